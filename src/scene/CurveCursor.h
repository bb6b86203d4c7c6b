#pragma once

#include <cmath>
#include <cstddef>
#include <vector>

#include "scene/ChannelCurve.h"
#include "scene/HermiteSegment.h"

// Reads a key curve at times that never go back: its value there and its slopes arriving and
// leaving (units per second), each segment's cubic worked out once for all the times inside it
// and a key's slopes when it is reached (in one pass over the keys, which a store makes while
// they are still in the cache). A time within float rounding of a key is at the key (as
// ChannelCurve::Evaluate has it), where the slopes are those of the segments on either side; a
// step leaves with slope 0. Inline: a store reads every axis of a path at every knot.
class CurveCursor {
  public:
    struct Point {
        double value, arriving, leaving;
    };

    // `curve` is borrowed.
    explicit CurveCursor(const ChannelCurve& curve)
        : curve_(curve), keys_(curve.keys()), cached_(keys_.size()) {}

    // The curve at `seconds`, which is not earlier than the time asked before.
    Point At(double seconds) {
        const size_t n = keys_.size();
        Point p{n == 0 ? 0.0 : keys_.front().value, 0.0, 0.0};
        if (n == 0 || std::isnan(seconds)) {
            return p;
        }
        const double eps = 1e-9 + std::fabs(seconds) * 1.2e-7;
        while (i_ < n && keys_[i_].time <= seconds + eps) {
            ++i_;
        }
        if (i_ == 0) {
            return p;  // held before the first key
        }
        const size_t j = i_ - 1;
        if (std::fabs(seconds - keys_[j].time) <= eps) {
            p.value = keys_[j].value;
            p.leaving = j + 1 < n ? curve_.OutSlope(j) : 0.0;  // (0 for a step)
            p.arriving = j > 0 && keys_[j - 1].out != ChannelCurve::kStep ? curve_.InSlope(j) : 0.0;
            return p;
        }
        if (i_ == n) {
            p.value = keys_.back().value;  // held after the last key
            return p;
        }
        if (cached_ != j) {
            cache(j);
        }
        if (step_) {
            p.value = v0_;
        } else if (straight_) {
            p.value = v0_ + (v1_ - v0_) * ((seconds - t0_) / dt_);  // as Evaluate has it
            p.arriving = p.leaving = (v1_ - v0_) / dt_;
        } else {
            const double u = (seconds - t0_) / dt_;
            p.value = HermiteSegment(v0_, v1_, m0_, m1_, u);
            p.arriving = p.leaving = HermiteSlope(v0_, v1_, m0_, m1_, u) / dt_;
        }
        return p;
    }

  private:
    // The coefficients of the segment from key j to j + 1.
    void cache(size_t j) {
        cached_ = j;
        const ChannelCurve::Key& a = keys_[j];
        const ChannelCurve::Key& b = keys_[j + 1];
        step_ = a.out == ChannelCurve::kStep;
        straight_ = a.out == ChannelCurve::kLinear && b.in == ChannelCurve::kLinear;
        t0_ = a.time;
        dt_ = b.time - a.time;
        v0_ = a.value;
        v1_ = b.value;
        m0_ = step_ || straight_ ? 0.0 : curve_.OutSlope(j) * dt_;
        m1_ = step_ || straight_ ? 0.0 : curve_.InSlope(j + 1) * dt_;
    }

    const ChannelCurve& curve_;
    const std::vector<ChannelCurve::Key>& keys_;
    size_t i_ = 0;   // keys before i_ lie at or before the last time asked
    size_t cached_;  // the segment whose coefficients follow (none: the key count)
    bool step_ = false, straight_ = false;
    double t0_ = 0, dt_ = 1, v0_ = 0, v1_ = 0, m0_ = 0, m1_ = 0;
};
