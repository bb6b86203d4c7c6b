#pragma once

#include <algorithm>
#include <cstddef>
#include <vector>

#include <tiny_gltf.h>

// Builds the data of a glTF model in code: each accessor gets a buffer view of its own, 4-byte
// aligned, at the end of the buffer it is put in. Shared by the demo generator and the tests and
// benchmarks that make scenes.
class GltfModelBuilder {
  public:
    GltfModelBuilder() { m.asset.version = "2.0"; }

    // A buffer view of `bytes` bytes copied from `data` into buffer `buffer` (made as needed).
    int View(const void* data, size_t bytes, int buffer = 0, int target = 0) {
        while (int(m.buffers.size()) <= buffer) {
            m.buffers.emplace_back();
        }
        std::vector<unsigned char>& buf = m.buffers[size_t(buffer)].data;
        buf.resize((buf.size() + 3) & ~size_t(3), 0);
        tinygltf::BufferView v;
        v.buffer = buffer;
        v.byteOffset = buf.size();
        v.byteLength = bytes;
        v.target = target;
        const unsigned char* p = static_cast<const unsigned char*>(data);
        buf.insert(buf.end(), p, p + bytes);
        m.bufferViews.push_back(v);
        return int(m.bufferViews.size()) - 1;
    }

    // An accessor of `count` elements of `width` components (1, 2, 3, 4 or 16) of
    // `componentSize` bytes each; with `minMaxOf`, the per-component bounds of those values.
    int Accessor(const void* data, size_t count, int width, int componentType, int componentSize,
                 int buffer = 0, int target = 0, const std::vector<float>* minMaxOf = nullptr) {
        tinygltf::Accessor a;
        a.bufferView = View(data, count * size_t(width) * size_t(componentSize), buffer, target);
        a.componentType = componentType;
        a.count = count;
        a.type = width == 1   ? TINYGLTF_TYPE_SCALAR
                 : width == 2 ? TINYGLTF_TYPE_VEC2
                 : width == 3 ? TINYGLTF_TYPE_VEC3
                 : width == 4 ? TINYGLTF_TYPE_VEC4
                              : TINYGLTF_TYPE_MAT4;
        if (minMaxOf) {
            a.minValues.assign(size_t(width), 1e30);
            a.maxValues.assign(size_t(width), -1e30);
            for (size_t i = 0; i < minMaxOf->size(); ++i) {
                size_t c = i % size_t(width);
                a.minValues[c] = std::min(a.minValues[c], double((*minMaxOf)[i]));
                a.maxValues[c] = std::max(a.maxValues[c], double((*minMaxOf)[i]));
            }
        }
        m.accessors.push_back(a);
        return int(m.accessors.size()) - 1;
    }

    // An accessor of `width` floats per element.
    int Floats(const std::vector<float>& v, int width, int buffer = 0, bool minMax = false,
               int target = 0) {
        return Accessor(v.data(), v.size() / size_t(width), width, TINYGLTF_COMPONENT_TYPE_FLOAT, 4,
                        buffer, target, minMax ? &v : nullptr);
    }

    tinygltf::Model m;
};
