#pragma once

#include <cstdint>
#include <vector>

#include "chart/KLWaveSummary.h"

class KLChartGeometry;
class KLKeyEvent;
class KLKeyTrack;

// A filled rectangle, laid out as the X protocol's rectangle.
struct KLChartRect {
    int16_t x, y;
    uint16_t width, height;
};

// The key layer of the chart as lists of shapes, with no X in it: the value curves by colour
// (as one-pixel segments), the key sticks with their ticks (three-pixel-wide lines as the
// rectangles they cover) and the key-shape letters. Built once per redraw and drawn into both
// pixmaps with one request per list.
class KLKeyDrawing {
  public:
    // A key-shape letter centred on `column` with its baseline at `baseline`.
    struct Letter {
        char letter;
        int column;
        int baseline;
    };

    void Build(const KLChartGeometry& geometry, const KLKeyTrack& track);
    void Clear();

    // The stick of a key at column x (lowerBandTop down to the base line) and its tick,
    // from x - 4 to x + 5 at the value's tick row: the pixels of 3-pixel-wide butt-capped
    // lines between those points.
    static void StickRects(const KLChartGeometry& geometry, int x, float value,
                           std::vector<KLChartRect>& out);

    std::vector<KLWaveSegment> linear;  // curves into Linear keys and held shapes
    std::vector<KLWaveSegment> ease;    // curves into Ease keys
    std::vector<KLWaveSegment> smooth;  // curves into Smooth keys
    std::vector<KLChartRect> sticks;
    std::vector<Letter> letters;

  private:
    void add_curve(const KLChartGeometry& geometry, const KLKeyEvent& previous, int px,
                   const KLKeyEvent& event, int x);
};
