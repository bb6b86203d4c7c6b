#pragma once

// The sound device's own clock, as seen from the times at which it asks for buffers. Those
// wake-up times jitter with the scheduler, but the samples are heard at the device's steady
// pace: a delay-locked loop (bandwidth about half a hertz) follows the device's rate and
// phase and filters the jitter out. Times in seconds of TimerClock::Now.
class DeviceClock {
  public:
    // The filtered time of a buffer requested at `now` that lasts `period` seconds. A first
    // call, a change of period or a jump of more than `kRelock` starts the loop afresh.
    double Update(double now, double period);
    void Reset() { locked_ = false; }

    static constexpr double kRelock = 0.05;

  private:
    bool locked_ = false;
    double period_ = 0.0;
    double t0_ = 0.0, t1_ = 0.0;  // filtered times of this buffer and the next
    double step_ = 0.0;           // filtered length of one buffer
    double b_ = 0.0, c_ = 0.0;    // loop gains
};
