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
    struct sigaction action = {};
    action.sa_handler = handler ? trampoline : SIG_DFL;
    // The handled signals wait while the trampoline decides, until the defaults are back.
    sigemptyset(&action.sa_mask);
    for (int other = 1; other < kMaxSignal; ++other)
        if (handlers[other])
            sigaddset(&action.sa_mask, other);
    return sigaction(sig, &action, nullptr) == 0;
}
