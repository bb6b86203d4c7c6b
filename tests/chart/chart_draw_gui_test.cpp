// What the chart paints, read back from its window.
#include "chart/ChartTestUtil.h"

#include <X11/Xresource.h>

#include <cmath>

#include "model/InterpEase.h"

using charttest::ChartWindow;
using charttest::Seconds;

namespace {

// A 600 x 260 chart showing ten seconds: 60 pixels a second, a grid line every 10 columns,
// wave band from row 15, lower band from 160 down to the base line at 240.
class ChartDraw : public charttest::ChartTest {
  protected:
    unsigned long Pixel(int x, int y) { return window->Pixel(x, y); }
    // Pixels of a rectangle that are neither background nor grid (text is antialiased).
    int Inked(int x, int y, int w, int h) {
        int count = 0;
        for (unsigned long p : window->Pixels(x, y, w, h))
            count += p != chart->background && p != chart->gridColor;
        return count;
    }
};

TEST_F(ChartDraw, SticksLettersAndTheActiveKeyAndMark) {
    EXPECT_EQ(chart->geometry.lowerBandTop, 160);
    EXPECT_EQ(chart->geometry.textBaseline, 240);
    EXPECT_EQ(chart->waveSegments.size(), 600u);
    Key(1, 2, 1, 1.0f);
    Key(2, 7, 0, 2.0f);
    KLMarkTrack marks;
    marks.InsertMark(Seconds(4), 'W');
    chart->SetKeyTrack(track.get());
    chart->SetMarkTrack(&marks);
    for (int x : {120, 420}) {
        EXPECT_EQ(Pixel(x, 170), chart->keyColor) << x;
        EXPECT_EQ(Pixel(x - 1, 230), chart->keyColor) << x;  // three pixels wide
        EXPECT_EQ(Pixel(x + 1, 230), chart->keyColor) << x;
        EXPECT_NE(Pixel(x + 2, 170), chart->keyColor) << x;
        EXPECT_NE(Pixel(x - 2, 230), chart->keyColor) << x;
    }
    // The ticks: value 1 halfway up, value 2 at the top plus one pixel, 4 left and 5 right.
    EXPECT_EQ(Pixel(120 - 4, chart->geometry.TickRow(1.0f)), chart->keyColor);
    EXPECT_EQ(Pixel(120 + 4, chart->geometry.TickRow(1.0f)), chart->keyColor);
    EXPECT_EQ(Pixel(420 + 4, 161), chart->keyColor);
    EXPECT_NE(Pixel(420 + 4, 159), chart->keyColor);
    EXPECT_GT(Inked(112, 242, 17, 17), 5);  // "A" under the stick, baseline 255
    EXPECT_GT(Inked(232, 0, 17, 15), 5);    // "W" above the waveform, baseline 12
    EXPECT_EQ(Inked(200, 242, 17, 17), 0);

    chart->SetIndicatorTime(Seconds(2) + CueTime::FromFrames(1));  // 2 pixels right of the key
    chart->UpdateDisplay();
    ASSERT_NE(chart->activeKey, nullptr);
    EXPECT_EQ(Pixel(120, 170), chart->keyActiveColor);
    EXPECT_EQ(chart->activeMark, nullptr);
    // Moving on to the mark: the key's highlight goes, the mark's letter sits on the colour.
    chart->SetIndicatorTime(Seconds(4));
    chart->UpdateDisplay();
    EXPECT_EQ(chart->activeKey, nullptr);
    EXPECT_EQ(Pixel(120, 170), chart->keyColor);
    ASSERT_NE(chart->activeMark, nullptr);
    int highlighted = 0;
    for (unsigned long p : window->Pixels(232, 0, 16, 14))
        highlighted += p == chart->keyActiveColor;
    EXPECT_GT(highlighted, 20);
}

TEST_F(ChartDraw, EaseAndSmoothCurvesRunThroughTheEaseFunction) {
    Key(0, 0, 1, 1.0f);
    Key(1, 4, 1, 2.0f);  // Ease, 0 .. 240
    Key(2, 8, 2, 1.0f);  // Smooth, 240 .. 480
    Key(3, 9, 0, 2.0f);  // Linear, 480 .. 540
    chart->SetKeyTrack(track.get());
    const float base = 240, top2 = 160, top1 = 200;
    for (int i : {33, 77, 121, 163, 207}) {
        const int y = int(std::trunc(interp_ease(i / 240.0f, base, top2, 0.2f, 0.8f)));
        EXPECT_EQ(Pixel(i, y), chart->easeColor) << i;
        const int ys = int(std::trunc(interp_ease(i / 240.0f, base, top1, 0.5f, 0.5f)));
        EXPECT_EQ(Pixel(240 + i, ys), chart->smoothColor) << i;
    }
    EXPECT_EQ(Pixel(510, 200), chart->linearColor);  // halfway up the straight line
    // Shrinking and growing the window repaints at the new size.
    for (int width : {500, 700}) {
        XtVaSetValues(window->shell, XmNwidth, width, nullptr);
        ASSERT_TRUE(guitest::WaitFor(
            [&] { return chart->geometry.width == unsigned(width) && !chart->needRedraw; }));
        EXPECT_EQ(chart->waveSegments.size(), size_t(width));
        EXPECT_EQ(Pixel(width * 4 / 10, 170), chart->keyColor) << width;  // the key at 4 s
    }
}

TEST_F(ChartDraw, RegionIndicatorZoomAndWaveform) {
    // 1.25 seconds is fraction 0.125, column 75 exactly (grid lines are every 10 columns).
    chart->SetRegionRange(Seconds(0.5), Seconds(1.25));
    EXPECT_EQ(Pixel(75, 5), chart->regionColor);
    EXPECT_EQ(Pixel(76, 5), chart->background);
    EXPECT_EQ(Pixel(29, 5), chart->background);
    EXPECT_EQ(Pixel(50, 5), chart->gridColor);           // the grid shows through the region
    chart->SetRegionRange(Seconds(1.25), Seconds(0.5));  // start after end selects nothing
    EXPECT_EQ(Pixel(45, 5), chart->background);

    chart->SetIndicatorTime(Seconds(2.5));
    EXPECT_EQ(chart->geometry.indicatorX, 150);
    EXPECT_EQ(Pixel(150, 0), chart->foreground);
    EXPECT_EQ(Pixel(150, 259), chart->foreground);
    // A time outside the visible part changes nothing.
    chart->SetZoomPan(0.0f, 0.5f);
    EXPECT_EQ(chart->geometry.indicatorX, 300);
    chart->SetIndicatorTime(Seconds(7));
    EXPECT_EQ(chart->geometry.indicatorX, 300);
    // The visible part's end maps to column 600: the old line goes, the column stays.
    chart->SetIndicatorPos(0.5f);
    EXPECT_EQ(chart->geometry.indicatorX, 300);
    EXPECT_NE(Pixel(300, 5), chart->foreground);
    chart->SetZoomPan(0.6f, 1.0f);  // zooming away from it hides it
    EXPECT_EQ(chart->geometry.indicatorX, -1);

    chart->ZoomReset();
    Widget in = KLXmGnome::FindWidget("syncChartZoomIn", window->shell);
    Widget out = KLXmGnome::FindWidget("syncChartZoomOut", window->shell);
    ASSERT_TRUE(in && out && chart->panScroll);
    guitest::Click(in);
    ASSERT_TRUE(guitest::WaitFor([this] { return chart->geometry.zoomEnd == 0.75f; }));
    EXPECT_FLOAT_EQ(chart->geometry.zoomStart, 0.25f);
    int value = 0, slider = 0;
    XtVaGetValues(chart->panScroll, XmNvalue, &value, XmNsliderSize, &slider, nullptr);
    EXPECT_EQ(std::make_pair(value, slider), std::make_pair(2500, 5000));
    // Dragging the slider pans.
    Dimension w = 0;
    XtVaGetValues(chart->panScroll, XmNwidth, &w, nullptr);
    guitest::MoveTo(chart->panScroll, w / 2, -1);
    guitest::Press(1);
    guitest::MoveTo(chart->panScroll, w / 2 + w / 8, -1);
    guitest::Release(1);
    ASSERT_TRUE(guitest::WaitFor([this] { return chart->geometry.zoomStart > 0.3f; }));
    EXPECT_NEAR(chart->geometry.zoomEnd - chart->geometry.zoomStart, 0.5f, 0.01f);
    guitest::Click(out);
    guitest::Click(out);
    ASSERT_TRUE(guitest::WaitFor(
        [this] { return chart->geometry.zoomStart == 0.0f && chart->geometry.zoomEnd == 1.0f; }));

    // A loud sound draws from the centre line through the band; without it the waveform goes.
    const int centre = 15 + (144 / 2);
    std::vector<float> tone(48000);
    for (size_t i = 0; i < tone.size(); i++)
        tone[i] = std::sin(float(i) * 0.05f);
    auto loud = charttest::Sound(tone, 48000);
    chart->SetSound(loud.get());
    EXPECT_EQ(Pixel(25, centre), chart->soundColor);
    EXPECT_EQ(Pixel(25, 20), chart->soundColor);
    EXPECT_NE(Pixel(25, 160), chart->soundColor);
    const CueTime before = chart->geometry.duration;
    chart->SetSound(nullptr);
    EXPECT_EQ(chart->geometry.duration, before);
    EXPECT_EQ(Pixel(25, 20), chart->background);
}

TEST(ChartResources, ColoursComeFromTheResourceDatabase) {
    ASSERT_TRUE(guitest::Shell());
    XrmDatabase db = XtDatabase(guitest::GetDisplay());
    XrmPutLineResource(&db, "*colourChart.keyColor: #00ff00");
    XrmPutLineResource(&db, "*colourChart.regionColor: #0000ff");
    ChartWindow window("colourChart", 300, 200);
    EXPECT_EQ(window.chart->keyColor, guitest::NamedPixel("#00ff00"));
    EXPECT_EQ(window.chart->regionColor, guitest::NamedPixel("#0000ff"));
    // The class-wide fallbacks fill in what the database does not say.
    EXPECT_EQ(window.chart->soundColor, guitest::NamedPixel("#1d4f91"));
    auto keyset = charttest::Keyset("rest AI");
    KLKeyTrack track(keyset.get());
    track.InsertKey(1, Seconds(2), keyset->GetKeyShape(1), 1, 1.0f);
    window.chart->SetKeyTrack(&track);
    const int x = window.chart->geometry.ColumnFromTime(Seconds(2));
    EXPECT_EQ(window.Pixel(x, window.chart->geometry.lowerBandTop + 3),
              guitest::NamedPixel("#00ff00"));
}

TEST(ChartSmall, TinyChartsAndFarKeysDrawWithoutTrouble) {
    auto keyset = charttest::Keyset("rest AI");
    KLKeyTrack track(keyset.get());
    track.InsertKey(1, CueTime::FromTicks(2000000000), keyset->GetKeyShape(1), 1, 1.0f);
    track.InsertKey(0, Seconds(1), keyset->GetKeyShape(0), 1, 1.0f);
    ChartWindow window("tinyChart", 40, 1);
    window.chart->SetKeyTrack(&track);
    EXPECT_EQ(window.chart->geometry.duration, CueTime::FromTicks(2000000000));
    for (int i = 0; i < 100; i++)
        window.chart->ZoomIn();
    window.chart->SetIndicatorPos(window.chart->geometry.zoomStart);
    window.chart->ZoomReset();
    guitest::Settle();
    EXPECT_EQ(window.chart->geometry.textBaseline, -19);
}

}  // namespace
