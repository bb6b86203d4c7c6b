// What the scene writer writes: samplers, tolerances, clips and buffers, what it leaves alone.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <map>
#include <stdexcept>

#include "scene/EulerRotation.h"
#include "scene/SamplerBuilder.h"
#include "scene/SceneChecker.h"
#include "scene/SceneDocument.h"
#include "scene/scene_builder_util.h"
#include "scene/scene_util.h"
#include "scene/written_sampler.h"

namespace {
class SceneWriterTest : public ::testing::Test {
  protected:
    // Opens `builder`'s model saved as `name`.
    void Open(ModelBuilder& builder, const std::string& name = "in.gltf") {
        ASSERT_TRUE(builder.Save(dir + "/" + name,
                                 name.size() > 4 && name.substr(name.size() - 4) == ".glb"));
        ASSERT_TRUE(scene.Open(dir + "/" + name));
    }
    // A scene of one empty node "a", opened; the node.
    Node OneNode() {
        ModelBuilder b;
        b.Node("a");
        Open(b);
        return scene.Fetch("a");
    }
    // Stores the open scene as `name`, checks the file is valid and reads it back.
    std::shared_ptr<SceneDocument> StoreAndRead(const std::string& name = "out.gltf") {
        std::string error;
        out = dir + "/" + name;
        EXPECT_EQ(scene.source->Store(out.c_str()), 1);
        ExpectValidGltf(out);
        auto back = SceneDocument::Load(out, &error);
        if (!back)  // fails the test: every caller reads what was written
            throw std::runtime_error("cannot read back " + out + ": " + error);
        return back;
    }
    std::string dir = MakeTempDir(), out;
    OpenScene scene;  // 30 frames a second
};

const float kQ90X[] = {0.70710678f, 0, 0, 0.70710678f};

// Keys at (time, value) that each hold their value until the next.
std::vector<ChannelCurve::Key> StepKeys(const std::vector<std::pair<double, double>>& at) {
    std::vector<ChannelCurve::Key> keys(at.size());
    for (size_t k = 0; k < at.size(); ++k) {
        keys[k].time = at[k].first;
        keys[k].value = at[k].second;
        keys[k].out = k + 1 < at.size() ? ChannelCurve::kStep : keys[k].out;
    }
    return keys;
}
}  // namespace

// Translation keyed on every axis at one set of times is written as those keys: LINEAR when
// every piece is straight, STEP when every one steps, CUBICSPLINE otherwise.
TEST_F(SceneWriterTest, SharedKeyTimesAreWrittenAsTheKeys) {
    Node a = OneNode();
    struct Case {
        int in, out;
        const char* interpolation;
        size_t floatsPerKey;
    };
    for (const Case& c : {Case{1, 1, "LINEAR", 3}, Case{0, 2, "CUBICSPLINE", 9}}) {
        for (int axis = 0; axis < 3; ++axis) {
            ASSERT_EQ(StoreKeys(a.get(), axis,
                                {{0, 1.f + axis, c.in, c.out},
                                 {1500, 2, c.in, c.out},
                                 {7000, -1, c.in, c.out}}),
                      1);
        }
        auto back = StoreAndRead();
        Written w = WrittenSampler(back->model(), 0, "translation");
        EXPECT_EQ(w.interpolation, c.interpolation);
        EXPECT_EQ(w.times, (std::vector<float>{0, 0.25f, 7000 / 6000.0f}));
        EXPECT_EQ(w.values.size(), 3 * c.floatsPerKey);
        ASSERT_TRUE(scene.Open(out));
        a = scene.Fetch("a");
    }
    // Steps: the document has no step tangent code, so set one through the curve.
    for (int axis = 0; axis < 3; ++axis) {
        scene.source->document()->SetCurve(0, axis, StepKeys({{0, 1}, {0.5, 2}}), true);
    }
    Written w = WrittenSampler(StoreAndRead()->model(), 0, "translation");
    EXPECT_EQ(w.interpolation, "STEP");
    EXPECT_EQ(w.times, (std::vector<float>{0, 0.5f}));
}

// Paths keyed at the same times (as the nodes one keyset drives are) share one input accessor;
// other times get their own, and each path keeps its own values.
TEST_F(SceneWriterTest, PathsKeyedAtTheSameTimesShareTheirTimes) {
    ModelBuilder b;
    for (const char* name : {"a", "b", "c"}) {
        b.Node(name);
    }
    Open(b);
    const int shifts[] = {0, 0, 100};  // ticks: "c" is keyed at other times
    for (int n = 0; n < 3; ++n) {
        const char name[2] = {char('a' + n), 0};
        Node node = scene.Fetch(name);
        for (int axis : {0, 4}) {
            ASSERT_EQ(
                StoreKeys(node.get(), axis,
                          {{shifts[n], float(n), 0, 0}, {3000 + shifts[n], float(n + 1), 0, 0}}),
                1);
        }
    }
    auto back = StoreAndRead();
    const tinygltf::Model& m = back->model();
    std::map<std::string, int> input;  // node name and path to the sampler's input accessor
    for (const tinygltf::Animation& anim : m.animations) {
        for (const tinygltf::AnimationChannel& c : anim.channels) {
            input[back->NodeName(c.target_node) + " " + c.target_path] =
                anim.samplers[size_t(c.sampler)].input;
        }
    }
    EXPECT_EQ(input["a translation"], input["b translation"]);
    EXPECT_NE(input["a translation"], input["c translation"]);
    EXPECT_NE(input["a rotation"], input["c rotation"]);
    for (int n = 0; n < 3; ++n) {
        EXPECT_NEAR(back->Curve(n, 0)->Evaluate(0.5 + shifts[n] / 6000.0), n + 1, 1e-6);
        EXPECT_NEAR(back->Curve(n, 4)->Evaluate(0.5 + shifts[n] / 6000.0), n + 1, 1e-3);
    }
}

// Axes keyed at different times are cut at the union of the key times as cubic pieces: exact
// at every frame, and no more keys than the union.
TEST_F(SceneWriterTest, AxesAtDifferentTimesAreCubicPiecesAtTheUnionOfKeyTimes) {
    Node a = OneNode();
    ASSERT_EQ(StoreKeys(a.get(), 0, {{0, 0, 0, 0}, {3000, 4, 0, 0}, {6000, 1, 0, 0}}), 1);
    ASSERT_EQ(StoreKeys(a.get(), 2, {{1000, 2, 1, 1}, {9000, -3, 1, 1}}), 1);
    auto back = StoreAndRead();
    Written w = WrittenSampler(back->model(), 0, "translation");
    EXPECT_EQ(w.interpolation, "CUBICSPLINE");
    EXPECT_EQ(w.times, (std::vector<float>{0, 1000 / 6000.0f, 0.5f, 1, 1.5f}));
    const SceneDocument& doc = *scene.source->document();
    for (int f = 0; f <= 50; ++f) {
        for (int c : {0, 1, 2}) {
            ASSERT_NEAR(back->Curve(0, c)->eval(f), doc.Curve(0, c) ? doc.Curve(0, c)->eval(f) : 0,
                        1e-5)
                << "channel " << c << " frame " << f;
        }
    }
    // An axis that holds one value at key times of its own adds none of them: the moving
    // axis's keys alone, exact, with the held axis at its value throughout.
    ASSERT_TRUE(scene.Open(out));
    a = scene.Fetch("a");
    ASSERT_EQ(StoreKeys(a.get(), 0, {{0, 0, 0, 0}, {3000, 4, 0, 0}, {6000, 1, 0, 0}}), 1);
    ASSERT_EQ(StoreKeys(a.get(), 2, {{1000, 2, 1, 1}, {2500, 2, 2, 0}, {9000, 2, 0, 1}}), 1);
    back = StoreAndRead();
    w = WrittenSampler(back->model(), 0, "translation");
    EXPECT_EQ(w.interpolation, "CUBICSPLINE");
    EXPECT_EQ(w.times, (std::vector<float>{0, 0.5f, 1}));
    for (int f = 0; f <= 50; ++f) {
        ASSERT_NEAR(back->Curve(0, 0)->eval(f), scene.source->document()->Curve(0, 0)->eval(f),
                    1e-5)
            << "frame " << f;
        ASSERT_NEAR(back->Curve(0, 2)->eval(f), 2, 1e-6) << "frame " << f;
    }
}

// Sampled curves (rotation; translation mixing steps with axes at other times) stay within
// tolerance at every frame and key, with fewer samples than frames.
TEST_F(SceneWriterTest, SampledCurvesStayWithinToleranceAtEveryFrameAndKey) {
    Node a = OneNode();
    // A steady turn about X over 20 s (600 frames), a smooth swing about Y for the first 5 s,
    // a jump about Z after the first frame (a step, which a spline cannot make).
    ASSERT_EQ(StoreKeys(a.get(), 3, {{0, 0, 1, 1}, {120000, 170, 1, 1}}), 1);
    ASSERT_EQ(StoreKeys(a.get(), 4, {{0, 10, 0, 0}, {15000, 95, 0, 0}, {30000, 5, 0, 0}}), 1);
    SceneDocument& edit = *scene.source->document();
    edit.SetCurve(0, 5, StepKeys({{0, 0}, {1 / 30.0, 30}}), true);
    edit.SetCurve(0, 0, StepKeys({{0, 0}, {2, 5}, {3.5, 1}}), true);
    ASSERT_EQ(StoreKeys(a.get(), 1, {{0, 0, 0, 0}, {9000, 2, 0, 0}, {24000, -1, 0, 0}}), 1);
    auto back = StoreAndRead();
    const SceneDocument& doc = *scene.source->document();
    Written rot = WrittenSampler(back->model(), 0, "rotation");
    Written pos = WrittenSampler(back->model(), 0, "translation");
    EXPECT_EQ(rot.interpolation, "LINEAR");
    EXPECT_EQ(pos.interpolation, "LINEAR");
    EXPECT_LT(rot.times.size(), 300u);  // far fewer than the 601 frames
    EXPECT_LT(pos.times.size(), 121u);
    // Every frame, and every key of the path's own axes.
    std::vector<double> checks[2];
    for (int f = 0; f <= 630; ++f) {
        checks[0].push_back(f / 30.0), checks[1].push_back(f / 30.0);
    }
    for (int c : {0, 1, 3, 4, 5}) {
        for (const ChannelCurve::Key& k : doc.Curve(0, c)->keys()) {
            checks[c / 3].push_back(k.time);
        }
    }
    for (double t : checks[1]) {
        EulerRotation::Quat want =
            EulerRotation::ToQuaternion({doc.Curve(0, 3)->Evaluate(t), doc.Curve(0, 4)->Evaluate(t),
                                         doc.Curve(0, 5)->Evaluate(t)});
        std::vector<double> got = SampleAt(rot, t, 4);
        ASSERT_LE(EulerRotation::AngleBetween(want, {got[0], got[1], got[2], got[3]}),
                  SamplerBuilder::kRotationToleranceDegrees)
            << "rotation at " << t;
    }
    for (double t : checks[0]) {
        std::vector<double> got = SampleAt(pos, t, 3);
        for (int axis : {0, 1}) {
            ASSERT_NEAR(got[size_t(axis)], doc.Curve(0, axis)->Evaluate(t),
                        SamplerBuilder::kVectorTolerance)
                << "axis " << axis << " at " << t;
        }
    }
}

// A skinned figure whose animation lives in a buffer of its own: replacing that animation
// leaves the buffer empty, and an empty buffer is removed, not written with byteLength 0.
TEST_F(SceneWriterTest, ABufferLeftEmptyIsRemoved) {
    ModelBuilder b;
    int root = b.Node("root"), bone = b.Node("bone", root), body = b.Node("body");
    int ibm = b.Floats({1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0,  0, 1,  //
                        1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, -1, 0, 1},
                       16);
    tinygltf::Skin skin;
    skin.joints = {root, bone};
    skin.inverseBindMatrices = ibm;
    b.m.skins.push_back(skin);
    tinygltf::Primitive prim;
    prim.attributes["POSITION"] = b.Floats({0, 0, 0, 1, 0, 0, 0, 1, 0}, 3, 0, true);
    prim.attributes["WEIGHTS_0"] = b.Floats({1, 0, 0, 0, 0, 1, 0, 0, 1, 0, 0, 0}, 4);
    const unsigned short joints[] = {0, 0, 0, 0, 0, 1, 0, 0, 0, 0, 0, 0};
    prim.attributes["JOINTS_0"] =
        b.Accessor(joints, 3, 4, TINYGLTF_COMPONENT_TYPE_UNSIGNED_SHORT, 2);
    prim.mode = TINYGLTF_MODE_TRIANGLES;
    b.m.meshes.emplace_back();
    b.m.meshes[0].primitives.push_back(prim);
    b.m.nodes[size_t(body)].mesh = 0;
    b.m.nodes[size_t(body)].skin = 0;
    b.Channel(0, bone, "rotation", {0, 1}, {0, 0, 0, 1, kQ90X[0], 0, 0, kQ90X[3]}, "LINEAR", 1);
    Open(b);
    ASSERT_EQ(StoreKeys(scene.Fetch("bone").get(), 3, {{0, 0, 1, 1}, {6000, 45, 1, 1}}), 1);
    auto back = StoreAndRead();
    // The old animation's buffer is gone; the scene's and the new animation's remain.
    ASSERT_EQ(back->model().buffers.size(), 2u);
    for (const tinygltf::Buffer& buffer : back->model().buffers) {
        EXPECT_FALSE(buffer.data.empty());
    }
    EXPECT_EQ(back->model().skins.size(), 1u);
    Written w = WrittenSampler(back->model(), bone, "rotation");
    ASSERT_EQ(w.channels, 1);
    EXPECT_NEAR(back->Curve(bone, 3)->Evaluate(1), 45, 1e-3);
}

// A path animated in the second clip: the applied curve replaces it there, and the channel on
// the same path in the first clip goes; the clips' other channels stay as they were.
TEST_F(SceneWriterTest, ADrivenPathEndsInTheFirstClipThatAnimatedItAndNowhereElse) {
    ModelBuilder b;
    int a = b.Node("a"), c = b.Node("c");
    b.Channel(0, c, "translation", {0, 1}, {0, 0, 0, 1, 1, 1});
    b.Channel(1, a, "translation", {0, 2}, {0, 0, 0, 2, 0, 0});
    b.Channel(1, c, "scale", {0, 1}, {1, 1, 1, 2, 2, 2});
    b.Channel(2, a, "translation", {0, 3}, {0, 0, 0, 3, 0, 0});
    Open(b);
    ASSERT_EQ(StoreKeys(scene.Fetch("a").get(), 1, {{0, 0, 1, 1}, {6000, 7, 1, 1}}), 1);
    auto back = StoreAndRead();
    const tinygltf::Model& m = back->model();
    Written w = WrittenSampler(m, a, "translation");
    EXPECT_EQ(w.channels, 1);
    EXPECT_EQ(w.clip, 1);
    ASSERT_EQ(m.animations.size(), 2u);  // clip2 lost its only channel
    EXPECT_EQ(m.animations[0].name + m.animations[1].name, "clip0clip1");
    EXPECT_EQ(WrittenSampler(m, c, "scale").values, (std::vector<float>{1, 1, 1, 2, 2, 2}));
    EXPECT_NEAR(back->Curve(a, 0)->Evaluate(1), 1, 1e-6);  // TX as clip1 had it
    EXPECT_NEAR(back->Curve(a, 1)->Evaluate(1), 7, 1e-6);
}

// A chain driven in one axis of one path: its other paths are written back as they were read.
TEST_F(SceneWriterTest, PathsNotDrivenAreWrittenBackAsRead) {
    ModelBuilder b;
    int bone = b.Node("b0");
    for (int i = 1; i < 4; ++i) {
        bone = b.Node("b" + std::to_string(i), bone);
    }
    std::vector<float> q = {0, 0, 0, 1, kQ90X[0], 0, 0, kQ90X[3], 0, 0, 0, 1};
    b.Channel(0, bone, "rotation", {0, 1, 2}, q);
    Open(b);
    ASSERT_EQ(StoreKeys(scene.Fetch("b3").get(), 2, {{0, 0, 1, 1}, {6000, 1, 1, 1}}), 1);
    auto back = StoreAndRead();
    Written rot = WrittenSampler(back->model(), bone, "rotation");
    EXPECT_EQ(rot.times, (std::vector<float>{0, 1, 2}));
    EXPECT_EQ(rot.values, q);
    EXPECT_EQ(WrittenSampler(back->model(), bone, "translation").times.size(), 2u);
}

// A .glb carries every buffer and embedded image in its binary chunk.
TEST_F(SceneWriterTest, AGlbHoldsEveryBufferAndImageInItsBinaryChunk) {
    ModelBuilder b;
    int a = b.Node("a");
    b.Channel(0, a, "scale", {0, 1}, {1, 1, 1, 2, 2, 2}, "LINEAR", 0);
    b.Channel(0, a, "rotation", {0, 1}, {0, 0, 0, 1, kQ90X[0], 0, 0, kQ90X[3]}, "LINEAR", 1);
    tinygltf::Image image;
    image.uri =
        "data:image/png;base64,iVBORw0KGgoAAAANSUhEUgAAAAEAAAABCAYAAAAfFcSJAAAADUlEQVR42mNkYPhfDwAC"
        "hwGA60e6kgAAAABJRU5ErkJggg==";
    b.m.images.push_back(image);
    b.m.textures.emplace_back();
    b.m.textures[0].source = 0;
    b.m.materials.emplace_back();
    b.m.materials[0].pbrMetallicRoughness.baseColorTexture.index = 0;
    Open(b, "in.glb");
    ASSERT_EQ(StoreKeys(scene.Fetch("a").get(), 0, {{0, 0, 1, 1}, {6000, 1, 1, 1}}), 1);
    auto back = StoreAndRead("out.glb");
    const tinygltf::Model& m = back->model();
    ASSERT_EQ(m.buffers.size(), 1u);
    EXPECT_TRUE(m.buffers[0].uri.empty());
    ASSERT_EQ(m.images.size(), 1u);
    EXPECT_GE(m.images[0].bufferView, 0);
    EXPECT_EQ(m.images[0].mimeType, "image/png");
    EXPECT_EQ(ReadFile(out).find("data:"), std::string::npos);
    EXPECT_EQ(WrittenSampler(m, a, "scale").values, (std::vector<float>{1, 1, 1, 2, 2, 2}));
}

// One open scene stored twice as .glb, then as .gltf with one node driven anew: each holds the
// last applied values; a .glb one buffer, the .gltf the scene's, the second store's and its own.
TEST_F(SceneWriterTest, StoresInTurnKeepOneBufferForTheNewAnimation) {
    ModelBuilder b;
    for (const char* name : {"a", "b", "c"}) {
        b.Node(name);
    }
    b.Channel(0, b.Node("d"), "scale", {0, 1}, {1, 1, 1, 2, 2, 2});  // the scene's own bytes
    Open(b);
    const size_t buffersRead = scene.source->document()->model().buffers.size();
    const char* names[] = {"a", "b", "c"};
    int last[3] = {0, 0, 0};  // the pass whose keys each node holds
    for (int pass = 0; pass < 3; ++pass) {
        for (int n = 0; n < (pass < 2 ? 3 : 1); ++n) {
            Node node = scene.Fetch(names[n]);
            for (int channel : {0, 1, 5}) {
                ASSERT_EQ(StoreKeys(node.get(), channel,
                                    {{0, float(pass + n), 0, 0},
                                     {3000, float(pass + n + channel), 0, 2},
                                     {6000, 1, 2, 0}}),
                          1);
            }
            last[n] = pass;
        }
        auto back = StoreAndRead(pass < 2 ? "out.glb" : "out.gltf");
        EXPECT_EQ(back->model().buffers.size(), pass < 2 ? 1u : buffersRead + 2) << "pass " << pass;
        for (int n = 0; n < 3; ++n) {
            for (int channel : {0, 1, 5}) {
                EXPECT_NEAR(back->Curve(n, channel)->Evaluate(0.5), last[n] + n + channel, 1e-3)
                    << "pass " << pass << " node " << n << " channel " << channel;
            }
        }
    }
}

// Keys before time 0 are cut off: the curve starts at 0 with its value there. No time or
// minimum is written as -0.
TEST_F(SceneWriterTest, CurvesStartAtZeroWithoutNegativeZeros) {
    Node a = OneNode();
    ASSERT_EQ(StoreKeys(a.get(), 0, {{-6000, 0, 1, 1}, {-3000, 1, 1, 1}, {3000, 3, 1, 1}}), 1);
    const ChannelCurve* tx = scene.source->document()->Curve(0, 0);
    ASSERT_EQ(tx->keys().size(), 2u);
    EXPECT_EQ(tx->keys()[0].time, 0);
    EXPECT_NEAR(tx->Evaluate(0), 2, 1e-9);
    EXPECT_NEAR(tx->Evaluate(0.25), 2.5, 1e-9);
    ASSERT_EQ(StoreKeys(a.get(), 3, {{-1, 0, 0, 0}, {3000, 30, 0, 0}}), 1);
    auto back = StoreAndRead();
    for (const char* path : {"translation", "rotation"}) {
        Written w = WrittenSampler(back->model(), 0, path);
        ASSERT_FALSE(w.times.empty());
        EXPECT_FALSE(std::signbit(w.times[0])) << path;
    }
    for (const tinygltf::Accessor& acc : back->model().accessors) {
        for (double v : acc.minValues) {
            EXPECT_FALSE(std::signbit(v) && v == 0);
        }
    }
}

// A small scene with one rotation key at 359,000 s stays small when driven; a rotation that
// steps over those 100 hours (so that it must be sampled) is refused, naming the file and node,
// and nothing is written.
TEST_F(SceneWriterTest, AFarKeyCostsNothingAndATooLongCurveIsRefused) {
    ModelBuilder b;
    int a = b.Node("a");
    b.Channel(0, a, "rotation", {359000}, {kQ90X[0], 0, 0, kQ90X[3]});
    Open(b);
    EXPECT_LT(ReadFile(dir + "/in.gltf").size(), 1500u);
    ASSERT_EQ(StoreKeys(scene.Fetch("a").get(), 4, {{0, 0, 1, 1}, {6000, 20, 1, 1}}), 1);
    auto back = StoreAndRead();
    EXPECT_LT(ReadFile(out).size(), 4000u);
    EXPECT_NEAR(back->Curve(a, 4)->Evaluate(0.5), 10, 1e-3);
    EXPECT_NEAR(back->Curve(a, 3)->Evaluate(100000), 90, 1e-3);

    ModelBuilder turning;
    a = turning.Node("a");
    turning.Channel(0, a, "rotation", {0, 359000}, {0, 0, 0, 1, kQ90X[0], 0, 0, kQ90X[3]},
                    "STEP");
    Open(turning);
    ASSERT_EQ(StoreKeys(scene.Fetch("a").get(), 4, {{0, 0, 1, 1}, {6000, 20, 1, 1}}), 1);
    std::string refused = dir + "/refused.gltf";
    testing::internal::CaptureStderr();
    EXPECT_EQ(scene.source->Store(refused.c_str()), 0);
    std::string said = testing::internal::GetCapturedStderr();
    EXPECT_NE(said.find(refused), std::string::npos) << said;
    EXPECT_NE(said.find("node [a]"), std::string::npos) << said;
    EXPECT_FALSE(std::filesystem::exists(refused));
}

// Buffers and images named by a uri are read from regular files only.
TEST_F(SceneWriterTest, AUriNamingADirectoryIsRefused) {
    std::filesystem::create_directory(dir + "/sub");
    for (const std::string& json :
         {std::string(R"({"asset":{"version":"2.0"},"buffers":[{"byteLength":4,"uri":"sub"}]})"),
          std::string(R"({"asset":{"version":"2.0"},"images":[{"uri":"sub"}]})")}) {
        WriteFile(dir + "/d.gltf", json);
        std::string error;
        EXPECT_FALSE(SceneDocument::Load(dir + "/d.gltf", &error));
        EXPECT_NE(error.find("not a regular file"), std::string::npos) << error;
    }
}
