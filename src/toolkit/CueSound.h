#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

// A sound held in memory: 32-bit float samples per channel, in -1..1 for integer formats.
// Reads AIFF and AIFF-C (8/16/24/32-bit integer, float, mu-law and A-law), WAV and NeXT/Sun
// sound files through audiofile. A file that cannot be read leaves an empty sound (no
// channels, no frames) and says why in ErrorText().
class CueSound {
  public:
    CueSound() = default;
    // Stops the sound output first when it is playing this sound.
    ~CueSound();
    CueSound(const CueSound&) = default;
    // The sound output's thread may be reading a sound's samples: a sound is replaced by
    // another object (whose destructor stops the output), never overwritten in place.
    CueSound& operator=(const CueSound&) = delete;
    // Reads the sound file `path`; check Valid() afterwards.
    explicit CueSound(const char* path);

    // Reads a whole sound file image from memory; `name` is only used in messages.
    static std::unique_ptr<CueSound> FromMemory(const void* data, size_t size, const char* name);
    // A sound made of the given channels (all of one length) at `rate` frames per second.
    static std::unique_ptr<CueSound> FromSamples(std::vector<std::vector<float>> channels,
                                                 double rate);

    bool Valid() const { return !channels_.empty() && rate_ > 0; }
    // Why the file could not be read, or why it was read only in part; empty when all is well.
    const std::string& ErrorText() const { return error_; }
    const std::string& FileName() const { return fileName_; }

    double Rate() const { return rate_; }
    int ChannelCount() const { return int(channels_.size()); }
    long FrameCount() const { return channels_.empty() ? 0 : long(channels_[0].size()); }
    // Length in seconds: frame count / rate as floats.
    float Length() const;

    // The lowest and highest sample over all channels, as computed by ComputeMinMax (both
    // zero for an empty sound).
    void ComputeMinMax();
    float Min() const { return min_; }
    float Max() const { return max_; }

    // Samples of one channel; `channel` -1 gives the mix (mean) of all channels. An
    // out-of-range channel gives an empty vector.
    std::vector<float> ChannelData(int channel) const;
    const std::vector<float>& Channel(int channel) const { return channels_.at(size_t(channel)); }

    std::unique_ptr<CueSound> Copy() const;
    // Keeps only the frames of [startSeconds, endSeconds) (clamped to the sound). Not on a
    // sound being played: trim a Copy.
    void Trim(double startSeconds, double endSeconds);
    // A new sound of the frames Trim would keep, copied without copying the rest: a short
    // region of a long sound costs only its own length.
    std::unique_ptr<CueSound> Excerpt(double startSeconds, double endSeconds) const;
    // The mix of all channels resampled to `rate` frames per second (16 kHz for recognizers);
    // empty for an empty sound or a rate outside 1/256 to 256 times the sound's own.
    std::vector<float> Resampled(double rate) const;

  private:
    // The frames [begin, end) whose times lie in [startSeconds, endSeconds), clamped.
    void frame_range(double startSeconds, double endSeconds, long& begin, long& end) const;
    // Decodes a whole sound file image; `bytes` has its size fields repaired in place.
    void load(std::vector<uint8_t>& bytes);
    // Empties the sound and keeps "Could not open sound file [name]: reason" as the error.
    void fail(const std::string& reason);

    std::vector<std::vector<float>> channels_;
    double rate_ = 0.0;
    float min_ = 0.0f;
    float max_ = 0.0f;
    std::string error_;
    std::string fileName_;
};
