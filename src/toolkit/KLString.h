#pragma once

#include <cstdarg>
#include <string>

// A copy of `s` in a new[] array that the caller owns (delete[]); null for null.
char* KLNewString(const char* s);

// printf-style formatting into a std::string.
std::string KLFmt(const char* format, ...) __attribute__((format(printf, 1, 2)));
std::string KLVFmt(const char* format, va_list args);

// `s` wrapped in `open` ... `close` when it holds any character of `force` (by default a
// blank or a tab, which would otherwise split it into several tokens); otherwise `s` as it
// stands. An empty string is quoted too, so that it stays a token when read back. Null gives
// an empty quoted token.
std::string KLQuote(const char* s, char open = '"', char close = '"', const char* force = " \t");
inline std::string KLQuote(const std::string& s) {
    return KLQuote(s.c_str());
}
