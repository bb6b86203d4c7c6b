#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <utility>

#include "scene/ChannelCurve.h"
#include "scene/CurveCursor.h"
#include "scene/EulerRotation.h"
#include "scene/HermiteSegment.h"
#include "scene/KLChannel.h"
#include "scene/KLSplineChannel.h"
#include "toolkit/CueTime.h"

namespace {
using Curve = ChannelCurve;
using Keys = std::vector<Curve::Key>;  // time (s), value, in, out, in-slope, out-slope
constexpr Curve::Kind L = Curve::kLinear, S = Curve::kStep, F = Curve::kFlat, M = Curve::kSmooth,
                      E = Curve::kExplicit;

struct CurveCase {
    const char* name;
    Keys keys;
    std::vector<std::pair<double, double>> samples;  // (seconds, value)
};
}  // namespace

class CurveEvaluate : public ::testing::TestWithParam<CurveCase> {};

// Hand-computed values; SlopeAt from either side against the difference quotient.
TEST_P(CurveEvaluate, GivesTheHermiteValueItsSlopeAndTheSameInOnePass) {
    Curve c(GetParam().keys);
    for (const auto& [t, value] : GetParam().samples) {
        EXPECT_NEAR(c.Evaluate(t), value, 1e-12) << "at " << t;
        bool atKey = std::any_of(c.keys().begin(), c.keys().end(),
                                 [t = t](const Curve::Key& k) { return k.time == t; });
        if (std::isnan(t) || atKey)
            continue;
        bool inside = t > c.keys().front().time && t < c.keys().back().time;
        double numeric = inside ? (c.Evaluate(t + 1e-6) - c.Evaluate(t - 1e-6)) / 2e-6 : 0;
        EXPECT_NEAR(c.SlopeAt(t, true), numeric, 1e-5) << "at " << t;
        EXPECT_NEAR(c.SlopeAt(t, false), numeric, 1e-5) << "at " << t;
    }
    // The one-pass sampling gives what Evaluate and SlopeAt give one time at a time: at every
    // key (where the sides differ), within float rounding of a key, between keys (several times
    // in one segment) and outside the keys. MaxSlope bounds the slope everywhere.
    std::vector<double> times = {-1.0};
    for (const Curve::Key& k : c.keys()) {
        for (double d : {-0.3, -1e-8, 0.0, 1e-8, 0.25, 0.5})
            times.push_back(k.time + d);
    }
    times.push_back(c.keys().back().time + 5);
    std::sort(times.begin(), times.end());
    CurveCursor cursor(c);
    std::vector<double> values;
    for (double t : times) {
        const CurveCursor::Point p = cursor.At(t);
        values.push_back(p.value);
        EXPECT_NEAR(p.value, c.Evaluate(t), 1e-12) << "at " << t;
        EXPECT_NEAR(p.arriving, c.SlopeAt(t, false), 1e-9) << "at " << t;
        EXPECT_NEAR(p.leaving, c.SlopeAt(t, true), 1e-9) << "at " << t;
    }
    std::vector<double> only;
    c.EvaluateSorted(times, &only);
    EXPECT_EQ(only, values);
    double steepest = 0;
    const double from = c.keys().front().time, to = c.keys().back().time;
    for (int i = 0; i <= 20000; ++i) {
        const double t = from + (to - from) * i / 20000;
        steepest =
            std::max({steepest, std::fabs(c.SlopeAt(t, true)), std::fabs(c.SlopeAt(t, false))});
    }
    EXPECT_GE(c.MaxSlope(), steepest * (1 - 1e-12));
}

INSTANTIATE_TEST_SUITE_P(
    Kinds, CurveEvaluate,
    ::testing::Values(
        // Held before the first and after the last key; NaN time gives the first value.
        CurveCase{"Linear",
                  {{1, 10, L, L}, {2, 20, L, L}, {4, 0, L, L}},
                  {{0, 10}, {1.5, 15}, {2, 20}, {3, 10}, {9, 0}, {NAN, 10}}},
        CurveCase{"StepHoldsLeftValue", {{0, 1, L, S}, {1, 5, L, S}}, {{0.999, 1}, {1, 5}}},
        CurveCase{"FlatEases", {{0, 0, F, F}, {1, 1, F, F}}, {{0.5, 0.5}, {0.25, 0.15625}}},
        // Catmull-Rom slope 2 at the middle key, one-sided slope 1 at the first.
        CurveCase{"Smooth", {{0, 0, M, M}, {1, 1, M, M}, {2, 4, M, M}}, {{0.5, 0.375}}},
        // Out-slope 3, in-slope -1 over 2 s, at u = 0.25.
        CurveCase{"Explicit", {{0, 0, E, E, 0, 3}, {2, 2, E, E, -1, 0}}, {{0.5, 1.25}}},
        // Linear out of the first key (slope 1), flat into the second.
        CurveCase{"MixedSides", {{0, 0, L, L}, {1, 1, F, F}}, {{0.5, 0.625}}}),
    [](const ::testing::TestParamInfo<CurveCase>& info) { return info.param.name; });

// At a key the sides differ: linear into key 2 (slope 3), smooth out of it ((2 - 1) / 2).
// eval takes frames of the current frame rate. A key at the time of another replaces it.
TEST(ChannelCurve, SlopeSidesFrameRateAndMerge) {
    Curve k({{0, 0, F, M}, {1, 1, M, L}, {2, 4, L, M}, {3, 2, F, F}});
    EXPECT_NEAR(k.SlopeAt(2, false), 3, 1e-12);
    EXPECT_NEAR(k.SlopeAt(2, true), 0.5, 1e-12);
    const int saved = CueTime::default_fps;
    CueTime::default_fps = 24;
    EXPECT_DOUBLE_EQ(Curve({{0, 0, L, L}, {1, 30, L, L}}).eval(12), 15);
    CueTime::default_fps = saved;
    Curve c;
    for (Curve::Key key : Keys{{1, 1}, {0, 0}, {1 + 1e-9, 7}})
        c.Merge(key);
    ASSERT_EQ(c.keys().size(), 2u);
    EXPECT_DOUBLE_EQ(c.keys()[0].time, 0);
    EXPECT_DOUBLE_EQ(c.keys()[1].value, 7);
}

// Key times of several curves as a file stores them, floats: times that round to one float are
// one time (the earliest), a curve keyed where the union already is adds nothing, and the union
// can stop at a time. The first key after a time skips keys on that time's float.
TEST(ChannelCurve, UnionOfKeyTimesAndFirstKeyAfter) {
    const double tenth = double(float(0.1));  // a file's 0.1, a little above the keyset's
    ASSERT_NE(tenth, 0.1);
    Curve a({{0, 0}, {0.1, 1}, {0.2, 0}, {0.3, 1}}), b({{tenth, 2}, {0.15, 1}, {0.35, 0}});
    Curve same(a.keys());
    const Curve* curves[] = {&a, nullptr, &b, &same};
    EXPECT_EQ(Curve::UnionTimes(curves, 4), (std::vector<double>{0, 0.1, 0.15, 0.2, 0.3, 0.35}));
    EXPECT_EQ(Curve::UnionTimes(curves, 4, 0.2), (std::vector<double>{0, 0.1, 0.15, 0.2}));
    const Curve* fileFirst[] = {&b, &a};
    EXPECT_EQ(Curve::UnionTimes(fileFirst, 2, 0.12), (std::vector<double>{0, 0.1}));
    EXPECT_EQ(a.FirstKeyAfter(-1), 0u);
    EXPECT_EQ(a.FirstKeyAfter(0.1), 2u);
    EXPECT_EQ(a.FirstKeyAfter(tenth), 2u);
    EXPECT_EQ(b.FirstKeyAfter(0.1), 1u);
    EXPECT_EQ(a.FirstKeyAfter(0.25), 3u);
    EXPECT_EQ(a.FirstKeyAfter(0.3), 4u);
}

// A segment's peak slope is the largest slope along it, and the division-free bound is never
// under it: both reached where they are tight (a bump with flat ends peaks at its middle at
// exactly the bound), and held on segments of every shape.
TEST(HermiteCubic, PeakSlopeAndItsDivisionFreeBound) {
    EXPECT_EQ(HermiteCubic(3, 3, 0, 0).PeakSlope(), 0);
    const HermiteCubic there(0, 0, 2, 2);  // out and back: slope 2 - 12u + 12u²
    EXPECT_NEAR(there.PeakSlope(), 2, 1e-12);
    const HermiteCubic flatEnds(0, 1, 0, 0);  // slope 6u(1 - u): 1.5 at the middle
    EXPECT_NEAR(flatEnds.PeakSlope(), 1.5, 1e-12);
    EXPECT_NEAR(flatEnds.SlopeBound(), 1.5, 1e-12);
    unsigned seed = 7;
    auto next = [&seed] {
        seed = seed * 1103515245u + 12345u;
        return double(seed >> 8 & 0xFFFF) / 0x8000 - 1;  // -1 .. 1
    };
    for (int i = 0; i < 2000; ++i) {
        const HermiteCubic h(next() * 4, next() * 4, next() * 8, next() * 8);
        double most = 0;
        for (int j = 0; j <= 200; ++j) {
            most = std::max(most, std::fabs(h.SlopeAt(j / 200.0)));
        }
        ASSERT_GE(h.PeakSlope(), most - 1e-9) << i;
        ASSERT_LE(h.PeakSlope(), most + 0.01 * (1 + most)) << i;  // the grid misses a little
        ASSERT_GE(h.SlopeBound(), h.PeakSlope() - 1e-9) << i;
    }
}

// The angles apply X first, then Z: R = Rz(90) * Rx(90) takes +Y to +Z and +X to +Y (columns
// of R); unwrapping moves each angle by whole turns towards the previous one.
TEST(EulerRotation, OrderAndUnwrap) {
    auto [x, y, z, w] = EulerRotation::ToQuaternion({90, 0, 90});
    EXPECT_NEAR(2 * (x * y - z * w), 0, 1e-12);
    EXPECT_NEAR(1 - 2 * (x * x + z * z), 0, 1e-12);
    EXPECT_NEAR(2 * (y * z + x * w), 1, 1e-12);
    EXPECT_NEAR(2 * (x * y + z * w), 1, 1e-12);
    EXPECT_EQ(EulerRotation::Unwrap({170, -350, 0}, {-170, 10, 359}),
              (EulerRotation::Vec3{190, -350, -1}));
}

// The preview's channels: a key at the time of another replaces it; the spline channel gives
// the Smooth case above, in ticks.
TEST(PreviewChannels, KeyedAndSpline) {
    KLChannel c;
    KLSplineChannel s;
    c.AddKey(CueTime::FromTicks(600), 10);
    c.AddKey(CueTime::FromTicks(600), 20);
    EXPECT_EQ(c.KeyCount(), 1);
    EXPECT_FLOAT_EQ(c.Evaluate(CueTime::FromTicks(0)), 20);
    for (int i : {0, 1, 2})
        s.AddKey(CueTime::FromTicks(100 * i), float(i * i));
    EXPECT_NEAR(s.Evaluate(CueTime::FromTicks(50)), 0.375, 1e-6);
}
