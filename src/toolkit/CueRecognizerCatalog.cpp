#include "toolkit/CueRecognizerCatalog.h"

#include <cstdlib>

#include "toolkit/CuePrefs.h"
#include "toolkit/CueRecognizer.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLFilePath.h"

std::unique_ptr<CueRecognizer> CueRecognizerCatalog::FetchRecognizer(const char* name) const {
    if (!name)
        return nullptr;
    if (!scanned_) {
        // Loading plug-ins does not change what the catalogue stands for: the recognizers
        // on the search path were always its contents.
        const_cast<CueRecognizerCatalog*>(this)->ScanDirectory(SearchPath().c_str());
    }
    const auto it = prototypes_.find(name);
    if (it == prototypes_.end())
        return nullptr;
    std::unique_ptr<CueRecognizer> copy = it->second->GuardedClone();
    if (copy && std::string(copy->Name()) != name) {
        // A clone of another kind would be filed under the wrong name in keyset files.
        KLWarning("Recognizer [%s] cloned itself as [%s]\n", name, copy->Name());
        return nullptr;
    }
    return copy;
}

void CueRecognizerCatalog::Register(std::unique_ptr<CueRecognizer> prototype) {
    if (!prototype)
        return;
    const std::string name = prototype->Name();
    if (name.empty() || prototypes_.count(name))
        return;
    order_.push_back(name);
    prototypes_[name] = std::move(prototype);
}

std::string CueRecognizerCatalog::SearchPath() {
    for (const char* var : {"TESSEL_PLUGIN_PATH", "KL_PLUGIN_PATH"}) {
        const char* value = std::getenv(var);
        if (value && *value)
            return value;
    }
    // The program's own plug-ins (<location>/lib/chirrup/plugins, in the build tree or the
    // installation) come last, so that they are found without any set-up but never hide a
    // plug-in of the same name earlier on the path.
    std::string path = "./plugins:/usr/tesselbeta/plugins:/usr/tessel/plugins";
    if (const char* location = CuePrefs::Location())
        path += ":" + KLFilePath::Join(location, "lib/chirrup/plugins");
    return path;
}
