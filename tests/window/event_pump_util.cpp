#include "window/EventPump.h"

#include <chrono>

#include "toolkit/xm/KLXmGnome.h"

namespace windowtest {

void PumpRound(XtAppContext context) {
    static bool armed = false;
    if (!armed) {
        armed = true;
        XtAppAddTimeOut(
            context, 10, [](XtPointer, XtIntervalId*) { armed = false; }, nullptr);
    }
    XtAppProcessEvent(context, XtIMAll);
}

bool Pump(const std::function<bool()>& done, double seconds) {
    const auto limit = std::chrono::steady_clock::now() + std::chrono::duration<double>(seconds);
    XtAppContext context = KLXmGnome::AppContext();
    while (!done()) {
        if (std::chrono::steady_clock::now() > limit)
            return done();
        PumpRound(context);
    }
    return true;
}

}  // namespace windowtest
