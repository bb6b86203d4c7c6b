#pragma once

#include <string>
#include <vector>

#include <tiny_gltf.h>

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

// A fresh empty directory for one test.
std::string MakeTempDir();
void WriteFile(const std::string& path, const std::string& bytes);
std::string ReadFile(const std::string& path);
// Runs tools/validate-gltf.mjs on `path`: its exit status, or -1 when node is not installed.
int RunValidator(const std::string& path, std::string* output);
