#pragma once

#include <cstddef>

class ChannelCurve;
struct BuiltSampler;

// A rotation that turns about one Euler axis between two fixed ones, written as CUBICSPLINE
// quaternion pieces at the turning curve's own keys. The rotation is then cos(h) P + sin(h) Q
// for two fixed quaternions P and Q and h half the turning angle, so each knot's value and
// slopes follow from the curve's value and slopes there, and how far a cubic piece (normalised,
// as players do) strays from the rotation is bounded from the curve's derivatives over the
// piece. A piece whose bound exceeds the tolerance is cut into equal parts (each cut bringing
// the bound down by about the fourth power of the number of parts).
class TurnSpline {
  public:
    // More parts than this for one piece and the turn is left to sampling.
    static constexpr int kMaxParts = 16;

    // `curve` (degrees, borrowed) turns Euler axis `axis` (0 X, 1 Y, 2 Z); `angles` holds the
    // fixed angles of the other two (degrees; angles[axis] is not used).
    TurnSpline(const ChannelCurve& curve, int axis, const double angles[3]);

    // Writes the knots into `out` (CUBICSPLINE, in-tangent, value, out-tangent per knot), each
    // piece within `toleranceDegrees` of the rotation at every time it covers, allowing for the
    // knots' times being stored as floats. False, with `out` untouched, when the curve steps,
    // has two keys on one float time, a piece would need more than kMaxParts parts, or the
    // knots would number more than `maxKnots`.
    bool Build(double toleranceDegrees, size_t maxKnots, BuiltSampler* out) const;

  private:
    // The parts a piece from time t0 to t1 (seconds) needs, 0 when no number up to kMaxParts
    // will do; its half-angle runs from p0 to p1 (radians) with slopes m0 and m1 (radians per
    // piece: the slope per second times t1 - t0).
    static int partsFor(double t0, double t1, double p0, double p1, double m0, double m1,
                        double allowedRadians);
    const ChannelCurve& curve_;
    double p_[4], q_[4];  // the rotation at turning half-angle h is cos(h) p_ + sin(h) q_
};
