#include "scene/TurnSpline.h"

#include <algorithm>
#include <cmath>

#include "scene/ChannelCurve.h"
#include "scene/EulerRotation.h"
#include "scene/HermiteSegment.h"
#include "scene/PieceBound.h"
#include "scene/SamplerBuilder.h"

namespace {
constexpr double kPi = 3.14159265358979323846;
constexpr double kHalfRadians = EulerRotation::kHalfRadiansPerDegree;
}  // namespace

TurnSpline::TurnSpline(const ChannelCurve& curve, int axis, const double angles[3], size_t firstKey)
    : curve_(curve), first_(firstKey) {
    double c[3], s[3];
    for (int a = 0; a < 3; ++a) {
        c[a] = std::cos(angles[a] * kHalfRadians);
        s[a] = std::sin(angles[a] * kHalfRadians);
    }
    // qz * qy * qx, as EulerRotation::ToQuaternion, with the turning axis at half-angle 0 (P)
    // and at a quarter turn (Q): each term holds that axis's cosine or sine once, so the
    // rotation at half-angle h is cos(h) P + sin(h) Q.
    for (int pass = 0; pass < 2; ++pass) {
        c[axis] = pass ? 0 : 1;
        s[axis] = pass ? 1 : 0;
        double* r = pass ? q_ : p_;
        r[0] = s[0] * c[1] * c[2] - c[0] * s[1] * s[2];
        r[1] = c[0] * s[1] * c[2] + s[0] * c[1] * s[2];
        r[2] = c[0] * c[1] * s[2] - s[0] * s[1] * c[2];
        r[3] = c[0] * c[1] * c[2] + s[0] * s[1] * s[2];
    }
}

size_t TurnSpline::Plan(double toleranceDegrees, size_t maxKnots) {
    knots_ = 0;
    // The keys from the first one written on.
    const size_t n = curve_.keys().size() > first_ ? curve_.keys().size() - first_ : 0;
    if (n < 2) {
        return 0;
    }
    const ChannelCurve::Key* const keys = curve_.keys().data() + first_;
    for (size_t i = 0; i + 1 < n; ++i) {
        if (keys[i].out == ChannelCurve::kStep) {
            return 0;  // a jump at the next key, which a spline cannot make
        }
    }
    // Each key's slopes, in half-angle radians per second, and each piece's number of parts.
    curve_.Slopes(&in_, &leave_, first_, kHalfRadians);
    knots_ = PieceBound::PartsOfPieces(
        n - 1,
        [&](size_t i, bool precise) {
            const double dt = keys[i + 1].time - keys[i].time;
            PieceBound b;
            b.Add(keys[i].value * kHalfRadians, keys[i + 1].value * kHalfRadians, leave_[i] * dt,
                  in_[i + 1] * dt, precise);
            return b;
        },
        [&](size_t i) { return keys[i].time; }, toleranceDegrees * kPi / 180, true, maxKnots,
        &parts_);
    return knots_;
}

bool TurnSpline::Write(float* times, float* values) const {
    const size_t n = in_.size();
    const ChannelCurve::Key* const keys = curve_.keys().data() + first_;
    float* time = times;
    float* v = values;
    // One knot: its time, the half-angle there and its slopes (half-angle radians per second).
    // The rotation is cos(h) P + sin(h) Q, its derivative by h -sin(h) P + cos(h) Q.
    auto put = [&](double at, double half, double arrive, double depart) {
        const double ch = std::cos(half), sh = std::sin(half);
        *time++ = BuiltSampler::Stored(at);
        for (int c = 0; c < 4; ++c) {
            const double dq = ch * q_[c] - sh * p_[c];
            v[c] = BuiltSampler::Stored(dq * arrive);
            v[4 + c] = BuiltSampler::Stored(ch * p_[c] + sh * q_[c]);
            v[8 + c] = BuiltSampler::Stored(dq * depart);
        }
        v += 12;
    };
    for (size_t i = 0; i < n; ++i) {
        const double half = keys[i].value * kHalfRadians;
        put(keys[i].time, half, in_[i], leave_[i]);
        if (i + 1 == n || parts_[i] == 1) {
            continue;
        }
        // The cut points of a piece cut into parts: on the piece's cubic in u = 0..1.
        const double dt = keys[i + 1].time - keys[i].time;
        const HermiteCubic piece(half, keys[i + 1].value * kHalfRadians, leave_[i] * dt,
                                 in_[i + 1] * dt);
        for (int j = 1; j < parts_[i]; ++j) {
            const double u = double(j) / parts_[i];
            const double slope = piece.SlopeAt(u) / dt;
            put(keys[i].time + u * dt, piece.At(u), slope, slope);
        }
    }
    for (size_t j = 1; j < knots_; ++j) {
        if (!(times[j] > times[j - 1])) {
            return false;  // two knots on one float time
        }
    }
    return true;
}

bool TurnSpline::Build(double toleranceDegrees, size_t maxKnots, BuiltSampler* out) {
    if (Plan(toleranceDegrees, maxKnots) == 0) {
        return false;
    }
    BuiltSampler s;
    float* values = s.SizeQuaternionKnots(knots_);
    if (!Write(s.times.data(), values)) {
        return false;
    }
    *out = std::move(s);
    return true;
}
