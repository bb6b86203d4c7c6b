#include "model/KLKeyTrack.h"

#include <gtest/gtest.h>

#include <cmath>
#include <tuple>

#include "model/KLKeySet.h"
#include "model/ModelTestUtil.h"
#include "scene/KLChannel.h"
#include "scene/KLGraphNode.h"
#include "scene/KLKeyFrameList.h"

namespace {

class KLKeyTrackTest : public ModelTest {
  protected:
    KLKeyTrackTest() { ReadText(set, "key rest 0\nkey jaw 10\nkey \"wide open\" 20\nend\n"); }
    KLKeyEvent* Add(int32_t ticks, int shape = 1, int smoothing = 1, float value = 1.0f) {
        return track.InsertKey(shape, Ticks(ticks), set.GetKeyShape(shape), smoothing, value);
    }
    KLKeySet set{"mouth", nullptr};
    KLKeyTrack track{&set};
};

// Inserts (even refused) and removals mark the track modified. Previous: last key at or
// before t; nearest: the later on a tie; none if empty or in another mode. Bracket: around t.
TEST_F(KLKeyTrackTest, InsertRemoveAndSlowLookups) {
    KLKeyEvent *prev = nullptr, *next = nullptr;
    EXPECT_TRUE(track.key_from_time(Ticks(0)) == nullptr && track.Duration() == CueTime());
    EXPECT_TRUE(track.bracket_keys_from_time(Ticks(5), &prev, &next) == 0.0f && !prev && !next);
    KLKeyEvent* a = Add(100);
    EXPECT_EQ(Add(100, 2), nullptr) << "occupied instant";
    KLKeyEvent* b = Add(110);
    EXPECT_TRUE(track.RemoveKey(Ticks(101)) == 0 && imp.modified == 3);
    const std::tuple<int, int32_t, KLKeyEvent*> lookups[] = {
        {KLKeyTrack::kPrevious, 99, nullptr}, {KLKeyTrack::kPrevious, 100, a},
        {KLKeyTrack::kPrevious, 109, a},      {KLKeyTrack::kPrevious, 110, b},
        {KLKeyTrack::kPrevious, 1 << 30, b},  {KLKeyTrack::kNearest, 50, a},
        {KLKeyTrack::kNearest, 104, a},       {KLKeyTrack::kNearest, 105, b},
        {KLKeyTrack::kNearest, 5000, b},      {7, 105, nullptr}};
    for (const auto& [mode, t, expected] : lookups) {
        track.lookupMode = mode;
        EXPECT_EQ(track.key_from_time(Ticks(t)), expected) << mode << " " << t;
    }
    EXPECT_TRUE(track.RemoveKey(Ticks(100)) == 1 && track.RemoveKey(Ticks(110)) == 1);
    EXPECT_EQ(imp.modified, 5);
    b = Add(900);
    a = Add(300);
    EXPECT_EQ(track.Duration(), Ticks(900));
    const std::tuple<int32_t, float, KLKeyEvent*, KLKeyEvent*> brackets[] = {
        {0, 1.0f, nullptr, a}, {300, 0.0f, a, b}, {450, 0.25f, a, b}, {901, 0.0f, b, nullptr}};
    for (const auto& [t, fraction, p, n] : brackets) {
        EXPECT_EQ(track.bracket_keys_from_time(Ticks(t), &prev, &next), fraction) << t;
        EXPECT_TRUE(prev == p && next == n) << t;
    }
}

// Per whole frame, the table holds what the slow lookups give at the frame's start; times
// clamp to its range; at exactly one half its nearest key is the earlier one.
class FastTable : public KLKeyTrackTest, public ::testing::WithParamInterface<int> {};
TEST_P(FastTable, MatchesSlowLookupsAndRangeRules) {
    CueTime::default_fps = GetParam();
    const int32_t frame = 6000 / GetParam();
    track.lookupMode = KLKeyTrack::kNearest;
    for (int32_t t : {-700, 130, 200, 455, 1000, 1010, 1500, 2500, 4321})
        Add(t, t < 0 ? 0 : t % 3);
    std::vector<KLKeyTrack::FastEntry> slow(6000 / frame);
    for (size_t i = 0; i < slow.size(); ++i) {
        KLKeyTrack::FastEntry& e = slow[i];
        e.fraction = track.bracket_keys_from_time(Ticks(-1000 + frame * int(i)), &e.prev, &e.next);
    }
    track.PrepareFastAccess(Ticks(-1000), Ticks(5000));
    ASSERT_EQ(track.fastCount, int(slow.size()));
    for (int i = 0; i < track.fastCount; ++i) {
        const CueTime t = Ticks(-1000 + frame * i);
        const KLKeyTrack::FastEntry &e = track.fastTable[size_t(i)], &s = slow[size_t(i)];
        EXPECT_TRUE(e.prev == s.prev && e.prev2 == s.prev && e.next == s.next) << i;
        EXPECT_EQ(e.fraction, s.fraction) << i;
        EXPECT_EQ(e.nearest, s.fraction > 0.5f ? s.next : s.prev) << i;
        EXPECT_EQ(track.key_from_time_fast(t + Ticks(frame - 1)), e.nearest) << i;
        KLKeyEvent *prev, *next;
        EXPECT_EQ(track.bracket_keys_from_time(t + Ticks(frame / 2), &prev, &next), e.fraction);
        EXPECT_TRUE(prev == e.prev && next == e.next) << i;
    }
    const KLKeyTrack::FastEntry half = track.fastTable[size_t(3000 / frame)];  // tick 2000
    EXPECT_EQ(half.fraction, 0.5f);
    EXPECT_EQ(track.fastTable[size_t(3000 / frame - 1)].fraction, GetParam() == 24 ? 0.25f : 0.3f);
    EXPECT_TRUE(track.key_from_time_fast(Ticks(2000)) == half.prev &&
                track.key_from_time(Ticks(2000)) == half.next);
    EXPECT_EQ(track.key_from_time_fast(Ticks(-50000)), track.fastTable.front().nearest);
    EXPECT_EQ(track.key_from_time_fast(Ticks(50000)), track.fastTable.back().nearest);
    track.PrepareFastAccess(Ticks(5), Ticks(5));  // an empty range keeps the table
    track.PrepareFastAccess(Ticks(5), Ticks(0));
    EXPECT_EQ(track.fastCount, int(slow.size()));
    track.RemoveKey(Ticks(130));  // drops the table: the slow lookups answer
    EXPECT_TRUE(track.fastTable.empty() && track.fastCount == 0);
    EXPECT_EQ(track.key_from_time_fast(Ticks(2000)), half.next);
    track.PrepareFastAccess(Ticks(0), Ticks(2 * frame - 1));  // under two frames: one entry
    EXPECT_EQ(track.fastCount, 1);
}
INSTANTIATE_TEST_SUITE_P(Fps, FastTable, ::testing::Values(24, 30));

// Smoothing names exact, defaults Ease and 1, other statements skipped, the first event at a
// time kept, unknown key shapes told; off-grid times round-trip; the workspace rate applies.
TEST_F(KLKeyTrackTest, ReadWriteGoldenAndRoundTrip) {
    ReadText(track,
             "    event 12 jaw Ease 1\nevent 3.5 jaw\nevent 20 \"wide open\" Linear\n"
             "event 30 rest smooth 0.25\nevent 31 rest LiNeAr\nevent 32 rest LINEAR 2\n"
             "event 40 jaw Smooth 2 extra\nevent 41\nevent 3.5 rest Linear 0\nkey 50 jaw\n"
             "event 1 nose\nevent 3 \"wide\" Ease 1\nevent 4 x a b c d\nend\nevent 60 jaw\n",
             &set);
    EXPECT_EQ(imp.informs,
              (std::vector<std::string>{"Failed to find keyshape [nose] in keyset [mouth].|Dismiss",
                                        "Failed to find keyshape [wide] in keyset [mouth].|Dismiss",
                                        "Failed to find keyshape [x] in keyset [mouth].|Dismiss"}));
    EXPECT_EQ(Written(track),
              "    event 3.5 jaw Ease 1\n    event 12 jaw Ease 1\n"
              "    event 20 \"wide open\" Linear 1\n    event 30 rest Smooth 0.25\n"
              "    event 31 rest Ease 1\n    event 32 rest Linear 2\n");
    EXPECT_EQ(track.events.Head()->time.Ticks(), 700);
    Add(7, 2, 1, -0.5f);
    Add(-201, 2, 2, 100.0f);
    Add(1234567, 1, 2, 1.75f);
    KLKeyTrack again(&set);
    ReadText(again, Written(track), &set);
    EXPECT_EQ(again.events.Count(), 9);
    EXPECT_EQ(Written(again), Written(track));
    // Times and values whose six-digit form is another tick or float read back exactly.
    track.Clear();
    ReadText(track,
             "event 0.1234567 rest Ease 0.1234567\nevent 3 jaw Linear 1e-7\n"
             "event 123456.7 jaw Smooth 123456.7\nevent 98765.43 rest Ease -0.0\n",
             &set);
    EXPECT_EQ(track.events.Tail()->time, CueTime(123456.7, 0));
    const auto events = [](const KLKeyTrack& t) {
        std::vector<std::tuple<int32_t, float, bool>> out;
        for (const KLKeyEvent* e : t.events)
            out.emplace_back(e->time.Ticks(), e->value, std::signbit(e->value));
        return out;
    };
    KLKeyTrack exact(&set);
    ReadText(exact, Written(track), &set);
    EXPECT_EQ(events(exact), events(track)) << Written(track);
    EXPECT_EQ(std::get<1>(events(track)[1]), 1e-7f);
    CueTime::default_fps = 24;
    track.Clear();
    ReadText(track, "event 3.5 jaw\n", &set);
    EXPECT_EQ(track.events.Head()->time.Ticks(), 875);
    EXPECT_EQ(Written(track), "    event 3.5 jaw Ease 1\n");
}

// Kind 1 previews through a key-shape channel and a value channel (their values are checked
// through the preview), registered with the key frame list only while the workspace prepares
// key frames.
TEST_F(KLKeyTrackTest, PreviewKindOne) {
    KLKeyFrameList list({0, 10, 20}, 0);
    Add(400, 1, 1, 0.5f);
    Add(1200, 2, 0, 1.5f);
    track.SetStatic();  // no channels yet: nothing to do
    imp.prepare = 0;
    track.PrepareKeyFrames(&list);
    imp.prepare = 1;
    track.PrepareKeyFrames(nullptr);  // no list
    EXPECT_EQ(track.shapeChannel, nullptr);
    set.keyFrameList = &list;
    track.PrepareKeyFrames(nullptr);
    KLChannel *shape = track.shapeChannel, *weight = track.weightChannel;
    ASSERT_TRUE(shape && weight);
    EXPECT_EQ(list.KeyChannels(),
              (std::vector<std::pair<KLChannel*, KLChannel*>>{{shape, weight}}));
    EXPECT_EQ(weight->KeyCount(), 2);
    track.RemoveKey(Ticks(400));
    track.PrepareKeyFrames(nullptr);
    EXPECT_TRUE(track.shapeChannel == shape && list.KeyChannels().size() == 1 &&
                weight->KeyCount() == 1)
        << "the same channels, refilled";
    track.Clear();
    EXPECT_TRUE(!track.shapeChannel && !track.weightChannel && list.KeyChannels().empty());
}

// Kind 2 previews through its control node's channel, borrowed (Clear leaves it to the node).
TEST_F(KLKeyTrackTest, PreviewKindTwo) {
    KLKeySet brow("brow", "browNode", 5, -0.5f, 2.0f);
    KLKeyTrack t(&brow);
    t.InsertKey(0, Ticks(600), nullptr, 1, 0.75f);
    t.PrepareKeyFrames(nullptr);  // no value channel yet: nothing to do
    testkit::StdErr([&] { t.SetControlGraphNode(nullptr); });
    KLGraphNode node("browNode");
    t.SetControlGraphNode(&node);
    KLChannel* channel = node.Transform()->Channel(5);
    ASSERT_TRUE(channel && t.weightChannel == channel);
    t.PrepareKeyFrames(nullptr);
    EXPECT_TRUE(channel->Evaluate(Ticks(600)) == 0.75f && channel->KeyCount() == 1);
    t.Clear();
    EXPECT_TRUE(t.weightChannel == nullptr && node.Transform()->Channel(5) == channel);
}

}  // namespace
