// chirrup's entry: environment and command line, error log, then batch mode or the window.
#include <cstdlib>
#include <iostream>
#include <string>

#include "scene/KLWire.h"
#include "toolkit/CuePrefs.h"
#include "toolkit/CueTime.h"
#include "toolkit/KLFilePath.h"
#include "toolkit/xm/KLSignalPipe.h"
#include "window/FallbackResources.h"
#include "window/Gnome.h"
#include "workspace/CommandLine.h"
#include "workspace/ConsoleGhost.h"
#include "workspace/Imp.h"

namespace {
// Seconds the event loop has to start the emergency save after a signal; after that the
// signal handler saves by itself.
constexpr unsigned kSignalFallbackSeconds = 5;
}  // namespace

int main(int argc, char** argv) {
    KLWire::Initialize();
    const CommandLine line = CommandLine::Parse(argc, argv, std::cerr);
    if (line.exitNow)
        return line.exitStatus;
    line.Apply(theImp);

    if (line.batchMode) {
        theGhost = &ConsoleGhost::Instance();
        if (line.infile) {
            const char* data = CuePrefs::MiscDir();
            const char* wires = CuePrefs::WireDir();
            const CommandLine::Batch& batch = line.batch;
            const std::string track = KLFilePath::Join(data, batch.track.c_str());
            const std::string apply = KLFilePath::Join(wires, batch.apply.c_str());
            const std::string out = KLFilePath::Join(wires, batch.out.c_str());
            const std::string keysets = KLFilePath::Join(data, line.infile->c_str());
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
        const char* display = std::getenv("DISPLAY");
        std::cerr << "chirrup: cannot open the display \"" << (display ? display : "")
                  << "\" for the window; use -B for batch mode." << std::endl;
        return 1;
    }
    // A signal sent to the window (TERM, USR1, USR2) has the emergency save run by the event
    // loop, where it cannot interrupt malloc or stdio halfway; faults still save at once.
    KLSignalPipe::Install(KLXmGnome::AppContext(), kSignalFallbackSeconds);
    if (line.infile)
        gnome.PostLoadKeyset(line.infile->c_str());
    KLXmGnome::MainLoop();
    return 0;
}
