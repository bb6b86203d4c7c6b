#include <gtest/gtest.h>

#include <cmath>
#include <cstring>

#include "scene/KLPoseSource.h"
#include "scene/KLScene.h"
#include "scene/KLWireSource.h"
#include "scene/SceneDeformer.h"
#include "scene/SceneDocument.h"
#include "scene/gl/TestScenes.h"
#include "testkit/TempDir.h"

namespace {

// Raises joint 1 (node 2) by 1, whatever the time.
struct RaiseJoint1 : KLPoseSource {
    void Pose(KLWireSource*, CueTime, ScenePose* pose) override { pose->Set(2, 1, 1.0); }
};

// A sheet with two joints and two morph targets at weights 0.5 and 0: target 0 lifts the left
// edge, target 1 the middle column not at all; raising joint 1 lifts the right edge only.
TEST(SceneGeometry, SkinAndMorphTargetsDeformTheSheet) {
    testkit::TempDir tmp;
    testscenes::Sheet sheet(4, 1, 2, 2);
    sheet.morphWeights = {0.5f, 0.0f};
    const std::string path = tmp.path() + "/sheet.glb";
    ASSERT_TRUE(testscenes::WriteSheet(path, sheet));
    KLWireSource wire(path.c_str());
    ASSERT_TRUE(wire.Valid()) << wire.ErrorText();
    KLScene scene;
    scene.LoadGeometry(&wire);
    auto vertex = [&](size_t v) {  // vertex v of the first draw item, in world space
        const SceneDrawItem& item = scene.DrawItems().at(0);
        const float* p = item.positions + v * 3;
        return item.world.TransformPoint(Vec3(p[0], p[1], p[2]));
    };
    scene.Evaluate(CueTime());
    ASSERT_EQ(scene.DrawItems().size(), 1u);
    EXPECT_NEAR(vertex(4).y, -1.0f, 1e-5) << "right edge at rest";
    EXPECT_NEAR(vertex(2).z, 0.0f, 1e-5) << "target 1 at weight 0";
    scene.SetPoseSource(std::make_unique<RaiseJoint1>());
    scene.Evaluate(CueTime());
    EXPECT_NEAR(vertex(0).z, 0.25f, 1e-5) << "target 0 at weight 0.5";
    EXPECT_NEAR(vertex(0).y, -1.0f + 0.25f, 1e-5) << "left edge, joint 0";
    EXPECT_NEAR(vertex(4).y, 0.0f, 1e-5) << "right edge, joint 1";
    EXPECT_NEAR(vertex(4).x, 1.0f, 1e-5);
    Vec3 lo, hi;
    ASSERT_TRUE(scene.Bounds(&lo, &hi));
    EXPECT_NEAR(hi.y, 2.0f, 1e-5);
}

// Parts a view cannot draw are left out with a message naming them; the rest is kept.
struct BadCase {
    const char* name;
    void (*damage)(tinygltf::Model&);
    const char* message;  // part of the message, "" for none
    size_t primitives;    // drawn of the two
};

// The bytes of the accessor of `attribute` ("" for the indices) of part `part`.
unsigned char* Bytes(tinygltf::Model& m, int part, const char* attribute) {
    tinygltf::Primitive& p = m.meshes[0].primitives[size_t(part)];
    const tinygltf::Accessor& a =
        m.accessors[size_t(*attribute ? p.attributes[attribute] : p.indices)];
    return m.buffers[0].data.data() + m.bufferViews[size_t(a.bufferView)].byteOffset + a.byteOffset;
}

const BadCase kBadCases[] = {
    {"nan_position",
     [](tinygltf::Model& m) { reinterpret_cast<float*>(Bytes(m, 0, "POSITION"))[1] = NAN; },
     "mesh 0 (sheet) part 0 has 1 non-finite vertex coordinates; it is not drawn", 1},
    {"huge_vertex_count",
     [](tinygltf::Model& m) {
         m.accessors[size_t(m.meshes[0].primitives[0].attributes["POSITION"])].count = 5000000;
     },
     "has 5000000 vertices, more than the 4194304 a view draws", 1},
    {"index_out_of_range",
     [](tinygltf::Model& m) { reinterpret_cast<uint32_t*>(Bytes(m, 1, ""))[0] = 999; },
     "part 1 has a vertex index out of range", 1},
    {"joint_out_of_range", [](tinygltf::Model& m) { m.skins[0].joints.resize(1); },
     "has 6 joint references beyond its skin's 1 joints; they are ignored", 2},
    {"no_inverse_bind_matrices", [](tinygltf::Model& m) { m.skins[0].inverseBindMatrices = -1; },
     "", 2},
    {"node_weights_beyond_targets",
     [](tinygltf::Model& m) {
         m.nodes[0].weights = {1, 1, 1, 1, 1};
     },
     "", 2},
    {"corrupt_texture",
     [](tinygltf::Model& m) {
         const tinygltf::BufferView& v = m.bufferViews[size_t(m.images[0].bufferView)];
         std::memset(m.buffers[0].data.data() + v.byteOffset, 'x', 8);
     },
     "image 0 cannot be decoded; its materials show their base colour", 2},
    {"no_meshes",
     [](tinygltf::Model& m) {
         m.meshes.clear();
         m.nodes[0].mesh = -1;
     },
     "", 0},
};

class BadGeometryTest : public ::testing::TestWithParam<BadCase> {};

TEST_P(BadGeometryTest, LeftOutWithAMessage) {
    testkit::TempDir tmp;
    testscenes::Sheet sheet(2, 2, 2, 2);
    sheet.backSheet = sheet.texture = true;
    ASSERT_TRUE(testscenes::WriteSheet(tmp.path() + "/bad.gltf", sheet));
    std::string error;
    auto doc = SceneDocument::Load(tmp.path() + "/bad.gltf", &error);
    ASSERT_TRUE(doc) << error;
    GetParam().damage(doc->model());
    SceneGeometry geometry;
    std::vector<std::string> messages;
    geometry.Load(doc->model(), &messages);
    ASSERT_EQ(messages.size(), *GetParam().message ? 1u : 0u)
        << (messages.empty() ? "" : messages[0]);
    if (*GetParam().message) {
        EXPECT_NE(messages[0].find(GetParam().message), std::string::npos) << messages[0];
    }
    size_t drawn = 0;
    for (const SceneMesh& mesh : geometry.meshes)
        drawn += mesh.primitives.size();
    EXPECT_EQ(drawn, GetParam().primitives);
    // The rest is posed and deformed without trouble.
    SceneDeformer deformer;
    deformer.Prepare(geometry);
    std::vector<Mat4> world(doc->model().nodes.size());
    std::vector<SceneDrawItem> items;
    deformer.Deform(geometry, world, 0.0, &items);
    EXPECT_EQ(items.size(), drawn);
}

INSTANTIATE_TEST_SUITE_P(Cases, BadGeometryTest, ::testing::ValuesIn(kBadCases),
                         [](const auto& info) { return std::string(info.param.name); });

}  // namespace
