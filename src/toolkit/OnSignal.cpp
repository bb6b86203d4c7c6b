#include "toolkit/OnSignal.h"

#include <signal.h>

#include <csignal>

namespace {

constexpr int kMaxSignal = 65;
KLSignalHandler handlers[kMaxSignal];
void* handler_data[kMaxSignal];
volatile sig_atomic_t handling = 0;

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

void trampoline(int sig) {
    if (handling) {
        // Another handler is running (in another thread, or this signal came in before the
        // defaults were back): this signal ends the program.
        std::signal(sig, SIG_DFL);
        std::raise(sig);
        return;
    }
    handling = 1;
    restore_defaults();
    if (sig > 0 && sig < kMaxSignal && handlers[sig])
        handlers[sig](sig, handler_data[sig]);
    std::raise(sig);
}

}  // namespace

bool OnSignal(int sig, KLSignalHandler handler, void* data) {
    if (sig <= 0 || sig >= kMaxSignal)
        return false;
    handlers[sig] = handler;
    handler_data[sig] = data;
    // Every handled signal waits while the trampoline of any of them decides, until the
    // defaults are back: the handlers installed before this one get the larger mask too.
    sigset_t mask;
    sigemptyset(&mask);
    for (int other = 1; other < kMaxSignal; ++other)
        if (handlers[other])
            sigaddset(&mask, other);
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
