#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include <tiny_gltf.h>

#include "scene/Mat4.h"

// A picture a material takes its base colour from, decoded to 8-bit RGBA (top row first).
// Empty when the image could not be decoded; the material then shows its base colour only.
struct SceneTexture {
    int width = 0;
    int height = 0;
    std::vector<uint8_t> rgba;
    bool Usable() const { return width > 0 && height > 0; }
};

struct SceneMaterial {
    float baseColour[4] = {0.8f, 0.8f, 0.8f, 1.0f};
    int texture = -1;  // index into SceneGeometry::textures, -1 for none
    bool doubleSided = false;
};

// One morph target of a primitive, sparse: only the vertices it moves.
struct SceneMorphTarget {
    std::vector<uint32_t> vertices;
    std::vector<float> positionDeltas;  // 3 per listed vertex
    std::vector<float> normalDeltas;    // 3 per listed vertex, or empty
};

// One drawable part of a mesh, as read and checked: every index refers to a vertex, every
// joint reference to a joint of the node's skin.
struct ScenePrimitive {
    enum Mode { kPoints = 0, kLines = 1, kTriangles = 4 };
    int mode = kTriangles;
    int material = -1;              // index into SceneGeometry::materials, -1 for the default
    std::vector<float> positions;   // 3 per vertex
    std::vector<float> normals;     // 3 per vertex (made from the faces when absent)
    std::vector<float> texcoords;   // 2 per vertex, or empty
    std::vector<uint32_t> indices;  // by mode: 3 per triangle, 2 per line, 1 per point
    std::vector<uint16_t> joints;   // 4 per vertex when skinned, else empty
    std::vector<float> weights;     // 4 per vertex when skinned
    std::vector<SceneMorphTarget> targets;

    size_t VertexCount() const { return positions.size() / 3; }
};

struct SceneMesh {
    std::string name;
    std::vector<ScenePrimitive> primitives;
    std::vector<float> weights;  // default morph weights, one per target
};

struct SceneSkin {
    std::vector<int> joints;        // node indices
    std::vector<Mat4> inverseBind;  // one per joint (identity when the file gives none)
};

struct SceneLight {
    enum Type { kDirectional, kPoint, kSpot };
    int type = kDirectional;
    float colour[3] = {1, 1, 1};
    float intensity = 1.0f;
    int node = -1;
};

struct SceneCamera {
    int node = -1;
    float yfov = 30.0f;  // degrees
};

// The drawable content of a glTF scene: meshes, materials and decoded textures, skins,
// punctual lights, cameras and the morph-weight animation, read with every index checked.
// Problems that leave part of the scene out (a bad mesh, a texture that does not decode)
// are collected as messages; the rest is kept.
class SceneGeometry {
  public:
    // Largest number of vertices a primitive may have; bigger ones are left out.
    static constexpr size_t kMaxVertices = 4u << 20;

    void Load(const tinygltf::Model& model, std::vector<std::string>* messages);

    // Morph weights of node `node` (mesh node) at `seconds` of the scene's animation: the
    // animated weights when the scene animates them, else the node's or the mesh's.
    void MorphWeights(int node, double seconds, std::vector<float>* out) const;

    std::vector<SceneMesh> meshes;
    std::vector<SceneMaterial> materials;
    std::vector<SceneTexture> textures;
    std::vector<SceneSkin> skins;
    std::vector<SceneLight> lights;
    std::vector<SceneCamera> cameras;
    std::vector<int> nodeMesh;                    // per node: mesh index or -1
    std::vector<int> nodeSkin;                    // per node: skin index or -1
    std::vector<std::vector<float>> nodeWeights;  // per node: its own default weights or empty
    std::vector<Mat4> restLocal;  // per node: local transform as written in the file

  private:
    struct WeightTrack {
        int node = -1;
        std::vector<float> times;   // seconds
        std::vector<float> values;  // weight count per time
        bool step = false;
    };
    std::vector<WeightTrack> weightTracks_;
};
