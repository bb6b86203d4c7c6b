#include "scene/KLChannel.h"

#include <algorithm>

size_t KLChannel::keyAtOrAfter(CueTime t) const {
    return size_t(std::lower_bound(keys_.begin(), keys_.end(), t,
                                   [](const Key& k, CueTime at) { return k.time < at; }) -
                  keys_.begin());
}

void KLChannel::AddKey(CueTime t, float value) {
    size_t i = keyAtOrAfter(t);
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
    size_t i = keyAtOrAfter(t);
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
