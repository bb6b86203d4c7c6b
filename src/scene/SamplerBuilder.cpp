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

// The fewest of the points 0..n-1 (first and last always among them) such that every point
// between two kept ones fits the straight piece between them: `fits(i, k, j)` says whether
// point k lies within tolerance of the piece from i to j. Each piece is grown by doubling and
// then narrowed by bisection, so the cost is about n log n checks for long pieces.
template <class Fits>
std::vector<size_t> reduce(size_t n, const Fits& fits) {
    std::vector<size_t> kept;
    if (n == 0) {
        return kept;
    }
    auto piece_fits = [&](size_t i, size_t j) {
        for (size_t k = i + 1; k < j; ++k) {
            if (!fits(i, k, j)) {
                return false;
            }
        }
        return true;
    };
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
}  // namespace

SamplerBuilder::SamplerBuilder(const ChannelCurve* const curves[3], const double rest[3], int fps)
    : fps_(fps > 0 ? fps : 30) {
    for (int a = 0; a < 3; ++a) {
        curves_[a] = curves[a] && !curves[a]->empty() ? curves[a] : nullptr;
        rest_[a] = rest[a];
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
    std::vector<double> times;
    if (!candidateTimes(&times, why)) {
        return false;
    }
    std::vector<double> axis[3];
    evaluate(times, axis);
    auto fits = [&](size_t i, size_t k, size_t j) {
        double u = (times[k] - times[i]) / (times[j] - times[i]);
        for (int a = 0; a < 3; ++a) {
            double line = axis[a][i] + (axis[a][j] - axis[a][i]) * u;
            if (std::fabs(line - axis[a][k]) > kVectorTolerance * 0.5) {
                return false;
            }
        }
        return true;
    };
    out->interpolation = "LINEAR";
    for (size_t k : reduce(times.size(), fits)) {
        out->times.push_back(stored(times[k]));
        for (int a = 0; a < 3; ++a) {
            out->values.push_back(stored(axis[a][k]));
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
    std::vector<double> times;
    if (!candidateTimes(&times, why)) {
        return false;
    }
    std::vector<double> axis[3];
    evaluate(times, axis);
    std::vector<EulerRotation::Quat> q(times.size());
    for (size_t k = 0; k < times.size(); ++k) {
        q[k] = EulerRotation::ToQuaternion({axis[0][k], axis[1][k], axis[2][k]});
        if (k > 0) {  // stay on the hemisphere of the previous sample: shortest way round
            const EulerRotation::Quat& p = q[k - 1];
            if (q[k][0] * p[0] + q[k][1] * p[1] + q[k][2] * p[2] + q[k][3] * p[3] < 0) {
                for (double& v : q[k]) {
                    v = -v;
                }
            }
        }
    }
    // Float storage moves a quaternion by about 1e-5 degrees: well inside the margin.
    auto fits = [&](size_t i, size_t k, size_t j) {
        double u = (times[k] - times[i]) / (times[j] - times[i]);
        return EulerRotation::AngleBetween(EulerRotation::Slerp(q[i], q[j], u), q[k]) <=
               kRotationToleranceDegrees * 0.5;
    };
    out->interpolation = "LINEAR";
    for (size_t k : reduce(times.size(), fits)) {
        out->times.push_back(stored(times[k]));
        for (double v : q[k]) {
            out->values.push_back(stored(v));
        }
    }
    return true;
}

void SamplerBuilder::keysExact(BuiltSampler* out) const {
    bool cubic = out->interpolation == "CUBICSPLINE";
    const auto& lead = lead_->keys();
    out->times.reserve(lead.size());
    out->values.reserve(lead.size() * (cubic ? 9 : 3));
    for (size_t k = 0; k < lead.size(); ++k) {
        out->times.push_back(stored(lead[k].time));
        for (int part = cubic ? 0 : 1; part < (cubic ? 3 : 2); ++part) {
            for (int a = 0; a < 3; ++a) {
                const ChannelCurve* c = curves_[a];
                double v = 0;
                if (part == 1) {
                    v = c ? c->keys()[k].value : rest_[a];
                } else if (c) {
                    v = part == 0 ? c->InSlope(k) : c->OutSlope(k);
                }
                out->values.push_back(stored(v));
            }
        }
    }
}

void SamplerBuilder::unionCubic(BuiltSampler* out) const {
    // A piece of a cubic is a cubic: cutting every axis at the union of the key times keeps
    // each axis exact, with the slope on either side of every cut.
    out->interpolation = "CUBICSPLINE";
    std::vector<double> times = unionTimes();
    std::vector<double> axis[3];
    evaluate(times, axis);
    for (size_t k = 0; k < times.size(); ++k) {
        out->times.push_back(stored(times[k]));
        for (int part = 0; part < 3; ++part) {
            for (int a = 0; a < 3; ++a) {
                const ChannelCurve* c = curves_[a];
                double v = part == 1 ? axis[a][k] : (c ? c->SlopeAt(times[k], part == 2) : 0.0);
                out->values.push_back(stored(v));
            }
        }
    }
}

std::vector<double> SamplerBuilder::unionTimes() const {
    std::vector<double> all;
    for (const ChannelCurve* c : curves_) {
        if (c) {
            for (const ChannelCurve::Key& k : c->keys()) {
                all.push_back(k.time);
            }
        }
    }
    std::sort(all.begin(), all.end());
    std::vector<double> out;
    out.reserve(all.size());
    for (double t : all) {
        if (out.empty() || float(t) > float(out.back())) {
            out.push_back(t);
        }
    }
    return out;
}

bool SamplerBuilder::stillBetween(double from, double to) const {
    double mid = (from + to) / 2;
    for (const ChannelCurve* c : curves_) {
        if (!c) {
            continue;
        }
        const auto& keys = c->keys();
        auto it = std::upper_bound(keys.begin(), keys.end(), mid,
                                   [](double s, const ChannelCurve::Key& k) { return s < k.time; });
        if (it == keys.begin() || it == keys.end()) {
            continue;  // held before the first key or after the last
        }
        size_t i = size_t(it - keys.begin()) - 1;
        if (keys[i].value != keys[i + 1].value) {
            return false;
        }
        if (keys[i].out != ChannelCurve::kStep && (c->OutSlope(i) != 0 || c->InSlope(i + 1) != 0)) {
            return false;
        }
    }
    return true;
}

bool SamplerBuilder::candidateTimes(std::vector<double>* out, std::string* why) const {
    std::vector<double> keys = unionTimes();
    // Count first, so that a curve that would need too many samples costs no memory.
    double count = double(keys.size());
    for (size_t k = 0; k + 1 < keys.size(); ++k) {
        if (!stillBetween(keys[k], keys[k + 1])) {
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
        if (k + 1 == keys.size() || stillBetween(keys[k], keys[k + 1])) {
            continue;
        }
        for (double f = std::ceil(keys[k] * fps_); f / fps_ < keys[k + 1]; ++f) {
            double t = f / fps_;
            if (float(t) > float(out->back()) && float(t) < float(keys[k + 1])) {
                out->push_back(t);
            }
        }
    }
    return true;
}

void SamplerBuilder::evaluate(const std::vector<double>& times, std::vector<double> axis[3]) const {
    for (int a = 0; a < 3; ++a) {
        if (curves_[a]) {
            curves_[a]->EvaluateSorted(times, &axis[a]);
        } else {
            axis[a].assign(times.size(), rest_[a]);
        }
    }
}
