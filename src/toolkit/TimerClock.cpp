#include "toolkit/TimerClock.h"

#include <algorithm>
#include <cmath>

#include "toolkit/MonotonicClock.h"

namespace {
std::atomic<TimerClock::Source> source{nullptr};
}

double TimerClock::Now() {
    Source s = source.load(std::memory_order_acquire);
    return s ? s() : MonotonicSeconds();
}

void TimerClock::SetSource(Source s) {
    source.store(s, std::memory_order_release);
}

void TimerClock::Start(double now) {
    if (Running())
        return;
    startClock_.store(now - frozenElapsed_.load(), std::memory_order_relaxed);
    started_.store(true, std::memory_order_release);
    running_.store(true, std::memory_order_release);
}

void TimerClock::Stop(double now) {
    if (!Running())
        return;
    frozenElapsed_.store(now - startClock_.load(), std::memory_order_relaxed);
    running_.store(false, std::memory_order_release);
}

double TimerClock::At(double now) const {
    double elapsed = Running() ? now - startClock_.load(std::memory_order_relaxed)
                               : frozenElapsed_.load(std::memory_order_relaxed);
    double span = std::fabs(to_ - from_);
    double run = std::clamp(elapsed, 0.0, span);
    return to_ < from_ ? from_ - run : from_ + run;
}
