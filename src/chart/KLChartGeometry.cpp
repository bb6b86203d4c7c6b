#include "chart/KLChartGeometry.h"

#include <algorithm>
#include <cmath>

namespace {
const CueTime kOneSecond(0, 0, 1, 0, 0);
const CueTime kFiveSeconds(0, 0, 5, 0, 0);

// Truncation toward zero into the int range (NaN gives 0), so that no fraction far outside
// the visible part can overflow a column.
int trunc_int(double v) {
    if (!(v == v))
        return 0;
    if (v >= 2147483647.0)
        return 2147483647;
    if (v <= -2147483648.0)
        return -2147483647 - 1;
    return int(v);
}
}  // namespace

KLChartGeometry::KLChartGeometry() : duration(kFiveSeconds), userDuration(kFiveSeconds) {}

bool KLChartGeometry::SetSize(uint32_t newWidth, uint32_t newHeight) {
    if (newWidth == width && newHeight == height)
        return false;
    width = newWidth;
    height = newHeight;
    bandMaskHeight = 100;
    waveHeight = int32_t(height) - waveTop - lowerBandHeight;
    lowerBandTop = waveTop + waveHeight;
    textBaseline = int32_t(height) - 20;
    return true;
}

double KLChartGeometry::FractionFromTime(CueTime t) const {
    const double total = Frames(duration);
    return total == 0.0 ? 0.0 : Frames(t) / total;
}

CueTime KLChartGeometry::TimeFromFraction(double f) const {
    return CueTime(Frames(duration) * f, 0);
}

double KLChartGeometry::PixelFromFraction(double f) const {
    const double span = double(zoomEnd) - double(zoomStart);
    if (span == 0.0)
        return 0.0;
    return double(width) * (f - double(zoomStart)) / span;
}

int KLChartGeometry::ColumnFromFraction(double f) const {
    return trunc_int(PixelFromFraction(f));
}

double KLChartGeometry::FractionFromColumn(double x) const {
    if (width == 0)
        return 0.0;
    return double(zoomStart) + x * (double(zoomEnd) - double(zoomStart)) / double(width);
}

long KLChartGeometry::IndexFromPos(double f, long sampleCount, CueTime soundLength) const {
    if (sampleCount <= 0 || soundLength.Ticks() <= 0)
        return 0;
    const double total = Frames(duration);
    if (total == 0.0)
        return 0;
    const double g = f / (Frames(soundLength) / total);
    if (g >= 1.0)
        return sampleCount - 1;
    if (!(g > 0.0))
        return 0;
    return long(double(sampleCount) * g);
}

double KLChartGeometry::IndicatorFraction() const {
    if (width == 0)
        return 0.0;
    return double(zoomStart) +
           double(indicatorX) * (double(zoomEnd) - double(zoomStart)) / double(width);
}

void KLChartGeometry::ReplaceIndicator(double f) {
    if (f < zoomStart || f > zoomEnd)
        indicatorX = -1;
    else
        indicatorX = ColumnFromFraction(f);
}

void KLChartGeometry::ZoomIn() {
    const double f = IndicatorFraction();
    if (RegionSelected()) {
        zoomStart = regionStart;
        zoomEnd = regionEnd;
        ClearRegion();
    } else {
        const float q = (zoomEnd - zoomStart) * 0.25f;
        zoomStart += q;
        zoomEnd -= q;
    }
    ReplaceIndicator(f);
}

void KLChartGeometry::ZoomOut() {
    const double f = IndicatorFraction();
    const float h = (zoomEnd - zoomStart) * 0.5f;
    zoomEnd = std::min(zoomEnd + h, 1.0f);
    zoomStart = std::max(zoomStart - h, 0.0f);
    ClearRegion();
    ReplaceIndicator(f);
}

void KLChartGeometry::ZoomReset() {
    const double f = IndicatorFraction();
    ClearRegion();
    zoomStart = 0.0f;
    zoomEnd = 1.0f;
    ReplaceIndicator(f);
}

void KLChartGeometry::SetZoomPan(float start, float end) {
    const double f = IndicatorFraction();
    // NaN asks for nothing: it keeps the end it would replace.
    zoomStart = start == start ? std::clamp(start, 0.0f, 1.0f) : 0.0f;
    zoomEnd = end == end ? std::min(end, 1.0f) : 1.0f;
    if (zoomEnd < zoomStart)
        zoomEnd = zoomStart;
    ClearRegion();
    ReplaceIndicator(f);
}

void KLChartGeometry::ComputeDuration(bool hasSound, CueTime soundLength, bool hasTrack,
                                      CueTime trackEnd) {
    CueTime d = std::max(userDuration, kOneSecond);
    if (hasSound)
        d = std::max(d, soundLength);
    if (hasTrack)
        d = std::max(d, trackEnd);
    duration = d;
}

double KLChartGeometry::GridStepFrames() const {
    const double frames = Frames(duration);
    if (frames == 0.0)
        return 0.0;
    const double frame = 1.0 / frames;
    const double span = double(zoomEnd) - double(zoomStart);
    const double most = double(width / 10);
    double decade = 1.0;
    int multiplier = 1;
    // Steps of 1, 2, 5, 10, 20, 50, ... frames until no more than width / 10 fit the span.
    while (span / (frame * decade * multiplier) > most && decade < 1e12) {
        if (multiplier == 1) {
            multiplier = 2;
        } else if (multiplier == 2) {
            multiplier = 5;
        } else {
            multiplier = 1;
            decade *= 10.0;
        }
    }
    return decade * multiplier;
}

std::vector<int> KLChartGeometry::GridColumns() const {
    std::vector<int> columns;
    const double stepFrames = GridStepFrames();
    if (stepFrames == 0.0)
        return columns;
    const double step = stepFrames / Frames(duration);
    const double span = double(zoomEnd) - double(zoomStart);
    if (span <= 0.0)
        return columns;
    for (double k = std::trunc(zoomStart / step) + 1;; k += 1.0) {
        const double g = step * k;
        if (g >= zoomEnd)
            break;
        columns.push_back(trunc_int(double(width) * (g - zoomStart) / span));
    }
    return columns;
}

double KLChartGeometry::ValueRow(float value) const {
    const double v = std::clamp(double(value), 0.0, 2.0);
    return textBaseline + double(lowerBandTop - textBaseline) * v / 2.0;
}

int KLChartGeometry::TickRow(float value) const {
    const double w = std::clamp(double(value) / 2.0, 0.0, 1.0);
    return trunc_int(double(lowerBandTop - textBaseline + 1) * w + textBaseline);
}

float KLChartGeometry::ValueFromRow(int y) const {
    const double band = double(textBaseline - lowerBandTop);
    if (band == 0.0)
        return 0.0f;
    const double v = (1.0 - double(y - lowerBandTop) / band) * 2.0;
    return float(std::clamp(v, 0.0, 2.0));
}

std::vector<KLChartGeometry::ColumnSpan> KLChartGeometry::RevealSpans(int x, int w) const {
    std::vector<ColumnSpan> spans;
    if (w <= 0)
        return spans;
    const int last = int(std::min<int64_t>(int64_t(x) + w - 1, 2147483647));
    if (!RegionSelected()) {
        spans.push_back({x, last, false});
        return spans;
    }
    const int r0 = ColumnFromFraction(regionStart);
    const int r1 = ColumnFromFraction(regionEnd);
    const int right = int(int64_t(width) - 1);
    auto add = [&spans](int a, int b, bool inRegion) {
        if (a <= b)
            spans.push_back({a, b, inRegion});
    };
    add(std::max(x, 0), std::min(last, r0 - 1), false);
    add(std::max(x, r0), std::min(last, r1), true);
    add(std::max(x, r1 + 1), std::min(last, right), false);
    return spans;
}

void KLChartGeometry::ScrollValues(int min, int max, int* value, int* sliderSize) const {
    const double range = double(max) - double(min);
    *value = min + trunc_int(double(zoomStart) * range);
    *sliderSize = trunc_int((double(zoomEnd) - double(zoomStart)) * range);
}

void KLChartGeometry::PanFromScroll(int value, int sliderSize, int min, int max, float* start,
                                    float* end) {
    const double range = double(max) - double(min);
    if (range == 0.0) {
        *start = 0.0f;
        *end = 1.0f;
        return;
    }
    // The minimum is not subtracted from the value: the scroll bar runs from 0 in practice.
    *start = float(double(value) / range);
    *end = float((double(value) + sliderSize) / range);
}
