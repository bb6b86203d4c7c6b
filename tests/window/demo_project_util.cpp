#include "window/DemoProject.h"

#include <unistd.h>

#include <cstdlib>
#include <filesystem>

#include "toolkit/CuePrefs.h"

namespace fs = std::filesystem;

namespace windowtest {

std::string DemoProject() {
    static std::string project = [] {
        std::string dir =
            fs::temp_directory_path() / ("chirrup-window-" + std::to_string(getpid()));
        fs::create_directories(dir);
        std::string demo = std::string(CHIRRUP_SOURCE_DIR) + "/resources/demo";
        for (const char* sub : {"misc_data", "wire", "pix"}) {
            fs::create_directories(dir + "/" + sub);
            for (const auto& entry : fs::directory_iterator(demo))
                fs::copy(entry.path(), dir + "/" + sub + "/" + entry.path().filename().string(),
                         fs::copy_options::overwrite_existing);
        }
        setenv("TESSEL_PROJECT", dir.c_str(), 1);
        unsetenv("TESSEL_MISC_DIR");
        CuePrefs::Refresh();
        return dir;
    }();
    return project;
}

}  // namespace windowtest
