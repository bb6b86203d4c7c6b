#include "scene/KLChannel.h"

#include <algorithm>

namespace {
// Index of the first key at or after `t`.
template <typename Keys>
size_t lower(const Keys& keys, CueTime t) {
    size_t lo = 0, hi = keys.size();
    while (lo < hi) {
        size_t mid = (lo + hi) / 2;
        if (keys[mid].time < t) {
            lo = mid + 1;
        } else {
            hi = mid;
        }
    }
    return lo;
}
}  // namespace

void KLChannel::AddKey(CueTime t, float value) {
    size_t i = lower(keys_, t);
    if (i < keys_.size() && keys_[i].time == t) {
        keys_[i].value = value;
    } else {
        keys_.insert(keys_.begin() + long(i), Key{t, value});
    }
}

void KLChannel::SetValue(CueTime t, float value) {
    if (static_ || !keyed_) {
        staticValue_ = value;
    } else {
        AddKey(t, value);
    }
}

float KLChannel::Evaluate(CueTime t) const {
    if (static_ || keys_.empty()) {
        return keys_.empty() || static_ ? staticValue_ : keys_.front().value;
    }
    size_t i = lower(keys_, t);
    if (i == 0) {
        return keys_.front().value;
    }
    if (i == keys_.size()) {
        return keys_.back().value;
    }
    const Key& a = keys_[i - 1];
    const Key& b = keys_[i];
    double u = double(t.Ticks() - a.time.Ticks()) / double(b.time.Ticks() - a.time.Ticks());
    return float(a.value + (b.value - a.value) * u);
}

float KLSplineChannel::Evaluate(CueTime t) const {
    if (static_ || keys_.size() < 3) {
        return KLChannel::Evaluate(t);
    }
    size_t i = lower(keys_, t);
    if (i == 0 || i == keys_.size()) {
        return KLChannel::Evaluate(t);
    }
    // Catmull-Rom through the keys on each side, with slopes in value per tick.
    auto slope = [&](size_t k) {
        size_t lo = k == 0 ? 0 : k - 1, hi = std::min(k + 1, keys_.size() - 1);
        double dt = double(keys_[hi].time.Ticks() - keys_[lo].time.Ticks());
        return dt > 0 ? (keys_[hi].value - keys_[lo].value) / dt : 0.0;
    };
    const Key& a = keys_[i - 1];
    const Key& b = keys_[i];
    double dt = double(b.time.Ticks() - a.time.Ticks());
    double u = double(t.Ticks() - a.time.Ticks()) / dt;
    double m0 = slope(i - 1) * dt, m1 = slope(i) * dt;
    double u2 = u * u, u3 = u2 * u;
    return float((2 * u3 - 3 * u2 + 1) * a.value + (u3 - 2 * u2 + u) * m0 +
                 (-2 * u3 + 3 * u2) * b.value + (u3 - u2) * m1);
}
