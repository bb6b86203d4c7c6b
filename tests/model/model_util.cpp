#include <tiny_gltf.h>

#include <algorithm>
#include <cmath>
#include <filesystem>

#include "model/ModelTestUtil.h"
#include "toolkit/CueTime.h"

ModelTest::ModelTest() {
    const auto* info = ::testing::UnitTest::GetInstance()->current_test_info();
    std::string name = std::string(info->test_suite_name()) + "." + info->name();
    std::replace(name.begin(), name.end(), '/', '_');
    dir = std::string(CHIRRUP_BINARY_DIR) + "/test-tmp/model/" + name;
    std::filesystem::remove_all(dir);
    std::filesystem::create_directories(dir);
}

ModelTest::~ModelTest() {
    CueTime::default_fps = 30;
    std::error_code ignored;
    std::filesystem::remove_all(dir, ignored);
}

void ModelTest::Open(const SceneBuilder& scene, const std::string& name) {
    root.reset();
    ASSERT_TRUE(scene.Write(File(name)));
    wire = std::make_unique<KLWireSource>(File(name).c_str());
    ASSERT_TRUE(wire->Valid()) << wire->ErrorText();
    root.reset(wire->RootNode());
}

struct SceneBuilder::Impl {
    tinygltf::Model model;

    // An accessor of `width` floats per element over new buffer data; key times get min/max.
    int AddFloats(const std::vector<float>& v, int type, size_t width) {
        tinygltf::Buffer& b = model.buffers[0];
        tinygltf::BufferView view;
        view.buffer = 0;
        view.byteOffset = b.data.size();
        view.byteLength = v.size() * 4;
        const auto* p = reinterpret_cast<const unsigned char*>(v.data());
        b.data.insert(b.data.end(), p, p + v.size() * 4);
        model.bufferViews.push_back(view);
        tinygltf::Accessor a;
        a.bufferView = int(model.bufferViews.size()) - 1;
        a.componentType = TINYGLTF_COMPONENT_TYPE_FLOAT;
        a.type = type;
        a.count = v.size() / width;
        if (type == TINYGLTF_TYPE_SCALAR) {
            a.minValues = {*std::min_element(v.begin(), v.end())};
            a.maxValues = {*std::max_element(v.begin(), v.end())};
        }
        model.accessors.push_back(a);
        return int(model.accessors.size()) - 1;
    }
};

SceneBuilder::SceneBuilder() : impl_(new Impl) {
    impl_->model.asset.version = "2.0";
    impl_->model.buffers.emplace_back();
    impl_->model.scenes.emplace_back();
    impl_->model.defaultScene = 0;
}

SceneBuilder::~SceneBuilder() = default;

int SceneBuilder::AddNode(const std::string& name, int parent) {
    tinygltf::Node n;
    n.name = name;
    impl_->model.nodes.push_back(n);
    const int index = int(impl_->model.nodes.size()) - 1;
    (parent >= 0 ? impl_->model.nodes[size_t(parent)].children : impl_->model.scenes[0].nodes)
        .push_back(index);
    return index;
}

void SceneBuilder::Animate(int node, const std::string& path, const std::vector<float>& seconds,
                           const std::vector<float>& values) {
    tinygltf::Model& m = impl_->model;
    if (m.animations.empty())
        m.animations.emplace_back();
    const bool rotation = path == "rotation";
    tinygltf::AnimationSampler s;
    s.input = impl_->AddFloats(seconds, TINYGLTF_TYPE_SCALAR, 1);
    s.output = impl_->AddFloats(values, rotation ? TINYGLTF_TYPE_VEC4 : TINYGLTF_TYPE_VEC3,
                                rotation ? 4 : 3);
    s.interpolation = "LINEAR";
    tinygltf::AnimationChannel c;
    c.sampler = int(m.animations[0].samplers.size());
    c.target_node = node;
    c.target_path = path;
    m.animations[0].samplers.push_back(s);
    m.animations[0].channels.push_back(c);
}

void SceneBuilder::RotateX(int node, const std::vector<float>& seconds,
                           const std::vector<float>& degrees) {
    std::vector<float> q;
    for (float d : degrees) {
        const double half = d * 3.141592653589793 / 360.0;
        q.insert(q.end(), {float(std::sin(half)), 0.0f, 0.0f, float(std::cos(half))});
    }
    Animate(node, "rotation", seconds, q);
}

bool SceneBuilder::Write(const std::string& path) const {
    tinygltf::TinyGLTF writer;
    tinygltf::Model copy = impl_->model;
    if (copy.buffers[0].data.empty())
        copy.buffers.clear();
    return writer.WriteGltfSceneToFile(&copy, path, true, true, true, false);
}
