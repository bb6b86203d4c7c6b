#include "scene/EulerSpline.h"

#include <algorithm>
#include <cmath>
#include <memory>
#include <optional>
#include <vector>

#include "scene/ChannelCurve.h"
#include "scene/CurveCursor.h"
#include "scene/EulerRotation.h"
#include "scene/HermiteSegment.h"
#include "scene/PieceBound.h"
#include "scene/SamplerBuilder.h"
#include "scene/TurnSpline.h"

namespace {
constexpr double kHalfRadians = EulerRotation::kHalfRadiansPerDegree;

// One knot of the union: each axis's half-angle there (radians) and its slopes arriving and
// leaving (radians per second).
struct Knot {
    double half[3], arrive[3], leave[3];
};

// qz * qy * qx, as EulerRotation::ToQuaternion, from each axis's half-angle cosine and sine.
// Inlined: called for every knot, and a call's results would come back through memory.
[[gnu::always_inline]] inline void product(const double c[3], const double s[3], double q[4]) {
    q[0] = s[0] * c[1] * c[2] - c[0] * s[1] * s[2];
    q[1] = c[0] * s[1] * c[2] + s[0] * c[1] * s[2];
    q[2] = c[0] * c[1] * s[2] - s[0] * s[1] * c[2];
    q[3] = c[0] * c[1] * c[2] + s[0] * s[1] * s[2];
}
}  // namespace

EulerSpline::EulerSpline(const ChannelCurve* const curves[3], const double angles[3]) {
    for (int a = 0; a < 3; ++a) {
        curves_[a] = curves[a] && !curves[a]->empty() ? curves[a] : nullptr;
        angles_[a] = angles[a];
    }
}

bool EulerSpline::Build(double toleranceDegrees, size_t maxKnots, BuiltSampler* out) const {
    // A spline cannot jump, so no axis may step.
    for (const ChannelCurve* c : curves_) {
        for (size_t k = 0; c && k + 1 < c->keys().size(); ++k) {
            if (c->keys()[k].out == ChannelCurve::kStep) {
                return false;
            }
        }
    }
    // Where every axis but one has stopped (after its last key), the rotation turns about that
    // one between fixed ones, which a TurnSpline writes from its keys at about half the cost:
    // the knots here run up to the first of those keys (the joint), the tail's from there.
    std::optional<TurnSpline> tail;
    size_t tailKnots = 0;
    double joint = HUGE_VAL;
    int axis;
    size_t firstKey;
    double held[3];
    if (tailFrom(&axis, &firstKey, held)) {
        tail.emplace(*curves_[axis], axis, held, firstKey);
        tailKnots = tail->Plan(toleranceDegrees, maxKnots);
        if (tailKnots > 0) {
            joint = curves_[axis]->keys()[firstKey].time;
        } else {
            tail.reset();
        }
    }
    // Every axis's key times up to there; those that round to one float are one knot, each
    // axis read there as at its own key (within float rounding, see CurveCursor).
    std::vector<double> times = ChannelCurve::UnionTimes(curves_, 3, joint);
    if (tail && !(times.size() >= 2 && float(times.back()) == float(joint))) {
        tail.reset();
        times = ChannelCurve::UnionTimes(curves_, 3);
    }
    const size_t n = times.size();
    if (n < 2 || n > maxKnots) {
        return false;
    }
    // Each axis's half-angle and its slopes at every knot (every field is written, so the
    // records are not cleared first).
    const std::unique_ptr<Knot[]> at(new Knot[n]);
    for (int a = 0; a < 3; ++a) {
        if (!curves_[a]) {
            for (size_t k = 0; k < n; ++k) {
                at[k].half[a] = angles_[a] * kHalfRadians;
                at[k].arrive[a] = at[k].leave[a] = 0;
            }
            continue;
        }
        CurveCursor cursor(*curves_[a]);
        for (size_t k = 0; k < n; ++k) {
            const CurveCursor::Point p = cursor.At(times[k]);
            at[k].half[a] = p.value * kHalfRadians;
            at[k].arrive[a] = p.arriving * kHalfRadians;
            at[k].leave[a] = p.leaving * kHalfRadians;
        }
    }
    // The parts of each piece.
    const double allowed = toleranceDegrees * 3.14159265358979323846 / 180;
    std::vector<unsigned char> parts;
    const size_t knots = PieceBound::PartsOfPieces(
        n - 1,
        [&](size_t k, bool precise) {
            const double dt = times[k + 1] - times[k];
            PieceBound bound;
            const Knot &from = at[k], &to = at[k + 1];
            for (int a = 0; a < 3; ++a) {
                const double m0 = from.leave[a] * dt, m1 = to.arrive[a] * dt;
                // (an axis that holds across the piece adds nothing)
                if (from.half[a] != to.half[a] || m0 != 0 || m1 != 0) {
                    bound.Add(from.half[a], to.half[a], m0, m1, precise);
                }
            }
            return bound;
        },
        [&](size_t k) { return times[k]; }, allowed, false, maxKnots, &parts);
    if (knots == 0) {
        return false;
    }

    // (the tail's first knot is the joint, the last here)
    const size_t total = tail ? knots - 1 + tailKnots : knots;
    if (total > maxKnots) {
        return false;
    }
    BuiltSampler s;
    float* v = s.SizeQuaternionKnots(total);
    float* time = s.times.data();
    // Each axis's last half-angle and its cosine and sine: an axis that holds (before its first
    // key, after its last, or without a curve) needs them once.
    double lastHalf[3] = {NAN, NAN, NAN}, c[3] = {1, 1, 1}, sn[3] = {0, 0, 0};
    // One knot: its time, the half-angles there and their slopes on either side. The
    // rotation's derivative by one half-angle is the product with that axis's cosine and sine
    // turned a quarter ahead, (-sin, cos).
    auto put = [&](double at, const double h[3], const double in[3], const double out[3]) {
        double q[4], dIn[4] = {0, 0, 0, 0}, dOut[4] = {0, 0, 0, 0};
        for (int a = 0; a < 3; ++a) {
            if (h[a] != lastHalf[a]) {
                lastHalf[a] = h[a];
                c[a] = std::cos(h[a]);
                sn[a] = std::sin(h[a]);
            }
        }
        product(c, sn, q);
        for (int a = 0; a < 3; ++a) {
            if (in[a] == 0 && out[a] == 0) {
                continue;
            }
            double cd[3] = {c[0], c[1], c[2]}, sd[3] = {sn[0], sn[1], sn[2]}, dq[4];
            cd[a] = -sn[a];
            sd[a] = c[a];
            product(cd, sd, dq);
            for (int i = 0; i < 4; ++i) {
                dIn[i] += dq[i] * in[a];
                dOut[i] += dq[i] * out[a];
            }
        }
        *time++ = BuiltSampler::Stored(at);
        for (int i = 0; i < 4; ++i, ++v) {
            v[0] = BuiltSampler::Stored(dIn[i]);
            v[4] = BuiltSampler::Stored(q[i]);
            v[8] = BuiltSampler::Stored(dOut[i]);
        }
        v += 8;
    };
    // (with a tail, the joint is its first knot and written with it)
    for (size_t k = 0; k < n; ++k) {
        const Knot& from = at[k];
        if (k + 1 == n) {
            if (!tail) {
                put(times[k], from.half, from.arrive, from.leave);
            }
            continue;
        }
        put(times[k], from.half, from.arrive, from.leave);
        if (parts[k] == 1) {
            continue;
        }
        // The cut points of a piece cut into parts: on each axis's cubic in u = 0..1.
        const double dt = times[k + 1] - times[k];
        const Knot& to = at[k + 1];
        const HermiteCubic piece[3] = {
            {from.half[0], to.half[0], from.leave[0] * dt, to.arrive[0] * dt},
            {from.half[1], to.half[1], from.leave[1] * dt, to.arrive[1] * dt},
            {from.half[2], to.half[2], from.leave[2] * dt, to.arrive[2] * dt}};
        for (int j = 1; j < parts[k]; ++j) {
            const double u = double(j) / parts[k];
            double hu[3], slope[3];
            for (int a = 0; a < 3; ++a) {
                hu[a] = piece[a].At(u);
                slope[a] = piece[a].SlopeAt(u) / dt;
            }
            put(times[k] + u * dt, hu, slope, slope);
        }
    }
    if (tail && !tail->Write(time, v)) {
        return false;
    }
    for (size_t j = 1; j < knots; ++j) {
        if (!(s.times[j] > s.times[j - 1])) {
            return false;  // two knots on one float time
        }
    }
    *out = std::move(s);
    return true;
}

bool EulerSpline::tailFrom(int* axis, size_t* firstKey, double held[3]) const {
    // The one axis keyed to the end, and the time at which the others stop (their last key).
    bool going[3];
    const double stop = ChannelCurve::OthersStop(curves_, 3, going);
    int last = -1, goingAxes = 0;
    for (int a = 0; a < 3; ++a) {
        if (going[a]) {
            last = a;
            ++goingAxes;
        }
    }
    if (goingAxes != 1 || stop == -HUGE_VAL) {
        return false;
    }
    for (int a = 0; a < 3; ++a) {
        held[a] = a != last && curves_[a] ? curves_[a]->keys().back().value : angles_[a];
    }
    // Its first key on a float time after that, with at least one piece after it.
    const size_t first = curves_[last]->FirstKeyAfter(stop);
    if (first + 1 >= curves_[last]->keys().size()) {
        return false;
    }
    *axis = last;
    *firstKey = first;
    return true;
}
