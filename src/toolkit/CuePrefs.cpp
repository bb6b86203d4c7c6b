#include "toolkit/CuePrefs.h"

#include <unistd.h>

#include <climits>
#include <cstdlib>

#include "toolkit/KLFilePath.h"

namespace {

struct Dirs {
    bool known = false;
    std::string project, misc, wire, pix, help, location;
};

Dirs& dirs() {
    static Dirs d;
    if (!d.known) {
        d.known = true;
        const char* project = CuePrefs::Variable("TESSEL_PROJECT");
        d.project = project ? project : "";
        while (d.project.size() > 1 && d.project.back() == '/')
            d.project.pop_back();
        if (!d.project.empty()) {
            const char* misc = CuePrefs::Variable("TESSEL_MISC_DIR");
            d.misc = d.project + "/" + (misc ? misc : "misc_data");
            d.wire = d.project + "/wire";
            d.pix = d.project + "/pix";
        } else {
            d.misc = d.wire = d.pix = "";
        }
        char exe[PATH_MAX];
        const ssize_t n = ::readlink("/proc/self/exe", exe, sizeof exe - 1);
        if (n > 0) {
            exe[n] = '\0';
            d.location = KLFilePath::Directory(KLFilePath::Directory(exe).c_str());
        } else {
            d.location = ".";
        }
        d.help = d.location + "/share/doc/chirrup/html";
    }
    return d;
}

const char* or_null(const std::string& s) {
    return s.empty() ? nullptr : s.c_str();
}

}  // namespace

const char* CuePrefs::Project() {
    return or_null(dirs().project);
}
const char* CuePrefs::WorkEnv() {
    return or_null(dirs().project);
}
const char* CuePrefs::MiscDir() {
    return or_null(dirs().misc);
}
const char* CuePrefs::WireDir() {
    return or_null(dirs().wire);
}
const char* CuePrefs::PixDir() {
    return or_null(dirs().pix);
}
const char* CuePrefs::HelpDir() {
    return or_null(dirs().help);
}
const char* CuePrefs::Location() {
    return or_null(dirs().location);
}

void CuePrefs::SetProject(const char* dir) {
    if (dir && *dir)
        ::setenv("TESSEL_PROJECT", dir, 1);
    else
        ::unsetenv("TESSEL_PROJECT");
    Refresh();
}

const char* CuePrefs::Variable(const char* name) {
    const char* v = name ? std::getenv(name) : nullptr;
    return (v && *v) ? v : nullptr;
}

void CuePrefs::Refresh() {
    dirs().known = false;
}
