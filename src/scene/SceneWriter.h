#pragma once

#include <set>
#include <string>
#include <vector>

#include <tiny_gltf.h>

class SceneDocument;

// Writes an open scene back to a glTF file. The translation, rotation and scale animation of
// every node whose channels were stored into is rewritten in the scene's first animation (or a
// new one named "chirrup"); everything else in the model is written as it was read. The
// document's model is updated in place, so that it matches what was written.
class SceneWriter {
  public:
    explicit SceneWriter(SceneDocument& doc);
    // `path` ending in ".glb" gives a binary file, anything else a .gltf with embedded
    // buffers; written to a temporary file in the same directory and renamed into place.
    bool Write(const std::string& path, std::string* error);

  private:
    struct NewSampler {
        int node;
        const char* path;
        std::string interpolation;
        std::vector<float> times;   // seconds
        std::vector<float> values;  // width floats per element
        int width;
    };

    void rewriteAnimation();
    std::set<int> removeTouchedChannels(tinygltf::Animation* anim);
    void collectGarbage(const std::set<int>& freedAccessors);
    void compactBuffers(const std::set<int>& buffers);
    void sampleTranslationScale(int node, int firstChannel, const char* path);
    void sampleRotation(int node);
    // Every key time of the node's three channels from `firstChannel` and, with `frames`,
    // every whole frame between the first and last key, ascending, one per distinct float.
    std::vector<double> sampleTimes(int node, int firstChannel, bool frames) const;
    // The three channels from `first` at `times` (seconds, ascending); an unanimated axis
    // holds its rest value.
    void evaluateAxes(int node, int first, const std::vector<double>& times,
                      std::vector<double> axis[3]) const;
    int appendAccessor(const std::vector<float>& data, int type, size_t count, bool withMinMax);
    void makeNodeTrs(int node);

    SceneDocument& doc_;
    tinygltf::Model& m_;
    std::vector<NewSampler> samplers_;
    std::vector<unsigned char> data_;  // new animation bytes, one buffer view in buffer 0
    int view_ = -1;
};
