#pragma once

#include <array>
#include <memory>
#include <string>
#include <unordered_map>
#include <vector>

#include <tiny_gltf.h>

#include "scene/ChannelCurve.h"

// One open glTF scene: the model as read, the node hierarchy (checked: no bad indices, no
// cycles, no node with two parents), a unique name per node and, per node, the key curves of
// its nine transform channels (TX TY TZ, RX RY RZ in degrees, SX SY SZ) taken from the first
// animation that animates each of its translation, rotation and scale.
class SceneDocument {
  public:
    static constexpr int kChannels = 9;

    // Reads a .gltf (embedded or side-car buffers) or .glb file. Null with `error` set to a
    // message naming the file when it cannot be read or is malformed.
    static std::shared_ptr<SceneDocument> Load(const std::string& path, std::string* error);
    // The same from bytes in memory (.glb when they start with the binary magic, else glTF
    // JSON); `name` stands for the file in messages. External files are never opened.
    static std::shared_ptr<SceneDocument> LoadFromMemory(const unsigned char* data, size_t size,
                                                         const std::string& name,
                                                         std::string* error);

    int NodeCount() const { return int(names_.size()); }
    // Unique name of node `index`; for -1, the root group's name (the scene's name or "root").
    const std::string& NodeName(int index) const;
    // Hierarchy walk; -1 is the synthetic root whose children are the scene's root nodes.
    // Each gives -1 when there is no such node.
    int FirstChild(int index) const;
    int NextSibling(int index) const;
    int Parent(int index) const { return index < 0 ? -1 : parent_[size_t(index)]; }
    bool HasChildren(int index) const { return FirstChild(index) >= 0; }
    // The node whose unique name is `name`, or -2 when there is none.
    int FindNode(const std::string& name) const;
    // Whether `node` is `ancestor` or lies below it (-1: the root group, which holds the
    // scene's nodes but not nodes outside the scene).
    bool Below(int node, int ancestor) const;

    // The key curve of one channel, null when the node does not animate it.
    ChannelCurve* Curve(int node, int channel) const;
    // Replaces (or with `clearFirst` false, merges keys into) one channel's curve and marks the
    // channel for rewriting at the next Store. An empty key list removes the curve. glTF has no
    // time before 0: the curve is cut at time 0 (TrimBefore); returns the keys that dropped.
    size_t SetCurve(int node, int channel, std::vector<ChannelCurve::Key> keys, bool clearFirst);
    // Whether any channel of the node, or of its path (0 translation, 1 rotation, 2 scale),
    // was set since the last Store.
    bool Touched(int node) const { return touched_[size_t(node)] != 0; }
    bool TouchedPath(int node, int path) const {
        return (touched_[size_t(node)] >> (3 * path) & 7u) != 0;
    }
    // The channel's value in the node's rest transform (its TRS or decomposed matrix).
    double RestValue(int node, int channel) const;

    // Writes the scene to `path` (.glb by that ending, else .gltf with embedded buffers)
    // through a SafeFile: the old file or the whole new one, never half of it.
    bool Store(const std::string& path, std::string* error);

    const std::string& path() const { return path_; }
    tinygltf::Model& model() { return model_; }
    const tinygltf::Model& model() const { return model_; }
    void ClearTouched();

  private:
    SceneDocument() = default;
    static std::shared_ptr<SceneDocument> parse(const unsigned char* data, size_t size,
                                                const std::string& name, const std::string& baseDir,
                                                bool allowFiles, std::string* error);
    bool buildHierarchy(std::string* why);
    void buildNames();
    bool readAnimations(std::string* why);
    // The curves of one sampler driving `path` (0 translation, 1 rotation, 2 scale).
    bool readSampler(const tinygltf::AnimationSampler& s, int path,
                     std::array<std::vector<ChannelCurve::Key>, 3>* keys, std::string* why) const;

    tinygltf::Model model_;
    std::string path_;
    std::string rootName_;
    std::vector<std::string> names_;
    std::vector<int> parent_;
    std::vector<int> next_;  // next sibling under the same parent (or among the roots)
    std::vector<int> roots_;
    std::vector<char> inScene_;                    // per node, whether it is one of roots_
    std::unordered_map<std::string, int> byName_;  // unique name to node
    std::vector<std::array<std::unique_ptr<ChannelCurve>, kChannels>> curves_;
    std::vector<unsigned> touched_;  // per node, one bit per channel
};
