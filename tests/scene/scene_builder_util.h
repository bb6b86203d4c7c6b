#pragma once

#include <string>
#include <vector>

#include <tiny_gltf.h>

// A small glTF model built in code for the writer tests: nodes, float accessors each with a
// buffer view of its own in a chosen buffer, and animation channels.
class ModelBuilder {
  public:
    ModelBuilder() {
        m.asset.version = "2.0";
        m.scenes.emplace_back();
        m.scenes[0].name = "scene";
        m.defaultScene = 0;
    }
    // A node named `name` under `parent` (-1: a root of the scene); its index.
    int Node(const std::string& name, int parent = -1) {
        tinygltf::Node n;
        n.name = name;
        m.nodes.push_back(n);
        int index = int(m.nodes.size()) - 1;
        if (parent < 0) {
            m.scenes[0].nodes.push_back(index);
        } else {
            m.nodes[size_t(parent)].children.push_back(index);
        }
        return index;
    }
    // An accessor of `width` floats per element (1, 3, 4 or 16) in buffer `buffer`.
    int Floats(const std::vector<float>& v, int width, int buffer = 0, bool minMax = false) {
        while (int(m.buffers.size()) <= buffer) {
            m.buffers.emplace_back();
        }
        std::vector<unsigned char>& data = m.buffers[size_t(buffer)].data;
        data.resize((data.size() + 3) & ~size_t(3), 0);
        tinygltf::BufferView view;
        view.buffer = buffer;
        view.byteOffset = data.size();
        view.byteLength = v.size() * 4;
        const unsigned char* p = reinterpret_cast<const unsigned char*>(v.data());
        data.insert(data.end(), p, p + v.size() * 4);
        m.bufferViews.push_back(view);
        tinygltf::Accessor a;
        a.bufferView = int(m.bufferViews.size()) - 1;
        a.componentType = TINYGLTF_COMPONENT_TYPE_FLOAT;
        a.type = width == 1   ? TINYGLTF_TYPE_SCALAR
                 : width == 3 ? TINYGLTF_TYPE_VEC3
                 : width == 4 ? TINYGLTF_TYPE_VEC4
                              : TINYGLTF_TYPE_MAT4;
        a.count = v.size() / size_t(width);
        if (minMax) {
            a.minValues.assign(size_t(width), 1e30);
            a.maxValues.assign(size_t(width), -1e30);
            for (size_t i = 0; i < v.size(); ++i) {
                double& lo = a.minValues[i % size_t(width)];
                double& hi = a.maxValues[i % size_t(width)];
                lo = std::min(lo, double(v[i]));
                hi = std::max(hi, double(v[i]));
            }
        }
        m.accessors.push_back(a);
        return int(m.accessors.size()) - 1;
    }
    // A channel on `node`'s `path` in animation `clip` (made as needed), its data in `buffer`.
    void Channel(int clip, int node, const char* path, const std::vector<float>& times,
                 const std::vector<float>& values, const char* interpolation = "LINEAR",
                 int buffer = 0) {
        while (int(m.animations.size()) <= clip) {
            m.animations.emplace_back();
            m.animations.back().name = "clip" + std::to_string(m.animations.size() - 1);
        }
        tinygltf::Animation& anim = m.animations[size_t(clip)];
        tinygltf::AnimationSampler s;
        s.input = Floats(times, 1, buffer, true);
        s.output = Floats(values, std::string(path) == "rotation" ? 4 : 3, buffer);
        s.interpolation = interpolation;
        tinygltf::AnimationChannel c;
        c.sampler = int(anim.samplers.size());
        c.target_node = node;
        c.target_path = path;
        anim.samplers.push_back(s);
        anim.channels.push_back(c);
    }
    bool Save(const std::string& path, bool binary = false) {
        tinygltf::TinyGLTF io;
        io.SetImageWriter(nullptr, nullptr);  // images keep their uri as given
        return io.WriteGltfSceneToFile(&m, path, false, true, true, binary);
    }

    tinygltf::Model m;
};
