// The chart driven with real pointer and keyboard input.
#include "chart/ChartTestUtil.h"

#include <X11/keysym.h>

using charttest::Seconds;

namespace {

// A 600 x 260 chart of ten seconds (60 pixels a second) with a key track and a mark track:
// keys at 2 s (column 120) and 5 s (column 300), marks at 1 s (column 60) and 3 s (180).
class ChartInput : public charttest::ChartTest {
  protected:
    void SetUp() override {
        ChartTest::SetUp();
        area = chart->drawingArea;
        Key(1, 2, 1, 1.0f);
        Key(2, 5, 0, 1.0f);
        marks.InsertMark(Seconds(1), 'a');
        marks.InsertMark(Seconds(3), 'b');
        chart->SetKeyTrack(track.get());
        chart->SetMarkTrack(&marks);
    }

    // Presses button 1 at (x0, y), moves to x1 (and y1) and releases there.
    void Drag(int x0, int y, int x1, int y1 = -1, int button = 1) {
        guitest::MoveTo(area, x0, y);
        guitest::Press(button);
        guitest::MoveTo(area, (x0 + x1) / 2, y1 < 0 ? y : (y + y1) / 2);
        guitest::MoveTo(area, x1, y1 < 0 ? y : y1);
        guitest::Release(button);
    }
    bool KeyAt(double seconds) {
        return track->key_from_time(Seconds(seconds)) &&
               track->key_from_time(Seconds(seconds))->time == Seconds(seconds);
    }
    int KeyCount() { return track->events.Count(); }
    std::string MarkText() {
        std::string text;
        for (const KLMarkEvent* m : marks.marks)
            text += std::string(1, m->label) + "@" + m->time.Text() + " ";
        return text;
    }

    Widget area = nullptr;
    KLMarkTrack marks;
};

// A click on the letter strip within four pixels of a key moves it there, else the indicator;
// dragging the indicator picks the active key, a stick sets a value, a key or a mark moves.
TEST_F(ChartInput, PicksAndDrags) {
    int column = 120;  // the key at 2 s
    for (int offset : {4, -4, 5, -5}) {
        const int x = column + offset;
        guitest::Click(area, 1, x, 250);
        if (std::abs(offset) < 5) {
            const double there = chart->geometry.TimeFromColumn(x).Seconds();
            EXPECT_TRUE(guitest::WaitFor([&] { return KeyAt(there); })) << offset;
            column = x;
        } else {
            EXPECT_TRUE(guitest::WaitFor([&] { return chart->geometry.indicatorX == x; }));
            EXPECT_TRUE(KeyAt(2.0)) << offset;
        }
        EXPECT_EQ(KeyCount(), 2);
    }
    ASSERT_EQ(column, 120);

    Drag(200, 100, 302);
    EXPECT_TRUE(guitest::WaitFor([&] { return chart->geometry.indicatorX == 302; }));
    EXPECT_EQ(chart->activeKey, track->key_from_time(Seconds(5)));
    EXPECT_EQ(chart->feedbackKeyBefore, 2);
    EXPECT_EQ(chart->feedbackKeyAfter, -1);

    const int tick = chart->geometry.TickRow(1.0f);  // 200
    Drag(121, tick + 2, 121, 180);
    const KLKeyEvent* key = track->key_from_time(Seconds(2));
    EXPECT_TRUE(guitest::WaitFor([&] { return key->value != 1.0f; }));
    EXPECT_FLOAT_EQ(key->value, chart->geometry.ValueFromRow(180));  // 1.5
    EXPECT_EQ(chart->dragMode, 0);
    // Five rows from the tick misses it: the indicator moves instead.
    guitest::Click(area, 1, 120, chart->geometry.TickRow(1.5f) + 5);
    EXPECT_TRUE(guitest::WaitFor([&] { return chart->geometry.indicatorX == 120; }));
    EXPECT_FLOAT_EQ(key->value, 1.5f);

    Drag(120, 250, 240);
    ASSERT_TRUE(guitest::WaitFor([&] { return KeyAt(4.0); }));
    const KLKeyEvent* moved = track->key_from_time(Seconds(4));
    EXPECT_EQ(moved->shapeIndex, 1);
    EXPECT_EQ(moved->value, 1.5f);
    EXPECT_FALSE(KeyAt(2.0));
    // Onto another key's time: refused, the key goes back.
    Drag(240, 250, 300);
    guitest::Settle();
    EXPECT_TRUE(KeyAt(4.0) && KeyAt(5.0));
    EXPECT_EQ(KeyCount(), 2);
    // Far out of the window: it lands on the chart's last column.
    Drag(240, 250, 900);
    EXPECT_TRUE(guitest::WaitFor([&] { return KeyCount() == 2 && !KeyAt(4.0); }));
    EXPECT_EQ(track->events.Tail()->time, chart->geometry.TimeFromColumn(599));

    Drag(62, 8, 150);
    EXPECT_TRUE(guitest::WaitFor([&] { return MarkText() == "a@75 b@90 "; })) << MarkText();
    Drag(150, 30, 200);  // below the mark strip the press is no mark's
    EXPECT_EQ(MarkText(), "a@75 b@90 ");
}

TEST_F(ChartInput, ButtonTwoSweepsARegion) {
    Drag(100, 100, 220, -1, 2);
    ASSERT_TRUE(guitest::WaitFor([&] { return chart->geometry.RegionSelected(); }));
    EXPECT_FLOAT_EQ(chart->geometry.regionStart, float(chart->geometry.FractionFromColumn(100)));
    EXPECT_FLOAT_EQ(chart->geometry.regionEnd, float(chart->geometry.FractionFromColumn(219)));
    guitest::Click(area, 2, 300, 100);
    EXPECT_TRUE(guitest::WaitFor([&] { return !chart->geometry.RegionSelected(); }));
    // Swept out of the window: clamped to the chart's ends.
    Drag(500, 100, 900, -1, 2);
    ASSERT_TRUE(guitest::WaitFor([&] { return chart->geometry.RegionSelected(); }));
    EXPECT_LE(chart->geometry.regionEnd, 1.0f);
}

// BackSpace selects the mark at or before the indicator, then removes marks backwards; a
// typed letter replaces the active mark or goes on the next frame; without a mark track
// only Space (a frame on) does anything.
TEST_F(ChartInput, TypedMarksAndBackSpace) {
    guitest::Click(area, 1, 240, 100);  // 4 s
    ASSERT_TRUE(guitest::WaitFor([&] { return chart->geometry.indicatorX == 240; }));
    guitest::TypeKey(XK_BackSpace);  // b at 3 s
    ASSERT_TRUE(guitest::WaitFor([&] { return chart->activeMark != nullptr; }));
    EXPECT_EQ(chart->activeMark->label, 'b');
    EXPECT_EQ(chart->geometry.indicatorX, 180);
    guitest::TypeKey(XK_BackSpace);  // b goes, a becomes active
    ASSERT_TRUE(guitest::WaitFor([&] { return marks.marks.Count() == 1; }));
    ASSERT_TRUE(chart->activeMark);
    EXPECT_EQ(chart->activeMark->label, 'a');
    EXPECT_EQ(chart->geometry.indicatorX, 60);
    guitest::TypeText("z");
    ASSERT_TRUE(guitest::WaitFor([&] { return MarkText() == "z@30 "; })) << MarkText();

    chart->SetMarkTrack(nullptr);
    guitest::Click(area, 1, 240, 100);
    ASSERT_TRUE(guitest::WaitFor([&] { return chart->geometry.indicatorX == 240; }));
    guitest::TypeKey(XK_BackSpace);
    guitest::TypeText("q");
    guitest::Settle();
    EXPECT_EQ(chart->geometry.indicatorX, 240);
    EXPECT_EQ(MarkText(), "z@30 ");
    guitest::TypeKey(XK_space);  // two columns here
    EXPECT_TRUE(guitest::WaitFor([&] { return chart->geometry.indicatorX == 242; }));

    // 100 seconds over 600 columns: a frame is a fifth of a pixel.
    chart->SetMarkTrack(&marks);
    chart->SetUserDuration(Seconds(100));
    marks.Clear();
    guitest::Click(area, 1, 300, 100);
    ASSERT_TRUE(guitest::WaitFor([&] { return chart->geometry.indicatorX == 300; }));
    const int start = chart->GetIndicatorTime().Frame();
    guitest::TypeText("abc");
    ASSERT_TRUE(guitest::WaitFor([&] { return marks.marks.Count() == 3; })) << MarkText();
    EXPECT_EQ(MarkText(), "a@" + std::to_string(start) + " b@" + std::to_string(start + 1) + " c@" +
                              std::to_string(start + 2) + " ");
}

}  // namespace
