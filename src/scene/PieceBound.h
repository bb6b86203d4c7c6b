#pragma once

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <vector>

#include "scene/HermiteSegment.h"

// How many equal parts a cubic quaternion piece needs to stay within a tolerance of a rotation
// whose Euler half-angles run along cubics over the piece. The rotation is the product of one
// turn per axis, exp(h(u) e) for the axis e and half-angle h, so the size of its fourth
// derivative is bounded by that of the exponential of the half-angles' summed derivative bounds
// (A⁴ + 6A²B + 3B² + 4AC for bounds A, B, C on the first three derivatives), and a cubic
// Hermite piece misses by at most a 384th of that. Each cut into n parts brings the bound down
// by about n⁴. Inline: a store asks it once for every piece of every turning curve.
class PieceBound {
  public:
    // More parts than this for one piece and the rotation is left to sampling.
    static constexpr int kMaxParts = 16;

    // Adds one axis's half-angle over the piece (radians): from p0 to p1, with slopes m0 and m1
    // in radians per piece (the slope per second times the piece's duration). Unless `precise`,
    // the slope is bounded without a division, more loosely: enough to tell that a piece needs
    // no cut, which is what most pieces are asked.
    void Add(double p0, double p1, double m0, double m1, bool precise) {
        const HermiteCubic h(p0, p1, m0, m1);
        first_ += precise ? h.PeakSlope() : h.SlopeBound();
        second_ += std::max(std::fabs(2 * h.b), std::fabs(2 * h.b + 6 * h.a));
        third_ += std::fabs(6 * h.a);
    }

    // The parts the piece from time t0 to t1 (seconds) needs to stay within `allowedRadians`
    // of the rotation, allowing for its knots' times being stored as floats; 0 when no number
    // up to kMaxParts will do. With `oneAxis` (only one half-angle was added, between fixed
    // rotations) only the error across the rotation's path counts, which is the smaller.
    int Parts(double t0, double t1, double allowedRadians, bool oneAxis) const {
        return PartsAllowing(Drift(std::max(std::fabs(t0), std::fabs(t1)), first_, t1 - t0),
                             allowedRadians, oneAxis);
    }

    // How far a piece may stray because its knots' times are floats: a knot may sit up to half
    // a float step off its time (at most `latest` seconds), moving what a player reads by the
    // turning speed (`first` radians over `dt` seconds) times that, and its tangents a little.
    static double Drift(double latest, double first, double dt) {
        return latest * kHalfFloatStep * 2.6 * first / dt;
    }
    // Widens the bound to cover `other` as well: a curve whose widest bound needs one part
    // (with the drift of its fastest piece at its latest time) needs one in every piece.
    void Widen(const PieceBound& other) {
        first_ = std::max(first_, other.first_);
        second_ = std::max(second_, other.second_);
        third_ = std::max(third_, other.third_);
    }

    // Parts, for a piece that float times may move by `drift` radians.
    int PartsAllowing(double drift, double allowedRadians, bool oneAxis) const {
        double by = 1;  // 1 / parts, multiplied rather than divided: most pieces need one part
        for (int parts = 1; parts <= kMaxParts; by = 1.0 / ++parts) {
            const double A = first_ * by, B = second_ * by * by, C = third_ * by * by * by;
            const double fourth = A * A * A * A + 6 * A * A * B + 3 * B * B + 4 * A * C;
            // How far the piece strays from the rotation (as 4-vectors), and the part of that
            // which turns it: for one axis, z = exp(i h) has z'''' = (h'^4 - 3h''^2 - 4h'h''' -
            // 6i h'^2 h'') z, the part along z is normalised away, and across z the real part
            // is scaled by the sine of how far h moves over the piece (at most A); otherwise
            // all of it.
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

    // The parts of each of `pieces` pieces into `parts`, and the knots they make (one more
    // than the parts), or 0 when a piece needs more than kMaxParts or the knots would number
    // more than `maxKnots`. `boundOf(i, precise)` is piece i's bound (see Add) and `timeOf(i)`
    // the time it starts (piece i ends at timeOf(i + 1)). The pieces are taken in blocks, and a
    // block whose widest loose bound, drifting as its fastest piece at its latest time, needs
    // one part needs one in every piece: most blocks of a lip-sync curve do, without asking
    // piece by piece. The others are asked piece by piece, with the precise bounds, so that
    // the loose ones never add a cut.
    template <class BoundOf, class TimeOf>
    static size_t PartsOfPieces(size_t pieces, const BoundOf& boundOf, const TimeOf& timeOf,
                                double allowedRadians, bool oneAxis, size_t maxKnots,
                                std::vector<unsigned char>* parts) {
        constexpr size_t kBlock = 32;
        parts->assign(pieces, 1);
        size_t knots = 1;
        for (size_t start = 0; start < pieces; start += kBlock) {
            const size_t end = std::min(pieces, start + kBlock);
            PieceBound widest;
            // The fastest piece's turn and duration: its speed is their quotient, compared by
            // cross-multiplying (durations are positive).
            double fastTurn = 0, fastDt = 1;
            for (size_t i = start; i < end; ++i) {
                const PieceBound b = boundOf(i, false);
                widest.Widen(b);
                const double dt = timeOf(i + 1) - timeOf(i);
                if (b.first_ * fastDt > fastTurn * dt) {
                    fastTurn = b.first_;
                    fastDt = dt;
                }
            }
            // (the fastest a hair faster: a piece's own drift rounds in another order)
            const double latest = std::max(std::fabs(timeOf(start)), std::fabs(timeOf(end)));
            if (widest.PartsAllowing(Drift(latest, fastTurn * (1 + 1e-12), fastDt), allowedRadians,
                                     oneAxis) == 1) {
                knots += end - start;
            } else {
                for (size_t i = start; i < end; ++i) {
                    const double t0 = timeOf(i), t1 = timeOf(i + 1);
                    int p = boundOf(i, false).Parts(t0, t1, allowedRadians, oneAxis);
                    if (p != 1) {
                        p = boundOf(i, true).Parts(t0, t1, allowedRadians, oneAxis);
                    }
                    if (p == 0) {
                        return 0;
                    }
                    (*parts)[i] = static_cast<unsigned char>(p);
                    knots += size_t(p);
                }
            }
            if (knots > maxKnots) {
                return 0;
            }
        }
        return knots;
    }

  private:
    static constexpr double kHalfFloatStep = 1.0 / (1 << 24);  // of a float, relative to it
    static constexpr double kBy384 = 1.0 / 384;
    static constexpr double kRoot2 = 1.4142135623730951;

    double first_ = 0, second_ = 0, third_ = 0;  // summed bounds, by u over the piece
};
