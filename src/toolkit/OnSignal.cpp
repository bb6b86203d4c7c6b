#include "toolkit/OnSignal.h"

#include <csignal>

namespace {

constexpr int kMaxSignal = 65;
KLSignalHandler handlers[kMaxSignal];
void* handler_data[kMaxSignal];

void trampoline(int sig) {
    if (sig > 0 && sig < kMaxSignal && handlers[sig])
        handlers[sig](sig, handler_data[sig]);
    std::signal(sig, SIG_DFL);
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
    sigemptyset(&action.sa_mask);
    action.sa_flags = SA_NODEFER;
    return sigaction(sig, &action, nullptr) == 0;
}
