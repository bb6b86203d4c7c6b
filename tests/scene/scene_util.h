#pragma once

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

#include <tiny_gltf.h>

#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"

// A small glTF model put together in a test, written as embedded .gltf, .gltf with a side-car
// buffer, or .glb with tinygltf's writer.
class TestScene {
  public:
    enum Format { kEmbedded, kSideCar, kBinary };

    TestScene();
    // Appends `v` to buffer 0 in a buffer view of its own and returns the new accessor.
    int AddFloats(const std::vector<float>& v, int type, bool withMinMax);
    int AddNode(const std::string& name, int parent = -1);
    // Adds a sampler and a channel to animation `anim` (made when missing).
    void Animate(int anim, int node, const std::string& path, const std::vector<float>& times,
                 const std::vector<float>& values, const std::string& interpolation);
    // One triangle mesh on `node`.
    void AddTriangle(int node);
    bool Write(const std::string& path, Format format) const;

    tinygltf::Model model;
};

// The standard test scene: "head" (a mesh, extras) with children "jaw", "brow", an unnamed
// node and two nodes named "lip"; animation "shapes" moves the jaw (LINEAR translation, STEP
// rotation) and the brow (CUBICSPLINE scale); animation "other" moves the first lip.
TestScene MakeFaceScene();

using Node = std::unique_ptr<OrDagNode>;

// A scene file opened through the scene-file reader, with its root handle; Open also sets the
// wire layer up and the frame rate to 30 frames per second.
struct OpenScene {
    ::testing::AssertionResult Open(const std::string& path);
    // The node named `name` at or below `below` (the root when null); null when not found.
    Node Fetch(const char* name, OrDagNode* below = nullptr) const;
    // Channel `channel` of node `name` at `frame`; a failure and NaN when there is none.
    double Eval(const char* name, int channel, double frame) const;

    std::unique_ptr<KLWireSource> source;
    Node root;
};

// One key for KLWire::StoreChannel: time in ticks, value, in- and out-tangent codes.
struct StoreKey {
    int ticks;
    float value;
    int in, out;
};
// Stores `keys` into `channel` of `node`, replacing its old keys when `clear` and merging
// with them otherwise; StoreChannel's result (1 on success).
int StoreKeys(OrDagNode* node, int channel, const std::vector<StoreKey>& keys, bool clear = true);

// A fresh empty directory for one test.
std::string MakeTempDir();
void WriteFile(const std::string& path, const std::string& bytes);
std::string ReadFile(const std::string& path);
// Expects the Khronos validator (tools/validate-gltf.mjs) to report no errors for `path`; marks
// the test skipped when node is not installed.
void ExpectValidGltf(const std::string& path);
