// Track files: loading with every message, the sound inside them, saving back byte for byte,
// the sound on its own and the workspace duration.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>

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
// sound "dialogue.aiff" in the data directory.
class TrackTest : public ::testing::Test {
  protected:
    void SetUp() override {
        for (const char* sub : {"misc_data", "wire"})
            std::filesystem::create_directory(dir / sub);
        WriteFile(dir / "wire/face.gltf", FaceSceneJson());
        WriteAiff(dir / "misc_data/dialogue.aiff", 16000, 8000);
        WriteFile(dir / "misc_data/face.kset",
                  "wire face.gltf\n"
                  "begin keyset mouth\n key rest 0\n key open 10\n key wide 20\nend\n"
                  "begin shapeset \"big mouth\" jaw 1\n key rest 0\n key wide 1\nend\n");
        ResetWorkspace();
        theImp.batchMode = 1;  // no project question, no geometry
        ASSERT_EQ(theImp.LoadKeyset((dir / "misc_data/face.kset").c_str()), 1);
        theImp.batchMode = 0;
        theImp.SetErrorFilename(log.c_str());
        ghost.calls.clear();
    }
    void TearDown() override { ResetWorkspace(); }
    std::string Track(const std::string& text, const std::string& name = "t.track") {
        WriteFile(dir / ("misc_data/" + name), text);
        return dir / ("misc_data/" + name);
    }
    std::string LogText() { return ReadFile(log).substr(ReadFile(log).find("\n\n") + 2); }

    TempDir dir;
    std::string log = dir / "errlog.vx";
    ScopedEnv project{"TESSEL_PROJECT", dir.path().c_str()};
    ScopedEnv misc{"TESSEL_MISC_DIR", nullptr};
    RecordingGhost ghost;
    GhostScope scope{&ghost};
};

const char* const kFullTrack =
    "sound dialogue.aiff\n\n"
    "fps 24\n\n"
    "begin marktrack\n"
    "    mark 3\t\"a\"\n"
    "    mark 40.5\t\"b\"\n"
    "end\n\n"
    "begin keytrack\tmouth\n"
    "    event 0 rest Ease 1\n"
    "    event 12.5 open Linear 0.75\n"
    "    event 30 wide Smooth 2\n"
    "end\n\n"
    "begin keytrack\t\"big mouth\"\n"
    "    event 5 wide Ease -0.5\n"
    "end\n\n"
    "active_keyset \"big mouth\"\n\n";

TEST_F(TrackTest, LoadSaveIsByteIdentical) {
    ASSERT_EQ(theImp.LoadTrack(Track(kFullTrack).c_str()), 1);
    EXPECT_EQ(theImp.fps, 24);
    ASSERT_NE(theImp.sound, nullptr);
    EXPECT_EQ(theImp.soundFile, dir / "misc_data/dialogue.aiff");
    EXPECT_EQ(theImp.activeKeyset, 1);
    EXPECT_EQ(theImp.GetKeyTrack(0)->events.Count(), 3);
    const std::string saved = dir / "misc_data/saved.track";
    ASSERT_EQ(theImp.SaveTrack(saved.c_str()), 1);
    EXPECT_EQ(ReadFile(saved), kFullTrack);
    EXPECT_EQ(theImp.trackModified, 0);
}

TEST_F(TrackTest, InteractiveLoadUpdatesTheWindowInOrder) {
    ASSERT_EQ(theImp.LoadTrack(Track(kFullTrack).c_str()), 1);
    // 30 frames at 24 per second is the last key: 1.25 s; the sound lasts 2 s.
    EXPECT_EQ(theImp.duration.Ticks(), 12000);
    EXPECT_THAT(ghost.calls,
                ElementsAre("InitSound(sound)", "InitMarkTrack(track)", "SetActiveKeyset(1)",
                            "SetMenuStatus()", "SetViewStatus()", "DisplayDuration(12000)"));
}

TEST_F(TrackTest, BatchLoadTellsTheWindowNothing) {
    theImp.batchMode = 1;
    ASSERT_EQ(theImp.LoadTrack(Track(kFullTrack).c_str()), 1);
    EXPECT_THAT(ghost.calls, IsEmpty());
    EXPECT_EQ(theImp.activeKeyset, 1);
}

TEST_F(TrackTest, LoadingAgainReplacesTheTracksAndMarks) {
    const std::string path = Track(kFullTrack);
    ASSERT_EQ(theImp.LoadTrack(path.c_str()), 1);
    theImp.GetKeyTrack(0)->InsertKey(0, CueTime::FromFrames(99), nullptr, 1, 1.0f);
    ASSERT_EQ(theImp.LoadTrack(path.c_str()), 1);
    EXPECT_EQ(theImp.GetKeyTrack(0)->events.Count(), 3);
    EXPECT_EQ(theImp.markTrack->marks.Count(), 2);
}

TEST_F(TrackTest, AMissingFileIsToldAndChangesNothing) {
    ASSERT_EQ(theImp.LoadTrack(Track(kFullTrack).c_str()), 1);
    ghost.calls.clear();
    EXPECT_EQ(theImp.LoadTrack((dir / "misc_data").c_str()), 0) << "a directory is no track";
    ghost.calls.clear();
    const std::string missing = dir / "misc_data/none.track";
    EXPECT_EQ(theImp.LoadTrack(missing.c_str()), 0);
    EXPECT_THAT(ghost.calls,
                ElementsAre("Inform(Failed to open track file [" + missing + "].|Dismiss)"));
    EXPECT_EQ(theImp.GetKeyTrack(0)->events.Count(), 3);

    theImp.batchMode = 1;
    ghost.calls.clear();
    testing::internal::CaptureStderr();
    EXPECT_EQ(theImp.LoadTrack(missing.c_str()), 0);
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "Failed to open track file [" + missing + "].\n");
    EXPECT_THAT(ghost.calls, IsEmpty());
}

TEST_F(TrackTest, EachBlockOfAnUnknownKeysetIsToldAndSkipped) {
    ASSERT_EQ(theImp.LoadTrack(Track("begin keytrack lips\n event 1 rest\nend\n"
                                     "begin keytrack mouth\n event 2 open\nend\n"
                                     "begin keytrack\tlips\n event 3 rest\nend\n")
                                   .c_str()),
              1);
    EXPECT_THAT(ghost.Calls("Inform"),
                ElementsAre("Inform(Failed to find keyset [lips].|Dismiss)",
                            "Inform(Failed to find keyset [lips].|Dismiss)"));
    ASSERT_EQ(theImp.GetKeyTrack(0)->events.Count(), 1);
    EXPECT_EQ(theImp.GetKeyTrack(0)->Duration(), CueTime::FromFrames(2));
    EXPECT_EQ(theImp.GetKeyTrack(1)->events.Count(), 0);
}

TEST_F(TrackTest, AMissingSoundIsLoggedAndTheTrackLoadsWithout) {
    ASSERT_EQ(theImp.LoadTrack(
                  Track("sound gone.aiff\nbegin keytrack mouth\n event 2 open\nend\n").c_str()),
              1);
    EXPECT_EQ(LogText(), "Audio file [" + (dir / "misc_data/gone.aiff") + "] does not exist.\n");
    EXPECT_EQ(theImp.sound, nullptr);
    EXPECT_EQ(theImp.soundFile, "");
    EXPECT_THAT(ghost.calls, ::testing::Contains("ShowErrorFlag()"));
    EXPECT_EQ(theImp.GetKeyTrack(0)->events.Count(), 1);
    const std::string saved = dir / "s.track";
    ASSERT_EQ(theImp.SaveTrack(saved.c_str()), 1);
    EXPECT_EQ(ReadFile(saved).rfind("fps 30\n\n", 0), 0u) << "no sound line without a sound";
}

TEST_F(TrackTest, AnUnreadableSoundIsLogged) {
    if (::geteuid() == 0)
        GTEST_SKIP() << "root reads every file";
    const std::string locked = dir / "misc_data/locked.aiff";
    WriteAiff(locked, 100, 8000);
    ::chmod(locked.c_str(), 0);
    ASSERT_EQ(theImp.LoadTrack(Track("sound locked.aiff\n").c_str()), 1);
    EXPECT_EQ(LogText(), "Audio file [" + locked + "] is unreadable.\n");
    EXPECT_EQ(theImp.sound, nullptr);
}

TEST_F(TrackTest, AFileThatIsNotASoundIsLogged) {
    WriteFile(dir / "misc_data/notes.aiff", "not a sound at all");
    ASSERT_EQ(theImp.LoadTrack(Track("sound notes.aiff\n").c_str()), 1);
    EXPECT_THAT(LogText(),
                HasSubstr("Audio file [" + (dir / "misc_data/notes.aiff") + "] could not be read"));
    EXPECT_EQ(theImp.sound, nullptr);
    EXPECT_EQ(theImp.soundFile, "");
}

struct FpsCase {
    const char* text;
    int expected;
};
class TrackFps : public TrackTest, public ::testing::WithParamInterface<FpsCase> {};

TEST_P(TrackFps, SetsOrKeepsTheRate) {
    theImp.SetFps(24);
    ASSERT_EQ(theImp.LoadTrack(Track(GetParam().text).c_str()), 1);
    EXPECT_EQ(theImp.fps, GetParam().expected);
    EXPECT_EQ(CueTime::default_fps, GetParam().expected);
}

std::string FpsCaseName(const ::testing::TestParamInfo<FpsCase>& info) {
    static const char* const names[] = {"None",       "Zero",       "Negative",
                                        "TwentyFive", "NotANumber", "ThreeTokens"};
    return names[info.index];
}

INSTANTIATE_TEST_SUITE_P(Statements, TrackFps,
                         ::testing::Values(FpsCase{"begin marktrack\nend\n", 24},
                                           FpsCase{"fps 0\n", 30}, FpsCase{"fps -2\n", 30},
                                           FpsCase{"fps 25\n", 25}, FpsCase{"fps twelve\n", 30},
                                           FpsCase{"fps 25 extra\n", 24}),
                         FpsCaseName);

TEST_F(TrackTest, AnActiveKeysetNotLoadedLeavesTheWindowAlone) {
    ASSERT_EQ(theImp.LoadTrack(Track("active_keyset lips\n").c_str()), 1);
    EXPECT_EQ(theImp.activeKeyset, -1);
    EXPECT_THAT(ghost.Calls("SetActiveKeyset"), IsEmpty());
}

TEST_F(TrackTest, SaveWritesTheActiveKeysetTheWindowReports) {
    ghost.activeKeyset = -1;
    const std::string path = dir / "a.track";
    ASSERT_EQ(theImp.SaveTrack(path.c_str()), 1);
    EXPECT_EQ(ReadFile(path),
              "fps 30\n\nbegin marktrack\nend\n\nbegin keytrack\tmouth\nend\n\n"
              "begin keytrack\t\"big mouth\"\nend\n\n");
    ghost.activeKeyset = 0;
    ASSERT_EQ(theImp.SaveTrack(path.c_str()), 1);
    EXPECT_THAT(ReadFile(path), ::testing::EndsWith("end\n\nactive_keyset mouth\n\n"));
}

TEST_F(TrackTest, AFileThatCannotBeCreatedIsToldEvenInBatchMode) {
    const std::string bad = dir / "no-dir/x.track";
    EXPECT_EQ(theImp.SaveTrack(bad.c_str()), 0);
    EXPECT_THAT(ghost.calls,
                ElementsAre("Inform(Failed to open track file [" + bad + "].|Dismiss)"));
    theImp.batchMode = 1;
    testing::internal::CaptureStderr();
    EXPECT_EQ(theImp.SaveTrack(bad.c_str()), 0);
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "Failed to open track file [" + bad + "].\n");
}

TEST_F(TrackTest, LoadSoundTakesTheNameAsItStands) {
    const std::string path = dir / "misc_data/dialogue.aiff";
    ASSERT_EQ(theImp.LoadSound(path.c_str()), 1);
    EXPECT_EQ(theImp.soundFile, path);
    EXPECT_EQ(theImp.sound->FrameCount(), 16000);
    EXPECT_EQ(theImp.trackModified, 1);
    EXPECT_EQ(theImp.duration.Ticks(), 12000);
    EXPECT_THAT(ghost.calls, ElementsAre("DisplayDuration(12000)", "InitSound(sound)"));
}

TEST_F(TrackTest, LoadSoundOfABadFileKeepsTheSoundHeld) {
    const std::string good = dir / "misc_data/dialogue.aiff";
    ASSERT_EQ(theImp.LoadSound(good.c_str()), 1);
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
    theImp.SetDuration(CueTime::FromTicks(100));
    EXPECT_EQ(theImp.duration.Ticks(), 18000);
    EXPECT_EQ(theImp.requestedDuration.Ticks(), 100);
}

}  // namespace

namespace {

TEST_F(TrackTest, DamagedTracksLoadWhatTheyCan) {
    static const char binary[] = "sound \"unterminated\nfps 99999999999\n\0\xff";
    const std::vector<std::string> cases = {
        "begin keytrack mouth\n event 3 open\n",  // no end
        "begin keytrack mouth\n event\n event x\n event 1e30 open\n event -4 open Ease nan\nend\n",
        "begin marktrack\n mark\n mark 3\n mark 2 \"\"\n",
        std::string(binary, sizeof binary - 1),
        "active_keyset\nactive_keyset a b\nbegin\nbegin keytrack\n",
    };
    for (const std::string& text : cases) {
        theImp.batchMode = 1;
        testing::internal::CaptureStderr();
        EXPECT_EQ(theImp.LoadTrack(Track(text).c_str()), 1) << text;
        testing::internal::GetCapturedStderr();
        EXPECT_GE(theImp.fps, 1);
        EXPECT_GE(theImp.duration.Ticks(), 6000);
        EXPECT_EQ(theImp.SaveTrack((dir / "after.track").c_str()), 1);
        EXPECT_EQ(theImp.LoadTrack((dir / "after.track").c_str()), 1)
            << "what was saved reads back";
    }
    theImp.SetFps(30);
}

}  // namespace
