#include "toolkit/DeviceClock.h"

#include <cmath>

double DeviceClock::Update(double now, double period) {
    if (!locked_ || period != period_ || std::fabs(now - t1_) > kRelock) {
        const double omega = 2 * M_PI * 0.5 * period;  // half a hertz of bandwidth
        b_ = std::sqrt(2.0) * omega;
        c_ = omega * omega;
        period_ = period;
        step_ = period;
        t0_ = now;
        t1_ = now + period;
        locked_ = true;
        return t0_;
    }
    const double e = now - t1_;
    t0_ = t1_;
    t1_ += b_ * e + step_;
    step_ += c_ * e;
    return t0_;
}
