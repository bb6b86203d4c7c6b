#pragma once

#include <string>

#include <tiny_gltf.h>

#include "scene/SceneGeometry.h"

// Reads one glTF mesh primitive into the views' form: positions (checked finite), indices
// (checked in range) turned into plain points, lines or triangles, normals (made from the
// faces when absent), texture coordinates, joints and weights, and sparse morph targets.
class ScenePrimitiveReader {
  public:
    // False with a reason ("has no vertices", ...) when the primitive cannot be drawn.
    static bool Read(const tinygltf::Model& model, const tinygltf::Primitive& in,
                     ScenePrimitive* out, std::string* why);
};
