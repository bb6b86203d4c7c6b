// Imp: recognizer settings files.
//
// A recognizer's settings file (CueRecognizer::ConfigFileName: "<data directory>/NAME.config",
// or "./NAME.config" without a project) holds statements of the program's usual grammar; the
// block "begin recognizer NAME" ... "end" in it carries the recognizer's settings in the same
// form as in keyset files. Everything else in the file is skipped, so one file may hold the
// settings of several recognizers.
#include <fstream>

#include "toolkit/CueRecognizer.h"
#include "toolkit/CueStatement.h"
#include "toolkit/KLFilePath.h"
#include "workspace/Ghost.h"
#include "workspace/Imp.h"

int Imp::ConfigureRecognizer(CueRecognizer* recognizer, const char* fileName) {
    if (!recognizer || !fileName || KLFilePath::IsDirectory(fileName))
        return 0;
    std::ifstream in(fileName, std::ios::in | std::ios::binary);
    if (!in)
        return 0;
    CueStatement s;
    while (s.Read(in)) {
        if (s.Count() == 3 && s.Matches("begin", 0) && s.Matches("recognizer", 1) &&
            s.Matches(recognizer->Name(), 2)) {
            recognizer->GuardedResetSettings();
            recognizer->GuardedReadSettings(in);
        }
    }
    theGhost->ShowRecognizerGui(recognizer);
    return 1;
}
