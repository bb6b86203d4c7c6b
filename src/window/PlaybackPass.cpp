#include "window/PlaybackPass.h"

#include <cmath>

namespace {
double span_frames(CueTime from, CueTime to) {
    return double((to - from).Ticks()) * CueTime::default_fps / CueTime::kTicksPerSecond;
}
}  // namespace

CueTime PlaybackPass::StretchedEnd(CueTime from, CueTime to, float speed) {
    return from + CueTime(span_frames(from, to) / double(speed), 0);
}

float PlaybackPass::FastSpeed(float speed) {
    return float(double(speed) + 0.25);
}

float PlaybackPass::MenuSpeed(int index, float current) {
    static const float speeds[] = {1.0f, 0.75f, 0.5f, 0.25f};
    return index >= 0 && index < 4 ? speeds[index] : current;
}

CueTime PlaybackPass::Position(CueTime from, CueTime timerNow, float speed) {
    return from + CueTime(span_frames(from, timerNow) * double(speed), 0);
}

int PlaybackPass::RegionFrames(CueTime start, CueTime end) {
    return int(std::lround(span_frames(start, end)));
}

KeyImageChoice KeyImageChoice::Choose(int style, bool prev, bool next, float fraction) {
    KeyImageChoice c;
    if (prev && next) {
        if (style == 2)
            c.show = kDissolve, c.fade = fraction;
        else if (style == 1)
            c.show = kPrev;
        else
            c.show = fraction > 0.5f ? kNext : kPrev;  // exactly one half still shows prev
    } else {
        c.show = next ? kNext : prev ? kPrev : kNone;
    }
    return c;
}
