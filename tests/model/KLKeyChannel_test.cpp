#include "model/KLKeyChannel.h"

#include <gtest/gtest.h>

#include <cmath>

#include "model/ModelTestUtil.h"

namespace {

TEST(KLKeyChannel, StartsEmptyAndCountsEverySet) {
    KLKeyChannel c("jaw", KLKeyChannel::kRX, 3);
    EXPECT_STREQ(c.Name(), "jaw");
    EXPECT_EQ(c.channel, KLKeyChannel::kRX);
    EXPECT_EQ(c.count, 0);
    EXPECT_EQ(c.size, 3);
    c.Set(1, 2.5f);
    c.Set(1, 3.5f);
    EXPECT_EQ(c.count, 2);
    EXPECT_EQ(c.Get(1), 3.5f);
}

TEST(KLKeyChannel, SetOutOfRangeIsIgnoredSilently) {
    KLKeyChannel c("jaw", 0, 2);
    CerrCapture err;
    c.Set(-1, 1.0f);
    c.Set(2, 1.0f);
    EXPECT_EQ(c.count, 0);
    EXPECT_EQ(err.Text(), "");
}

TEST(KLKeyChannel, GetOutOfRangeGivesSentinelAndMessage) {
    KLKeyChannel c("jaw", 0, 2);
    c.Set(0, 1.0f);
    c.Set(1, 2.0f);
    CerrCapture err;
    EXPECT_EQ(c.Get(2), -10000.0f);
    EXPECT_EQ(c.Get(-1), -10000.0f);
    EXPECT_EQ(err.Text(), "KLKeyChannel::Get() out of range\nKLKeyChannel::Get() out of range\n");
}

TEST(KLKeyChannel, ConstructorMessages) {
    CerrCapture err;
    KLKeyChannel zero("a", 0, 0);
    KLKeyChannel unnamed(nullptr, 0, 1);
    KLKeyChannel negative("b", 0, -5);
    EXPECT_EQ(err.Text(),
              "KLKeyChannel::KLKeyChannel() a_size is 0\n"
              "KLKeyChannel::KLKeyChannel() no name\n"
              "KLKeyChannel::KLKeyChannel() couldn't allocate values\n");
    EXPECT_EQ(unnamed.Name(), nullptr);
    EXPECT_EQ(negative.Constant(), 1);
}

TEST(KLKeyChannel, ChannelNames) {
    const char* names[] = {"TX", "TY", "TZ", "RX", "RY", "RZ", "SX", "SY", "SZ"};
    for (int i = 0; i < 9; ++i)
        EXPECT_STREQ(KLKeyChannel("n", i, 1).GetChannelName(), names[i]);
    CerrCapture err;
    EXPECT_STREQ(KLKeyChannel("n", 9, 1).GetChannelName(), "TX");
    EXPECT_STREQ(KLKeyChannel("n", -1, 1).GetChannelName(), "TX");
    EXPECT_EQ(err.Text(),
              "KLKeyChannel::GetChannelName() unknown channel\n"
              "KLKeyChannel::GetChannelName() unknown channel\n");
}

TEST(KLKeyChannel, ConstantRules) {
    KLKeyChannel empty("a", 0, 3);
    EXPECT_EQ(empty.Constant(), 1) << "nothing set";

    KLKeyChannel partial("a", 0, 3);
    partial.Set(0, 1.0f);
    partial.Set(2, 5.0f);
    EXPECT_EQ(partial.Constant(), 1) << "not every slot set counts as constant";

    KLKeyChannel same("a", 0, 3);
    for (int i = 0; i < 3; ++i)
        same.Set(i, 0.25f);
    EXPECT_EQ(same.Constant(), 1);

    KLKeyChannel differs("a", 0, 3);
    differs.Set(0, 1.0f);
    differs.Set(1, 1.0f);
    differs.Set(2, std::nextafter(1.0f, 2.0f));
    EXPECT_EQ(differs.Constant(), 0) << "comparison is exact";

    // One slot set twice makes the count match the size although slot 1 was never set: the
    // never-set slot (0) then differs from the others.
    KLKeyChannel twice("a", 0, 2);
    twice.Set(0, 3.0f);
    twice.Set(0, 4.0f);
    EXPECT_EQ(twice.Constant(), 0);

    KLKeyChannel overfilled("a", 0, 2);
    overfilled.Set(0, 1.0f);
    overfilled.Set(1, 2.0f);
    overfilled.Set(1, 2.0f);
    EXPECT_EQ(overfilled.Constant(), 1) << "three sets on two slots";
}

TEST(KLKeyChannel, DumpPrintsSetCountLines) {
    KLKeyChannel c("a", 0, 3);
    c.Set(0, 1.5f);
    c.Set(1, -2.0f);
    CerrCapture err;
    c.Dump();
    EXPECT_EQ(err.Text(), "    Idx 0 value 1.5\n    Idx 1 value -2\n");
}

}  // namespace
