// Playback through the main window on the demo (its keyset, track and sound), driven by the
// transport buttons; the arithmetic of a pass and the display styles as tables.
#include <gtest/gtest.h>

#include <Xm/RowColumn.h>
#include <Xm/Xm.h>

#include <chrono>
#include <cstdlib>
#include <functional>
#include <memory>
#include <string>
#include <tuple>

#include "chart/KLSyncChart.h"
#include "guitest/GuiTest.h"
#include "model/KLKey.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "toolkit/KLImageSGI.h"
#include "toolkit/KLTimer.h"
#include "toolkit/xm/KLImageView.h"
#include "window/Gnome.h"
#include "window/PlaybackPass.h"
#include "window/WindowTestUtil.h"
#include "workspace/Imp.h"

namespace {

class PlaybackPassTest : public ::testing::Test {
  protected:
    void SetUp() override { saved_ = CueTime::default_fps, CueTime::default_fps = 30; }
    void TearDown() override { CueTime::default_fps = saved_; }
    int saved_ = 30;
};

TEST_F(PlaybackPassTest, TheTimerSpansTheRegionStretchedBySpeed) {
    using Case = std::tuple<double, double, float, double>;  // from, to, speed, end (frames)
    for (auto [from, to, speed, end] :
         {Case{10, 40, 1.0f, 40}, Case{10, 40, 0.5f, 70}, Case{10, 40, 0.25f, 130},
          Case{10, 40, 1.25f, 34}, Case{40, 10, 0.5f, -20}, Case{40, 10, 1.25f, 16},
          Case{5, 5, 0.5f, 5}, Case{0, 1, 0.75f, 4.0 / 3}}) {
        CueTime e =
            PlaybackPass::StretchedEnd(CueTime::FromFrames(from), CueTime::FromFrames(to), speed);
        EXPECT_EQ(e, CueTime::FromFrames(end)) << from << ".." << to << " at " << speed;
    }
}

TEST_F(PlaybackPassTest, PositionMapsTimerTimeBackOntoTheRegion) {
    const CueTime from = CueTime::FromFrames(40), to = CueTime::FromFrames(10);
    for (float speed : {1.0f, 0.75f, 0.5f, 0.25f, 1.25f}) {
        CueTime end = PlaybackPass::StretchedEnd(from, to, speed);
        EXPECT_EQ(PlaybackPass::Position(from, from, speed), from);
        EXPECT_NEAR(PlaybackPass::Position(from, end, speed).Ticks(), to.Ticks(), 1) << speed;
    }
    EXPECT_EQ(PlaybackPass::Position(CueTime(), CueTime::FromFrames(8), 0.5f),
              CueTime::FromFrames(4));
}

TEST_F(PlaybackPassTest, FastIsAQuarterMoreAndTheMenuHasFourSpeeds) {
    EXPECT_EQ(PlaybackPass::FastSpeed(1.0f), 1.25f);
    EXPECT_EQ(PlaybackPass::FastSpeed(0.25f), 0.5f);
    EXPECT_EQ(PlaybackPass::FastSpeed(0.75f), 1.0f);
    EXPECT_EQ(PlaybackPass::MenuSpeed(0, 0.5f), 1.0f);
    EXPECT_EQ(PlaybackPass::MenuSpeed(1, 0.5f), 0.75f);
    EXPECT_EQ(PlaybackPass::MenuSpeed(3, 1.0f), 0.25f);
    EXPECT_EQ(PlaybackPass::MenuSpeed(4, 0.75f), 0.75f) << "unknown entries change nothing";
    EXPECT_EQ(PlaybackPass::MenuSpeed(-1, 0.75f), 0.75f);
}

TEST_F(PlaybackPassTest, RegionFramesRoundToNearest) {
    EXPECT_EQ(PlaybackPass::RegionFrames(CueTime(), CueTime::FromFrames(10.4)), 10);
    EXPECT_EQ(PlaybackPass::RegionFrames(CueTime(), CueTime::FromFrames(10.6)), 11);
    EXPECT_EQ(PlaybackPass::RegionFrames(CueTime::FromFrames(3), CueTime::FromFrames(3)), 0);
}

using K = KeyImageChoice;
struct StyleCase {
    int style;
    bool prev, next;
    float fraction;
    K::Show show;
    float fade;
};

class DisplayStyleTest : public ::testing::TestWithParam<StyleCase> {};

TEST_P(DisplayStyleTest, ChoosesTheImages) {
    const StyleCase c = GetParam();
    K k = K::Choose(c.style, c.prev, c.next, c.fraction);
    EXPECT_EQ(k.show, c.show);
    EXPECT_EQ(k.fade, c.fade);
}

INSTANTIATE_TEST_SUITE_P(
    MidpointKeyframeDissolve, DisplayStyleTest,
    ::testing::Values(
        StyleCase{0, true, true, 0.25f, K::kPrev, 0},
        StyleCase{0, true, true, 0.5f, K::kPrev, 0},  // the exact half: prev
        StyleCase{0, true, true, 0.5001f, K::kNext, 0}, StyleCase{1, true, true, 0.9f, K::kPrev, 0},
        StyleCase{2, true, true, 0.3f, K::kDissolve, 0.3f},
        StyleCase{0, false, true, 0.7f, K::kNext, 0}, StyleCase{1, false, true, 0.7f, K::kNext, 0},
        StyleCase{2, false, true, 0.7f, K::kNext, 0}, StyleCase{0, true, false, 0.7f, K::kPrev, 0},
        StyleCase{2, true, false, 0.7f, K::kPrev, 0}, StyleCase{0, false, false, 0.0f, K::kNone, 0},
        StyleCase{2, false, false, 0.0f, K::kNone, 0}));

// Runs the event loop as the program's main loop does, work procedures included (a short
// timeout makes every round return), until `done` or `seconds` pass.
bool Pump(const std::function<bool()>& done, double seconds = 5.0) {
    auto limit = std::chrono::steady_clock::now() + std::chrono::duration<double>(seconds);
    XtAppContext context = KLXmGnome::AppContext();
    while (!done()) {
        if (std::chrono::steady_clock::now() > limit)
            return done();
        static bool armed = false;  // one wake-up timeout at a time
        if (!armed) {
            armed = true;
            XtAppAddTimeOut(
                context, 10, [](XtPointer, XtIntervalId*) { armed = false; }, nullptr);
        }
        XtAppProcessEvent(context, XtIMAll);
    }
    return true;
}

// The window with the demo loaded, once per program; sound goes to SDL's silent driver.
class PlaybackWindowTest : public ::testing::Test {
  protected:
    void SetUp() override {
        // The silent driver unless the run asks for another (CTest runs these under "disk" too).
        setenv("SDL_AUDIODRIVER", "dummy", 0);
        gnome = &windowtest::TheWindow();
        const std::string project = windowtest::DemoProject();
        if (theImp.keysetCount == 0) {
            ASSERT_EQ(theImp.LoadKeyset((project + "/misc_data/demo.kset").c_str()), 1);
            ASSERT_EQ(theImp.LoadTrack((project + "/misc_data/demo.track").c_str()), 1);
        }
        ASSERT_NE(gnome->syncChart, nullptr);
        ASSERT_NE(theImp.sound, nullptr);
        chart = gnome->syncChart;
        gnome->repeatMode = 0;
        gnome->playSpeed = 1.0f;
    }
    void TearDown() override {
        gnome->PlayStop();
        Pump([&] { return !gnome->playTimer; }, 5);
        gnome->repeatMode = 0;
        gnome->playSpeed = 1.0f;
    }
    static Widget W(const char* name) { return KLXmGnome::FindWidget(name); }
    // Chooses entry `index` of an option menu as a click on it would.
    static void ChooseOption(const char* menu, int index) {
        Widget sub = nullptr;
        XtVaGetValues(W(menu), XmNsubMenuId, &sub, nullptr);
        ASSERT_NE(sub, nullptr);
        WidgetList children = nullptr;
        Cardinal count = 0;
        XtVaGetValues(sub, XmNchildren, &children, XmNnumChildren, &count, nullptr);
        ASSERT_LT(Cardinal(index), count);
        XtCallCallbacks(children[index], XmNactivateCallback, nullptr);
    }
    static std::string LabelText(const char* name) {
        return guitest::XmText(W(name), XmNlabelString);
    }

    Gnome* gnome = nullptr;
    KLSyncChart* chart = nullptr;
};

TEST_F(PlaybackWindowTest, ASecondPressWhilePlayingIsIgnored) {
    chart->SetRegionRange(CueTime::FromSeconds(0.5), CueTime::FromSeconds(2.5));
    guitest::Click(W("playForward"));
    ASSERT_TRUE(Pump([&] { return gnome->playTimer != nullptr; }));
    const CueTime to = gnome->playTimer->To();
    ASSERT_TRUE(Pump([&] { return chart->GetIndicatorTime().Seconds() > 0.7; }));
    guitest::Click(W("fastForward"));
    guitest::Click(W("playReverse"));
    guitest::Settle();
    EXPECT_EQ(gnome->passSpeed, 1.0f);
    ASSERT_NE(gnome->playTimer, nullptr);
    EXPECT_EQ(gnome->playTimer->To(), to);
    EXPECT_FALSE(gnome->playTimer->Reverse());
}

// Stop during a loop: the pass ends where it is, and the information bar shows that time.
TEST_F(PlaybackWindowTest, StopDuringALoopEndsAtTheCurrentPositionWithItsTimecode) {
    const CueTime start = CueTime::FromSeconds(1.0), end = CueTime::FromSeconds(1.5);
    chart->SetRegionRange(start, end);
    CueTime s, e;
    chart->GetRegionRange(s, e);
    ChooseOption("repeatMenu", 1);
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
    EXPECT_EQ(LabelText("infoTimeValue"), at.Text());
}

TEST_F(PlaybackWindowTest, AnEmptyPassEndsAtOnceOrRestartsWhenLooping) {
    const CueTime t = CueTime::FromSeconds(2);
    XtAppAddWorkProc(KLXmGnome::AppContext(), Gnome::playback_workproc, gnome);
    gnome->begin_playback(t, t, 1.0f);
    ASSERT_TRUE(Pump([&] { return !gnome->playTimer; }, 2));
    EXPECT_NEAR(chart->GetIndicatorTime().Ticks(), t.Ticks(), 200) << "within the chart's column";

    gnome->repeatMode = 1;
    XtAppAddWorkProc(KLXmGnome::AppContext(), Gnome::playback_workproc, gnome);
    gnome->begin_playback(t, t, 1.0f);
    Pump([] { return false; }, 0.5);
    EXPECT_NE(gnome->playTimer, nullptr) << "restarted, again and again";
    EXPECT_NEAR(chart->GetIndicatorTime().Ticks(), t.Ticks(), 200);
    gnome->PlayStop();
    ASSERT_TRUE(Pump([&] { return !gnome->playTimer; }, 2));
}

// The speed menu stretches the timer; fast adds a quarter; reverse runs from the end back.
TEST_F(PlaybackWindowTest, SpeedFastAndReverseShapeThePass) {
    chart->SetRegionRange(CueTime::FromSeconds(1), CueTime::FromSeconds(3));
    CueTime s, e;
    chart->GetRegionRange(s, e);
    chart->SetIndicatorTime(e);
    ChooseOption("speedMenu", 3);
    EXPECT_EQ(gnome->playSpeed, 0.25f);
    guitest::Click(W("fastReverse"));
    ASSERT_TRUE(Pump([&] { return gnome->playTimer != nullptr; }));
    EXPECT_EQ(gnome->passSpeed, 0.5f);
    EXPECT_TRUE(gnome->playTimer->Reverse());
    EXPECT_EQ(gnome->playTimer->From(), e);
    EXPECT_EQ(gnome->playTimer->To(), PlaybackPass::StretchedEnd(e, s, 0.5f));
    ASSERT_TRUE(Pump([&] { return chart->GetIndicatorTime() < e - CueTime(2.0, 0); }))
        << "the indicator runs back from the region's end";
    EXPECT_GT(chart->GetIndicatorTime(), s);
}

// The key image view by style, on three keys of the active keyset with pictures of their own.
TEST_F(PlaybackWindowTest, GoToTimeShowsTheKeyImagesByDisplayStyle) {
    gnome->SetActiveKeyset(0);
    KLKeyTrack* track = theImp.GetKeyTrack(0);
    KLKeySet* set = theImp.GetKeySet(0);
    ASSERT_TRUE(track && set && gnome->keyImageView);
    const int savedMode = gnome->keyViewMode;
    gnome->keyViewMode = 2;  // key images
    // Keys at frames 0 and 10 (shapes 1 and 2), and nothing after 10 but the last.
    track->Clear();
    for (int i : {1, 2})
        set->GetKeyShape(i)->SetImage(new KLImageSGI(4, 3));
    track->InsertKey(1, CueTime::FromFrames(0), set->GetKeyShape(1), 1, 1.0f);
    track->InsertKey(2, CueTime::FromFrames(10), set->GetKeyShape(2), 1, 1.0f);
    KLImageSGI* a = set->GetKeyShape(1)->GetImage();
    KLImageSGI* b = set->GetKeyShape(2)->GetImage();
    KLImageView* view = gnome->keyImageView;
    struct Case {
        int style;
        double frame;
        KLImageSGI *first, *second;
        float fade;
    };
    for (Case c : {Case{0, 5, a, nullptr, 0}, Case{0, 6, b, nullptr, 0}, Case{1, 9, a, nullptr, 0},
                   Case{2, 2.5, a, b, 0.25f}, Case{2, 20, b, nullptr, 0}}) {
        gnome->displayStyle = c.style;
        gnome->GoToTime(CueTime::FromFrames(c.frame));
        EXPECT_EQ(view->ImageA(), c.first) << "style " << c.style << " frame " << c.frame;
        if (c.second) {
            EXPECT_EQ(view->ImageB(), c.second);
            EXPECT_NEAR(view->Fade(), c.fade, 1e-3);
        }
    }
    gnome->keyViewMode = savedMode;
    gnome->displayStyle = 0;
}

TEST_F(PlaybackWindowTest, PlayForwardSaveMakesOneFrameSlotPerRegionFrame) {
    chart->SetRegionRange(CueTime::FromFrames(30), CueTime::FromFrames(60));
    CueTime s, e;
    chart->GetRegionRange(s, e);
    guitest::Click(W("playForwardSave"));
    guitest::Settle();
    EXPECT_EQ(theImp.playblastCount, PlaybackPass::RegionFrames(s, e));
    EXPECT_NEAR(theImp.playblastCount, 30, 1);
    EXPECT_EQ(gnome->playTimer, nullptr) << "no sound, no timer";
    EXPECT_EQ(XtIsManaged(W("mixScn")), gnome->mixViewOn != 0);
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
    guitest::MoveTo(W("syncChart"), to, y);
    guitest::Release(1);
    guitest::Settle();
    const CueTime at = chart->GetIndicatorTime();
    EXPECT_EQ(g.indicatorX, to);
    EXPECT_EQ(LabelText("infoTimeValue"), at.Text());
}

}  // namespace
