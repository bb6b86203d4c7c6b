// The sync chart's pointer and keyboard: events dispatched to the hit tests and the drags
// (KLSyncChartDrag.cpp), typed marks, and the active key and mark that follow the indicator.
#include <X11/XKBlib.h>
#include <X11/Xutil.h>
#include <X11/keysym.h>

#include <algorithm>
#include <cctype>
#include <climits>
#include <cstdlib>

#include "chart/KLChartText.h"
#include "chart/KLSyncChart.h"
#include "model/KLKey.h"
#include "model/KLKeyTrack.h"
#include "model/KLMarkTrack.h"
#include "toolkit/KLTimer.h"

KLKeyEvent* KLSyncChart::hitKey = nullptr;
KLMarkEvent* KLSyncChart::hitMark = nullptr;
int KLSyncChart::keyHighlightX = -1;
int KLSyncChart::markHighlightX = -1;
CueTime KLSyncChart::feedbackTime;
CueTime KLSyncChart::lastTypedTime;
int KLSyncChart::lastTypedX = -2;
float KLSyncChart::scrubPosition = 0.0f;
std::unique_ptr<KLTimer> KLSyncChart::scrubTimer;

namespace {
const CueTime kOneFrame(1.0, 0);

// The first of the keys or marks either side of a time whose column is within reach of `x`
// and that `accepts` takes; null when neither is.
template <typename Event, typename Accepts>
Event* within_reach(const KLChartGeometry& g, int x, Event* before, Event* after, Accepts accepts) {
    for (Event* e : {before, after})
        if (e && KLChartGeometry::Hits(g.ColumnFromTime(e->time), x) && accepts(*e))
            return e;
    return nullptr;
}

template <typename Event>
Event* within_reach(const KLChartGeometry& g, int x, Event* before, Event* after) {
    return within_reach(g, x, before, after, [](const Event&) { return true; });
}

// The key either side of column `x` within reach of it that `accepts` takes, or null.
template <typename Accepts>
KLKeyEvent* key_within_reach(KLKeyTrack& track, const KLChartGeometry& g, int x, Accepts accepts) {
    KLKeyEvent *before = nullptr, *after = nullptr;
    track.bracket_keys_from_time(g.TimeFromColumn(x), &before, &after);
    return within_reach(g, x, before, after, accepts);
}
}  // namespace

void KLSyncChart::input(XEvent* event) {
    if (!event)
        return;
    switch (event->type) {
        case ButtonPress: {
            const int x = event->xbutton.x;
            if (event->xbutton.button == Button1) {
                // Shift scrubs a sound; otherwise the first thing hit under the pointer is
                // dragged, and the indicator when nothing is.
                dragMode = sound && (event->xbutton.state & ShiftMask) ? 4
                           : handle_keyframe_hit(event)                ? 2
                           : handle_mark_hit(event)                    ? 3
                           : handle_keystick_hit(event)                ? 5
                                                                       : 1;
                button1_drag(x, event->xbutton.y, 0);
            } else if (event->xbutton.button == Button2) {
                drag_region(x, 0);
            }
            break;
        }
        case MotionNotify: {
            const int x = event->xmotion.x;
            if (event->xmotion.state & Button1Mask) {
                button1_drag(x, event->xmotion.y, 1);
            } else if (event->xmotion.state & Button2Mask) {
                drag_region(x, 1);
            }
            break;
        }
        case ButtonRelease: {
            const int x = event->xbutton.x;
            if (event->xbutton.button == Button1) {
                button1_drag(x, event->xbutton.y, 2);
                dragMode = 0;
            } else if (event->xbutton.button == Button2) {
                drag_region(x, 2);
            }
            break;
        }
        case KeyPress: {
            char text[20] = {0};
            KeySym keysym = NoSymbol;
            const int count = XLookupString(&event->xkey, text, sizeof(text) - 1, &keysym, nullptr);
            handle_keyboard_input(keysym, count, text);
            break;
        }
        default:
            break;
    }
}

void KLSyncChart::button1_drag(int x, int y, int phase) {
    switch (dragMode) {
        case 1:
            drag_1(x, phase);
            break;
        case 2:
            drag_key(x, phase);
            break;
        case 3:
            drag_mark(x, phase);
            break;
        case 4:
            scrub(x, phase);
            break;
        case 5:
            drag_keystick(y, phase);
            break;
        default:
            break;
    }
}

// --- Hit tests --------------------------------------------------------------------------

int KLSyncChart::handle_keyframe_hit(XEvent* event) {
    const int x = event->xbutton.x, y = event->xbutton.y;
    if (!keyTrack || !geometry.InKeyLetterStrip(y))
        return 0;
    KLKeyEvent* k =
        key_within_reach(*keyTrack, geometry, x, [](const KLKeyEvent&) { return true; });
    if (k)
        hitKey = k;
    return k != nullptr;
}

int KLSyncChart::handle_keystick_hit(XEvent* event) {
    const int x = event->xbutton.x, y = event->xbutton.y;
    if (!keyTrack || !geometry.InStickBand(y))
        return 0;
    KLKeyEvent* k = key_within_reach(*keyTrack, geometry, x, [&](const KLKeyEvent& e) {
        return std::abs(y - geometry.TickRow(e.value)) < 5;
    });
    if (k)
        hitKey = k;
    return k != nullptr;
}

int KLSyncChart::handle_mark_hit(XEvent* event) {
    const int x = event->xbutton.x, y = event->xbutton.y;
    if (!markTrack || !geometry.InMarkStrip(y))
        return 0;
    KLMarkEvent *before = nullptr, *after = nullptr;
    markTrack->BracketMarks(geometry.TimeFromColumn(x), &before, &after);
    KLMarkEvent* m = within_reach(geometry, x, before, after);
    if (m)
        hitMark = m;
    return m != nullptr;
}

// --- Active key and mark, feedback --------------------------------------------------------

void KLSyncChart::set_active_key(KLKeyEvent* event) {
    activeKey = event;
    if (keyHighlightX != -1) {
        erase_key_strip(keyHighlightX);
        keyHighlightX = -1;
    }
    if (!event)
        return;
    showKeyframeCallback.Call(this);
    if (!window || !gc || activeKey != event)
        return;
    const int x = geometry.ColumnFromTime(event->time);
    draw_stick(window, x, event->value, keyActiveColor);
    keyHighlightX = x;
}

void KLSyncChart::set_active_mark(KLMarkEvent* mark) {
    activeMark = mark;
    if (markHighlightX != -1) {
        erase_mark_strip(markHighlightX);
        markHighlightX = -1;
    }
    if (!mark || !window || !gc || !font)
        return;
    const int x = geometry.ColumnFromTime(mark->time);
    const int half = font->Width(&mark->label, 1) / 2;
    font->DrawImage(window, gc, foreground, keyActiveColor, x - half, 12, &mark->label, 1);
    markHighlightX = x;
}

void KLSyncChart::feedback_meter_movement() {
    const CueTime t = GetIndicatorTime();
    feedbackTime = t;
    const int ix = geometry.indicatorX;
    const bool shown = geometry.ValidColumn(ix);
    if (keyTrack) {
        KLKeyEvent *before = nullptr, *after = nullptr;
        feedbackBlend = keyTrack->bracket_keys_from_time(t, &before, &after);
        // A hidden indicator (column -1) picks no key: the key at the chart's start would
        // otherwise become active, and Delete Key remove it, without the user seeing why.
        set_active_key(shown ? within_reach(geometry, ix, before, after) : nullptr);
        feedbackKeyBefore = before ? before->shapeIndex : -1;
        feedbackKeyAfter = after ? after->shapeIndex : -1;
        showKeyframeImageCallback.Call(this);
    }
    if (markTrack) {
        KLMarkEvent *before = nullptr, *after = nullptr;
        markTrack->BracketMarks(t, &before, &after);
        set_active_mark(shown ? within_reach(geometry, ix, before, after) : nullptr);
    }
    showReferenceImageCallback.Call(this);
}

// --- Keyboard ---------------------------------------------------------------------------

void KLSyncChart::handle_keyboard_input(unsigned long keysym, int count, char* text) {
    if (keysym == XK_Return || keysym == XK_Escape || (keysym >= XK_F1 && keysym <= XK_F12))
        return;
    if (keysym == XK_BackSpace || keysym == XK_Delete) {
        if (!markTrack)
            return;
        KLMarkEvent* before = nullptr;
        if (activeMark) {
            const CueTime removed = activeMark->time;
            activeMark = nullptr;
            markTrack->RemoveMark(removed);
            set_active_mark(nullptr);
            needRedraw = true;
            full_expose();
            markTrack->BracketMarks(removed, &before, nullptr);
        } else {
            markTrack->BracketMarks(GetIndicatorTime(), &before, nullptr);
        }
        if (before) {
            SetIndicatorTime(before->time);
            set_active_mark(before);
        }
        return;
    }
    if (keysym == XK_space) {
        set_active_mark(nullptr);
        SetIndicatorTime(GetIndicatorTime() + kOneFrame);
        full_expose();
        return;
    }
    if (count != 1 || !text || !std::isgraph(static_cast<unsigned char>(text[0])) || !markTrack)
        return;
    CueTime t;
    if (activeMark) {
        t = activeMark->time;
        activeMark = nullptr;
        markTrack->RemoveMark(t);
        set_active_mark(nullptr);
    } else if (geometry.indicatorX == lastTypedX) {
        // Frames narrower than a pixel: the indicator's column cannot tell where the last
        // letter went, so the next one goes one frame after it.
        t = lastTypedTime + kOneFrame;
    } else {
        t = GetIndicatorTime();
    }
    markTrack->InsertMark(t, text[0]);
    lastTypedTime = t;
    SetIndicatorTime(t + kOneFrame);
    lastTypedX = geometry.indicatorX;
    needRedraw = true;
    full_expose();
}
