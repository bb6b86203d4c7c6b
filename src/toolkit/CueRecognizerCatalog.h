#pragma once

#include <memory>
#include <string>

#include "toolkit/KLPlugCatalog.h"

class CueRecognizer;

// The recognizer kinds the program knows: the plug-ins found on the plug-in path
// (KLPlugCatalog) and those registered directly; hands out new recognizers by name.
class CueRecognizerCatalog : public KLPlugCatalog {
  public:
    // A new recognizer of that name with default settings, or null.
    // When no directory has been scanned yet, the default search path is scanned first, so
    // that keyset files name plug-ins in batch mode too.
    std::unique_ptr<CueRecognizer> FetchRecognizer(const char* name) const;
    // Adds a recognizer kind directly (built into the program, or for tests); takes
    // ownership of the prototype.
    void Register(std::unique_ptr<CueRecognizer> prototype);
    // The default plug-in search path: TESSEL_PLUGIN_PATH, else KL_PLUGIN_PATH, else
    // "./plugins:/usr/tesselbeta/plugins:/usr/tessel/plugins" followed by the program's own
    // plug-in directory, <CuePrefs::Location()>/lib/chirrup/plugins.
    static std::string SearchPath();
};
