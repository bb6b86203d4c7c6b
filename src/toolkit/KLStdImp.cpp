#include "toolkit/KLStdImp.h"

#include <iostream>

#include "toolkit/CuePrefs.h"

KLStdImp* KLStdImp::theImp = nullptr;

namespace {
// Stands in when no workspace object exists, so that callers may always use theImp.
KLStdImp& fallback() {
    static KLStdImp* imp = [] {
        KLStdImp* saved = KLStdImp::theImp;
        KLStdImp* made = new KLStdImp;  // lives to the end of the program
        KLStdImp::theImp = saved;
        return made;
    }();
    return *imp;
}
}  // namespace

KLStdImp& KLStdImp::Workspace() {
    return theImp ? *theImp : fallback();
}

KLStdImp::KLStdImp() {
    if (!theImp)
        theImp = this;
}

KLStdImp::~KLStdImp() {
    if (theImp == this)
        theImp = nullptr;
}

const char* KLStdImp::GetPixDirectory() {
    return CuePrefs::PixDir();
}
const char* KLStdImp::GetWireDirectory() {
    return CuePrefs::WireDir();
}
const char* KLStdImp::GetDataDirectory() {
    return CuePrefs::MiscDir();
}

void KLStdImp::Inform(const char* message, const char* /*button*/) {
    std::cerr << message << std::endl;
}

int KLStdImp::Confirm(const char* message, const char* /*yes*/, const char* /*no*/) {
    std::cerr << message << std::endl << "Assuming OK" << std::endl;
    return 1;
}
