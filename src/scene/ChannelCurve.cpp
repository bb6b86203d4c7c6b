#include "scene/ChannelCurve.h"

#include <algorithm>
#include <cmath>

#include "toolkit/CueTime.h"

namespace {
constexpr double kSameTime = 0.5e-6;  // seconds: keys closer than this are at one time
}

double ChannelCurve::segmentSlope(size_t i) const {
    const Key& a = keys_[i];
    const Key& b = keys_[i + 1];
    double dt = b.time - a.time;
    return dt > 0 ? (b.value - a.value) / dt : 0.0;
}

double ChannelCurve::smoothSlope(size_t i) const {
    size_t n = keys_.size();
    if (n < 2) {
        return 0.0;
    }
    size_t lo = i == 0 ? 0 : i - 1;
    size_t hi = i + 1 < n ? i + 1 : n - 1;
    double dt = keys_[hi].time - keys_[lo].time;
    return dt > 0 ? (keys_[hi].value - keys_[lo].value) / dt : 0.0;
}

double ChannelCurve::OutSlope(size_t i) const {
    const Key& k = keys_[i];
    switch (k.out) {
        case kSmooth:
            return smoothSlope(i);
        case kLinear:
            return i + 1 < keys_.size() ? segmentSlope(i) : 0.0;
        case kExplicit:
            return k.outSlope;
        case kFlat:
        case kStep:
            break;
    }
    return 0.0;
}

double ChannelCurve::InSlope(size_t i) const {
    const Key& k = keys_[i];
    switch (k.in) {
        case kSmooth:
            return smoothSlope(i);
        case kLinear:
            return i > 0 ? segmentSlope(i - 1) : 0.0;
        case kExplicit:
            return k.inSlope;
        case kFlat:
        case kStep:
            break;
    }
    return 0.0;
}

double ChannelCurve::Evaluate(double seconds) const {
    if (keys_.empty()) {
        return 0.0;
    }
    if (std::isnan(seconds)) {
        return keys_.front().value;
    }
    // Key times read from files are floats: a time within float rounding of a key is at the
    // key, so that evaluating at a key's frame gives the key's own value.
    double eps = 1e-9 + std::fabs(seconds) * 1.2e-7;
    auto it = std::upper_bound(keys_.begin(), keys_.end(), seconds + eps,
                               [](double s, const Key& k) { return s < k.time; });
    if (it == keys_.begin()) {
        return keys_.front().value;
    }
    size_t i = size_t(it - keys_.begin()) - 1;  // the last key at or before `seconds`
    if (i + 1 == keys_.size() || std::fabs(seconds - keys_[i].time) <= eps) {
        return keys_[i].value;
    }
    return segment(i, seconds);
}

double ChannelCurve::segment(size_t i, double seconds) const {
    const Key& a = keys_[i];
    const Key& b = keys_[i + 1];
    if (a.out == kStep) {
        return a.value;
    }
    double dt = b.time - a.time;
    double u = (seconds - a.time) / dt;
    if (a.out == kLinear && b.in == kLinear) {
        return a.value + (b.value - a.value) * u;  // exact straight line
    }
    double m0 = OutSlope(i) * dt;
    double m1 = InSlope(i + 1) * dt;
    double u2 = u * u, u3 = u2 * u;
    return (2 * u3 - 3 * u2 + 1) * a.value + (u3 - 2 * u2 + u) * m0 + (-2 * u3 + 3 * u2) * b.value +
           (u3 - u2) * m1;
}

double ChannelCurve::SlopeAt(double seconds, bool outgoing) const {
    size_t n = keys_.size();
    if (n < 2 || std::isnan(seconds)) {
        return 0.0;
    }
    double eps = 1e-9 + std::fabs(seconds) * 1.2e-7;
    auto it = std::upper_bound(keys_.begin(), keys_.end(), seconds + eps,
                               [](double s, const Key& k) { return s < k.time; });
    if (it == keys_.begin()) {
        return 0.0;  // held before the first key
    }
    size_t i = size_t(it - keys_.begin()) - 1;  // the last key at or before `seconds`
    if (std::fabs(seconds - keys_[i].time) <= eps) {
        // At key i: the segment leaving it, or the one arriving at it.
        if (outgoing) {
            return i + 1 < n && keys_[i].out != kStep ? OutSlope(i) : 0.0;
        }
        return i > 0 && keys_[i - 1].out != kStep ? InSlope(i) : 0.0;
    }
    if (i + 1 == n || keys_[i].out == kStep) {
        return 0.0;
    }
    const Key& a = keys_[i];
    const Key& b = keys_[i + 1];
    double dt = b.time - a.time;
    if (a.out == kLinear && b.in == kLinear) {
        return (b.value - a.value) / dt;
    }
    double u = (seconds - a.time) / dt;
    double m0 = OutSlope(i) * dt, m1 = InSlope(i + 1) * dt;
    return ((6 * u * u - 6 * u) * (a.value - b.value) + (3 * u * u - 4 * u + 1) * m0 +
            (3 * u * u - 2 * u) * m1) /
           dt;
}

void ChannelCurve::EvaluateSorted(const std::vector<double>& times,
                                  std::vector<double>* out) const {
    out->resize(times.size());
    size_t n = keys_.size();
    size_t i = 0;  // keys before i lie at or before the current time (within rounding)
    for (size_t k = 0; k < times.size(); ++k) {
        double seconds = times[k];
        if (n == 0 || std::isnan(seconds)) {
            (*out)[k] = n == 0 ? 0.0 : keys_.front().value;
            continue;
        }
        double eps = 1e-9 + std::fabs(seconds) * 1.2e-7;
        while (i < n && keys_[i].time <= seconds + eps) {
            ++i;
        }
        if (i == 0) {
            (*out)[k] = keys_.front().value;
        } else if (i == n || std::fabs(seconds - keys_[i - 1].time) <= eps) {
            (*out)[k] = keys_[i - 1].value;
        } else {
            (*out)[k] = segment(i - 1, seconds);
        }
    }
}

double ChannelCurve::eval(double frame) const {
    int fps = CueTime::default_fps > 0 ? CueTime::default_fps : 30;
    return Evaluate(frame / fps);
}

bool ChannelCurve::AllLinear() const {
    for (size_t i = 0; i + 1 < keys_.size(); ++i) {
        if (keys_[i].out != kLinear || keys_[i + 1].in != kLinear) {
            return false;
        }
    }
    return true;
}

bool ChannelCurve::AllStep() const {
    for (size_t i = 0; i + 1 < keys_.size(); ++i) {
        if (keys_[i].out != kStep) {
            return false;
        }
    }
    return true;
}

void ChannelCurve::Merge(const Key& key) {
    auto it = std::lower_bound(keys_.begin(), keys_.end(), key.time - kSameTime,
                               [](const Key& k, double t) { return k.time < t; });
    if (it != keys_.end() && std::fabs(it->time - key.time) <= kSameTime) {
        *it = key;
    } else {
        keys_.insert(it, key);
    }
}

ChannelCurve::Kind ChannelCurve::KindFromCode(int code) {
    switch (code) {
        case KLWire::kSmooth:
            return kSmooth;
        case KLWire::kFlat:
            return kFlat;
        default:
            return kLinear;
    }
}

bool ChannelCurve::FromApplyArrays(int count, const CueTime* times, const float* values,
                                   const int* inTangents, const int* outTangents,
                                   std::vector<Key>* keys) {
    keys->clear();
    if (count < 0 || (count > 0 && (!times || !values))) {
        return false;
    }
    keys->reserve(size_t(count));
    for (int i = 0; i < count; ++i) {
        if (!std::isfinite(values[i])) {
            keys->clear();
            return false;
        }
        Key k;
        k.time = times[i].Seconds();
        k.value = values[i];
        k.in = KindFromCode(inTangents ? inTangents[i] : KLWire::kLinear);
        k.out = KindFromCode(outTangents ? outTangents[i] : KLWire::kLinear);
        keys->push_back(k);
    }
    std::stable_sort(keys->begin(), keys->end(),
                     [](const Key& a, const Key& b) { return a.time < b.time; });
    return true;
}
