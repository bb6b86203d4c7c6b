#include "toolkit/KLFilePath.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cstring>

bool KLFilePath::Exists(const char* path) {
    struct stat st;
    return path && *path && ::stat(path, &st) == 0;
}

bool KLFilePath::IsReadable(const char* path) {
    return path && *path && ::access(path, R_OK) == 0;
}

bool KLFilePath::IsWritable(const char* path) {
    return path && *path && ::access(path, W_OK) == 0;
}

bool KLFilePath::IsDirectory(const char* path) {
    struct stat st;
    return path && *path && ::stat(path, &st) == 0 && S_ISDIR(st.st_mode);
}

std::string KLFilePath::TrimHead(const char* path, const char* head) {
    if (!path)
        return std::string();
    if (!head || !*head)
        return path;
    size_t n = std::strlen(head);
    while (n > 1 && head[n - 1] == '/')
        --n;
    if (std::strncmp(path, head, n) != 0)
        return path;
    if (path[n] == '\0')
        return std::string();
    if (path[n] == '/')
        return path + n + 1;
    if (head[n - 1] == '/')
        return path + n;  // head is "/"
    return path;
}

std::string KLFilePath::Join(const char* dir, const char* name) {
    if (!name)
        return std::string();
    if (!dir || !*dir || name[0] == '/')
        return name;
    std::string joined(dir);
    joined += '/';
    joined += name;
    return joined;
}

std::string KLFilePath::Directory(const char* path) {
    if (!path)
        return ".";
    const char* slash = std::strrchr(path, '/');
    if (!slash)
        return ".";
    if (slash == path)
        return "/";
    return std::string(path, size_t(slash - path));
}

std::string KLFilePath::Basename(const char* path) {
    if (!path)
        return std::string();
    const char* slash = std::strrchr(path, '/');
    return slash ? slash + 1 : path;
}
