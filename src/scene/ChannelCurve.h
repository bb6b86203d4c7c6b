#pragma once

#include <cmath>
#include <vector>

#include "scene/KLWire.h"

// The key curve of one transform channel of a scene node: keys at times in seconds (strictly
// increasing), each with a value and the kind of its incoming and outgoing tangent. Between two
// keys the curve is a cubic Hermite segment whose end slopes follow from the tangent kinds
// (a step holds the left key's value); before the first key and after the last the curve holds.
class ChannelCurve : public OrChannel {
  public:
    enum Kind : unsigned char {
        kSmooth = 0,    // Catmull-Rom slope through the neighbouring keys
        kLinear = 1,    // slope of the straight line to the neighbour on that side
        kFlat = 2,      // zero slope
        kStep = 3,      // (out side only) hold the value until the next key
        kExplicit = 4,  // slope given in inSlope/outSlope (units per second)
    };
    // 32 bytes: an applied keyset makes hundreds of thousands of them. Explicit slopes come
    // from a file's float tangents, or from the curve itself at a cut at time 0, and are
    // written to files as floats, so floats hold them.
    struct Key {
        double time = 0;  // seconds
        double value = 0;
        Kind in = kLinear;
        Kind out = kLinear;
        float inSlope = 0;  // for kExplicit, units per second
        float outSlope = 0;
    };

    // Seconds: keys closer than this are at one time.
    static constexpr double kSameTime = 0.5e-6;

    ChannelCurve() = default;
    explicit ChannelCurve(std::vector<Key> keys) : keys_(std::move(keys)) {}

    const std::vector<Key>& keys() const { return keys_; }
    std::vector<Key>& keys() { return keys_; }
    bool empty() const { return keys_.empty(); }

    // Value at `seconds`.
    double Evaluate(double seconds) const;
    // Values at each of `times` (seconds, ascending), into `out`; the same as Evaluate on
    // each, in one pass over the keys.
    void EvaluateSorted(const std::vector<double>& times, std::vector<double>* out) const;
    // Value at `frame` frames of CueTime::default_fps.
    double eval(double frame) const override;

    // The slope (units per second) with which the curve leaves key `i` (out) or arrives at it
    // (in), resolved from the tangent kinds; a step leaves with slope 0. Inline: a store reads
    // them for every key it writes.
    double OutSlope(size_t i) const {
        const Key& k = keys_[i];
        return SideSlope(k.out, k.out == kSmooth ? smoothSlope(i) : 0.0,
                         k.out == kLinear && i + 1 < keys_.size() ? segmentSlope(i) : 0.0,
                         k.outSlope);
    }
    double InSlope(size_t i) const {
        const Key& k = keys_[i];
        return SideSlope(k.in, k.in == kSmooth ? smoothSlope(i) : 0.0,
                         k.in == kLinear && i > 0 ? segmentSlope(i - 1) : 0.0, k.inSlope);
    }
    // InSlope and OutSlope of every key from key `from` on (element i for key from + i), in one
    // pass (each segment's slope worked out once), each multiplied by `scale`.
    void Slopes(std::vector<double>* in, std::vector<double>* out, size_t from = 0,
                double scale = 1) const;
    // A bound on the size of the curve's slope anywhere (units per second).
    double MaxSlope() const;
    // The curve's derivative (units per second) at `seconds`, from the right (`outgoing`) or
    // from the left; zero where the curve holds, and at a step.
    double SlopeAt(double seconds, bool outgoing) const;
    // True when the curve has the same value everywhere.
    bool Constant() const;
    // True when every segment is a straight line (both ends linear) or every one a step.
    bool AllLinear() const;
    bool AllStep() const;

    // Inserts the key or replaces the one at the same time (within half a microsecond).
    void Merge(const Key& key);
    // Cuts the curve at `seconds`: keys before it are dropped and, when there were some, a key
    // at `seconds` holds the curve's value there; the curve from `seconds` on is unchanged
    // (slopes that depended on a dropped key are made explicit). Returns the keys dropped.
    size_t TrimBefore(double seconds);

    // The index of the first key whose time, as a file stores it (a float), is after that of
    // `seconds`; the key count when there is none.
    size_t FirstKeyAfter(double seconds) const;

    // Of the `count` curves (null ones left out), marks in `going` those keyed to the end (their
    // last key on the latest float time) and returns when the others stop (the latest of their
    // last keys); -HUGE_VAL when none stops before the end.
    static double OthersStop(const ChannelCurve* const curves[], size_t count, bool going[]);

    // Every key time of the `count` curves (null ones left out) up to `until`, ascending; times
    // that round to one float (as a file stores them) are one time, the earliest.
    static std::vector<double> UnionTimes(const ChannelCurve* const curves[], size_t count,
                                          double until = HUGE_VAL);

    // The curve kind of a scene tangent code (KLWire::Tangent); unknown codes are linear.
    static Kind KindFromCode(int code) {
        return code == KLWire::kSmooth ? kSmooth : (code == KLWire::kFlat ? kFlat : kLinear);
    }
    // The keys of `count` apply keys (times in ticks, values, tangent codes; null code arrays
    // mean linear), in time order; of two keys at one time the later given comes last. Null
    // when a value is not finite. KLWire::StoreChannel stores exactly these keys, and the
    // 3D preview evaluates them, so that the preview shows what apply writes.
    static bool FromApplyArrays(int count, const CueTime* times, const float* values,
                                const int* inTangents, const int* outTangents,
                                std::vector<Key>* keys);

  private:
    double segment(size_t i, double seconds) const;  // inside the segment from key i to i + 1
    // The slope through the neighbours of key i.
    double smoothSlope(size_t i) const {
        const size_t n = keys_.size();
        if (n < 2) {
            return 0.0;
        }
        const Key& lo = keys_[i == 0 ? 0 : i - 1];
        const Key& hi = keys_[i + 1 < n ? i + 1 : n - 1];
        const double dt = hi.time - lo.time;
        return dt > 0 ? (hi.value - lo.value) / dt : 0.0;
    }
    // The slope of the straight line from key i to key i + 1.
    double segmentSlope(size_t i) const {
        const double dt = keys_[i + 1].time - keys_[i].time;
        return dt > 0 ? (keys_[i + 1].value - keys_[i].value) / dt : 0.0;
    }
    // A key side's slope by its tangent `kind`: `smooth` the slope through the neighbouring
    // keys, `linear` the straight line to the neighbour on that side, `given` the explicit one.
    static double SideSlope(Kind kind, double smooth, double linear, double given) {
        switch (kind) {
            case kSmooth:
                return smooth;
            case kLinear:
                return linear;
            case kExplicit:
                return given;
            case kFlat:
            case kStep:
                break;
        }
        return 0.0;
    }
    // SlopeAt, given the index of the first key after `seconds` (plus `eps`, the rounding).
    double slopeAfter(size_t after, double seconds, double eps, bool outgoing) const;

    std::vector<Key> keys_;
};
