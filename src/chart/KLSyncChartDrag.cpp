// The sync chart's drags: the indicator, the region sweep, keys, the key stick and marks,
// and scrubbing the sound under the pointer.
#include <X11/Xlib.h>

#include <algorithm>
#include <chrono>
#include <climits>
#include <cstdlib>
#include <thread>

#include "chart/KLChartText.h"
#include "chart/KLSyncChart.h"
#include "model/KLKey.h"
#include "model/KLKeyTrack.h"
#include "model/KLMarkTrack.h"
#include "toolkit/KLSoundControl.h"
#include "toolkit/KLTimer.h"
#include "toolkit/KLTimerBeat.h"

namespace {
// Half the width of the strip restored around a key while it is dragged or highlighted.
constexpr int kKeyStripHalf = 5;
}  // namespace

void KLSyncChart::move_indicator(int x) {
    if (geometry.ValidColumn(geometry.indicatorX))
        reveal(geometry.indicatorX, 0, 1, int(geometry.height));
    if (geometry.ValidColumn(x)) {
        geometry.indicatorX = x;
        draw_indicator();
    }
}

void KLSyncChart::drag_1(int x, int) {
    move_indicator(x);
    feedback_meter_movement();
}

void KLSyncChart::drag_region(int x, int phase) {
    if (phase == 0) {
        geometry.ClearRegion();
        full_expose();
        regionAnchor_ = x;
        regionLeft_ = x;
        regionWidth_ = 0;
        return;
    }
    const int left = std::min(regionAnchor_, x);
    const int width = std::abs(x - regionAnchor_);
    const int oldL = regionLeft_, oldR = regionLeft_ + regionWidth_;
    const int newL = left, newR = left + width;
    auto copy = [this](Pixmap from, int a, int b) {
        a = std::max(a, 0);
        b = std::min(b, int(geometry.width));
        if (a < b && drawable())
            XCopyArea(display, from, window, gc, a, 0, unsigned(b - a), geometry.height, a, 0);
    };
    // What the old rectangle no longer covers goes back to normal; what is new is region.
    copy(chartPixmap, oldL, std::min(oldR, newL));
    copy(chartPixmap, std::max(oldL, newR), oldR);
    copy(regionPixmap, newL, std::min(newR, oldL));
    copy(regionPixmap, std::max(newL, oldR), newR);
    regionLeft_ = newL;
    regionWidth_ = width;
    if (phase == 2) {
        if (width > 0) {
            geometry.regionStart = float(std::max(geometry.FractionFromColumn(left), 0.0));
            geometry.regionEnd =
                float(std::min(geometry.FractionFromColumn(left + width - 1), 1.0));
        } else {
            geometry.ClearRegion();
        }
    }
    draw_indicator();
    if (display)
        XFlush(display);
}

void KLSyncChart::erase_key_strip(int x) {
    reveal(x - kKeyStripHalf, geometry.lowerBandTop, 2 * kKeyStripHalf + 1,
           int(geometry.height) - geometry.lowerBandTop);
}

void KLSyncChart::erase_mark_strip(int x) {
    const int w = font ? std::max(font->Width("M", 1), 1) : 10;
    reveal(x - w / 2, 0, w, geometry.waveTop + 5);
}

void KLSyncChart::draw_dragged_key(int x) {
    if (!window || !gc || !hitKey)
        return;
    draw_stick(window, x, hitKey->value, keyActiveColor);
    const char* name = hitKey->key ? hitKey->key->Name() : nullptr;
    if (name && name[0] && font) {
        const int half = font->Width(name, 1) / 2;
        font->DrawImage(window, gc, foreground, keyActiveColor, x - half,
                        geometry.textBaseline + 15, name, 1);
    }
}

void KLSyncChart::draw_dragged_mark(int x) {
    if (!window || !gc || !hitMark || !font)
        return;
    const int half = font->Width(&hitMark->label, 1) / 2;
    font->DrawImage(window, gc, foreground, keyActiveColor, x - half, 12, &hitMark->label, 1);
}

namespace {
// A dragged object lands on a column inside the chart.
int landing_column(int x, uint32_t width) {
    return std::clamp(x, 0, std::max(int(width) - 1, 0));
}
}  // namespace

int KLSyncChart::follow_drag(int x, int phase, void (KLSyncChart::*erase)(int),
                             void (KLSyncChart::*draw)(int)) {
    if (dragX_ >= 0)
        (this->*erase)(dragX_);
    x = landing_column(x, geometry.width);
    if (phase != 2) {
        dragX_ = x;
        (this->*draw)(x);
        XFlush(display);
        return -1;
    }
    dragX_ = -1;
    return x;
}

void KLSyncChart::end_drag() {
    needRedraw = true;
    full_expose();
    feedback_meter_movement();
}

void KLSyncChart::drag_key(int x, int phase) {
    if (!keyTrack || !hitKey)
        return;
    x = follow_drag(x, phase, &KLSyncChart::erase_key_strip, &KLSyncChart::draw_dragged_key);
    if (x < 0)
        return;
    const KLKeyEvent moved = *hitKey;
    const CueTime to = geometry.TimeFromColumn(x);
    const bool wasActive = activeKey == hitKey;
    if (to != moved.time && keyTrack->RemoveKey(moved.time)) {
        if (wasActive)
            activeKey = nullptr;
        KLKeyEvent* landed =
            keyTrack->InsertKey(moved.shapeIndex, to, moved.key, moved.smoothing, moved.value);
        // A time that holds another key refuses it: the key goes back where it was.
        if (!landed)
            landed = keyTrack->InsertKey(moved.shapeIndex, moved.time, moved.key, moved.smoothing,
                                         moved.value);
        if (wasActive)
            activeKey = landed;
    }
    hitKey = nullptr;
    keyTrack->PrepareKeyFrames(nullptr);
    end_drag();
}

void KLSyncChart::drag_keystick(int y, int phase) {
    if (!keyTrack || !hitKey)
        return;
    const int x = geometry.ColumnFromTime(hitKey->time);
    erase_key_strip(x);
    hitKey->value = geometry.ValueFromRow(y);
    if (phase != 2) {
        draw_stick(window, x, hitKey->value, keyActiveColor);
        XFlush(display);
        return;
    }
    hitKey = nullptr;
    keyTrack->PrepareKeyFrames(nullptr);
    end_drag();
}

void KLSyncChart::drag_mark(int x, int phase) {
    if (!markTrack || !hitMark)
        return;
    x = follow_drag(x, phase, &KLSyncChart::erase_mark_strip, &KLSyncChart::draw_dragged_mark);
    if (x < 0)
        return;
    const KLMarkEvent moved = *hitMark;
    const CueTime to = geometry.TimeFromColumn(x);
    if (to != moved.time && markTrack->RemoveMark(moved.time)) {
        if (activeMark == hitMark)
            activeMark = nullptr;
        if (!markTrack->InsertMark(to, moved.label))
            markTrack->InsertMark(moved.time, moved.label);
    }
    hitMark = nullptr;
    end_drag();
}

void KLSyncChart::scrub(int x, int phase) {
    move_indicator(x);
    feedback_meter_movement();
    const double s = geometry.FractionFromTime(CueTime());
    const double e = geometry.FractionFromTime(sound_length());
    const double f = geometry.IndicatorFraction();
    // The sound thread reads the position as it plays: stored as an atomic.
    float at = (s == e || f <= s) ? 0.0f : f >= e ? 1.0f : float((f - s) / (e - s));
    __atomic_store(&scrubPosition, &at, __ATOMIC_RELAXED);
    if (phase == 0) {
        if (scrubTimer)
            return;
        scrubTimer = std::make_unique<KLTimer>(CueTime(), CueTime::FromTicks(INT32_MAX));
        KLSoundControl::PlayDrag(sound, scrubTimer.get(), 100, &scrubPosition);
        KLTimerBeat::start();
        scrubTimer->start();
    } else if (phase == 2) {
        stop_scrub();
    }
}

void KLSyncChart::stop_scrub() {
    if (!scrubTimer)
        return;
    scrubTimer->stop();
    KLTimerBeat::stop();
    // Twenty system ticks (1/100 s each) for the last grain to drain.
    std::this_thread::sleep_for(std::chrono::milliseconds(200));
    KLSoundControl::Stop();
    scrubTimer.reset();
    float rest = 0.0f;
    __atomic_store(&scrubPosition, &rest, __ATOMIC_RELAXED);
}
