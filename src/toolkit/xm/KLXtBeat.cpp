#include "toolkit/xm/KLXtBeat.h"

#include <X11/Intrinsic.h>

#include "toolkit/KLTimerBeat.h"
#include "toolkit/xm/KLXmGnome.h"

namespace {
XtIntervalId timeout = 0;
}

void KLXtBeat::Install() {
    KLTimerBeat::SetDriver(drive);
}

void KLXtBeat::drive(bool run) {
    if (run && !timeout && KLXmGnome::AppContext()) {
        timeout = XtAppAddTimeOut(KLXmGnome::AppContext(), kIntervalMs, tick, nullptr);
    } else if (!run && timeout) {
        XtRemoveTimeOut(timeout);
        timeout = 0;
    }
}

void KLXtBeat::tick(void*, unsigned long*) {
    timeout = 0;
    KLTimerBeat::Tick();
    if (KLTimerBeat::Running())
        timeout = XtAppAddTimeOut(KLXmGnome::AppContext(), kIntervalMs, tick, nullptr);
}
