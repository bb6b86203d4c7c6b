#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

// Checks and repairs the container of a sound file image held in memory before the sound
// library parses it. The library trusts the size fields it reads: a FORM or RIFF size larger
// than the file makes it walk zero-filled "chunks" for a very long time, and a data chunk that
// claims more bytes than there are makes it promise frames it cannot deliver. This class
// rewrites such fields, in place, to what the bytes really hold, and refuses containers and
// encodings that this program does not read (compressed ADPCM codecs and formats other than
// AIFF, AIFF-C, WAV and NeXT/Sun).
class SoundReaderHeader {
  public:
    enum Kind { kUnknown, kAiff, kAiffC, kWave, kNext };

    // Limits beyond which a header is taken to be damaged rather than describing a sound.
    static constexpr double kMaxRate = 1536000.0;  // frames per second
    static constexpr int kMaxChannels = 64;

    // What Sanitize found besides the repairs.
    struct Result {
        Kind kind = kUnknown;
        // The sample frames the header promised when the data was cut short (the header now
        // promises only the frames present); -1 when nothing is missing or the count is not
        // known.
        long long claimedFrames = -1;
    };

    // Clamps the size fields of `bytes` to its real size. Returns false, with the reason in
    // *reason, when the image is not a sound this program reads.
    static bool Sanitize(std::vector<uint8_t>& bytes, std::string* reason,
                         Result* result = nullptr);

    // The container kind named by the first bytes, without checking the rest.
    static Kind Identify(const uint8_t* data, size_t size);

  private:
    // False, with the reason, for a channel count or rate outside the limits (NaN included).
    static bool check_layout(long long channels, double rate, std::string* reason);
    static bool sanitize_aiff(std::vector<uint8_t>& bytes, bool aiffc, std::string* reason,
                              Result* result);
    static bool sanitize_wave(std::vector<uint8_t>& bytes, std::string* reason, Result* result);
    static bool sanitize_next(std::vector<uint8_t>& bytes, std::string* reason, Result* result);
};
