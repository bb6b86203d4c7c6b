#pragma once

#include <cstddef>

class ChannelCurve;
struct BuiltSampler;

// A rotation whose Euler angles move about more than one axis, written as CUBICSPLINE
// quaternion pieces at the union of its axes' key times (times that round to one float being
// one knot, see ChannelCurve::UnionTimes); from where all axes but one have stopped, as a
// TurnSpline at that one's keys. Between two of those times every axis
// runs along one cubic, so each knot's value and slopes follow from the angles and their slopes
// there, and a piece whose bound on how far it (normalised, as players do) strays from the
// rotation exceeds the tolerance is cut into equal parts (see PieceBound).
class EulerSpline {
  public:
    // `curves` (degrees, borrowed) are the X, Y and Z angles, null for an axis held at
    // `angles[axis]` (degrees).
    EulerSpline(const ChannelCurve* const curves[3], const double angles[3]);

    // Writes the knots into `out` (CUBICSPLINE, in-tangent, value, out-tangent per knot), each
    // piece within `toleranceDegrees` of the rotation at every time it covers, allowing for the
    // knots' times being stored as floats. False, with `out` untouched, when an axis steps, a
    // piece would need more than PieceBound::kMaxParts parts, the knots would number more than
    // `maxKnots`, or two of them (the cuts of a piece a float step long) fall on one float.
    bool Build(double toleranceDegrees, size_t maxKnots, BuiltSampler* out) const;

  private:
    // Where the rotation ends turning about one axis alone: that `axis`, the index of its first
    // key after every other axis's last (with a piece after it), and the angles the others hold
    // from there (degrees); false when no axis turns on alone.
    bool tailFrom(int* axis, size_t* firstKey, double held[3]) const;

    const ChannelCurve* curves_[3];
    double angles_[3];
};
