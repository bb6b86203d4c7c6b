#pragma once

#include <X11/Intrinsic.h>

// Runs the handlers of asynchronous signals (TERM, USR1, USR2...) from the event loop rather
// than inside the signal handler (see DeferAsynchronousSignals in toolkit/OnSignal.h): the
// signal handler only writes a byte to a pipe, and the loop, which watches the pipe, runs the
// handler. A loop that does not come back within `fallbackSeconds` has the handler run inside
// the signal handler after all.
class KLSignalPipe {
  public:
    // False when the pipe cannot be made; the handlers then keep running inside the signal
    // handler.
    static bool Install(XtAppContext app, unsigned fallbackSeconds);
};
