#pragma once

#include <cstddef>
#include <vector>

#include <tiny_gltf.h>

// Reads the elements of a glTF accessor (bounds-checked when the scene was opened) as numbers:
// any component type, normalised integers scaled to [0, 1] or [-1, 1], sparse substitutions
// applied.
class SceneAccessor {
  public:
    // `components` numbers per element; false when the accessor does not exist, has another
    // number of components per element, or a sparse index out of range.
    static bool Read(const tinygltf::Model& model, int index, int components,
                     std::vector<double>* out);
    // As Read, into floats; non-finite values become 0 and are counted in *bad.
    static bool ReadFloats(const tinygltf::Model& model, int index, int components,
                           std::vector<float>* out, size_t* bad = nullptr);
    // Bytes per component of a glTF component type; 0 for a type glTF does not allow in an
    // accessor (signed 32-bit integers among them).
    static int ComponentSize(int type);
    // The accessor's element count; 0 when it does not exist.
    static size_t Count(const tinygltf::Model& model, int index);
};
