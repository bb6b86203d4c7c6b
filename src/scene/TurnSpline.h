#pragma once

#include <cstddef>
#include <vector>

class ChannelCurve;
struct BuiltSampler;

// A rotation that turns about one Euler axis between two fixed ones, written as CUBICSPLINE
// quaternion pieces at the turning curve's own keys. The rotation is then cos(h) P + sin(h) Q
// for two fixed quaternions P and Q and h half the turning angle, so each knot's value and
// slopes follow from the curve's value and slopes there, and a piece whose bound on how far it
// (normalised, as players do) strays from the rotation exceeds the tolerance is cut into equal
// parts (see PieceBound).
class TurnSpline {
  public:
    // `curve` (degrees, borrowed) turns Euler axis `axis` (0 X, 1 Y, 2 Z); `angles` holds the
    // fixed angles of the other two (degrees; angles[axis] is not used). The knots are the
    // curve's keys from `firstKey` on (a rotation whose other axes stop turning there, see
    // EulerSpline).
    TurnSpline(const ChannelCurve& curve, int axis, const double angles[3], size_t firstKey = 0);

    // The knots the spline needs, each piece within `toleranceDegrees` of the rotation at every
    // time it covers, allowing for the knots' times being stored as floats; 0 when the curve
    // steps, a piece would need more than PieceBound::kMaxParts parts, or the knots would number
    // more than `maxKnots`.
    size_t Plan(double toleranceDegrees, size_t maxKnots);
    // Writes the planned knots: their times into `times`, and into `values` their in-tangent,
    // value and out-tangent (12 floats a knot). False when two fall on one float time.
    bool Write(float* times, float* values) const;
    // Plan and Write into `out` (CUBICSPLINE); false, with `out` untouched, when either fails.
    bool Build(double toleranceDegrees, size_t maxKnots, BuiltSampler* out);

  private:
    const ChannelCurve& curve_;
    size_t first_;
    double p_[4], q_[4];  // the rotation at turning half-angle h is cos(h) p_ + sin(h) q_
    // What Plan worked out: each key's slopes (half-angle radians per second), each piece's
    // parts and the knots they make.
    std::vector<double> in_, leave_;
    std::vector<unsigned char> parts_;
    size_t knots_ = 0;
};
