#include "scene/SamplerBuilder.h"

#include <algorithm>
#include <cmath>

#include "scene/ChannelCurve.h"
#include "scene/EulerRotation.h"

namespace {
// Stored floats: a negative zero is written as zero.
float stored(double v) {
    return float(v) + 0.0f;
}

// Few of the points 0..n-1 (first and last always among them) such that every point between
// two kept ones fits the straight piece between them: `piece_fits(i, j)` says whether every
// point strictly between i and j lies within tolerance of the piece from i to j. Each piece is
// grown by doubling and then narrowed by bisection, so the cost is about n log n point checks
// for long pieces, and one check per point where no point can be left out.
template <class PieceFits>
std::vector<size_t> reduce(size_t n, const PieceFits& piece_fits) {
    std::vector<size_t> kept;
    if (n == 0) {
        return kept;
    }
    size_t i = 0;
    kept.push_back(0);
    while (i + 1 < n) {
        size_t good = i + 1, step = 2;
        size_t bad = n;  // first end known not to fit (n: none)
        while (true) {
            size_t j = std::min(n - 1, i + step);
            if (j == good) {
                break;
            }
            if (piece_fits(i, j)) {
                good = j;
                if (j == n - 1) {
                    break;
                }
                step *= 2;
            } else {
                bad = j;
                break;
            }
        }
        while (bad < n && bad - good > 1) {
            size_t mid = good + (bad - good) / 2;
            if (piece_fits(i, mid)) {
                good = mid;
            } else {
                bad = mid;
            }
        }
        kept.push_back(good);
        i = good;
    }
    return kept;
}
// Whether values[k] for i < k < j lie within `tolerance` of the straight line from i to j.
bool line_fits(const std::vector<double>& times, const std::vector<double>& values, size_t i,
               size_t j, double tolerance) {
    double t0 = times[i], v0 = values[i];
    double slope = (values[j] - v0) / (times[j] - t0);
    for (size_t k = i + 1; k < j; ++k) {
        if (std::fabs(v0 + slope * (times[k] - t0) - values[k]) > tolerance) {
            return false;
        }
    }
    return true;
}

// Whether q[k] for i < k < j lies within `chord` (the chord between unit quaternions of the
// tolerance angle) of the spherical interpolation from q[i] to q[j], as players interpolate.
bool slerp_fits(const std::vector<double>& times, const std::vector<EulerRotation::Quat>& q,
                size_t i, size_t j, double chord) {
    const EulerRotation::Quat& a = q[i];
    const EulerRotation::Quat& b = q[j];
    double dot = a[0] * b[0] + a[1] * b[1] + a[2] * b[2] + a[3] * b[3];
    double sign = dot < 0 ? -1.0 : 1.0;
    dot *= sign;
    // Between quaternions less than 0.01 radians apart the normalised straight line misses the
    // spherical one by under 1e-5 degrees, far inside the margin: no sines needed.
    double angle = dot < 0.99995 ? std::acos(dot) : 0.0, s = angle > 0 ? std::sin(angle) : 0.0;
    double limit = chord * chord;
    for (size_t k = i + 1; k < j; ++k) {
        double u = (times[k] - times[i]) / (times[j] - times[i]);
        double wa = 1 - u, wb = u;
        if (angle > 0) {
            wa = std::sin((1 - u) * angle) / s;
            wb = std::sin(u * angle) / s;
        }
        EulerRotation::Quat m;
        double n = 0;
        for (size_t c = 0; c < 4; ++c) {
            m[c] = wa * a[c] + wb * sign * b[c];
            n += m[c] * m[c];
        }
        n = 1 / std::sqrt(n);
        double same = 0, opposite = 0;
        for (size_t c = 0; c < 4; ++c) {
            double x = m[c] * n;
            same += (x - q[k][c]) * (x - q[k][c]);
            opposite += (x + q[k][c]) * (x + q[k][c]);
        }
        if (std::min(same, opposite) > limit) {
            return false;
        }
    }
    return true;
}
}  // namespace

SamplerBuilder::SamplerBuilder(const ChannelCurve* const curves[3], const double rest[3], int fps)
    : fps_(fps > 0 ? fps : 30) {
    bool anyMoving = false;
    for (int a = 0; a < 3; ++a) {
        curves_[a] = curves[a] && !curves[a]->empty() ? curves[a] : nullptr;
        rest_[a] = rest[a];
        anyMoving = anyMoving || (curves_[a] && !curves_[a]->Constant());
    }
    for (int a = 0; a < 3; ++a) {
        // An axis that holds one value throughout is written as that value: its key times
        // bring nothing the other axes need, so they neither widen the union nor make pieces.
        // (When no axis moves the curves are kept, so that the path stays animated.)
        if (anyMoving && curves_[a] && curves_[a]->Constant()) {
            rest_[a] = curves_[a]->keys().front().value;
            curves_[a] = nullptr;
        }
        lead_ = lead_ ? lead_ : curves_[a];
    }
}

bool SamplerBuilder::sharedTimes() const {
    for (const ChannelCurve* c : curves_) {
        if (!c) {
            continue;
        }
        if (c->keys().size() != lead_->keys().size()) {
            return false;
        }
        for (size_t k = 0; k < c->keys().size(); ++k) {
            if (float(c->keys()[k].time) != float(lead_->keys()[k].time)) {
                return false;
            }
        }
    }
    for (size_t k = 1; k < lead_->keys().size(); ++k) {
        if (!(float(lead_->keys()[k].time) > float(lead_->keys()[k - 1].time))) {
            return false;  // two keys on one float time: not writable as they are
        }
    }
    return true;
}

bool SamplerBuilder::BuildVector(BuiltSampler* out, std::string* why) const {
    *out = BuiltSampler();
    out->width = 3;
    if (!lead_) {
        return true;
    }
    bool allLinear = true, allStep = true, anyStep = false;
    for (const ChannelCurve* c : curves_) {
        if (!c) {
            continue;
        }
        allLinear = allLinear && c->AllLinear();
        allStep = allStep && c->AllStep();
        for (size_t k = 0; k + 1 < c->keys().size(); ++k) {
            anyStep = anyStep || c->keys()[k].out == ChannelCurve::kStep;
        }
    }
    bool shared = sharedTimes();
    if (shared && (allLinear || allStep || !anyStep)) {
        out->interpolation = allLinear ? "LINEAR" : (allStep ? "STEP" : "CUBICSPLINE");
        keysExact(out);
        return true;
    }
    if (!anyStep) {
        unionCubic(out);
        return true;
    }
    std::vector<double> times, axis[3];
    if (!sampleCandidates(&times, axis, HUGE_VAL, why)) {
        return false;
    }
    // An axis without a curve holds its rest value (its samples are not filled in).
    auto fits = [&](size_t i, size_t j) {
        for (int a = 0; a < 3; ++a) {
            if (!axis[a].empty() && !line_fits(times, axis[a], i, j, kVectorTolerance * 0.5)) {
                return false;
            }
        }
        return true;
    };
    out->interpolation = "LINEAR";
    for (size_t k : reduce(times.size(), fits)) {
        out->times.push_back(stored(times[k]));
        for (int a = 0; a < 3; ++a) {
            out->values.push_back(stored(axis[a].empty() ? rest_[a] : axis[a][k]));
        }
    }
    return true;
}

bool SamplerBuilder::BuildRotation(BuiltSampler* out, std::string* why) const {
    *out = BuiltSampler();
    out->width = 4;
    if (!lead_) {
        return true;
    }
    int moving = -1, movingAxes = 0;
    for (int a = 0; a < 3; ++a) {
        if (curves_[a] && !curves_[a]->Constant()) {
            moving = a;
            ++movingAxes;
        }
    }
    // With one turning axis a straight span of it is followed exactly (see below), as long as
    // it turns by less than half a turn, which a piece would go the other way round.
    std::vector<double> times, axis[3];
    if (!sampleCandidates(&times, axis, movingAxes <= 1 ? 90.0 : 0.0, why)) {
        return false;
    }
    // An axis without a curve holds its rest value (its samples are not filled in).
    auto angle = [&](int a, size_t k) { return axis[a].empty() ? rest_[a] : axis[a][k]; };
    // Float storage moves a quaternion by about 1e-5 degrees: well inside the margin.
    const double tolerance = kRotationToleranceDegrees * 0.5;
    const double halfRadians = 3.14159265358979323846 / 360;
    out->interpolation = "LINEAR";
    if (movingAxes <= 1) {
        // One axis turning between fixed ones: the rotation is a fixed one, a turn about that
        // axis, and another fixed one, and interpolation commutes with fixed rotations on either
        // side, so the angle by which a piece misses is the angle its straight line misses by.
        int a = moving < 0 ? 0 : moving;
        if (axis[a].empty()) {
            axis[a].assign(times.size(), rest_[a]);
        }
        std::vector<size_t> kept = reduce(times.size(), [&](size_t i, size_t j) {
            return std::fabs(axis[a][j] - axis[a][i]) < 180 &&
                   line_fits(times, axis[a], i, j, tolerance);
        });
        // The fixed axes' half-angle sines and cosines once; only the turning one per sample,
        // written straight out, each on the hemisphere of the one before (players take the
        // shortest way round).
        double c[3], sn[3];
        for (int b = 0; b < 3; ++b) {
            c[b] = std::cos(angle(b, 0) * halfRadians);
            sn[b] = std::sin(angle(b, 0) * halfRadians);
        }
        out->times.resize(kept.size());
        out->values.resize(kept.size() * 4);
        float* v = out->values.data();
        double previous[4] = {0, 0, 0, 1};
        for (size_t n = 0; n < kept.size(); ++n, v += 4) {
            const size_t k = kept[n];
            c[a] = std::cos(axis[a][k] * halfRadians);
            sn[a] = std::sin(axis[a][k] * halfRadians);
            // qz * qy * qx, as EulerRotation::ToQuaternion
            double q[4] = {sn[0] * c[1] * c[2] - c[0] * sn[1] * sn[2],
                           c[0] * sn[1] * c[2] + sn[0] * c[1] * sn[2],
                           c[0] * c[1] * sn[2] - sn[0] * sn[1] * c[2],
                           c[0] * c[1] * c[2] + sn[0] * sn[1] * sn[2]};
            const double side = n > 0 && q[0] * previous[0] + q[1] * previous[1] +
                                                 q[2] * previous[2] + q[3] * previous[3] <
                                             0
                                    ? -1.0
                                    : 1.0;
            out->times[n] = stored(times[k]);
            for (size_t i = 0; i < 4; ++i) {
                previous[i] = q[i] * side;
                v[i] = stored(previous[i]);
            }
        }
        return true;
    }
    std::vector<EulerRotation::Quat> q(times.size());
    for (size_t k = 0; k < times.size(); ++k) {
        q[k] = EulerRotation::ToQuaternion({angle(0, k), angle(1, k), angle(2, k)});
    }
    const double chord = 2 * std::sin(tolerance * 3.14159265358979323846 / 180 / 4);
    std::vector<size_t> kept =
        reduce(times.size(), [&](size_t i, size_t j) { return slerp_fits(times, q, i, j, chord); });
    out->times.resize(kept.size());
    out->values.resize(kept.size() * 4);
    float* v = out->values.data();
    EulerRotation::Quat previous = {0, 0, 0, 1};
    for (size_t n = 0; n < kept.size(); ++n, v += 4) {
        // Each sample on the hemisphere of the one before: players take the shortest way round.
        EulerRotation::Quat r = q[kept[n]];
        if (n > 0 &&
            r[0] * previous[0] + r[1] * previous[1] + r[2] * previous[2] + r[3] * previous[3] < 0) {
            for (double& x : r) {
                x = -x;
            }
        }
        out->times[n] = stored(times[kept[n]]);
        for (size_t i = 0; i < 4; ++i) {
            v[i] = stored(r[i]);
        }
        previous = r;
    }
    return true;
}

void SamplerBuilder::keysExact(BuiltSampler* out) const {
    const bool cubic = out->interpolation == "CUBICSPLINE";
    const auto& lead = lead_->keys();
    const size_t n = lead.size(), stride = cubic ? 9 : 3;
    out->times.resize(n);
    out->values.resize(n * stride);
    for (size_t k = 0; k < n; ++k) {
        out->times[k] = stored(lead[k].time);
    }
    // Axis by axis into the interleaved values: in-tangents, values, out-tangents of each key.
    for (int a = 0; a < 3; ++a) {
        const ChannelCurve* c = curves_[a];
        float* v = out->values.data() + (cubic ? 3 : 0) + a;
        for (size_t k = 0; k < n; ++k, v += stride) {
            v[0] = stored(c ? c->keys()[k].value : rest_[a]);
            if (cubic) {
                v[-3] = c ? stored(c->InSlope(k)) : 0.0f;
                v[3] = c ? stored(c->OutSlope(k)) : 0.0f;
            }
        }
    }
}

void SamplerBuilder::unionCubic(BuiltSampler* out) const {
    // A piece of a cubic is a cubic: cutting every axis at the union of the key times keeps
    // each axis exact, with the slope on either side of every cut.
    out->interpolation = "CUBICSPLINE";
    std::vector<double> times = unionTimes();
    std::vector<double> axis[3], in[3], leave[3];
    for (int a = 0; a < 3; ++a) {
        if (curves_[a]) {
            curves_[a]->SampleSorted(times, &axis[a], &in[a], &leave[a]);
        } else {
            axis[a].assign(times.size(), rest_[a]);
            in[a].assign(times.size(), 0.0);
            leave[a].assign(times.size(), 0.0);
        }
    }
    const size_t n = times.size();
    out->times.resize(n);
    out->values.resize(n * 9);
    float* v = out->values.data();
    for (size_t k = 0; k < n; ++k, v += 9) {
        out->times[k] = stored(times[k]);
        for (int a = 0; a < 3; ++a) {
            v[a] = stored(in[a][k]);
            v[3 + a] = stored(axis[a][k]);
            v[6 + a] = stored(leave[a][k]);
        }
    }
}

std::vector<double> SamplerBuilder::unionTimes() const {
    std::vector<double> all, one, merged;
    for (const ChannelCurve* c : curves_) {
        if (!c) {
            continue;
        }
        one.clear();
        for (const ChannelCurve::Key& k : c->keys()) {
            one.push_back(k.time);
        }
        merged.resize(all.size() + one.size());
        std::merge(all.begin(), all.end(), one.begin(), one.end(), merged.begin());
        all.swap(merged);
    }
    std::vector<double> out;
    out.reserve(all.size());
    for (double t : all) {
        if (out.empty() || float(t) > float(out.back())) {
            out.push_back(t);
        }
    }
    return out;
}

std::vector<char> SamplerBuilder::plainSpans(const std::vector<double>& keys,
                                             double straightUpTo) const {
    std::vector<char> still(keys.empty() ? 0 : keys.size() - 1, 1);
    for (const ChannelCurve* c : curves_) {
        if (!c) {
            continue;
        }
        const auto& own = c->keys();
        size_t after = 0;  // the first of the curve's keys after the span's middle
        for (size_t k = 0; k < still.size(); ++k) {
            double mid = (keys[k] + keys[k + 1]) / 2;
            while (after < own.size() && own[after].time <= mid) {
                ++after;
            }
            if (after == 0 || after == own.size()) {
                continue;  // held before the first key or after the last
            }
            size_t i = after - 1;
            if (own[i].out == ChannelCurve::kLinear && own[i + 1].in == ChannelCurve::kLinear &&
                std::fabs(own[i + 1].value - own[i].value) < straightUpTo) {
                continue;  // a straight line, which the written pieces follow exactly
            }
            if (own[i].value != own[i + 1].value ||
                (own[i].out != ChannelCurve::kStep &&
                 (c->OutSlope(i) != 0 || c->InSlope(i + 1) != 0))) {
                still[k] = 0;
            }
        }
    }
    return still;
}

bool SamplerBuilder::candidateTimes(std::vector<double>* out, double straightUpTo,
                                    std::string* why) const {
    std::vector<double> keys = unionTimes();
    std::vector<char> still = plainSpans(keys, straightUpTo);
    // Count first, so that a curve that would need too many samples costs no memory.
    double count = double(keys.size());
    for (size_t k = 0; k + 1 < keys.size(); ++k) {
        if (!still[k]) {
            count += std::max(0.0, std::floor(keys[k + 1] * fps_) - std::ceil(keys[k] * fps_) + 1);
        }
    }
    if (count > double(kMaxSampledFrames)) {
        *why = "its keys span " + std::to_string(static_cast<long long>(count)) +
               " frames to sample, more than the " + std::to_string(kMaxSampledFrames) + " allowed";
        return false;
    }
    out->clear();
    out->reserve(size_t(count));
    for (size_t k = 0; k < keys.size(); ++k) {
        out->push_back(keys[k]);
        if (k + 1 == keys.size() || still[k]) {
            continue;
        }
        const float next = float(keys[k + 1]);
        for (double f = std::ceil(keys[k] * fps_), t = f / fps_; t < keys[k + 1]; t = ++f / fps_) {
            if (float(t) > float(out->back()) && float(t) < next) {
                out->push_back(t);
            }
        }
    }
    return true;
}

bool SamplerBuilder::sampleCandidates(std::vector<double>* times, std::vector<double> axis[3],
                                      double straightUpTo, std::string* why) const {
    if (!candidateTimes(times, straightUpTo, why)) {
        return false;
    }
    evaluate(*times, axis);
    return true;
}

void SamplerBuilder::evaluate(const std::vector<double>& times, std::vector<double> axis[3]) const {
    for (int a = 0; a < 3; ++a) {
        if (curves_[a] && !curves_[a]->Constant()) {
            curves_[a]->EvaluateSorted(times, &axis[a]);
        } else if (curves_[a]) {
            axis[a].assign(times.size(), curves_[a]->keys().front().value);
        } else {
            axis[a].clear();  // holds rest_[a]
        }
    }
}
