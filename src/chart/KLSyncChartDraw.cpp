// The sync chart's drawing: the grid stencil, the waveform, key curves and sticks, marks,
// and the copies from the pixmaps to the window.
#include <algorithm>
#include <cmath>

#include "chart/KLChartText.h"
#include "chart/KLSyncChart.h"
#include "model/InterpEase.h"
#include "model/KLKey.h"
#include "model/KLKeyTrack.h"
#include "model/KLMarkTrack.h"

namespace {
// X coordinates are 16-bit: anything drawn is first cut to a little beyond the pixmap.
constexpr int kMargin = 16;

short to_short(double v) {
    return short(std::clamp(v, -32000.0, 32000.0));
}
}  // namespace

void KLSyncChart::expose(XEvent* event) {
    set_size(window);
    if (!drawable())
        return;
    if (needRedraw) {
        draw_grid();
        draw_keys();
        if (sound)
            draw_sound();
        draw_marks();
        needRedraw = false;
    }
    if (!needFullReveal && event && (event->type == Expose || event->type == GraphicsExpose)) {
        reveal(event->xexpose.x, event->xexpose.y, event->xexpose.width, event->xexpose.height);
    } else {
        reveal(0, 0, int(geometry.width), int(geometry.height));
        needFullReveal = false;
    }
    draw_indicator();
    XFlush(display);
}

void KLSyncChart::reveal(int x, int y, int w, int h) {
    if (!drawable() || h <= 0)
        return;
    for (const auto& span : geometry.RevealSpans(x, w)) {
        XCopyArea(display, span.inRegion ? regionPixmap : chartPixmap, window, gc, span.first, y,
                  unsigned(span.last - span.first + 1), unsigned(h), span.first, y);
    }
}

void KLSyncChart::sketch_grid() {
    needRedraw = true;
    if (!bandMask || !maskGc)
        return;
    XSetForeground(display, maskGc, 0);
    XFillRectangle(display, bandMask, maskGc, 0, 0, geometry.width,
                   unsigned(geometry.bandMaskHeight));
    XSetForeground(display, maskGc, 1);
    XSetLineAttributes(display, maskGc, 0, LineSolid, CapButt, JoinRound);
    for (int x : geometry.GridColumns())
        XDrawLine(display, bandMask, maskGc, x, 0, x, geometry.bandMaskHeight - 1);
}

void KLSyncChart::sketch_sound() {
    if (sampleCount <= 1 || samples.empty() || peak == 0.0f) {
        waveSegmentCount = 0;
        return;
    }
    needRedraw = true;
    waveSegmentCount = SketchWave(geometry, samples.data(), waveSummary, sampleCount,
                                  sound_length(), peak, waveSegments);
}

void KLSyncChart::draw_grid() {
    const Pixmap targets[2] = {chartPixmap, regionPixmap};
    const Pixel backs[2] = {background, regionColor};
    XSetForeground(display, gc, gridColor);
    for (int i = 0; i < 2; i++) {
        XSetBackground(display, gc, backs[i]);
        for (int row = 0; row < int(geometry.height); row += 100)
            XCopyPlane(display, bandMask, targets[i], gc, 0, 0, geometry.width,
                       unsigned(geometry.bandMaskHeight), 0, row, 1);
    }
}

void KLSyncChart::draw_sound() {
    if (waveSegmentCount <= 0)
        return;
    static_assert(sizeof(KLWaveSegment) == sizeof(XSegment), "segment layouts differ");
    XSetForeground(display, gc, soundColor);
    XSetLineAttributes(display, gc, 0, LineSolid, CapButt, JoinRound);
    auto* segments = reinterpret_cast<XSegment*>(waveSegments.data());
    for (Pixmap p : {chartPixmap, regionPixmap})
        XDrawSegments(display, p, gc, segments, waveSegmentCount);
}

// The curve into `event` from the previous event at column px, cut to the pixmap's columns.
void KLSyncChart::draw_key_curve(Drawable d, const KLKeyEvent* previous, int px,
                                 const KLKeyEvent* event, int x) {
    const int base = geometry.textBaseline;
    const int left = -1, right = int(geometry.width) + 1;
    if (event->shapeIndex == previous->shapeIndex) {
        // A held shape: flat at the base line.
        XSetForeground(display, gc, linearColor);
        XDrawLine(display, d, gc, std::max(px, left - kMargin), base, std::min(x, right + kMargin),
                  base);
        return;
    }
    const double top = geometry.ValueRow(event->value);
    if (event->smoothing == KLKeyEvent::kLinear) {
        XSetForeground(display, gc, linearColor);
        const int target = int(top);
        const double n = double(x) - px;
        auto row = [&](int c) { return base + (target - base) * ((c - px) / n); };
        const int a = std::max(px, left - kMargin), b = std::min(x, right + kMargin);
        if (a > b)
            return;
        XDrawLine(display, d, gc, a, int(std::lround(row(a))), b, int(std::lround(row(b))));
        return;
    }
    float e1 = 0.2f, e2 = 0.8f;
    XSetForeground(display, gc, easeColor);
    if (event->smoothing == KLKeyEvent::kSmooth) {
        e1 = e2 = 0.5f;
        XSetForeground(display, gc, smoothColor);
    }
    const long n = long(x) - px;
    const long first = std::max(0L, long(left) - px);
    const long last = std::min(n, long(right) - px);
    if (first > last)
        return;
    std::vector<XPoint> points;
    points.reserve(size_t(last - first + 1));
    for (long i = first; i <= last; i++) {
        const float v = interp_ease(float(double(i) / double(n)), float(base), float(top), e1, e2);
        points.push_back(XPoint{to_short(double(px + i)), to_short(std::trunc(v))});
    }
    if (points.size() == 1)
        points.push_back(points.front());
    XDrawLines(display, d, gc, points.data(), int(points.size()), CoordModeOrigin);
}

void KLSyncChart::draw_key_letter(Drawable d, const KLKeyEvent* event, int x) {
    const char* name = event->key ? event->key->Name() : nullptr;
    if (!name || !name[0] || !font)
        return;
    const int half = font->Width(name, 1) / 2;
    font->Draw(d, foreground, x - half, geometry.textBaseline + 15, name, 1);
}

void KLSyncChart::draw_stick(Drawable d, int x, float value, unsigned long pixel) {
    XSetForeground(display, gc, pixel);
    XSetLineAttributes(display, gc, 3, LineSolid, CapButt, JoinRound);
    XDrawLine(display, d, gc, x, geometry.lowerBandTop, x, geometry.textBaseline);
    const int t = geometry.TickRow(value);
    XDrawLine(display, d, gc, x - 4, t, x + 5, t);
    XSetLineAttributes(display, gc, 0, LineSolid, CapButt, JoinRound);
}

void KLSyncChart::draw_keys() {
    if (!keyTrack)
        return;
    const double zs = geometry.zoomStart, ze = geometry.zoomEnd;
    for (Pixmap p : {chartPixmap, regionPixmap}) {
        XSetLineAttributes(display, gc, 0, LineSolid, CapButt, JoinRound);
        const KLKeyEvent* previous = nullptr;
        double pf = 0.0;
        int px = 0;
        for (const KLKeyEvent* event : keyTrack->events) {
            const double f = geometry.FractionFromTime(event->time);
            const int x = geometry.ColumnFromFraction(f);
            if (previous && f >= zs && pf <= ze && x != px)
                draw_key_curve(p, previous, px, event, x);
            previous = event;
            pf = f;
            px = x;
            if (f > ze)
                break;  // nothing later is drawn
        }
        for (const KLKeyEvent* event : keyTrack->events) {
            const double f = geometry.FractionFromTime(event->time);
            if (f < zs)
                continue;
            if (f > ze)
                break;
            const int x = geometry.ColumnFromFraction(f);
            draw_stick(p, x, event->value, keyColor);
            draw_key_letter(p, event, x);
        }
    }
}

void KLSyncChart::draw_marks() {
    if (!markTrack || !font)
        return;
    for (const KLMarkEvent* mark : markTrack->marks) {
        const int x = geometry.ColumnFromTime(mark->time);
        if (x < -kMargin || x > int(geometry.width) + kMargin)
            continue;
        const int half = font->Width(&mark->label, 1) / 2;
        for (Pixmap p : {chartPixmap, regionPixmap})
            font->Draw(p, foreground, x - half, 12, &mark->label, 1);
    }
}
