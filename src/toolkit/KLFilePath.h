#pragma once

#include <string>

// File-name services. Paths are plain strings; nothing here touches a file's contents.
class KLFilePath {
  public:
    static bool Exists(const char* path);
    static bool IsReadable(const char* path);
    static bool IsWritable(const char* path);
    static bool IsDirectory(const char* path);
    // `path` with the directory `head` removed from its front: "head/rest" gives "rest" and
    // "head" itself gives ""; a path not below `head` (or a null or empty head) is returned
    // unchanged. A trailing "/" on head is ignored.
    static std::string TrimHead(const char* path, const char* head);
    // "%s/%s" of `dir` and `name` when `dir` is set and `name` is relative; otherwise `name`.
    static std::string Join(const char* dir, const char* name);
    // The part before the last "/" ("." when there is none, "/" for a file in the root).
    static std::string Directory(const char* path);
    // The part after the last "/".
    static std::string Basename(const char* path);
};
