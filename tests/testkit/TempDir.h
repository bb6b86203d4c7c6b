#pragma once

// The one temporary-directory helper of the tests: a fresh directory, removed with everything
// in it when the object goes, however the test ends.
#include <stdlib.h>

#include <filesystem>
#include <string>
#include <system_error>

namespace testkit {

class TempDir {
  public:
    TempDir() {
        std::string name = std::filesystem::temp_directory_path().string() + "/chirrup-test-XXXXXX";
        if (::mkdtemp(name.data()))
            path_ = name;
    }
    ~TempDir() {
        std::error_code ignored;
        if (!path_.empty())
            std::filesystem::remove_all(path_, ignored);
    }
    TempDir(const TempDir&) = delete;
    TempDir& operator=(const TempDir&) = delete;

    // Empty when no directory could be made.
    const std::string& path() const { return path_; }
    std::string operator/(const std::string& name) const { return path_ + "/" + name; }

  private:
    std::string path_;
};

}  // namespace testkit
