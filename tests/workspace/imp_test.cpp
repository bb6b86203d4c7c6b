// The workspace's small operations, the error log and its viewer, the console window
// interface, saving through a temporary file, and apply inside the program.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>

#include "WorkspaceTestUtil.h"
#include "model/KLEdlEvent.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "scene/KLScene.h"
#include "scene/KLWireSource.h"
#include "toolkit/KLErrHandler.h"
#include "workspace/ConsoleGhost.h"
#include "workspace/Imp.h"
#include "workspace/SafeFile.h"

using namespace wstest;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

namespace {

using ImpTest = ProjectTest;

TEST_F(ImpTest, KeysetLookupsStayInBoundsAndFindTheFirstOfAName) {
    for (const char* n : {"a", "b", "b", "c", "d", "e", "f", "g", "h", "i"}) {
        const int i = theImp.keysetCount++;
        theImp.keySets[i] = std::make_unique<KLKeySet>(n, nullptr);
        theImp.keyTracks[i] = std::make_unique<KLKeyTrack>(theImp.keySets[i].get());
    }
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
    theImp.scene->Feedback(3);
    theImp.SetFeedback(7);
    EXPECT_EQ(theImp.feedback, 1);
    EXPECT_EQ(theImp.scene->Feedback(), 1) << "the scene is told the kept mode again";
    theImp.SetFeedback(2);
}

// --- error log

TEST_F(ImpTest, ReportsAtOrAboveTheOutputLevelAreLoggedAndRaiseTheFlag) {
    const std::string log = dir / "errlog.vx";
    theImp.SetErrorFilename(log.c_str());
    const size_t header = ReadFile(log).size();
    KLInform("not logged at the default level\n");
    KLWarning("Audio file [x] does not exist.\n");
    KLError("second");
    EXPECT_EQ(ReadFile(log).substr(header), "Audio file [x] does not exist.\nsecond");
    EXPECT_THAT(ghost.calls, ElementsAre("ShowErrorFlag()", "ShowErrorFlag()"));
    KLErrHandler::outputLevel = KLErr::kStatus;
    KLStatus("shown when verbose\n");
    KLErrHandler::outputLevel = KLErrHandler::kDefaultOutputLevel;
    EXPECT_THAT(ReadFile(log), HasSubstr("shown when verbose\n"));

    const std::string bad = dir / "missing-dir/errlog.vx";
    theImp.SetErrorFilename(bad.c_str());
    EXPECT_EQ(StdErr([] { KLError("Audio file [a.aiff] does not exist.\n"); }),
              "ERROR: Unable to append to error log file, " + bad +
                  ".\nAudio file [a.aiff] does not exist.\n");
}

TEST_F(ImpTest, ViewingAppendsASeparatorOnlyAfterNewMessages) {
    const std::string log = dir / "errlog.vx", seen = dir / "seen";
    const std::string separator = "\n---------------------------------------\n\n";
    std::optional<ScopedEnv> viewer;
    viewer.emplace("TESSEL_USER_ERROR_READER", ("sh -c 'cp \"$0\" " + seen + "'").c_str());
    theImp.SetErrorFilename(log.c_str());
    const size_t header = ReadFile(log).size();
    theImp.ViewErrorLog();
    EXPECT_EQ(ReadFile(log).size(), header) << "no messages yet: no separator";
    KLError("one\n");
    theImp.ViewErrorLog();
    EXPECT_EQ(ReadFile(seen).substr(header), "one\n") << "the viewer gets the log";
    theImp.ViewErrorLog();
    KLError("two\n");
    viewer.reset();
    viewer.emplace("TESSEL_USER_ERROR_READER", "false");
    theImp.ViewErrorLog();
    EXPECT_EQ(ReadFile(log).substr(header),
              "one\n" + separator + "two\n" + "Problem launching error log viewer.\n" + separator);
    EXPECT_EQ(ghost.Calls("ClearErrorFlag").size(), 4u);
}

// --- console window interface

TEST_F(ImpTest, TheConsoleAndBatchModeAnswerOnTheErrorStream) {
    int answer = 0;
    EXPECT_EQ(StdErr([&] {
                  ConsoleGhost::Instance().Inform("Failed to open track file [t].", "Dismiss");
                  answer = ConsoleGhost::Instance().Confirm("Dag [jaw]?", "Continue", "Cancel");
              }),
              "Failed to open track file [t].\nDag [jaw]?\nAssuming OK\n");
    EXPECT_EQ(answer, 1);
    theImp.batchMode = 1;
    EXPECT_EQ(StdErr([&] { answer = theImp.Confirm("Could not locate [x].", "Go", "Stop"); }),
              "Could not locate [x].\nAssuming OK\n");
    EXPECT_EQ(answer, 1);
    EXPECT_THAT(ghost.calls, IsEmpty());
    theImp.batchMode = 0;
    theImp.Inform("asked interactively", "OK");
    EXPECT_THAT(ghost.calls, ElementsAre("Inform(asked interactively|OK)"));
}

// --- saving through a temporary file

TEST_F(ImpTest, SafeFileReplacesOnCommitOnlyAndLeavesNoTemporaryFile) {
    const std::string target = dir / "work/a.track";
    WriteFile(target, "old\n");
    ::chmod(target.c_str(), 0640);
    {
        SafeFile abandoned(target);
        abandoned.Stream() << "half written";
    }
    EXPECT_EQ(ReadFile(target), "old\n");
    {
        SafeFile file(target);
        ASSERT_TRUE(file.IsOpen());
        file.Stream() << "new\n";
        EXPECT_EQ(ReadFile(target), "old\n") << "nothing changes before Commit";
        EXPECT_TRUE(file.Commit());
    }
    EXPECT_EQ(ReadFile(target), "new\n");
    struct stat st;
    ASSERT_EQ(::stat(target.c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0640u) << "the replaced file's permissions are kept";
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(dir / "work"), {}), 1);
    EXPECT_FALSE(SafeFile(dir / "no-such-dir/a.keyset").IsOpen());
    EXPECT_FALSE(SafeFile(dir.path()).IsOpen()) << "a directory is not a file";
    EXPECT_FALSE(SafeFile("").IsOpen());
}

// --- apply: two keysets named "mouth", the first over the whole face, the second on "lip"

class ApplyTest : public ProjectTest {
  protected:
    void SetUp() override {
        ProjectTest::SetUp();
        ASSERT_EQ(BatchLoadKeyset(Data("face.kset", std::string("wire face.gltf\n") + kMouth +
                                                        "begin keyset other\n key rest 0\n"
                                                        " key wide 20\nend\n"
                                                        "begin keyset mouth lip\n key rest 0\n"
                                                        " key wide 20\nend\n")),
                  1);
        theImp.SetDuration(CueTime(0, 0, 4, 0, 0));
        ghost.calls.clear();
        theImp.OpenApplyWire((dir / "wire/face.gltf").c_str());
        theImp.applyEvent->OpenWire();
        target = theImp.applyEvent->wire.get();
        ASSERT_TRUE(target && target->Valid());
    }
    void Key(int keyset, double frame, int shape, float value) {
        theImp.GetKeyTrack(keyset)->InsertKey(shape, CueTime::FromFrames(frame),
                                              theImp.GetKeySet(keyset)->GetKeyShape(shape), 1,
                                              value);
    }
    int Apply(const char* keyset, const char* dag, KLWireSource* to) {
        return theImp.ApplyWire(to, keyset, dag, CueTime(), theImp.duration, CueTime());
    }
    KLWireSource* target = nullptr;
};

TEST_F(ApplyTest, TheApplyEventCoversTheWholeWorkspace) {
    EXPECT_STREQ(theImp.applyEvent->WireFile(), "face.gltf") << "held below the wire directory";
    EXPECT_EQ(theImp.applyEvent->sourceIn, CueTime());
    EXPECT_EQ(theImp.applyEvent->sourceOut.Ticks(), 24000);
    EXPECT_EQ(theImp.applyEvent->destIn, CueTime());
    EXPECT_EQ(theImp.applyEvent->destOut.Ticks(), 24000);
    EXPECT_THAT(ghost.calls, ElementsAre("UpdateApplyDialog(face.gltf)"));
    theImp.OpenApplyWire("/elsewhere/b.gltf");
    EXPECT_STREQ(theImp.applyEvent->WireFile(), "/elsewhere/b.gltf");
}

TEST_F(ApplyTest, EveryKeysetOfTheNameIsAppliedInSlotOrder) {
    Key(0, 0, 0, 1.0f);
    Key(0, 6, 2, 1.0f);  // first "mouth": wide, lip TX 5, jaw TY 2
    Key(2, 6, 1, 0.5f);  // second "mouth": half of wide on lip only, lip TX 2.5
    Key(1, 3, 1, 1.0f);
    EXPECT_EQ(Apply("other", "head", target), 1);
    EXPECT_EQ(Apply("nobody", "head", target), 0);
    EXPECT_EQ(Apply("mouth", "head", nullptr), 0);
    ghost.calls.clear();
    EXPECT_EQ(Apply("mouth", "nothere", target), 0);
    EXPECT_THAT(ghost.calls,
                ElementsAre("Inform(Cannot find base dag [nothere] for apply ...|Dismiss)",
                            "Inform(Cannot find base dag [nothere] for apply ...|Dismiss)"));
    EXPECT_EQ(Apply("mouth", "head", target), 1);
    EXPECT_EQ(KLWireSource::Active(), theImp.wireSource.get()) << "the workspace's scene again";
    const std::string out = dir / "wire/out.gltf";
    ASSERT_EQ(theImp.applyEvent->StoreWire(out.c_str()), 1);
    EXPECT_NEAR(*EvalChannel(out, "jaw", 1, 6), 2.0, 1e-4) << "from the first keyset";
    EXPECT_NEAR(*EvalChannel(out, "lip", 0, 6), 2.5, 1e-4) << "the second one wrote last";
}

}  // namespace
