// Playback through the main window on the demo (its keyset, track and sound), driven by the
// transport buttons; the arithmetic of a pass and the key-image choice as tables.
#include <gtest/gtest.h>

#include <Xm/Xm.h>

#include <cstdlib>
#include <string>
#include <tuple>

#include "chart/KLSyncChart.h"
#include "guitest/GuiTest.h"
#include "model/KLKeyTrack.h"
#include "toolkit/KLTimer.h"
#include "window/EventPump.h"
#include "window/Gnome.h"
#include "window/PlaybackPass.h"
#include "window/WindowTestUtil.h"
#include "workspace/Imp.h"

namespace {

// At 30 frames a second: the timer spans the region stretched by the speed, either way, and
// Position maps timer time back; fast is a quarter more, the menu has four speeds, region
// frames round to nearest; the key images by display style (midpoint, keyframe, dissolve) and
// the keys either side.
TEST(PlaybackPass, ArithmeticAndKeyImages) {
    const int fps = CueTime::default_fps;
    CueTime::default_fps = 30;
    using Case = std::tuple<double, double, float, double>;  // from, to, speed, end (frames)
    for (auto [from, to, speed, end] :
         {Case{10, 40, 0.5f, 70}, Case{10, 40, 1.25f, 34}, Case{40, 10, 0.5f, -20},
          Case{5, 5, 0.5f, 5}, Case{0, 1, 0.75f, 4.0 / 3}}) {
        SCOPED_TRACE(testing::Message() << from << ".." << to << " at " << speed);
        const CueTime f = CueTime::FromFrames(from), t = CueTime::FromFrames(to);
        const CueTime e = PlaybackPass::StretchedEnd(f, t, speed);
        EXPECT_EQ(e, CueTime::FromFrames(end));
        EXPECT_EQ(PlaybackPass::Position(f, f, speed), f);
        EXPECT_NEAR(PlaybackPass::Position(f, e, speed).Ticks(), t.Ticks(), 1);
    }
    EXPECT_EQ(PlaybackPass::FastSpeed(1.0f), 1.25f);
    EXPECT_EQ(PlaybackPass::MenuSpeed(1, 0.5f), 0.75f);
    EXPECT_EQ(PlaybackPass::MenuSpeed(4, 0.75f), 0.75f) << "unknown entries change nothing";
    EXPECT_EQ(PlaybackPass::RegionFrames(CueTime(), CueTime::FromFrames(10.4)), 10);
    EXPECT_EQ(PlaybackPass::RegionFrames(CueTime(), CueTime::FromFrames(10.6)), 11);
    CueTime::default_fps = fps;

    using K = KeyImageChoice;
    using Style = std::tuple<int, bool, bool, float, K::Show, float>;  // ... fraction -> show, fade
    for (auto [style, prev, next, fraction, show, fade] :
         {Style{0, true, true, 0.5f, K::kPrev, 0},  // the exact half: prev
          Style{0, true, true, 0.5001f, K::kNext, 0}, Style{1, true, true, 0.9f, K::kPrev, 0},
          Style{2, true, true, 0.3f, K::kDissolve, 0.3f}, Style{2, false, true, 0.7f, K::kNext, 0},
          Style{0, false, false, 0, K::kNone, 0}}) {
        const K k = K::Choose(style, prev, next, fraction);
        EXPECT_TRUE(k.show == show && k.fade == fade) << style << prev << next << " " << fraction;
    }
}

using windowtest::Label;
using windowtest::Pump;
using windowtest::W;

// The window with the demo loaded, once per program; sound goes to SDL's silent driver unless
// the run asks for another (CTest runs these under "disk" too).
class PlaybackWindowTest : public ::testing::Test {
  protected:
    void SetUp() override {
        setenv("SDL_AUDIODRIVER", "dummy", 0);
        gnome = &windowtest::TheDemoWindow(true);
        chart = gnome->syncChart;
        ASSERT_NE(chart, nullptr);
        ASSERT_NE(theImp.sound, nullptr);
        gnome->repeatMode = 0;
        gnome->playSpeed = 1.0f;
    }
    void TearDown() override {
        gnome->PlayStop();
        Pump([&] { return !gnome->playTimer; }, 5);
    }
    // The chart's region set to from..to, as the chart stores it.
    void Region(CueTime from, CueTime to, CueTime* s, CueTime* e) {
        chart->SetRegionRange(from, to);
        chart->GetRegionRange(*s, *e);
    }

    Gnome* gnome = nullptr;
    KLSyncChart* chart = nullptr;
};

// The speed menu stretches the timer; fast adds a quarter; reverse runs from the region's end
// back; while a pass plays, another transport button is ignored.
TEST_F(PlaybackWindowTest, SpeedFastAndReverseShapeThePassAndASecondPressIsIgnored) {
    CueTime s, e;
    Region(CueTime::FromSeconds(1), CueTime::FromSeconds(3), &s, &e);
    chart->SetIndicatorTime(e);
    windowtest::ChooseOption(W("speedMenu"), 3);
    EXPECT_EQ(gnome->playSpeed, 0.25f);
    guitest::Click(W("fastReverse"));
    ASSERT_TRUE(Pump([&] { return gnome->playTimer != nullptr; }));
    EXPECT_EQ(gnome->passSpeed, 0.5f);
    EXPECT_TRUE(gnome->playTimer->Reverse());
    EXPECT_EQ(gnome->playTimer->From(), e);
    const CueTime to = PlaybackPass::StretchedEnd(e, s, 0.5f);
    EXPECT_EQ(gnome->playTimer->To(), to);
    ASSERT_TRUE(Pump([&] { return chart->GetIndicatorTime() < e - CueTime(2.0, 0); }))
        << "the indicator runs back from the region's end";
    EXPECT_GT(chart->GetIndicatorTime(), s);
    guitest::Click(W("fastForward"));
    guitest::Click(W("playForward"));
    guitest::Settle();
    ASSERT_NE(gnome->playTimer, nullptr);
    EXPECT_EQ(gnome->passSpeed, 0.5f);
    EXPECT_EQ(gnome->playTimer->To(), to);
    EXPECT_TRUE(gnome->playTimer->Reverse());
}

// An empty pass ends at once, or when looping restarts again and again; Stop during a loop
// ends the pass where it is, and the information bar shows that time.
TEST_F(PlaybackWindowTest, LoopsRestartUntilStoppedWhereTheyAre) {
    const CueTime t = CueTime::FromSeconds(2);
    for (int repeat : {0, 1}) {
        gnome->repeatMode = repeat;
        XtAppAddWorkProc(KLXmGnome::AppContext(), Gnome::playback_workproc, gnome);
        gnome->begin_playback(t, t, 1.0f);
        EXPECT_EQ(Pump([&] { return !gnome->playTimer; }, repeat ? 0.5 : 2), !repeat) << repeat;
        EXPECT_NEAR(chart->GetIndicatorTime().Ticks(), t.Ticks(), 200) << "within its column";
    }
    gnome->PlayStop();
    ASSERT_TRUE(Pump([&] { return !gnome->playTimer; }, 2));

    gnome->repeatMode = 0;
    CueTime s, e;
    Region(CueTime::FromSeconds(1.0), CueTime::FromSeconds(1.5), &s, &e);
    windowtest::ChooseOption(W("repeatMenu"), 1);
    ASSERT_EQ(gnome->repeatMode, 1);
    guitest::Click(W("playForward"));
    // Past the end of the first pass and round again.
    ASSERT_TRUE(Pump([&] { return chart->GetIndicatorTime() > e - CueTime(3.0, 0); }));
    ASSERT_TRUE(Pump([&] { return chart->GetIndicatorTime() < s + CueTime(6.0, 0); }))
        << "the loop starts the region again";
    ASSERT_NE(gnome->playTimer, nullptr) << "still playing";
    guitest::Click(W("playStop"));
    ASSERT_TRUE(Pump([&] { return !gnome->playTimer; }));
    EXPECT_EQ(gnome->soundPlaying, 0);
    const CueTime at = chart->GetIndicatorTime();
    EXPECT_GE(at, s);
    EXPECT_LE(at, e);
    EXPECT_EQ(Label(W("infoTimeValue")), at.Text());
}

// Dragging the indicator by hand across the sound, away from any key, the information bar
// shows where it was let go, not where the press was.
TEST_F(PlaybackWindowTest, TheTimecodeFollowsAnIndicatorDraggedByHand) {
    const KLChartGeometry& g = chart->geometry;
    chart->SetRegionRange(CueTime(), CueTime());
    chart->SetZoomRange(CueTime(), g.duration);
    KLKeyTrack* track = theImp.GetKeyTrack(gnome->GetActiveKeyset());
    ASSERT_NE(track, nullptr);
    // A column at least ten pixels from every key, in the right half of the chart.
    auto clear = [&](int x) {
        for (const KLKeyEvent* e : track->events)
            if (std::abs(g.ColumnFromTime(e->time) - x) < 10)
                return false;
        return true;
    };
    int to = int(g.width) - 20;
    while (to > int(g.width) / 2 && !clear(to))
        to--;
    ASSERT_GT(to, int(g.width) / 2) << "no column clear of keys";
    const int from = to - 60, y = int(g.height) / 3;
    guitest::MoveTo(W("syncChart"), from, y);
    guitest::Press(1);
    for (int x = from + 10; x <= to; x += 10)
        guitest::MoveTo(W("syncChart"), x, y);
    guitest::Release(1);
    guitest::Settle();
    const CueTime at = chart->GetIndicatorTime();
    EXPECT_EQ(g.indicatorX, to);
    EXPECT_EQ(Label(W("infoTimeValue")), at.Text());
}

}  // namespace
