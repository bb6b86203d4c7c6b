// The sync chart's drawing: the grid stencil, the waveform, key curves and sticks, marks,
// and the copies from the pixmaps to the window.
#include <algorithm>
#include <cmath>

#include "chart/KLChartText.h"
#include "chart/KLKeyDrawing.h"
#include "chart/KLSyncChart.h"
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

void KLSyncChart::draw_stick(Drawable d, int x, float value, unsigned long pixel) {
    std::vector<KLChartRect> rects;
    KLKeyDrawing::StickRects(geometry, x, value, rects);
    XSetForeground(display, gc, pixel);
    XFillRectangles(display, d, gc, reinterpret_cast<XRectangle*>(rects.data()), int(rects.size()));
}

void KLSyncChart::draw_keys() {
    if (!keyTrack)
        return;
    static_assert(sizeof(KLChartRect) == sizeof(XRectangle), "rectangle layouts differ");
    keyDrawing.Build(geometry, *keyTrack);
    std::vector<XftCharSpec> letters;
    if (font) {
        letters.reserve(keyDrawing.letters.size());
        for (const auto& l : keyDrawing.letters)
            letters.push_back(XftCharSpec{FcChar32(static_cast<unsigned char>(l.letter)),
                                          to_short(l.column - font->Width(&l.letter, 1) / 2),
                                          to_short(l.baseline)});
    }
    const std::pair<std::vector<KLWaveSegment>*, Pixel> curves[] = {
        {&keyDrawing.linear, linearColor},
        {&keyDrawing.ease, easeColor},
        {&keyDrawing.smooth, smoothColor}};
    for (Pixmap p : {chartPixmap, regionPixmap}) {
        XSetLineAttributes(display, gc, 0, LineSolid, CapButt, JoinRound);
        for (const auto& [list, colour] : curves) {
            if (list->empty())
                continue;
            XSetForeground(display, gc, colour);
            XDrawSegments(display, p, gc, reinterpret_cast<XSegment*>(list->data()),
                          int(list->size()));
        }
        XSetForeground(display, gc, keyColor);
        XFillRectangles(display, p, gc, reinterpret_cast<XRectangle*>(keyDrawing.sticks.data()),
                        int(keyDrawing.sticks.size()));
        if (font)
            font->DrawLetters(p, foreground, letters);
    }
}

void KLSyncChart::draw_marks() {
    if (!markTrack || !font)
        return;
    std::vector<XftCharSpec> letters;
    for (const KLMarkEvent* mark : markTrack->marks) {
        // Marks are not limited to the visible part; those off the pixmap are left out.
        const int x = geometry.ColumnFromTime(mark->time);
        if (x < -kMargin || x > int(geometry.width) + kMargin)
            continue;
        const int half = font->Width(&mark->label, 1) / 2;
        letters.push_back(
            XftCharSpec{FcChar32(static_cast<unsigned char>(mark->label)), to_short(x - half), 12});
    }
    for (Pixmap p : {chartPixmap, regionPixmap})
        font->DrawLetters(p, foreground, letters);
}
