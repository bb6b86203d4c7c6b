#include "model/KLKeyTrack.h"

#include <gtest/gtest.h>

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
    // What bracket_keys_from_time gives without the table.
    float SlowBracket(CueTime t, KLKeyEvent** prev, KLKeyEvent** next) {
        std::vector<KLKeyTrack::FastEntry> saved;
        saved.swap(track.fastTable);
        const float f = track.bracket_keys_from_time(t, prev, next);
        saved.swap(track.fastTable);
        return f;
    }

    KLKeySet set{"mouth", nullptr};
    KLKeyTrack track{&set};
};

// Inserting (even refused at an occupied instant) and removing mark the track modified.
TEST_F(KLKeyTrackTest, InsertRemoveDurationClear) {
    EXPECT_EQ(track.Duration(), CueTime());
    KLKeyEvent* a = Add(100, 1, 2, 0.5f);
    ASSERT_NE(a, nullptr);
    EXPECT_EQ(Add(100, 2), nullptr) << "occupied instant";
    EXPECT_EQ(a->shapeIndex, 1);
    EXPECT_EQ(imp.modified, 2);
    EXPECT_EQ(track.RemoveKey(Ticks(101)), 0);
    EXPECT_EQ(imp.modified, 2);
    EXPECT_EQ(track.RemoveKey(Ticks(100)), 1);
    EXPECT_EQ(imp.modified, 3);
    Add(300);
    Add(-50);
    EXPECT_EQ(track.Duration(), Ticks(300));
    track.Clear();
    EXPECT_TRUE(track.events.Empty());
    EXPECT_EQ(track.Duration(), CueTime());
}

// Previous: the last key at or before t. Nearest: the tie goes to the later key. Both on an
// empty track and with an unknown mode: none. Bracket: the keys around t and t's position
// between them in frames.
TEST_F(KLKeyTrackTest, SlowLookups) {
    EXPECT_EQ(track.key_from_time(Ticks(0)), nullptr);
    KLKeyEvent *prev = nullptr, *next = nullptr;
    EXPECT_EQ(track.bracket_keys_from_time(Ticks(5), &prev, &next), 0.0f);
    EXPECT_TRUE(!prev && !next);
    KLKeyEvent* a = Add(100);
    KLKeyEvent* b = Add(110);
    const std::pair<int32_t, KLKeyEvent*> previous[] = {
        {99, nullptr}, {100, a}, {109, a}, {110, b}, {1 << 30, b}};
    for (const auto& [t, expected] : previous)
        EXPECT_EQ(track.key_from_time(Ticks(t)), expected) << t;
    track.lookupMode = KLKeyTrack::kNearest;
    const std::pair<int32_t, KLKeyEvent*> nearest[] = {
        {50, a}, {104, a}, {105, b}, {106, b}, {5000, b}};
    for (const auto& [t, expected] : nearest)
        EXPECT_EQ(track.key_from_time(Ticks(t)), expected) << t;
    track.lookupMode = 7;
    EXPECT_EQ(track.key_from_time(Ticks(105)), nullptr);
    track.Clear();
    a = Add(300);
    b = Add(900);
    const std::tuple<int32_t, float, KLKeyEvent*, KLKeyEvent*> brackets[] = {
        {0, 1.0f, nullptr, a}, {300, 0.0f, a, b}, {450, 0.25f, a, b}, {901, 0.0f, b, nullptr}};
    for (const auto& [t, fraction, p, n] : brackets) {
        EXPECT_EQ(track.bracket_keys_from_time(Ticks(t), &prev, &next), fraction) << t;
        EXPECT_TRUE(prev == p && next == n) << t;
    }
}

// The table holds, per whole frame, what the slow lookups give at that frame's start; times
// are clamped to its range. At exactly one half the table's nearest key is the earlier one,
// the slow lookup's the later one.
class FastTable : public KLKeyTrackTest, public ::testing::WithParamInterface<int> {};
TEST_P(FastTable, MatchesSlowLookups) {
    CueTime::default_fps = GetParam();
    const int32_t frame = 6000 / GetParam();
    track.lookupMode = KLKeyTrack::kNearest;
    for (int32_t t : {-700, 130, 200, 455, 1000, 1010, 1500, 2500, 4321})
        Add(t, t < 0 ? 0 : t % 3);
    track.PrepareFastAccess(Ticks(-1000), Ticks(5000));
    ASSERT_EQ(track.fastCount, 6000 / frame);
    for (int i = 0; i < track.fastCount; ++i) {
        const CueTime t = Ticks(-1000 + frame * i);
        const KLKeyTrack::FastEntry& e = track.fastTable[size_t(i)];
        KLKeyEvent *prev, *next;
        const float fraction = SlowBracket(t, &prev, &next);
        EXPECT_TRUE(e.prev == prev && e.prev2 == prev && e.next == next) << i;
        EXPECT_EQ(e.fraction, fraction) << i;
        EXPECT_EQ(e.nearest, fraction > 0.5f ? next : prev) << i;
        EXPECT_EQ(track.key_from_time_fast(t + Ticks(frame - 1)), e.nearest) << i;
        EXPECT_EQ(track.bracket_keys_from_time(t + Ticks(frame / 2), &prev, &next), e.fraction);
        EXPECT_TRUE(prev == e.prev && next == e.next) << i;
    }
    const KLKeyTrack::FastEntry& half = track.fastTable[size_t(3000 / frame)];  // tick 2000
    EXPECT_EQ(half.fraction, 0.5f);
    EXPECT_EQ(track.fastTable[size_t(3000 / frame - 1)].fraction, GetParam() == 24 ? 0.25f : 0.3f);
    EXPECT_EQ(track.key_from_time_fast(Ticks(2000)), half.prev);
    EXPECT_EQ(track.key_from_time(Ticks(2000)), half.next);
    EXPECT_EQ(track.key_from_time_fast(Ticks(-50000)), track.fastTable.front().nearest);
    EXPECT_EQ(track.key_from_time_fast(Ticks(50000)), track.fastTable.back().nearest);
    track.lookupMode = KLKeyTrack::kPrevious;
    EXPECT_EQ(track.key_from_time_fast(Ticks(50000)), track.fastTable.back().prev);
    track.FinishFastAccess();
    EXPECT_TRUE(track.fastTable.empty() && track.fastCount == 0);
}
INSTANTIATE_TEST_SUITE_P(Fps, FastTable, ::testing::Values(24, 30),
                         [](const auto& p) { return "fps" + std::to_string(p.param); });

TEST_F(KLKeyTrackTest, FastTableRangeRules) {
    KLKeyEvent* a = Add(100);
    track.PrepareFastAccess(Ticks(600), Ticks(600));
    track.PrepareFastAccess(Ticks(600), Ticks(0));
    EXPECT_TRUE(track.fastTable.empty()) << "an empty range builds nothing";
    EXPECT_EQ(track.key_from_time_fast(Ticks(150)), a) << "without a table: slow lookup";
    track.PrepareFastAccess(Ticks(0), Ticks(399));  // 1.995 frames: one entry
    EXPECT_EQ(track.fastCount, 1);
    track.PrepareFastAccess(Ticks(0), Ticks(60000));
    track.PrepareFastAccess(Ticks(5), Ticks(5));
    EXPECT_EQ(track.fastCount, 300) << "an empty range keeps the old table";
    track.RemoveKey(Ticks(100));
    EXPECT_TRUE(track.fastTable.empty()) << "removing a key drops the table";
    track.PrepareFastAccess(Ticks(0), Ticks(6000));
    EXPECT_EQ(track.key_from_time_fast(Ticks(300)), nullptr);
}

// Events at fractional frames, smoothing names (exact spellings only), defaults Ease and 1;
// other statements skipped; the first event at a time kept.
TEST_F(KLKeyTrackTest, ReadWriteGolden) {
    ReadText(track,
             "    event 12 jaw Ease 1\nevent 3.5 jaw\nevent 20 \"wide open\" Linear\n"
             "event 30 rest smooth 0.25\nevent 31 rest LiNeAr\nevent 32 rest LINEAR 2\n"
             "event 40 jaw Smooth 2 extra\nevent 41\nevent 3.5 rest Linear 0\nkey 50 jaw\n"
             "end\nevent 60 jaw\n",
             &set);
    EXPECT_TRUE(imp.informs.empty());
    const std::string golden =
        "    event 3.5 jaw Ease 1\n    event 12 jaw Ease 1\n"
        "    event 20 \"wide open\" Linear 1\n    event 30 rest Smooth 0.25\n"
        "    event 31 rest Ease 1\n    event 32 rest Linear 2\n";
    EXPECT_EQ(Written(track), golden);
    EXPECT_EQ(track.events.Head()->time.Ticks(), 700);
    EXPECT_EQ(track.events.Head()->key, set.GetKeyShape(1));

    CueTime::default_fps = 24;
    KLKeyTrack at24(&set);
    ReadText(at24, "event 3.5 jaw\n", &set);
    EXPECT_EQ(at24.events.Head()->time.Ticks(), 875);
    EXPECT_EQ(Written(at24), "    event 3.5 jaw Ease 1\n");
}

TEST_F(KLKeyTrackTest, RoundTripKeepsEveryField) {
    Add(0, 0, 0, 0.0f);
    Add(7, 2, 1, -0.5f);
    Add(1234567, 1, 2, 1.75f);
    Add(-200, 2, 2, 100.0f);
    KLKeyTrack again(&set);
    ReadText(again, Written(track), &set);
    ASSERT_EQ(again.events.Count(), track.events.Count());
    auto it = again.events.begin();
    for (const KLKeyEvent* e : track.events) {
        EXPECT_TRUE((*it)->time == e->time && (*it)->key == e->key);
        EXPECT_TRUE((*it)->smoothing == e->smoothing && (*it)->value == e->value);
        ++it;
    }
}

// A key shape missing from the keyset is reported and its line skipped; times beyond the
// tick range are clamped.
TEST_F(KLKeyTrackTest, UnknownKeyShapeAndClampedTimes) {
    ReadText(track,
             "event 1 nose\nevent 2 jaw\nevent 3 \"wide\" Ease 1\nevent 4 x a b c d\n"
             "event 1e38 jaw\nevent -1e38 jaw\n",
             &set);
    ASSERT_EQ(imp.informs.size(), 3u);
    EXPECT_EQ(imp.informs[0].message, "Failed to find keyshape [nose] in keyset [mouth].");
    EXPECT_EQ(imp.informs[0].first, "Dismiss");
    EXPECT_EQ(imp.informs[1].message, "Failed to find keyshape [wide] in keyset [mouth].");
    EXPECT_EQ(imp.informs[2].message, "Failed to find keyshape [x] in keyset [mouth].");
    ASSERT_EQ(track.events.Count(), 3);
    EXPECT_EQ(track.events.Head()->time.Ticks(), INT32_MIN);
    EXPECT_EQ(track.events.Tail()->time.Ticks(), INT32_MAX);
}

// Kind 1 previews through a key-shape channel (shape values) and a value channel, registered
// with the keyset's key frame list while the workspace prepares key frames; static mode shows
// the rest pose.
TEST_F(KLKeyTrackTest, PreviewKindOne) {
    KLKeyFrameList list({0, 10, 20}, 0);
    for (int i = 0; i < 3; ++i)
        set.keyShapes[size_t(i)]->shapeValue = 7 + i;
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
    ASSERT_TRUE(track.shapeChannel && track.weightChannel);
    ASSERT_EQ(list.KeyChannels().size(), 1u);
    EXPECT_EQ(list.KeyChannels()[0], std::make_pair(track.shapeChannel, track.weightChannel));
    KLChannel *shape = track.shapeChannel, *weight = track.weightChannel;
    EXPECT_FLOAT_EQ(shape->Evaluate(Ticks(400)), 8.0f);
    EXPECT_FLOAT_EQ(shape->Evaluate(Ticks(1200)), 9.0f);
    EXPECT_FLOAT_EQ(weight->Evaluate(Ticks(400)), 0.5f);
    EXPECT_FLOAT_EQ(weight->Evaluate(Ticks(1200)), 1.5f);
    set.defaultIndex = 2;
    track.SetStatic();
    EXPECT_FLOAT_EQ(shape->Evaluate(Ticks(400)), 9.0f);
    EXPECT_FLOAT_EQ(weight->Evaluate(Ticks(400)), 1.0f);
    track.ClearStatic();
    EXPECT_FLOAT_EQ(shape->Evaluate(Ticks(400)), 8.0f);
    track.RemoveKey(Ticks(400));
    track.PrepareKeyFrames(nullptr);
    EXPECT_EQ(track.shapeChannel, shape) << "the same channels, refilled";
    EXPECT_TRUE(list.KeyChannels().size() == 1 && shape->KeyCount() == 1 &&
                weight->KeyCount() == 1);
    track.Clear();
    EXPECT_TRUE(!track.shapeChannel && !track.weightChannel && list.KeyChannels().empty());
}

// Kind 2 previews through its control node's channel, borrowed, not owned; static mode shows
// the low value.
TEST_F(KLKeyTrackTest, PreviewKindTwo) {
    KLKeySet brow("brow", "browNode", 5, -0.5f, 2.0f);
    KLKeyTrack t(&brow);
    t.InsertKey(0, Ticks(200), nullptr, 1, 0.25f);
    t.InsertKey(0, Ticks(600), nullptr, 1, 0.75f);
    t.PrepareKeyFrames(nullptr);
    EXPECT_EQ(t.weightChannel, nullptr) << "no value channel yet";
    CerrCapture err;
    t.SetControlGraphNode(nullptr);
    EXPECT_EQ(err.Text(), "NO GRAPH NODE\n");
    KLGraphNode node("browNode");
    t.SetControlGraphNode(&node);
    ASSERT_NE(node.Transform()->Channel(5), nullptr);
    EXPECT_EQ(t.weightChannel, node.Transform()->Channel(5));
    t.PrepareKeyFrames(nullptr);
    EXPECT_TRUE(t.shapeChannel == nullptr && t.weightChannel->KeyCount() == 2);
    EXPECT_FLOAT_EQ(t.weightChannel->Evaluate(Ticks(600)), 0.75f);
    t.SetStatic();
    EXPECT_FLOAT_EQ(t.weightChannel->Evaluate(Ticks(600)), -0.5f);
    t.ClearStatic();
    EXPECT_FLOAT_EQ(t.weightChannel->Evaluate(Ticks(600)), 0.75f);
    t.Clear();
    EXPECT_TRUE(t.weightChannel == nullptr && node.Transform()->Channel(5) != nullptr);
}

}  // namespace
