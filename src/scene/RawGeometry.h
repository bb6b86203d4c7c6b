#pragma once

#include <string>

// The raw geometry form of a scene: every triangle mesh of the scene in world space at the
// scene's rest pose (node transforms as stored, no animation, no skinning or morphing),
// written as Wavefront OBJ text with one "o" group per mesh node.
class RawGeometry {
  public:
    // Reads the scene file `scenePath` and writes its raw geometry to `outPath` (through a
    // temporary file renamed into place). False with `error` naming the file on failure.
    static bool Write(const char* scenePath, const char* outPath, std::string* error);
};
