#pragma once

#include <string>

#include <tiny_gltf.h>

// Serialises a model into a glTF file: `path` ending in ".glb" (any case) gives a binary file
// whose buffer 0 is the binary chunk, anything else a .gltf with its buffers embedded as data
// URIs. Images read as bytes are written back as the same bytes; images named by a file keep
// their uri. The file is written through a SafeFile, so that `path` is either the old file or
// the whole new one and no temporary file is left behind.
class SceneSerializer {
  public:
    static bool IsBinaryPath(const std::string& path);
    // Base64 of `size` bytes (RFC 4648, with padding), as data URIs carry them.
    static std::string Base64(const unsigned char* bytes, size_t size);
    // Whether every buffer can be joined into one binary chunk as the file is written (none
    // has extras, and together they fit a .glb).
    static bool CanJoinBuffers(const tinygltf::Model& model);
    // False with `error` naming the file when it cannot be written. For a .glb, `joinBuffers`
    // writes every buffer into the binary chunk, one after another at 16-byte boundaries, with
    // the buffer views moved accordingly in the file (the model itself keeps its buffers);
    // without it only buffer 0 goes there. With `closeGaps` the bytes of a buffer that no view
    // covers are left out (ModelCompactor::LiveSpans): a .glb leaves them out as it is written,
    // otherwise they are taken out of the model first.
    static bool Write(tinygltf::Model& model, const std::string& path, bool joinBuffers,
                      bool closeGaps, std::string* error);
};
