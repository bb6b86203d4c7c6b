#include "model/KLMarkTrack.h"

#include <gtest/gtest.h>

#include "model/ModelTestUtil.h"

namespace {

struct KLMarkTrackTest : ModelTest {
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
    ASSERT_TRUE(m1 && m2 && m1->label == 'a' && imp.modified == 0);
    const std::tuple<int32_t, KLMarkEvent*, KLMarkEvent*> cases[] = {
        {-5, nullptr, m1}, {100, m1, m2}, {199, m1, m2}, {200, m2, nullptr}};
    for (const auto& [t, b, a] : cases) {
        EXPECT_EQ(track.BracketMarks(Ticks(t), &before, &after), a) << t;
        EXPECT_TRUE(before == b && after == a) << t;
    }
    EXPECT_TRUE(!track.RemoveMark(Ticks(99)) && track.RemoveMark(Ticks(100)) == 1);
    EXPECT_EQ(track.RemoveMark(Ticks(100)), 0);
    EXPECT_EQ(track.marks.Count(), 1);
}

// A label is its first character; other statements and empty labels skipped; off-grid times
// round-trip; times clamp to the tick range.
TEST_F(KLMarkTrackTest, ReadWriteGoldenAndRoundTrip) {
    track.InsertMark(CueTime(1.0, 0), 'q');
    ReadText(track,
             "    mark 12\t\"a\"\nmark 4 \"ah\"\nmark 4 z\nmark 5\nmark 6 a b\nmarks 7 q\n"
             "mark 1 r\nmark 2.5 \" \"\nmark 8 \"\"\nend\nmark 9 x\n");
    EXPECT_EQ(Written(track),
              "    mark 1\t\"q\"\n    mark 2.5\t\" \"\n    mark 4\t\"a\"\n    mark 12\t\"a\"\n");
    EXPECT_EQ(track.marks.Next(track.marks.Head())->time.Ticks(), 500);
    for (int i = 0; i < 20; ++i)
        track.InsertMark(Ticks(i * 137 - 401), char('a' + i));
    KLMarkTrack again;
    ReadText(again, Written(track));
    EXPECT_EQ(again.marks.Count(), 24);
    EXPECT_EQ(Written(again), Written(track));
    track.Clear();
    EXPECT_EQ(Written(track), "");
    ReadText(track, "mark 1e30 a\nmark -1e30 b\nmark 123456.7 c\n");
    EXPECT_EQ(track.marks.Next(track.marks.Head())->time, CueTime(123456.7, 0)) << "not a float";
    EXPECT_EQ(track.marks.Head()->time.Ticks(), INT32_MIN);
    EXPECT_EQ(track.marks.Tail()->time.Ticks(), INT32_MAX);
}

}  // namespace
