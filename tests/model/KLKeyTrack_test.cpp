#include "model/KLKeyTrack.h"

#include <gtest/gtest.h>

#include <sstream>

#include "model/KLKeySet.h"
#include "model/ModelTestUtil.h"

namespace {

CueTime Ticks(int32_t t) {
    return CueTime::FromTicks(t);
}

class KLKeyTrackTest : public ::testing::Test {
  protected:
    KLKeyTrackTest() : set("mouth", nullptr), track(&set) {
        std::istringstream in("key rest 0\nkey jaw 10\nkey \"wide open\" 20\nend\n");
        set.Read(in);
    }
    void TearDown() override { CueTime::default_fps = 30; }
    KLKeyEvent* Add(int32_t ticks, int shape = 1, int smoothing = 1, float value = 1.0f) {
        return track.InsertKey(shape, Ticks(ticks), set.GetKeyShape(shape), smoothing, value);
    }
    std::string Written() const {
        std::ostringstream out;
        track.Write(out);
        return out.str();
    }

    RecordingImp imp;
    KLKeySet set;
    KLKeyTrack track;
};

TEST_F(KLKeyTrackTest, InsertAndRemoveMarkModified) {
    KLKeyEvent* a = Add(100, 1, 2, 0.5f);
    ASSERT_NE(a, nullptr);
    EXPECT_EQ(a->shapeIndex, 1);
    EXPECT_EQ(a->key, set.GetKeyShape(1));
    EXPECT_EQ(a->smoothing, 2);
    EXPECT_EQ(a->value, 0.5f);
    EXPECT_EQ(imp.modified, 1);
    EXPECT_EQ(Add(100, 2), nullptr) << "occupied instant";
    EXPECT_EQ(imp.modified, 2) << "a refused insert marks modified too";
    EXPECT_EQ(a->shapeIndex, 1);
    EXPECT_EQ(track.RemoveKey(Ticks(101)), 0);
    EXPECT_EQ(imp.modified, 2);
    EXPECT_EQ(track.RemoveKey(Ticks(100)), 1);
    EXPECT_EQ(imp.modified, 3);
    EXPECT_TRUE(track.events.Empty());
}

TEST_F(KLKeyTrackTest, DurationAndClear) {
    EXPECT_EQ(track.Duration(), CueTime());
    Add(300);
    Add(-50);
    EXPECT_EQ(track.Duration(), Ticks(300));
    track.Clear();
    EXPECT_TRUE(track.events.Empty());
    EXPECT_EQ(track.Duration(), CueTime());
}

TEST_F(KLKeyTrackTest, EmptyTrackLookups) {
    for (int mode : {0, 1}) {
        track.lookupMode = mode;
        EXPECT_EQ(track.key_from_time(Ticks(0)), nullptr);
    }
    KLKeyEvent* prev = Add(0);  // any non-null value to see it overwritten
    track.RemoveKey(Ticks(0));
    KLKeyEvent* next = prev;
    EXPECT_EQ(track.bracket_keys_from_time(Ticks(5), &prev, &next), 0.0f);
    EXPECT_EQ(prev, nullptr);
    EXPECT_EQ(next, nullptr);

    track.PrepareFastAccess(Ticks(0), Ticks(6000));
    EXPECT_EQ(track.fastCount, 30);
    EXPECT_EQ(track.key_from_time_fast(Ticks(300)), nullptr);
    EXPECT_EQ(track.bracket_keys_from_time(Ticks(300), &prev, &next), 0.0f);
    EXPECT_EQ(prev, nullptr);
    EXPECT_EQ(next, nullptr);
}

TEST_F(KLKeyTrackTest, PreviousLookup) {
    KLKeyEvent* a = Add(100);
    KLKeyEvent* b = Add(200);
    EXPECT_EQ(track.key_from_time(Ticks(99)), nullptr);
    EXPECT_EQ(track.key_from_time(Ticks(100)), a);
    EXPECT_EQ(track.key_from_time(Ticks(199)), a);
    EXPECT_EQ(track.key_from_time(Ticks(200)), b);
    EXPECT_EQ(track.key_from_time(Ticks(1 << 30)), b);
    track.lookupMode = 7;
    EXPECT_EQ(track.key_from_time(Ticks(150)), nullptr);
}

TEST_F(KLKeyTrackTest, NearestLookupTieGoesToLaterKey) {
    track.lookupMode = KLKeyTrack::kNearest;
    KLKeyEvent* a = Add(100);
    KLKeyEvent* b = Add(110);
    EXPECT_EQ(track.key_from_time(Ticks(50)), a) << "only a next key";
    EXPECT_EQ(track.key_from_time(Ticks(104)), a);
    EXPECT_EQ(track.key_from_time(Ticks(105)), b) << "exactly between";
    EXPECT_EQ(track.key_from_time(Ticks(106)), b);
    EXPECT_EQ(track.key_from_time(Ticks(5000)), b) << "only a previous key";
}

// The fast table breaks the tie the other way: at exactly one half the earlier key is nearest.
TEST_F(KLKeyTrackTest, FastTableTieGoesToEarlierKey) {
    track.lookupMode = KLKeyTrack::kNearest;
    KLKeyEvent* a = Add(0);
    KLKeyEvent* b = Add(400);  // two frames at 30 fps
    track.PrepareFastAccess(Ticks(0), Ticks(600));
    ASSERT_EQ(track.fastCount, 3);
    EXPECT_EQ(track.fastTable[1].fraction, 0.5f);
    EXPECT_EQ(track.key_from_time(Ticks(200)), b);
    EXPECT_EQ(track.key_from_time_fast(Ticks(200)), a);
    EXPECT_EQ(track.key_from_time_fast(Ticks(399)), a) << "whole frame 1";
    EXPECT_EQ(track.key_from_time_fast(Ticks(400)), b);
}

TEST_F(KLKeyTrackTest, BracketWithoutTable) {
    KLKeyEvent* a = Add(300);
    KLKeyEvent* b = Add(900);
    KLKeyEvent* prev;
    KLKeyEvent* next;
    EXPECT_EQ(track.bracket_keys_from_time(Ticks(0), &prev, &next), 1.0f);
    EXPECT_EQ(prev, nullptr);
    EXPECT_EQ(next, a);
    EXPECT_EQ(track.bracket_keys_from_time(Ticks(450), &prev, &next), 0.25f);
    EXPECT_EQ(prev, a);
    EXPECT_EQ(next, b);
    EXPECT_EQ(track.bracket_keys_from_time(Ticks(300), &prev, &next), 0.0f);
    EXPECT_EQ(prev, a);
    EXPECT_EQ(track.bracket_keys_from_time(Ticks(901), &prev, &next), 0.0f);
    EXPECT_EQ(prev, b);
    EXPECT_EQ(next, nullptr);
}

// The table holds, per whole frame, what the lookups give at that frame's start; times are
// clamped to the table's range.
TEST_F(KLKeyTrackTest, FastTableMatchesSlowLookups) {
    track.lookupMode = KLKeyTrack::kNearest;
    for (int32_t t : {-700, 130, 200, 455, 1000, 1010, 4321})
        Add(t, t % 3 < 0 ? 0 : t % 3);
    const CueTime start = Ticks(-1000), end = Ticks(5000);
    track.PrepareFastAccess(start, end);
    ASSERT_EQ(track.fastCount, 30);
    EXPECT_EQ(track.fastStart, start);
    EXPECT_EQ(track.fastEnd, end);
    for (int i = 0; i < track.fastCount; ++i) {
        const CueTime t = Ticks(-1000 + 200 * i);
        const KLKeyTrack::FastEntry& e = track.fastTable[i];
        KLKeyEvent *prev, *next;
        const float fraction = [&] {
            std::vector<KLKeyTrack::FastEntry> saved;
            saved.swap(track.fastTable);
            const float f = track.bracket_keys_from_time(t, &prev, &next);
            saved.swap(track.fastTable);
            return f;
        }();
        EXPECT_EQ(e.prev, prev) << i;
        EXPECT_EQ(e.prev2, prev) << i;
        EXPECT_EQ(e.next, next) << i;
        EXPECT_EQ(e.fraction, fraction) << i;
        EXPECT_EQ(e.nearest, fraction > 0.5f ? next : prev) << i;
        EXPECT_EQ(track.key_from_time_fast(t + Ticks(199)), e.nearest);
        EXPECT_EQ(track.bracket_keys_from_time(t + Ticks(150), &prev, &next), e.fraction);
        EXPECT_EQ(prev, e.prev);
        EXPECT_EQ(next, e.next);
    }
    EXPECT_EQ(track.key_from_time_fast(Ticks(-50000)), track.fastTable[0].nearest);
    EXPECT_EQ(track.key_from_time_fast(Ticks(50000)), track.fastTable[29].nearest);
    track.lookupMode = KLKeyTrack::kPrevious;
    EXPECT_EQ(track.key_from_time_fast(Ticks(50000)), track.fastTable[29].prev);

    track.FinishFastAccess();
    EXPECT_TRUE(track.fastTable.empty());
    EXPECT_EQ(track.fastCount, 0);
}

TEST_F(KLKeyTrackTest, FastTableRangeRules) {
    KLKeyEvent* a = Add(100);
    track.PrepareFastAccess(Ticks(600), Ticks(600));
    EXPECT_TRUE(track.fastTable.empty()) << "an empty range builds nothing";
    track.PrepareFastAccess(Ticks(600), Ticks(0));
    EXPECT_TRUE(track.fastTable.empty());
    EXPECT_EQ(track.key_from_time_fast(Ticks(150)), a) << "without a table: slow lookup";

    track.PrepareFastAccess(Ticks(0), Ticks(399));  // 1.995 frames: one entry
    EXPECT_EQ(track.fastCount, 1);
    track.PrepareFastAccess(Ticks(0), Ticks(60000));
    EXPECT_EQ(track.fastCount, 300);
    track.PrepareFastAccess(Ticks(5), Ticks(5));
    EXPECT_EQ(track.fastCount, 300) << "an empty range keeps the old table";
    track.RemoveKey(Ticks(100));
    EXPECT_TRUE(track.fastTable.empty()) << "removing a key drops the table";
}

TEST_F(KLKeyTrackTest, FastTableAtTwentyFourFps) {
    CueTime::default_fps = 24;
    KLKeyEvent* a = Add(0);
    KLKeyEvent* b = Add(1000);  // four frames of 250 ticks
    track.PrepareFastAccess(Ticks(0), Ticks(1500));
    ASSERT_EQ(track.fastCount, 6);
    const float expected[] = {0.0f, 0.25f, 0.5f, 0.75f, 0.0f, 0.0f};
    for (int i = 0; i < 6; ++i)
        EXPECT_EQ(track.fastTable[i].fraction, expected[i]) << i;
    EXPECT_EQ(track.fastTable[3].nearest, b);
    EXPECT_EQ(track.fastTable[2].nearest, a);
    EXPECT_EQ(track.fastTable[5].next, nullptr);
}

TEST_F(KLKeyTrackTest, SmoothingNames) {
    EXPECT_EQ(SmoothFromString(nullptr), 1);
    for (const char* s : {"Linear", "LINEAR", "linear"})
        EXPECT_EQ(SmoothFromString(s), 0);
    for (const char* s : {"Smooth", "SMOOTH", "smooth"})
        EXPECT_EQ(SmoothFromString(s), 2);
    for (const char* s : {"Ease", "EASE", "ease", "LiNeAr", "", "Unknown"}) {
        EXPECT_EQ(SmoothFromString(s), 1) << s;
    }
    KLKeyEvent e(0, CueTime(), nullptr, 0, 1.0f);
    EXPECT_STREQ(e.GetSmoothName(), "Linear");
    e.SetSmoothName("smooth");
    EXPECT_STREQ(e.GetSmoothName(), "Smooth");
    e.SetSmoothName("whatever");
    EXPECT_STREQ(e.GetSmoothName(), "Ease");
    e.smoothing = 3;
    EXPECT_STREQ(e.GetSmoothName(), "Unknown");
    e.smoothing = -1;
    EXPECT_STREQ(e.GetSmoothName(), "Unknown");
}

TEST_F(KLKeyTrackTest, ReadGolden) {
    std::istringstream in(
        "    event 12 jaw Ease 1\n"
        "event 3.5 jaw\n"
        "event 20 \"wide open\" Linear\n"
        "event 30 rest smooth 0.25\n"
        "event 40 jaw Smooth 2 extra\n"
        "event 41\n"
        "event 3.5 rest Linear 0\n"
        "key 50 jaw\n"
        "end\n"
        "event 60 jaw\n");
    track.Read(in, &set);
    EXPECT_TRUE(imp.informs.empty());
    EXPECT_EQ(Written(),
              "    event 3.5 jaw Ease 1\n"
              "    event 12 jaw Ease 1\n"
              "    event 20 \"wide open\" Linear 1\n"
              "    event 30 rest Smooth 0.25\n");
    KLKeyEvent* first = track.events.Head();
    EXPECT_EQ(first->time.Ticks(), 700);
    EXPECT_EQ(first->key, set.GetKeyShape(1));
    EXPECT_EQ(first->shapeIndex, 1);
}

TEST_F(KLKeyTrackTest, ReadAtTwentyFourFps) {
    CueTime::default_fps = 24;
    std::istringstream in("event 3.5 jaw\n");
    track.Read(in, &set);
    ASSERT_EQ(track.events.Count(), 1);
    EXPECT_EQ(track.events.Head()->time.Ticks(), 875);
    EXPECT_EQ(track.events.Head()->smoothing, 1);
    EXPECT_EQ(track.events.Head()->value, 1.0f);
    EXPECT_EQ(Written(), "    event 3.5 jaw Ease 1\n");
}

TEST_F(KLKeyTrackTest, UnknownKeyShapeIsReportedAndSkipped) {
    std::istringstream in(
        "event 1 nose\nevent 2 jaw\nevent 3 \"wide\" Ease 1\nevent 4 x a b c d\n");
    track.Read(in, &set);
    ASSERT_EQ(imp.informs.size(), 3u);
    EXPECT_EQ(imp.informs[0].message, "Failed to find keyshape [nose] in keyset [mouth].");
    EXPECT_EQ(imp.informs[0].first, "Dismiss");
    EXPECT_EQ(imp.informs[1].message, "Failed to find keyshape [wide] in keyset [mouth].");
    EXPECT_EQ(imp.informs[2].message, "Failed to find keyshape [x] in keyset [mouth].");
    EXPECT_EQ(track.events.Count(), 1);
}

TEST_F(KLKeyTrackTest, RoundTrip) {
    Add(0, 0, 0, 0.0f);
    Add(7, 2, 1, -0.5f);
    Add(1234567, 1, 2, 1.75f);
    Add(-200, 2, 2, 100.0f);
    const std::string text = Written();
    KLKeyTrack again(&set);
    std::istringstream in(text);
    again.Read(in, &set);
    ASSERT_EQ(again.events.Count(), track.events.Count());
    auto it = again.events.begin();
    for (const KLKeyEvent* e : track.events) {
        EXPECT_EQ((*it)->time, e->time);
        EXPECT_EQ((*it)->key, e->key);
        EXPECT_EQ((*it)->smoothing, e->smoothing);
        EXPECT_EQ((*it)->value, e->value);
        ++it;
    }
}

TEST_F(KLKeyTrackTest, BadInputDoesNotCrash) {
    std::string text = "event 1e38 jaw\nevent -1e38 jaw\nevent nan jaw\nevent \"\" \"\" \"\"\n";
    text += "event 5 jaw Ease 1e39\nevent 9 \"\" \"\" \"\" \"\"\nevent";
    for (int i = 1; i < 256; ++i)
        text.push_back(char(i));
    std::istringstream in(text);
    track.Read(in, &set);
    ASSERT_EQ(track.events.Count(), 4);
    EXPECT_EQ(track.events.Head()->time.Ticks(), INT32_MIN);
    EXPECT_EQ(track.events.Tail()->time.Ticks(), INT32_MAX);
    EXPECT_EQ(imp.informs.size(), 2u);
    EXPECT_EQ(imp.informs[0].message, "Failed to find keyshape [] in keyset [mouth].");
}

}  // namespace
