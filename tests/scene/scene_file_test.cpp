#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "scene/KLGraphNode.h"
#include "scene/KLScene.h"
#include "scene/KLWire.h"
#include "scene/SceneDocument.h"
#include "scene/scene_util.h"

namespace {
std::string names_of(OrDagNode* top, int withTop) {
    std::unique_ptr<KLDagList> list(KLWire::BuildDagList(top, withTop));
    std::string out;
    for (OrDagNode* n : list->nodes) {
        out += std::string(out.empty() ? "" : " ") + KLWire::NodeName(n);
    }
    return out;
}
std::shared_ptr<SceneDocument> reload(const std::string& path) {
    std::string error;
    auto doc = SceneDocument::Load(path, &error);
    EXPECT_TRUE(doc) << error;
    return doc;
}

// Apply-like keys: smooth, linear and flat tangents mixed, off the frame grid.
std::vector<StoreKey> mixed_keys(float s) {
    return {{0, 0, 2, 2},
            {1000, s, 0, 2},
            {2600, -2 * s, 1, 0},
            {6000, 0.5f * s, 2, 1},
            {9050, 3 * s, 0, 2}};
}

// Every channel of every node of `a` and `b` agrees at every frame from -2 to `frames` and at
// every key time of `a`'s curves.
void expect_same_curves(const SceneDocument& a, const SceneDocument& b, int frames) {
    ASSERT_EQ(a.NodeCount(), b.NodeCount());
    for (int n = 0; n < a.NodeCount(); ++n) {
        for (int c = 0; c < SceneDocument::kChannels; ++c) {
            const ChannelCurve *ca = a.Curve(n, c), *cb = b.Curve(n, c);
            std::string where = a.NodeName(n) + " channel " + std::to_string(c);
            if (!ca) {  // a channel of a rewritten node may come back animated at its rest value
                EXPECT_TRUE(!cb || std::fabs(cb->eval(0) - a.RestValue(n, c)) < 1e-4) << where;
                continue;
            }
            ASSERT_TRUE(cb) << where;
            for (int f = -2; f <= frames; ++f) {
                ASSERT_NEAR(ca->eval(f), cb->eval(f), 2e-4) << where << " frame " << f;
            }
            for (const ChannelCurve::Key& k : ca->keys()) {
                ASSERT_NEAR(ca->Evaluate(k.time), cb->Evaluate(k.time), 2e-4) << where << " key";
            }
        }
    }
}
}  // namespace

// The face scene written as embedded .gltf, .gltf with a side-car buffer and .glb, opened, and
// stored as .glb (or as .gltf when it came from .glb).
class FaceScene : public ::testing::TestWithParam<TestScene::Format> {
  protected:
    void SetUp() override {
        std::string dir = MakeTempDir();
        path_ = dir + (GetParam() == TestScene::kBinary ? "/face.glb" : "/face.gltf");
        out_ = dir + (GetParam() == TestScene::kBinary ? "/out.gltf" : "/out.glb");
        ASSERT_TRUE(MakeFaceScene().Write(path_, GetParam()));
        ASSERT_TRUE(face_.Open(path_));
    }
    std::string path_, out_;
    OpenScene face_;
};

TEST_P(FaceScene, WalksNodesWithUniqueNames) {
    OrDagNode* root = face_.root.get();
    EXPECT_EQ(KLWire::IsWireFile(path_.c_str()), 1);
    EXPECT_STREQ(KLWire::NodeName(root), "face");
    ASSERT_EQ(root->asGroupNodePtr(), root);
    Node head(root->childNode()), brow = face_.Fetch("brow");
    ASSERT_TRUE(head && brow);
    EXPECT_STREQ(head->name(), "head");
    EXPECT_EQ(head->nextNode(), nullptr);
    EXPECT_EQ(brow->asGroupNodePtr(), nullptr);
    EXPECT_EQ(brow->childNode(), nullptr);
    EXPECT_EQ(names_of(root, 1), "face head jaw lip#2 brow node3 lip");
    EXPECT_EQ(names_of(head.get(), 0), "jaw lip#2 brow node3 lip");

    EXPECT_EQ(face_.Fetch("nose"), nullptr);
    EXPECT_TRUE(face_.Fetch("lip#2"));
    Node jaw = face_.Fetch("jaw");
    EXPECT_FALSE(KLWire::UniqueDagName(root, "lip"));
    EXPECT_TRUE(KLWire::UniqueDagName(jaw.get(), "lip"));  // only lip#2 is below the jaw
    EXPECT_TRUE(KLWire::UniqueDagName(root, "jaw"));
    // Without demangling "lip" under the jaw is not found; with it, lip#2 is, and an exact
    // name still wins over a suffixed one.
    EXPECT_EQ(face_.Fetch("lip", jaw.get()), nullptr);
    KLWire::DemangleNames(1);
    Node found = face_.Fetch("lip", jaw.get());
    Node exact = face_.Fetch("lip");
    KLWire::DemangleNames(0);
    ASSERT_TRUE(found && exact);
    EXPECT_STREQ(found->name(), "lip#2");
    EXPECT_STREQ(exact->name(), "lip");
}

TEST_P(FaceScene, EvaluatesEachInterpolation) {
    Node jaw = face_.Fetch("jaw");
    ASSERT_TRUE(jaw);
    EXPECT_EQ(KLWire::FindChannel(jaw.get(), 6), nullptr);  // scale not animated
    EXPECT_EQ(KLWire::FindChannel(face_.root.get(), 0), nullptr);
    struct Value {
        const char* node;
        int channel;
        double frame, value;
    };
    // Jaw TY: LINEAR, held after the last key. Jaw RX: STEP holding until 0.1 s = frame 3,
    // quaternion to Euler degrees. Brow SX: CUBICSPLINE 1 -> 3 over 1 s, out-tangent 2 at the
    // start, in-tangent 0 at the end; at u = 0.5: 0.5 * 1 + 0.125 * 2 + 0.5 * 3. The first lip
    // is moved by the second animation only.
    for (const Value& v : {Value{"jaw", 1, 0, 0},
                           {"jaw", 1, 0.5, -0.5},
                           {"jaw", 1, 2, -2},
                           {"jaw", 1, 10, -2},
                           {"jaw", 3, 2.9, 0},
                           {"jaw", 3, 3, 90},
                           {"jaw", 4, 3, 0},
                           {"brow", 6, 15, 2.25},
                           {"brow", 7, 15, 1},
                           {"lip", 0, 15, 2.5}}) {
        EXPECT_NEAR(face_.Eval(v.node, v.channel, v.frame), v.value, v.channel < 3 ? 1e-5 : 1e-3)
            << v.node << " channel " << v.channel << " frame " << v.frame;
    }
}

TEST_P(FaceScene, StoredChannelsReadBackEqualAndTheRestUnchanged) {
    Node jaw = face_.Fetch("jaw"), lip = face_.Fetch("lip#2");
    ASSERT_TRUE(jaw && lip);
    ASSERT_EQ(StoreKeys(jaw.get(), 0, mixed_keys(3)), 1);  // TX, TY: mixed tangents
    ASSERT_EQ(StoreKeys(jaw.get(), 1, mixed_keys(1)), 1);
    ASSERT_EQ(StoreKeys(jaw.get(), 3, mixed_keys(40)), 1);   // RX: rotation, sampled
    ASSERT_EQ(StoreKeys(jaw.get(), 5, mixed_keys(-25)), 1);  // RZ
    ASSERT_EQ(StoreKeys(lip.get(), 6, {{0, 1, 1, 1}, {3000, 2, 1, 1}}), 1);  // lossless LINEAR
    ASSERT_EQ(StoreKeys(lip.get(), 0, mixed_keys(2)), 1);
    ASSERT_EQ(face_.source->Store(out_.c_str()), 1);
    auto back = reload(out_);
    ASSERT_TRUE(back);
    // Every channel, stored or not (the brow's cubic, the other animation's lip), at every
    // frame and key.
    expect_same_curves(*face_.source->document(), *back, 50);
    // Smooth, linear and flat keys really differ from a straight line between keys.
    EXPECT_GT(std::fabs(back->Curve(1, 1)->eval(4) - back->Curve(1, 1)->eval(3)), 0.01);

    // Mesh positions, node extras and the second animation come back as they were.
    const tinygltf::Model& m = back->model();
    ASSERT_EQ(m.meshes.size(), 1u);
    const tinygltf::Accessor& a =
        m.accessors[size_t(m.meshes[0].primitives[0].attributes.at("POSITION"))];
    const tinygltf::BufferView& v = m.bufferViews[size_t(a.bufferView)];
    std::vector<float> positions(9);
    std::memcpy(positions.data(),
                m.buffers[size_t(v.buffer)].data.data() + v.byteOffset + a.byteOffset, 36);
    EXPECT_EQ(positions, (std::vector<float>{0, 0, 0, 1, 0, 0, 0, 1, 0}));
    EXPECT_EQ(a.maxValues, (std::vector<double>{1, 1, 0}));
    EXPECT_EQ(m.nodes[0].extras.Get<std::string>(), "kept");
    ASSERT_EQ(m.animations.size(), 2u);
    EXPECT_EQ(m.animations[0].name, "shapes");
    EXPECT_EQ(m.animations[1].name, "other");
    EXPECT_EQ(m.animations[1].samplers.size(), 1u);
    // The jaw's old translation and rotation samplers were replaced, not kept beside the new.
    int jawChannels = 0;
    for (const auto& c : m.animations[0].channels) {
        jawChannels += c.target_node == 1;
    }
    EXPECT_EQ(jawChannels, 2);
    ExpectValidGltf(out_);
}

TEST_P(FaceScene, RepeatedStoresDoNotGrowTheFile) {
    ASSERT_EQ(StoreKeys(face_.Fetch("jaw").get(), 1, mixed_keys(1)), 1);
    ASSERT_EQ(face_.source->Store(out_.c_str()), 1);
    auto size_of = [&]() {
        auto doc = reload(out_);
        size_t n = 0;
        for (const auto& b : doc->model().buffers) {
            n += b.data.size();
        }
        return std::make_pair(n, doc->model().accessors.size());
    };
    auto first = size_of();
    for (int round = 0; round < 3; ++round) {
        OpenScene again;
        ASSERT_TRUE(again.Open(out_));
        ASSERT_EQ(StoreKeys(again.Fetch("jaw").get(), 1, mixed_keys(1)), 1);
        ASSERT_EQ(again.source->Store(out_.c_str()), 1);
        auto now = size_of();
        // Alignment padding may move by a few bytes; the old animation data never stays.
        EXPECT_LE(now.first, first.first + 16) << "round " << round;
        EXPECT_EQ(now.second, first.second) << "round " << round;
    }
}

INSTANTIATE_TEST_SUITE_P(Formats, FaceScene,
                         ::testing::Values(TestScene::kEmbedded, TestScene::kSideCar,
                                           TestScene::kBinary),
                         [](const ::testing::TestParamInfo<TestScene::Format>& info) {
                             return std::string(info.param == TestScene::kEmbedded  ? "Embedded"
                                                : info.param == TestScene::kSideCar ? "SideCar"
                                                                                    : "Binary");
                         });

TEST(SceneNames, RepeatedAndEmptyNamesNeverCollide) {
    TestScene s;
    s.model.scenes[0].name.clear();
    for (const char* name : {"a", "a#2", "a", "", "node3"}) {  // "a#2" as a suffix would make it
        s.AddNode(name);
    }
    std::string dir = MakeTempDir();
    ASSERT_TRUE(s.Write(dir + "/n.glb", TestScene::kBinary));
    OpenScene scene;
    ASSERT_TRUE(scene.Open(dir + "/n.glb"));
    const char* want[] = {"root", "a", "a#2", "a#3", "node3", "node3#2"};  // from node -1
    for (int n = -1; n < 5; ++n) {
        EXPECT_EQ(scene.source->document()->NodeName(n), want[n + 1]) << n;
    }
    // The preview has a graph node per node name, not for the root, and none once unloaded.
    KLScene preview;
    preview.LoadGeometry(scene.source.get());
    EXPECT_EQ(preview.Source(), scene.source.get());
    ASSERT_NE(preview.FetchNode("a#3"), nullptr);
    EXPECT_EQ(preview.FetchNode("a#3")->Name(), "a#3");
    EXPECT_NE(preview.FetchNode("node3#2"), nullptr);
    EXPECT_EQ(preview.FetchNode("root"), nullptr);
    preview.LoadGeometry(nullptr);
    EXPECT_EQ(preview.FetchNode("a"), nullptr);

    // Without scenes every parentless node is a root, in file order.
    WriteFile(dir + "/s.gltf", R"({"asset":{"version":"2.0"},
        "nodes":[{"name":"b","children":[2]},{"name":"a"},{"name":"c"}]})");
    ASSERT_TRUE(scene.Open(dir + "/s.gltf"));
    EXPECT_EQ(names_of(scene.root.get(), 0), "b c a");
}

TEST(SceneStoreEdges, MergeClearRejectAndNewAnimation) {
    // A scene without animation and a node placed by a matrix: scale 2 on X, then 90 degrees
    // about Z, then translation (5, 6, 7); column major.
    std::string dir = MakeTempDir();
    TestScene s;
    int n = s.AddNode("box");
    s.model.nodes[size_t(n)].matrix = {0, 2, 0, 0, -1, 0, 0, 0, 0, 0, 1, 0, 5, 6, 7, 1};
    s.AddTriangle(n);
    ASSERT_TRUE(s.Write(dir + "/box.gltf", TestScene::kEmbedded));
    OpenScene scene;
    ASSERT_TRUE(scene.Open(dir + "/box.gltf"));
    Node box = scene.Fetch("box");
    EXPECT_EQ(KLWire::FindChannel(box.get(), 0), nullptr);

    ASSERT_EQ(StoreKeys(box.get(), 1, {{0, 1, 1, 1}, {6000, 2, 1, 1}}), 1);
    // Without clearing, new keys merge into the curve.
    ASSERT_EQ(StoreKeys(box.get(), 1, {{3000, 10, 1, 1}}, false), 1);
    EXPECT_NEAR(KLWire::FindChannel(box.get(), 1)->eval(15), 10, 1e-9);
    EXPECT_NEAR(KLWire::FindChannel(box.get(), 1)->eval(30), 2, 1e-9);
    // NaN values, the root and a channel out of range are refused; no keys remove a curve.
    EXPECT_EQ(StoreKeys(box.get(), 1, {{3000, std::nanf(""), 1, 1}}, false), 0);
    EXPECT_EQ(StoreKeys(scene.root.get(), 1, {{3000, 10, 1, 1}}), 0);
    EXPECT_EQ(StoreKeys(box.get(), 9, {{3000, 10, 1, 1}}), 0);
    ASSERT_EQ(StoreKeys(box.get(), 2, {{3000, 10, 1, 1}}), 1);
    ASSERT_EQ(StoreKeys(box.get(), 2, {}), 1);
    EXPECT_EQ(KLWire::FindChannel(box.get(), 2), nullptr);

    ASSERT_EQ(scene.source->Store((dir + "/box-out.glb").c_str()), 1);
    auto back = reload(dir + "/box-out.glb");
    ASSERT_TRUE(back);
    ASSERT_EQ(back->model().animations.size(), 1u);
    EXPECT_EQ(back->model().animations[0].name, "chirrup");
    EXPECT_TRUE(back->model().nodes[0].matrix.empty());  // animated nodes carry TRS
    EXPECT_NEAR(back->RestValue(0, 6), 2, 1e-9);
    EXPECT_NEAR(back->RestValue(0, 7), 1, 1e-9);
    EXPECT_NEAR(back->RestValue(0, 5), 90, 1e-9);
    EXPECT_NEAR(back->Curve(0, 0)->eval(15), 5, 1e-6);  // the matrix's translation
    EXPECT_NEAR(back->Curve(0, 1)->eval(15), 10, 1e-5);
    ExpectValidGltf(dir + "/box-out.glb");
}

TEST(SceneStoreEdges, FailedStoreNamesTheFileAndKeepsTheOldOne) {
    namespace fs = std::filesystem;
    std::string dir = MakeTempDir(), face = dir + "/face.glb", bad = dir + "/no/dir/out.glb";
    ASSERT_TRUE(MakeFaceScene().Write(face, TestScene::kBinary));
    KLWireSource src(face.c_str()), invalid((dir + "/missing.glb").c_str());
    ASSERT_TRUE(src.Valid());
    testing::internal::CaptureStderr();
    EXPECT_EQ(src.Store(bad.c_str()), 0);
    EXPECT_NE(testing::internal::GetCapturedStderr().find(bad), std::string::npos);
    testing::internal::CaptureStderr();
    EXPECT_EQ(invalid.Store((dir + "/x.glb").c_str()), 0);
    EXPECT_NE(testing::internal::GetCapturedStderr().find("x.glb"), std::string::npos);
    // Storing over an existing file replaces it whole; no temporary file is left behind.
    ASSERT_EQ(src.Store(face.c_str()), 1);
    EXPECT_TRUE(reload(face));
    EXPECT_EQ(std::distance(fs::directory_iterator(dir), fs::directory_iterator()), 1);
}
