#include <gtest/gtest.h>

#include <climits>
#include <cmath>
#include <sstream>
#include <tuple>

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
    using Case = std::tuple<int, double, int32_t>;  // fps, frames, ticks
    for (auto [fps, frames, ticks] :
         {Case{24, 3.5, 875}, Case{25, 12.5, 3000}, Case{30, 1, 200}, Case{60, -2.25, -225},
          Case{30, -0.5, -100}, Case{24, 0.004, 1}, Case{30, 1e-9, 0}}) {
        CueTime::default_fps = fps;
        const CueTime t(frames, 0);
        EXPECT_EQ(t.Ticks(), ticks) << frames << " frames at " << fps;
        EXPECT_DOUBLE_EQ(t.Frames(), ticks * fps / 6000.0);
        EXPECT_EQ(t.Frame(), int(frames)) << "whole frames truncate toward zero";
        EXPECT_EQ(CueTime(frames, fps).Ticks(), ticks) << "explicit rate";
    }
}

// Arithmetic and conversions saturate instead of wrapping.
TEST_F(CueTimeTest, TimecodeAndSaturation) {
    EXPECT_EQ(CueTime(1, 2, 3, 4, 0).Ticks(), (3600 + 120 + 3) * 6000 + 4 * 200);
    EXPECT_EQ((CueTime::FromTicks(INT32_MAX - 5) + CueTime::FromTicks(100)).Ticks(), INT32_MAX);
    EXPECT_EQ((CueTime::FromTicks(INT32_MIN) - CueTime::FromTicks(1)).Ticks(), INT32_MIN);
    EXPECT_EQ((-CueTime::FromTicks(INT32_MIN)).Ticks(), INT32_MAX);
    EXPECT_EQ(CueTime(1e300, 0).Ticks(), INT32_MAX);
    EXPECT_EQ(CueTime(-1e300, 0).Ticks(), INT32_MIN);
    EXPECT_EQ(CueTime(std::nan(""), 0).Ticks(), 0);
}

// Every tick value must survive the text and binary stream forms at every rate, including
// fractional frames, negative times and the extremes; text that is not a time changes nothing.
TEST_F(CueTimeTest, TextAndBinaryFormsReadBackExactly) {
    for (int fps : {24, 25, 30, 60, 1, 7}) {
        CueTime::default_fps = fps;
        for (int32_t v : {0, 1, -1, 7, 199, 201, -875, 5999, 6001, 123457, -98765432, INT32_MAX,
                          INT32_MIN, INT32_MAX - 1, 1000000007}) {
            for (int binary : {0, 1}) {
                CueTime::binaryIO = binary;
                std::stringstream io;
                io << CueTime::FromTicks(v);
                CueTime back;
                ASSERT_TRUE(back.Read(io)) << io.str();
                EXPECT_EQ(back.Ticks(), v) << io.str() << " at " << fps << " fps";
            }
        }
    }
    CueTime::binaryIO = 1;
    std::stringstream bin, cut(std::string("\x01\x02", 2));
    bin << CueTime::FromTicks(0x01020304);
    EXPECT_EQ(bin.str(), std::string("\x01\x02\x03\x04", 4));  // big-endian
    EXPECT_FALSE(CueTime().Read(cut));
    CueTime::binaryIO = 0;
    CueTime::default_fps = 30;
    EXPECT_EQ(CueTime::FromTicks(1).Text(), "0.005");  // the fewest digits that read back
    CueTime t;
    ASSERT_TRUE(t.SetText("-0:0:1:15"));
    EXPECT_EQ(t.Ticks(), -(6000 + 15 * 200));
    for (const char* bad : {"", "abc", "12abc", "1:2", "nan", "inf", "1:2:3:-4", "  "}) {
        EXPECT_FALSE(t.SetText(bad)) << bad;
        EXPECT_EQ(t.Ticks(), -9000) << "left unchanged by " << bad;
    }
}

}  // namespace
