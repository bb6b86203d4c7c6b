#include "workspace/CommandLine.h"

#include <cstdlib>
#include <cstring>
#include <ostream>

#include "toolkit/CuePrefs.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLFilePath.h"
#include "workspace/Imp.h"

namespace {

const char* const kBuildStamp = "9704300208";

// A frame rate as the program takes it: a number that is not negative; anything else is
// ignored (text reads as 0, the default rate).
void take_rate(std::optional<int>& fps, const char* text) {
    const int n = std::atoi(text);
    if (n >= 0)
        fps = n;
}

}  // namespace

void CommandLine::Banner(std::ostream& err) {
    err << "Tessel|Marlin Parlando and Facial Animation Version 2.0 (" << kBuildStamp << ")"
        << std::endl;
}

void CommandLine::Usage(std::ostream& err) {
    err << " usage: chirrup [-e STRING] [-fps #] [-nogeom]\n"
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

CommandLine CommandLine::Parse(int argc, const char* const* argv, std::ostream& err,
                               Lookup environment) {
    if (!environment)
        environment = [](const char* name) -> const char* { return std::getenv(name); };
    CommandLine line;
    if (const char* v = environment("VX_FPS"))
        take_rate(line.fps, v);
    line.verbose = environment("VX_VERBOSE") != nullptr;
    line.beep = environment("VX_AUDIO") != nullptr;

    int i = 1;
    while (i < argc && argv[i][0] == '-') {
        const char* opt = argv[i];
        const int left = argc - i - 1;  // arguments after this option
        if (!std::strcmp(opt, "-nogeom")) {
            line.noGeometry = true;
            i += 1;
        } else if (!std::strcmp(opt, "-v")) {
            line.verbose = true;
            i += 1;
        } else if (!std::strcmp(opt, "-a")) {
            line.beep = true;
            i += 1;
        } else if (!std::strcmp(opt, "-fps")) {
            if (left >= 1) {
                take_rate(line.fps, argv[i + 1]);
                i += 2;
            } else {
                line.fps = 0;
                i += 1;
            }
        } else if (!std::strcmp(opt, "-tess")) {
            if (left >= 2) {
                line.tessU = std::atoi(argv[i + 1]);
                line.tessV = std::atoi(argv[i + 2]);
                i += 3;
            } else {
                err << "-tess needs two numbers; the tesselation levels stay at " << line.tessU
                    << " " << line.tessV << "." << std::endl;
                i = argc;
            }
        } else if (!std::strcmp(opt, "-i")) {
            Banner(err);
            line.exitNow = true;
            return line;
        } else if (!std::strcmp(opt, "-H") || !std::strcmp(opt, "-h")) {
            Banner(err);
            Usage(err);
            line.exitNow = true;
            return line;
        } else if (!std::strcmp(opt, "-e")) {
            if (left >= 1) {
                line.errorFile = argv[i + 1];
                i += 2;
            } else {
                err << "-e needs a file name; the error log keeps its usual name." << std::endl;
                i += 1;
            }
        } else if (!std::strcmp(opt, "-B")) {
            if (left < 5) {
                err << "-B needs five arguments: track apply dag off out" << std::endl;
                line.exitNow = true;
                line.exitStatus = 1;
                return line;
            }
            line.batch = {argv[i + 1], argv[i + 2], argv[i + 3], argv[i + 4], argv[i + 5]};
            line.batchMode = true;
            i += 6;
        } else {
            err << "Unknown switch [" << opt << "]" << std::endl;
            i += 1;
        }
    }
    if (i < argc)
        line.infile = argv[i];
    return line;
}

void CommandLine::Apply(Imp& imp) const {
    if (fps)
        imp.SetFps(*fps);
    if (verbose)
        KLErrHandler::outputLevel = KLErr::kStatus;
    if (beep)
        imp.beep = 1;
    if (noGeometry) {
        imp.loadGeometry = 0;
        imp.geometryActive = 0;
    }
    if (errorFile)
        imp.SetErrorFilename(errorFile->c_str());
    else
        imp.SetErrorFilename(KLFilePath::Join(CuePrefs::WorkEnv(), "errlog.vx").c_str());
    imp.tessU = tessU;
    imp.tessV = tessV;
    if (batchMode)
        imp.batchMode = 1;
}
