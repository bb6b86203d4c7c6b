#include "model/KLMarkTrack.h"

#include <gtest/gtest.h>

#include "model/ModelTestUtil.h"

namespace {

class KLMarkTrackTest : public ModelTest {
  protected:
    KLMarkTrack track;
};

// One mark per instant, the first kept; marks do not mark the workspace modified. Bracket:
// the mark after t, and the last at or before it.
TEST_F(KLMarkTrackTest, InsertRemoveBracket) {
    KLMarkEvent *before = nullptr, *after = nullptr;
    EXPECT_EQ(track.BracketMarks(Ticks(5), &before, &after), nullptr);
    KLMarkEvent* m1 = track.InsertMark(Ticks(100), 'a');
    EXPECT_EQ(track.InsertMark(Ticks(100), 'b'), nullptr);
    KLMarkEvent* m2 = track.InsertMark(Ticks(200), 'b');
    ASSERT_TRUE(m1 && m2);
    EXPECT_EQ(m1->label, 'a');
    EXPECT_EQ(imp.modified, 0);
    const std::tuple<int32_t, KLMarkEvent*, KLMarkEvent*> cases[] = {
        {-5, nullptr, m1}, {100, m1, m2}, {199, m1, m2}, {200, m2, nullptr}};
    for (const auto& [t, b, a] : cases) {
        EXPECT_EQ(track.BracketMarks(Ticks(t), &before, &after), a) << t;
        EXPECT_TRUE(before == b && after == a) << t;
    }
    EXPECT_EQ(track.RemoveMark(Ticks(99)), 0);
    EXPECT_EQ(track.RemoveMark(Ticks(100)), 1);
    EXPECT_EQ(track.RemoveMark(Ticks(100)), 0);
    EXPECT_EQ(track.marks.Count(), 1);
}

// Reading adds to the marks there; a label is its first character; other statements skipped.
TEST_F(KLMarkTrackTest, ReadWriteGolden) {
    track.InsertMark(CueTime(1.0, 0), 'q');
    ReadText(track,
             "    mark 12\t\"a\"\nmark 4 \"ah\"\nmark 4 z\nmark 5\nmark 6 a b\nmarks 7 q\n"
             "mark 1 r\nmark 2.5 \" \"\nmark 8 \"\"\nend\nmark 9 x\n");
    const std::string golden =
        "    mark 1\t\"q\"\n    mark 2.5\t\" \"\n    mark 4\t\"a\"\n    mark 12\t\"a\"\n";
    EXPECT_EQ(Written(track), golden);
    EXPECT_EQ(track.marks.Next(track.marks.Head())->time, CueTime(2.5, 0));
    CueTime::default_fps = 24;
    KLMarkTrack at24;
    ReadText(at24, "mark 3.5 m\n");
    EXPECT_EQ(at24.marks.Head()->time.Ticks(), 875);  // 3.5 frames of 250 ticks
    EXPECT_EQ(Written(at24), "    mark 3.5\t\"m\"\n");
}

TEST_F(KLMarkTrackTest, RoundTripAndClear) {
    for (int i = 0; i < 20; ++i)
        track.InsertMark(Ticks(i * 137 - 400), char('a' + i));
    KLMarkTrack again;
    ReadText(again, Written(track));
    EXPECT_EQ(Written(again), Written(track));
    auto it = again.marks.begin();
    for (const KLMarkEvent* m : track.marks) {
        EXPECT_TRUE((*it)->time == m->time && (*it)->label == m->label);
        ++it;
    }
    track.Clear();
    EXPECT_EQ(Written(track), "");
}

TEST_F(KLMarkTrackTest, TimesBeyondTheTickRangeAreClamped) {
    ReadText(track, "mark 1e30 a\nmark -1e30 b\nmark \"\" \"\"\n");
    ASSERT_EQ(track.marks.Count(), 2);
    EXPECT_EQ(track.marks.Head()->time.Ticks(), INT32_MIN);
    EXPECT_EQ(track.marks.Tail()->time.Ticks(), INT32_MAX);
}

}  // namespace
