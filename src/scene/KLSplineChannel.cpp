#include "scene/KLSplineChannel.h"

#include <algorithm>

#include "scene/HermiteSegment.h"

float KLSplineChannel::Evaluate(CueTime t) const {
    if (static_ || keys_.size() < 3) {
        return KLChannel::Evaluate(t);
    }
    const size_t i = keyAtOrAfter(t);
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
    const double dt = double(b.time.Ticks() - a.time.Ticks());
    const double u = double(t.Ticks() - a.time.Ticks()) / dt;
    return float(HermiteSegment(a.value, b.value, slope(i - 1) * dt, slope(i) * dt, u));
}
