#include "model/KLMarkTrack.h"

#include <gtest/gtest.h>

#include <sstream>

#include "model/ModelTestUtil.h"

namespace {

class KLMarkTrackTest : public ::testing::Test {
  protected:
    void TearDown() override { CueTime::default_fps = 30; }
    std::string Written() const {
        std::ostringstream out;
        track.Write(out);
        return out.str();
    }
    RecordingImp imp;
    KLMarkTrack track;
};

TEST_F(KLMarkTrackTest, InsertRefusesOccupiedInstant) {
    KLMarkEvent* a = track.InsertMark(CueTime::FromTicks(100), 'a');
    ASSERT_NE(a, nullptr);
    EXPECT_EQ(track.InsertMark(CueTime::FromTicks(100), 'b'), nullptr);
    EXPECT_EQ(a->label, 'a');
    EXPECT_NE(track.InsertMark(CueTime::FromTicks(101), 'b'), nullptr);
    EXPECT_EQ(track.marks.Count(), 2);
    EXPECT_EQ(imp.modified, 0) << "marks do not mark the workspace modified";
}

TEST_F(KLMarkTrackTest, RemoveNeedsExactTime) {
    track.InsertMark(CueTime::FromTicks(100), 'a');
    EXPECT_EQ(track.RemoveMark(CueTime::FromTicks(99)), 0);
    EXPECT_EQ(track.RemoveMark(CueTime::FromTicks(100)), 1);
    EXPECT_EQ(track.RemoveMark(CueTime::FromTicks(100)), 0);
    EXPECT_TRUE(track.marks.Empty());
}

TEST_F(KLMarkTrackTest, Bracket) {
    KLMarkEvent* before = reinterpret_cast<KLMarkEvent*>(1);
    KLMarkEvent* after = reinterpret_cast<KLMarkEvent*>(1);
    EXPECT_EQ(track.BracketMarks(CueTime::FromTicks(5), &before, &after), nullptr);
    EXPECT_EQ(before, nullptr);
    EXPECT_EQ(after, nullptr);

    KLMarkEvent* m1 = track.InsertMark(CueTime::FromTicks(100), 'a');
    KLMarkEvent* m2 = track.InsertMark(CueTime::FromTicks(200), 'b');
    EXPECT_EQ(track.BracketMarks(CueTime::FromTicks(-5), &before, &after), m1);
    EXPECT_EQ(before, nullptr);
    EXPECT_EQ(after, m1);
    EXPECT_EQ(track.BracketMarks(CueTime::FromTicks(100), &before, &after), m2);
    EXPECT_EQ(before, m1);
    EXPECT_EQ(track.BracketMarks(CueTime::FromTicks(199), &before, &after), m2);
    EXPECT_EQ(before, m1);
    EXPECT_EQ(track.BracketMarks(CueTime::FromTicks(200), &before, &after), nullptr);
    EXPECT_EQ(before, m2);
    EXPECT_EQ(after, nullptr);
}

TEST_F(KLMarkTrackTest, ReadGolden) {
    std::istringstream in(
        "    mark 12\t\"a\"\n"
        "mark 4 \"ah\"\n"
        "mark 4 z\n"
        "mark 5\n"
        "mark 6 a b\n"
        "marks 7 q\n"
        "mark 2.5 \" \"\n"
        "mark 8 \"\"\n"
        "end\n"
        "mark 9 x\n");
    track.Read(in);
    EXPECT_EQ(Written(), "    mark 2.5\t\" \"\n    mark 4\t\"a\"\n    mark 12\t\"a\"\n");
    EXPECT_EQ(track.marks.Head()->time, CueTime(2.5, 0));
}

TEST_F(KLMarkTrackTest, ReadAddsToExistingMarks) {
    track.InsertMark(CueTime(4.0, 0), 'q');
    std::istringstream in("mark 4 a\nmark 5 b\n");
    track.Read(in);
    EXPECT_EQ(Written(), "    mark 4\t\"q\"\n    mark 5\t\"b\"\n");
}

TEST_F(KLMarkTrackTest, FractionalFramesFollowTheFrameRate) {
    CueTime::default_fps = 24;
    std::istringstream in("mark 3.5 m\n");
    track.Read(in);
    ASSERT_EQ(track.marks.Count(), 1);
    EXPECT_EQ(track.marks.Head()->time.Ticks(), 875);  // 3.5 frames of 250 ticks
    EXPECT_EQ(Written(), "    mark 3.5\t\"m\"\n");
}

TEST_F(KLMarkTrackTest, RoundTripAndClear) {
    for (int i = 0; i < 20; ++i)
        track.InsertMark(CueTime::FromTicks(i * 137 - 400), char('a' + i));
    const std::string text = Written();
    KLMarkTrack again;
    std::istringstream in(text);
    again.Read(in);
    std::ostringstream out;
    again.Write(out);
    EXPECT_EQ(out.str(), text);
    auto it = again.marks.begin();
    for (const KLMarkEvent* m : track.marks) {
        EXPECT_EQ((*it)->time, m->time);
        EXPECT_EQ((*it)->label, m->label);
        ++it;
    }
    track.Clear();
    EXPECT_TRUE(track.marks.Empty());
    EXPECT_EQ(Written(), "");
}

TEST_F(KLMarkTrackTest, BadInputIsSkipped) {
    std::string text = "mark 1e30 a\nmark -1e30 b\nmark nan c\nmark \"\" \"\"\nmark";
    for (int i = 1; i < 256; ++i)
        text.push_back(char(i));
    std::istringstream in(text);
    track.Read(in);
    ASSERT_EQ(track.marks.Count(), 3);
    EXPECT_EQ(track.marks.Head()->time.Ticks(), INT32_MIN);
    EXPECT_EQ(track.marks.Tail()->time.Ticks(), INT32_MAX);
}

}  // namespace
