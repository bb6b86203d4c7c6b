#pragma once

// The cubic Hermite segment from value `a` to value `b` at the position u (0 at a, 1 at b),
// with the tangents m0 leaving a and m1 arriving at b, both in value per whole segment (a
// slope per second times the segment's length in seconds, for instance). The one formula that
// the preview's spline channels and the scene's key curves share.
inline double HermiteSegment(double a, double b, double m0, double m1, double u) {
    const double u2 = u * u, u3 = u2 * u;
    return (2 * u3 - 3 * u2 + 1) * a + (u3 - 2 * u2 + u) * m0 + (-2 * u3 + 3 * u2) * b +
           (u3 - u2) * m1;
}
