#include "scene/EulerSpline.h"

#include <algorithm>
#include <cmath>
#include <vector>

#include "scene/ChannelCurve.h"
#include "scene/CurveCursor.h"
#include "scene/PieceBound.h"
#include "scene/SamplerBuilder.h"

namespace {
constexpr double kHalfRadians = 3.14159265358979323846 / 360;  // half-angle radians per degree

// Stored floats: a negative zero is written as zero.
float stored(double v) {
    return float(v) + 0.0f;
}

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
    // Every axis's key times, once each; a spline cannot jump, so no axis may step.
    std::vector<double> times, merged;
    for (const ChannelCurve* c : curves_) {
        if (!c) {
            continue;
        }
        const auto& keys = c->keys();
        for (size_t k = 0; k + 1 < keys.size(); ++k) {
            if (keys[k].out == ChannelCurve::kStep) {
                return false;
            }
        }
        merged.resize(times.size() + keys.size());
        auto at = merged.begin();
        auto from = times.begin();
        for (const ChannelCurve::Key& k : keys) {
            while (from != times.end() && *from < k.time) {
                *at++ = *from++;
            }
            if (from == times.end() || *from != k.time) {
                *at++ = k.time;
            }
        }
        at = std::copy(from, times.end(), at);
        merged.resize(size_t(at - merged.begin()));
        times.swap(merged);
    }
    // Key times of different axes that round to one float are one knot: each axis is
    // evaluated there as at its own key (within float rounding, see ChannelCurve).
    times.erase(std::unique(times.begin(), times.end(),
                            [](double a, double b) { return float(a) == float(b); }),
                times.end());
    const size_t n = times.size();
    if (n < 2 || n > maxKnots) {
        return false;
    }
    std::vector<CurveCursor> cursors;
    cursors.reserve(3);
    int cursorOf[3] = {-1, -1, -1};
    for (int a = 0; a < 3; ++a) {
        if (curves_[a]) {
            cursorOf[a] = int(cursors.size());
            cursors.emplace_back(*curves_[a]);
        }
    }
    const double allowed = toleranceDegrees * 3.14159265358979323846 / 180;
    // Room for one knot per time; a piece cut into parts makes more (and more room).
    BuiltSampler s;
    s.SizeQuaternionKnots(n);
    size_t knots = 0;
    // Each axis's last half-angle and its cosine and sine: an axis that holds (before its first
    // key, after its last, or without a curve) needs them once.
    double lastHalf[3] = {NAN, NAN, NAN}, c[3] = {1, 1, 1}, sn[3] = {0, 0, 0};
    // One knot: its time, the half-angles there and their slopes on either side (radians per
    // second). The rotation's derivative by one half-angle is the product with that axis's
    // cosine and sine turned a quarter ahead, (-sin, cos).
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
        s.times[knots] = stored(at);
        float* v = reinterpret_cast<float*>(s.valueBytes.data()) + knots * 12;
        for (int i = 0; i < 4; ++i) {
            v[i] = stored(dIn[i]);
            v[4 + i] = stored(q[i]);
            v[8 + i] = stored(dOut[i]);
        }
        ++knots;
    };
    // Knot by knot, each piece checked against the bound as its end is reached: every axis's
    // half-angle and slopes at the piece's start (`h0`, `leave0`) and end.
    double h0[3] = {0, 0, 0}, leave0[3] = {0, 0, 0};
    for (size_t k = 0; k < n; ++k) {
        double h[3], in[3], out[3];
        for (int a = 0; a < 3; ++a) {
            if (cursorOf[a] >= 0) {
                const CurveCursor::Point p = cursors[size_t(cursorOf[a])].At(times[k]);
                h[a] = p.value * kHalfRadians;
                in[a] = p.arriving * kHalfRadians;
                out[a] = p.leaving * kHalfRadians;
            } else {
                h[a] = angles_[a] * kHalfRadians;
                in[a] = out[a] = 0;
            }
        }
        if (k > 0) {
            const double dt = times[k] - times[k - 1];
            PieceBound bound;
            double m0[3], m1[3];
            for (int a = 0; a < 3; ++a) {
                m0[a] = leave0[a] * dt;
                m1[a] = in[a] * dt;
                // (an axis that holds across the piece adds nothing)
                if (h0[a] != h[a] || m0[a] != 0 || m1[a] != 0) {
                    bound.Add(h0[a], h[a], m0[a], m1[a]);
                }
            }
            const int parts = bound.Parts(times[k - 1], times[k], allowed, false);
            if (parts == 0 || knots + size_t(parts) + (n - k - 1) > maxKnots) {
                return false;
            }
            if (parts > 1) {
                const size_t room = knots + size_t(parts) + (n - k - 1);
                if (room > s.times.size()) {
                    s.times.resize(room);
                    s.SizeValues(room * 12);
                }
                // The cut points: on each axis's cubic in u = 0..1.
                double b[3], a3[3];
                for (int a = 0; a < 3; ++a) {
                    b[a] = 3 * (h[a] - h0[a]) - 2 * m0[a] - m1[a];
                    a3[a] = 2 * (h0[a] - h[a]) + m0[a] + m1[a];
                }
                for (int j = 1; j < parts; ++j) {
                    const double u = double(j) / parts;
                    double hu[3], slope[3];
                    for (int a = 0; a < 3; ++a) {
                        hu[a] = h0[a] + u * (m0[a] + u * (b[a] + u * a3[a]));
                        slope[a] = (m0[a] + u * (2 * b[a] + 3 * a3[a] * u)) / dt;
                    }
                    put(times[k - 1] + u * dt, hu, slope, slope);
                }
            }
        }
        put(times[k], h, in, out);
        for (int a = 0; a < 3; ++a) {
            h0[a] = h[a];
            leave0[a] = out[a];
        }
    }
    for (size_t j = 1; j < knots; ++j) {
        if (!(s.times[j] > s.times[j - 1])) {
            return false;  // two knots on one float time
        }
    }
    *out = std::move(s);
    return true;
}
