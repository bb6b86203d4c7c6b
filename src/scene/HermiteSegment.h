#pragma once

#include <algorithm>
#include <cmath>

// The cubic Hermite segment from value `a` to value `b` at the position u (0 at a, 1 at b),
// with the tangents m0 leaving a and m1 arriving at b, both in value per whole segment (a
// slope per second times the segment's length in seconds, for instance). The one formula that
// the preview's spline channels and the scene's key curves share.
inline double HermiteSegment(double a, double b, double m0, double m1, double u) {
    const double u2 = u * u, u3 = u2 * u;
    return (2 * u3 - 3 * u2 + 1) * a + (u3 - 2 * u2 + u) * m0 + (-2 * u3 + 3 * u2) * b +
           (u3 - u2) * m1;
}

// The same segment's slope at u, in value per whole segment (divide by the segment's length
// for a slope per second).
inline double HermiteSlope(double a, double b, double m0, double m1, double u) {
    const double u2 = u * u;
    return (6 * u2 - 6 * u) * (a - b) + (3 * u2 - 4 * u + 1) * m0 + (3 * u2 - 2 * u) * m1;
}

// The same segment as a polynomial in u, p0 + m0 u + b u² + a u³: for cutting it into parts
// and bounding its derivatives.
struct HermiteCubic {
    HermiteCubic(double p0, double p1, double m0, double m1)
        : p0(p0), m0(m0), m1(m1), b(3 * (p1 - p0) - 2 * m0 - m1), a(2 * (p0 - p1) + m0 + m1) {}

    double At(double u) const { return p0 + u * (m0 + u * (b + u * a)); }
    // The slope at u, per whole segment.
    double SlopeAt(double u) const { return m0 + u * (2 * b + 3 * a * u); }
    // The largest size of the slope over the segment: the slope m0 + 2bu + 3au² peaks at an
    // end or where 2b + 6au is zero; clamped to the segment, that point gives an end's slope
    // when it lies outside, so all three can be taken without asking which.
    double PeakSlope() const {
        const double u = a != 0 ? std::min(1.0, std::max(0.0, -b / (3 * a))) : 0.0;
        return std::max({std::fabs(m0), std::fabs(m1), std::fabs(SlopeAt(u))});
    }
    // A bound on the same without a division: the slope is m0 (1 - u) + m1 u - 3a u (1 - u),
    // which strays from the line between the end slopes by at most 3|a|/4.
    double SlopeBound() const {
        return std::max(std::fabs(m0), std::fabs(m1)) + 0.75 * std::fabs(a);
    }

    double p0, m0, m1, b, a;
};
