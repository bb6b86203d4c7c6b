#pragma once

#include <set>
#include <vector>

#include <tiny_gltf.h>

// The index bookkeeping of a model whose animation was rewritten: accessors, buffer views and
// buffers that nothing refers to any more are removed and every reference renumbered, and for a
// .glb every buffer and every image held as bytes is moved into buffer 0, the binary chunk.
// Works on the model in place (borrowed).
class ModelCompactor {
  public:
    explicit ModelCompactor(tinygltf::Model& model) : m_(model) {}

    // True when every extension in use is known not to refer to accessors, buffer views or
    // buffers by index, so that renumbering them cannot break one; otherwise nothing is
    // renumbered and unused objects stay in place (still valid, merely unused).
    bool RenumberingSafe() const;
    // Removes those of `candidates` (accessor indices) that nothing uses any more, then the
    // buffer views only they used. Their bytes stay where they are, a gap in the model that
    // the serialiser leaves out of the file (see SceneSerializer::Write).
    void RemoveUnusedAccessors(const std::set<int>& candidates);
    // Removes every buffer that no buffer view uses.
    void RemoveUnusedBuffers();
    // For a .glb: moves every image held as bytes outside a buffer view into buffer 0 (made
    // when there is none), whose uri is cleared, and with `moveBuffers` the bytes of every
    // other buffer too (without, the serialiser joins them as it writes the binary chunk).
    void PackIntoFirstBuffer(bool moveBuffers);

    // Bytes [from, from + length) of a buffer that buffer views cover (merged where they
    // overlap), and `to`, where they go when the bytes no view covers are left out: as low as
    // they can, keeping their offset modulo 16 so that every alignment rule still holds.
    struct Span {
        size_t from, to, length;
    };
    // The spans of every buffer, in order; `spanOfView` the index of each view's span in its
    // buffer's list, `lengths` each buffer's length without the bytes left out.
    static std::vector<std::vector<Span>> LiveSpans(const tinygltf::Model& m,
                                                    std::vector<size_t>* spanOfView,
                                                    std::vector<size_t>* lengths);

    // Moves the bytes of every buffer that a view uses together as LiveSpans places them,
    // leaving out what no view covers.
    void CloseGaps();

  private:
    void moveIntoFirst();
    // Appends bytes at a 16-byte boundary of buffer 0; returns their offset.
    size_t appendToFirst(const std::vector<unsigned char>& bytes);

    tinygltf::Model& m_;
};
