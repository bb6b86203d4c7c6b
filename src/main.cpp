// chirrup's entry: environment and command line, error log, then batch mode or the window.
#include <cstdlib>
#include <iostream>
#include <string>

#include "scene/KLWire.h"
#include "toolkit/CuePrefs.h"
#include "toolkit/CueTime.h"
#include "toolkit/KLFilePath.h"
#include "workspace/CommandLine.h"
#include "workspace/ConsoleGhost.h"
#include "workspace/Imp.h"

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

    std::cerr << "chirrup: the main window is not built into this program yet; use -B for "
                 "batch mode."
              << std::endl;
    return 1;
}
