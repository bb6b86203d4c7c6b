#include "model/InterpEase.h"

#include <gtest/gtest.h>

#include <cmath>
#include <tuple>

namespace {

struct Params {
    float e1;
    float e2;
};

class InterpEaseParams : public ::testing::TestWithParam<Params> {};

TEST_P(InterpEaseParams, EndsAreExact) {
    const Params p = GetParam();
    EXPECT_EQ(interp_ease(0.0f, 0.3f, 7.1f, p.e1, p.e2), 0.3f);
    EXPECT_EQ(interp_ease(1.0f, 0.3f, 7.1f, p.e1, p.e2), 7.1f);
    EXPECT_EQ(interp_ease(0.0f, -4.0f, -9.0f, p.e1, p.e2), -4.0f);
    EXPECT_EQ(interp_ease(1.0f, -4.0f, -9.0f, p.e1, p.e2), -9.0f);
}

// The pieces meet at e1 and e2 with the values e1/D and (2 e2 - e1)/D, and approach 0 and 1
// at the ends without a jump.
TEST_P(InterpEaseParams, ContinuousAtJoinsAndEnds) {
    const Params p = GetParam();
    const double d = 1.0 + p.e2 - p.e1;
    if (p.e1 > 0.0f) {
        EXPECT_NEAR(interp_ease(p.e1, 0, 1, p.e1, p.e2), p.e1 / d, 1e-6);
        EXPECT_NEAR(interp_ease(std::nextafter(p.e1, 0.0f), 0, 1, p.e1, p.e2), p.e1 / d, 1e-5);
        EXPECT_NEAR(interp_ease(std::nextafter(p.e1, 1.0f), 0, 1, p.e1, p.e2), p.e1 / d, 1e-5);
        EXPECT_NEAR(interp_ease(1e-6f, 0, 1, p.e1, p.e2), 0.0, 1e-5);
    }
    if (p.e2 < 1.0f) {
        EXPECT_NEAR(interp_ease(p.e2, 0, 1, p.e1, p.e2), (2.0 * p.e2 - p.e1) / d, 1e-6);
        EXPECT_NEAR(interp_ease(std::nextafter(p.e2, 1.0f), 0, 1, p.e1, p.e2),
                    (2.0 * p.e2 - p.e1) / d, 1e-5);
        EXPECT_NEAR(interp_ease(0.999999f, 0, 1, p.e1, p.e2), 1.0, 1e-5);
    }
}

TEST_P(InterpEaseParams, RisesMonotonicallyWithinBounds) {
    const Params p = GetParam();
    float last = 0.0f;
    for (int i = 1; i < 1000; ++i) {
        const float v = interp_ease(i / 1000.0f, 0, 1, p.e1, p.e2);
        EXPECT_GE(v, last) << "at t = " << i / 1000.0f;
        EXPECT_LE(v, 1.0f);
        last = v;
    }
}

// Ease and Smooth segments as the chart draws them, a linear-heavy curve, and the boundaries.
INSTANTIATE_TEST_SUITE_P(Curves, InterpEaseParams,
                         ::testing::Values(Params{0.2f, 0.8f}, Params{0.5f, 0.5f},
                                           Params{0.25f, 0.75f}, Params{0.05f, 0.95f},
                                           Params{0.0f, 0.6f}, Params{0.4f, 1.0f}));

TEST(InterpEase, MiddleIsLinear) {
    EXPECT_EQ(interp_ease(0.5f, 0, 1, 0.25f, 0.75f), 0.5f);
    EXPECT_EQ(interp_ease(0.5f, 2, 4, 0.25f, 0.75f), 3.0f);
    // With e1 = 0 everything up to e2 takes the linear middle formula.
    EXPECT_FLOAT_EQ(interp_ease(0.3f, 0, 1, 0.0f, 0.6f), 0.6f / 1.6f);
}

TEST(InterpEase, FullSineAtOneHalf) {
    EXPECT_FLOAT_EQ(interp_ease(0.5f, 0, 1, 0.5f, 0.5f), 0.5f);
    EXPECT_FLOAT_EQ(interp_ease(0.5f, 10, 20, 0.5f, 0.5f), 15.0f);
}

// Values worked out independently (single-precision inputs, u and w rounded to single
// precision, double arithmetic, result rounded): the curve must reproduce them bit for bit.
TEST(InterpEase, ExactValues) {
    using Case = std::tuple<float, float, float, float, float, float>;
    const Case cases[] = {
        {0.1f, 0, 1, 0.2f, 0.8f, 0x1.7419f2p-6f},   {0.9f, 0, 1, 0.2f, 0.8f, 0x1.f45f3p-1f},
        {0.3f, -2, 5, 0.5f, 0.5f, -0x1.eb4b18p-1f}, {0.7f, 10, -10, 0.5f, 0.5f, -0x1.c1bf64p+2f},
        {0.05f, 0, 1, 0.2f, 0.8f, 0x1.984decp-9f},  {0.99f, 0, 1, 0.2f, 0.8f, 0x1.fffca2p-1f},
        {0.6f, 1, 3, 0.25f, 0.75f, 0x1.222222p+1f},
    };
    for (const Case& c : cases) {
        const auto [t, a, b, e1, e2, expected] = c;
        EXPECT_EQ(interp_ease(t, a, b, e1, e2), expected) << "t " << t << " e1 " << e1;
    }
}

}  // namespace
