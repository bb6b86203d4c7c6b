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
