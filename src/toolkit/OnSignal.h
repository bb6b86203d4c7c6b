#pragma once

// Installs `handler` for `signal`: when the signal arrives, handler(signal, data) runs. When
// the handler returns, the signal's default action is restored and the signal raised again,
// so that a fatal signal still ends the program after the handler had its say.
//
// Handlers never run inside one another: as one starts, every signal given to OnSignal gets
// its default action back (and is unblocked), so that a second signal, or a fault inside the
// handler, ends the program at once by that signal.
using KLSignalHandler = void (*)(int signal, void* data);
bool OnSignal(int signal, KLSignalHandler handler, void* data);

// A program with an event loop can have the handlers of asynchronous signals (sent by another
// process: TERM, USR1, USR2, HUP, INT...) run from that loop instead of inside the signal
// handler, where they could interrupt malloc or stdio halfway and deadlock on their locks.
// Once deferred, such a signal is only noted and `notify` is called from the signal handler
// (so it must be async-signal-safe: write to a pipe, for one); the loop then calls
// RunDeferredSignal, which runs the handler and ends the program as above. Should the loop
// not come back within `fallbackSeconds`, SIGALRM runs the handler inside the signal handler
// after all. Further asynchronous signals while one waits are ignored (its handler is coming);
// a synchronous fault (SEGV, BUS, FPE, ILL, TRAP, SYS, ABRT) always runs its handler at once,
// as nothing better is possible.
using KLSignalNotify = void (*)();
void DeferAsynchronousSignals(KLSignalNotify notify, unsigned fallbackSeconds);
// True for the signals that a fault of the running code raises (see above).
bool IsSynchronousSignal(int signal);
// The signal noted and waiting for RunDeferredSignal, or 0.
int DeferredSignal();
// From the event loop: runs the waiting signal's handler, then ends the program as the
// handler would inside the signal handler. Does nothing when no signal waits.
void RunDeferredSignal();
