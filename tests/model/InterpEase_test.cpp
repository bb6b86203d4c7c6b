#include "model/InterpEase.h"

#include <gtest/gtest.h>

#include <cmath>
#include <string>

namespace {

struct Ease {
    float e1;
    float e2;
};

void PrintTo(const Ease& p, std::ostream* os) {
    *os << "e1 " << p.e1 << " e2 " << p.e2;
}
class InterpEaseCurve : public ::testing::TestWithParam<Ease> {};

// Exact ends; the pieces meet at e1 and e2 with the values e1/D and (2 e2 - e1)/D
// (D = 1 + e2 - e1) and approach 0 and 1 without a jump; the curve rises within [0, 1].
TEST_P(InterpEaseCurve, ExactEndsContinuousJoinsMonotonicRise) {
    const float e1 = GetParam().e1, e2 = GetParam().e2;
    EXPECT_EQ(interp_ease(0.0f, 0.3f, 7.1f, e1, e2), 0.3f);
    EXPECT_EQ(interp_ease(1.0f, 0.3f, 7.1f, e1, e2), 7.1f);
    EXPECT_EQ(interp_ease(1.0f, -4.0f, -9.0f, e1, e2), -9.0f);
    const double d = 1.0 + e2 - e1;
    if (e1 > 0.0f) {
        for (float t : {e1, std::nextafter(e1, 0.0f), std::nextafter(e1, 1.0f)})
            EXPECT_NEAR(interp_ease(t, 0, 1, e1, e2), e1 / d, 1e-5) << t;
        EXPECT_NEAR(interp_ease(1e-6f, 0, 1, e1, e2), 0.0, 1e-5);
    }
    if (e2 < 1.0f) {
        for (float t : {e2, std::nextafter(e2, 1.0f)})
            EXPECT_NEAR(interp_ease(t, 0, 1, e1, e2), (2.0 * e2 - e1) / d, 1e-5) << t;
        EXPECT_NEAR(interp_ease(0.999999f, 0, 1, e1, e2), 1.0, 1e-5);
    }
    float last = 0.0f;
    for (int i = 1; i < 1000; ++i) {
        const float v = interp_ease(i / 1000.0f, 0, 1, e1, e2);
        ASSERT_GE(v, last) << "at t = " << i / 1000.0f;
        ASSERT_LE(v, 1.0f);
        last = v;
    }
}

// Ease and Smooth segments as the chart draws them, a linear-heavy curve, and the boundaries.
INSTANTIATE_TEST_SUITE_P(Curves, InterpEaseCurve,
                         ::testing::Values(Ease{0.2f, 0.8f}, Ease{0.5f, 0.5f}, Ease{0.25f, 0.75f},
                                           Ease{0.05f, 0.95f}, Ease{0.0f, 0.6f}, Ease{0.4f, 1.0f}),
                         [](const ::testing::TestParamInfo<Ease>& p) {
                             return "e1_" + std::to_string(int(p.param.e1 * 100 + 0.5f)) + "_e2_" +
                                    std::to_string(int(p.param.e2 * 100 + 0.5f));
                         });

// Values worked out independently (single-precision inputs, u and w rounded to single
// precision, double arithmetic, result rounded): the curve must reproduce them bit for bit.
// Covers both sine pieces, the linear middle, the full sine (e1 = e2 = 1/2) and e1 = 0.
TEST(InterpEase, ExactValues) {
    struct Case {
        float t, a, b, e1, e2, expected;
    };
    const Case cases[] = {
        {0.1f, 0, 1, 0.2f, 0.8f, 0x1.7419f2p-6f},   {0.9f, 0, 1, 0.2f, 0.8f, 0x1.f45f3p-1f},
        {0.3f, -2, 5, 0.5f, 0.5f, -0x1.eb4b18p-1f}, {0.7f, 10, -10, 0.5f, 0.5f, -0x1.c1bf64p+2f},
        {0.05f, 0, 1, 0.2f, 0.8f, 0x1.984decp-9f},  {0.99f, 0, 1, 0.2f, 0.8f, 0x1.fffca2p-1f},
        {0.6f, 1, 3, 0.25f, 0.75f, 0x1.222222p+1f}, {0.5f, 2, 4, 0.25f, 0.75f, 3.0f},
        {0.5f, 10, 20, 0.5f, 0.5f, 15.0f},          {0.3f, 0, 1, 0.0f, 0.6f, 0.375f},
    };
    for (const Case& c : cases)
        EXPECT_EQ(interp_ease(c.t, c.a, c.b, c.e1, c.e2), c.expected) << "t " << c.t;
}

}  // namespace
