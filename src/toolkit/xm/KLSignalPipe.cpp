#include "toolkit/xm/KLSignalPipe.h"

#include <fcntl.h>
#include <unistd.h>

#include "toolkit/OnSignal.h"

namespace {

int pipeEnds[2] = {-1, -1};

// Inside the signal handler: one write, nothing else. A full pipe already wakes the loop.
void notify_loop() {
    const char byte = 1;
    const ssize_t written = write(pipeEnds[1], &byte, 1);
    (void)written;
}

void pipe_readable(XtPointer, int* fd, XtInputId*) {
    char bytes[64];
    while (read(*fd, bytes, sizeof bytes) > 0) {
    }
    RunDeferredSignal();
}

}  // namespace

bool KLSignalPipe::Install(XtAppContext app, unsigned fallbackSeconds) {
    if (pipeEnds[0] >= 0)
        return true;
    if (pipe2(pipeEnds, O_NONBLOCK | O_CLOEXEC) != 0) {
        pipeEnds[0] = pipeEnds[1] = -1;
        return false;
    }
    XtAppAddInput(app, pipeEnds[0], reinterpret_cast<XtPointer>(XtInputReadMask), pipe_readable,
                  nullptr);
    DeferAsynchronousSignals(notify_loop, fallbackSeconds);
    return true;
}
