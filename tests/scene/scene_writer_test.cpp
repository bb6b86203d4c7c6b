// What the scene writer writes: samplers, tolerances, clips and buffers, what it leaves alone.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <map>
#include <stdexcept>
#include <string>
#include <tuple>

#include "scene/SamplerBuilder.h"
#include "scene/SceneDocument.h"
#include "scene/scene_builder_util.h"
#include "scene/scene_util.h"
#include "scene/written_sampler.h"

namespace {
class SceneWriterTest : public ::testing::Test {
  protected:
    // Opens `builder`'s model saved as `name`.
    void Open(ModelBuilder& builder, const std::string& name = "in.gltf") {
        ASSERT_TRUE(builder.Save(dir + "/" + name, name.substr(name.size() - 4) == ".glb"));
        ASSERT_TRUE(scene.Open(dir + "/" + name));
    }
    // A scene of one empty node "a", opened.
    void OneNode() {
        ModelBuilder b;
        b.Node("a");
        Open(b);
    }
    // Keys on `channel` of node `name`, replacing its old keys.
    void Key(const char* name, int channel, const std::vector<StoreKey>& keys) {
        EXPECT_EQ(StoreKeys(scene.Fetch(name).get(), channel, keys), 1) << name << channel;
    }
    // Keys at (time, value) on node 0's `channel` that each hold their value until the next.
    void Steps(int channel, const std::vector<std::pair<double, double>>& at) {
        std::vector<ChannelCurve::Key> keys(at.size());
        for (size_t k = 0; k < at.size(); ++k) {
            keys[k].time = at[k].first, keys[k].value = at[k].second;
            keys[k].out = k + 1 < at.size() ? ChannelCurve::kStep : keys[k].out;
        }
        scene.source->document()->SetCurve(0, channel, keys, true);
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
    // The rotation at `t` that curves 3..5 of `doc`'s node 0 give against the written `rot`.
    static void ExpectRotationAt(const SceneDocument& doc, const Written& rot, double t) {
        EulerRotation::Vec3 angles;
        for (int c = 0; c < 3; ++c)
            angles[size_t(c)] = doc.Curve(0, 3 + c)->Evaluate(t);
        std::vector<double> got = SampleAt(rot, t, 4);
        ASSERT_LE(EulerRotation::AngleBetween(EulerRotation::ToQuaternion(angles),
                                              {got[0], got[1], got[2], got[3]}),
                  SamplerBuilder::kRotationToleranceDegrees)
            << "rotation at " << t << " s";
    }
    std::string dir = MakeTempDir(), out;
    OpenScene scene;  // 30 frames a second
};

const float kQ90X[] = {0.70710678f, 0, 0, 0.70710678f};
const std::vector<float> kScale12 = {1, 1, 1, 2, 2, 2};
}  // namespace

// Translation keyed on every axis at one set of times is written as those keys: LINEAR when
// every piece is straight, STEP when every one steps, CUBICSPLINE otherwise.
TEST_F(SceneWriterTest, SharedKeyTimesAreWrittenAsTheKeys) {
    OneNode();
    for (auto [i, o, interpolation] :
         {std::tuple{1, 1, "LINEAR"}, {0, 2, "CUBICSPLINE"}, {0, 0, "STEP"}}) {
        for (int axis = 0; axis < 3; ++axis) {
            Key("a", axis, {{0, 1.f + axis, i, o}, {1500, 2, i, o}, {7000, -1, i, o}});
            if (*interpolation == 'S')  // no step tangent code: set one through the curve
                Steps(axis, {{0, 1}, {0.25, 2}, {7000 / 6000.0, -1}});
        }
        Written w = WrittenSampler(StoreAndRead()->model(), 0, "translation");
        EXPECT_EQ(w.interpolation, interpolation);
        EXPECT_EQ(w.times, (std::vector<float>{0, 0.25f, 7000 / 6000.0f}));
        EXPECT_EQ(w.values.size(), *interpolation == 'C' ? 27u : 9u);
        ASSERT_TRUE(scene.Open(out));
    }
}

// Axes keyed at different times are cut at the union of the key times as cubic pieces: exact
// at every frame, and no more keys than the union.
TEST_F(SceneWriterTest, AxesAtDifferentTimesAreCubicPiecesAtTheUnionOfKeyTimes) {
    OneNode();
    Key("a", 0, {{0, 0, 0, 0}, {3000, 4, 0, 0}, {6000, 1, 0, 0}});
    Key("a", 2, {{1000, 2, 1, 1}, {9000, -3, 1, 1}});
    auto back = StoreAndRead();
    Written w = WrittenSampler(back->model(), 0, "translation");
    EXPECT_EQ(w.interpolation, "CUBICSPLINE");
    EXPECT_EQ(w.times, (std::vector<float>{0, 1000 / 6000.0f, 0.5f, 1, 1.5f}));
    const SceneDocument& doc = *scene.source->document();
    for (int f = 0; f <= 50; ++f) {
        for (int c : {0, 1, 2})
            ASSERT_NEAR(back->Curve(0, c)->eval(f), doc.Curve(0, c) ? doc.Curve(0, c)->eval(f) : 0,
                        1e-5)
                << "channel " << c << " frame " << f;
    }
}

// Two axes of one keyset going on after a third, keyed apart, has stopped: from the third's last
// key on, the knots are the keyset's keys, each axis still exact at every frame.
TEST_F(SceneWriterTest, AxesGoingOnTogetherAfterAnotherStopsStayExact) {
    OneNode();
    std::vector<StoreKey> x, y, z;
    for (int k = 0; k <= 20; ++k) {
        x.push_back({600 * k, float(std::sin(k * 0.7)), k % 3, (k + 1) % 3});
        y.push_back({600 * k, float(std::cos(k * 0.4)), (k + 2) % 3, k % 3});
    }
    for (int k = 0; k <= 15; ++k)
        z.push_back({200 * k, float(0.1 * k * k), 2, 2});
    Key("a", 0, x);
    Key("a", 1, y);
    Key("a", 2, z);
    auto back = StoreAndRead();
    Written w = WrittenSampler(back->model(), 0, "translation");
    EXPECT_EQ(w.interpolation, "CUBICSPLINE");
    // The union: every Z key (every frame to 0.5 s) and every X and Y key after it.
    ASSERT_EQ(w.times.size(), 16u + 15u);
    const SceneDocument& doc = *scene.source->document();
    for (int f = 0; f <= 66; ++f) {
        for (int c : {0, 1, 2})
            ASSERT_NEAR(back->Curve(0, c)->eval(f), doc.Curve(0, c)->eval(f), 1e-5)
                << "channel " << c << " frame " << f;
    }
}

// Sampled curves (rotation; translation mixing steps with axes at other times) stay within
// tolerance at every frame and key, with fewer samples than frames.
TEST_F(SceneWriterTest, SampledCurvesStayWithinToleranceAtEveryFrameAndKey) {
    OneNode();
    // A steady turn about X over 20 s (600 frames), a smooth swing about Y for the first 5 s,
    // a jump about Z after the first frame (a step, which a spline cannot make).
    Key("a", 3, {{0, 0, 1, 1}, {120000, 170, 1, 1}});
    Key("a", 4, {{0, 10, 0, 0}, {15000, 95, 0, 0}, {30000, 5, 0, 0}});
    Steps(5, {{0, 0}, {1 / 30.0, 30}});
    Steps(0, {{0, 0}, {2, 5}, {3.5, 1}});
    Key("a", 1, {{0, 0, 0, 0}, {9000, 2, 0, 0}, {24000, -1, 0, 0}});
    auto back = StoreAndRead();
    const SceneDocument& doc = *scene.source->document();
    Written rot = WrittenSampler(back->model(), 0, "rotation");
    Written pos = WrittenSampler(back->model(), 0, "translation");
    EXPECT_EQ(rot.interpolation + pos.interpolation, "LINEARLINEAR");
    EXPECT_LT(rot.times.size(), 300u);  // far fewer than the 601 frames
    EXPECT_LT(pos.times.size(), 121u);
    // Every frame, and every key of the path's own axes.
    std::vector<double> checks[2];
    for (int f = 0; f <= 630; ++f)
        checks[0].push_back(f / 30.0), checks[1].push_back(f / 30.0);
    for (int c : {0, 1, 3, 4, 5}) {
        for (const ChannelCurve::Key& k : doc.Curve(0, c)->keys())
            checks[c / 3].push_back(k.time);
    }
    for (double t : checks[1])
        ASSERT_NO_FATAL_FAILURE(ExpectRotationAt(doc, rot, t));
    for (double t : checks[0]) {
        std::vector<double> got = SampleAt(pos, t, 3);
        for (int axis : {0, 1}) {
            ASSERT_NEAR(got[size_t(axis)], doc.Curve(0, axis)->Evaluate(t),
                        SamplerBuilder::kVectorTolerance)
                << "axis " << axis << " at " << t;
        }
    }
}

// A rotation turning about one axis between fixed ones, or about several, in each form it is
// written in (cubic pieces, cut or not, or samples), stays within tolerance at every frame and
// key.
struct TurnCase {
    const char* name;
    bool steps;                     // every X key but the last steps to the next
    const char* interpolation;      // what is written
    bool cut;                       // more knots than key times (cubic pieces cut into parts)
    std::vector<StoreKey> keys[3];  // RX RY RZ: ticks (6000 a second), degrees, tangent codes;
                                    // none: held at an angle of its own
};
// A head keyed every three frames on every axis, swinging by `scale` times a few degrees about
// rest angles of its own, with every kind of tangent.
// A jaw keyed every three frames for ten seconds, barely moving but for one wide swing late
// on: only the pieces of that swing are cut.
TurnCase LateSwing(const char* name, float swing) {
    TurnCase c{name, false, "CUBICSPLINE", true, {}};
    for (int k = 0; k < 100; ++k)
        c.keys[0].push_back({600 * k, k == 77 ? swing : 0.2f * std::sin(k * 0.9f), k % 3, k % 2});
    return c;
}
TurnCase Head(const char* name, float scale, const char* interpolation, bool cut) {
    const float rest[3] = {0, 10, -5};
    const float swing[3][5] = {{0, 4, -3, 5, 0}, {0, 4, -4, 2, 0}, {0, 3, -3, 0, -1}};
    const int tangents[3][5][2] = {{{0, 0}, {0, 1}, {1, 2}, {2, 0}, {0, 0}},
                                   {{1, 1}, {0, 0}, {0, 2}, {2, 1}, {1, 0}},
                                   {{2, 0}, {0, 0}, {0, 1}, {1, 1}, {0, 0}}};
    TurnCase c{name, false, interpolation, cut, {}};
    for (int axis = 0; axis < 3; ++axis) {
        for (int k = 0; k < 5; ++k)
            c.keys[axis].push_back({600 * k, rest[axis] + scale * swing[axis][k],
                                    tangents[axis][k][0], tangents[axis][k][1]});
    }
    return c;
}
void PrintTo(const TurnCase& c, std::ostream* os) {
    *os << c.name;
}
class TurnTest : public SceneWriterTest, public ::testing::WithParamInterface<TurnCase> {};

TEST_P(TurnTest, StaysWithinToleranceAtEveryFrameAndKey) {
    const TurnCase& c = GetParam();
    OneNode();
    const float fixed[3] = {30, -50, -20};
    for (int axis = 0; axis < 3; ++axis) {
        if (c.keys[axis].empty())
            Key("a", 3 + axis, {{0, fixed[axis], 1, 1}});
        else
            Key("a", 3 + axis, c.keys[axis]);
    }
    SceneDocument& doc = *scene.source->document();
    if (c.steps) {
        std::vector<std::pair<double, double>> at;
        for (const ChannelCurve::Key& k : doc.Curve(0, 3)->keys())
            at.emplace_back(k.time, k.value);
        Steps(3, at);
    }
    Written rot = WrittenSampler(StoreAndRead("out.glb")->model(), 0, "rotation");
    EXPECT_EQ(rot.interpolation, c.interpolation);
    std::vector<double> keys;  // every axis's key times, once each
    for (int axis = 0; axis < 3; ++axis) {
        for (const ChannelCurve::Key& k : doc.Curve(0, 3 + axis)->keys())
            keys.push_back(k.time);
    }
    std::sort(keys.begin(), keys.end());
    keys.erase(std::unique(keys.begin(), keys.end()), keys.end());
    if (rot.interpolation == "CUBICSPLINE") {
        EXPECT_EQ(rot.times.size() > keys.size(), c.cut) << rot.times.size() << " knots";
        EXPECT_EQ(rot.times.front(), float(keys.front()));
        EXPECT_EQ(rot.times.back(), float(keys.back()));
    }
    // Every frame from a second before the first key to a second after the last, every key.
    for (double f = std::floor(keys.front() * 30) - 30; f <= std::ceil(keys.back() * 30) + 30; ++f)
        ASSERT_NO_FATAL_FAILURE(ExpectRotationAt(doc, rot, f / 30));
    for (double t : keys)
        ASSERT_NO_FATAL_FAILURE(ExpectRotationAt(doc, rot, t));
}

INSTANTIATE_TEST_SUITE_P(
    Forms, TurnTest,
    ::testing::Values(
        // Smooth, eased and straight pieces over 15 s, turning by 170 degrees in the first 5 s:
        // cut into parts there.
        TurnCase{"SmoothAndStraight",
                 false,
                 "CUBICSPLINE",
                 true,
                 {{}, {{0, -50, 0, 0}, {30000, 120, 0, 1}, {90000, 100, 1, 1}}, {}}},
        // Keys every three frames swinging both ways, as a lip-sync keyset drives a jaw.
        TurnCase{"DenseSwings",
                 false,
                 "CUBICSPLINE",
                 false,
                 {{},
                  {},
                  {{0, 0, 0, 1},
                   {600, 1, 1, 2},
                   {1200, -0.5f, 2, 0},
                   {1800, 0.8f, 0, 0},
                   {2400, 0, 0, 1}}}},
        // Two turns a second five minutes in: a float time there is up to 15 microseconds off,
        // which moves a knot by more than the tolerance, so the turn is sampled.
        TurnCase{"FastTurnLateInAScene",
                 false,
                 "LINEAR",
                 false,
                 {{}, {{1800000, 0, 0, 0}, {1803000, 360, 0, 0}, {1806000, 720, 0, 0}}, {}}},
        // Holds that jump at each key: a spline cannot jump, so the turn is sampled.
        TurnCase{"Steps",
                 true,
                 "LINEAR",
                 false,
                 {{{0, 0, 1, 1}, {3000, 40, 1, 1}, {9000, -10, 1, 1}}, {}, {}}},
        // A head nodding, shaking and tilting at once, keyed every three frames on every axis:
        // pieces cut finely enough would outnumber the frames, so it is sampled.
        Head("ThreeAxesDense", 1, "LINEAR", false),
        // Gentle for ten seconds but for one wide swing: only that swing's pieces are cut.
        LateSwing("OneWideSwingLate", 25),
        // The same head swaying a tenth as far: cubic pieces, some cut.
        Head("ThreeAxesGentle", 0.1f, "CUBICSPLINE", true),
        // Big tumbles about two axes keyed at different times: pieces at the union of the key
        // times, cut into parts where they turn fast.
        TurnCase{"TwoAxesAtDifferentTimes",
                 false,
                 "CUBICSPLINE",
                 true,
                 {{{0, 0, 0, 0}, {30000, 120, 0, 1}, {60000, -20, 1, 0}},
                  {},
                  {{9000, -40, 0, 0}, {21000, 60, 2, 2}, {45000, 30, 0, 0}}}}),
    [](const auto& info) { return std::string(info.param.name); });

// A keyset turning X every three frames over a head that the file turns about Y every frame:
// the file's key times are floats, the keyset's are not, and where they meet (every third frame)
// they are one knot, not a reason to sample the whole turn. The file's turn stops after 1 s and
// the keyset's goes on to 2 s, about X alone between the held Y and Z: that second half is
// written from the X keys as a one-axis turn, joined to the first at X's first key after 1 s.
TEST_F(SceneWriterTest, AxesKeyedOnOneFloatTimeShareAKnot) {
    OneNode();
    std::vector<StoreKey> x;
    for (int k = 0; k <= 20; ++k)
        x.push_back({600 * k, float(3 * std::sin(k * 0.7)), k % 3, (k + 1) % 3});
    Key("a", 3, x);
    Key("a", 5, {{0, -20, 1, 1}});
    std::vector<ChannelCurve::Key> y(31);
    for (int k = 0; k <= 30; ++k)
        y[size_t(k)].time = double(float(k / 30.0)), y[size_t(k)].value = 8 * std::cos(k * 0.2);
    SceneDocument& doc = *scene.source->document();
    doc.SetCurve(0, 4, y, true);
    Written rot = WrittenSampler(StoreAndRead("out.glb")->model(), 0, "rotation");
    EXPECT_EQ(rot.interpolation, "CUBICSPLINE");
    // A knot at every key time of either axis (and some between, where a piece is cut).
    for (int k = 0; k <= 30; ++k)
        EXPECT_EQ(std::count(rot.times.begin(), rot.times.end(), float(k / 30.0)), 1) << k;
    for (int k = 11; k <= 20; ++k)
        EXPECT_EQ(std::count(rot.times.begin(), rot.times.end(), float(k * 0.1)), 1) << k;
    for (double f = 0; f <= 60; ++f)
        ASSERT_NO_FATAL_FAILURE(ExpectRotationAt(doc, rot, f / 30));
    for (int k = 0; k <= 20; ++k)
        ASSERT_NO_FATAL_FAILURE(ExpectRotationAt(doc, rot, k * 0.1));
}

// Paths keyed at the same times share one input accessor; a path whose times differ only in a
// key that the lookup of shared times does not look at gets its own, with its own times.
TEST_F(SceneWriterTest, PathsAtTheSameTimesShareTheirInput) {
    OneNode();
    std::vector<StoreKey> keys;
    for (int k = 0; k < 20; ++k)
        keys.push_back({600 * k, 0.5f * float(k % 3), 1, 1});
    std::vector<StoreKey> shifted = keys;
    shifted[4].ticks += 100;
    Key("a", 0, keys);
    Key("a", 3, keys);
    Key("a", 6, shifted);
    auto back = StoreAndRead();
    std::map<std::string, int> input;
    for (const tinygltf::Animation& anim : back->model().animations) {
        for (const tinygltf::AnimationChannel& c : anim.channels)
            input[c.target_path] = anim.samplers[size_t(c.sampler)].input;
    }
    EXPECT_EQ(input["translation"], input["rotation"]);
    EXPECT_NE(input["scale"], input["translation"]);
    Written scale = WrittenSampler(back->model(), 0, "scale");
    ASSERT_EQ(scale.times.size(), 20u);
    EXPECT_EQ(scale.times[4], float(2500 / 6000.0));
    EXPECT_EQ(WrittenSampler(back->model(), 0, "rotation").times[4], float(2400 / 6000.0));
}

// A skinned figure whose animation lives in a buffer of its own: replacing that animation
// leaves the buffer empty, and an empty buffer is removed, not written with byteLength 0.
TEST_F(SceneWriterTest, ABufferLeftEmptyIsRemoved) {
    ModelBuilder b;
    int root = b.Node("root"), bone = b.Node("bone", root), body = b.Node("body");
    tinygltf::Skin skin;
    skin.joints = {root, bone};
    skin.inverseBindMatrices = b.Floats({1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0,  0, 1,  //
                                         1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, -1, 0, 1},
                                        16);
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
    Key("bone", 3, {{0, 0, 1, 1}, {6000, 45, 1, 1}});
    auto back = StoreAndRead();
    // The old animation's buffer is gone; the scene's and the new animation's remain.
    ASSERT_EQ(back->model().buffers.size(), 2u);
    for (const tinygltf::Buffer& buffer : back->model().buffers)
        EXPECT_FALSE(buffer.data.empty());
    EXPECT_EQ(back->model().skins.size(), 1u);
    ASSERT_EQ(WrittenSampler(back->model(), bone, "rotation").channels, 1);
    EXPECT_NEAR(back->Curve(bone, 3)->Evaluate(1), 45, 1e-3);
}

// A path animated in the second clip: the applied curve replaces it there, and the channel on
// the same path in the first clip goes; the clips' other channels stay as they were.
TEST_F(SceneWriterTest, ADrivenPathEndsInTheFirstClipThatAnimatedItAndNowhereElse) {
    ModelBuilder b;
    int a = b.Node("a"), c = b.Node("c");
    b.Channel(0, c, "translation", {0, 1}, {0, 0, 0, 1, 1, 1});
    b.Channel(1, a, "translation", {0, 2}, {0, 0, 0, 2, 0, 0});
    b.Channel(1, c, "scale", {0, 1}, kScale12);
    b.Channel(2, a, "translation", {0, 3}, {0, 0, 0, 3, 0, 0});
    Open(b);
    Key("a", 1, {{0, 0, 1, 1}, {6000, 7, 1, 1}});
    auto back = StoreAndRead();
    const tinygltf::Model& m = back->model();
    Written w = WrittenSampler(m, a, "translation");
    EXPECT_TRUE(w.channels == 1 && w.clip == 1) << w.channels << " in clip " << w.clip;
    ASSERT_EQ(m.animations.size(), 2u);  // clip2 lost its only channel
    EXPECT_EQ(m.animations[0].name + m.animations[1].name, "clip0clip1");
    EXPECT_EQ(WrittenSampler(m, c, "scale").values, kScale12);
    EXPECT_NEAR(back->Curve(a, 0)->Evaluate(1), 1, 1e-6);  // TX as clip1 had it
    EXPECT_NEAR(back->Curve(a, 1)->Evaluate(1), 7, 1e-6);
}

// A chain driven in one axis of one path: its other paths are written back as they were read.
TEST_F(SceneWriterTest, PathsNotDrivenAreWrittenBackAsRead) {
    ModelBuilder b;
    int bone = b.Node("b0");
    for (int i = 1; i < 4; ++i)
        bone = b.Node("b" + std::to_string(i), bone);
    std::vector<float> q = {0, 0, 0, 1, kQ90X[0], 0, 0, kQ90X[3], 0, 0, 0, 1};
    b.Channel(0, bone, "rotation", {0, 1, 2}, q);
    Open(b);
    Key("b3", 2, {{0, 0, 1, 1}, {6000, 1, 1, 1}});
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
    b.Channel(0, a, "scale", {0, 1}, kScale12, "LINEAR", 0);
    b.Channel(0, a, "rotation", {0, 1}, {0, 0, 0, 1, kQ90X[0], 0, 0, kQ90X[3]}, "LINEAR", 1);
    b.m.images.emplace_back();
    b.m.images[0].uri =
        "data:image/png;base64,iVBORw0KGgoAAAANSUhEUgAAAAEAAAABCAYAAAAfFcSJAAAADUlEQVR42mNkYPhfDwAC"
        "hwGA60e6kgAAAABJRU5ErkJggg==";
    b.m.textures.emplace_back();
    b.m.textures[0].source = 0;
    b.m.materials.emplace_back();
    b.m.materials[0].pbrMetallicRoughness.baseColorTexture.index = 0;
    Open(b, "in.glb");
    Key("a", 0, {{0, 0, 1, 1}, {6000, 1, 1, 1}});
    auto back = StoreAndRead("out.glb");
    const tinygltf::Model& m = back->model();
    ASSERT_TRUE(m.buffers.size() == 1 && m.images.size() == 1);
    EXPECT_TRUE(m.buffers[0].uri.empty());
    EXPECT_GE(m.images[0].bufferView, 0);
    EXPECT_EQ(m.images[0].mimeType, "image/png");
    EXPECT_EQ(ReadFile(out).find("data:"), std::string::npos);
    EXPECT_EQ(WrittenSampler(m, a, "scale").values, kScale12);
}

// One open scene stored twice as .glb, then as .gltf with one node driven anew: each holds the
// last applied values; a .glb one buffer, the .gltf the scene's, the second store's and its own.
TEST_F(SceneWriterTest, StoresInTurnKeepOneBufferForTheNewAnimation) {
    ModelBuilder b;
    for (const char* name : {"a", "b", "c"})
        b.Node(name);
    b.Channel(0, b.Node("d"), "scale", {0, 1}, kScale12);  // the scene's own bytes
    Open(b);
    const size_t buffersRead = scene.source->document()->model().buffers.size();
    int last[3] = {0, 0, 0};  // the pass whose keys each node holds
    for (int pass = 0; pass < 3; ++pass) {
        for (int n = 0; n < (pass < 2 ? 3 : 1); ++n) {
            const char name[2] = {char('a' + n), 0};
            for (int ch : {0, 1, 5})
                Key(name, ch, {{0, float(pass + n), 0, 0}, {3000, float(pass + n + ch), 0, 2}});
            last[n] = pass;
        }
        auto back = StoreAndRead(pass < 2 ? "out.glb" : "out.gltf");
        EXPECT_EQ(back->model().buffers.size(), pass < 2 ? 1u : buffersRead + 2) << pass;
        for (int n = 0; n < 3; ++n) {
            for (int ch : {0, 1, 5})
                EXPECT_NEAR(back->Curve(n, ch)->Evaluate(0.5), last[n] + n + ch, 1e-3)
                    << "pass " << pass << " node " << n << " channel " << ch;
        }
    }
}

// Keys before time 0 are cut off: the curve starts at 0 with its value there. No time or
// The bytes of the animation a store replaces are left out of the file, .glb or .gltf, and the
// bytes on either side of them come back as they were.
TEST_F(SceneWriterTest, ReplacedAnimationBytesAreLeftOut) {
    ModelBuilder b;
    std::vector<float> points(3000), times(1000), moves(3000);
    for (size_t i = 0; i < points.size(); ++i)
        points[i] = float(i), moves[i] = float(i % 7);
    for (size_t i = 0; i < times.size(); ++i)
        times[i] = float(i) / 30;
    auto mesh = [&](int node) {  // 12 KB of points
        tinygltf::Primitive p;
        p.mode = TINYGLTF_MODE_POINTS;
        p.attributes["POSITION"] = b.Floats(points, 3, 0, true);
        b.m.meshes.emplace_back().primitives.push_back(p);
        b.m.nodes[size_t(node)].mesh = int(b.m.meshes.size()) - 1;
    };
    mesh(b.Node("a"));
    b.Channel(0, 0, "translation", times, moves);  // 16 KB between the meshes
    mesh(b.Node("c"));
    Open(b);
    const size_t read = scene.source->document()->model().buffers[0].data.size();
    for (int axis = 0; axis < 3; ++axis)
        Key("a", axis, {{0, 1, 1, 1}, {6000, 2, 1, 1}});
    for (const char* name : {"out.glb", "out.gltf"}) {
        auto back = StoreAndRead(name);
        size_t bytes = 0;
        for (const tinygltf::Buffer& buffer : back->model().buffers)
            bytes += buffer.data.size();
        EXPECT_LT(bytes, read - 15000) << name;
        for (const tinygltf::Mesh& m : back->model().meshes) {
            std::vector<float> got;
            std::string why;
            ASSERT_TRUE(SceneChecker::ReadFloats(
                back->model(), m.primitives[0].attributes.at("POSITION"), 3, &got, &why))
                << why;
            EXPECT_EQ(got, points) << name;
        }
    }
}

// minimum is written as -0.
TEST_F(SceneWriterTest, CurvesStartAtZeroWithoutNegativeZeros) {
    OneNode();
    Key("a", 0, {{-6000, 0, 1, 1}, {-3000, 1, 1, 1}, {3000, 3, 1, 1}});
    const ChannelCurve* tx = scene.source->document()->Curve(0, 0);
    ASSERT_EQ(tx->keys().size(), 2u);
    EXPECT_EQ(tx->keys()[0].time, 0);
    EXPECT_NEAR(tx->Evaluate(0), 2, 1e-9);
    EXPECT_NEAR(tx->Evaluate(0.25), 2.5, 1e-9);
    Key("a", 3, {{-1, 0, 0, 0}, {3000, 30, 0, 0}});
    auto back = StoreAndRead();
    EXPECT_FALSE(std::signbit(WrittenSampler(back->model(), 0, "rotation").times.at(0)));
    EXPECT_FALSE(std::signbit(WrittenSampler(back->model(), 0, "translation").times.at(0)));
    for (const tinygltf::Accessor& acc : back->model().accessors) {
        for (double v : acc.minValues)
            EXPECT_FALSE(std::signbit(v) && v == 0);
    }
}

// A small scene with one rotation key at 359,000 s stays small when driven; a rotation that
// steps over those 100 hours (so that it must be sampled) is refused, naming the file and node,
// and nothing is written.
TEST_F(SceneWriterTest, AFarKeyCostsNothingAndATooLongCurveIsRefused) {
    for (bool turning : {false, true}) {
        ModelBuilder b;
        int a = b.Node("a");
        if (turning)
            b.Channel(0, a, "rotation", {0, 359000}, {0, 0, 0, 1, kQ90X[0], 0, 0, kQ90X[3]},
                      "STEP");
        else
            b.Channel(0, a, "rotation", {359000}, {kQ90X[0], 0, 0, kQ90X[3]});
        Open(b);
        Key("a", 4, {{0, 0, 1, 1}, {6000, 20, 1, 1}});
        if (!turning) {
            EXPECT_LT(ReadFile(dir + "/in.gltf").size(), 1500u);
            auto back = StoreAndRead();
            EXPECT_LT(ReadFile(out).size(), 4000u);
            EXPECT_NEAR(back->Curve(a, 4)->Evaluate(0.5), 10, 1e-3);
            EXPECT_NEAR(back->Curve(a, 3)->Evaluate(100000), 90, 1e-3);
            continue;
        }
        std::string refused = dir + "/refused.gltf";
        testing::internal::CaptureStderr();
        EXPECT_EQ(scene.source->Store(refused.c_str()), 0);
        std::string said = testing::internal::GetCapturedStderr();
        EXPECT_NE(said.find(refused), std::string::npos) << said;
        EXPECT_NE(said.find("node [a]"), std::string::npos) << said;
        EXPECT_FALSE(std::filesystem::exists(refused));
    }
}
