#pragma once

#include <cstdint>
#include <iosfwd>
#include <string>

// A time on the workspace's time line, held as one signed 32-bit count of ticks, 6000 ticks
// per second. Frames are at CueTime::default_fps unless a rate is given; converting ticks to
// frames is ticks * fps / 6000.0 in double precision, and to a whole frame truncates toward
// zero. Times built from frames or seconds round to the nearest tick and saturate at the
// 32-bit range (about 99 hours either side of zero), so no input can overflow.
class CueTime {
  public:
    static constexpr int32_t kTicksPerSecond = 6000;
    static constexpr int kDefaultFps = 30;  // the frame rate when none is set
    static int default_fps;  // the workspace frame rate, kDefaultFps unless Imp::SetFps changes it
    // The frame rate that conversions use: `fps` when positive, else default_fps when
    // positive, else kDefaultFps.
    static int Rate(int fps = 0);
    static int binaryIO;  // nonzero: Write/Read use the binary form

    constexpr CueTime() = default;
    // `frames` frames at `fps` frames per second; fps <= 0 means default_fps.
    CueTime(double frames, int fps);
    // Hours, minutes, seconds and frames at `fps` (<= 0: default_fps).
    CueTime(int hours, int minutes, int seconds, int frames, int fps);

    static constexpr CueTime FromTicks(int32_t ticks) { return CueTime(ticks, Tag{}); }
    static CueTime FromSeconds(double seconds);
    static CueTime FromFrames(double frames) { return CueTime(frames, 0); }

    void SetTimecode(int hours, int minutes, int seconds, int frames, int fps = 0);
    void SetTicks(int32_t ticks) { ticks_ = ticks; }

    constexpr int32_t Ticks() const { return ticks_; }
    double Seconds() const { return ticks_ / double(kTicksPerSecond); }
    // Frames at `fps` (<= 0: default_fps) as a double, and as a whole frame truncated to zero.
    double Frames(int fps = 0) const;
    int Frame(int fps = 0) const;
    // Splits a non-negative time into hours, minutes, seconds and frames (truncated);
    // a negative time gives the parts of its magnitude and `negative` set.
    void Timecode(int* hours, int* minutes, int* seconds, int* frames, bool* negative = nullptr,
                  int fps = 0) const;

    // Text form: the time in frames at default_fps, written with as few digits as read back
    // to the same tick ("12", "-3.5", "0.005"). Read also takes "h:m:s:f" timecode. Both
    // return false on text that is not a time and then leave the time unchanged.
    std::string Text() const;
    bool SetText(const std::string& text);
    void Write(std::ostream& out) const;
    bool Read(std::istream& in);
    // Binary form: the tick count as four bytes, most significant first.
    void WriteBinary(std::ostream& out) const;
    bool ReadBinary(std::istream& in);

    constexpr bool operator==(CueTime o) const { return ticks_ == o.ticks_; }
    constexpr bool operator!=(CueTime o) const { return ticks_ != o.ticks_; }
    constexpr bool operator<(CueTime o) const { return ticks_ < o.ticks_; }
    constexpr bool operator<=(CueTime o) const { return ticks_ <= o.ticks_; }
    constexpr bool operator>(CueTime o) const { return ticks_ > o.ticks_; }
    constexpr bool operator>=(CueTime o) const { return ticks_ >= o.ticks_; }
    // Sums and differences saturate at the 32-bit range.
    CueTime operator+(CueTime o) const { return Saturated(int64_t(ticks_) + o.ticks_); }
    CueTime operator-(CueTime o) const { return Saturated(int64_t(ticks_) - o.ticks_); }
    CueTime operator-() const { return Saturated(-int64_t(ticks_)); }
    CueTime& operator+=(CueTime o) { return *this = *this + o; }
    CueTime& operator-=(CueTime o) { return *this = *this - o; }

    // Rounds a tick count in double precision to the nearest tick within the 32-bit range;
    // NaN gives zero.
    static int32_t ClampTicks(double ticks);

  private:
    struct Tag {};
    constexpr CueTime(int32_t ticks, Tag) : ticks_(ticks) {}
    static CueTime Saturated(int64_t ticks);

    int32_t ticks_ = 0;
};

std::ostream& operator<<(std::ostream& out, CueTime t);
