#pragma once

#include <memory>
#include <vector>

#include "toolkit/CueTime.h"
#include "toolkit/TimerClock.h"

// A wall-clock timer on the workspace time line. Once started, its current time runs from
// `from` towards `to` at the rate of the monotonic clock (backwards when `to` is earlier than
// `from`) and stops at `to`. Triggers posted at a time fire, on the thread that runs
// KLTimerBeat::Tick (the event loop), once the current time has reached them.
class KLTimer {
  public:
    using Trigger = void (*)(KLTimer* timer, void* data);

    KLTimer(CueTime from, CueTime to);
    ~KLTimer();
    KLTimer(const KLTimer&) = delete;
    KLTimer& operator=(const KLTimer&) = delete;

    // Calls `trigger` with `data` once the current time reaches `at`.
    void post_trigger(Trigger trigger, void* data, CueTime at);
    void start();
    // Freezes the current time where it is; triggers not yet due never fire.
    void stop();

    CueTime From() const { return from_; }
    CueTime To() const { return to_; }
    bool Running() const { return clock_->Running(); }
    bool Reverse() const { return to_ < from_; }
    // The current time (from() before start, frozen after stop or at the end).
    CueTime Current() const;
    // The current time in seconds with sub-tick precision, for the sound thread.
    double CurrentSeconds() const;

    // Fires the triggers that are due; returns true while the timer still runs.
    bool fire_due();

    // The timer's running state, for the sound thread; it outlives the timer.
    std::shared_ptr<const TimerClock> Clock() const { return clock_; }

  private:
    struct Posted {
        Trigger trigger;
        void* data;
        CueTime at;
        bool fired;
    };
    CueTime from_, to_;
    std::shared_ptr<TimerClock> clock_;
    std::vector<Posted> triggers_;
    bool* alive_ = nullptr;  // set false by the destructor while fire_due runs a trigger
};
