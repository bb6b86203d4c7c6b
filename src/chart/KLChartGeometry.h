#pragma once

#include <cstdint>
#include <vector>

#include "toolkit/CueTime.h"

// The sync chart's time/pixel geometry, with no X in it: the chart's duration, the visible
// part (zoom) and the selected region as fractions of the duration, the indicator column, the
// vertical bands, and the mappings between times, fractions and pixel columns. Conversions to
// whole columns truncate toward zero. The widget (KLSyncChart) turns events into calls on this
// class and draws what it computes.
class KLChartGeometry {
  public:
    // One range of columns of a reveal, both ends inclusive, and whether it is copied from the
    // region image.
    struct ColumnSpan {
        int first;
        int last;
        bool inRegion;
    };

    KLChartGeometry();

    // Stores a new size and recomputes the bands; false (nothing changed) when the size is
    // the same as before.
    bool SetSize(uint32_t newWidth, uint32_t newHeight);

    // Frames of `t` at the default frame rate, in double precision.
    static double Frames(CueTime t) { return t.Frames(); }
    // t as a fraction of `duration` (0 for a zero duration), and back.
    double FractionFromTime(CueTime t) const;
    CueTime TimeFromFraction(double f) const;
    // Pixel position of a fraction (not truncated; 0 when the visible span is empty), the
    // column (truncated) and the fraction at the left edge of column x (0 for zero width).
    double PixelFromFraction(double f) const;
    int ColumnFromFraction(double f) const;
    double FractionFromColumn(double x) const;
    int ColumnFromTime(CueTime t) const { return ColumnFromFraction(FractionFromTime(t)); }
    CueTime TimeFromColumn(int x) const { return TimeFromFraction(FractionFromColumn(x)); }
    bool ValidColumn(int x) const { return x >= 0 && x < int64_t(width); }

    // The sample index shown at fraction f of a sound of `sampleCount` samples lasting
    // `soundLength`: 0 without samples, the last sample from the sound's end on.
    long IndexFromPos(double f, long sampleCount, CueTime soundLength) const;

    // Zoom: the visible part halves about its centre (or becomes the region, which is then
    // cleared), doubles with each end clamped separately, or shows everything. Each keeps the
    // indicator at its time (ReplaceIndicator).
    void ZoomIn();
    void ZoomOut();
    void ZoomReset();
    void SetZoomPan(float start, float end);
    // The indicator's fraction by the current mapping (the point one pixel left of the
    // visible part when it is hidden), and re-placing it after the mapping changed.
    double IndicatorFraction() const;
    void ReplaceIndicator(double f);

    bool RegionSelected() const { return regionStart < regionEnd; }
    void ClearRegion() { regionStart = regionEnd = 0.0f; }

    // The chart's duration: the largest of one second, `userDuration`, the sound's length and
    // the key track's last key time (each only when present).
    void ComputeDuration(bool hasSound, CueTime soundLength, bool hasTrack, CueTime trackEnd);

    // The grid step in frames (1, 2, 5, 10, 20, 50, ...; 0 for a zero duration) and the
    // columns of the grid lines strictly inside the visible part.
    double GridStepFrames() const;
    std::vector<int> GridColumns() const;

    // Rows of the lower band: a key value's row on its curve (not truncated), its stick's
    // tick row, and the value a pointer row sets on a stick drag (clamped to 0..2).
    double ValueRow(float value) const;
    int TickRow(float value) const;
    float ValueFromRow(int y) const;
    // Which strip a pointer row lies in, for the hit tests.
    bool InKeyLetterStrip(int y) const { return y >= textBaseline && y <= int64_t(height); }
    bool InStickBand(int y) const { return y >= lowerBandTop && y <= textBaseline; }
    bool InMarkStrip(int y) const { return y >= 0 && y <= waveTop; }
    // A target at `column` is hit by the pointer at x when they are less than 5 pixels apart.
    static bool Hits(int column, int x) {
        return int64_t(column) - x < 5 && x - int64_t(column) < 5;
    }

    // How the rectangle of columns x .. x + w - 1 is copied to the window: from the region
    // image inside the region (its last column included), from the chart image elsewhere.
    std::vector<ColumnSpan> RevealSpans(int x, int w) const;

    // The pan scroll bar's value and slider size for a scroll bar running from min to max,
    // and the visible part a moved scroll bar asks for.
    void ScrollValues(int min, int max, int* value, int* sliderSize) const;
    static void PanFromScroll(int value, int sliderSize, int min, int max, float* start,
                              float* end);

    uint32_t width = 0, height = 0;              // drawing area, pixels
    int32_t waveTop = 15;                        // mark-letter strip above the waveform
    int32_t lowerBandHeight = 100;               // key curves, sticks and letters
    int32_t waveHeight = 0;                      // height - waveTop - lowerBandHeight
    int32_t lowerBandTop = 0;                    // waveTop + waveHeight
    int32_t textBaseline = 0;                    // height - 20: the key curves' base line
    int32_t bandMaskHeight = 100;                // rows of the grid stencil
    CueTime duration;                            // length of the whole chart
    CueTime userDuration;                        // length the workspace asked for
    float zoomStart = 0.0f, zoomEnd = 1.0f;      // visible part, fractions of duration
    float regionStart = 0.0f, regionEnd = 0.0f;  // selection; empty unless start < end
    int32_t indicatorX = -1;                     // indicator column, -1 when hidden
};
