#pragma once

#include <vector>

// Marks displayed frames during playback and reports their rate.
class KLStopWatch {
  public:
    explicit KLStopWatch(double rate = 1.0);

    void Reset();
    // Notes that a frame was displayed now.
    void Mark();
    int Marks() const;
    // Frames per second between the first and the last mark (0 with fewer than two marks).
    double FrameRate() const;

  private:
    double rate_;
    std::vector<double> marks_;  // TimerClock::Now seconds
};
