#include "scene/ScenePrimitiveReader.h"

#include <cmath>
#include <cstring>

#include "scene/SceneAccessor.h"

namespace {
using Model = tinygltf::Model;

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

}  // namespace

bool ScenePrimitiveReader::Read(const Model& m, const tinygltf::Primitive& in, ScenePrimitive* out,
                                std::string* why) {
    auto pos = in.attributes.find("POSITION");
    if (pos == in.attributes.end()) {
        *why = "has no vertex positions";
        return false;
    }
    const size_t count = SceneAccessor::Count(m, pos->second);
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
    if (!SceneAccessor::ReadFloats(m, pos->second, 3, &out->positions, &bad)) {
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
        if (!SceneAccessor::Read(m, in.indices, 1, &raw)) {
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
    if (normal == in.attributes.end() || SceneAccessor::Count(m, normal->second) != count ||
        !SceneAccessor::ReadFloats(m, normal->second, 3, &out->normals)) {
        face_normals(out);
    }
    auto uv = in.attributes.find("TEXCOORD_0");
    if (uv != in.attributes.end() && SceneAccessor::Count(m, uv->second) == count) {
        SceneAccessor::ReadFloats(m, uv->second, 2, &out->texcoords);
    }
    auto joints = in.attributes.find("JOINTS_0");
    auto weights = in.attributes.find("WEIGHTS_0");
    if (joints != in.attributes.end() && weights != in.attributes.end() &&
        SceneAccessor::Count(m, joints->second) == count &&
        SceneAccessor::Count(m, weights->second) == count) {
        std::vector<double> j;
        if (SceneAccessor::Read(m, joints->second, 4, &j) &&
            SceneAccessor::ReadFloats(m, weights->second, 4, &out->weights)) {
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
        if (dp != in.targets[t].end() && SceneAccessor::Count(m, dp->second) == count) {
            SceneAccessor::ReadFloats(m, dp->second, 3, &d);
        }
        auto dnormal = in.targets[t].find("NORMAL");
        if (dnormal != in.targets[t].end() && SceneAccessor::Count(m, dnormal->second) == count) {
            SceneAccessor::ReadFloats(m, dnormal->second, 3, &dn);
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
