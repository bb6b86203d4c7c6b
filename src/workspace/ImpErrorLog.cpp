// Imp::KLErrorLog: the error log file that collects the toolkit's reports.
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <fstream>
#include <iostream>

#include "toolkit/KLString.h"
#include "workspace/Imp.h"

Imp::KLErrorLog::KLErrorLog(const char* name) : KLErrHandler(0) {
    if (!name)
        return;
    fileName = name;
    std::ofstream out(fileName, std::ios::out | std::ios::trunc);
    if (!out)
        return;  // an unwritable log is reported message by message in append_msg
    const std::time_t now = std::time(nullptr);
    const std::tm* local = std::localtime(&now);
    // asctime ends in a newline of its own, so the header is followed by an empty line.
    out << "----------"
        << " Chirrup Error Log "
        << "----------"
        << " " << (local ? std::asctime(local) : "\n") << "\n";
}

Imp::KLErrorLog::~KLErrorLog() = default;

void Imp::KLErrorLog::append_msg(const char* text) {
    if (!text || fileName.empty())
        return;
    std::ofstream out(fileName, std::ios::out | std::ios::app);
    if (out)
        out << text;
    if (!out) {
        std::cerr << "ERROR: Unable to append to error log file, " << fileName << "." << std::endl;
        std::cerr << text << std::flush;
    }
}

void Imp::KLErrorLog::Handle(KLErr* e) {
    if (e->Level() < outputLevel)
        return;
    ++handled;
    append_msg(e->Message());
    ::theImp.UIShowErrorFlag();
}

void Imp::KLErrorLog::View() {
    const char* viewer = std::getenv("TESSEL_USER_ERROR_READER");
    if (!viewer)
        viewer = "/usr/sbin/jot -v";
    const std::string command = KLFmt("%s %s", viewer, fileName.c_str());
    std::fflush(nullptr);
    if (std::system(command.c_str()) != 0)
        KLError("Problem launching error log viewer.\n");
    if (handled != handledAtView)
        append_msg("\n---------------------------------------\n\n");
    handledAtView = handled;
}
