#include "toolkit/CueTime.h"

#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <istream>
#include <limits>
#include <ostream>

int CueTime::default_fps = CueTime::kDefaultFps;
int CueTime::binaryIO = 0;

int CueTime::Rate(int fps) {
    return fps > 0 ? fps : (default_fps > 0 ? default_fps : kDefaultFps);
}

int32_t CueTime::ClampTicks(double ticks) {
    if (std::isnan(ticks))
        return 0;
    const double r = std::nearbyint(ticks);
    if (r >= double(std::numeric_limits<int32_t>::max()))
        return std::numeric_limits<int32_t>::max();
    if (r <= double(std::numeric_limits<int32_t>::min()))
        return std::numeric_limits<int32_t>::min();
    return int32_t(r);
}

CueTime CueTime::Saturated(int64_t ticks) {
    if (ticks > std::numeric_limits<int32_t>::max())
        return FromTicks(std::numeric_limits<int32_t>::max());
    if (ticks < std::numeric_limits<int32_t>::min())
        return FromTicks(std::numeric_limits<int32_t>::min());
    return FromTicks(int32_t(ticks));
}

CueTime::CueTime(double frames, int fps)
    : ticks_(ClampTicks(frames * kTicksPerSecond / Rate(fps))) {}

CueTime::CueTime(int hours, int minutes, int seconds, int frames, int fps) {
    SetTimecode(hours, minutes, seconds, frames, fps);
}

CueTime CueTime::FromSeconds(double seconds) {
    return FromTicks(ClampTicks(seconds * kTicksPerSecond));
}

void CueTime::SetTimecode(int hours, int minutes, int seconds, int frames, int fps) {
    const double secs = hours * 3600.0 + minutes * 60.0 + seconds;
    ticks_ = ClampTicks(secs * kTicksPerSecond + double(frames) * kTicksPerSecond / Rate(fps));
}

double CueTime::Frames(int fps) const {
    return ticks_ * (Rate(fps) / double(kTicksPerSecond));
}

int CueTime::Frame(int fps) const {
    return int(std::trunc(Frames(fps)));
}

void CueTime::Timecode(int* hours, int* minutes, int* seconds, int* frames, bool* negative,
                       int fps) const {
    const int64_t mag = std::llabs(int64_t(ticks_));
    const int64_t whole = mag / kTicksPerSecond;
    const int64_t rest = mag % kTicksPerSecond;
    if (hours)
        *hours = int(whole / 3600);
    if (minutes)
        *minutes = int(whole / 60 % 60);
    if (seconds)
        *seconds = int(whole % 60);
    if (frames)
        *frames = int(rest * Rate(fps) / kTicksPerSecond);
    if (negative)
        *negative = ticks_ < 0;
}

std::string CueTime::Text() const {
    const double frames = Frames();
    char buf[64];
    // The fewest significant digits that read back to this very tick.
    for (int digits = 6; digits <= 17; ++digits) {
        std::snprintf(buf, sizeof buf, "%.*g", digits, frames);
        if (CueTime(std::strtod(buf, nullptr), 0).ticks_ == ticks_)
            break;
    }
    return buf;
}

bool CueTime::SetText(const std::string& text) {
    const char* s = text.c_str();
    while (*s == ' ' || *s == '\t')
        ++s;
    if (!*s)
        return false;
    // h:m:s:f timecode, optionally signed.
    int h = 0, m = 0, sec = 0, f = 0, used = 0;
    const bool neg = (*s == '-');
    const char* body = (neg || *s == '+') ? s + 1 : s;
    if (std::sscanf(body, "%d:%d:%d:%d%n", &h, &m, &sec, &f, &used) == 4 && body[used] == '\0' &&
        h >= 0 && m >= 0 && sec >= 0 && f >= 0) {
        SetTimecode(h, m, sec, f);
        if (neg)
            ticks_ = Saturated(-int64_t(ticks_)).ticks_;
        return true;
    }
    char* end = nullptr;
    const double frames = std::strtod(s, &end);
    if (end == s || !std::isfinite(frames))
        return false;
    while (*end == ' ' || *end == '\t')
        ++end;
    if (*end)
        return false;
    *this = CueTime(frames, 0);
    return true;
}

void CueTime::Write(std::ostream& out) const {
    if (binaryIO)
        WriteBinary(out);
    else
        out << Text();
}

bool CueTime::Read(std::istream& in) {
    if (binaryIO)
        return ReadBinary(in);
    std::string word;
    if (!(in >> word))
        return false;
    return SetText(word);
}

void CueTime::WriteBinary(std::ostream& out) const {
    const uint32_t u = uint32_t(ticks_);
    const char bytes[4] = {char(u >> 24), char(u >> 16), char(u >> 8), char(u)};
    out.write(bytes, 4);
}

bool CueTime::ReadBinary(std::istream& in) {
    unsigned char bytes[4];
    if (!in.read(reinterpret_cast<char*>(bytes), 4))
        return false;
    const uint32_t u = (uint32_t(bytes[0]) << 24) | (uint32_t(bytes[1]) << 16) |
                       (uint32_t(bytes[2]) << 8) | bytes[3];
    ticks_ = int32_t(u);
    return true;
}

std::ostream& operator<<(std::ostream& out, CueTime t) {
    t.Write(out);
    return out;
}
