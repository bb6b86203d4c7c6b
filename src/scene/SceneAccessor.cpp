#include "scene/SceneAccessor.h"

#include <algorithm>
#include <cmath>
#include <cstring>

namespace {
using Model = tinygltf::Model;

// One component at `p` as a number; normalised integers are scaled to [0, 1] or [-1, 1].
double component(const unsigned char* p, int type, bool normalized) {
    switch (type) {
        case TINYGLTF_COMPONENT_TYPE_BYTE: {
            double v = int8_t(p[0]);
            return normalized ? std::max(v / 127.0, -1.0) : v;
        }
        case TINYGLTF_COMPONENT_TYPE_UNSIGNED_BYTE:
            return normalized ? p[0] / 255.0 : p[0];
        case TINYGLTF_COMPONENT_TYPE_SHORT: {
            int16_t s;
            std::memcpy(&s, p, 2);
            return normalized ? std::max(s / 32767.0, -1.0) : s;
        }
        case TINYGLTF_COMPONENT_TYPE_UNSIGNED_SHORT: {
            uint16_t s;
            std::memcpy(&s, p, 2);
            return normalized ? s / 65535.0 : s;
        }
        case TINYGLTF_COMPONENT_TYPE_UNSIGNED_INT: {
            uint32_t s;
            std::memcpy(&s, p, 4);
            return s;
        }
        default: {
            float f;
            std::memcpy(&f, p, 4);
            return f;
        }
    }
}

}  // namespace

int SceneAccessor::ComponentSize(int type) {
    switch (type) {
        case TINYGLTF_COMPONENT_TYPE_BYTE:
        case TINYGLTF_COMPONENT_TYPE_UNSIGNED_BYTE:
            return 1;
        case TINYGLTF_COMPONENT_TYPE_SHORT:
        case TINYGLTF_COMPONENT_TYPE_UNSIGNED_SHORT:
            return 2;
        case TINYGLTF_COMPONENT_TYPE_UNSIGNED_INT:
        case TINYGLTF_COMPONENT_TYPE_FLOAT:
            return 4;
        default:
            return 0;
    }
}

bool SceneAccessor::Read(const Model& m, int index, int components, std::vector<double>* out) {
    if (index < 0 || size_t(index) >= m.accessors.size()) {
        return false;
    }
    const tinygltf::Accessor& a = m.accessors[size_t(index)];
    if (tinygltf::GetNumComponentsInType(uint32_t(a.type)) != components) {
        return false;
    }
    const int csize = ComponentSize(a.componentType);
    out->assign(a.count * size_t(components), 0.0);
    if (a.bufferView >= 0) {
        const tinygltf::BufferView& v = m.bufferViews[size_t(a.bufferView)];
        const unsigned char* base =
            m.buffers[size_t(v.buffer)].data.data() + v.byteOffset + a.byteOffset;
        const size_t elem = size_t(csize) * size_t(components);
        const size_t stride = v.byteStride ? v.byteStride : elem;
        for (size_t e = 0; e < a.count; ++e) {
            for (int c = 0; c < components; ++c) {
                (*out)[e * size_t(components) + size_t(c)] =
                    component(base + e * stride + size_t(c * csize), a.componentType, a.normalized);
            }
        }
    }
    if (a.sparse.isSparse) {
        const auto& si = a.sparse.indices;
        const auto& sv = a.sparse.values;
        const tinygltf::BufferView& iv = m.bufferViews[size_t(si.bufferView)];
        const tinygltf::BufferView& vv = m.bufferViews[size_t(sv.bufferView)];
        const unsigned char* ip =
            m.buffers[size_t(iv.buffer)].data.data() + iv.byteOffset + size_t(si.byteOffset);
        const unsigned char* vp =
            m.buffers[size_t(vv.buffer)].data.data() + vv.byteOffset + size_t(sv.byteOffset);
        const int isize = ComponentSize(si.componentType);
        for (int k = 0; k < a.sparse.count; ++k) {
            const double at = component(ip + size_t(k * isize), si.componentType, false);
            if (at < 0 || at >= double(a.count)) {
                return false;
            }
            for (int c = 0; c < components; ++c) {
                (*out)[size_t(at) * size_t(components) + size_t(c)] = component(
                    vp + size_t((k * components + c) * csize), a.componentType, a.normalized);
            }
        }
    }
    return true;
}

bool SceneAccessor::ReadFloats(const Model& m, int index, int components, std::vector<float>* out,
                               size_t* bad) {
    std::vector<double> values;
    if (!Read(m, index, components, &values)) {
        return false;
    }
    out->resize(values.size());
    for (size_t i = 0; i < values.size(); ++i) {
        float f = float(values[i]);
        if (!std::isfinite(f)) {
            f = 0.0f;
            if (bad) {
                ++*bad;
            }
        }
        (*out)[i] = f;
    }
    return true;
}

size_t SceneAccessor::Count(const Model& m, int index) {
    return index >= 0 && size_t(index) < m.accessors.size() ? m.accessors[size_t(index)].count : 0;
}
