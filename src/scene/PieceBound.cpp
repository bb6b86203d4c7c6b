#include "scene/PieceBound.h"

#include <algorithm>
#include <cmath>

namespace {
constexpr double kHalfFloatStep = 1.0 / (1 << 24);  // of a float, relative to its size
constexpr double kBy384 = 1.0 / 384;
constexpr double kRoot2 = 1.4142135623730951;
}  // namespace

void PieceBound::Add(double p0, double p1, double m0, double m1) {
    const double b = 3 * (p1 - p0) - 2 * m0 - m1, a = 2 * (p0 - p1) + m0 + m1;
    double first = std::max(std::fabs(m0), std::fabs(m1));
    if (b * (b + 3 * a) < 0) {
        // The second derivative 2b + 6au changes sign inside: the first peaks there.
        const double u = -b / (3 * a);
        first = std::max(first, std::fabs(m0 + 2 * b * u + 3 * a * u * u));
    }
    first_ += first;
    second_ += std::max(std::fabs(2 * b), std::fabs(2 * b + 6 * a));
    third_ += std::fabs(6 * a);
}

int PieceBound::Parts(double t0, double t1, double allowedRadians, bool oneAxis) const {
    // The knots' times are floats: a piece may sit up to half a float step off at either end,
    // moving what a player reads by the turning speed times that (and its tangents a little).
    const double drift =
        std::max(std::fabs(t0), std::fabs(t1)) * kHalfFloatStep * 2.6 * first_ / (t1 - t0);
    double by = 1;  // 1 / parts, multiplied rather than divided: most pieces need one part
    for (int parts = 1; parts <= kMaxParts; by = 1.0 / ++parts) {
        const double A = first_ * by, B = second_ * by * by, C = third_ * by * by * by;
        const double fourth = A * A * A * A + 6 * A * A * B + 3 * B * B + 4 * A * C;
        // How far the piece strays from the rotation (as 4-vectors), and the part of that
        // which turns it: for one axis, z = exp(i h) has z'''' = (h'^4 - 3h''^2 - 4h'h''' -
        // 6i h'^2 h'') z, the part along z is normalised away, and across z the real part is
        // scaled by the sine of how far h moves over the piece (at most A); otherwise all of it.
        const double whole = (oneAxis ? kRoot2 : 1.0) * fourth * kBy384;
        const double across =
            oneAxis ? ((A * A * A * A + 3 * B * B + 4 * A * C) * A + 6 * A * A * B) * kBy384
                    : whole;
        // 2 (across / (1 - whole) + drift) <= allowedRadians, without dividing
        if (whole < 0.5 && 2 * (across + drift * (1 - whole)) <= allowedRadians * (1 - whole)) {
            return parts;
        }
    }
    return 0;
}
