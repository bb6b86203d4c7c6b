#pragma once

#include <iosfwd>
#include <optional>
#include <string>

class Imp;

// What the program's command line and its environment (VX_FPS, VX_VERBOSE, VX_AUDIO) ask for,
// read without touching the workspace, so that tests can parse a command line without running
// the program:
//
//     CommandLine line = CommandLine::Parse(argc, argv, std::cerr);
//     if (line.exitNow) return line.exitStatus;
//     line.Apply(theImp);
//
// Parse writes the program's messages on `err` as it meets them (an unknown switch, a
// missing argument, the banner and the usage). Options run while the next argument begins
// with "-"; the first other argument is the infile.
class CommandLine {
  public:
    // The five arguments of "-B", as given.
    struct Batch {
        std::string track, apply, dag, off, out;
    };
    using Lookup = const char* (*)(const char* name);

    // `environment` looks up the VX_ variables (std::getenv by default); the command line
    // wins over them.
    static CommandLine Parse(int argc, const char* const* argv, std::ostream& err,
                             Lookup environment = nullptr);
    static void Banner(std::ostream& err);
    static void Usage(std::ostream& err);

    // Hands the settings to the workspace: frame rate, verbosity, beep, geometry loading,
    // tessellation, batch mode, and the error log (the "-e" file, else errlog.vx in the
    // project directory, else in the working directory).
    void Apply(Imp& imp) const;

    bool exitNow = false;    // "-i", "-h" or a "-B" without its arguments: end at once ...
    int exitStatus = 0;      // ... with this status
    std::optional<int> fps;  // a rate asked for (0: the default rate)
    bool verbose = false;
    bool beep = false;
    bool noGeometry = false;
    int tessU = 1, tessV = 1;
    std::optional<std::string> errorFile;
    bool batchMode = false;
    Batch batch;
    std::optional<std::string> infile;
};
