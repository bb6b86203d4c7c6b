#include <gtest/gtest.h>

#include <cmath>

#include "scene/ChannelCurve.h"
#include "scene/EulerRotation.h"
#include "scene/KLChannel.h"
#include "scene/KLGraphNode.h"
#include "scene/KLKeyFrameList.h"
#include "toolkit/CueTime.h"

namespace {
ChannelCurve::Key key(double t, double v, ChannelCurve::Kind in, ChannelCurve::Kind out) {
    ChannelCurve::Key k;
    k.time = t;
    k.value = v;
    k.in = in;
    k.out = out;
    return k;
}
}  // namespace

TEST(ChannelCurve, LinearHoldsOutsideAndInterpolatesInside) {
    ChannelCurve c({key(1, 10, ChannelCurve::kLinear, ChannelCurve::kLinear),
                    key(2, 20, ChannelCurve::kLinear, ChannelCurve::kLinear),
                    key(4, 0, ChannelCurve::kLinear, ChannelCurve::kLinear)});
    EXPECT_DOUBLE_EQ(c.Evaluate(0), 10);
    EXPECT_DOUBLE_EQ(c.Evaluate(1.5), 15);
    EXPECT_DOUBLE_EQ(c.Evaluate(2), 20);
    EXPECT_DOUBLE_EQ(c.Evaluate(3), 10);
    EXPECT_DOUBLE_EQ(c.Evaluate(9), 0);
    EXPECT_DOUBLE_EQ(c.Evaluate(NAN), 10);
    EXPECT_TRUE(c.AllLinear());
    EXPECT_FALSE(c.AllStep());
}

TEST(ChannelCurve, StepHoldsLeftValueUntilNextKey) {
    ChannelCurve c({key(0, 1, ChannelCurve::kLinear, ChannelCurve::kStep),
                    key(1, 5, ChannelCurve::kLinear, ChannelCurve::kStep)});
    EXPECT_DOUBLE_EQ(c.Evaluate(0.999), 1);
    EXPECT_DOUBLE_EQ(c.Evaluate(1.0), 5);
    EXPECT_TRUE(c.AllStep());
}

TEST(ChannelCurve, FlatTangentsEaseInAndOut) {
    ChannelCurve c({key(0, 0, ChannelCurve::kFlat, ChannelCurve::kFlat),
                    key(1, 1, ChannelCurve::kFlat, ChannelCurve::kFlat)});
    EXPECT_NEAR(c.Evaluate(0.5), 0.5, 1e-12);
    EXPECT_NEAR(c.Evaluate(0.25), 0.15625, 1e-12);  // 3u^2 - 2u^3
    EXPECT_DOUBLE_EQ(c.OutSlope(0), 0);
}

TEST(ChannelCurve, SmoothUsesSlopeThroughNeighbours) {
    ChannelCurve c({key(0, 0, ChannelCurve::kSmooth, ChannelCurve::kSmooth),
                    key(1, 1, ChannelCurve::kSmooth, ChannelCurve::kSmooth),
                    key(2, 4, ChannelCurve::kSmooth, ChannelCurve::kSmooth)});
    EXPECT_DOUBLE_EQ(c.OutSlope(1), 2.0);  // (4 - 0) / 2
    EXPECT_DOUBLE_EQ(c.InSlope(1), 2.0);
    EXPECT_DOUBLE_EQ(c.OutSlope(0), 1.0);  // one-sided at the ends
    // Hermite from (0,0,m0=1) to (1,1,m1=2) at u = 0.5: 0.125*1 + 0.5 - 0.125*2.
    EXPECT_NEAR(c.Evaluate(0.5), 0.375, 1e-12);
}

TEST(ChannelCurve, ExplicitCubicMatchesHermiteAndMixedSidesCombine) {
    ChannelCurve::Key a = key(0, 0, ChannelCurve::kExplicit, ChannelCurve::kExplicit);
    ChannelCurve::Key b = key(2, 2, ChannelCurve::kExplicit, ChannelCurve::kExplicit);
    a.outSlope = 3;
    b.inSlope = -1;
    ChannelCurve c({a, b});
    double u = 0.25, dt = 2;
    double want = (u * u * u - 2 * u * u + u) * 3 * dt + (-2 * u * u * u + 3 * u * u) * 2 +
                  (u * u * u - u * u) * -1 * dt;
    EXPECT_NEAR(c.Evaluate(0.5), want, 1e-12);
    // Linear out of the first key, flat into the second: slope 1 then 0.
    ChannelCurve m({key(0, 0, ChannelCurve::kLinear, ChannelCurve::kLinear),
                    key(1, 1, ChannelCurve::kFlat, ChannelCurve::kFlat)});
    EXPECT_NEAR(m.Evaluate(0.5), 0.125 + 0.5, 1e-12);
}

TEST(ChannelCurve, EvalTakesFramesAtDefaultRate) {
    ChannelCurve c({key(0, 0, ChannelCurve::kLinear, ChannelCurve::kLinear),
                    key(1, 30, ChannelCurve::kLinear, ChannelCurve::kLinear)});
    int saved = CueTime::default_fps;
    CueTime::default_fps = 30;
    EXPECT_DOUBLE_EQ(c.eval(15), 15);
    CueTime::default_fps = 24;
    EXPECT_DOUBLE_EQ(c.eval(12), 15);
    CueTime::default_fps = saved;
}

TEST(ChannelCurve, MergeReplacesKeyAtSameTimeAndKeepsOrder) {
    ChannelCurve c;
    c.Merge(key(1, 1, ChannelCurve::kLinear, ChannelCurve::kLinear));
    c.Merge(key(0, 0, ChannelCurve::kLinear, ChannelCurve::kLinear));
    c.Merge(key(1 + 1e-9, 7, ChannelCurve::kLinear, ChannelCurve::kLinear));
    ASSERT_EQ(c.keys().size(), 2u);
    EXPECT_DOUBLE_EQ(c.keys()[0].time, 0);
    EXPECT_DOUBLE_EQ(c.keys()[1].value, 7);
}

TEST(ChannelCurve, SortedEvaluationMatchesOneByOne) {
    // Keys in order, one at a float-rounded time as read from a file.
    ChannelCurve c({key(0.1, 0, ChannelCurve::kFlat, ChannelCurve::kStep),
                    key(double(float(1 / 3.0)), 1, ChannelCurve::kLinear, ChannelCurve::kSmooth),
                    key(0.5, 2, ChannelCurve::kSmooth, ChannelCurve::kFlat),
                    key(0.9, -1, ChannelCurve::kFlat, ChannelCurve::kLinear)});
    std::vector<double> times;
    for (int f = -3; f <= 40; ++f) {
        times.push_back(f / 30.0);
    }
    times.push_back(0.95);
    std::vector<double> out;
    c.EvaluateSorted(times, &out);
    ASSERT_EQ(out.size(), times.size());
    for (size_t i = 0; i < times.size(); ++i) {
        EXPECT_DOUBLE_EQ(out[i], c.Evaluate(times[i])) << times[i];
    }
    EXPECT_DOUBLE_EQ(out[13], 1);  // frame 10 = 1/3 s lands on the float-rounded key
}

TEST(ChannelCurve, SlopeMatchesDifferenceQuotientAndHoldsOutside) {
    ChannelCurve c({key(0, 0, ChannelCurve::kFlat, ChannelCurve::kSmooth),
                    key(1, 1, ChannelCurve::kSmooth, ChannelCurve::kLinear),
                    key(2, 4, ChannelCurve::kLinear, ChannelCurve::kFlat),
                    key(3, 2, ChannelCurve::kFlat, ChannelCurve::kFlat)});
    const double h = 1e-6;
    for (double t : {0.25, 0.5, 1.5, 2.2, 2.9}) {
        double numeric = (c.Evaluate(t + h) - c.Evaluate(t - h)) / (2 * h);
        EXPECT_NEAR(c.SlopeAt(t, true), numeric, 1e-5) << t;
        EXPECT_NEAR(c.SlopeAt(t, false), numeric, 1e-5) << t;
    }
    // At a key the two sides may differ: linear into key 2 (slope 3), smooth out of it.
    EXPECT_NEAR(c.SlopeAt(2, false), 3, 1e-12);
    EXPECT_NEAR(c.SlopeAt(2, true), c.OutSlope(2), 1e-12);
    EXPECT_EQ(c.SlopeAt(-1, true), 0);
    EXPECT_EQ(c.SlopeAt(0, false), 0);
    EXPECT_EQ(c.SlopeAt(3, true), 0);
    EXPECT_EQ(c.SlopeAt(5, false), 0);
}

class EulerRoundTrip : public ::testing::TestWithParam<std::array<double, 3>> {};

TEST_P(EulerRoundTrip, QuaternionGivesBackTheAngles) {
    EulerRotation::Vec3 in = GetParam();
    EulerRotation::Vec3 out = EulerRotation::ToEuler(EulerRotation::ToQuaternion(in));
    for (int a = 0; a < 3; ++a) {
        EXPECT_NEAR(out[size_t(a)], in[size_t(a)], 1e-9) << "axis " << a;
    }
}

INSTANTIATE_TEST_SUITE_P(
    Angles, EulerRoundTrip,
    ::testing::Values(std::array<double, 3>{0, 0, 0}, std::array<double, 3>{90, 0, 0},
                      std::array<double, 3>{0, 45, 0}, std::array<double, 3>{0, 0, -120},
                      std::array<double, 3>{30, -20, 170}, std::array<double, 3>{-179, 89, 5}));

TEST(EulerRotation, OrderIsXThenYThenZ) {
    // 90 about X then 90 about Z maps +Y to +Z first, +Z stays: check through the quaternion
    // of R = Rz * Ry * Rx applied to the unit Y axis.
    EulerRotation::Quat q = EulerRotation::ToQuaternion({90, 0, 90});
    double x = q[0], y = q[1], z = q[2], w = q[3];
    // Second column of the rotation matrix = image of +Y.
    double iy[3] = {2 * (x * y - z * w), 1 - 2 * (x * x + z * z), 2 * (y * z + x * w)};
    EXPECT_NEAR(iy[0], 0, 1e-12);
    EXPECT_NEAR(iy[1], 0, 1e-12);
    EXPECT_NEAR(iy[2], 1, 1e-12);
    // Image of +X: X is untouched by Rx, then Rz(90) takes it to +Y.
    double ix[3] = {1 - 2 * (y * y + z * z), 2 * (x * y + z * w), 2 * (x * z - y * w)};
    EXPECT_NEAR(ix[1], 1, 1e-12);
}

TEST(EulerRotation, UnwrapMovesByWholeTurns) {
    EulerRotation::Vec3 u = EulerRotation::Unwrap({170, -350, 0}, {-170, 10, 359});
    EXPECT_DOUBLE_EQ(u[0], 190);
    EXPECT_DOUBLE_EQ(u[1], -350);
    EXPECT_DOUBLE_EQ(u[2], -1);
}

TEST(EulerRotation, DecomposeMatrix) {
    // Scale 2 on X, rotation 90 about Z, translation (1, 2, 3); column major.
    double m[16] = {0, 2, 0, 0, -1, 0, 0, 0, 0, 0, 1, 0, 1, 2, 3, 1};
    EulerRotation::Vec3 t, s;
    EulerRotation::Quat r;
    EulerRotation::Decompose(m, &t, &r, &s);
    EXPECT_DOUBLE_EQ(t[2], 3);
    EXPECT_NEAR(s[0], 2, 1e-12);
    EXPECT_NEAR(s[1], 1, 1e-12);
    EXPECT_NEAR(EulerRotation::ToEuler(r)[2], 90, 1e-9);
}

TEST(KLChannel, KeyedStaticAndSpline) {
    KLChannel c;
    c.SetStorageKeyed();
    c.AddKey(CueTime::FromTicks(0), 0);
    c.AddKey(CueTime::FromTicks(600), 10);
    c.AddKey(CueTime::FromTicks(600), 20);  // replaces
    EXPECT_EQ(c.KeyCount(), 2);
    EXPECT_FLOAT_EQ(c.Evaluate(CueTime::FromTicks(300)), 10);
    EXPECT_FLOAT_EQ(c.Evaluate(CueTime::FromTicks(-5)), 0);
    EXPECT_FLOAT_EQ(c.Evaluate(CueTime::FromTicks(9000)), 20);
    c.SetStatic(true);
    c.SetValue(CueTime::FromTicks(0), 3);
    EXPECT_FLOAT_EQ(c.Evaluate(CueTime::FromTicks(300)), 3);
    c.SetStatic(false);
    c.ClearAnimation();
    EXPECT_EQ(c.KeyCount(), 0);

    KLSplineChannel s;
    s.SetStorageKeyed();
    s.AddKey(CueTime::FromTicks(0), 0);
    s.AddKey(CueTime::FromTicks(100), 1);
    s.AddKey(CueTime::FromTicks(200), 4);
    // Same Hermite as the scene curve's smooth test, in ticks.
    EXPECT_NEAR(s.Evaluate(CueTime::FromTicks(50)), 0.375, 1e-6);
    EXPECT_FLOAT_EQ(s.Evaluate(CueTime::FromTicks(100)), 1);
}

TEST(KLKeyFrameList, RemoveEitherChannelOfAPair) {
    KLChannel a, b, c, d;
    KLKeyFrameList list({1, 2, 3}, 7);
    list.AddKeyChannel(&a, &b);
    list.AddKeyChannel(&c, &d);
    list.RemoveKeyChannel(&b);
    ASSERT_EQ(list.KeyChannels().size(), 1u);
    EXPECT_EQ(list.KeyChannels()[0].first, &c);
    EXPECT_EQ(list.ExtraFrame(), 7);
}

TEST(KLTransform, ChannelsMadeOnRequest) {
    KLGraphNode n("jaw");
    EXPECT_EQ(n.Transform()->Channel(3), nullptr);
    KLChannel* c = n.Transform()->AnimateChannel(3);
    ASSERT_NE(c, nullptr);
    EXPECT_TRUE(c->StorageKeyed());
    EXPECT_EQ(n.Transform()->Channel(3), c);
    EXPECT_EQ(n.Transform()->AnimateChannel(9), nullptr);
    EXPECT_EQ(n.Transform()->AnimateChannel(-1), nullptr);
}
