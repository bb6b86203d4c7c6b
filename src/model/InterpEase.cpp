#include "model/InterpEase.h"

#include <cmath>

namespace {
constexpr double kPi = 3.141592653589793;
constexpr double kInvPi = 0.3183098861837907;
}  // namespace

// Every expression is evaluated in double precision from the single-precision inputs and the
// result rounded back to single precision; the acceleration phase multiplies by 1/pi while the
// deceleration phase divides by pi, so that the curve's values stay bit-for-bit stable.
float interp_ease(float t, float a, float b, float e1, float e2) {
    if (t == 0.0f)
        return a;
    if (t == 1.0f)
        return b;
    const double delta = double(b) - double(a);
    const double d = 1.0 + double(e2) - double(e1);
    if (t <= e1) {
        const float u = t / e1;
        return float(a + delta * e1 * (kPi * u + std::sin(kPi * (u - 1.0))) * kInvPi / d);
    }
    if (t <= e2)
        return float(a + delta * (2.0 * t - e1) / d);
    const float w = float(kPi * (double(t) - e2) / (1.0 - e2));
    return float(a + delta * ((1.0 - e2) * (w + std::sin(double(w))) / kPi + 2.0 * e2 - e1) / d);
}
