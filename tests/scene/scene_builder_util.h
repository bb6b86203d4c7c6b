#pragma once

#include <string>
#include <vector>

#include <tiny_gltf.h>

#include "GltfModelBuilder.h"

// A small glTF model built in code for the writer tests: nodes, float accessors each with a
// buffer view of its own in a chosen buffer, and animation channels.
class ModelBuilder : public GltfModelBuilder {
  public:
    ModelBuilder() {
        m.scenes.emplace_back();
        m.scenes[0].name = "scene";
        m.defaultScene = 0;
    }
    // A node named `name` under `parent` (-1: a root of the scene); its index.
    int Node(const std::string& name, int parent = -1) {
        m.nodes.emplace_back();
        m.nodes.back().name = name;
        const int index = int(m.nodes.size()) - 1;
        (parent < 0 ? m.scenes[0].nodes : m.nodes[size_t(parent)].children).push_back(index);
        return index;
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
        anim.channels.emplace_back();
        anim.channels.back().sampler = int(anim.samplers.size());
        anim.channels.back().target_node = node;
        anim.channels.back().target_path = path;
        anim.samplers.emplace_back();
        anim.samplers.back().input = Floats(times, 1, buffer, true);
        anim.samplers.back().output =
            Floats(values, std::string(path) == "rotation" ? 4 : 3, buffer);
        anim.samplers.back().interpolation = interpolation;
    }
    bool Save(const std::string& path, bool binary = false) {
        tinygltf::TinyGLTF io;
        io.SetImageWriter(nullptr, nullptr);  // images keep their uri as given
        return io.WriteGltfSceneToFile(&m, path, false, true, true, binary);
    }
};
