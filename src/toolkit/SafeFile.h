#pragma once

#include <cstddef>
#include <memory>
#include <ostream>
#include <string>

class FdStreamBuffer;
struct iovec;

// Saves a file so that the target is always either its old self or the complete new content,
// never half-written, and so that no temporary file is left behind. Every file the program
// writes (keysets, tracks, scenes, pictures, emergency saves) goes through it:
//
//     SafeFile file(path);
//     if (!file.IsOpen()) { report(file.ErrorText()); return false; }
//     file.Stream() << ...;                 // or file.Write(bytes, size)
//     if (!file.Commit()) { report(file.ErrorText()); return false; }
//
// The content goes into an unnamed file in the target's directory (O_TMPFILE), which has no
// name until Commit links it into place: a run killed before then leaves nothing behind.
// Where the file system has no unnamed files, a hidden temporary file beside the target is
// used instead (".<name>.tmp-<pid>-XXXXXX"); the next SafeFile for the same target removes
// those left by runs that are no longer alive. Replacing an existing target needs a name for
// the moment between the link and the rename, with the same clean-up.
//
// Commit checks every write, flushes the file to disk (fsync), gives it the permission bits of
// the file it replaces (a new file gets 0666 less the umask), renames it over the target and
// flushes the directory. A failure up to the rename leaves the target untouched and removes
// the temporary file, as does destroying a SafeFile without a successful Commit; a failure
// after it (closing, flushing the directory) is reported with the new content in place.
class SafeFile {
  public:
    // Opens the temporary file for `path`; check IsOpen().
    explicit SafeFile(const std::string& path);
    ~SafeFile();
    SafeFile(const SafeFile&) = delete;
    SafeFile& operator=(const SafeFile&) = delete;

    bool IsOpen() const { return fd_ >= 0; }
    // Where the content goes until Commit (binary: nothing is translated).
    std::ostream& Stream() { return *stream_; }
    // Appends `size` bytes; false once anything failed.
    bool Write(const void* data, size_t size);
    // Appends `count` blocks one after another, after what went to Stream(), in few system
    // calls; false once anything failed.
    bool WriteGathered(const struct iovec* blocks, size_t count);
    // For writers that take only a file name (an image library): a name that opens this
    // SafeFile's file ("/proc/self/fd/N"). Write either through it or through Stream(), not
    // both; Commit then checks and places what was written.
    std::string DescriptorPath() const;
    // Puts the content in place of the target. False when anything failed on the way (the
    // target is then untouched and ErrorText says why). The SafeFile is closed either way.
    bool Commit();
    // Why the file could not be opened or committed, e.g. "No such file or directory".
    const std::string& ErrorText() const { return error_; }
    const std::string& Path() const { return path_; }

    // The points of a save, in order, at which a test can stop it (the hook is called there).
    enum class Stage { Opened, Written, Synced, Linked, Renamed };
    using StageHook = void (*)(Stage stage);
    // For tests only: a hook called at every stage of every SafeFile, or null for none.
    static void SetStageHook(StageHook hook);
    // For tests only: false makes every SafeFile use a named temporary file, as on a file
    // system without unnamed files.
    static void SetUnnamedFilesAllowed(bool allowed);

  private:
    bool openUnnamed(const std::string& dir);
    bool openNamed(const std::string& dir);
    // Gives the finished file its name: `path_` itself, or via a fresh temporary name renamed
    // over the existing target.
    bool linkIntoPlace();
    bool fail(const std::string& what, int error);
    void discard();

    std::string path_;
    std::string temp_;  // the named temporary file while it exists on disk, else empty
    int fd_ = -1;
    bool unnamed_ = false;
    std::string error_;
    std::unique_ptr<FdStreamBuffer> buffer_;
    std::unique_ptr<std::ostream> stream_;
};
