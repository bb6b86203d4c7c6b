#pragma once

// The order of the events of a track (key events, marks), for the skip lists that hold them:
// 0 for equal times, -1 when a's time is earlier, else 1. `Event` has a CueTime `time`.
template <typename Event>
int CompareEventTimes(const void* a, const void* b) {
    const auto ta = static_cast<const Event*>(a)->time;
    const auto tb = static_cast<const Event*>(b)->time;
    if (ta == tb)
        return 0;
    return ta < tb ? -1 : 1;
}
