#include "toolkit/CueTokenList.h"

#include <cerrno>
#include <cfloat>
#include <climits>
#include <cmath>
#include <cstdlib>
#include <cstring>

void CueTokenList::Split(const std::string& line) {
    tokens_.clear();
    size_t n = line.size();
    if (n > 0 && line[n - 1] == '\r')
        --n;
    size_t i = 0;
    while (i < n) {
        while (i < n && (line[i] == ' ' || line[i] == '\t'))
            ++i;
        if (i >= n)
            break;
        std::string token;
        while (i < n && line[i] != ' ' && line[i] != '\t') {
            if (line[i] == '"') {
                const size_t close = line.find('"', i + 1);
                const size_t stop = (close == std::string::npos || close > n) ? n : close;
                token.append(line, i + 1, stop - i - 1);
                i = stop < n ? stop + 1 : n;
            } else {
                token.push_back(line[i++]);
            }
        }
        tokens_.push_back(std::move(token));
    }
}

bool CueTokenList::Matches(const char* text, int i) const {
    return text && i >= 0 && i < Count() && tokens_[i] == text;
}

const char* CueTokenList::ArgText(int i) const {
    return (i >= 0 && i < Count()) ? tokens_[i].c_str() : nullptr;
}

int CueTokenList::ArgInt(int i) const {
    const char* s = ArgText(i);
    if (!s)
        return 0;
    errno = 0;
    const long long v = std::strtoll(s, nullptr, 10);
    if (v > INT_MAX)
        return INT_MAX;
    if (v < INT_MIN)
        return INT_MIN;
    return int(v);
}

double CueTokenList::ArgDouble(int i) const {
    const char* s = ArgText(i);
    if (!s)
        return 0.0;
    const double v = std::strtod(s, nullptr);
    return std::isfinite(v) ? v : 0.0;
}

float CueTokenList::ArgFloat(int i) const {
    const double v = ArgDouble(i);
    if (v > FLT_MAX)
        return FLT_MAX;
    if (v < -FLT_MAX)
        return -FLT_MAX;
    if (v == 0.0)
        return float(v);  // also what is not a number at all
    // Read as a float straight away: going through a double can round twice and miss the
    // float that the text was written from.
    const float f = std::strtof(ArgText(i), nullptr);
    return std::isinf(f) ? std::copysign(FLT_MAX, f) : f;
}
