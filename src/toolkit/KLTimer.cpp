#include "toolkit/KLTimer.h"

#include <algorithm>
#include <ctime>

#include "toolkit/MonotonicClock.h"
#include "toolkit/TimerRegistry.h"

KLTimer::KLTimer(CueTime from, CueTime to) : from_(from), to_(to) { TimerRegistry::Add(this); }

KLTimer::~KLTimer() { TimerRegistry::Remove(this); }

void KLTimer::post_trigger(Trigger trigger, void* data, CueTime at) {
    triggers_.push_back({trigger, data, at, false});
}

void KLTimer::start() {
    startClock_ = MonotonicSeconds() - frozenElapsed_;
    running_ = true;
}

void KLTimer::stop() {
    if (!running_) return;
    frozenElapsed_ = MonotonicSeconds() - startClock_;
    running_ = false;
}

double KLTimer::elapsed() const {
    return running_ ? MonotonicSeconds() - startClock_ : frozenElapsed_;
}

double KLTimer::CurrentSeconds() const {
    double span = to_.Seconds() - from_.Seconds();
    double run = std::min(elapsed(), span < 0 ? -span : span);
    return from_.Seconds() + (span < 0 ? -run : run);
}

CueTime KLTimer::Current() const { return CueTime::FromSeconds(CurrentSeconds()); }

bool KLTimer::fire_due() {
    CueTime now = Current();
    bool ended = now == to_;
    if (ended && running_) stop();
    for (size_t i = 0; i < triggers_.size(); i++) {
        Posted& p = triggers_[i];
        bool due = Reverse() ? now <= p.at : now >= p.at;
        if (!p.fired && (due || (ended && p.at == to_))) {
            p.fired = true;
            p.trigger(this, p.data);  // may post further triggers: index, not iterator
        }
    }
    return running_;
}
