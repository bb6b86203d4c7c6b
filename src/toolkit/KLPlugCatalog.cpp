#include "toolkit/KLPlugCatalog.h"

#include <dirent.h>
#include <dlfcn.h>
#include <sys/stat.h>

#include <algorithm>
#include <cstdlib>

#include "toolkit/CueChirrup.h"
#include "toolkit/CuePlugin.h"
#include "toolkit/CueRecognizer.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLFilePath.h"

namespace {

// The regular files named "*.so" in `dir`, sorted by name so that the search order (and so
// which of two recognizers of the same name wins) does not depend on the file system. A
// directory that cannot be read gives none.
std::vector<std::string> plugin_files(const std::string& dir) {
    std::vector<std::string> files;
    DIR* d = opendir(dir.c_str());
    if (!d)
        return files;
    while (const dirent* e = readdir(d)) {
        const std::string name = e->d_name;
        if (name.size() <= 3 || name.compare(name.size() - 3, 3, ".so") != 0)
            continue;
        const std::string path = KLFilePath::Join(dir.c_str(), name.c_str());
        struct stat st;
        if (stat(path.c_str(), &st) == 0 && S_ISREG(st.st_mode))
            files.push_back(path);
    }
    closedir(d);
    std::sort(files.begin(), files.end());
    return files;
}

// Calls a plug-in entry function, turning an exception into `failed`.
template <typename Fn, typename R>
R call_entry(Fn fn, R failed) {
    try {
        return fn();
    } catch (...) {
        return failed;
    }
}

}  // namespace

KLPlugCatalog::KLPlugCatalog() = default;

// The prototypes are plug-in objects: they go before the shared objects are closed. The
// objects are opened with RTLD_NODELETE, so dlclose only drops the catalogue's reference:
// recognizers cloned from a prototype (owned by keysets, which may outlive the catalogue)
// keep their code until the program ends.
KLPlugCatalog::~KLPlugCatalog() {
    prototypes_.clear();
    order_.clear();
    for (auto it = handles_.rbegin(); it != handles_.rend(); ++it)
        dlclose(*it);
}

int KLPlugCatalog::ScanDirectory(const char* path) {
    if (!path)
        return 0;
    scanned_ = true;
    const int before = Count();
    const std::string all = path;
    size_t start = 0;
    while (start <= all.size()) {
        size_t colon = all.find(':', start);
        if (colon == std::string::npos)
            colon = all.size();
        const std::string dir = all.substr(start, colon - start);
        if (!dir.empty())
            for (const std::string& file : plugin_files(dir))
                LoadPlugin(file.c_str());
        start = colon + 1;
    }
    return Count() - before;
}

bool KLPlugCatalog::LoadPlugin(const char* file) {
    if (!file)
        return false;
    // Plug-ins call CueChirrup for their panels; the reference keeps it in every program
    // that loads them, so that their undefined references resolve.
    (void)CueChirrup::Host();
    void* handle = dlopen(file, RTLD_NOW | RTLD_LOCAL | RTLD_NODELETE);
    if (!handle) {
        const char* why = dlerror();
        KLWarning("[%s] could not be loaded: %s\n", file, why ? why : "unknown reason");
        return false;
    }
    auto abi =
        reinterpret_cast<ChirrupPluginAbiVersionFn>(dlsym(handle, CHIRRUP_PLUGIN_ABI_SYMBOL));
    auto create =
        reinterpret_cast<ChirrupPluginCreateFn>(dlsym(handle, CHIRRUP_PLUGIN_CREATE_SYMBOL));
    if (!abi || !create) {
        KLWarning("[%s] is not a chirrup plug-in\n", file);
        dlclose(handle);
        return false;
    }
    const int version = call_entry(abi, -1);
    if (version != CHIRRUP_PLUGIN_ABI_VERSION) {
        KLWarning("[%s] was built for plug-in interface %d, this program uses %d\n", file, version,
                  CHIRRUP_PLUGIN_ABI_VERSION);
        dlclose(handle);
        return false;
    }
    std::unique_ptr<CueRecognizer> prototype(
        call_entry(create, static_cast<CueRecognizer*>(nullptr)));
    if (!prototype) {
        KLWarning("[%s] did not create a recognizer\n", file);
        dlclose(handle);
        return false;
    }
    const std::string name = prototype->Name();
    if (name.empty() || prototypes_.count(name)) {
        // The first recognizer found under a name wins; an unnamed one cannot be asked for.
        if (name.empty())
            KLWarning("[%s] made a recognizer without a name\n", file);
        else
            KLInform("[%s]: recognizer [%s] is already loaded, this one is ignored\n", file,
                     name.c_str());
        prototype.reset();
        dlclose(handle);
        return false;
    }
    order_.push_back(name);
    prototypes_[name] = std::move(prototype);
    handles_.push_back(handle);
    return true;
}

const char* KLPlugCatalog::HeadKey() const {
    return order_.empty() ? nullptr : order_.front().c_str();
}

const char* KLPlugCatalog::NextKey(const char* key) const {
    if (!key)
        return nullptr;
    for (size_t i = 0; i + 1 < order_.size(); ++i)
        if (order_[i] == key)
            return order_[i + 1].c_str();
    return nullptr;
}
