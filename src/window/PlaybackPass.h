#pragma once

#include "toolkit/CueTime.h"

// The arithmetic of a playback pass, kept apart from the window so that it can be tested
// without a display. Spans are counted in frames at the workspace rate (ticks *
// default_fps / 6000.0, in double precision) and turned back into times by rounding to the
// nearest tick.
class PlaybackPass {
  public:
    // The end of the timer for a pass over the region [from, to] played at `speed`: the
    // region's length stretched by the speed (twice as long at 0.5). `to` may be earlier
    // than `from` (a reverse pass).
    static CueTime StretchedEnd(CueTime from, CueTime to, float speed);
    // The fast speed: the normal speed plus one quarter, in double precision.
    static float FastSpeed(float speed);
    // The speed of an entry of the speed menu (0: 1, 1: 0.75, 2: 0.5, 3: 0.25); any other
    // index keeps `current`.
    static float MenuSpeed(int index, float current);
    // The region position shown when the timer of a pass that began at `from` reads
    // `timerNow` and the pass runs at `speed`.
    static CueTime Position(CueTime from, CueTime timerNow, float speed);
    // The number of whole frames of the region [start, end], rounded to nearest.
    static int RegionFrames(CueTime start, CueTime end);
};

// What the key image view shows at a time, by display style (0 midpoint, 1 keyframe,
// 2 dissolve), given which of the key events before (`prev`) and after (`next`) that time
// exist and the fraction between them: the image of one of them, a dissolve from prev's to
// next's by `fade`, or nothing.
struct KeyImageChoice {
    enum Show { kNone, kPrev, kNext, kDissolve };
    Show show = kNone;
    float fade = 0.0f;

    static KeyImageChoice Choose(int style, bool prev, bool next, float fraction);
};
