#include "workspace/ConsoleGhost.h"

#include <iostream>

#include "workspace/Imp.h"

namespace {
ConsoleGhost console;
}  // namespace

// Constant-initialised, so it is valid before any static constructor runs.
Ghost* theGhost = &console;

ConsoleGhost& ConsoleGhost::Instance() {
    return console;
}

int ConsoleGhost::GetActiveKeyset() {
    return theImp.activeKeyset;
}

void ConsoleGhost::Inform(const char* message, const char* /*button*/) {
    std::cerr << (message ? message : "") << std::endl;
}

int ConsoleGhost::Confirm(const char* message, const char* /*yes*/, const char* /*no*/) {
    std::cerr << (message ? message : "") << std::endl << "Assuming OK" << std::endl;
    return 1;
}
