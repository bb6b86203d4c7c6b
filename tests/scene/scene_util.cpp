#include "scene/scene_util.h"

#include <stdlib.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <sstream>

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
    tinygltf::BufferView view;
    view.buffer = 0;
    view.byteOffset = b.data.size();
    view.byteLength = v.size() * 4;
    const unsigned char* p = reinterpret_cast<const unsigned char*>(v.data());
    b.data.insert(b.data.end(), p, p + v.size() * 4);
    model.bufferViews.push_back(view);
    tinygltf::Accessor a;
    a.bufferView = int(model.bufferViews.size()) - 1;
    a.componentType = TINYGLTF_COMPONENT_TYPE_FLOAT;
    a.type = type;
    int width = type == TINYGLTF_TYPE_SCALAR ? 1 : (type == TINYGLTF_TYPE_VEC3 ? 3 : 4);
    a.count = v.size() / size_t(width);
    if (withMinMax) {
        a.minValues.assign(size_t(width), 1e30);
        a.maxValues.assign(size_t(width), -1e30);
        for (size_t i = 0; i < v.size(); ++i) {
            a.minValues[i % size_t(width)] = std::min(a.minValues[i % size_t(width)], double(v[i]));
            a.maxValues[i % size_t(width)] = std::max(a.maxValues[i % size_t(width)], double(v[i]));
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
    std::string tmpl = std::string(CHIRRUP_BINARY_DIR) + "/scene-test-XXXXXX";
    std::vector<char> name(tmpl.begin(), tmpl.end());
    name.push_back('\0');
    const char* made = mkdtemp(name.data());
    return made ? std::string(made) : std::string("/tmp");
}

void WriteFile(const std::string& path, const std::string& bytes) {
    std::ofstream out(path, std::ios::binary);
    out << bytes;
}

std::string ReadFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    std::stringstream ss;
    ss << in.rdbuf();
    return ss.str();
}

int RunValidator(const std::string& path, std::string* output) {
    if (std::system("node --version >/dev/null 2>&1") != 0) {
        return -1;
    }
    std::string cmd =
        "node " + std::string(CHIRRUP_SOURCE_DIR) + "/tools/validate-gltf.mjs '" + path + "' 2>&1";
    FILE* p = popen(cmd.c_str(), "r");
    if (!p) {
        return -1;
    }
    char buf[512];
    output->clear();
    while (fgets(buf, sizeof buf, p)) {
        *output += buf;
    }
    int status = pclose(p);
    return WIFEXITED(status) ? WEXITSTATUS(status) : 99;
}
