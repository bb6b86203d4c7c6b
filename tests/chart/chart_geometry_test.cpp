#include <gtest/gtest.h>

#include <cmath>
#include <tuple>

#include "chart/KLChartGeometry.h"

namespace {

// A chart of the given size showing `seconds` seconds (at 30 frames a second).
KLChartGeometry chart(uint32_t width, uint32_t height = 200, double seconds = 10.0) {
    KLChartGeometry g;
    g.SetSize(width, height);
    g.duration = CueTime::FromSeconds(seconds);
    return g;
}

// Zooming out doubles the visible part clamping each end separately; an asked-for span is
// clamped and ordered. Both clear the region.
TEST(ChartZoom, OutAndPanClampEachEndAndClearTheRegion) {
    const struct {
        bool zoomOut;      // ZoomOut from (start, end), else SetZoomPan(start, end)
        float start, end;  // visible part before, or the span asked for
        float wantStart, wantEnd;
    } cases[] = {{true, 0.0f, 0.5f, 0.0f, 0.75f},  {true, 0.4f, 0.6f, 0.3f, 0.7f},
                 {true, 0.8f, 0.9f, 0.75f, 0.95f}, {true, 0.0f, 1.0f, 0.0f, 1.0f},
                 {false, -0.5f, 2, 0, 1},          {false, 0.6f, 0.4f, 0.6f, 0.6f},
                 {false, NAN, NAN, 0.0f, 1.0f}};
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::Message() << c.zoomOut << " " << c.start << " " << c.end);
        auto g = chart(400);
        g.regionStart = 0.2f;
        g.regionEnd = 0.25f;
        if (c.zoomOut) {
            g.zoomStart = c.start, g.zoomEnd = c.end;
            g.ZoomOut();
        } else {
            g.SetZoomPan(c.start, c.end);
        }
        EXPECT_FLOAT_EQ(g.zoomStart, c.wantStart);
        EXPECT_FLOAT_EQ(g.zoomEnd, c.wantEnd);
        EXPECT_FALSE(g.RegionSelected());
    }
}

// Zooming in takes the region, then halves about the centre; the indicator keeps its
// fraction or hides.
TEST(ChartZoom, InOnRegionThenAboutTheCentreKeepingTheIndicator) {
    auto g = chart(400);
    g.regionStart = 0.2f;
    g.regionEnd = 0.6f;
    g.ZoomIn();
    EXPECT_EQ(std::make_pair(g.zoomStart, g.zoomEnd), std::make_pair(0.2f, 0.6f));
    EXPECT_FALSE(g.RegionSelected());
    g.ZoomIn();
    EXPECT_FLOAT_EQ(g.zoomStart, 0.3f);
    EXPECT_FLOAT_EQ(g.zoomEnd, 0.5f);

    g.ZoomReset();
    g.indicatorX = 100;  // fraction 0.25
    g.SetZoomPan(0.0f, 0.5f);
    EXPECT_EQ(g.indicatorX, 200);
    g.SetZoomPan(0.5f, 1.0f);
    EXPECT_EQ(g.indicatorX, -1);
    // Hidden, it reports the point one pixel left of the visible part.
    EXPECT_NEAR(g.IndicatorFraction(), 0.5 - 0.5 / 400, 1e-9);
}

TEST(ChartMapping, TimesFractionsColumnsAndSamplesAgree) {
    auto g = chart(300, 200, 10.0);  // 300 frames over 300 columns
    EXPECT_DOUBLE_EQ(g.FractionFromTime(CueTime::FromSeconds(2.5)), 0.25);
    EXPECT_EQ(g.ColumnFromTime(CueTime::FromSeconds(2.5)), 75);
    EXPECT_EQ(g.TimeFromColumn(75), CueTime::FromSeconds(2.5));
    EXPECT_EQ(g.ColumnFromFraction(1.0), 300);  // zoomEnd: just outside
    EXPECT_FALSE(g.ValidColumn(300));
    // A 5-second sound of 1000 samples on the 10-second chart; the last sample from its end.
    const CueTime half = CueTime::FromSeconds(5.0);
    using Index = std::tuple<double, long, CueTime, long>;
    for (auto [f, count, length, want] : {Index{0.25, 1000, half, 500}, Index{0.9, 1000, half, 999},
                                          Index{0.25, 0, half, 0}, Index{0.25, 1000, CueTime(), 0}})
        EXPECT_EQ(g.IndexFromPos(f, count, length), want) << f << " " << count;
    g.duration = CueTime();
    EXPECT_EQ(g.FractionFromTime(CueTime::FromSeconds(3)), 0.0);

    g = chart(0);  // zero width maps every column to 0
    g.zoomStart = 0.3f;
    g.zoomEnd = 0.6f;
    EXPECT_EQ(g.FractionFromColumn(17), 0.0);
    EXPECT_EQ(g.IndicatorFraction(), 0.0);
    EXPECT_EQ(g.ColumnFromFraction(0.5), 0);
    EXPECT_FALSE(g.ValidColumn(0));
    EXPECT_TRUE(g.GridColumns().empty());
}

TEST(ChartDuration, IsTheLargestOfWhatIsShownAndAtLeastASecond) {
    KLChartGeometry g;
    EXPECT_EQ(g.duration, CueTime(0, 0, 5, 0, 0));
    g.userDuration = CueTime(0, 0, 1, 0, 0);
    g.ComputeDuration(false, CueTime(), false, CueTime());
    EXPECT_EQ(g.duration, CueTime(0, 0, 1, 0, 0));
    g.ComputeDuration(true, CueTime::FromSeconds(7), true, CueTime::FromSeconds(3));
    EXPECT_EQ(g.duration, CueTime::FromSeconds(7));
    g.ComputeDuration(true, CueTime::FromSeconds(7), true, CueTime::FromSeconds(30));
    EXPECT_EQ(g.duration, CueTime::FromSeconds(30));
    g.ComputeDuration(true, CueTime::FromTicks(INT32_MAX), false, CueTime());
    EXPECT_EQ(g.duration, CueTime::FromTicks(INT32_MAX));
}

TEST(ChartBands, MapValuesToRows) {
    auto g = chart(400, 300);            // lower band 200 .. base 280
    using Tick = std::pair<float, int>;  // the tick's extra pixel at the top
    for (auto [value, row] : {Tick{0.0f, 280}, Tick{1.0f, 240}, Tick{2.0f, 201}, Tick{5.0f, 201}})
        EXPECT_EQ(g.TickRow(value), row) << value;
    EXPECT_DOUBLE_EQ(g.ValueRow(1.0f), 240.0);
    EXPECT_DOUBLE_EQ(g.ValueRow(-3.0f), 280.0);
    EXPECT_FLOAT_EQ(g.ValueFromRow(240), 1.0f);
    EXPECT_FLOAT_EQ(g.ValueFromRow(150), 2.0f);
    EXPECT_FLOAT_EQ(g.ValueFromRow(400), 0.0f);
    EXPECT_FALSE(g.SetSize(400, 300));
    EXPECT_TRUE(g.SetSize(400, 1));  // a 1-pixel chart: negative bands, no trouble
    EXPECT_EQ(g.textBaseline, -19);
    EXPECT_EQ(g.ValueFromRow(0), 0.0f);
    EXPECT_FALSE(KLChartGeometry::Hits(-100, 0) || KLChartGeometry::Hits(INT32_MIN, INT32_MAX));
}

}  // namespace
