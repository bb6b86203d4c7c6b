#pragma once

#include <X11/Intrinsic.h>

#include <functional>

// The event loop run as the program's main loop runs it, work procedures included, for the
// window tests and the window benchmarks (a waiting test or bench otherwise never runs the
// work procedures that playback and the views' drags are made of).
namespace windowtest {

// One round: one event, timeout or work procedure; a 10 ms wake-up timeout (one at a time)
// makes sure it returns.
void PumpRound(XtAppContext context);
// Rounds until `done` returns true or `seconds` pass; what `done` last said.
bool Pump(const std::function<bool()>& done, double seconds = 5.0);

}  // namespace windowtest
