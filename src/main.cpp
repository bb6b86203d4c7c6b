// chirrup's entry: environment, command line, error log, then batch mode or the window.
#include <cstdlib>
#include <cstring>
#include <iostream>
#include <string>

#include "scene/KLWire.h"
#include "toolkit/CuePrefs.h"
#include "toolkit/CueTime.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLFilePath.h"
#include "toolkit/KLString.h"
#include "window/FallbackResources.h"
#include "window/Gnome.h"
#include "workspace/ConsoleGhost.h"
#include "workspace/Imp.h"

namespace {

const char* const kBuildStamp = "9704300208";

void banner() {
    std::cerr << "Tessel|Marlin Parlando and Facial Animation Version 2.0 (" << kBuildStamp << ")"
              << std::endl;
}

void usage() {
    std::cerr << " usage: chirrup [-e STRING] [-fps #] [-nogeom]\n"
              << "            [-v] [-tess # #] [-B track apply dag off out] infile\n"
              << "\n"
              << "\t-nogeom\t\tSuppress loading of geometry (images only)\n"
              << "\t-v \t\tShow all messages (verbose)\n"
              << "\t-a \t\tEnable a beep on keyframe insertion\n"
              << "\t-fps #\t\tSet the frames per second to #\n"
              << "\t-tess # #\tSet the U and V tesselation level\n"
              << "\t-e STRING\tSet the error file to STRING\n"
              << "\t-B track apply dag off out\n"
              << " \t\t\tUse batch mode; track is the trackfile name,\n"
              << " \t\t\tdag is the apply dag, off is the frame offset, \n"
              << " \t\t\tout is the output filename\n"
              << std::flush;
}

// The five arguments of "-B", as given.
struct BatchArgs {
    std::string track, apply, dag, off, out;
};

}  // namespace

int main(int argc, char** argv) {
    KLWire::Initialize();

    if (const char* v = std::getenv("VX_FPS")) {
        const int n = std::atoi(v);
        if (n >= 0)
            theImp.SetFps(n);
    }
    if (std::getenv("VX_VERBOSE"))
        KLErrHandler::outputLevel = KLErr::kStatus;
    if (std::getenv("VX_AUDIO"))
        theImp.beep = 1;

    const char* errorFile = nullptr;
    int tessU = 1, tessV = 1;
    BatchArgs batch;

    // Options run while the next argument begins with "-"; the first other argument is the
    // keyset description (infile).
    int i = 1;
    while (i < argc && argv[i][0] == '-') {
        const char* opt = argv[i];
        const int left = argc - i - 1;  // arguments after this option
        if (!std::strcmp(opt, "-nogeom")) {
            theImp.loadGeometry = 0;
            theImp.geometryActive = 0;
            i += 1;
        } else if (!std::strcmp(opt, "-v")) {
            KLErrHandler::outputLevel = KLErr::kStatus;
            i += 1;
        } else if (!std::strcmp(opt, "-a")) {
            theImp.beep = 1;
            i += 1;
        } else if (!std::strcmp(opt, "-fps")) {
            if (left >= 1) {
                const int n = std::atoi(argv[i + 1]);
                if (n >= 0)
                    theImp.SetFps(n);
                i += 2;
            } else {
                theImp.SetFps(0);
                i += 1;
            }
        } else if (!std::strcmp(opt, "-tess")) {
            if (left >= 2) {
                tessU = std::atoi(argv[i + 1]);
                tessV = std::atoi(argv[i + 2]);
                i += 3;
            } else {
                std::cerr << "-tess needs two numbers; the tesselation levels stay at " << tessU
                          << " " << tessV << "." << std::endl;
                i = argc;
            }
        } else if (!std::strcmp(opt, "-i")) {
            banner();
            return 0;
        } else if (!std::strcmp(opt, "-H") || !std::strcmp(opt, "-h")) {
            banner();
            usage();
            return 0;
        } else if (!std::strcmp(opt, "-e")) {
            if (left >= 1) {
                errorFile = argv[i + 1];
                i += 2;
            } else {
                std::cerr << "-e needs a file name; the error log keeps its usual name."
                          << std::endl;
                i += 1;
            }
        } else if (!std::strcmp(opt, "-B")) {
            if (left < 5) {
                std::cerr << "-B needs five arguments: track apply dag off out" << std::endl;
                return 1;
            }
            batch = {argv[i + 1], argv[i + 2], argv[i + 3], argv[i + 4], argv[i + 5]};
            theImp.batchMode = 1;
            i += 6;
        } else {
            std::cerr << "Unknown switch [" << opt << "]" << std::endl;
            i += 1;
        }
    }
    // What remains: the infile, if any (the program name stands before it).
    const char* infile = i < argc ? argv[i] : nullptr;

    if (errorFile) {
        theImp.SetErrorFilename(errorFile);
    } else if (const char* env = CuePrefs::WorkEnv()) {
        theImp.SetErrorFilename(KLFmt("%s/errlog.vx", env).c_str());
    } else {
        theImp.SetErrorFilename("errlog.vx");
    }

    theImp.tessU = tessU;
    theImp.tessV = tessV;

    if (theImp.batchMode) {
        theGhost = &ConsoleGhost::Instance();
        if (infile) {
            const char* data = CuePrefs::MiscDir();
            const char* wires = CuePrefs::WireDir();
            const std::string track = KLFilePath::Join(data, batch.track.c_str());
            const std::string apply = KLFilePath::Join(wires, batch.apply.c_str());
            const std::string out = KLFilePath::Join(wires, batch.out.c_str());
            const std::string keysets = KLFilePath::Join(data, infile);
            const CueTime offset = CueTime::FromFrames(std::atoi(batch.off.c_str()));
            theImp.BatchApply(keysets.c_str(), track.c_str(), apply.c_str(), out.c_str(),
                              batch.dag.c_str(), offset);
        }
        return 0;
    }

    // The window: built from its widget table, then the infile is loaded once the event loop
    // runs, so that the load's questions and status show in the window.
    static Gnome gnome;
    theGhost = &gnome;
    int xargc = 1;  // the toolkit sees only the program name: the options are ours
    char* xargv[] = {argv[0], nullptr};
    if (!gnome.Initialize("chirrup", "Chirrup", widget_spec, &xargc, xargv,
                          chirrup_fallback_resources())) {
        theGhost = &ConsoleGhost::Instance();
        std::cerr << "chirrup: no display to open the window on; use -B for batch mode."
                  << std::endl;
        return 1;
    }
    if (infile)
        gnome.PostLoadKeyset(infile);
    KLXmGnome::MainLoop();
    return 0;
}
