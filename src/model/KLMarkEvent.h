#pragma once

#include "toolkit/CueTime.h"

// A one-character label pinned to an instant of the sound.
class KLMarkEvent {
  public:
    KLMarkEvent(CueTime t, char c) : time(t), label(c) {}

    // Orders marks by time: 0 for equal times, -1 when a's is earlier, else 1.
    static int CompareByTimestamp(const void* a, const void* b);

    CueTime time;
    char label;
};
