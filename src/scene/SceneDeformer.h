#pragma once

#include <vector>

#include "scene/Mat4.h"
#include "scene/SceneDrawItem.h"

class SceneGeometry;

// Poses the meshes of a scene on the CPU: morph targets by their weights, then the skin by
// its joints' matrices. Keeps one pair of output arrays per deformed primitive; primitives
// with neither skin nor active morph targets are drawn from their own arrays under their
// node's matrix.
class SceneDeformer {
  public:
    // Sizes the output arrays for `geometry` (called after every load).
    void Prepare(const SceneGeometry& geometry);
    // The draw items of every mesh node with the nodes' world matrices `world` and the
    // morph weights at `seconds` of the scene's own animation.
    void Deform(const SceneGeometry& geometry, const std::vector<Mat4>& world, double seconds,
                std::vector<SceneDrawItem>* items);

  private:
    struct Output {
        int node = -1;
        int primitive = -1;
        std::vector<float> positions;
        std::vector<float> normals;
    };
    std::vector<Output> outputs_;  // one per (mesh node, primitive), in node order
    std::vector<float> weights_;
    std::vector<Mat4> jointMatrices_;
    std::vector<Mat4> jointNormals_;
};
