#pragma once

#include <set>
#include <string>
#include <vector>

#include <tiny_gltf.h>

#include "scene/SamplerBuilder.h"

class SceneDocument;

// Writes an open scene back to a glTF file. Only the node paths (translation, rotation, scale)
// whose channels were set since the last store are rewritten; everything else in the model,
// other paths of the same node included, is written as it was read.
//
// A rewritten path ends up animated by one channel in one clip: the first animation (clip) that
// animated that node path when the scene was read receives the new channel, or when none did,
// the scene's first animation, or a new one named "chirrup" when the scene has none. Channels on
// that path in every other clip are removed (with their samplers, accessors, buffer views and
// the bytes only they used); a clip left without channels is removed, and so is a buffer left
// without views. A path whose three channels were all removed ends up unanimated. Key times
// before 0 never reach the file (the document cuts every set curve at 0). How each path's
// sampler is written (exact keys, cubic pieces, or samples within a tolerance) is described at
// SamplerBuilder. The new animation bytes go into a buffer of their own (for a .glb, in memory, the
// key times in one and each path's values in another, taken over from the builder without a
// copy; a later .gltf store joins them back into one); samplers whose key times are the same
// share one input accessor. A .glb is written with
// every buffer and every embedded image in its binary chunk. The document's model is updated in
// place to hold what was written (for a .glb its buffers may still be separate in memory,
// joined only in the file).
class SceneWriter {
  public:
    explicit SceneWriter(SceneDocument& doc);
    // `path` ending in ".glb" gives a binary file, anything else a .gltf with embedded
    // buffers; written through a SafeFile (the old file or the whole new one, never half). False
    // with `error` set (naming the file, and the node when a curve cannot be written), and the
    // file untouched, on failure.
    bool Write(const std::string& path, std::string* error);

  private:
    struct Target {
        int node;
        int path;       // 0 translation, 1 rotation, 2 scale
        int clip = -1;  // the animation receiving the new channel
        BuiltSampler sampler;
    };

    // The rewritten paths with their built samplers; false (nothing changed yet) when one
    // cannot be built.
    bool buildTargets(std::vector<Target>* targets, std::string* why);
    // Removes every channel on a rewritten path from every clip, choosing each path's clip
    // first; returns the accessors of the samplers that nothing uses any more.
    std::set<int> removeOldChannels(std::vector<Target>* targets);
    // Appends the built samplers; for a `binary` file each path's values go into a buffer of
    // their own (joined as the file is written).
    void appendSamplers(std::vector<Target>* targets, bool binary);
    // Joins the buffers of single paths' values into one (before writing a .gltf).
    void joinPathBuffers();
    // Appends `floats` values to the new bytes' buffer (already reserved) as a float accessor of
    // the new view.
    int appendAccessor(const float* values, size_t floats, int type, size_t count, bool withMinMax);
    void makeNodeTrs(int node);

    SceneDocument& doc_;
    tinygltf::Model& m_;
    int buffer_ = 0;        // the buffer holding the new animation bytes
    int view_ = -1;         // their buffer view, at the end of that buffer
    size_t viewStart_ = 0;  // its offset in the buffer
};
