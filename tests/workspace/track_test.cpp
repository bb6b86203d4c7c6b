// Track files: loading with every message, the sound inside them, saving back byte for byte,
// the sound on its own and the workspace duration.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "WorkspaceTestUtil.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "model/KLMarkTrack.h"
#include "toolkit/CueSound.h"
#include "workspace/Imp.h"

using namespace wstest;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

namespace {

// Two keysets, "mouth" and "big mouth", loaded from the face scene of a project; a two-second
// sound "dialogue.aiff" in the data directory; the error log in the project.
class TrackTest : public ProjectTest {
  protected:
    void SetUp() override {
        ProjectTest::SetUp();
        WriteAiff(dir / "misc_data/dialogue.aiff", 16000, 8000);
        ASSERT_EQ(BatchLoadKeyset(Data("face.kset", std::string("wire face.gltf\n") + kMouth +
                                                        "begin shapeset \"big mouth\" jaw 1\n"
                                                        " key rest 0\n key wide 1\nend\n")),
                  1);
        theImp.SetErrorFilename(log.c_str());
        ghost.calls.clear();
    }
    int Load(const std::string& text) { return theImp.LoadTrack(Data("t.track", text).c_str()); }
    std::string LogText() { return ReadFile(log).substr(ReadFile(log).find("\n\n") + 2); }
    std::string SavedText() {
        EXPECT_EQ(theImp.SaveTrack((dir / "saved.track").c_str()), 1);
        return ReadFile(dir / "saved.track");
    }

    std::string log = dir / "errlog.vx";
};

const char* const kFullTrack =
    "sound dialogue.aiff\n\n"
    "fps 24\n\n"
    "begin marktrack\n    mark 3\t\"a\"\n    mark 40.5\t\"b\"\nend\n\n"
    "begin keytrack\tmouth\n"
    "    event 0 rest Ease 1\n    event 12.5 open Linear 0.75\n    event 30 wide Smooth 2\n"
    "end\n\n"
    "begin keytrack\t\"big mouth\"\n    event 5 wide Ease -0.5\nend\n\n"
    "active_keyset \"big mouth\"\n\n";

TEST_F(TrackTest, LoadTellsTheWindowInOrderAndSavesBackByteForByte) {
    ASSERT_EQ(Load(kFullTrack), 1);
    EXPECT_EQ(theImp.fps, 24);
    EXPECT_EQ(theImp.soundFile, dir / "misc_data/dialogue.aiff");
    EXPECT_EQ(theImp.activeKeyset, 1);
    // 30 frames at 24 per second is the last key: 1.25 s; the sound lasts 2 s.
    EXPECT_EQ(theImp.duration.Ticks(), 12000);
    EXPECT_THAT(ghost.calls,
                ElementsAre("InitSound(sound)", "InitMarkTrack(track)", "SetActiveKeyset(1)",
                            "SetMenuStatus()", "SetViewStatus()", "DisplayDuration(12000)"));
    theImp.trackModified = 1;
    EXPECT_EQ(SavedText(), kFullTrack);
    EXPECT_EQ(theImp.trackModified, 0);

    // Loading again in batch mode replaces the tracks and marks and tells the window nothing.
    theImp.GetKeyTrack(0)->InsertKey(0, CueTime::FromFrames(99), nullptr, 1, 1.0f);
    theImp.batchMode = 1;
    ghost.calls.clear();
    ASSERT_EQ(theImp.LoadTrack((dir / "saved.track").c_str()), 1);
    EXPECT_THAT(ghost.calls, IsEmpty());
    EXPECT_EQ(theImp.GetKeyTrack(0)->events.Count(), 3);
    EXPECT_EQ(theImp.markTrack->marks.Count(), 2);
}

TEST_F(TrackTest, AFileThatCannotBeOpenedIsToldAndChangesNothing) {
    ASSERT_EQ(Load(kFullTrack), 1);
    EXPECT_EQ(theImp.LoadTrack((dir / "misc_data").c_str()), 0) << "a directory is no track";
    const std::string missing = dir / "misc_data/none.track";
    const std::string told = "Failed to open track file [" + missing + "].";
    ghost.calls.clear();
    EXPECT_EQ(theImp.LoadTrack(missing.c_str()), 0);
    EXPECT_THAT(ghost.calls, ElementsAre("Inform(" + told + "|Dismiss)"));
    EXPECT_EQ(theImp.GetKeyTrack(0)->events.Count(), 3);
    theImp.batchMode = 1;
    ghost.calls.clear();
    EXPECT_EQ(StdErr([&] { EXPECT_EQ(theImp.LoadTrack(missing.c_str()), 0); }), told + "\n");
    EXPECT_THAT(ghost.calls, IsEmpty());
}

TEST_F(TrackTest, EachBlockOfAnUnknownKeysetIsToldAndSkipped) {
    ASSERT_EQ(Load("begin keytrack lips\n event 1 rest\nend\n"
                   "begin keytrack mouth\n event 2 open\nend\n"
                   "begin keytrack\tlips\n event 3 rest\nend\n"
                   "active_keyset lips\n"),
              1);
    EXPECT_THAT(ghost.Calls("Inform"),
                ElementsAre("Inform(Failed to find keyset [lips].|Dismiss)",
                            "Inform(Failed to find keyset [lips].|Dismiss)"));
    ASSERT_EQ(theImp.GetKeyTrack(0)->events.Count(), 1);
    EXPECT_EQ(theImp.GetKeyTrack(0)->Duration(), CueTime::FromFrames(2));
    EXPECT_EQ(theImp.GetKeyTrack(1)->events.Count(), 0);
    EXPECT_EQ(theImp.activeKeyset, -1) << "an active keyset not loaded is ignored";
    EXPECT_THAT(ghost.Calls("SetActiveKeyset"), IsEmpty());
}

TEST_F(TrackTest, ASoundThatCannotBeReadIsLoggedAndTheTrackLoadsWithout) {
    WriteFile(dir / "misc_data/notes.aiff", "not a sound at all");
    WriteAiff(dir / "misc_data/locked.aiff", 100, 8000);
    ::chmod((dir / "misc_data/locked.aiff").c_str(), 0);
    const std::vector<std::pair<std::string, std::string>> cases = {
        {"gone.aiff", "Audio file [%M/gone.aiff] does not exist.\n"},
        {"notes.aiff", "Audio file [%M/notes.aiff] could not be read"},
        {"locked.aiff", "Audio file [%M/locked.aiff] is unreadable.\n"},
    };
    for (const auto& [file, logged] : cases) {
        if (file == "locked.aiff" && ::geteuid() == 0)
            continue;  // root reads every file
        theImp.SetErrorFilename(log.c_str());
        ghost.calls.clear();
        ASSERT_EQ(Load("sound " + file + "\nbegin keytrack mouth\n event 2 open\nend\n"), 1);
        EXPECT_THAT(LogText(), HasSubstr(Fill(logged)));
        EXPECT_EQ(theImp.sound, nullptr);
        EXPECT_EQ(theImp.soundFile, "");
        EXPECT_THAT(ghost.calls, ::testing::Contains("ShowErrorFlag()"));
        EXPECT_EQ(theImp.GetKeyTrack(0)->events.Count(), 1);
    }
    EXPECT_EQ(SavedText().rfind("fps 30\n\n", 0), 0u) << "no sound line without a sound";
}

struct FpsCase {
    const char* label;
    const char* text;
    int expected;
    friend void PrintTo(const FpsCase& c, std::ostream* os) { *os << c.label; }
};
class TrackFps : public TrackTest, public ::testing::WithParamInterface<FpsCase> {};

TEST_P(TrackFps, SetsOrKeepsTheRate) {
    theImp.SetFps(24);
    ASSERT_EQ(Load(GetParam().text), 1);
    EXPECT_EQ(theImp.fps, GetParam().expected);
    EXPECT_EQ(CueTime::default_fps, GetParam().expected);
}

INSTANTIATE_TEST_SUITE_P(Statements, TrackFps,
                         ::testing::Values(FpsCase{"None", "begin marktrack\nend\n", 24},
                                           FpsCase{"Zero", "fps 0\n", 30},
                                           FpsCase{"Negative", "fps -2\n", 30},
                                           FpsCase{"TwentyFive", "fps 25\n", 25},
                                           FpsCase{"NotANumber", "fps twelve\n", 30},
                                           FpsCase{"ThreeTokens", "fps 25 extra\n", 24}),
                         ByLabel());

TEST_F(TrackTest, SaveWritesTheActiveKeysetTheWindowReportsAndTellsAFailure) {
    ghost.activeKeyset = -1;
    EXPECT_EQ(SavedText(),
              "fps 30\n\nbegin marktrack\nend\n\nbegin keytrack\tmouth\nend\n\n"
              "begin keytrack\t\"big mouth\"\nend\n\n");
    ghost.activeKeyset = 0;
    EXPECT_THAT(SavedText(), ::testing::EndsWith("end\n\nactive_keyset mouth\n\n"));

    const std::string bad = dir / "no-dir/x.track";
    ghost.calls.clear();
    EXPECT_EQ(theImp.SaveTrack(bad.c_str()), 0);
    EXPECT_THAT(ghost.calls,
                ElementsAre("Inform(Failed to open track file [" + bad + "].|Dismiss)"));
    theImp.batchMode = 1;
    EXPECT_EQ(StdErr([&] { EXPECT_EQ(theImp.SaveTrack(bad.c_str()), 0); }),
              "Failed to open track file [" + bad + "].\n");
}

TEST_F(TrackTest, LoadSoundTakesTheNameAsItStandsAndKeepsTheSoundOnFailure) {
    const std::string good = dir / "misc_data/dialogue.aiff";
    ASSERT_EQ(theImp.LoadSound(good.c_str()), 1);
    EXPECT_EQ(theImp.soundFile, good);
    EXPECT_EQ(theImp.sound->FrameCount(), 16000);
    EXPECT_EQ(theImp.trackModified, 1);
    EXPECT_THAT(ghost.calls, ElementsAre("DisplayDuration(12000)", "InitSound(sound)"));
    ghost.calls.clear();
    const std::string bad = dir / "misc_data/none.aiff";
    EXPECT_EQ(theImp.LoadSound(bad.c_str()), 0);
    ASSERT_EQ(ghost.Calls("Inform").size(), 1u) << ::testing::PrintToString(ghost.calls);
    EXPECT_THAT(ghost.Calls("Inform")[0],
                ::testing::StartsWith("Inform(Could not read sound file [" + bad + "]"));
    EXPECT_EQ(theImp.soundFile, good);
    EXPECT_NE(theImp.sound, nullptr);
}

TEST_F(TrackTest, DurationIsTheLongestOfItsCandidatesAndNeverBelowOneSecond) {
    EXPECT_EQ(theImp.compute_duration(CueTime()).Ticks(), 6000);
    EXPECT_EQ(theImp.compute_duration(CueTime::FromTicks(5999)).Ticks(), 6000);
    EXPECT_EQ(theImp.compute_duration(CueTime::FromTicks(9000)).Ticks(), 9000);
    theImp.GetKeyTrack(1)->InsertKey(0, CueTime::FromTicks(15000), nullptr, 1, 1.0f);
    EXPECT_EQ(theImp.compute_duration(CueTime::FromTicks(9000)).Ticks(), 15000);
    theImp.sound = CueSound::FromSamples({std::vector<float>(24000, 0.0f)}, 8000.0);
    EXPECT_EQ(theImp.compute_duration(CueTime()).Ticks(), 18000) << "3 s of sound";
    EXPECT_EQ(theImp.compute_duration(CueTime::FromTicks(30000)).Ticks(), 30000);
    ghost.calls.clear();
    theImp.SetDuration(CueTime::FromTicks(100));
    EXPECT_EQ(theImp.duration.Ticks(), 18000);
    EXPECT_EQ(theImp.requestedDuration.Ticks(), 100);
    EXPECT_THAT(ghost.calls, ElementsAre("DisplayDuration(18000)"));
}

TEST_F(TrackTest, DamagedTracksLoadWhatTheyCan) {
    static const char binary[] = "sound \"unterminated\nfps 99999999999\n\0\xff";
    const std::vector<std::string> cases = {
        "begin keytrack mouth\n event 3 open\n",  // no end
        "begin keytrack mouth\n event\n event x\n event 1e30 open\n event -4 open Ease nan\nend\n",
        "begin marktrack\n mark\n mark 3\n mark 2 \"\"\n",
        std::string(binary, sizeof binary - 1),
        "active_keyset\nactive_keyset a b\nbegin\nbegin keytrack\n",
    };
    theImp.batchMode = 1;
    for (const std::string& text : cases) {
        StdErr([&] { EXPECT_EQ(Load(text), 1) << text; });
        EXPECT_GE(theImp.fps, 1);
        EXPECT_GE(theImp.duration.Ticks(), 6000);
        EXPECT_EQ(theImp.SaveTrack((dir / "after.track").c_str()), 1);
        EXPECT_EQ(theImp.LoadTrack((dir / "after.track").c_str()), 1)
            << "what was saved reads back";
    }
}

}  // namespace
