#include "chart/KLKeyDrawing.h"

#include <algorithm>
#include <climits>
#include <cmath>

#include "chart/KLChartGeometry.h"
#include "model/InterpEase.h"
#include "model/KLKey.h"
#include "model/KLKeyTrack.h"

namespace {
// X coordinates are 16-bit: shapes are cut to a little beyond the pixmap first.
constexpr int kMargin = 16;

int16_t clamp16(double v) {
    return int16_t(std::clamp(v, -32000.0, 32000.0));
}

void add_segment(std::vector<KLWaveSegment>& list, double x1, double y1, double x2, double y2) {
    list.push_back({clamp16(x1), clamp16(y1), clamp16(x2), clamp16(y2)});
}

void add_rect(std::vector<KLChartRect>& list, int x, int y, int w, int h) {
    if (w <= 0 || h <= 0)
        return;
    const KLChartRect r{clamp16(x), clamp16(y), uint16_t(std::min(w, 65535)),
                        uint16_t(std::min(h, 65535))};
    list.push_back(r);
}
}  // namespace

void KLKeyDrawing::Clear() {
    linear.clear();
    ease.clear();
    smooth.clear();
    sticks.clear();
    letters.clear();
}

void KLKeyDrawing::StickRects(const KLChartGeometry& g, int x, float value,
                              std::vector<KLChartRect>& out) {
    // A 3-pixel-wide line covers the pixel rows (or columns) one either side of it, from its
    // start up to but not including its end.
    add_rect(out, x - 1, std::min(g.lowerBandTop, g.textBaseline), 3,
             std::abs(g.textBaseline - g.lowerBandTop));
    const int t = g.TickRow(value);
    add_rect(out, x - 4, t - 1, 9, 3);
}

void KLKeyDrawing::add_curve(const KLChartGeometry& g, const KLKeyEvent& previous, int px,
                             const KLKeyEvent& event, int x) {
    const int base = g.textBaseline;
    const int left = -kMargin, right = int(g.width) + kMargin;
    if (event.shapeIndex == previous.shapeIndex) {
        // A held shape: flat at the base line.
        add_segment(linear, std::max(px, left), base, std::min(x, right), base);
        return;
    }
    const double top = g.ValueRow(event.value);
    const double n = double(x) - px;
    if (event.smoothing == KLKeyEvent::kLinear) {
        const int target = int(top);
        auto row = [&](double c) { return std::round(base + (target - base) * ((c - px) / n)); };
        const double a = std::max<double>(px, left), b = std::min<double>(x, right);
        if (a <= b)
            add_segment(linear, a, a == px ? base : row(a), b, b == x ? target : row(b));
        return;
    }
    const bool smoothKind = event.smoothing == KLKeyEvent::kSmooth;
    const float e1 = smoothKind ? 0.5f : 0.2f, e2 = smoothKind ? 0.5f : 0.8f;
    std::vector<KLWaveSegment>& list = smoothKind ? smooth : ease;
    // The polyline through (px + i, interp_ease(i / n)) for i = 0 .. n, within the pixmap.
    const long first = std::max(0L, long(left) - px);
    const long last = std::min(long(n), long(right) - px);
    if (first > last)
        return;
    double prevX = px + first;
    double prevY =
        std::trunc(interp_ease(float(double(first) / n), float(base), float(top), e1, e2));
    if (first == last)
        add_segment(list, prevX, prevY, prevX, prevY);
    for (long i = first + 1; i <= last; i++) {
        const double y =
            std::trunc(interp_ease(float(double(i) / n), float(base), float(top), e1, e2));
        add_segment(list, prevX, prevY, double(px + i), y);
        prevX = double(px + i);
        prevY = y;
    }
}

void KLKeyDrawing::Build(const KLChartGeometry& g, const KLKeyTrack& track) {
    Clear();
    const double zs = g.zoomStart, ze = g.zoomEnd;
    // First pass: the curve from each key into the next, where both columns differ.
    const KLKeyEvent* previous = nullptr;
    double pf = 0.0;
    int px = 0;
    for (const KLKeyEvent* event : track.events) {
        const double f = g.FractionFromTime(event->time);
        const int x = g.ColumnFromFraction(f);
        if (previous && f >= zs && pf <= ze && x != px)
            add_curve(g, *previous, px, *event, x);
        previous = event;
        pf = f;
        px = x;
        if (f > ze)
            break;  // no later key has a curve in view
    }
    // Second pass: sticks, ticks and letters of the keys in view.
    int column = INT32_MIN;
    std::vector<int> columnTicks;  // tick rows filled in this column
    for (const KLKeyEvent* event : track.events) {
        const double f = g.FractionFromTime(event->time);
        if (f < zs)
            continue;
        if (f > ze)
            break;
        const int x = g.ColumnFromFraction(f);
        // Keys sharing a column share its stick, and often a tick: each is filled once.
        if (x != column) {
            column = x;
            columnTicks.clear();
            add_rect(sticks, x - 1, std::min(g.lowerBandTop, g.textBaseline), 3,
                     std::abs(g.textBaseline - g.lowerBandTop));
        }
        const int t = g.TickRow(event->value);
        if (std::find(columnTicks.begin(), columnTicks.end(), t) == columnTicks.end()) {
            columnTicks.push_back(t);
            add_rect(sticks, x - 4, t - 1, 9, 3);
        }
        const char* name = event->key ? event->key->Name() : nullptr;
        if (name && name[0])
            letters.push_back({name[0], x, g.textBaseline + 15});
    }
}
