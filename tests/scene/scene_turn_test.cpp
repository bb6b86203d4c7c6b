// A stored rotation turning about one axis between fixed ones, or about several, in each form
// it is written in (cubic pieces, cut or not, or samples), stays within tolerance at every frame
// and key.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <string>
#include <vector>

#include "scene/EulerRotation.h"
#include "scene/SamplerBuilder.h"
#include "scene/SceneDocument.h"
#include "scene/scene_builder_util.h"
#include "scene/scene_util.h"
#include "scene/written_sampler.h"

namespace {
struct TurnCase {
    const char* name;
    std::vector<StoreKey> keys[3];  // RX RY RZ: ticks (6000 a second), degrees, tangent codes;
                                    // none: held at an angle of its own
    bool steps;                     // every X key but the last steps to the next
    const char* interpolation;      // what is written
    bool cut;                       // more knots than key times (cubic pieces cut into parts)
};

void PrintTo(const TurnCase& c, std::ostream* os) {
    *os << c.name;
}

class TurnTest : public ::testing::TestWithParam<TurnCase> {
  protected:
    std::string dir = MakeTempDir();
    OpenScene scene;  // 30 frames a second
};

const TurnCase kCases[] = {
    // Smooth, eased and straight pieces over 15 s, turning by 170 degrees in the first 5 s:
    // cut into parts there.
    {"SmoothAndStraight",
     {{}, {{0, -50, 0, 0}, {30000, 120, 0, 1}, {90000, 100, 1, 1}}, {}},
     false,
     "CUBICSPLINE",
     true},
    // Keys every three frames swinging both ways, as a lip-sync keyset drives a jaw.
    {"DenseSwings",
     {{},
      {},
      {{0, 0, 0, 1}, {600, 1, 1, 2}, {1200, -0.5f, 2, 0}, {1800, 0.8f, 0, 0}, {2400, 0, 0, 1}}},
     false,
     "CUBICSPLINE",
     false},
    // Two turns a second five minutes in: a float time there is up to 15 microseconds off,
    // which moves a knot by more than the tolerance, so the turn is sampled.
    {"FastTurnLateInAScene",
     {{}, {{1800000, 0, 0, 0}, {1803000, 360, 0, 0}, {1806000, 720, 0, 0}}, {}},
     false,
     "LINEAR",
     false},
    // Holds that jump at each key: a spline cannot jump, so the turn is sampled.
    {"Steps", {{{0, 0, 1, 1}, {3000, 40, 1, 1}, {9000, -10, 1, 1}}, {}, {}}, true, "LINEAR", false},
    // A head nodding, shaking and tilting at once, keyed every three frames on every axis:
    // pieces cut finely enough would outnumber the frames, so it is sampled.
    {"ThreeAxesDense",
     {{{0, 0, 0, 0}, {600, 4, 0, 1}, {1200, -3, 1, 2}, {1800, 5, 2, 0}, {2400, 0, 0, 0}},
      {{0, 10, 1, 1}, {600, 14, 0, 0}, {1200, 6, 0, 2}, {1800, 12, 2, 1}, {2400, 10, 1, 0}},
      {{0, -5, 2, 0}, {600, -2, 0, 0}, {1200, -8, 0, 1}, {1800, -5, 1, 1}, {2400, -6, 0, 0}}},
     false,
     "LINEAR",
     false},
    // The same head swaying gently: cubic pieces, some cut.
    {"ThreeAxesGentle",
     {{{0, 0, 0, 0}, {600, 0.4f, 0, 1}, {1200, -0.3f, 1, 2}, {1800, 0.5f, 2, 0}, {2400, 0, 0, 0}},
      {{0, 10, 1, 1},
       {600, 10.4f, 0, 0},
       {1200, 9.6f, 0, 2},
       {1800, 10.2f, 2, 1},
       {2400, 10, 1, 0}},
      {{0, -5, 2, 0},
       {600, -4.7f, 0, 0},
       {1200, -5.8f, 0, 1},
       {1800, -5, 1, 1},
       {2400, -5.1f, 0, 0}}},
     false,
     "CUBICSPLINE",
     true},
    // Big tumbles about two axes keyed at different times: pieces at the union of the key
    // times, cut into parts where they turn fast.
    {"TwoAxesAtDifferentTimes",
     {{{0, 0, 0, 0}, {30000, 120, 0, 1}, {60000, -20, 1, 0}},
      {},
      {{9000, -40, 0, 0}, {21000, 60, 2, 2}, {45000, 30, 0, 0}}},
     false,
     "CUBICSPLINE",
     true},
};
}  // namespace

TEST_P(TurnTest, StaysWithinToleranceAtEveryFrameAndKey) {
    const TurnCase& c = GetParam();
    ModelBuilder b;
    b.Node("a");
    ASSERT_TRUE(b.Save(dir + "/in.gltf"));
    ASSERT_TRUE(scene.Open(dir + "/in.gltf"));
    Node a = scene.Fetch("a");
    const float fixed[3] = {30, -50, -20};  // the angles of axes without keys of their own
    for (int axis = 0; axis < 3; ++axis) {
        const std::vector<StoreKey>& keys = c.keys[axis];
        ASSERT_EQ(StoreKeys(a.get(), 3 + axis,
                            keys.empty() ? std::vector<StoreKey>{{0, fixed[axis], 1, 1}} : keys),
                  1);
    }
    SceneDocument& doc = *scene.source->document();
    if (c.steps) {
        std::vector<ChannelCurve::Key> keys = doc.Curve(0, 3)->keys();
        for (size_t k = 0; k + 1 < keys.size(); ++k) {
            keys[k].out = ChannelCurve::kStep;
        }
        doc.SetCurve(0, 3, keys, true);
    }
    const std::string out = dir + "/out.glb";
    ASSERT_EQ(scene.source->Store(out.c_str()), 1);
    std::string error;
    auto back = SceneDocument::Load(out, &error);
    ASSERT_TRUE(back) << error;
    ExpectValidGltf(out);

    Written rot = WrittenSampler(back->model(), 0, "rotation");
    EXPECT_EQ(rot.interpolation, c.interpolation);
    // Every frame from a second before the first key to a second after the last, every key.
    std::vector<double> checks, keys;
    for (int axis = 0; axis < 3; ++axis) {
        for (const ChannelCurve::Key& k : doc.Curve(0, 3 + axis)->keys()) {
            keys.push_back(k.time);
        }
    }
    std::sort(keys.begin(), keys.end());
    keys.erase(std::unique(keys.begin(), keys.end()), keys.end());
    if (rot.interpolation == "CUBICSPLINE") {
        EXPECT_EQ(rot.times.size() > keys.size(), c.cut) << rot.times.size() << " knots";
        EXPECT_EQ(rot.times.front(), float(keys.front()));
        EXPECT_EQ(rot.times.back(), float(keys.back()));
    }
    for (double f = std::floor(keys.front() * 30) - 30; f <= std::ceil(keys.back() * 30) + 30;
         ++f) {
        checks.push_back(f / 30);
    }
    checks.insert(checks.end(), keys.begin(), keys.end());
    for (double t : checks) {
        EulerRotation::Vec3 angles;
        for (int axis = 0; axis < 3; ++axis) {
            angles[size_t(axis)] = doc.Curve(0, 3 + axis)->Evaluate(t);
        }
        std::vector<double> got = SampleAt(rot, t, 4);
        ASSERT_LE(EulerRotation::AngleBetween(EulerRotation::ToQuaternion(angles),
                                              {got[0], got[1], got[2], got[3]}),
                  SamplerBuilder::kRotationToleranceDegrees)
            << "at " << t << " s";
    }
}

INSTANTIATE_TEST_SUITE_P(Forms, TurnTest, ::testing::ValuesIn(kCases),
                         [](const ::testing::TestParamInfo<TurnCase>& info) {
                             return std::string(info.param.name);
                         });
