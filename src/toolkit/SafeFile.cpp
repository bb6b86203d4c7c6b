#include "toolkit/SafeFile.h"

#include <dirent.h>
#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <vector>

#include "toolkit/FdStreamBuffer.h"
#include "toolkit/KLFilePath.h"

namespace {

std::atomic<SafeFile::StageHook> stage_hook{nullptr};
std::atomic<bool> unnamed_allowed{true};

void reached(SafeFile::Stage stage) {
    if (SafeFile::StageHook hook = stage_hook.load())
        hook(stage);
}

// What every temporary name for `base` begins with; the process id follows, then a dash.
std::string temp_prefix(const std::string& base) {
    return "." + base + ".tmp-";
}

// The process's file-creation mask, read without changing it where /proc allows.
mode_t current_umask() {
    std::ifstream status("/proc/self/status");
    std::string key;
    while (status >> key) {
        if (key == "Umask:") {
            std::string octal;
            status >> octal;
            return mode_t(std::strtoul(octal.c_str(), nullptr, 8));
        }
        status.ignore(1 << 12, '\n');
    }
    const mode_t mask = ::umask(022);
    ::umask(mask);
    return mask;
}

// Removes the temporary files for `base` in `dir` that belong to processes no longer alive:
// what runs killed in the middle of a save left behind.
void remove_stale_temporaries(const std::string& dir, const std::string& base) {
    DIR* d = ::opendir(dir.c_str());
    if (!d)
        return;
    const std::string prefix = temp_prefix(base);
    while (const dirent* entry = ::readdir(d)) {
        const char* name = entry->d_name;
        if (std::strncmp(name, prefix.c_str(), prefix.size()) != 0)
            continue;
        char* end = nullptr;
        const long pid = std::strtol(name + prefix.size(), &end, 10);
        if (pid <= 0 || end == name + prefix.size() || *end != '-' || pid == long(::getpid()))
            continue;
        if (::kill(pid_t(pid), 0) != 0 && errno == ESRCH)
            ::unlink(KLFilePath::Join(dir.c_str(), name).c_str());
    }
    ::closedir(d);
}

// A fresh name for a temporary file beside `base` in `dir` (six random letters at the end).
std::string temp_name(const std::string& dir, const std::string& base) {
    static const char kLetters[] = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789";
    static std::atomic<unsigned long> counter{0};
    unsigned long long seed =
        (unsigned long long)std::chrono::steady_clock::now().time_since_epoch().count() ^
        (counter.fetch_add(1) * 0x9E3779B97F4A7C15ull);
    std::string name = temp_prefix(base) + std::to_string(::getpid()) + "-";
    for (int i = 0; i < 6; ++i) {
        seed = seed * 6364136223846793005ull + 1442695040888963407ull;
        name += kLetters[(seed >> 33) % (sizeof(kLetters) - 1)];
    }
    return KLFilePath::Join(dir.c_str(), name.c_str());
}

// Flushes the directory entry changes of `dir` to disk. File systems that cannot sync a
// directory say EINVAL; that is not a failure.
int sync_directory(const std::string& dir) {
    const int fd = ::open(dir.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (fd < 0)
        return errno;
    int error = ::fsync(fd) == 0 || errno == EINVAL || errno == EROFS ? 0 : errno;
    ::close(fd);
    return error;
}

}  // namespace

void SafeFile::SetStageHook(StageHook hook) {
    stage_hook.store(hook);
}

void SafeFile::SetUnnamedFilesAllowed(bool allowed) {
    unnamed_allowed.store(allowed);
}

SafeFile::SafeFile(const std::string& path)
    : path_(path), stream_(std::make_unique<std::ostream>(nullptr)) {
    if (path.empty()) {
        error_ = "no file name";
        return;
    }
    if (KLFilePath::IsDirectory(path.c_str())) {
        error_ = path + " is a directory";
        return;
    }
    const std::string dir = KLFilePath::Directory(path.c_str());
    remove_stale_temporaries(dir, KLFilePath::Basename(path.c_str()));
    if (!(unnamed_allowed.load() && openUnnamed(dir)) && !openNamed(dir))
        return;
    buffer_ = std::make_unique<FdStreamBuffer>(fd_);
    stream_->rdbuf(buffer_.get());  // also clears the stream's state
    reached(Stage::Opened);
}

SafeFile::~SafeFile() {
    discard();
}

bool SafeFile::openUnnamed(const std::string& dir) {
    // The finished file is linked into place through /proc/self/fd: without /proc an unnamed
    // file could never get its name.
    if (::access("/proc/self/fd", X_OK) != 0)
        return false;
    fd_ = ::open(dir.c_str(), O_TMPFILE | O_WRONLY | O_CLOEXEC, 0666);
    unnamed_ = fd_ >= 0;
    return unnamed_;
}

bool SafeFile::openNamed(const std::string& dir) {
    std::string name = temp_name(dir, KLFilePath::Basename(path_.c_str()));
    // mkostemp replaces the last six characters with a name of its own.
    std::vector<char> pattern(name.begin(), name.end() - 6);
    pattern.insert(pattern.end(), {'X', 'X', 'X', 'X', 'X', 'X', '\0'});
    fd_ = ::mkostemp(pattern.data(), O_CLOEXEC);
    if (fd_ < 0) {
        error_ = std::strerror(errno);
        return false;
    }
    temp_ = pattern.data();
    // mkostemp creates the file for its owner only; a new file gets the usual permissions.
    if (::fchmod(fd_, 0666 & ~current_umask()) != 0) {
        error_ = std::strerror(errno);
        discard();
        return false;
    }
    return true;
}

bool SafeFile::Write(const void* data, size_t size) {
    if (!IsOpen())
        return false;
    stream_->write(static_cast<const char*>(data), std::streamsize(size));
    return bool(*stream_);
}

bool SafeFile::WriteGathered(const struct iovec* blocks, size_t count) {
    if (!IsOpen() || !*stream_)
        return false;
    if (!buffer_->WriteGathered(blocks, count)) {
        stream_->setstate(std::ios::badbit);
        return false;
    }
    return true;
}

std::string SafeFile::DescriptorPath() const {
    return IsOpen() ? "/proc/self/fd/" + std::to_string(fd_) : std::string();
}

bool SafeFile::fail(const std::string& what, int error) {
    error_ = what + ": " + std::strerror(error ? error : EIO);
    discard();
    return false;
}

void SafeFile::discard() {
    if (stream_)
        stream_->rdbuf(nullptr);
    buffer_.reset();
    if (fd_ >= 0)
        ::close(fd_);
    fd_ = -1;
    if (!temp_.empty())
        ::unlink(temp_.c_str());
    temp_.clear();
}

bool SafeFile::linkIntoPlace() {
    const std::string self = DescriptorPath();
    if (::linkat(AT_FDCWD, self.c_str(), AT_FDCWD, path_.c_str(), AT_SYMLINK_FOLLOW) == 0) {
        reached(Stage::Linked);
        reached(Stage::Renamed);
        return true;
    }
    if (errno != EEXIST)
        return fail("could not link into place", errno);
    // linkat never replaces a file: the finished file gets a temporary name first.
    const std::string dir = KLFilePath::Directory(path_.c_str());
    const std::string base = KLFilePath::Basename(path_.c_str());
    for (int attempt = 0; temp_.empty(); ++attempt) {
        const std::string name = temp_name(dir, base);
        if (::linkat(AT_FDCWD, self.c_str(), AT_FDCWD, name.c_str(), AT_SYMLINK_FOLLOW) == 0)
            temp_ = name;
        else if (errno != EEXIST || attempt == 100)
            return fail("could not link into place", errno);
    }
    reached(Stage::Linked);
    if (::rename(temp_.c_str(), path_.c_str()) != 0)
        return fail("could not rename into place", errno);
    temp_.clear();
    reached(Stage::Renamed);
    return true;
}

bool SafeFile::Commit() {
    if (!IsOpen())
        return false;
    stream_->flush();
    if (!*stream_ || buffer_->Error())
        return fail("could not write all of " + path_, buffer_->Error());
    reached(Stage::Written);
    struct stat old;
    if (::stat(path_.c_str(), &old) == 0 && S_ISREG(old.st_mode) &&
        ::fchmod(fd_, old.st_mode & 07777) != 0)
        return fail("could not keep the permissions of " + path_, errno);
    if (::fsync(fd_) != 0)
        return fail("could not flush " + path_ + " to disk", errno);
    reached(Stage::Synced);
    if (unnamed_) {
        if (!linkIntoPlace())
            return false;
    } else {
        reached(Stage::Linked);
        if (::rename(temp_.c_str(), path_.c_str()) != 0)
            return fail("could not rename into place", errno);
        temp_.clear();
        reached(Stage::Renamed);
    }
    stream_->rdbuf(nullptr);
    buffer_.reset();
    const int closed = ::close(fd_) == 0 ? 0 : errno;
    fd_ = -1;
    if (closed)
        return fail("could not close " + path_, closed);
    if (const int error = sync_directory(KLFilePath::Directory(path_.c_str())))
        return fail("could not flush the folder of " + path_ + " to disk", error);
    return true;
}
