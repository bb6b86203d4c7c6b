#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <tuple>

#include "scene/KLWireSetting.h"
#include "scene/SceneDocument.h"
#include "scene/scene_util.h"
#include "testkit/CaptureStderr.h"

namespace {
std::string NamesOf(OrDagNode* top, int withTop) {
    std::unique_ptr<KLDagList> list = KLWire::BuildDagList(top, withTop);
    std::string out;
    for (const auto& n : list->nodes)
        out += std::string(out.empty() ? "" : " ") + KLWire::NodeName(n.get());
    return out;
}

// Apply-like keys off the frame grid: smooth, linear and flat tangents mixed.
std::vector<StoreKey> MixedKeys(float s) {
    return {{0, 0, 2, 2}, {1000, s, 0, 2}, {2600, -s, 1, 0}, {6000, s, 2, 1}, {9050, 3 * s, 0, 2}};
}

// Every channel of every node of `a` and `b` agrees at frames -2..50 and at `a`'s key times.
void ExpectSameCurves(const SceneDocument& a, const SceneDocument& b) {
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
            for (int f = -2; f <= 50; ++f)
                ASSERT_NEAR(ca->eval(f), cb->eval(f), 2e-4) << where << " frame " << f;
            for (const ChannelCurve::Key& k : ca->keys())
                ASSERT_NEAR(ca->Evaluate(k.time), cb->Evaluate(k.time), 2e-4) << where << " key";
        }
    }
}
}  // namespace

class FaceScene : public ::testing::TestWithParam<SceneFormat> {};

// The face scene in each format: names, each interpolation, and stored channels read back.
TEST_P(FaceScene, ReadsAndRoundTrips) {
    const bool glb = GetParam() == kBinary;
    std::string dir = MakeTempDir(), in = dir + (glb ? "/f.glb" : "/f.gltf"), error;
    std::string out = dir + (glb ? "/o.gltf" : "/o.glb");
    OpenScene face;
    ASSERT_TRUE(WriteFaceScene(in, GetParam()));
    ASSERT_TRUE(face.Open(in));
    OrDagNode* root = face.root.get();
    EXPECT_EQ(NamesOf(root, 1), "face head jaw lip#2 brow node3 lip");
    Node head = root->childNode(), jaw = face.Fetch("jaw"), brow = face.Fetch("brow");
    ASSERT_TRUE(head && jaw && brow);
    EXPECT_EQ(NamesOf(head.get(), 0), "jaw lip#2 brow node3 lip");
    EXPECT_TRUE(root->asGroupNodePtr() == root && !brow->asGroupNodePtr() && !head->nextNode());
    EXPECT_EQ(face.Fetch("nose"), nullptr);
    EXPECT_FALSE(KLWire::UniqueDagName(root, "lip"));
    EXPECT_TRUE(KLWire::UniqueDagName(jaw.get(), "lip"));  // only lip#2 is below the jaw
    // Demangling finds "lip" as lip#2 below the jaw; an exact name still wins over a suffixed one.
    EXPECT_EQ(face.Fetch("lip", jaw.get()), nullptr);
    Node found, lip;
    {
        KLWireSetting demangle(KLWireSetting::kDemangleNames);
        found = face.Fetch("lip", jaw.get()), lip = face.Fetch("lip");
    }
    EXPECT_FALSE(KLWire::NamesDemangled()) << "off again after the scope";
    ASSERT_TRUE(found && lip);
    EXPECT_STREQ(found->name(), "lip#2");
    EXPECT_STREQ(lip->name(), "lip");
    EXPECT_EQ(KLWire::FindChannel(jaw.get(), 6), nullptr);  // scale not animated
    // Jaw TY: LINEAR, held after the last key. Jaw RX: STEP until 0.1 s = frame 3, in degrees.
    // Brow SX: CUBICSPLINE 1 -> 3 over 1 s, out-tangent 2 at the start, in-tangent 0 at the end:
    // 0.5 * 1 + 0.125 * 2 + 0.5 * 3 at u = 0.5. The first lip moves in the second animation.
    const std::tuple<const char*, int, double, double> rows[] = {
        {"jaw", 1, 0.5, -0.5}, {"jaw", 1, 10, -2},    {"jaw", 3, 2.9, 0}, {"jaw", 3, 3, 90},
        {"jaw", 4, 3, 0},      {"brow", 6, 15, 2.25}, {"brow", 7, 15, 1}, {"lip", 0, 15, 2.5}};
    for (auto [node, channel, frame, value] : rows)
        EXPECT_NEAR(face.Eval(node, channel, frame), value, channel < 3 ? 1e-5 : 1e-3)
            << node << " channel " << channel << " frame " << frame;
    // Translation with mixed tangents; RZ too, so the rotation is sampled, RX's step included
    // (its key at 0.1 s rounded to float must still hold from frame 3); a lossless LINEAR scale.
    for (auto [channel, scale] : {std::pair{0, 3.0f}, {1, 1.0f}, {5, -25.0f}})
        ASSERT_EQ(StoreKeys(jaw.get(), channel, MixedKeys(scale)), 1);
    ASSERT_EQ(StoreKeys(found.get(), 6, {{0, 1, 1, 1}, {3000, 2, 1, 1}}), 1);
    ASSERT_EQ(StoreKeys(found.get(), 0, MixedKeys(2)), 1);
    ASSERT_EQ(face.source->Store(out.c_str()), 1);
    auto back = SceneDocument::Load(out, &error);
    ASSERT_TRUE(back) << error;
    ExpectValidGltf(out);
    // Every channel, stored or not (the brow's cubic, the other animation's lip).
    ExpectSameCurves(*face.source->document(), *back);
    // Smooth, linear and flat keys really differ from a straight line between keys.
    EXPECT_GT(std::fabs(back->Curve(1, 1)->eval(4) - back->Curve(1, 1)->eval(3)), 0.01);
    // Extras and the other animation are kept; the jaw's old samplers replaced, not kept beside.
    const tinygltf::Model& m = back->model();
    EXPECT_EQ(m.nodes[0].extras.Get<std::string>(), "kept");
    ASSERT_EQ(m.animations.size(), 2u);
    EXPECT_EQ(m.animations[0].name + m.animations[1].name, "shapesother");
    const auto& ch = m.animations[0].channels;
    EXPECT_EQ(std::count_if(ch.begin(), ch.end(), [](auto& c) { return c.target_node == 1; }), 2);
    // Opened and stored again and again, the file does not grow: replaced data never stays.
    size_t sizes[2];
    for (size_t& size : sizes) {
        OpenScene again;
        ASSERT_TRUE(again.Open(out));
        ASSERT_EQ(StoreKeys(again.Fetch("jaw").get(), 1, MixedKeys(1)), 1);
        ASSERT_EQ(again.source->Store(out.c_str()), 1);
        size = ReadFile(out).size();
    }
    EXPECT_LE(sizes[1], sizes[0] + 16);  // alignment padding may move
}

INSTANTIATE_TEST_SUITE_P(
    Formats, FaceScene, ::testing::Values(kEmbedded, kSideCar, kBinary), [](const auto& info) {
        return (std::vector<std::string>{"Embedded", "SideCar", "Binary"})[info.param];
    });

// No scenes (parentless nodes are roots in file order), names that collide with generated ones,
// no buffer; "box" has a column-major matrix: X scaled 2, 90 degrees about Z, moved (5, 6, 7).
TEST(SceneEdges, NamesStoreRejectsAndFailures) {
    std::string dir = MakeTempDir(), out = dir + "/out.glb", bad = dir + "/no/dir/x.glb", error;
    WriteFile(dir + "/box.gltf", R"({"asset":{"version":"2.0"},"nodes":[
        {"name":"box","children":[2],"matrix":[0,2,0,0,-1,0,0,0,0,0,1,0,5,6,7,1]},
        {"name":"a"},{"name":"a#2"},{"name":"a"},{},{"name":"node4"}]})");
    OpenScene scene;
    ASSERT_TRUE(scene.Open(dir + "/box.gltf"));
    EXPECT_EQ(NamesOf(scene.root.get(), 1), "root box a#2 a a#3 node4 node4#2");
    Node box = scene.Fetch("box");
    ASSERT_EQ(StoreKeys(box.get(), 1, {{0, 1, 1, 1}, {6000, 2, 1, 1}}), 1);
    ASSERT_EQ(StoreKeys(box.get(), 1, {{3000, 10, 1, 1}}, false), 1);  // merges
    EXPECT_NEAR(KLWire::FindChannel(box.get(), 1)->eval(15), 10, 1e-9);
    EXPECT_NEAR(KLWire::FindChannel(box.get(), 1)->eval(30), 2, 1e-9);
    // NaN values, the root and a channel out of range are refused; no keys remove a curve.
    EXPECT_EQ(StoreKeys(box.get(), 1, {{3000, std::nanf(""), 1, 1}}, false), 0);
    EXPECT_EQ(StoreKeys(scene.root.get(), 1, {{3000, 10, 1, 1}}), 0);
    EXPECT_EQ(StoreKeys(box.get(), 9, {{3000, 10, 1, 1}}), 0);
    ASSERT_EQ(StoreKeys(box.get(), 2, {{3000, 10, 1, 1}}), 1);
    ASSERT_EQ(StoreKeys(box.get(), 2, {}), 1);
    EXPECT_EQ(KLWire::FindChannel(box.get(), 2), nullptr);
    // A failed store names the file and writes nothing.
    int stored = -1;
    EXPECT_NE(testkit::StdErr([&] { stored = scene.source->Store(bad.c_str()); }).find(bad),
              std::string::npos);
    EXPECT_EQ(stored, 0);
    const std::string told = testkit::StdErr(
        [&] { stored = KLWireSource((dir + "/missing.glb").c_str()).Store(out.c_str()); });
    EXPECT_EQ(stored, 0);
    EXPECT_NE(told.find(out), std::string::npos);
    // Stored twice over the same file: replaced whole, no temporary file left behind.
    ASSERT_EQ(scene.source->Store(out.c_str()), 1);
    ASSERT_EQ(scene.source->Store(out.c_str()), 1);
    namespace fs = std::filesystem;
    EXPECT_EQ(std::distance(fs::directory_iterator(dir), fs::directory_iterator()), 2);
    auto back = SceneDocument::Load(out, &error);
    ASSERT_TRUE(back) << error;
    ASSERT_EQ(back->model().animations.size(), 1u);
    EXPECT_EQ(back->model().animations[0].name, "chirrup");
    EXPECT_TRUE(back->model().nodes[0].matrix.empty());  // animated nodes carry TRS
    EXPECT_NEAR(back->RestValue(0, 6), 2, 1e-9);
    EXPECT_NEAR(back->RestValue(0, 7), 1, 1e-9);
    EXPECT_NEAR(back->RestValue(0, 5), 90, 1e-9);
    EXPECT_NEAR(back->Curve(0, 0)->eval(15), 5, 1e-6);  // the matrix's translation
    EXPECT_NEAR(back->Curve(0, 1)->eval(15), 10, 1e-5);
    ExpectValidGltf(out);
}

// The committed demo rig: rest, then the jaw opens for AI and O and stays shut for MBP; keys
// hold between frames.
TEST(DemoFace, JawShapes) {
    OpenScene face;
    ASSERT_TRUE(face.Open(CHIRRUP_SOURCE_DIR "/resources/demo/face.glb"));
    for (auto [frame, degrees] : {std::pair{0.0, 0.0}, {1, 14}, {1.9, 14}, {3, 12}, {5, 0}})
        EXPECT_NEAR(face.Eval("jaw", 3, frame), degrees, 1e-3) << frame;
}
