#pragma once

#include <atomic>

// The running state of one KLTimer, shared with the sound thread. The event-loop thread
// writes it (start, stop); the sound thread only reads it, so every field is atomic and the
// sound control can keep it alive after the timer itself is destroyed.
class TimerClock {
  public:
    using Source = double (*)();

    TimerClock(double fromSeconds, double toSeconds) : from_(fromSeconds), to_(toSeconds) {}

    // Seconds of the clock that every timer runs on: CLOCK_MONOTONIC, or the source set with
    // SetSource (tests drive timers from the sound device's own sample count).
    static double Now();
    static void SetSource(Source source);

    void Start(double now);
    void Stop(double now);

    double From() const { return from_; }
    double To() const { return to_; }
    bool Running() const { return running_.load(std::memory_order_acquire); }
    bool Started() const { return started_.load(std::memory_order_acquire); }
    // The timer's time in seconds at clock time `now`: from `from`, moving one second per
    // second towards `to` while running, never past it; frozen while stopped.
    double At(double now) const;

  private:
    const double from_, to_;
    std::atomic<bool> running_{false};
    std::atomic<bool> started_{false};
    std::atomic<double> startClock_{0.0};     // clock time at which elapsed time was zero
    std::atomic<double> frozenElapsed_{0.0};  // elapsed seconds at the last stop
};
