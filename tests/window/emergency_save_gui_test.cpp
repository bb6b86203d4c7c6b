// The emergency save of a running window is made by the event loop, not inside the signal
// handler, so a signal that interrupts the program while it holds a lock (malloc's, stdio's)
// does not deadlock the save. The window runs in a child process with the demo keyset and track.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <pthread.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <Xm/Xm.h>
#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include "testkit/TempDir.h"
#include "toolkit/SafeFile.h"
#include "toolkit/xm/KLSignalPipe.h"
#include "toolkit/xm/KLXmGnome.h"
#include "window/DemoProject.h"
#include "window/WindowTestUtil.h"
#include "workspace/Imp.h"

namespace fs = std::filesystem;

namespace {

struct SignalCase {
    int signal;
    // Raised by the event loop's own thread while it holds a lock that the save also takes
    // (as malloc's arena lock would be), rather than sent by another process.
    bool raisedHoldingALock;
};

int reportEnd = -1;  // the child's end of the pipe it reports on
pthread_mutex_t theLock;
SignalCase theCase;

void report(const std::string& text) {
    const ssize_t n = write(reportEnd, text.data(), text.size());
    (void)n;
}

// The save's first file opens: it takes the lock, as a save that mallocs takes malloc's.
void take_the_lock(SafeFile::Stage stage) {
    if (stage == SafeFile::Stage::Opened && pthread_mutex_lock(&theLock) != 0)
        report("the save would deadlock;");
    else if (stage == SafeFile::Stage::Opened)
        pthread_mutex_unlock(&theLock);
}

void send_inside_the_lock(XtPointer, XtIntervalId*) {
    pthread_mutex_lock(&theLock);
    ::raise(theCase.signal);
    pthread_mutex_unlock(&theLock);
}

// The child: the window with the demo, the signal pipe installed as the entry does, then
// the event loop for good.
[[noreturn]] void run_window(const std::string& project, const std::string& work) {
    struct rlimit noCore = {0, 0};
    setrlimit(RLIMIT_CORE, &noCore);
    pthread_mutexattr_t attributes;
    pthread_mutexattr_init(&attributes);
    pthread_mutexattr_settype(&attributes, PTHREAD_MUTEX_ERRORCHECK);
    pthread_mutex_init(&theLock, &attributes);
    if (chdir(work.c_str()) != 0 || !std::freopen((work + "/../child.err").c_str(), "w", stderr))
        _exit(120);
    windowtest::TheWindow();
    if (theImp.LoadKeyset((project + "/misc_data/demo.kset").c_str()) != 1 ||
        theImp.LoadTrack((project + "/misc_data/demo.track").c_str()) != 1 ||
        !KLSignalPipe::Install(KLXmGnome::AppContext(), 5))
        _exit(121);
    SafeFile::SetStageHook(take_the_lock);
    report("ready;");
    if (theCase.raisedHoldingALock)
        XtAppAddTimeOut(KLXmGnome::AppContext(), 50, send_inside_the_lock, nullptr);
    KLXmGnome::MainLoop();
    _exit(123);
}

std::string read_file(const std::string& path) {
    std::stringstream text;
    text << std::ifstream(path).rdbuf();
    return text.str();
}

// What the child reports, read until it closes its end (or, unless `toEnd`, until the first
// report), for at most `seconds`.
std::string read_reports(int fd, double seconds, bool toEnd) {
    std::string text;
    const auto limit = std::chrono::steady_clock::now() + std::chrono::duration<double>(seconds);
    char buffer[256];
    struct pollfd p = {fd, POLLIN, 0};
    while ((toEnd || text.find(';') == std::string::npos) &&
           std::chrono::steady_clock::now() < limit) {
        if (poll(&p, 1, 50) <= 0)
            continue;
        const ssize_t n = read(fd, buffer, sizeof buffer);
        if (n <= 0)
            break;
        text.append(buffer, size_t(n));
    }
    return text;
}

// The child's wait status, killing it if it has not ended within `seconds`.
int wait_for(pid_t pid, double seconds) {
    int status = 0;
    for (int i = 0; waitpid(pid, &status, WNOHANG) == 0; i++) {
        if (i > seconds * 100) {
            kill(pid, SIGKILL);
            waitpid(pid, &status, 0);
            ADD_FAILURE() << "the window did not end";
            return -1;
        }
        poll(nullptr, 0, 10);
    }
    return status;
}

class WindowEmergencySave : public ::testing::TestWithParam<SignalCase> {};

TEST_P(WindowEmergencySave, TheEventLoopSavesWithoutDeadlock) {
    theCase = GetParam();
    const std::string project = windowtest::DemoProject();
    testkit::TempDir dir;
    const std::string work = dir / "work";
    fs::create_directories(work);
    int reports[2];
    ASSERT_EQ(pipe(reports), 0);
    const pid_t pid = fork();
    ASSERT_GE(pid, 0);
    if (pid == 0) {
        close(reports[0]);
        reportEnd = reports[1];
        run_window(project, work);
    }
    close(reports[1]);
    const std::string ready = read_reports(reports[0], 60, false);
    ASSERT_EQ(ready, "ready;") << "the window did not come up: " << read_file(dir / "child.err");
    if (!theCase.raisedHoldingALock)
        kill(pid, theCase.signal);
    const std::string later = read_reports(reports[0], 30, true);
    close(reports[0]);
    const int status = wait_for(pid, 30);
    EXPECT_EQ(later, "") << "the save ran inside the signal handler, holding the lock";
    ASSERT_TRUE(WIFEXITED(status)) << "ended by signal " << WTERMSIG(status);
    EXPECT_EQ(WEXITSTATUS(status), 255);
    EXPECT_THAT(read_file(dir / "child.err"),
                testing::EndsWith("EMERGENCY SAVE ON SIGNAL " + std::to_string(theCase.signal) +
                                  " ... Done.\n"));

    std::vector<std::string> files;
    for (const auto& e : fs::directory_iterator(work))
        files.push_back(e.path().filename().string());
    std::sort(files.begin(), files.end());
    EXPECT_EQ(files, (std::vector<std::string>{"_m.keyset", "_m.track"})) << "no temporaries";
}

// USR1 sent from outside; TERM raised by the loop's thread holding the lock.
INSTANTIATE_TEST_SUITE_P(Signals, WindowEmergencySave,
                         ::testing::Values(SignalCase{SIGUSR1, false}, SignalCase{SIGTERM, true}),
                         [](const auto& info) {
                             return std::string(sigabbrev_np(info.param.signal));
                         });

}  // namespace
