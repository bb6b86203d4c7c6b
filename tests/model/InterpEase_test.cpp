#include "model/InterpEase.h"

#include <gtest/gtest.h>

namespace {

// Values worked out independently (float inputs, u and w rounded to float, double arithmetic),
// bit for bit: sine pieces, linear middle, full sine, asymmetric curves, e1 = 0, e2 = 1, ends.
TEST(InterpEase, ExactValues) {
    const struct {
        float t, a, b, e1, e2, expected;
    } cases[] = {
        {0.1f, 0, 1, 0.2f, 0.8f, 0x1.7419f2p-6f},   {0.9f, 0, 1, 0.2f, 0.8f, 0x1.f45f3p-1f},
        {0.3f, -2, 5, 0.5f, 0.5f, -0x1.eb4b18p-1f}, {0.7f, 10, -10, 0.5f, 0.5f, -0x1.c1bf64p+2f},
        {0.05f, 0, 1, 0.2f, 0.8f, 0x1.984decp-9f},  {0.99f, 0, 1, 0.2f, 0.8f, 0x1.fffca2p-1f},
        {0.6f, 1, 3, 0.25f, 0.75f, 0x1.222222p+1f}, {0.5f, 2, 4, 0.25f, 0.75f, 3.0f},
        {0.5f, 10, 20, 0.5f, 0.5f, 15.0f},          {0.3f, 0, 1, 0.0f, 0.6f, 0.375f},
        {0.9f, 0, 1, 0.0f, 0.6f, 0x1.fccf64p-1f},   {0.3f, -1, 3, 0.4f, 1.0f, -0x1.e67b2p-2f},
        {0.0f, 0.3f, 7.1f, 0.0f, 0.6f, 0.3f},       {1.0f, -4, -9, 0.4f, 1.0f, -9.0f},
    };
    for (const auto& c : cases)
        EXPECT_EQ(interp_ease(c.t, c.a, c.b, c.e1, c.e2), c.expected) << "t " << c.t;
}

}  // namespace
