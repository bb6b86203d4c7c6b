#include <gtest/gtest.h>

#include <cmath>

#include "chart/KLChartGeometry.h"

namespace {

// A chart of the given size showing `seconds` seconds (at 30 frames a second).
KLChartGeometry chart(uint32_t width, uint32_t height = 200, double seconds = 10.0) {
    KLChartGeometry g;
    g.SetSize(width, height);
    g.duration = CueTime::FromSeconds(seconds);
    return g;
}

struct ZoomCase {
    const char* name;
    float start, end;  // visible part before
    float wantStart, wantEnd;
};

class ZoomOut : public testing::TestWithParam<ZoomCase> {};

TEST_P(ZoomOut, ClampsEachEndSeparately) {
    auto g = chart(400);
    g.zoomStart = GetParam().start;
    g.zoomEnd = GetParam().end;
    g.regionStart = 0.2f;
    g.regionEnd = 0.25f;
    g.ZoomOut();
    EXPECT_FLOAT_EQ(g.zoomStart, GetParam().wantStart);
    EXPECT_FLOAT_EQ(g.zoomEnd, GetParam().wantEnd);
    EXPECT_FALSE(g.RegionSelected());
}

INSTANTIATE_TEST_SUITE_P(Spans, ZoomOut,
                         testing::Values(ZoomCase{"LeftEdge", 0.1f, 0.3f, 0.0f, 0.4f},
                                         ZoomCase{"FromStart", 0.0f, 0.5f, 0.0f, 0.75f},
                                         ZoomCase{"Middle", 0.4f, 0.6f, 0.3f, 0.7f},
                                         ZoomCase{"RightEdge", 0.8f, 0.9f, 0.75f, 0.95f},
                                         ZoomCase{"Everything", 0.0f, 1.0f, 0.0f, 1.0f}),
                         [](const auto& info) { return std::string(info.param.name); });

class SetZoomPan : public testing::TestWithParam<ZoomCase> {};

TEST_P(SetZoomPan, ClampsAndOrders) {
    auto g = chart(400);
    g.regionStart = 0.1f;
    g.regionEnd = 0.2f;
    g.SetZoomPan(GetParam().start, GetParam().end);
    EXPECT_FLOAT_EQ(g.zoomStart, GetParam().wantStart);
    EXPECT_FLOAT_EQ(g.zoomEnd, GetParam().wantEnd);
    EXPECT_FALSE(g.RegionSelected());
}

INSTANTIATE_TEST_SUITE_P(Asked, SetZoomPan,
                         testing::Values(ZoomCase{"BeyondBothEnds", -0.5f, 2.0f, 0.0f, 1.0f},
                                         ZoomCase{"Reversed", 0.6f, 0.4f, 0.6f, 0.6f},
                                         ZoomCase{"Inside", 0.25f, 0.5f, 0.25f, 0.5f},
                                         ZoomCase{"NotANumber", NAN, NAN, 0.0f, 1.0f}),
                         [](const auto& info) { return std::string(info.param.name); });

TEST(ChartZoom, InOnRegionTakesItThenHalvesAboutTheCentre) {
    auto g = chart(400);
    g.regionStart = 0.2f;
    g.regionEnd = 0.6f;
    g.ZoomIn();
    EXPECT_FLOAT_EQ(g.zoomStart, 0.2f);
    EXPECT_FLOAT_EQ(g.zoomEnd, 0.6f);
    EXPECT_FALSE(g.RegionSelected());
    g.ZoomIn();
    EXPECT_FLOAT_EQ(g.zoomStart, 0.3f);
    EXPECT_FLOAT_EQ(g.zoomEnd, 0.5f);
}

TEST(ChartZoom, AHundredZoomsInStayOrderedAndMapFinitely) {
    auto g = chart(1600);
    g.indicatorX = 800;
    for (int i = 0; i < 100; i++)
        g.ZoomIn();
    EXPECT_LE(g.zoomStart, g.zoomEnd);
    // Far outside columns saturate rather than overflow.
    const int far = g.ColumnFromFraction(1.0);
    EXPECT_GT(far, 0);
    EXPECT_EQ(g.ColumnFromFraction(g.zoomStart), 0);
    g.ZoomReset();
    EXPECT_FLOAT_EQ(g.zoomStart, 0.0f);
    EXPECT_FLOAT_EQ(g.zoomEnd, 1.0f);
}

TEST(ChartIndicator, KeepsItsFractionOrHidesAcrossZooms) {
    auto g = chart(400);
    g.indicatorX = 100;  // fraction 0.25
    g.SetZoomPan(0.0f, 0.5f);
    EXPECT_EQ(g.indicatorX, 200);
    g.SetZoomPan(0.5f, 1.0f);
    EXPECT_EQ(g.indicatorX, -1);
    // Hidden, it reports the point one pixel left of the visible part.
    EXPECT_NEAR(g.IndicatorFraction(), 0.5 - 0.5 / 400, 1e-9);
}

TEST(ChartMapping, ZeroWidthMapsEveryColumnToZero) {
    auto g = chart(0);
    g.zoomStart = 0.3f;
    g.zoomEnd = 0.6f;
    EXPECT_EQ(g.FractionFromColumn(0), 0.0);
    EXPECT_EQ(g.FractionFromColumn(17), 0.0);
    EXPECT_EQ(g.IndicatorFraction(), 0.0);
    EXPECT_EQ(g.ColumnFromFraction(0.5), 0);
    EXPECT_FALSE(g.ValidColumn(0));
    EXPECT_TRUE(g.GridColumns().empty());
}

TEST(ChartMapping, TimesFractionsAndColumnsAgree) {
    auto g = chart(300, 200, 10.0);  // 300 frames over 300 columns
    EXPECT_DOUBLE_EQ(g.FractionFromTime(CueTime::FromSeconds(2.5)), 0.25);
    EXPECT_EQ(g.ColumnFromTime(CueTime::FromSeconds(2.5)), 75);
    EXPECT_EQ(g.TimeFromColumn(75), CueTime::FromSeconds(2.5));
    EXPECT_EQ(g.ColumnFromFraction(1.0), 300);  // zoomEnd: just outside
    EXPECT_FALSE(g.ValidColumn(300));
    g.duration = CueTime();
    EXPECT_EQ(g.FractionFromTime(CueTime::FromSeconds(3)), 0.0);
}

TEST(ChartMapping, SampleIndexFollowsTheSoundsShareOfTheChart) {
    auto g = chart(100, 200, 10.0);
    const CueTime half = CueTime::FromSeconds(5.0);  // a 5-second sound of 1000 samples
    EXPECT_EQ(g.IndexFromPos(0.0, 1000, half), 0);
    EXPECT_EQ(g.IndexFromPos(0.25, 1000, half), 500);
    EXPECT_EQ(g.IndexFromPos(0.5, 1000, half), 999);
    EXPECT_EQ(g.IndexFromPos(0.9, 1000, half), 999);
    EXPECT_EQ(g.IndexFromPos(0.25, 0, half), 0);
    EXPECT_EQ(g.IndexFromPos(0.25, 1000, CueTime()), 0);
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

struct GridCase {
    uint32_t width;
    double frames;  // chart duration in frames
    float start, end;
    double step;
};

class GridStep : public testing::TestWithParam<GridCase> {};

TEST_P(GridStep, IsTheFirstOfOneTwoFiveThatFits) {
    const auto& c = GetParam();
    KLChartGeometry g;
    g.SetSize(c.width, 200);
    g.duration = CueTime::FromFrames(c.frames);
    g.zoomStart = c.start;
    g.zoomEnd = c.end;
    EXPECT_DOUBLE_EQ(g.GridStepFrames(), c.step);
}

INSTANTIATE_TEST_SUITE_P(Charts, GridStep,
                         testing::Values(GridCase{500, 1000, 0, 1, 20},
                                         GridCase{500, 500, 0, 1, 10}, GridCase{500, 501, 0, 1, 20},
                                         GridCase{1600, 30, 0, 1, 1},
                                         GridCase{1600, 108000, 0, 1, 1000},
                                         GridCase{100, 1000, 0.5, 0.75, 50},
                                         GridCase{9, 30, 0, 1, 1e12}));

TEST(ChartGrid, LinesLieStrictlyInsideTheVisiblePart) {
    auto g = chart(500, 200, 1000.0 / 30);  // 1000 frames: step 20, lines every 10 columns
    auto columns = g.GridColumns();
    ASSERT_EQ(columns.size(), 49u);
    EXPECT_EQ(columns.front(), 10);
    EXPECT_EQ(columns.back(), 490);
    g.zoomStart = 0.025f;  // 75 frames: a line every 2 frames, the first after 0.026
    g.zoomEnd = 0.1f;
    columns = g.GridColumns();
    // 0.026 .. 0.098, and 0.1 itself when the float end lies above it.
    ASSERT_GE(columns.size(), 37u);
    ASSERT_LE(columns.size(), 38u);
    EXPECT_EQ(columns.front(), 6);
    EXPECT_LT(columns.back(), 500);
}

TEST(ChartBands, FollowTheHeight) {
    auto g = chart(400, 300);
    EXPECT_EQ(g.waveHeight, 185);
    EXPECT_EQ(g.lowerBandTop, 200);
    EXPECT_EQ(g.textBaseline, 280);
    EXPECT_FALSE(g.SetSize(400, 300));
    EXPECT_TRUE(g.SetSize(400, 1));  // a 1-pixel chart: negative bands, no trouble
    EXPECT_EQ(g.textBaseline, -19);
    EXPECT_EQ(g.ValueFromRow(0), 0.0f);
}

TEST(ChartBands, StickTicksAndValuesFromRows) {
    auto g = chart(400, 300);  // lower band 200 .. base 280
    EXPECT_EQ(g.TickRow(0.0f), 280);
    EXPECT_EQ(g.TickRow(2.0f), 201);  // the tick's extra pixel
    EXPECT_EQ(g.TickRow(5.0f), 201);
    EXPECT_EQ(g.TickRow(1.0f), 240);
    EXPECT_DOUBLE_EQ(g.ValueRow(1.0f), 240.0);
    EXPECT_DOUBLE_EQ(g.ValueRow(-3.0f), 280.0);
    EXPECT_FLOAT_EQ(g.ValueFromRow(240), 1.0f);
    EXPECT_FLOAT_EQ(g.ValueFromRow(150), 2.0f);
    EXPECT_FLOAT_EQ(g.ValueFromRow(400), 0.0f);
}

TEST(ChartHits, FourPixelsHitFiveDoNot) {
    EXPECT_TRUE(KLChartGeometry::Hits(100, 104));
    EXPECT_TRUE(KLChartGeometry::Hits(100, 96));
    EXPECT_FALSE(KLChartGeometry::Hits(100, 105));
    EXPECT_FALSE(KLChartGeometry::Hits(100, 95));
    EXPECT_FALSE(KLChartGeometry::Hits(-100, 0));
}

TEST(ChartReveal, RegionColumnsIncludeItsLastColumn) {
    auto g = chart(100);
    EXPECT_EQ(g.RevealSpans(0, 100).size(), 1u);
    EXPECT_TRUE(g.RevealSpans(0, 0).empty());
    g.regionStart = 0.2f;
    g.regionEnd = 0.5f;  // columns 20 .. 50
    auto spans = g.RevealSpans(0, 100);
    ASSERT_EQ(spans.size(), 3u);
    EXPECT_EQ(spans[0].first, 0);
    EXPECT_EQ(spans[0].last, 19);
    EXPECT_FALSE(spans[0].inRegion);
    EXPECT_EQ(spans[1].first, 20);
    EXPECT_EQ(spans[1].last, 50);
    EXPECT_TRUE(spans[1].inRegion);
    EXPECT_EQ(spans[2].first, 51);
    EXPECT_EQ(spans[2].last, 99);
    // A one-column reveal inside the region comes from the region image only.
    spans = g.RevealSpans(50, 1);
    ASSERT_EQ(spans.size(), 1u);
    EXPECT_TRUE(spans[0].inRegion);
    // Start after end: no region at all.
    g.regionStart = 0.5f;
    g.regionEnd = 0.2f;
    spans = g.RevealSpans(0, 100);
    ASSERT_EQ(spans.size(), 1u);
    EXPECT_FALSE(spans[0].inRegion);
}

TEST(ChartScroll, ValuesAndPanRoundTrip) {
    auto g = chart(400);
    g.zoomStart = 0.25f;
    g.zoomEnd = 0.5f;
    int value = 0, slider = 0;
    g.ScrollValues(0, 10000, &value, &slider);
    EXPECT_EQ(value, 2500);
    EXPECT_EQ(slider, 2500);
    g.ScrollValues(100, 200, &value, &slider);
    EXPECT_EQ(value, 125);
    EXPECT_EQ(slider, 25);
    float start, end;
    KLChartGeometry::PanFromScroll(5000, 2500, 0, 10000, &start, &end);
    EXPECT_FLOAT_EQ(start, 0.5f);
    EXPECT_FLOAT_EQ(end, 0.75f);
    // The minimum is not subtracted from the value.
    KLChartGeometry::PanFromScroll(150, 25, 100, 200, &start, &end);
    EXPECT_FLOAT_EQ(start, 1.5f);
}

}  // namespace
