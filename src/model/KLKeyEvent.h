#pragma once

#include "toolkit/CueTime.h"

class KLKey;

// The smoothing named by `name`: "Linear"/"LINEAR"/"linear" 0, "Smooth"/"SMOOTH"/"smooth" 2;
// anything else, null included, 1 (Ease).
int SmoothFromString(const char* name);

// A keyframe of a key track: at `time`, call up key shape `key` (index `shapeIndex` of the
// track's keyset) with weight `value` and a smoothing kind.
class KLKeyEvent {
  public:
    // Smoothing kinds.
    enum Smoothing { kLinear = 0, kEase = 1, kSmooth = 2 };

    KLKeyEvent(int a_shapeIndex, CueTime a_time, KLKey* a_key, int a_smoothing, float a_value)
        : shapeIndex(a_shapeIndex),
          time(a_time),
          key(a_key),
          smoothing(a_smoothing),
          value(a_value) {}

    void SetSmoothName(const char* name) { smoothing = SmoothFromString(name); }
    // "Linear", "Ease", "Smooth", or "Unknown" for any other smoothing.
    const char* GetSmoothName() const;

    // Orders events by time: 0 for equal times, -1 when a's is earlier, else 1.
    static int CompareByTimestamp(const void* a, const void* b);

    int shapeIndex;
    CueTime time;
    KLKey* key;  // borrowed from the keyset
    int smoothing;
    float value;
};
