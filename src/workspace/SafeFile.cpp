#include "workspace/SafeFile.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <vector>

#include "toolkit/KLFilePath.h"

namespace {

// The permission bits a newly created file would get: those of the file being replaced, or
// 0666 less the process's umask.
mode_t target_mode(const std::string& path) {
    struct stat st;
    if (::stat(path.c_str(), &st) == 0 && S_ISREG(st.st_mode))
        return st.st_mode & 07777;
    const mode_t mask = ::umask(022);
    ::umask(mask);
    return 0666 & ~mask;
}

}  // namespace

SafeFile::SafeFile(const std::string& path) : path_(path) {
    if (path.empty()) {
        error_ = "no file name";
        return;
    }
    if (KLFilePath::IsDirectory(path.c_str())) {
        error_ = path + " is a directory";
        return;
    }
    const std::string dir = KLFilePath::Directory(path.c_str());
    std::string pattern = dir + "/." + KLFilePath::Basename(path.c_str()) + ".XXXXXX";
    std::vector<char> name(pattern.begin(), pattern.end());
    name.push_back('\0');
    const int fd = ::mkstemp(name.data());
    if (fd < 0) {
        error_ = std::strerror(errno);
        return;
    }
    ::fchmod(fd, target_mode(path));
    ::close(fd);
    temp_ = name.data();
    out_.open(temp_, std::ios::out | std::ios::trunc | std::ios::binary);
    if (!out_) {
        error_ = "cannot write " + temp_;
        ::unlink(temp_.c_str());
        temp_.clear();
        return;
    }
    open_ = true;
}

SafeFile::~SafeFile() {
    discard();
}

void SafeFile::discard() {
    if (out_.is_open())
        out_.close();
    if (!temp_.empty())
        ::unlink(temp_.c_str());
    temp_.clear();
    open_ = false;
}

bool SafeFile::Commit() {
    if (!open_)
        return false;
    out_.flush();
    const bool written = bool(out_);
    out_.close();
    if (!written || out_.fail()) {
        error_ = "could not write all of " + path_;
        discard();
        return false;
    }
    const int fd = ::open(temp_.c_str(), O_RDONLY);
    if (fd >= 0) {
        ::fsync(fd);
        ::close(fd);
    }
    if (::rename(temp_.c_str(), path_.c_str()) != 0) {
        error_ = std::string("could not rename into place: ") + std::strerror(errno);
        discard();
        return false;
    }
    temp_.clear();
    open_ = false;
    return true;
}
