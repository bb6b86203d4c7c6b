#include "scene/SceneGeometry.h"

#include <algorithm>
#include <cmath>
#include <cstring>

#include "scene/SceneAccessor.h"
#include "scene/ScenePrimitiveReader.h"

namespace {
using Model = tinygltf::Model;

constexpr float kDegrees = float(180.0 / M_PI);

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
std::string item(const char* what, size_t i) {
    return std::string(what) + " " + std::to_string(i);
}
}  // namespace

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
            if (!ScenePrimitiveReader::Read(m, in.primitives[p], &prim, &why)) {
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
            if (SceneAccessor::ReadFloats(m, ibm, 16, &mats) &&
                mats.size() >= skin.joints.size() * 16) {
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
                !SceneAccessor::ReadFloats(m, sampler.input, 1, &track.times) ||
                !SceneAccessor::ReadFloats(m, sampler.output, 1, &track.values) ||
                track.times.empty() || track.values.size() % track.times.size() != 0) {
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
