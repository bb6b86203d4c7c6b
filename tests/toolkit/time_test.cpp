#include <gtest/gtest.h>

#include <climits>
#include <cmath>
#include <sstream>

#include "toolkit/CueTime.h"

namespace {

// Runs every test at a known frame rate and puts the old one back.
class CueTimeTest : public ::testing::Test {
  protected:
    void SetUp() override { saved_ = CueTime::default_fps, CueTime::default_fps = 30; }
    void TearDown() override { CueTime::default_fps = saved_, CueTime::binaryIO = 0; }
    int saved_ = 30;
};

TEST_F(CueTimeTest, FramesAndTicksAtTheCommonRates) {
    struct Case {
        int fps;
        double frames;
        int32_t ticks;
    };
    const Case cases[] = {{24, 1, 250},     {24, 3.5, 875}, {25, 1, 240}, {25, 12.5, 3000},
                          {30, 1, 200},     {30, 3.5, 700}, {60, 1, 100}, {60, -2.25, -225},
                          {30, -0.5, -100}, {24, 0.004, 1}, {30, 1e-9, 0}};
    for (const Case& c : cases) {
        CueTime::default_fps = c.fps;
        const CueTime t(c.frames, 0);
        EXPECT_EQ(t.Ticks(), c.ticks) << c.frames << " frames at " << c.fps;
        EXPECT_DOUBLE_EQ(t.Frames(), c.ticks * c.fps / 6000.0);
        EXPECT_EQ(CueTime(c.frames, c.fps).Ticks(), c.ticks) << "explicit rate";
    }
}

TEST_F(CueTimeTest, WholeFramesTruncateTowardZero) {
    EXPECT_EQ(CueTime::FromTicks(399).Frame(), 1);
    EXPECT_EQ(CueTime::FromTicks(-399).Frame(), -1);
    EXPECT_EQ(CueTime::FromTicks(-199).Frame(), 0);
    EXPECT_EQ(CueTime::FromTicks(875).Frame(24), 3);
}

TEST_F(CueTimeTest, TimecodeParts) {
    const CueTime t(1, 2, 3, 4, 0);
    EXPECT_EQ(t.Ticks(), (3600 + 120 + 3) * 6000 + 4 * 200);
    int h, m, s, f;
    bool neg;
    (-t).Timecode(&h, &m, &s, &f, &neg);
    EXPECT_EQ(h, 1);
    EXPECT_EQ(m, 2);
    EXPECT_EQ(s, 3);
    EXPECT_EQ(f, 4);
    EXPECT_TRUE(neg);
    EXPECT_EQ(CueTime(0, 0, 0, 1, 25).Ticks(), 240) << "one frame at an explicit rate";
    EXPECT_EQ(CueTime(0, 0, 5, 0, 0), CueTime::FromSeconds(5.0));
}

TEST_F(CueTimeTest, ArithmeticSaturatesInsteadOfWrapping) {
    const CueTime big = CueTime::FromTicks(INT32_MAX - 5);
    EXPECT_EQ((big + CueTime::FromTicks(100)).Ticks(), INT32_MAX);
    EXPECT_EQ((CueTime::FromTicks(INT32_MIN) - CueTime::FromTicks(1)).Ticks(), INT32_MIN);
    EXPECT_EQ((-CueTime::FromTicks(INT32_MIN)).Ticks(), INT32_MAX);
    EXPECT_EQ(CueTime(1e300, 0).Ticks(), INT32_MAX);
    EXPECT_EQ(CueTime(-1e300, 0).Ticks(), INT32_MIN);
    EXPECT_EQ(CueTime(std::nan(""), 0).Ticks(), 0);
    EXPECT_LT(CueTime::FromTicks(-1), CueTime());
}

// Every tick value must survive text and binary forms at every rate, including fractional
// frames, negative times and the extremes.
class CueTimeRoundTrip : public CueTimeTest, public ::testing::WithParamInterface<int> {};

TEST_P(CueTimeRoundTrip, TextAndBinaryFormsReadBackExactly) {
    CueTime::default_fps = GetParam();
    const int32_t ticks[] = {
        0,    1,    -1,     7,         199,       200,       201,           875,       -875,
        5999, 6001, 123457, -98765432, INT32_MAX, INT32_MIN, INT32_MAX - 1, 1000000007};
    for (int32_t v : ticks) {
        const CueTime t = CueTime::FromTicks(v);
        CueTime back;
        ASSERT_TRUE(back.SetText(t.Text())) << t.Text();
        EXPECT_EQ(back.Ticks(), v) << "text " << t.Text() << " at " << GetParam() << " fps";

        std::stringstream bin;
        t.WriteBinary(bin);
        EXPECT_EQ(bin.str().size(), 4u);
        CueTime fromBin;
        ASSERT_TRUE(fromBin.ReadBinary(bin));
        EXPECT_EQ(fromBin.Ticks(), v);
    }
}

INSTANTIATE_TEST_SUITE_P(Rates, CueTimeRoundTrip, ::testing::Values(24, 25, 30, 60, 1, 7));

TEST_F(CueTimeTest, TextIsShortForWholeAndHalfFrames) {
    EXPECT_EQ(CueTime(12, 0).Text(), "12");
    EXPECT_EQ(CueTime(-3.5, 0).Text(), "-3.5");
    EXPECT_EQ(CueTime().Text(), "0");
    EXPECT_EQ(CueTime::FromTicks(1).Text(), "0.005");
}

TEST_F(CueTimeTest, ReadTakesTimecodeAndRejectsNonsense) {
    CueTime t;
    ASSERT_TRUE(t.SetText("0:0:1:15"));
    EXPECT_EQ(t.Ticks(), 6000 + 15 * 200);
    ASSERT_TRUE(t.SetText("-0:0:1:0"));
    EXPECT_EQ(t.Ticks(), -6000);
    t = CueTime::FromTicks(42);
    for (const char* bad : {"", "abc", "12abc", "1:2", "nan", "inf", "1:2:3:-4", "  "}) {
        EXPECT_FALSE(t.SetText(bad)) << bad;
        EXPECT_EQ(t.Ticks(), 42) << "left unchanged by " << bad;
    }
}

TEST_F(CueTimeTest, StreamFormsFollowBinaryIO) {
    std::stringstream text;
    CueTime(2.5, 0).Write(text);
    EXPECT_EQ(text.str(), "2.5");
    CueTime back;
    ASSERT_TRUE(back.Read(text));
    EXPECT_EQ(back, CueTime(2.5, 0));

    CueTime::binaryIO = 1;
    std::stringstream bin;
    bin << CueTime::FromTicks(0x01020304);
    EXPECT_EQ(bin.str(), std::string("\x01\x02\x03\x04", 4));
    ASSERT_TRUE(back.Read(bin));
    EXPECT_EQ(back.Ticks(), 0x01020304);
    std::stringstream shortInput(std::string("\x01\x02", 2));
    EXPECT_FALSE(back.Read(shortInput));
}

}  // namespace
