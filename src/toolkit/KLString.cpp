#include "toolkit/KLString.h"

#include <cstdio>
#include <cstring>
#include <vector>

char* KLNewString(const char* s) {
    if (!s)
        return nullptr;
    const size_t n = std::strlen(s);
    char* copy = new char[n + 1];
    std::memcpy(copy, s, n + 1);
    return copy;
}

std::string KLVFmt(const char* format, va_list args) {
    va_list copy;
    va_copy(copy, args);
    const int n = std::vsnprintf(nullptr, 0, format, copy);
    va_end(copy);
    if (n <= 0)
        return std::string();
    std::vector<char> buf(size_t(n) + 1);
    std::vsnprintf(buf.data(), buf.size(), format, args);
    return std::string(buf.data(), size_t(n));
}

std::string KLFmt(const char* format, ...) {
    va_list args;
    va_start(args, format);
    std::string s = KLVFmt(format, args);
    va_end(args);
    return s;
}

std::string KLQuote(const char* s, char open, char close, const char* force) {
    if (!s)
        return std::string(1, open) + close;
    if (*s && !std::strpbrk(s, force ? force : ""))
        return s;
    std::string quoted(1, open);
    quoted += s;
    quoted += close;
    return quoted;
}
