// The emergency save: a process holding keysets (and a sound) that receives a fatal signal
// writes "_m.keyset" (and "_m.track") in its working directory and ends with status -1.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstring>
#include <filesystem>

#include "WorkspaceTestUtil.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "workspace/Imp.h"

using namespace wstest;

namespace {

struct Outcome {
    int status = -1;  // exit status when it exited
    int signal = 0;   // the signal that ended it otherwise
    std::string err;  // what it wrote on the error stream
};

class EmergencySave : public ProjectTest, public ::testing::WithParamInterface<int> {
  protected:
    void SetUp() override {
        ProjectTest::SetUp();
        Data("face.kset", std::string("wire face.gltf\n") + kMouth +
                              "begin shapeset \"the brow\" jaw 4\n key down 0\n key up 1\nend\n");
        Data("t.track",
             "begin keytrack mouth\n event 3 open Linear 0.5\n event 9 wide\nend\n"
             "begin keytrack\t\"the brow\"\n event 4 up Smooth 2\nend\n");
        WriteAiff(dir / "misc_data/d.aiff", 8000, 8000);
    }

    // Forks a process that loads what is asked, waits for `sig`, and reports how it ended.
    Outcome Crash(int sig, bool keysets, bool sound) {
        int ready[2];
        EXPECT_EQ(::pipe(ready), 0);
        const std::string errPath = dir / "child.err";
        const pid_t pid = ::fork();
        if (pid == 0) {
            ::close(ready[0]);
            if (!std::freopen(errPath.c_str(), "w", stderr) || ::chdir((dir / "work").c_str()))
                ::_exit(120);
            theImp.batchMode = 1;
            if (keysets && (!theImp.LoadKeyset((dir / "misc_data/face.kset").c_str()) ||
                            !theImp.LoadTrack((dir / "misc_data/t.track").c_str())))
                ::_exit(121);
            if (sound && !theImp.LoadSound((dir / "misc_data/d.aiff").c_str()))
                ::_exit(122);
            ::alarm(30);  // never outlive the test
            if (::write(ready[1], "r", 1) != 1)
                ::_exit(123);
            for (;;)
                ::pause();
        }
        ::close(ready[1]);
        char byte = 0;
        if (::read(ready[0], &byte, 1) == 1)
            ::kill(pid, sig);
        ::close(ready[0]);
        int status = 0;
        ::waitpid(pid, &status, 0);
        Outcome o;
        if (WIFEXITED(status))
            o.status = WEXITSTATUS(status);
        if (WIFSIGNALED(status))
            o.signal = WTERMSIG(status);
        o.err = ReadFile(errPath);
        return o;
    }
    std::vector<std::string> WorkFiles() const {
        std::vector<std::string> names;
        for (const auto& e : std::filesystem::directory_iterator(dir / "work"))
            names.push_back(e.path().filename().string());
        return names;
    }
};

TEST_P(EmergencySave, WritesKeysetsAndTrackThatLoadBack) {
    const int sig = GetParam();
    const Outcome o = Crash(sig, true, true);
    EXPECT_EQ(o.signal, 0);
    EXPECT_EQ(o.status, 255);
    EXPECT_EQ(o.err, "EMERGENCY SAVE ON SIGNAL " + std::to_string(sig) + " ... Done.\n");

    theImp.batchMode = 1;
    ASSERT_EQ(theImp.LoadKeyset((dir / "work/_m.keyset").c_str()), 1);
    ASSERT_EQ(theImp.LoadTrack((dir / "work/_m.track").c_str()), 1);
    ASSERT_EQ(theImp.keysetCount, 2);
    EXPECT_STREQ(theImp.GetKeySet(1)->Name(), "the brow");
    EXPECT_EQ(theImp.GetKeyTrack(0)->events.Count(), 2);
    EXPECT_EQ(theImp.GetKeyTrack(0)->Duration(), CueTime::FromFrames(9));
    EXPECT_EQ(theImp.GetKeyTrack(1)->events.Count(), 1);
    ASSERT_NE(theImp.sound, nullptr);
    EXPECT_EQ(theImp.soundFile, dir / "misc_data/d.aiff");
}

// Segmentation violation, bad system call, termination, bus error, floating-point exception,
// trap, abort, illegal instruction, and the two user signals.
INSTANTIATE_TEST_SUITE_P(Signals, EmergencySave,
                         ::testing::Values(SIGSEGV, SIGSYS, SIGTERM, SIGBUS, SIGFPE, SIGTRAP,
                                           SIGABRT, SIGILL, SIGUSR2, SIGUSR1),
                         [](const auto& info) { return std::string(sigabbrev_np(info.param)); });

TEST_F(EmergencySave, WithoutKeysetsNothingIsSavedWithoutASoundNoTrack) {
    Outcome o = Crash(SIGTERM, false, true);
    EXPECT_EQ(o.signal, SIGTERM) << "the signal takes its course";
    EXPECT_EQ(o.err, "");
    EXPECT_THAT(WorkFiles(), ::testing::IsEmpty());

    WriteFile(dir / "work/_m.keyset", std::string(100000, 'x'));
    o = Crash(SIGABRT, true, false);
    EXPECT_EQ(o.status, 255);
    const std::string saved = ReadFile(dir / "work/_m.keyset");
    EXPECT_EQ(saved.rfind("wire face.gltf 0\n\nbegin keyset mouth\n", 0), 0u) << saved;
    EXPECT_EQ(saved.find('x'), std::string::npos) << "an earlier save is replaced whole";
    EXPECT_THAT(WorkFiles(), ::testing::ElementsAre("_m.keyset")) << "no track, no temporary";
}

}  // namespace
