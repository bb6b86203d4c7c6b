#include <algorithm>
#include <cmath>

#include <tiny_gltf.h>

#include "GltfModelBuilder.h"
#include "scene/gl/TestScenes.h"

namespace testscenes {
namespace {

// A 2 x 2 PNG checker: red, blue / blue, red.
const unsigned char kChecker[] = {
    0x89, 0x50, 0x4e, 0x47, 0x0d, 0x0a, 0x1a, 0x0a, 0x00, 0x00, 0x00, 0x0d, 0x49, 0x48, 0x44,
    0x52, 0x00, 0x00, 0x00, 0x02, 0x00, 0x00, 0x00, 0x02, 0x08, 0x06, 0x00, 0x00, 0x00, 0x72,
    0xb6, 0x0d, 0x24, 0x00, 0x00, 0x00, 0x12, 0x49, 0x44, 0x41, 0x54, 0x78, 0xda, 0x63, 0xf8,
    0xcf, 0xc0, 0x00, 0x42, 0x40, 0x0c, 0x24, 0x40, 0x2c, 0x00, 0x43, 0xce, 0x07, 0xf9, 0xe9,
    0x06, 0xd5, 0x19, 0x00, 0x00, 0x00, 0x00, 0x49, 0x45, 0x4e, 0x44, 0xae, 0x42, 0x60, 0x82};

constexpr int kArray = TINYGLTF_TARGET_ARRAY_BUFFER;
constexpr int kElements = TINYGLTF_TARGET_ELEMENT_ARRAY_BUFFER;

// One sheet's primitive: positions in the plane z = `z`, facing +Z unless `flip`.
tinygltf::Primitive sheet_primitive(GltfModelBuilder& builder, const Sheet& s, float z, bool flip) {
    const int cols = std::max(1, s.columns), rows = std::max(1, s.rows);
    std::vector<float> pos, nrm, uv, weights;
    std::vector<uint16_t> joints;
    std::vector<uint32_t> idx;
    for (int r = 0; r <= rows; ++r) {
        for (int c = 0; c <= cols; ++c) {
            pos.insert(pos.end(),
                       {-1 + 2 * float(c) / float(cols), -1 + 2 * float(r) / float(rows), z});
            nrm.insert(nrm.end(), {0, 0, flip ? -1.0f : 1.0f});
            uv.insert(uv.end(), {float(c) / float(cols), 1.0f - float(r) / float(rows)});
            joints.insert(joints.end(),
                          {uint16_t(std::min(s.joints - 1, c * s.joints / (cols + 1))), 0, 0, 0});
            weights.insert(weights.end(), {1, 0, 0, 0});
        }
    }
    for (int r = 0; r < rows; ++r) {
        for (int c = 0; c < cols; ++c) {
            const uint32_t a = uint32_t(r * (cols + 1) + c), b = a + 1, d = a + uint32_t(cols + 1);
            idx.insert(idx.end(), flip ? std::initializer_list<uint32_t>{a, d, b, b, d, d + 1}
                                       : std::initializer_list<uint32_t>{a, b, d, b, d + 1, d});
        }
    }
    tinygltf::Primitive p;
    p.mode = TINYGLTF_MODE_TRIANGLES;
    p.material = 0;
    p.attributes["POSITION"] = builder.Floats(pos, 3, 0, true, kArray);
    p.attributes["NORMAL"] = builder.Floats(nrm, 3, 0, false, kArray);
    p.attributes["TEXCOORD_0"] = builder.Floats(uv, 2, 0, false, kArray);
    if (s.joints > 0) {
        p.attributes["JOINTS_0"] =
            builder.Accessor(joints.data(), joints.size() / 4, 4,
                             TINYGLTF_COMPONENT_TYPE_UNSIGNED_SHORT, 2, 0, kArray);
        p.attributes["WEIGHTS_0"] = builder.Floats(weights, 4, 0, false, kArray);
    }
    for (int k = 0; k < s.morphTargets; ++k) {
        std::vector<float> delta(pos.size(), 0.0f);
        const int start = k * cols / s.morphTargets, band = std::max(1, (cols + 1) / 4);
        for (int r = 0; r <= rows; ++r) {
            for (int c = start; c < start + band && c <= cols; ++c) {
                const size_t v = size_t(r * (cols + 1) + c) * 3;
                delta[v + 1] = delta[v + 2] = 0.5f;
            }
        }
        p.targets.push_back({{"POSITION", builder.Floats(delta, 3, 0, true, kArray)}});
    }
    p.indices = builder.Accessor(idx.data(), idx.size(), 1, TINYGLTF_COMPONENT_TYPE_UNSIGNED_INT, 4,
                                 0, kElements);
    return p;
}

}  // namespace

bool WriteSheet(const std::string& path, const Sheet& s) {
    GltfModelBuilder builder;
    tinygltf::Model& m = builder.m;
    m.asset.generator = "chirrup view tests";
    m.buffers.resize(1);

    tinygltf::Material material;
    material.name = "sheet";
    material.pbrMetallicRoughness.baseColorFactor = {0.9, 0.6, 0.2, 1.0};
    if (s.texture) {
        m.images.emplace_back();
        m.images[0].mimeType = "image/png";
        m.images[0].bufferView = builder.View(kChecker, sizeof kChecker);
        m.textures.emplace_back();
        m.textures[0].source = 0;
        material.pbrMetallicRoughness.baseColorFactor = {1, 1, 1, 1};
        material.pbrMetallicRoughness.baseColorTexture.index = 0;
    }
    m.materials.push_back(material);

    m.meshes.emplace_back();
    tinygltf::Mesh& mesh = m.meshes[0];
    mesh.name = "sheet";
    mesh.primitives.push_back(sheet_primitive(builder, s, 0.0f, false));
    if (s.backSheet)
        mesh.primitives.push_back(sheet_primitive(builder, s, -0.5f, true));
    mesh.weights.assign(size_t(s.morphTargets), 0.0);
    for (size_t k = 0; k < s.morphWeights.size() && k < mesh.weights.size(); ++k)
        mesh.weights[k] = s.morphWeights[k];

    m.nodes.emplace_back();
    m.nodes[0].name = "sheet";
    m.nodes[0].mesh = 0;
    m.scenes.emplace_back();
    m.scenes[0].nodes.push_back(0);
    m.defaultScene = 0;
    if (s.joints > 0) {
        tinygltf::Skin skin;
        std::vector<float> inverse;
        const float step = 2.0f / float(s.joints);
        for (int j = 0; j < s.joints; ++j) {
            tinygltf::Node joint;
            joint.name = "joint" + std::to_string(j);
            joint.translation = {j == 0 ? -1.0 : step, 0, 0};
            m.nodes.push_back(joint);
            const int index = int(m.nodes.size()) - 1;
            if (j == 0)
                m.scenes[0].nodes.push_back(index);
            else
                m.nodes[size_t(index) - 1].children.push_back(index);
            skin.joints.push_back(index);
            const float mat[16] = {1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 1 - step * float(j),
                                   0, 0, 1};
            inverse.insert(inverse.end(), mat, mat + 16);
        }
        skin.inverseBindMatrices = builder.Floats(inverse, 16);
        skin.skeleton = skin.joints[0];
        m.skins.push_back(skin);
        m.nodes[0].skin = 0;
    }
    if (s.joints > 0 && s.animatedFrames > 0) {
        m.animations.emplace_back();
        m.animations.back().name = "shapes";
        std::vector<float> times;
        for (int f = 0; f < s.animatedFrames; ++f)
            times.push_back(float(f) / 30.0f);
        const int input = builder.Floats(times, 1, 0, true);
        for (int j = 0; j < s.joints; ++j) {
            std::vector<float> quats;
            for (int f = 0; f < s.animatedFrames; ++f) {
                const double half = 2.0 * std::sin(double(j + f)) * M_PI / 360.0;
                quats.insert(quats.end(), {0, 0, float(std::sin(half)), float(std::cos(half))});
            }
            tinygltf::Animation& anim = m.animations.back();
            anim.samplers.emplace_back();
            anim.samplers.back().input = input;
            anim.samplers.back().output = builder.Floats(quats, 4);
            anim.samplers.back().interpolation = "STEP";
            anim.channels.emplace_back();
            anim.channels.back().sampler = j;
            anim.channels.back().target_node = m.skins[0].joints[size_t(j)];
            anim.channels.back().target_path = "rotation";
        }
    }
    const bool binary = path.size() > 4 && path.compare(path.size() - 4, 4, ".glb") == 0;
    return tinygltf::TinyGLTF().WriteGltfSceneToFile(&m, path, true, true, true, binary);
}

}  // namespace testscenes
