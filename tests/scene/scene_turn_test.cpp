// A stored rotation with one turning axis between fixed ones, in each form it is written in
// (cubic pieces, cut or not, or samples), stays within tolerance at every frame and key.
#include <gtest/gtest.h>

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
    int channel;                 // the turning axis: 3 RX, 4 RY, 5 RZ
    std::vector<StoreKey> keys;  // ticks (6000 a second), degrees, tangent codes
    bool steps;                  // every key but the last steps to the next
    const char* interpolation;   // what is written
    bool cut;                    // more knots than keys (cubic pieces cut into parts)
};

class TurnTest : public ::testing::TestWithParam<TurnCase> {
  protected:
    std::string dir = MakeTempDir();
    OpenScene scene;  // 30 frames a second
};

const TurnCase kCases[] = {
    // Smooth, eased and straight pieces over 15 s, turning by 170 degrees in the first 5 s:
    // cut into parts there.
    {"SmoothAndStraight",
     4,
     {{0, -50, 0, 0}, {30000, 120, 0, 1}, {90000, 100, 1, 1}},
     false,
     "CUBICSPLINE",
     true},
    // Keys every three frames swinging both ways, as a lip-sync keyset drives a jaw.
    {"DenseSwings",
     5,
     {{0, 0, 0, 1}, {600, 1, 1, 2}, {1200, -0.5f, 2, 0}, {1800, 0.8f, 0, 0}, {2400, 0, 0, 1}},
     false,
     "CUBICSPLINE",
     false},
    // Two turns a second five minutes in: a float time there is up to 15 microseconds off,
    // which moves a knot by more than the tolerance, so the turn is sampled.
    {"FastTurnLateInAScene",
     4,
     {{1800000, 0, 0, 0}, {1803000, 360, 0, 0}, {1806000, 720, 0, 0}},
     false,
     "LINEAR",
     false},
    // Holds that jump at each key: a spline cannot jump, so the turn is sampled.
    {"Steps", 3, {{0, 0, 1, 1}, {3000, 40, 1, 1}, {9000, -10, 1, 1}}, true, "LINEAR", false},
};
}  // namespace

TEST_P(TurnTest, StaysWithinToleranceAtEveryFrameAndKey) {
    const TurnCase& c = GetParam();
    ModelBuilder b;
    b.Node("a");
    ASSERT_TRUE(b.Save(dir + "/in.gltf"));
    ASSERT_TRUE(scene.Open(dir + "/in.gltf"));
    Node a = scene.Fetch("a");
    // The other two axes are held at angles of their own.
    const float fixed[3] = {30, -50, -20};
    for (int channel = 3; channel < 6; ++channel) {
        if (channel != c.channel) {
            ASSERT_EQ(StoreKeys(a.get(), channel, {{0, fixed[channel - 3], 1, 1}}), 1);
        }
    }
    ASSERT_EQ(StoreKeys(a.get(), c.channel, c.keys), 1);
    SceneDocument& doc = *scene.source->document();
    if (c.steps) {
        std::vector<ChannelCurve::Key> keys = doc.Curve(0, c.channel)->keys();
        for (size_t k = 0; k + 1 < keys.size(); ++k) {
            keys[k].out = ChannelCurve::kStep;
        }
        doc.SetCurve(0, c.channel, keys, true);
    }
    const std::string out = dir + "/out.glb";
    ASSERT_EQ(scene.source->Store(out.c_str()), 1);
    std::string error;
    auto back = SceneDocument::Load(out, &error);
    ASSERT_TRUE(back) << error;
    ExpectValidGltf(out);

    Written rot = WrittenSampler(back->model(), 0, "rotation");
    EXPECT_EQ(rot.interpolation, c.interpolation);
    const ChannelCurve& turn = *doc.Curve(0, c.channel);
    if (rot.interpolation == "CUBICSPLINE") {
        EXPECT_EQ(rot.times.size() > c.keys.size(), c.cut) << rot.times.size() << " knots";
        EXPECT_EQ(rot.times.front(), float(turn.keys().front().time));
        EXPECT_EQ(rot.times.back(), float(turn.keys().back().time));
    }
    // Every frame from a second before the first key to a second after the last, every key.
    std::vector<double> checks;
    const double first = turn.keys().front().time, last = turn.keys().back().time;
    for (double f = std::floor(first * 30) - 30; f <= std::ceil(last * 30) + 30; ++f) {
        checks.push_back(f / 30);
    }
    for (const ChannelCurve::Key& k : turn.keys()) {
        checks.push_back(k.time);
    }
    for (double t : checks) {
        EulerRotation::Vec3 angles = {fixed[0], fixed[1], fixed[2]};
        angles[size_t(c.channel - 3)] = turn.Evaluate(t);
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
