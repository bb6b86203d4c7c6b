// The error log, the console window interface, apply inside the program, and the emergency
// save on a fatal signal.
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstring>
#include <filesystem>

#include "WorkspaceTestUtil.h"
#include "model/KLEdlEvent.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "scene/KLWireSource.h"
#include "toolkit/SafeFile.h"
#include "workspace/ConsoleGhost.h"
#include "workspace/Imp.h"

using namespace wstest;

namespace {

using ImpTest = ProjectTest;

TEST_F(ImpTest, ErrorLogTakesReportsAtTheOutputLevel) {
    const std::string log = dir / "errlog.vx";
    theImp.SetErrorFilename(log.c_str());
    const size_t header = ReadFile(log).size();
    KLInform("not logged at the default level\n");
    KLWarning("one\n");
    KLError("two\n");
    EXPECT_THAT(ghost.calls, ElementsAre("ShowErrorFlag()", "ShowErrorFlag()"));
    KLErrHandler::outputLevel = KLErr::kStatus;
    KLStatus("shown when verbose\n");
    KLErrHandler::outputLevel = KLErrHandler::kDefaultOutputLevel;
    EXPECT_EQ(ReadFile(log).substr(header), "one\ntwo\nshown when verbose\n");

    const std::string bad = dir / "missing-dir/errlog.vx";
    theImp.SetErrorFilename(bad.c_str());
    EXPECT_EQ(StdErr([] { KLError("Audio file [a.aiff] does not exist.\n"); }),
              "ERROR: Unable to append to error log file, " + bad +
                  ".\nAudio file [a.aiff] does not exist.\n");
}

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
}

// Two keysets named "mouth", the first over the whole face, the second on "lip" only; every
// keyset of the name is applied in slot order.
TEST_F(ImpTest, ApplyCoversTheWorkspaceAndEveryKeysetOfTheName) {
    ASSERT_EQ(BatchLoadKeyset(Data("face.kset", std::string("wire face.gltf\n") + kMouth +
                                                    "begin keyset other\n key rest 0\nend\n"
                                                    "begin keyset mouth lip\n key rest 0\n"
                                                    " key wide 20\nend\n")),
              1);
    theImp.SetDuration(CueTime(0, 0, 4, 0, 0));
    ghost.calls.clear();
    theImp.OpenApplyWire((dir / "wire/face.gltf").c_str());
    KLEdlEvent& event = *theImp.applyEvent;
    EXPECT_STREQ(event.WireFile(), "face.gltf") << "held below the wire directory";
    EXPECT_EQ(event.sourceOut.Ticks(), 24000);
    EXPECT_EQ(event.destOut.Ticks(), 24000);
    EXPECT_THAT(ghost.calls, ElementsAre("UpdateApplyDialog(face.gltf)"));
    event.OpenWire();
    KLWireSource* target = event.wire.get();
    ASSERT_TRUE(target && target->Valid());

    auto key = [](int keyset, int shape, float value) {
        theImp.GetKeyTrack(keyset)->InsertKey(
            shape, CueTime::FromFrames(6), theImp.GetKeySet(keyset)->GetKeyShape(shape), 1, value);
    };
    key(0, 2, 1.0f);  // first "mouth": wide, lip TX 5, jaw TY 2
    key(2, 1, 0.5f);  // second "mouth": half of wide on lip only, lip TX 2.5
    auto apply = [](const char* keyset, const char* dag, KLWireSource* to) {
        return theImp.ApplyWire(to, keyset, dag, CueTime(), theImp.duration, CueTime());
    };
    EXPECT_EQ(apply("nobody", "head", target), 0);
    EXPECT_EQ(apply("mouth", "head", nullptr), 0);
    ghost.calls.clear();
    EXPECT_EQ(apply("mouth", "nothere", target), 0);
    const std::string told = "Inform(Cannot find base dag [nothere] for apply ...|Dismiss)";
    EXPECT_THAT(ghost.calls, ElementsAre(told, told));
    EXPECT_EQ(apply("mouth", "head", target), 1);
    const std::string out = dir / "wire/out.gltf";
    ASSERT_EQ(event.StoreWire(out.c_str()), 1);
    EXPECT_NEAR(*EvalChannel(out, "jaw", 1, 6), 2.0, 1e-4) << "from the first keyset";
    EXPECT_NEAR(*EvalChannel(out, "lip", 0, 6), 2.5, 1e-4) << "the second one wrote last";
}

struct SecondSignal {
    int signal;
    int file;  // 1: while the keyset is written, 2: while the track is
};
SecondSignal second;

// A process holding keysets (and a sound) that receives a fatal signal writes "_m.keyset" (and
// "_m.track") in its working directory and ends with status -1.
class EmergencySaveTest : public ProjectTest {
  protected:
    void SetUp() override {
        ProjectTest::SetUp();
        Data("face.kset", std::string("wire face.gltf\n") + kMouth +
                              "begin shapeset \"the brow\" jaw 4\n key down 0\n key up 1\nend\n");
        Data("t.track",
             "begin keytrack mouth\n event 3 open Linear 0.5\n event 9 wide\nend\n"
             "begin keytrack\t\"the brow\"\n event 4 up Smooth 2\nend\n");
        WriteAiff(dir / "misc_data/d.aiff", 8000);
    }

    // Forks a process that loads what is asked and then receives `sig`; its wait status.
    // `hook`, when given, watches the saves of the child.
    int Crash(int sig, bool keysets, bool sound, SafeFile::StageHook hook = nullptr) {
        const pid_t pid = ::fork();
        if (pid == 0) {
            struct rlimit noCore = {0, 0};  // a second fault must not leave a core file
            ::setrlimit(RLIMIT_CORE, &noCore);
            if (!std::freopen((dir / "child.err").c_str(), "w", stderr) ||
                ::chdir((dir / "work").c_str()))
                ::_exit(120);
            theImp.batchMode = 1;
            if ((keysets && (!theImp.LoadKeyset((dir / "misc_data/face.kset").c_str()) ||
                             !theImp.LoadTrack((dir / "misc_data/t.track").c_str()))) ||
                (sound && !theImp.LoadSound((dir / "misc_data/d.aiff").c_str())))
                ::_exit(121);
            SafeFile::SetStageHook(hook);
            ::raise(sig);
            ::_exit(122);
        }
        int status = -1;
        if (pid > 0)
            ::waitpid(pid, &status, 0);
        return status;
    }
    std::vector<std::string> WorkFiles() const {
        std::vector<std::string> names;
        for (const auto& e : std::filesystem::directory_iterator(dir / "work"))
            names.push_back(e.path().filename().string());
        return names;
    }
};

class EmergencySave : public EmergencySaveTest, public ::testing::WithParamInterface<int> {};

TEST_P(EmergencySave, WritesKeysetsAndTrackThatLoadBack) {
    const int status = Crash(GetParam(), true, true);
    ASSERT_TRUE(WIFEXITED(status));
    EXPECT_EQ(WEXITSTATUS(status), 255);
    EXPECT_EQ(ReadFile(dir / "child.err"),
              "EMERGENCY SAVE ON SIGNAL " + std::to_string(GetParam()) + " ... Done.\n");

    theImp.batchMode = 1;
    ASSERT_EQ(theImp.LoadKeyset((dir / "work/_m.keyset").c_str()), 1);
    ASSERT_EQ(theImp.LoadTrack((dir / "work/_m.track").c_str()), 1);
    ASSERT_EQ(theImp.keysetCount, 2);
    EXPECT_STREQ(theImp.GetKeySet(1)->Name(), "the brow");
    EXPECT_EQ(theImp.GetKeyTrack(0)->events.Count(), 2);
    EXPECT_EQ(theImp.GetKeyTrack(0)->Duration(), CueTime::FromFrames(9));
    EXPECT_EQ(theImp.GetKeyTrack(1)->events.Count(), 1);
    EXPECT_EQ(theImp.soundFile, dir / "misc_data/d.aiff");
}

INSTANTIATE_TEST_SUITE_P(Signals, EmergencySave,
                         ::testing::Values(SIGSEGV, SIGSYS, SIGTERM, SIGBUS, SIGFPE, SIGTRAP,
                                           SIGABRT, SIGILL, SIGUSR2, SIGUSR1),
                         [](const auto& info) { return std::string(sigabbrev_np(info.param)); });

// A second fatal signal while the emergency save is writing ends the program at once, by that
// signal: no second save starts, and the file being written is absent, not half-written.
void SecondSignalDuringSave(SafeFile::Stage stage) {
    static int files = 0;
    if (stage == SafeFile::Stage::Written && ++files == second.file)
        ::raise(second.signal);  // if survived, the save goes on, and the test says so
}

class EmergencySaveInterrupted : public EmergencySaveTest,
                                 public ::testing::WithParamInterface<SecondSignal> {};

TEST_P(EmergencySaveInterrupted, EndsAtOnceLeavingCompleteFilesOnly) {
    second = GetParam();
    const int status = Crash(SIGTERM, true, true, SecondSignalDuringSave);
    EXPECT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == second.signal)
        << (WIFEXITED(status) ? "exit " + std::to_string(WEXITSTATUS(status)) : "signal");
    EXPECT_EQ(ReadFile(dir / "child.err"), "EMERGENCY SAVE ON SIGNAL 15 ... ")
        << "one save, not finished";
    if (second.file == 1) {
        EXPECT_THAT(WorkFiles(), ::testing::IsEmpty());
    } else {
        EXPECT_THAT(WorkFiles(), ::testing::ElementsAre("_m.keyset"));
        theImp.batchMode = 1;
        EXPECT_EQ(theImp.LoadKeyset((dir / "work/_m.keyset").c_str()), 1);
        EXPECT_EQ(theImp.keysetCount, 2);
    }
}

// A fault, and signals of the save's own kind and another, arriving while a file is written.
INSTANTIATE_TEST_SUITE_P(Signals, EmergencySaveInterrupted,
                         ::testing::Values(SecondSignal{SIGSEGV, 1}, SecondSignal{SIGTERM, 1},
                                           SecondSignal{SIGUSR1, 2}),
                         [](const auto& info) {
                             return std::string(sigabbrev_np(info.param.signal)) +
                                    (info.param.file == 1 ? "_InKeyset" : "_InTrack");
                         });

TEST_F(EmergencySave, WithoutKeysetsNothingIsSavedWithoutASoundNoTrack) {
    int status = Crash(SIGTERM, false, true);
    EXPECT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGTERM)
        << "the signal takes its course";
    EXPECT_EQ(ReadFile(dir / "child.err"), "");
    EXPECT_THAT(WorkFiles(), ::testing::IsEmpty());

    WriteFile(dir / "work/_m.keyset", std::string(100000, 'x'));
    status = Crash(SIGABRT, true, false);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 255);
    const std::string saved = ReadFile(dir / "work/_m.keyset");
    EXPECT_EQ(saved.rfind("wire face.gltf 0\n\nbegin keyset mouth\n", 0), 0u) << saved;
    EXPECT_EQ(saved.find('x'), std::string::npos) << "an earlier save is replaced whole";
    EXPECT_THAT(WorkFiles(), ::testing::ElementsAre("_m.keyset")) << "no track, no temporary";
}

}  // namespace
