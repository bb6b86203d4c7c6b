#include "scene/SceneGeometry.h"

#include <algorithm>
#include <cmath>
#include <cstring>

namespace {
using Model = tinygltf::Model;

constexpr float kDegrees = float(180.0 / M_PI);

int component_size(int type) {
    switch (type) {
        case TINYGLTF_COMPONENT_TYPE_BYTE:
        case TINYGLTF_COMPONENT_TYPE_UNSIGNED_BYTE:
            return 1;
        case TINYGLTF_COMPONENT_TYPE_SHORT:
        case TINYGLTF_COMPONENT_TYPE_UNSIGNED_SHORT:
            return 2;
        case TINYGLTF_COMPONENT_TYPE_INT:
        case TINYGLTF_COMPONENT_TYPE_UNSIGNED_INT:
        case TINYGLTF_COMPONENT_TYPE_FLOAT:
            return 4;
        default:
            return 0;
    }
}

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
        case TINYGLTF_COMPONENT_TYPE_INT: {
            int32_t s;
            std::memcpy(&s, p, 4);
            return s;
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

// The elements of an accessor (already bounds-checked when the scene was opened) as numbers,
// `components` per element, with sparse substitutions applied. False when the accessor's
// element type has another number of components.
bool read_accessor(const Model& m, int index, int components, std::vector<double>* out) {
    if (index < 0 || size_t(index) >= m.accessors.size()) {
        return false;
    }
    const tinygltf::Accessor& a = m.accessors[size_t(index)];
    if (tinygltf::GetNumComponentsInType(uint32_t(a.type)) != components) {
        return false;
    }
    const int csize = component_size(a.componentType);
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
        const int isize = component_size(si.componentType);
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

// As read_accessor, into floats; non-finite values become 0 and are counted in *bad.
bool read_floats(const Model& m, int index, int components, std::vector<float>* out,
                 size_t* bad = nullptr) {
    std::vector<double> values;
    if (!read_accessor(m, index, components, &values)) {
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

size_t accessor_count(const Model& m, int index) {
    return index >= 0 && size_t(index) < m.accessors.size() ? m.accessors[size_t(index)].count : 0;
}

Mat4 rest_local(const tinygltf::Node& n) {
    if (n.matrix.size() == 16) {
        Mat4 r;
        for (int i = 0; i < 16; ++i) {
            r.m[i] = float(n.matrix[size_t(i)]);
        }
        return r;
    }
    Mat4 t, r, s;
    if (n.translation.size() == 3) {
        t = Mat4::Translation(
            Vec3(float(n.translation[0]), float(n.translation[1]), float(n.translation[2])));
    }
    if (n.rotation.size() == 4) {
        double x = n.rotation[0], y = n.rotation[1], z = n.rotation[2], w = n.rotation[3];
        double len = std::sqrt(x * x + y * y + z * z + w * w);
        if (len > 0) {
            r = Mat4::Quaternion(float(x / len), float(y / len), float(z / len), float(w / len));
        }
    }
    if (n.scale.size() == 3) {
        s = Mat4::Scaling(Vec3(float(n.scale[0]), float(n.scale[1]), float(n.scale[2])));
    }
    return t * r * s;
}

// Turns strips, fans and loops into plain triangles and lines; false for an unknown mode.
bool to_basic_mode(int mode, std::vector<uint32_t>* idx, int* basic) {
    std::vector<uint32_t> in;
    in.swap(*idx);
    switch (mode) {
        case TINYGLTF_MODE_POINTS:
            *basic = ScenePrimitive::kPoints;
            idx->swap(in);
            return true;
        case TINYGLTF_MODE_LINE:
            *basic = ScenePrimitive::kLines;
            in.resize(in.size() / 2 * 2);
            idx->swap(in);
            return true;
        case TINYGLTF_MODE_LINE_LOOP:
        case TINYGLTF_MODE_LINE_STRIP:
            *basic = ScenePrimitive::kLines;
            for (size_t i = 0; i + 1 < in.size(); ++i) {
                idx->insert(idx->end(), {in[i], in[i + 1]});
            }
            if (mode == TINYGLTF_MODE_LINE_LOOP && in.size() > 2) {
                idx->insert(idx->end(), {in.back(), in.front()});
            }
            return true;
        case TINYGLTF_MODE_TRIANGLES:
            *basic = ScenePrimitive::kTriangles;
            in.resize(in.size() / 3 * 3);
            idx->swap(in);
            return true;
        case TINYGLTF_MODE_TRIANGLE_STRIP:
            *basic = ScenePrimitive::kTriangles;
            for (size_t i = 0; i + 2 < in.size(); ++i) {
                if (i % 2 == 0) {
                    idx->insert(idx->end(), {in[i], in[i + 1], in[i + 2]});
                } else {
                    idx->insert(idx->end(), {in[i + 1], in[i], in[i + 2]});
                }
            }
            return true;
        case TINYGLTF_MODE_TRIANGLE_FAN:
            *basic = ScenePrimitive::kTriangles;
            for (size_t i = 1; i + 1 < in.size(); ++i) {
                idx->insert(idx->end(), {in[0], in[i], in[i + 1]});
            }
            return true;
        default:
            return false;
    }
}

// Vertex normals from the area-weighted normals of the triangles around each vertex.
void face_normals(ScenePrimitive* p) {
    p->normals.assign(p->positions.size(), 0.0f);
    if (p->mode != ScenePrimitive::kTriangles) {
        for (size_t v = 0; v < p->VertexCount(); ++v) {
            p->normals[v * 3 + 2] = 1.0f;
        }
        return;
    }
    const float* pos = p->positions.data();
    for (size_t t = 0; t + 2 < p->indices.size(); t += 3) {
        const uint32_t a = p->indices[t], b = p->indices[t + 1], c = p->indices[t + 2];
        Vec3 pa(pos[a * 3], pos[a * 3 + 1], pos[a * 3 + 2]);
        Vec3 pb(pos[b * 3], pos[b * 3 + 1], pos[b * 3 + 2]);
        Vec3 pc(pos[c * 3], pos[c * 3 + 1], pos[c * 3 + 2]);
        Vec3 n = (pb - pa).Cross(pc - pa);
        for (uint32_t v : {a, b, c}) {
            p->normals[v * 3] += n.x;
            p->normals[v * 3 + 1] += n.y;
            p->normals[v * 3 + 2] += n.z;
        }
    }
    for (size_t v = 0; v < p->VertexCount(); ++v) {
        Vec3 n(p->normals[v * 3], p->normals[v * 3 + 1], p->normals[v * 3 + 2]);
        n = n.Length() > 0 ? n.Normalized() : Vec3(0, 0, 1);
        std::memcpy(&p->normals[v * 3], &n, sizeof(float) * 3);
    }
}

std::string item(const char* what, size_t i) {
    return std::string(what) + " " + std::to_string(i);
}
}  // namespace

// Reads one primitive; false with a message when it cannot be drawn.
static bool read_primitive(const Model& m, const tinygltf::Primitive& in, ScenePrimitive* out,
                           std::string* why) {
    auto pos = in.attributes.find("POSITION");
    if (pos == in.attributes.end()) {
        *why = "has no vertex positions";
        return false;
    }
    const size_t count = accessor_count(m, pos->second);
    if (count == 0) {
        *why = "has no vertices";
        return false;
    }
    if (count > SceneGeometry::kMaxVertices) {
        *why = "has " + std::to_string(count) + " vertices, more than the " +
               std::to_string(SceneGeometry::kMaxVertices) + " a view draws";
        return false;
    }
    size_t bad = 0;
    if (!read_floats(m, pos->second, 3, &out->positions, &bad)) {
        *why = "has vertex positions that are not 3D vectors";
        return false;
    }
    if (bad) {
        *why = "has " + std::to_string(bad) + " non-finite vertex coordinates";
        return false;
    }
    std::vector<uint32_t> idx;
    if (in.indices >= 0) {
        std::vector<double> raw;
        if (!read_accessor(m, in.indices, 1, &raw)) {
            *why = "has vertex indices that are not scalars";
            return false;
        }
        idx.reserve(raw.size());
        for (double d : raw) {
            if (!(d >= 0 && d < double(count))) {
                *why = "has a vertex index out of range";
                return false;
            }
            idx.push_back(uint32_t(d));
        }
    } else {
        idx.resize(count);
        for (size_t i = 0; i < count; ++i) {
            idx[i] = uint32_t(i);
        }
    }
    if (!to_basic_mode(in.mode < 0 ? TINYGLTF_MODE_TRIANGLES : in.mode, &idx, &out->mode)) {
        *why = "has an unknown drawing mode " + std::to_string(in.mode);
        return false;
    }
    out->indices.swap(idx);
    out->material = in.material;

    auto normal = in.attributes.find("NORMAL");
    if (normal == in.attributes.end() || accessor_count(m, normal->second) != count ||
        !read_floats(m, normal->second, 3, &out->normals)) {
        face_normals(out);
    }
    auto uv = in.attributes.find("TEXCOORD_0");
    if (uv != in.attributes.end() && accessor_count(m, uv->second) == count) {
        read_floats(m, uv->second, 2, &out->texcoords);
    }
    auto joints = in.attributes.find("JOINTS_0");
    auto weights = in.attributes.find("WEIGHTS_0");
    if (joints != in.attributes.end() && weights != in.attributes.end() &&
        accessor_count(m, joints->second) == count && accessor_count(m, weights->second) == count) {
        std::vector<double> j;
        if (read_accessor(m, joints->second, 4, &j) &&
            read_floats(m, weights->second, 4, &out->weights)) {
            out->joints.resize(j.size());
            for (size_t k = 0; k < j.size(); ++k) {
                const bool ok = j[k] >= 0 && j[k] < 65536.0;
                out->joints[k] = ok ? uint16_t(j[k]) : 0;
                if (!ok || out->weights[k] < 0) {
                    out->weights[k] = 0;
                }
            }
        } else {
            out->weights.clear();
        }
    }
    for (size_t t = 0; t < in.targets.size(); ++t) {
        SceneMorphTarget target;
        auto dp = in.targets[t].find("POSITION");
        std::vector<float> d, dn;
        if (dp != in.targets[t].end() && accessor_count(m, dp->second) == count) {
            read_floats(m, dp->second, 3, &d);
        }
        auto dnormal = in.targets[t].find("NORMAL");
        if (dnormal != in.targets[t].end() && accessor_count(m, dnormal->second) == count) {
            read_floats(m, dnormal->second, 3, &dn);
        }
        for (size_t v = 0; v < count && (!d.empty() || !dn.empty()); ++v) {
            const float* p = d.empty() ? nullptr : &d[v * 3];
            const float* n = dn.empty() ? nullptr : &dn[v * 3];
            const bool moves = (p && (p[0] != 0 || p[1] != 0 || p[2] != 0)) ||
                               (n && (n[0] != 0 || n[1] != 0 || n[2] != 0));
            if (!moves) {
                continue;
            }
            target.vertices.push_back(uint32_t(v));
            target.positionDeltas.insert(target.positionDeltas.end(),
                                         {p ? p[0] : 0, p ? p[1] : 0, p ? p[2] : 0});
            target.normalDeltas.insert(target.normalDeltas.end(),
                                       {n ? n[0] : 0, n ? n[1] : 0, n ? n[2] : 0});
        }
        out->targets.push_back(std::move(target));
    }
    return true;
}

void SceneGeometry::Load(const tinygltf::Model& m, std::vector<std::string>* messages) {
    *this = SceneGeometry();
    auto say = [&](const std::string& text) { messages->push_back(text); };

    // Textures: one per glTF texture, decoded from its image.
    textures.resize(m.textures.size());
    for (size_t t = 0; t < m.textures.size(); ++t) {
        const int source = m.textures[t].source;
        if (source < 0 || size_t(source) >= m.images.size()) {
            say(item("texture", t) + " has no image; its materials show their base colour");
            continue;
        }
        const tinygltf::Image& image = m.images[size_t(source)];
        const unsigned char* bytes = image.image.data();
        size_t size = image.image.size();
        if (image.bufferView >= 0 && size_t(image.bufferView) < m.bufferViews.size()) {
            const tinygltf::BufferView& v = m.bufferViews[size_t(image.bufferView)];
            bytes = m.buffers[size_t(v.buffer)].data.data() + v.byteOffset;
            size = v.byteLength;
        }
        tinygltf::Image decoded;
        std::string err, warn;
        if (!bytes || size == 0 || size > 0x7fffffff ||
            !tinygltf::LoadImageData(&decoded, source, &err, &warn, 0, 0, bytes, int(size),
                                     nullptr) ||
            decoded.width <= 0 || decoded.height <= 0 || decoded.component < 1 ||
            decoded.component > 4 || (decoded.bits != 8 && decoded.bits != 16)) {
            say(item("image", size_t(source)) + (image.uri.empty() ? "" : " [" + image.uri + "]") +
                " cannot be decoded; its materials show their base colour");
            continue;
        }
        SceneTexture& out = textures[t];
        out.width = decoded.width;
        out.height = decoded.height;
        const size_t pixels = size_t(decoded.width) * size_t(decoded.height);
        const int comp = decoded.component;
        const int bytesPer = decoded.bits / 8;
        out.rgba.resize(pixels * 4);
        for (size_t p = 0; p < pixels; ++p) {
            uint8_t c[4] = {0, 0, 0, 255};
            for (int k = 0; k < comp; ++k) {
                // The high byte of 16-bit samples (little-endian).
                c[k] = decoded.image[(p * size_t(comp) + size_t(k)) * size_t(bytesPer) +
                                     size_t(bytesPer - 1)];
            }
            if (comp < 3) {  // grey (and alpha)
                c[3] = comp == 2 ? c[1] : 255;
                c[1] = c[2] = c[0];
            }
            std::memcpy(&out.rgba[p * 4], c, 4);
        }
    }

    for (const tinygltf::Material& mat : m.materials) {
        SceneMaterial out;
        const auto& f = mat.pbrMetallicRoughness.baseColorFactor;
        for (size_t k = 0; k < 4 && k < f.size(); ++k) {
            out.baseColour[k] = std::isfinite(f[k]) ? float(std::clamp(f[k], 0.0, 1.0)) : 1.0f;
        }
        const int tex = mat.pbrMetallicRoughness.baseColorTexture.index;
        out.texture = tex >= 0 && size_t(tex) < textures.size() ? tex : -1;
        out.doubleSided = mat.doubleSided;
        materials.push_back(out);
    }

    for (size_t i = 0; i < m.meshes.size(); ++i) {
        const tinygltf::Mesh& in = m.meshes[i];
        SceneMesh mesh;
        mesh.name = in.name;
        size_t targets = 0;
        for (size_t p = 0; p < in.primitives.size(); ++p) {
            ScenePrimitive prim;
            std::string why;
            if (!read_primitive(m, in.primitives[p], &prim, &why)) {
                say(item("mesh", i) + " (" + in.name + ") part " + std::to_string(p) + " " + why +
                    "; it is not drawn");
                continue;
            }
            if (prim.material >= int(materials.size())) {
                prim.material = -1;
            }
            targets = std::max(targets, prim.targets.size());
            mesh.primitives.push_back(std::move(prim));
        }
        mesh.weights.assign(targets, 0.0f);
        for (size_t k = 0; k < targets && k < in.weights.size(); ++k) {
            mesh.weights[k] = std::isfinite(in.weights[k]) ? float(in.weights[k]) : 0.0f;
        }
        meshes.push_back(std::move(mesh));
    }

    for (size_t s = 0; s < m.skins.size(); ++s) {
        SceneSkin skin;
        skin.joints = m.skins[s].joints;
        skin.inverseBind.assign(skin.joints.size(), Mat4());
        const int ibm = m.skins[s].inverseBindMatrices;
        std::vector<float> mats;
        if (ibm >= 0) {
            if (read_floats(m, ibm, 16, &mats) && mats.size() >= skin.joints.size() * 16) {
                for (size_t j = 0; j < skin.joints.size(); ++j) {
                    std::memcpy(skin.inverseBind[j].m, &mats[j * 16], sizeof(float) * 16);
                }
            } else {
                say(item("skin", s) + " has unusable inverse bind matrices; identities are used");
            }
        }
        skins.push_back(std::move(skin));
    }

    const size_t n = m.nodes.size();
    nodeMesh.assign(n, -1);
    nodeSkin.assign(n, -1);
    nodeWeights.assign(n, {});
    restLocal.resize(n);
    for (size_t i = 0; i < n; ++i) {
        const tinygltf::Node& node = m.nodes[i];
        restLocal[i] = rest_local(node);
        if (node.mesh >= 0 && size_t(node.mesh) < meshes.size()) {
            nodeMesh[i] = node.mesh;
        }
        if (node.skin >= 0 && size_t(node.skin) < skins.size() && nodeMesh[i] >= 0) {
            nodeSkin[i] = node.skin;
            // Joint references beyond the skin's joints lose their influence.
            const size_t jointCount = skins[size_t(node.skin)].joints.size();
            size_t dropped = 0;
            for (ScenePrimitive& prim : meshes[size_t(nodeMesh[i])].primitives) {
                for (size_t k = 0; k < prim.joints.size(); ++k) {
                    if (prim.joints[k] >= jointCount && prim.weights[k] != 0) {
                        prim.weights[k] = 0;
                        ++dropped;
                    }
                }
            }
            if (dropped) {
                say(item("node", i) + " (" + node.name + ") has " + std::to_string(dropped) +
                    " joint references beyond its skin's " + std::to_string(jointCount) +
                    " joints; they are ignored");
            }
        }
        for (double w : node.weights) {
            nodeWeights[i].push_back(std::isfinite(w) ? float(w) : 0.0f);
        }
        if (node.camera >= 0 && size_t(node.camera) < m.cameras.size()) {
            const tinygltf::Camera& cam = m.cameras[size_t(node.camera)];
            SceneCamera out;
            out.node = int(i);
            if (cam.type == "perspective") {
                const double fov = cam.perspective.yfov * kDegrees;
                if (std::isfinite(fov) && fov > 1 && fov < 170) {
                    out.yfov = float(fov);
                }
                if (!(cam.perspective.aspectRatio > 0)) {
                    say(item("camera", size_t(node.camera)) +
                        " has no usable aspect ratio; the view's own shape is used");
                }
            }
            cameras.push_back(out);
        }
        auto ext = node.extensions.find("KHR_lights_punctual");
        if (ext != node.extensions.end() && ext->second.Has("light")) {
            const int l = ext->second.Get("light").GetNumberAsInt();
            if (l >= 0 && size_t(l) < m.lights.size()) {
                const tinygltf::Light& light = m.lights[size_t(l)];
                SceneLight out;
                out.node = int(i);
                out.type = light.type == "point"  ? SceneLight::kPoint
                           : light.type == "spot" ? SceneLight::kSpot
                                                  : SceneLight::kDirectional;
                for (size_t k = 0; k < 3 && k < light.color.size(); ++k) {
                    out.colour[k] = std::isfinite(light.color[k]) ? float(light.color[k]) : 1.0f;
                }
                out.intensity = std::isfinite(light.intensity) ? float(light.intensity) : 1.0f;
                lights.push_back(out);
            }
        }
    }

    // The morph weights the scene's first animation of each node's weights gives.
    for (const tinygltf::Animation& anim : m.animations) {
        for (const tinygltf::AnimationChannel& ch : anim.channels) {
            if (ch.target_path != "weights" || ch.target_node < 0 || size_t(ch.target_node) >= n ||
                ch.sampler < 0 || size_t(ch.sampler) >= anim.samplers.size()) {
                continue;
            }
            bool known = false;
            for (const WeightTrack& w : weightTracks_) {
                known = known || w.node == ch.target_node;
            }
            const tinygltf::AnimationSampler& sampler = anim.samplers[size_t(ch.sampler)];
            WeightTrack track;
            track.node = ch.target_node;
            track.step = sampler.interpolation == "STEP";
            if (known || sampler.interpolation == "CUBICSPLINE" ||
                !read_floats(m, sampler.input, 1, &track.times) ||
                !read_floats(m, sampler.output, 1, &track.values) || track.times.empty() ||
                track.values.size() % track.times.size() != 0) {
                continue;
            }
            weightTracks_.push_back(std::move(track));
        }
    }
}

void SceneGeometry::MorphWeights(int node, double seconds, std::vector<float>* out) const {
    const int mesh = node >= 0 && size_t(node) < nodeMesh.size() ? nodeMesh[size_t(node)] : -1;
    out->clear();
    if (mesh < 0) {
        return;
    }
    const size_t targets = meshes[size_t(mesh)].weights.size();
    *out = meshes[size_t(mesh)].weights;
    const std::vector<float>& own = nodeWeights[size_t(node)];
    for (size_t k = 0; k < targets && k < own.size(); ++k) {
        (*out)[k] = own[k];
    }
    for (const WeightTrack& track : weightTracks_) {
        if (track.node != node) {
            continue;
        }
        const size_t per = track.values.size() / track.times.size();
        const float t = float(seconds);
        size_t hi = size_t(std::upper_bound(track.times.begin(), track.times.end(), t) -
                           track.times.begin());
        size_t lo = hi == 0 ? 0 : hi - 1;
        hi = std::min(hi, track.times.size() - 1);
        float u = 0;
        if (hi != lo && !track.step) {
            u = (t - track.times[lo]) / (track.times[hi] - track.times[lo]);
        }
        for (size_t k = 0; k < targets && k < per; ++k) {
            const float a = track.values[lo * per + k], b = track.values[hi * per + k];
            (*out)[k] = a + (b - a) * std::clamp(u, 0.0f, 1.0f);
        }
    }
}
