#pragma once

#include <fstream>
#include <string>

// Saves a file without ever leaving a half-written one behind: the text goes to a temporary
// file in the same directory as the target, and Commit renames it over the target in one
// step. A SafeFile destroyed without a successful Commit removes its temporary file and
// leaves the target exactly as it was.
class SafeFile {
  public:
    // Creates the temporary file next to `path`; check IsOpen().
    explicit SafeFile(const std::string& path);
    ~SafeFile();
    SafeFile(const SafeFile&) = delete;
    SafeFile& operator=(const SafeFile&) = delete;

    bool IsOpen() const { return open_; }
    // Where the text goes until Commit.
    std::ostream& Stream() { return out_; }
    // Flushes the text to disk and renames the temporary file over the target. False when
    // anything failed on the way (the target is then untouched and ErrorText says why).
    bool Commit();
    const std::string& ErrorText() const { return error_; }
    const std::string& Path() const { return path_; }

  private:
    void discard();

    std::string path_;
    std::string temp_;
    std::ofstream out_;
    bool open_ = false;
    std::string error_;
};
