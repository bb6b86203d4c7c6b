#include "scene/SceneDeformer.h"

#include <cmath>
#include <cstring>

#include "scene/SceneGeometry.h"

namespace {
const SceneMaterial kDefaultMaterial;

// Adds the active morph targets' deltas to `pos` and `nrm` (copies of the rest arrays).
bool apply_morphs(const ScenePrimitive& prim, const std::vector<float>& weights, float* pos,
                  float* nrm) {
    bool any = false;
    const size_t n = std::min(prim.targets.size(), weights.size());
    for (size_t t = 0; t < n; ++t) {
        const float w = weights[t];
        if (w == 0.0f || !std::isfinite(w)) {
            continue;
        }
        any = true;
        const SceneMorphTarget& target = prim.targets[t];
        const bool withNormals = !target.normalDeltas.empty();
        for (size_t k = 0; k < target.vertices.size(); ++k) {
            const size_t v = size_t(target.vertices[k]) * 3;
            pos[v] += w * target.positionDeltas[k * 3];
            pos[v + 1] += w * target.positionDeltas[k * 3 + 1];
            pos[v + 2] += w * target.positionDeltas[k * 3 + 2];
            if (withNormals) {
                nrm[v] += w * target.normalDeltas[k * 3];
                nrm[v + 1] += w * target.normalDeltas[k * 3 + 1];
                nrm[v + 2] += w * target.normalDeltas[k * 3 + 2];
            }
        }
    }
    return any;
}
}  // namespace

void SceneDeformer::Prepare(const SceneGeometry& geometry) {
    outputs_.clear();
    for (size_t node = 0; node < geometry.nodeMesh.size(); ++node) {
        const int mesh = geometry.nodeMesh[node];
        if (mesh < 0) {
            continue;
        }
        const SceneMesh& m = geometry.meshes[size_t(mesh)];
        for (size_t p = 0; p < m.primitives.size(); ++p) {
            Output out;
            out.node = int(node);
            out.primitive = int(p);
            outputs_.push_back(std::move(out));
        }
    }
}

void SceneDeformer::Deform(const SceneGeometry& geometry, const std::vector<Mat4>& world,
                           double seconds, std::vector<SceneDrawItem>* items) {
    items->clear();
    int weightsNode = -1;
    for (Output& out : outputs_) {
        if (size_t(out.node) >= world.size()) {
            continue;
        }
        const SceneMesh& mesh = geometry.meshes[size_t(geometry.nodeMesh[size_t(out.node)])];
        const ScenePrimitive& prim = mesh.primitives[size_t(out.primitive)];
        SceneDrawItem item;
        item.node = out.node;
        item.primitive = &prim;
        item.material =
            prim.material >= 0 ? &geometry.materials[size_t(prim.material)] : &kDefaultMaterial;
        item.world = world[size_t(out.node)];
        item.positions = prim.positions.data();
        item.normals = prim.normals.data();
        const size_t floats = prim.positions.size();

        bool morphed = false;
        if (!prim.targets.empty()) {
            if (weightsNode != out.node) {
                geometry.MorphWeights(out.node, seconds, &weights_);
                weightsNode = out.node;
            }
            out.positions.assign(prim.positions.begin(), prim.positions.end());
            out.normals.assign(prim.normals.begin(), prim.normals.end());
            morphed = apply_morphs(prim, weights_, out.positions.data(), out.normals.data());
            if (morphed) {
                item.positions = out.positions.data();
                item.normals = out.normals.data();
            }
        }

        const int skinIndex = geometry.nodeSkin[size_t(out.node)];
        if (skinIndex >= 0 && !prim.joints.empty()) {
            const SceneSkin& skin = geometry.skins[size_t(skinIndex)];
            jointMatrices_.resize(skin.joints.size());
            jointNormals_.resize(skin.joints.size());
            for (size_t j = 0; j < skin.joints.size(); ++j) {
                jointMatrices_[j] = world[size_t(skin.joints[j])] * skin.inverseBind[j];
                jointNormals_[j] = jointMatrices_[j].NormalMatrix();
            }
            const float* srcP = item.positions;
            const float* srcN = item.normals;
            std::vector<float> skinnedP(floats), skinnedN(floats);
            for (size_t v = 0; v < floats / 3; ++v) {
                Vec3 p(srcP[v * 3], srcP[v * 3 + 1], srcP[v * 3 + 2]);
                Vec3 n(srcN[v * 3], srcN[v * 3 + 1], srcN[v * 3 + 2]);
                Vec3 sp, sn;
                float total = 0;
                for (int k = 0; k < 4; ++k) {
                    const float w = prim.weights[v * 4 + size_t(k)];
                    if (w == 0.0f) {
                        continue;
                    }
                    const size_t j = prim.joints[v * 4 + size_t(k)];
                    sp = sp + jointMatrices_[j].TransformPoint(p) * w;
                    sn = sn + jointNormals_[j].TransformDirection(n) * w;
                    total += w;
                }
                if (total <= 0.0f) {  // no influence: the vertex stays with the mesh node
                    sp = item.world.TransformPoint(p);
                    sn = item.world.NormalMatrix().TransformDirection(n);
                } else if (total != 1.0f) {
                    sp = sp * (1.0f / total);
                }
                std::memcpy(&skinnedP[v * 3], &sp, sizeof(float) * 3);
                std::memcpy(&skinnedN[v * 3], &sn, sizeof(float) * 3);
            }
            out.positions.swap(skinnedP);
            out.normals.swap(skinnedN);
            item.positions = out.positions.data();
            item.normals = out.normals.data();
            item.world = Mat4();
        }
        items->push_back(item);
    }
}
