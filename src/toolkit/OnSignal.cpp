#include "toolkit/OnSignal.h"

#include <signal.h>
#include <unistd.h>

#include <atomic>
#include <csignal>

namespace {

constexpr int kMaxSignal = 65;
KLSignalHandler handlers[kMaxSignal];
void* handler_data[kMaxSignal];

// kIdle; a positive signal number: that asynchronous signal noted, its handler waiting for
// the event loop; kHandling: a handler running (or about to), after which the program ends.
// One atomic, so that the signal noted is never seen apart from the state.
constexpr int kIdle = 0;
constexpr int kHandling = -1;
std::atomic<int> state{kIdle};
std::atomic<KLSignalNotify> deferNotify{nullptr};
std::atomic<unsigned> fallbackSeconds{0};
static_assert(std::atomic<int>::is_always_lock_free, "used inside signal handlers");
static_assert(std::atomic<KLSignalNotify>::is_always_lock_free, "used inside signal handlers");

// Gives every signal that has a handler its default action back and unblocks it.
void restore_defaults() {
    sigset_t installed;
    sigemptyset(&installed);
    for (int sig = 1; sig < kMaxSignal; ++sig) {
        if (!handlers[sig])
            continue;
        std::signal(sig, SIG_DFL);
        sigaddset(&installed, sig);
    }
    sigprocmask(SIG_UNBLOCK, &installed, nullptr);
}

// The state is kHandling: runs the handler of `sig` and then lets the signal take its course.
// The deferral's alarm is switched off (and a pending one discarded) first, so that it cannot
// end a handler that runs from the event loop.
void run_handler(int sig) {
    if (deferNotify.load()) {
        alarm(0);
        std::signal(SIGALRM, SIG_IGN);
    }
    restore_defaults();
    if (sig > 0 && sig < kMaxSignal && handlers[sig])
        handlers[sig](sig, handler_data[sig]);
    std::raise(sig);
}

// SIGALRM while a deferred signal still waits: the event loop did not come back in time, so
// its handler runs here after all.
void fallback() {
    int seen = state.load();
    if (seen > 0 && state.compare_exchange_strong(seen, kHandling))
        run_handler(seen);
    // Otherwise a late alarm: the handler already runs, or nothing was deferred.
}

void trampoline(int sig) {
    if (sig == SIGALRM && !handlers[SIGALRM]) {
        fallback();
        return;
    }
    const KLSignalNotify notify = deferNotify.load();
    const bool defer = notify && !IsSynchronousSignal(sig);
    for (;;) {
        int seen = state.load();
        if (seen == kHandling)
            break;
        if (defer) {
            if (seen > 0)
                return;  // the handler of the one noted first is on its way
            if (state.compare_exchange_weak(seen, sig)) {
                alarm(fallbackSeconds.load());
                notify();
                return;
            }
        } else if (state.compare_exchange_weak(seen, kHandling)) {
            run_handler(sig);
            return;
        }
    }
    // Another handler is running (in another thread, or this signal came in before the
    // defaults were back): this signal ends the program.
    std::signal(sig, SIG_DFL);
    std::raise(sig);
}

// The signals given to OnSignal, and the deferral's alarm when there is one.
sigset_t handled_signals() {
    sigset_t mask;
    sigemptyset(&mask);
    for (int sig = 1; sig < kMaxSignal; ++sig)
        if (handlers[sig])
            sigaddset(&mask, sig);
    if (deferNotify.load())
        sigaddset(&mask, SIGALRM);
    return mask;
}

}  // namespace

bool OnSignal(int sig, KLSignalHandler handler, void* data) {
    if (sig <= 0 || sig >= kMaxSignal)
        return false;
    handlers[sig] = handler;
    handler_data[sig] = data;
    // Every handled signal waits while the trampoline of any of them decides, until the
    // defaults are back: the handlers installed before this one get the larger mask too.
    const sigset_t mask = handled_signals();
    bool ok = true;
    for (int other = 1; other < kMaxSignal; ++other) {
        if (other != sig && !handlers[other])
            continue;
        struct sigaction action = {};
        action.sa_handler = handlers[other] ? trampoline : SIG_DFL;
        action.sa_mask = mask;
        ok = sigaction(other, &action, nullptr) == 0 && ok;
    }
    return ok;
}

bool IsSynchronousSignal(int sig) {
    switch (sig) {
        case SIGSEGV:
        case SIGBUS:
        case SIGFPE:
        case SIGILL:
        case SIGTRAP:
        case SIGSYS:
        case SIGABRT:
            return true;
        default:
            return false;
    }
}

void DeferAsynchronousSignals(KLSignalNotify notify, unsigned seconds) {
    fallbackSeconds.store(seconds > 0 ? seconds : 1);
    deferNotify.store(notify);
    struct sigaction action = {};
    action.sa_handler = notify ? trampoline : SIG_DFL;
    action.sa_mask = handled_signals();
    sigaction(SIGALRM, &action, nullptr);
}

int DeferredSignal() {
    const int seen = state.load();
    return seen > 0 ? seen : 0;
}

void RunDeferredSignal() {
    // The handled signals and the alarm wait while the handler changes hands, so that none of
    // them finds the state half-changed; run_handler unblocks the handled ones again.
    sigset_t mask = handled_signals(), before;
    sigaddset(&mask, SIGALRM);
    pthread_sigmask(SIG_BLOCK, &mask, &before);
    int seen = state.load();
    if (seen > 0 && state.compare_exchange_strong(seen, kHandling))
        run_handler(seen);
    pthread_sigmask(SIG_SETMASK, &before, nullptr);
}
