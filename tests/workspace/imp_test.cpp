// The workspace's small operations, the error log, the console window interface and saving
// through a temporary file.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <regex>

#include "WorkspaceTestUtil.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "scene/KLScene.h"
#include "toolkit/KLErrHandler.h"
#include "workspace/ConsoleGhost.h"
#include "workspace/Imp.h"
#include "workspace/SafeFile.h"

using namespace wstest;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

namespace {

class ImpTest : public ::testing::Test {
  protected:
    void SetUp() override {
        ResetWorkspace();
        ghost.calls.clear();
    }
    void TearDown() override { ResetWorkspace(); }
    // Puts keysets of these names into the workspace, as a keyset load would.
    void AddKeysets(const std::vector<std::string>& names) {
        for (const std::string& n : names) {
            const int i = theImp.keysetCount++;
            theImp.keySets[i] = std::make_unique<KLKeySet>(n.c_str(), nullptr);
            theImp.keyTracks[i] = std::make_unique<KLKeyTrack>(theImp.keySets[i].get());
        }
    }
    TempDir dir;
    RecordingGhost ghost;
    GhostScope scope{&ghost};
};

TEST_F(ImpTest, FrameRateBelowOneSelectsThirty) {
    for (int n : {0, -3}) {
        theImp.SetFps(24);
        theImp.SetFps(n);
        EXPECT_EQ(theImp.fps, 30) << n;
        EXPECT_EQ(CueTime::default_fps, 30) << n;
    }
    theImp.SetFps(25);
    EXPECT_EQ(CueTime::default_fps, 25);
    theImp.SetFps(30);
}

TEST_F(ImpTest, KeysetLookupsStayInBoundsAndFindTheFirstOfAName) {
    AddKeysets({"a", "b", "b", "c", "d", "e", "f", "g", "h", "i"});
    ASSERT_EQ(theImp.keysetCount, 10);
    EXPECT_EQ(theImp.GetKeySet(10), nullptr);
    EXPECT_EQ(theImp.GetKeySet(-1), nullptr);
    EXPECT_EQ(theImp.GetKeyTrack(10), nullptr);
    EXPECT_EQ(theImp.GetKeySet(9), theImp.keySets[9].get());
    EXPECT_EQ(theImp.GetKeySetId("b"), 1);
    EXPECT_EQ(theImp.GetKeySetId("B"), -1) << "names are case-sensitive";
    EXPECT_EQ(theImp.GetKeySet("b"), theImp.keySets[1].get());
    EXPECT_EQ(theImp.GetKeySet("zz"), nullptr);
    EXPECT_EQ(theImp.GetKeySetId(nullptr), -1);
}

TEST_F(ImpTest, FeedbackOutOfRangeKeepsTheModeButRefreshesTheScene) {
    theImp.SetFeedback(1);
    EXPECT_EQ(theImp.scene->Feedback(), 1);
    theImp.scene->Feedback(3);
    theImp.SetFeedback(7);
    EXPECT_EQ(theImp.feedback, 1);
    EXPECT_EQ(theImp.scene->Feedback(), 1) << "the scene is told the kept mode again";
    theImp.SetFeedback(2);
}

TEST_F(ImpTest, DurationAndOffsetsReachTheWindow) {
    theImp.SetDuration(CueTime(0, 0, 3, 0, 0));
    EXPECT_EQ(theImp.requestedDuration.Ticks(), 18000);
    EXPECT_EQ(theImp.duration.Ticks(), 18000);
    theImp.SetReferenceOffset(CueTime::FromTicks(600));
    theImp.SetPlayblastOffset(CueTime::FromTicks(1200));
    EXPECT_EQ(theImp.playblastOffset.Ticks(), 1200);
    EXPECT_THAT(ghost.calls, ElementsAre("DisplayDuration(18000)", "DisplayReferenceOffset(600)"));
}

// --- error log

class ErrorLogTest : public ImpTest {
  protected:
    std::string log = dir / "errlog.vx";
};

TEST_F(ErrorLogTest, HeaderIsFollowedByAnEmptyLine) {
    WriteFile(log, "old text that must go\n");
    theImp.SetErrorFilename(log.c_str());
    const std::string text = ReadFile(log);
    EXPECT_TRUE(std::regex_match(
        text, std::regex("---------- Chirrup Error Log ---------- "
                         "[A-Z][a-z]{2} [A-Z][a-z]{2} [ 0-9]\\d \\d\\d:\\d\\d:\\d\\d \\d{4}\n\n")))
        << text;
}

TEST_F(ErrorLogTest, ReportsAtOrAboveTheOutputLevelAreAppendedAndRaiseTheFlag) {
    theImp.SetErrorFilename(log.c_str());
    const size_t header = ReadFile(log).size();
    KLInform("not logged at the default level\n");
    KLWarning("Audio file [x] does not exist.\n");
    KLError("second");
    EXPECT_EQ(ReadFile(log).substr(header), "Audio file [x] does not exist.\nsecond");
    EXPECT_EQ(theImp.errorLog->handled, 2);
    EXPECT_THAT(ghost.calls, ElementsAre("ShowErrorFlag()", "ShowErrorFlag()"));

    KLErrHandler::outputLevel = KLErr::kStatus;
    KLStatus("shown when verbose\n");
    KLErrHandler::outputLevel = KLErrHandler::kDefaultOutputLevel;
    EXPECT_THAT(ReadFile(log), HasSubstr("shown when verbose\n"));
}

TEST_F(ErrorLogTest, UnwritableLogSendsEachMessageToTheErrorStream) {
    const std::string bad = dir / "missing-dir/errlog.vx";
    theImp.SetErrorFilename(bad.c_str());
    testing::internal::CaptureStderr();
    KLError("Audio file [a.aiff] does not exist.\n");
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "ERROR: Unable to append to error log file, " + bad +
                  ".\nAudio file [a.aiff] does not exist.\n");
}

TEST_F(ErrorLogTest, ViewAppendsASeparatorOnlyAfterNewMessages) {
    ScopedEnv viewer("TESSEL_USER_ERROR_READER", "true");
    theImp.SetErrorFilename(log.c_str());
    const std::string separator = "\n---------------------------------------\n\n";
    const size_t header = ReadFile(log).size();
    theImp.ViewErrorLog();
    EXPECT_EQ(ReadFile(log).size(), header) << "no messages yet: no separator";
    KLError("one\n");
    theImp.ViewErrorLog();
    theImp.ViewErrorLog();
    EXPECT_EQ(ReadFile(log).substr(header), "one\n" + separator);
    KLError("two\n");
    theImp.ViewErrorLog();
    EXPECT_EQ(ReadFile(log).substr(header), "one\n" + separator + "two\n" + separator);
    EXPECT_EQ(ghost.Calls("ClearErrorFlag").size(), 4u);
}

TEST_F(ErrorLogTest, AViewerThatFailsIsReportedIntoTheLog) {
    ScopedEnv viewer("TESSEL_USER_ERROR_READER", "false");
    theImp.SetErrorFilename(log.c_str());
    const size_t header = ReadFile(log).size();
    theImp.ViewErrorLog();
    EXPECT_EQ(ReadFile(log).substr(header),
              "Problem launching error log viewer.\n\n---------------------------------------\n\n");
}

TEST_F(ErrorLogTest, TheViewerGetsTheLogFileName) {
    const std::string seen = dir / "seen";
    const std::string command = "cp";
    ScopedEnv viewer("TESSEL_USER_ERROR_READER", ("sh -c 'cp \"$0\" " + seen + "'").c_str());
    theImp.SetErrorFilename(log.c_str());
    KLError("for the viewer\n");
    theImp.ViewErrorLog();
    EXPECT_THAT(ReadFile(seen), HasSubstr("for the viewer\n"));
}

// --- console window interface

TEST(ConsoleGhostTest, InformAndConfirmWriteToTheErrorStream) {
    ConsoleGhost& console = ConsoleGhost::Instance();
    testing::internal::CaptureStderr();
    console.Inform("Failed to open track file [t].", "Dismiss");
    const int answer =
        console.Confirm("Dag name [jaw] isn't unique, ignored.", "Continue", "Cancel");
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "Failed to open track file [t].\n"
              "Dag name [jaw] isn't unique, ignored.\nAssuming OK\n");
    EXPECT_EQ(answer, 1);
}

TEST(ConsoleGhostTest, BatchModeRoutesTheModelsQuestionsToTheConsole) {
    RecordingGhost ghost;
    GhostScope scope(&ghost);
    theImp.batchMode = 1;
    testing::internal::CaptureStderr();
    const int answer = theImp.Confirm("Could not locate apply dag [x].", "Continue", "Cancel");
    theImp.batchMode = 0;
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "Could not locate apply dag [x].\nAssuming OK\n");
    EXPECT_EQ(answer, 1);
    EXPECT_TRUE(ghost.calls.empty());
    theImp.Inform("asked interactively", "OK");
    EXPECT_THAT(ghost.calls, ElementsAre("Inform(asked interactively|OK)"));
}

// --- saving through a temporary file

std::vector<std::string> Entries(const std::string& dir) {
    std::vector<std::string> names;
    for (const auto& e : std::filesystem::directory_iterator(dir))
        names.push_back(e.path().filename().string());
    std::sort(names.begin(), names.end());
    return names;
}

TEST(SafeFileTest, CommitReplacesTheTargetAndLeavesNoTemporaryFile) {
    TempDir dir;
    WriteFile(dir / "a.track", "old\n");
    ::chmod((dir / "a.track").c_str(), 0640);
    {
        SafeFile file(dir / "a.track");
        ASSERT_TRUE(file.IsOpen());
        file.Stream() << "new\n";
        EXPECT_EQ(ReadFile(dir / "a.track"), "old\n") << "nothing changes before Commit";
        EXPECT_TRUE(file.Commit());
    }
    EXPECT_EQ(ReadFile(dir / "a.track"), "new\n");
    EXPECT_THAT(Entries(dir.path()), ElementsAre("a.track"));
    struct stat st;
    ASSERT_EQ(::stat((dir / "a.track").c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0640u) << "the replaced file's permissions are kept";
}

TEST(SafeFileTest, AbandonedSaveLeavesTheTargetAlone) {
    TempDir dir;
    WriteFile(dir / "a.keyset", "precious\n");
    {
        SafeFile file(dir / "a.keyset");
        file.Stream() << "half written";
    }
    EXPECT_EQ(ReadFile(dir / "a.keyset"), "precious\n");
    EXPECT_THAT(Entries(dir.path()), ElementsAre("a.keyset"));
}

TEST(SafeFileTest, UncreatableFilesAreRefused) {
    TempDir dir;
    EXPECT_FALSE(SafeFile(dir / "no-such-dir/a.keyset").IsOpen());
    EXPECT_FALSE(SafeFile(dir.path()).IsOpen()) << "a directory is not a file";
    EXPECT_FALSE(SafeFile("").IsOpen());
}

}  // namespace
