#include "toolkit/KLTimer.h"

#include "toolkit/TimerRegistry.h"

KLTimer::KLTimer(CueTime from, CueTime to)
    : from_(from), to_(to), clock_(std::make_shared<TimerClock>(from.Seconds(), to.Seconds())) {
    TimerRegistry::Add(this);
}

KLTimer::~KLTimer() {
    if (alive_)
        *alive_ = false;
    TimerRegistry::Remove(this);
}

void KLTimer::post_trigger(Trigger trigger, void* data, CueTime at) {
    triggers_.push_back({trigger, data, at, false});
}

void KLTimer::start() {
    clock_->Start(TimerClock::Now());
}

void KLTimer::stop() {
    clock_->Stop(TimerClock::Now());
}

double KLTimer::CurrentSeconds() const {
    return clock_->At(TimerClock::Now());
}

CueTime KLTimer::Current() const {
    // At the end exactly `to`, whatever the rounding of the seconds.
    double s = CurrentSeconds();
    return s == to_.Seconds() ? to_ : CueTime::FromSeconds(s);
}

bool KLTimer::fire_due() {
    if (!clock_->Started())
        return false;
    CueTime now = Current();
    bool ended = now == to_;
    if (ended)
        stop();
    // A trigger may post further triggers (so an index, not an iterator) or destroy this
    // timer (then nothing of it is touched again).
    bool alive = true;
    bool* outer = alive_;
    alive_ = &alive;
    for (size_t i = 0; i < triggers_.size(); i++) {
        Posted& p = triggers_[i];
        bool due = Reverse() ? now <= p.at : now >= p.at;
        if (!p.fired && due) {
            p.fired = true;
            p.trigger(this, p.data);
            if (!alive) {
                if (outer)
                    *outer = false;
                return false;
            }
        }
    }
    alive_ = outer;
    return clock_->Running();
}
