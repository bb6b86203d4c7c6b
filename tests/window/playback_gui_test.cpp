#include <gtest/gtest.h>

#include <tuple>

#include "window/PlaybackPass.h"

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

}  // namespace
