#pragma once

#include <vector>

#include "toolkit/CueTime.h"

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
    bool Running() const { return running_; }
    bool Reverse() const { return to_ < from_; }
    // The current time (from() before start, frozen after stop or at the end).
    CueTime Current() const;
    // The current time in seconds with sub-tick precision, for the sound thread.
    double CurrentSeconds() const;

    // Fires the triggers that are due; returns true while the timer still runs.
    bool fire_due();

  private:
    struct Posted {
        Trigger trigger;
        void* data;
        CueTime at;
        bool fired;
    };
    double elapsed() const;  // seconds of wall clock since start (frozen after stop)

    CueTime from_, to_;
    bool running_ = false;
    double startClock_ = 0.0;   // monotonic seconds at start
    double frozenElapsed_ = 0.0;
    std::vector<Posted> triggers_;
};
