#include "scene/scene_util.h"

#include <stdlib.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <fstream>
#include <iterator>

#include "scene/KLWire.h"
#include "toolkit/CueTime.h"

TestScene::TestScene() {
    model.asset.version = "2.0";
    model.asset.generator = "chirrup tests";
    model.buffers.emplace_back();
    model.scenes.emplace_back();
    model.scenes[0].name = "face";
    model.defaultScene = 0;
}

int TestScene::AddFloats(const std::vector<float>& v, int type, bool withMinMax) {
    tinygltf::Buffer& b = model.buffers[0];
    const unsigned char* p = reinterpret_cast<const unsigned char*>(v.data());
    tinygltf::BufferView view;
    view.buffer = 0;
    view.byteOffset = b.data.size();
    view.byteLength = v.size() * 4;
    b.data.insert(b.data.end(), p, p + v.size() * 4);
    model.bufferViews.push_back(view);
    tinygltf::Accessor a;
    a.bufferView = int(model.bufferViews.size()) - 1;
    a.componentType = TINYGLTF_COMPONENT_TYPE_FLOAT;
    a.type = type;
    size_t width = type == TINYGLTF_TYPE_SCALAR ? 1 : (type == TINYGLTF_TYPE_VEC3 ? 3 : 4);
    a.count = v.size() / width;
    if (withMinMax) {
        a.minValues.assign(width, 1e30);
        a.maxValues.assign(width, -1e30);
        for (size_t i = 0; i < v.size(); ++i) {
            a.minValues[i % width] = std::min(a.minValues[i % width], double(v[i]));
            a.maxValues[i % width] = std::max(a.maxValues[i % width], double(v[i]));
        }
    }
    model.accessors.push_back(a);
    return int(model.accessors.size()) - 1;
}

int TestScene::AddNode(const std::string& name, int parent) {
    tinygltf::Node n;
    n.name = name;
    model.nodes.push_back(n);
    int index = int(model.nodes.size()) - 1;
    if (parent >= 0) {
        model.nodes[size_t(parent)].children.push_back(index);
    } else {
        model.scenes[0].nodes.push_back(index);
    }
    return index;
}

void TestScene::Animate(int anim, int node, const std::string& path,
                        const std::vector<float>& times, const std::vector<float>& values,
                        const std::string& interpolation) {
    while (int(model.animations.size()) <= anim) {
        model.animations.emplace_back();
        model.animations.back().name = anim == 0 ? "shapes" : "other";
    }
    tinygltf::AnimationSampler s;
    s.input = AddFloats(times, TINYGLTF_TYPE_SCALAR, true);
    s.output =
        AddFloats(values, path == "rotation" ? TINYGLTF_TYPE_VEC4 : TINYGLTF_TYPE_VEC3, false);
    s.interpolation = interpolation;
    tinygltf::Animation& a = model.animations[size_t(anim)];
    tinygltf::AnimationChannel c;
    c.sampler = int(a.samplers.size());
    c.target_node = node;
    c.target_path = path;
    a.samplers.push_back(s);
    a.channels.push_back(c);
}

void TestScene::AddTriangle(int node) {
    tinygltf::Primitive p;
    p.attributes["POSITION"] = AddFloats({0, 0, 0, 1, 0, 0, 0, 1, 0}, TINYGLTF_TYPE_VEC3, true);
    p.mode = TINYGLTF_MODE_TRIANGLES;
    tinygltf::Mesh mesh;
    mesh.name = "tri";
    mesh.primitives.push_back(p);
    model.meshes.push_back(mesh);
    model.nodes[size_t(node)].mesh = int(model.meshes.size()) - 1;
}

bool TestScene::Write(const std::string& path, Format format) const {
    tinygltf::TinyGLTF writer;
    tinygltf::Model copy = model;
    if (copy.buffers[0].data.empty()) {
        copy.buffers.clear();
    }
    for (tinygltf::Node& n : copy.nodes) {
        if (n.name.empty() && n.children.empty() && n.mesh < 0) {
            n.translation = {0, 0, 0};  // the writer would write an empty node as null
        }
    }
    return writer.WriteGltfSceneToFile(&copy, path, true, format != kSideCar, true,
                                       format == kBinary);
}

TestScene MakeFaceScene() {
    TestScene s;
    int head = s.AddNode("head");
    int jaw = s.AddNode("jaw", head);
    int brow = s.AddNode("brow", head);
    s.AddNode("", head);
    int lip = s.AddNode("lip", head);
    s.AddNode("lip", jaw);
    s.AddTriangle(head);
    s.model.nodes[size_t(head)].extras = tinygltf::Value(std::string("kept"));
    s.model.nodes[size_t(head)].translation = {0, 1.5, 0};
    s.Animate(0, jaw, "translation", {0.0f, 1 / 30.0f, 2 / 30.0f}, {0, 0, 0, 0, -1, 0, 0, -2, 1},
              "LINEAR");
    // 0 and 90 degrees about X, held.
    s.Animate(0, jaw, "rotation", {0.0f, 0.1f}, {0, 0, 0, 1, 0.70710678f, 0, 0, 0.70710678f},
              "STEP");
    // CUBICSPLINE: in-tangent, value, out-tangent per key.
    s.Animate(0, brow, "scale", {0.0f, 1.0f},
              {0, 0, 0, 1, 1, 1, 2, 0, 0, 0, 0, 0, 3, 1, 1, 0, 0, 0}, "CUBICSPLINE");
    s.Animate(1, lip, "translation", {0.0f, 1.0f}, {0, 0, 0, 5, 5, 5}, "LINEAR");
    return s;
}

std::string MakeTempDir() {
    std::string name = std::string(CHIRRUP_BINARY_DIR) + "/scene-test-XXXXXX";
    const char* made = mkdtemp(&name[0]);
    return made ? std::string(made) : std::string("/tmp");
}

void WriteFile(const std::string& path, const std::string& bytes) {
    std::ofstream out(path, std::ios::binary);
    out << bytes;
}

std::string ReadFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(in), {});
}

::testing::AssertionResult OpenScene::Open(const std::string& path) {
    KLWire::Initialize();
    CueTime::default_fps = 30;
    root.reset();
    source = std::make_unique<KLWireSource>(path.c_str());
    if (!source->Valid()) {
        return ::testing::AssertionFailure() << source->ErrorText();
    }
    root.reset(source->RootNode());
    return ::testing::AssertionSuccess();
}

Node OpenScene::Fetch(const char* name, OrDagNode* below) const {
    return Node(KLWire::FetchDagNode(below ? below : root.get(), name));
}

int StoreKeys(OrDagNode* node, int channel, const std::vector<StoreKey>& keys, bool clear) {
    std::vector<CueTime> times;
    std::vector<float> values;
    std::vector<int> in, out;
    for (const StoreKey& k : keys) {
        times.push_back(CueTime::FromTicks(k.ticks));
        values.push_back(k.value);
        in.push_back(k.in);
        out.push_back(k.out);
    }
    KLWire::alwaysClearChannel = clear ? 1 : 0;
    return KLWire::StoreChannel(node, channel, int(keys.size()), times.data(), values.data(),
                                in.data(), nullptr, out.data(), nullptr);
}

double OpenScene::Eval(const char* name, int channel, double frame) const {
    Node n = Fetch(name);
    OrChannel* c = n ? KLWire::FindChannel(n.get(), channel) : nullptr;
    EXPECT_TRUE(c) << name << " channel " << channel;
    return c ? c->eval(frame) : NAN;
}

void ExpectValidGltf(const std::string& path) {
    if (std::system("node --version >/dev/null 2>&1") != 0) {
        GTEST_SKIP() << "node is not installed";
    }
    std::string cmd =
        "node " + std::string(CHIRRUP_SOURCE_DIR) + "/tools/validate-gltf.mjs '" + path + "' 2>&1";
    FILE* p = popen(cmd.c_str(), "r");
    ASSERT_TRUE(p) << cmd;
    char buf[512];
    std::string report;
    while (fgets(buf, sizeof buf, p)) {
        report += buf;
    }
    int status = pclose(p);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0) << report;
    EXPECT_NE(report.find(": 0 errors"), std::string::npos) << report;
}
