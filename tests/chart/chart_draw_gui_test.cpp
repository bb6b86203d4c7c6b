// What the chart paints, read back from its window.
#include "chart/ChartTestUtil.h"

#include <cmath>

using charttest::ChartWindow;
using charttest::Seconds;

namespace {

// A 600 x 260 chart showing ten seconds: 60 pixels a second, wave band from row 15, lower
// band from 160 down to the base line at 240.
class ChartDraw : public charttest::ChartTest {
  protected:
    unsigned long Pixel(int x, int y) { return window->Pixel(x, y); }
};

// The mark at the indicator is active; a time out of view leaves the indicator; a resized
// window repaints.
TEST_F(ChartDraw, TheActiveMarkAndResizing) {
    Key(1, 2, 1, 1.0f);
    Key(2, 7, 0, 2.0f);
    KLMarkTrack marks;
    marks.InsertMark(Seconds(4), 'W');
    chart->SetKeyTrack(track.get());
    chart->SetMarkTrack(&marks);
    chart->SetIndicatorTime(Seconds(4));
    chart->UpdateDisplay();
    EXPECT_TRUE(chart->activeKey == nullptr && chart->activeMark != nullptr);
    chart->SetZoomPan(0.0f, 0.5f);  // a time outside the visible part leaves the indicator
    chart->SetIndicatorTime(Seconds(7));
    EXPECT_EQ(chart->geometry.indicatorX, 480);
    chart->ZoomReset();
    for (int width : {500, 700}) {
        XtVaSetValues(window->shell, XmNwidth, width, nullptr);
        ASSERT_TRUE(guitest::WaitFor(
            [&] { return chart->geometry.width == unsigned(width) && !chart->needRedraw; }));
        EXPECT_EQ(chart->waveSegments.size(), size_t(width));
        EXPECT_EQ(Pixel(width * 7 / 10, 170), chart->keyColor) << width;  // the key at 7 s
    }
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
