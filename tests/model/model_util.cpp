#include <tiny_gltf.h>

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <fstream>

#include "model/ModelTestUtil.h"
#include "toolkit/KLErrHandler.h"

TempDir::TempDir(const std::string& name)
    : path_(std::string(CHIRRUP_BINARY_DIR) + "/test-tmp/model/" + name) {
    std::filesystem::remove_all(path_);
    std::filesystem::create_directories(path_);
}

TempDir::~TempDir() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
}

bool WriteTextFile(const std::string& path, const std::string& text) {
    std::ofstream out(path, std::ios::binary);
    out << text;
    return bool(out);
}

struct SceneBuilder::Impl {
    tinygltf::Model model;

    int AddFloats(const std::vector<float>& v, int type, bool withMinMax) {
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
        const size_t width =
            type == TINYGLTF_TYPE_SCALAR ? 1 : (type == TINYGLTF_TYPE_VEC3 ? 3 : 4);
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

    void Animate(int node, const std::string& path, const std::vector<float>& seconds,
                 const std::vector<float>& values) {
        if (model.animations.empty()) {
            model.animations.emplace_back();
            model.animations[0].name = "shapes";
        }
        tinygltf::AnimationSampler s;
        s.input = AddFloats(seconds, TINYGLTF_TYPE_SCALAR, true);
        s.output =
            AddFloats(values, path == "rotation" ? TINYGLTF_TYPE_VEC4 : TINYGLTF_TYPE_VEC3, false);
        s.interpolation = "LINEAR";
        tinygltf::Animation& a = model.animations[0];
        tinygltf::AnimationChannel c;
        c.sampler = int(a.samplers.size());
        c.target_node = node;
        c.target_path = path;
        a.samplers.push_back(s);
        a.channels.push_back(c);
    }
};

SceneBuilder::SceneBuilder() : impl_(new Impl) {
    impl_->model.asset.version = "2.0";
    impl_->model.buffers.emplace_back();
    impl_->model.scenes.emplace_back();
    impl_->model.scenes[0].name = "face";
    impl_->model.defaultScene = 0;
}

SceneBuilder::~SceneBuilder() {
    delete impl_;
}

int SceneBuilder::AddNode(const std::string& name, int parent) {
    tinygltf::Node n;
    n.name = name;
    impl_->model.nodes.push_back(n);
    const int index = int(impl_->model.nodes.size()) - 1;
    if (parent >= 0) {
        impl_->model.nodes[size_t(parent)].children.push_back(index);
    } else {
        impl_->model.scenes[0].nodes.push_back(index);
    }
    return index;
}

void SceneBuilder::Translate(int node, const std::vector<float>& seconds,
                             const std::vector<float>& xyz) {
    impl_->Animate(node, "translation", seconds, xyz);
}

void SceneBuilder::Scale(int node, const std::vector<float>& seconds,
                         const std::vector<float>& xyz) {
    impl_->Animate(node, "scale", seconds, xyz);
}

void SceneBuilder::RotateX(int node, const std::vector<float>& seconds,
                           const std::vector<float>& degrees) {
    std::vector<float> q;
    for (float d : degrees) {
        const double half = d * 3.141592653589793 / 360.0;
        q.insert(q.end(), {float(std::sin(half)), 0.0f, 0.0f, float(std::cos(half))});
    }
    impl_->Animate(node, "rotation", seconds, q);
}

bool SceneBuilder::Write(const std::string& path) const {
    tinygltf::TinyGLTF writer;
    tinygltf::Model copy = impl_->model;
    if (copy.buffers[0].data.empty())
        copy.buffers.clear();
    return writer.WriteGltfSceneToFile(&copy, path, true, true, true, false);
}

class ReportLog : public KLErrHandler {
  public:
    void Handle(KLErr* e) override { messages.push_back(e->Message()); }
    std::vector<std::string> messages;
};

ReportCapture::ReportCapture() : log_(new ReportLog) {}
ReportCapture::~ReportCapture() {
    delete log_;
}
const std::vector<std::string>& ReportCapture::Messages() const {
    return log_->messages;
}
