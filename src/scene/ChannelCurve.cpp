#include "scene/ChannelCurve.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <iterator>

#include "scene/CurveCursor.h"
#include "scene/HermiteSegment.h"
#include "toolkit/CueTime.h"

void ChannelCurve::Slopes(std::vector<double>* in, std::vector<double>* out, size_t from,
                          double scale) const {
    const size_t n = keys_.size();
    in->resize(n > from ? n - from : 0);
    out->resize(in->size());
    // the slope of the segment arriving at key i
    double before = from > 0 && from < n ? segmentSlope(from - 1) : 0.0;
    for (size_t i = from; i < n; ++i) {
        const Key& k = keys_[i];
        const double after = i + 1 < n ? segmentSlope(i) : 0.0;
        const double smooth = k.in == kSmooth || k.out == kSmooth ? smoothSlope(i) : 0.0;
        (*in)[i - from] = SideSlope(k.in, smooth, before, k.inSlope) * scale;
        (*out)[i - from] = SideSlope(k.out, smooth, after, k.outSlope) * scale;
        before = after;
    }
}

double ChannelCurve::MaxSlope() const {
    std::vector<double> in, out;
    Slopes(&in, &out);
    double most = 0;
    for (size_t i = 0; i + 1 < keys_.size(); ++i) {
        if (keys_[i].out == kStep) {
            continue;
        }
        const double dt = keys_[i + 1].time - keys_[i].time;
        if (dt > 0) {
            const HermiteCubic h(keys_[i].value, keys_[i + 1].value, out[i] * dt, in[i + 1] * dt);
            most = std::max(most, h.PeakSlope() / dt);
        }
    }
    return most;
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
    return HermiteSegment(a.value, b.value, OutSlope(i) * dt, InSlope(i + 1) * dt, u);
}

double ChannelCurve::SlopeAt(double seconds, bool outgoing) const {
    if (keys_.size() < 2 || std::isnan(seconds)) {
        return 0.0;
    }
    double eps = 1e-9 + std::fabs(seconds) * 1.2e-7;
    auto it = std::upper_bound(keys_.begin(), keys_.end(), seconds + eps,
                               [](double s, const Key& k) { return s < k.time; });
    return slopeAfter(size_t(it - keys_.begin()), seconds, eps, outgoing);
}

double ChannelCurve::slopeAfter(size_t after, double seconds, double eps, bool outgoing) const {
    size_t n = keys_.size();
    if (after == 0) {
        return 0.0;  // held before the first key
    }
    size_t i = after - 1;  // the last key at or before `seconds`
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
    const double u = (seconds - a.time) / dt;
    return HermiteSlope(a.value, b.value, OutSlope(i) * dt, InSlope(i + 1) * dt, u) / dt;
}

bool ChannelCurve::Constant() const {
    // With every value the same, smooth, linear and flat slopes are all zero: only a slope
    // given explicitly can move the curve between its keys.
    for (const Key& k : keys_) {
        if (k.value != keys_.front().value) {
            return false;
        }
    }
    for (size_t i = 0; i + 1 < keys_.size(); ++i) {
        if (keys_[i].out != kStep &&
            ((keys_[i].out == kExplicit && keys_[i].outSlope != 0) ||
             (keys_[i + 1].in == kExplicit && keys_[i + 1].inSlope != 0))) {
            return false;
        }
    }
    return true;
}

void ChannelCurve::EvaluateSorted(const std::vector<double>& times,
                                  std::vector<double>* out) const {
    out->resize(times.size());
    CurveCursor cursor(*this);
    for (size_t k = 0; k < times.size(); ++k) {
        (*out)[k] = cursor.At(times[k]).value;
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
    if (keys_.empty() || key.time > keys_.back().time + kSameTime) {
        keys_.push_back(key);  // the usual case: keys given in time order
        return;
    }
    auto it = std::lower_bound(keys_.begin(), keys_.end(), key.time - kSameTime,
                               [](const Key& k, double t) { return k.time < t; });
    if (it != keys_.end() && std::fabs(it->time - key.time) <= kSameTime) {
        *it = key;
    } else {
        keys_.insert(it, key);
    }
}

size_t ChannelCurve::TrimBefore(double seconds) {
    size_t first = 0;
    while (first < keys_.size() && keys_[first].time < seconds - kSameTime) {
        ++first;
    }
    if (first == 0) {
        return 0;
    }
    if (first == keys_.size()) {  // every key is earlier: the curve holds its last value
        Key hold = keys_.back();
        hold.time = seconds;
        hold.in = hold.out = kLinear;
        keys_.assign(1, hold);
        return first;
    }
    // The kept keys' slopes as they are now, before their neighbours change.
    Key& next = keys_[first];
    double in = InSlope(first), out = OutSlope(first);
    next.in = kExplicit;
    next.inSlope = float(in);
    if (next.out == kSmooth || (next.out == kLinear && first + 1 == keys_.size())) {
        next.out = kExplicit;
        next.outSlope = float(out);
    }
    bool atCut = std::fabs(next.time - seconds) <= kSameTime;
    Key cut;
    if (!atCut) {
        cut.time = seconds;
        cut.value = Evaluate(seconds);
        cut.in = kExplicit;
        cut.inSlope = float(SlopeAt(seconds, false));
        bool step = keys_[first - 1].out == kStep;
        cut.out = step ? kStep : kExplicit;
        cut.outSlope = step ? 0.0f : float(SlopeAt(seconds, true));
    }
    keys_.erase(keys_.begin(), keys_.begin() + long(first));
    if (!atCut) {
        keys_.insert(keys_.begin(), cut);
    }
    return first;
}

size_t ChannelCurve::FirstKeyAfter(double seconds) const {
    size_t first = size_t(std::upper_bound(keys_.begin(), keys_.end(), seconds,
                                           [](double t, const Key& k) { return t < k.time; }) -
                          keys_.begin());
    while (first < keys_.size() && !(float(keys_[first].time) > float(seconds))) {
        ++first;
    }
    return first;
}

double ChannelCurve::OthersStop(const ChannelCurve* const curves[], size_t count, bool going[]) {
    double latest = -HUGE_VAL, stop = -HUGE_VAL;
    for (size_t c = 0; c < count; ++c) {
        latest = curves[c] ? std::max(latest, curves[c]->keys_.back().time) : latest;
    }
    for (size_t c = 0; c < count; ++c) {
        const ChannelCurve* curve = curves[c];
        going[c] = curve && float(curve->keys_.back().time) == float(latest);
        stop = curve && !going[c] ? std::max(stop, curve->keys_.back().time) : stop;
    }
    return stop;
}

std::vector<double> ChannelCurve::UnionTimes(const ChannelCurve* const curves[], size_t count,
                                             double until) {
    std::vector<double> all, merged;
    for (size_t c = 0; c < count; ++c) {
        if (!curves[c]) {
            continue;
        }
        const std::vector<Key>& keys = curves[c]->keys_;
        const size_t end =
            size_t(std::upper_bound(keys.begin(), keys.end(), until,
                                    [](double t, const Key& k) { return t < k.time; }) -
                   keys.begin());
        // Axes of one keyset share their key times: nothing to merge.
        if (end == all.size() && std::equal(all.begin(), all.end(), keys.begin(),
                                            [](double t, const Key& k) { return t == k.time; })) {
            continue;
        }
        merged.resize(all.size() + end);
        size_t i = 0, j = 0, at = 0;
        while (i < all.size() && j < end) {
            merged[at++] = keys[j].time < all[i] ? keys[j++].time : all[i++];
        }
        for (; i < all.size(); ++i) {
            merged[at++] = all[i];
        }
        for (; j < end; ++j) {
            merged[at++] = keys[j].time;
        }
        all.swap(merged);
    }
    size_t kept = 0;
    for (double t : all) {
        if (kept == 0 || float(t) > float(all[kept - 1])) {
            all[kept++] = t;
        }
    }
    all.resize(kept);
    return all;
}

bool ChannelCurve::FromApplyArrays(int count, const CueTime* times, const float* values,
                                   const int* inTangents, const int* outTangents,
                                   std::vector<Key>* keys) {
    keys->clear();
    if (count < 0 || (count > 0 && (!times || !values))) {
        return false;
    }
    for (int i = 0; i < count; ++i) {
        if (!std::isfinite(values[i])) {
            return false;
        }
    }
    // Each key made where it goes, from an iterator over the arrays: a curve of thousands of
    // keys is written once, not cleared first (a third quicker than clearing and filling).
    struct Keys {
        using iterator_category = std::forward_iterator_tag;
        using value_type = Key;
        using difference_type = std::ptrdiff_t;
        using pointer = const Key*;
        using reference = Key;
        const CueTime* times;
        const float* values;
        const int *in, *out;
        int i;
        Key operator*() const {
            return Key{times[i].Seconds(),
                       values[i],
                       KindFromCode(in ? in[i] : KLWire::kLinear),
                       KindFromCode(out ? out[i] : KLWire::kLinear),
                       0.0f,
                       0.0f};
        }
        Keys& operator++() {
            ++i;
            return *this;
        }
        Keys operator++(int) {
            Keys was = *this;
            ++i;
            return was;
        }
        bool operator==(const Keys& o) const { return i == o.i; }
        bool operator!=(const Keys& o) const { return i != o.i; }
    };
    keys->assign(Keys{times, values, inTangents, outTangents, 0},
                 Keys{times, values, inTangents, outTangents, count});
    // Apply gives its keys in time order: sorting (which allocates) only when they are not.
    auto earlier = [](const Key& a, const Key& b) { return a.time < b.time; };
    if (!std::is_sorted(keys->begin(), keys->end(), earlier)) {
        std::stable_sort(keys->begin(), keys->end(), earlier);
    }
    return true;
}
