#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <utility>

#include "scene/ChannelCurve.h"
#include "scene/EulerRotation.h"
#include "scene/KLChannel.h"
#include "scene/KLKeyFrameList.h"
#include "toolkit/CueTime.h"

namespace {
using Curve = ChannelCurve;
constexpr Curve::Kind L = Curve::kLinear, S = Curve::kStep, F = Curve::kFlat, M = Curve::kSmooth,
                      E = Curve::kExplicit;

Curve::Key key(double t, double v, Curve::Kind in, Curve::Kind out, double inSlope = 0,
               double outSlope = 0) {
    Curve::Key k;
    k.time = t, k.value = v, k.in = in, k.out = out, k.inSlope = inSlope, k.outSlope = outSlope;
    return k;
}

// Keys and the values the curve must take at the given seconds.
struct CurveCase {
    const char* name;
    std::vector<Curve::Key> keys;
    std::vector<std::pair<double, double>> samples;  // (seconds, value)
};
}  // namespace

class CurveEvaluate : public ::testing::TestWithParam<CurveCase> {};

TEST_P(CurveEvaluate, GivesTheHermiteValueAndItsSlope) {
    Curve c(GetParam().keys);
    const double h = 1e-6;
    for (const auto& [t, value] : GetParam().samples) {
        EXPECT_NEAR(c.Evaluate(t), value, 1e-12) << "at " << t;
        bool atKey = std::any_of(c.keys().begin(), c.keys().end(),
                                 [t = t](const Curve::Key& k) { return k.time == t; });
        if (std::isnan(t) || atKey) {
            continue;
        }
        // Zero where the curve holds, else the difference quotient from either side.
        bool inside = t > c.keys().front().time && t < c.keys().back().time;
        double numeric = inside ? (c.Evaluate(t + h) - c.Evaluate(t - h)) / (2 * h) : 0;
        EXPECT_NEAR(c.SlopeAt(t, true), numeric, 1e-5) << "at " << t;
        EXPECT_NEAR(c.SlopeAt(t, false), numeric, 1e-5) << "at " << t;
    }
}

INSTANTIATE_TEST_SUITE_P(
    Kinds, CurveEvaluate,
    ::testing::Values(
        // Held before the first and after the last key; NaN time gives the first value.
        CurveCase{"Linear",
                  {key(1, 10, L, L), key(2, 20, L, L), key(4, 0, L, L)},
                  {{0, 10}, {1.5, 15}, {2, 20}, {3, 10}, {9, 0}, {NAN, 10}}},
        CurveCase{"StepHoldsLeftValue", {key(0, 1, L, S), key(1, 5, L, S)}, {{0.999, 1}, {1, 5}}},
        CurveCase{"FlatEases", {key(0, 0, F, F), key(1, 1, F, F)}, {{0.5, 0.5}, {0.25, 0.15625}}},
        // Catmull-Rom slope 2 at the middle key, one-sided slope 1 at the first.
        CurveCase{"Smooth", {key(0, 0, M, M), key(1, 1, M, M), key(2, 4, M, M)}, {{0.5, 0.375}}},
        // Out-slope 3, in-slope -1 over 2 s, at u = 0.25.
        CurveCase{"Explicit", {key(0, 0, E, E, 0, 3), key(2, 2, E, E, -1, 0)}, {{0.5, 1.25}}},
        // Linear out of the first key (slope 1), flat into the second.
        CurveCase{"MixedSides", {key(0, 0, L, L), key(1, 1, F, F)}, {{0.5, 0.625}}}),
    [](const ::testing::TestParamInfo<CurveCase>& info) { return info.param.name; });

TEST(ChannelCurve, SlopeSidesKindSummaryFrameRateAndMerge) {
    // At a key the two sides may differ: linear into key 2 (slope 3), smooth out of it
    // ((2 - 1) / 2 through the neighbours); the curve holds before the first key and after
    // the last.
    Curve k({key(0, 0, F, M), key(1, 1, M, L), key(2, 4, L, M), key(3, 2, F, F)});
    EXPECT_NEAR(k.SlopeAt(2, false), 3, 1e-12);
    EXPECT_NEAR(k.SlopeAt(2, true), 0.5, 1e-12);
    EXPECT_EQ(k.SlopeAt(0, false), 0);
    EXPECT_EQ(k.SlopeAt(3, true), 0);

    Curve lin({key(0, 0, L, L), key(1, 30, L, L)});
    EXPECT_TRUE(lin.AllLinear());
    EXPECT_FALSE(lin.AllStep());
    EXPECT_TRUE(Curve({key(0, 1, L, S), key(1, 5, L, S)}).AllStep());
    int saved = CueTime::default_fps;
    CueTime::default_fps = 30;
    EXPECT_DOUBLE_EQ(lin.eval(15), 15);
    CueTime::default_fps = 24;
    EXPECT_DOUBLE_EQ(lin.eval(12), 15);
    CueTime::default_fps = saved;

    Curve c;
    c.Merge(key(1, 1, L, L));
    c.Merge(key(0, 0, L, L));
    c.Merge(key(1 + 1e-9, 7, L, L));  // the same time: replaces
    ASSERT_EQ(c.keys().size(), 2u);
    EXPECT_DOUBLE_EQ(c.keys()[0].time, 0);
    EXPECT_DOUBLE_EQ(c.keys()[1].value, 7);
}

TEST(ChannelCurve, SortedEvaluationMatchesOneByOne) {
    // Keys in order, one at a float-rounded time as read from a file.
    Curve c({key(0.1, 0, F, S), key(double(float(1 / 3.0)), 1, L, M), key(0.5, 2, M, F),
             key(0.9, -1, F, L)});
    std::vector<double> times, out;
    for (int f = -3; f <= 40; ++f) {
        times.push_back(f / 30.0);
    }
    times.push_back(0.95);
    c.EvaluateSorted(times, &out);
    ASSERT_EQ(out.size(), times.size());
    for (size_t i = 0; i < times.size(); ++i) {
        EXPECT_DOUBLE_EQ(out[i], c.Evaluate(times[i])) << times[i];
    }
    EXPECT_DOUBLE_EQ(out[13], 1);  // frame 10 = 1/3 s lands on the float-rounded key
}

TEST(EulerRotation, QuaternionRoundTripGivesBackTheAngles) {
    for (EulerRotation::Vec3 in :
         {EulerRotation::Vec3{90, 0, 0}, {0, 45, 0}, {0, 0, -120}, {30, -20, 170}, {-179, 89, 5}}) {
        EulerRotation::Vec3 out = EulerRotation::ToEuler(EulerRotation::ToQuaternion(in));
        for (size_t a = 0; a < 3; ++a) {
            EXPECT_NEAR(out[a], in[a], 1e-9) << in[0] << " " << in[1] << " " << in[2];
        }
    }
}

TEST(EulerRotation, OrderAndUnwrap) {
    // R = Rz(90) * Rx(90): +Y goes to +Z (X first), +X goes to +Y (then Z). Columns of R.
    EulerRotation::Quat q = EulerRotation::ToQuaternion({90, 0, 90});
    double x = q[0], y = q[1], z = q[2], w = q[3];
    EXPECT_NEAR(2 * (x * y - z * w), 0, 1e-12);
    EXPECT_NEAR(1 - 2 * (x * x + z * z), 0, 1e-12);
    EXPECT_NEAR(2 * (y * z + x * w), 1, 1e-12);
    EXPECT_NEAR(2 * (x * y + z * w), 1, 1e-12);

    EulerRotation::Vec3 u = EulerRotation::Unwrap({170, -350, 0}, {-170, 10, 359});
    EXPECT_EQ(u, (EulerRotation::Vec3{190, -350, -1}));
}

TEST(KLChannel, KeyedAndSplineChannelsHoldOutsideTheirKeys) {
    KLChannel c;
    KLSplineChannel s;
    for (auto [ticks, value] : {std::pair{0, 0.0f}, {600, 10.0f}, {600, 20.0f}}) {
        c.AddKey(CueTime::FromTicks(ticks), value);  // the second key at 600 replaces the first
    }
    EXPECT_EQ(c.KeyCount(), 2);
    EXPECT_FLOAT_EQ(c.Evaluate(CueTime::FromTicks(300)), 10);
    EXPECT_FLOAT_EQ(c.Evaluate(CueTime::FromTicks(-5)), 0);
    EXPECT_FLOAT_EQ(c.Evaluate(CueTime::FromTicks(9000)), 20);
    for (auto [ticks, value] : {std::pair{0, 0.0f}, {100, 1.0f}, {200, 4.0f}}) {
        s.AddKey(CueTime::FromTicks(ticks), value);
    }
    // The same Hermite as the curve's smooth case, in ticks.
    EXPECT_NEAR(s.Evaluate(CueTime::FromTicks(50)), 0.375, 1e-6);
    EXPECT_FLOAT_EQ(s.Evaluate(CueTime::FromTicks(100)), 1);
}

TEST(KLKeyFrameList, RemovingEitherChannelOfAPairRemovesThePair) {
    KLChannel a, b, c, d;
    KLKeyFrameList list({1, 2, 3}, 7);
    list.AddKeyChannel(&a, &b);
    list.AddKeyChannel(&c, &d);
    list.RemoveKeyChannel(&b);  // either channel of a pair removes the pair
    ASSERT_EQ(list.KeyChannels().size(), 1u);
    EXPECT_EQ(list.KeyChannels()[0].first, &c);
}
