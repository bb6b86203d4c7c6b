#include "scene/SceneChecker.h"

#include <algorithm>
#include <cmath>
#include <cstring>

#include "scene/SceneAccessor.h"

namespace {
bool fail(std::string* why, const std::string& text) {
    if (why) {
        *why = text;
    }
    return false;
}

bool in_range(int index, size_t size) {
    return index >= 0 && size_t(index) < size;
}

std::string item(const char* kind, size_t index) {
    return std::string(kind) + " " + std::to_string(index);
}

int component_count(int type) {
    switch (type) {
        case TINYGLTF_TYPE_SCALAR:
            return 1;
        case TINYGLTF_TYPE_VEC2:
            return 2;
        case TINYGLTF_TYPE_VEC3:
            return 3;
        case TINYGLTF_TYPE_VEC4:
        case TINYGLTF_TYPE_MAT2:
            return 4;
        case TINYGLTF_TYPE_MAT3:
            return 9;
        case TINYGLTF_TYPE_MAT4:
            return 16;
        default:
            return 0;
    }
}

// Bytes [offset, offset + length) lie inside a block of `size` bytes (no overflow).
bool fits(uint64_t offset, uint64_t length, uint64_t size) {
    return offset <= size && length <= size - offset;
}

bool check_view_range(const tinygltf::Model& m, int view, uint64_t offset, uint64_t length,
                      const std::string& what, std::string* why) {
    if (!in_range(view, m.bufferViews.size())) {
        return fail(why, what + " refers to buffer view " + std::to_string(view) +
                             ", which does not exist");
    }
    if (!fits(offset, length, m.bufferViews[size_t(view)].byteLength)) {
        return fail(why, what + " reaches past the end of buffer view " + std::to_string(view));
    }
    return true;
}

bool finite_array(const std::vector<double>& v, size_t wanted) {
    if (!v.empty() && v.size() != wanted) {
        return false;
    }
    for (double d : v) {
        if (!std::isfinite(d)) {
            return false;
        }
    }
    return true;
}
}  // namespace

bool SceneChecker::Check(const tinygltf::Model& m, std::string* why) {
    for (size_t i = 0; i < m.bufferViews.size(); ++i) {
        const tinygltf::BufferView& v = m.bufferViews[i];
        if (!in_range(v.buffer, m.buffers.size())) {
            return fail(why, item("buffer view", i) + " refers to buffer " +
                                 std::to_string(v.buffer) + ", which does not exist");
        }
        if (!fits(v.byteOffset, v.byteLength, m.buffers[size_t(v.buffer)].data.size())) {
            return fail(why, item("buffer view", i) + " reaches past the end of buffer " +
                                 std::to_string(v.buffer) + " (the buffer is too short)");
        }
        if (v.byteStride != 0 && (v.byteStride < 4 || v.byteStride > 252)) {
            return fail(why, item("buffer view", i) + " has an invalid byte stride");
        }
    }
    for (size_t i = 0; i < m.accessors.size(); ++i) {
        if (!checkAccessor(m, i, why)) {
            return false;
        }
    }
    for (size_t i = 0; i < m.images.size(); ++i) {
        int v = m.images[i].bufferView;
        if (v != -1 && !in_range(v, m.bufferViews.size())) {
            return fail(why, item("image", i) + " refers to a buffer view that does not exist");
        }
    }
    return checkMeshesSkins(m, why) && checkNodes(m, why) && checkAnimations(m, why);
}

bool SceneChecker::checkAccessor(const tinygltf::Model& m, size_t i, std::string* why) {
    const tinygltf::Accessor& a = m.accessors[i];
    std::string what = item("accessor", i);
    int csize = SceneAccessor::ComponentSize(a.componentType);
    int ccount = component_count(a.type);
    if (csize == 0 || ccount == 0) {
        return fail(why, what + " has an unknown component type or element type");
    }
    if (a.count == 0 || a.count > (uint64_t(1) << 32)) {
        return fail(why, what + " has an invalid element count");
    }
    uint64_t elem = uint64_t(csize) * uint64_t(ccount);
    if (a.bufferView != -1) {
        if (!in_range(a.bufferView, m.bufferViews.size())) {
            return fail(why, what + " refers to buffer view " + std::to_string(a.bufferView) +
                                 ", which does not exist");
        }
        const tinygltf::BufferView& v = m.bufferViews[size_t(a.bufferView)];
        uint64_t stride = v.byteStride ? v.byteStride : elem;
        if (stride < elem) {
            return fail(why, what + " has elements wider than its buffer view's stride");
        }
        uint64_t span = stride * (uint64_t(a.count) - 1) + elem;
        if (!check_view_range(m, a.bufferView, a.byteOffset, span, what, why)) {
            return false;
        }
        if ((v.byteOffset + a.byteOffset) % uint64_t(csize) != 0) {
            return fail(why, what + " is not aligned to its component size");
        }
    }
    if (a.sparse.isSparse) {
        int n = a.sparse.count;
        int isize = SceneAccessor::ComponentSize(a.sparse.indices.componentType);
        if (n <= 0 || uint64_t(n) > a.count || isize == 0 || a.sparse.indices.byteOffset < 0 ||
            a.sparse.values.byteOffset < 0) {
            return fail(why, what + " has an invalid sparse part");
        }
        if (!check_view_range(m, a.sparse.indices.bufferView, uint64_t(a.sparse.indices.byteOffset),
                              uint64_t(n) * uint64_t(isize), what + " (sparse indices)", why) ||
            !check_view_range(m, a.sparse.values.bufferView, uint64_t(a.sparse.values.byteOffset),
                              uint64_t(n) * elem, what + " (sparse values)", why)) {
            return false;
        }
    }
    return true;
}

bool SceneChecker::checkMeshesSkins(const tinygltf::Model& m, std::string* why) {
    size_t na = m.accessors.size();
    for (size_t i = 0; i < m.meshes.size(); ++i) {
        for (const tinygltf::Primitive& p : m.meshes[i].primitives) {
            bool ok = (p.indices == -1 || in_range(p.indices, na)) &&
                      (p.material == -1 || in_range(p.material, m.materials.size()));
            for (const auto& kv : p.attributes) {
                ok = ok && in_range(kv.second, na);
            }
            for (const auto& target : p.targets) {
                for (const auto& kv : target) {
                    ok = ok && in_range(kv.second, na);
                }
            }
            if (!ok) {
                return fail(why, item("mesh", i) +
                                     " refers to an accessor or material that "
                                     "does not exist");
            }
        }
    }
    for (size_t i = 0; i < m.skins.size(); ++i) {
        const tinygltf::Skin& s = m.skins[i];
        bool ok = (s.inverseBindMatrices == -1 || in_range(s.inverseBindMatrices, na)) &&
                  (s.skeleton == -1 || in_range(s.skeleton, m.nodes.size()));
        for (int j : s.joints) {
            ok = ok && in_range(j, m.nodes.size());
        }
        if (!ok) {
            return fail(why, item("skin", i) + " refers to a node or accessor that does not exist");
        }
    }
    return true;
}

bool SceneChecker::checkNodes(const tinygltf::Model& m, std::string* why) {
    size_t nn = m.nodes.size();
    for (size_t i = 0; i < nn; ++i) {
        const tinygltf::Node& n = m.nodes[i];
        std::string what = item("node", i);
        for (int c : n.children) {
            if (!in_range(c, nn)) {
                return fail(why,
                            what + " has child " + std::to_string(c) + ", which does not exist");
            }
        }
        if ((n.mesh != -1 && !in_range(n.mesh, m.meshes.size())) ||
            (n.skin != -1 && !in_range(n.skin, m.skins.size())) ||
            (n.camera != -1 && !in_range(n.camera, m.cameras.size()))) {
            return fail(why, what + " refers to a mesh, skin or camera that does not exist");
        }
        if (!finite_array(n.translation, 3) || !finite_array(n.rotation, 4) ||
            !finite_array(n.scale, 3) || !finite_array(n.matrix, 16)) {
            return fail(why, what + " has a malformed or non-finite transform");
        }
    }
    for (size_t i = 0; i < m.scenes.size(); ++i) {
        for (int n : m.scenes[i].nodes) {
            if (!in_range(n, nn)) {
                return fail(why, item("scene", i) + " lists node " + std::to_string(n) +
                                     ", which does not exist");
            }
        }
    }
    if (m.defaultScene != -1 && !in_range(m.defaultScene, m.scenes.size())) {
        return fail(why, "the default scene does not exist");
    }
    return true;
}

bool SceneChecker::checkAnimations(const tinygltf::Model& m, std::string* why) {
    for (size_t i = 0; i < m.animations.size(); ++i) {
        const tinygltf::Animation& a = m.animations[i];
        std::string what = item("animation", i);
        for (const tinygltf::AnimationSampler& s : a.samplers) {
            if (!in_range(s.input, m.accessors.size()) || !in_range(s.output, m.accessors.size())) {
                return fail(why, what +
                                     " has a sampler that refers to an accessor that does "
                                     "not exist");
            }
        }
        for (const tinygltf::AnimationChannel& c : a.channels) {
            if (!in_range(c.sampler, a.samplers.size())) {
                return fail(why, what + " has a channel with sampler " + std::to_string(c.sampler) +
                                     ", which does not exist");
            }
            if (c.target_node != -1 && !in_range(c.target_node, m.nodes.size())) {
                return fail(why, what + " targets node " + std::to_string(c.target_node) +
                                     ", which does not exist");
            }
        }
    }
    return true;
}

bool SceneChecker::ReadFloats(const tinygltf::Model& m, int index, int components,
                              std::vector<float>* out, std::string* why) {
    if (!in_range(index, m.accessors.size())) {
        return fail(why, item("accessor", size_t(index < 0 ? 0 : index)) + " does not exist");
    }
    const tinygltf::Accessor& a = m.accessors[size_t(index)];
    std::string what = item("accessor", size_t(index));
    if (component_count(a.type) != components) {
        return fail(why, what + " has the wrong element type for its use");
    }
    if (a.sparse.isSparse) {
        return fail(why, what + " is sparse, which animation data may not be here");
    }
    int csize = SceneAccessor::ComponentSize(a.componentType);
    bool isFloat = a.componentType == TINYGLTF_COMPONENT_TYPE_FLOAT;
    if (!isFloat && (!a.normalized || csize > 2)) {
        return fail(why, what + " holds neither floats nor normalised integers");
    }
    out->assign(a.count * size_t(components), 0.0f);
    if (a.bufferView == -1) {
        return true;  // all zeros
    }
    const tinygltf::BufferView& v = m.bufferViews[size_t(a.bufferView)];
    const unsigned char* base =
        m.buffers[size_t(v.buffer)].data.data() + v.byteOffset + a.byteOffset;
    size_t elem = size_t(csize) * size_t(components);
    size_t stride = v.byteStride ? v.byteStride : elem;
    for (size_t e = 0; e < a.count; ++e) {
        const unsigned char* p = base + e * stride;
        for (int c = 0; c < components; ++c) {
            float f = 0;
            switch (a.componentType) {
                case TINYGLTF_COMPONENT_TYPE_FLOAT:
                    std::memcpy(&f, p + c * 4, 4);
                    break;
                case TINYGLTF_COMPONENT_TYPE_BYTE:
                    f = std::max(float(int8_t(p[c])) / 127.0f, -1.0f);
                    break;
                case TINYGLTF_COMPONENT_TYPE_UNSIGNED_BYTE:
                    f = float(p[c]) / 255.0f;
                    break;
                case TINYGLTF_COMPONENT_TYPE_SHORT: {
                    int16_t s;
                    std::memcpy(&s, p + c * 2, 2);
                    f = std::max(float(s) / 32767.0f, -1.0f);
                    break;
                }
                default: {
                    uint16_t s;
                    std::memcpy(&s, p + c * 2, 2);
                    f = float(s) / 65535.0f;
                }
            }
            if (!std::isfinite(f)) {
                return fail(why, what + " holds a value that is not a finite number (NaN)");
            }
            (*out)[e * size_t(components) + size_t(c)] = f;
        }
    }
    return true;
}

namespace {
uint32_t read_u32(const unsigned char* p) {
    return uint32_t(p[0]) | uint32_t(p[1]) << 8 | uint32_t(p[2]) << 16 | uint32_t(p[3]) << 24;
}
}  // namespace

bool SceneChecker::CheckGlb(const unsigned char* data, size_t size, size_t* used,
                            std::string* why) {
    if (size < 20) {
        *why = "binary container is truncated";
        return false;
    }
    uint32_t version = read_u32(data + 4), length = read_u32(data + 8);
    uint32_t jsonLength = read_u32(data + 12), jsonType = read_u32(data + 16);
    if (version != 2) {
        *why = "binary container has version " + std::to_string(version) + ", not 2";
        return false;
    }
    if (length > size || length < 20 || jsonType != 0x4E4F534A || jsonLength == 0 ||
        uint64_t(jsonLength) + 20 > length) {
        *why = "binary container has inconsistent chunk lengths";
        return false;
    }
    uint64_t rest = length - 20 - uint64_t(jsonLength);
    if (rest != 0) {
        if (rest < 8 || uint64_t(read_u32(data + 20 + jsonLength)) + 8 > rest) {
            *why = "binary container has inconsistent chunk lengths";
            return false;
        }
    }
    *used = length;
    return true;
}
