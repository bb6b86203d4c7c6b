#include "toolkit/KLStopWatch.h"

#include "toolkit/TimerClock.h"

KLStopWatch::KLStopWatch(double rate) : rate_(rate) {}

void KLStopWatch::Reset() {
    marks_.clear();
}

void KLStopWatch::Mark() {
    marks_.push_back(TimerClock::Now());
}

int KLStopWatch::Marks() const {
    return int(marks_.size());
}

double KLStopWatch::FrameRate() const {
    if (marks_.size() < 2)
        return 0.0;
    double span = marks_.back() - marks_.front();
    return span > 0 ? rate_ * double(marks_.size() - 1) / span : 0.0;
}
