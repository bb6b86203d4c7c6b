// Signal handlers deferred to an event loop: an asynchronous signal is only noted, its handler
// runs when the loop asks; faults, a stuck loop and a second signal behave as without deferral.
// Each case runs in a child process, which the signal ends.

#include <fcntl.h>
#include <poll.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <cstring>
#include <string>

#include "toolkit/OnSignal.h"
#include "toolkit_test_util.h"

namespace {

int loopPipe[2];    // the "event loop" is woken through this pipe
int reportPipe[2];  // the child tells the test what happened, in order

void report(const char* text) {
    const ssize_t n = write(reportPipe[1], text, strlen(text));
    (void)n;
}

void wake_loop() {
    const char byte = 1;
    const ssize_t n = write(loopPipe[1], &byte, 1);
    (void)n;
}

bool loop_woken() {
    struct pollfd p = {loopPipe[0], POLLIN, 0};
    return poll(&p, 1, 0) == 1;
}

// The handler under test: says which signal it runs for; `raiseInside` raises a second
// signal from inside it, as a fault or another signal during an emergency save would.
int raiseInside = 0;
void handler(int sig, void*) {
    report(("handler " + std::to_string(sig) + ";").c_str());
    if (raiseInside)
        ::raise(raiseInside);
    report("handler done;");
}

struct Deferral {
    const char* name;
    void (*child)();     // runs in the child after the handlers are installed and deferred
    int endedBy;         // the signal that ends the child
    const char* events;  // what the child reported, in order
};

class DeferredSignals : public ::testing::TestWithParam<Deferral> {};

TEST_P(DeferredSignals, RunAsTheLoopAsksAndEndTheProgramAsBefore) {
    const Deferral& c = GetParam();
    ASSERT_EQ(pipe(loopPipe), 0);
    ASSERT_EQ(pipe(reportPipe), 0);
    fcntl(loopPipe[1], F_SETFL, O_NONBLOCK);
    const int status = InChild([&] {
        struct rlimit noCore = {0, 0};
        setrlimit(RLIMIT_CORE, &noCore);
        for (int sig : {SIGSEGV, SIGBUS, SIGTERM, SIGUSR1, SIGUSR2})
            OnSignal(sig, handler, nullptr);
        DeferAsynchronousSignals(wake_loop, 1);
        c.child();
        _exit(99);
    });
    close(reportPipe[1]);  // the child's reports are all in the pipe now
    std::string events;
    char buffer[256];
    for (ssize_t n; (n = read(reportPipe[0], buffer, sizeof buffer)) > 0;)
        events.append(buffer, size_t(n));
    for (int fd : {reportPipe[0], loopPipe[0], loopPipe[1]})
        close(fd);
    EXPECT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == c.endedBy) << "wait status " << status;
    EXPECT_EQ(events, c.events);
}

INSTANTIATE_TEST_SUITE_P(
    Cases, DeferredSignals,
    ::testing::Values(
        // The loop asks for the noted signal's handler once woken, not before.
        Deferral{"NotedThenRunByTheLoop",
                 [] {
                     RunDeferredSignal();  // nothing waiting: nothing runs
                     ::raise(SIGTERM);
                     report(DeferredSignal() == SIGTERM ? "noted;" : "not noted;");
                     report(loop_woken() ? "woken;" : "not woken;");
                     RunDeferredSignal();
                 },
                 SIGTERM, "noted;woken;handler 15;handler done;"},
        // USR1 and USR2 are deferred as well; a second asynchronous signal while one waits is
        // ignored.
        Deferral{"SecondWhileWaitingIsIgnored",
                 [] {
                     ::raise(SIGUSR1);
                     ::raise(SIGUSR2);
                     ::raise(SIGTERM);
                     report(DeferredSignal() == SIGUSR1 ? "noted;" : "not noted;");
                     RunDeferredSignal();
                 },
                 SIGUSR1, "noted;handler 10;handler done;"},
        // The loop never comes back: the alarm runs the handler inside the signal handler.
        Deferral{"LoopNeverComesBack",
                 [] {
                     ::raise(SIGTERM);
                     report("noted;");
                     for (;;)
                         ::pause();
                 },
                 SIGTERM, "noted;handler 15;handler done;"},
        // A fault while a signal waits saves at once, for the fault; a fault is never deferred.
        Deferral{"FaultWhileWaiting",
                 [] {
                     ::raise(SIGTERM);
                     report("noted;");
                     ::raise(SIGSEGV);
                     report("survived;");
                 },
                 SIGSEGV, "noted;handler 11;handler done;"},
        // A second signal while the loop runs the handler ends the program at once, by it.
        Deferral{"SecondSignalDuringTheHandler",
                 [] {
                     raiseInside = SIGTERM;
                     ::raise(SIGUSR1);
                     RunDeferredSignal();
                 },
                 SIGTERM, "handler 10;"}),
    [](const auto& info) { return std::string(info.param.name); });

}  // namespace
