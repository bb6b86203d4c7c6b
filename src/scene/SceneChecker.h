#pragma once

#include <string>
#include <vector>

#include <tiny_gltf.h>

// Bounds checks of a loaded glTF model, made before anything indexes into it (the loader
// does not check indices), and checked reads of accessor data. Every failure fills `why`
// with a short reason that the caller prefixes with the file name.
class SceneChecker {
  public:
    // Indices of buffer views, accessors, meshes, skins, nodes, scenes and animations in
    // range; every accessor and buffer view inside its buffer; node transforms of the right
    // size and finite.
    static bool Check(const tinygltf::Model& model, std::string* why);
    // The elements of accessor `index` as floats, `components` per element (the accessor's
    // type must have that many); normalised integer components are scaled to [-1, 1] or
    // [0, 1]. Non-finite values are an error.
    static bool ReadFloats(const tinygltf::Model& model, int index, int components,
                           std::vector<float>* out, std::string* why);

    // The .glb container's header and chunk lengths, so that the loader never reads past the
    // `size` bytes it is given; *used gets the container's own length.
    static bool CheckGlb(const unsigned char* data, size_t size, size_t* used, std::string* why);

  private:
    static bool checkAccessor(const tinygltf::Model& model, size_t index, std::string* why);
    static bool checkNodes(const tinygltf::Model& model, std::string* why);
    static bool checkMeshesSkins(const tinygltf::Model& model, std::string* why);
    static bool checkAnimations(const tinygltf::Model& model, std::string* why);
};
