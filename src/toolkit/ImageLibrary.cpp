#include "toolkit/ImageLibrary.h"

#include <dlfcn.h>

#include <cstdlib>
#include <mutex>

#include "toolkit/image/ImageModule.h"

namespace {
struct Module {
    decltype(&chirrup_image_read) read = nullptr;
    decltype(&chirrup_image_resize) resize = nullptr;
    decltype(&chirrup_image_write_sgi) writeSgi = nullptr;
    std::string error;  // why the module could not be loaded, when it could not
};

// The module's path: lib/chirrup/chirrup_image.so beside the directory of the program that
// holds this code (bin/, or bench/ in the build tree).
std::string module_path() {
    Dl_info info;
    std::string self;
    if (dladdr(reinterpret_cast<void*>(&module_path), &info) && info.dli_fname)
        self = info.dli_fname;
    char* real = realpath(self.c_str(), nullptr);
    if (real) {
        self = real;
        std::free(real);
    }
    const size_t slash = self.find_last_of('/');
    const std::string dir = slash == std::string::npos ? "." : self.substr(0, slash);
    return dir + "/../lib/chirrup/chirrup_image.so";
}

const Module& module() {
    static Module m;
    static std::once_flag once;
    std::call_once(once, [] {
        const std::string path = module_path();
        void* handle = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
        if (!handle) {
            const char* why = dlerror();
            m.error = "the image library cannot be loaded (" + std::string(why ? why : path) + ")";
            return;
        }
        m.read = reinterpret_cast<decltype(m.read)>(dlsym(handle, "chirrup_image_read"));
        m.resize = reinterpret_cast<decltype(m.resize)>(dlsym(handle, "chirrup_image_resize"));
        m.writeSgi =
            reinterpret_cast<decltype(m.writeSgi)>(dlsym(handle, "chirrup_image_write_sgi"));
        if (!m.read || !m.resize || !m.writeSgi)
            m.error = "the image library module " + path + " is incomplete";
    });
    return m;
}

bool unavailable(const Module& m, std::string* error) {
    if (m.error.empty())
        return false;
    if (error)
        *error = m.error;
    return true;
}
}  // namespace

bool ImageLibrary::Read(const std::string& path, long long maxPixels, int* width, int* height,
                        std::vector<uint8_t>* rgba, std::string* error) {
    const Module& m = module();
    if (unavailable(m, error))
        return false;
    char why[512] = "";
    unsigned char* pixels = nullptr;
    if (!m.read(path.c_str(), maxPixels, width, height, &pixels, why, sizeof why)) {
        if (error)
            *error = why;
        return false;
    }
    rgba->assign(pixels, pixels + size_t(*width) * size_t(*height) * 4);
    std::free(pixels);
    return true;
}

bool ImageLibrary::Resize(const uint8_t* rgba, int fromWidth, int fromHeight, uint8_t* out,
                          int width, int height, std::string* error) {
    const Module& m = module();
    if (unavailable(m, error))
        return false;
    char why[512] = "";
    if (!m.resize(rgba, fromWidth, fromHeight, out, width, height, why, sizeof why)) {
        if (error)
            *error = why;
        return false;
    }
    return true;
}

bool ImageLibrary::WriteSgi(const std::string& path, const uint8_t* rgba, int width, int height,
                            std::string* error) {
    const Module& m = module();
    if (unavailable(m, error))
        return false;
    char why[512] = "";
    if (!m.writeSgi(path.c_str(), rgba, width, height, why, sizeof why)) {
        if (error)
            *error = why;
        return false;
    }
    return true;
}
