#include "toolkit/SoundReaderHeader.h"

#include <cmath>
#include <cstring>

#include "toolkit/KLString.h"

namespace {

uint32_t get_be32(const uint8_t* p) {
    return uint32_t(p[0]) << 24 | uint32_t(p[1]) << 16 | uint32_t(p[2]) << 8 | uint32_t(p[3]);
}
uint32_t get_le32(const uint8_t* p) {
    return uint32_t(p[3]) << 24 | uint32_t(p[2]) << 16 | uint32_t(p[1]) << 8 | uint32_t(p[0]);
}
uint16_t get_be16(const uint8_t* p) {
    return uint16_t(p[0] << 8 | p[1]);
}
uint16_t get_le16(const uint8_t* p) {
    return uint16_t(p[1] << 8 | p[0]);
}

void put_be32(uint8_t* p, uint32_t v) {
    p[0] = uint8_t(v >> 24);
    p[1] = uint8_t(v >> 16);
    p[2] = uint8_t(v >> 8);
    p[3] = uint8_t(v);
}
void put_le32(uint8_t* p, uint32_t v) {
    p[3] = uint8_t(v >> 24);
    p[2] = uint8_t(v >> 16);
    p[1] = uint8_t(v >> 8);
    p[0] = uint8_t(v);
}

// A four-character code as text for messages, with unprintable bytes shown as '?'.
std::string fourcc_text(const uint8_t* p) {
    std::string s(4, '?');
    for (int i = 0; i < 4; ++i)
        if (p[i] >= 0x20 && p[i] < 0x7f)
            s[size_t(i)] = char(p[i]);
    return s;
}

void set_reason(std::string* reason, const std::string& text) {
    if (reason)
        *reason = text;
}

// Uncompressed and companded AIFF-C encodings the sound library decodes safely.
bool aiffc_compression_ok(const uint8_t* p) {
    static const char* const kAllowed[] = {"NONE", "none", "twos", "sowt", "raw ", "fl32", "FL32",
                                           "fl64", "FL64", "ulaw", "ULAW", "alaw", "ALAW"};
    for (const char* name : kAllowed)
        if (std::memcmp(p, name, 4) == 0)
            return true;
    return false;
}

// An 80-bit IEEE extended float, as AIFF stores its sample rate.
double get_extended(const uint8_t* p) {
    const int exponent = (p[0] & 0x7f) << 8 | p[1];
    uint64_t mantissa = 0;
    for (int i = 2; i < 10; ++i)
        mantissa = mantissa << 8 | p[i];
    if (exponent == 0x7fff)
        return std::nan("");
    const double value = std::ldexp(double(mantissa), exponent - 16383 - 63);
    return (p[0] & 0x80) ? -value : value;
}

// WAV format tags: PCM, IEEE float, A-law, mu-law.
bool wave_format_ok(uint16_t tag) {
    return tag == 1 || tag == 3 || tag == 6 || tag == 7;
}

}  // namespace

bool SoundReaderHeader::check_layout(long long channels, double rate, std::string* reason) {
    if (channels < 1 || channels > kMaxChannels) {
        set_reason(reason, KLFmt("bad channel count %lld", channels));
        return false;
    }
    // Written so that NaN fails.
    if (!(rate >= 1.0 && rate <= kMaxRate)) {
        set_reason(reason, KLFmt("bad sample rate %g", rate));
        return false;
    }
    return true;
}

SoundReaderHeader::Kind SoundReaderHeader::Identify(const uint8_t* data, size_t size) {
    if (size >= 12 && std::memcmp(data, "FORM", 4) == 0) {
        if (std::memcmp(data + 8, "AIFF", 4) == 0)
            return kAiff;
        if (std::memcmp(data + 8, "AIFC", 4) == 0)
            return kAiffC;
    }
    if (size >= 12 && std::memcmp(data, "RIFF", 4) == 0 && std::memcmp(data + 8, "WAVE", 4) == 0)
        return kWave;
    if (size >= 4 && std::memcmp(data, ".snd", 4) == 0)
        return kNext;
    return kUnknown;
}

bool SoundReaderHeader::Sanitize(std::vector<uint8_t>& bytes, std::string* reason, Result* result) {
    Result local;
    if (!result)
        result = &local;
    *result = Result();
    result->kind = bytes.empty() ? kUnknown : Identify(bytes.data(), bytes.size());
    switch (result->kind) {
        case kAiff:
            return sanitize_aiff(bytes, false, reason, result);
        case kAiffC:
            return sanitize_aiff(bytes, true, reason, result);
        case kWave:
            return sanitize_wave(bytes, reason, result);
        case kNext:
            return sanitize_next(bytes, reason, result);
        case kUnknown:
            break;
    }
    set_reason(reason, bytes.empty() ? "the file is empty"
                                     : "not a sound file (AIFF, AIFF-C, WAV or NeXT/Sun expected)");
    return false;
}

// FORM <size> AIFF|AIFC, then chunks of <id> <big-endian size> <data> padded to even length.
bool SoundReaderHeader::sanitize_aiff(std::vector<uint8_t>& bytes, bool aiffc, std::string* reason,
                                      Result* result) {
    uint8_t* d = bytes.data();
    const uint64_t real = bytes.size() - 8;  // bytes after the FORM header's id and size
    uint64_t form = get_be32(d + 4);
    if (form > real) {
        form = real;
        put_be32(d + 4, uint32_t(form));
    }
    const uint64_t end = 8 + form;
    uint8_t* comm = nullptr;  // data of the COMM chunk
    uint64_t soundBytes = 0;  // sample bytes in the SSND chunk after its offset
    bool ssnd = false;
    uint64_t pos = 12;
    while (pos + 8 <= end) {
        uint8_t* chunk = d + pos;
        uint64_t size = get_be32(chunk + 4);
        const uint64_t avail = end - pos - 8;
        if (size > avail) {
            size = avail;
            put_be32(chunk + 4, uint32_t(size));
        }
        if (std::memcmp(chunk, "COMM", 4) == 0) {
            if (size < (aiffc ? 22u : 18u)) {
                set_reason(reason, KLFmt("COMM chunk too short (%u bytes)", unsigned(size)));
                return false;
            }
            if (aiffc && !aiffc_compression_ok(chunk + 8 + 18)) {
                set_reason(reason,
                           "unsupported AIFF-C compression '" + fourcc_text(chunk + 8 + 18) + "'");
                return false;
            }
            comm = chunk + 8;
            if (!check_layout(get_be16(comm), get_extended(comm + 8), reason))
                return false;
            const int bits = get_be16(comm + 6);
            if (bits < 1 || bits > 64) {
                set_reason(reason, KLFmt("bad sample size %d bits", bits));
                return false;
            }
        } else if (std::memcmp(chunk, "SSND", 4) == 0) {
            if (size < 8) {
                set_reason(reason, "SSND chunk too short");
                return false;
            }
            // The offset to the first sample frame must stay inside the chunk.
            if (get_be32(chunk + 8) > size - 8)
                put_be32(chunk + 8, uint32_t(size - 8));
            soundBytes = size - 8 - get_be32(chunk + 8);
            ssnd = true;
        }
        pos += 8 + size + (size & 1);
    }
    if (!comm) {
        set_reason(reason, "no COMM chunk (sample format) in the file");
        return false;
    }
    if (!ssnd) {
        set_reason(reason, "no SSND chunk (sound data) in the file");
        return false;
    }

    // The frame count comes from COMM; the library would try to read all of it and, on a cut
    // file, lose the frames of the last partial block. Promise only the frames present.
    const uint64_t channels = get_be16(comm);
    uint64_t sampleBytes = (get_be16(comm + 6) + 7u) / 8u;
    if (aiffc) {
        const uint8_t* type = comm + 18;
        if (std::memcmp(type, "fl32", 4) == 0 || std::memcmp(type, "FL32", 4) == 0)
            sampleBytes = 4;
        else if (std::memcmp(type, "fl64", 4) == 0 || std::memcmp(type, "FL64", 4) == 0)
            sampleBytes = 8;
        else if (std::memcmp(type, "ulaw", 4) == 0 || std::memcmp(type, "ULAW", 4) == 0 ||
                 std::memcmp(type, "alaw", 4) == 0 || std::memcmp(type, "ALAW", 4) == 0)
            sampleBytes = 1;
    }
    const uint64_t frameBytes = channels * sampleBytes;
    if (frameBytes > 0) {
        const uint64_t present = soundBytes / frameBytes;
        const uint64_t claimed = get_be32(comm + 2);
        if (claimed > present) {
            put_be32(comm + 2, uint32_t(present));
            result->claimedFrames = (long long)claimed;
        }
    }
    return true;
}

// RIFF <little-endian size> WAVE, then chunks of <id> <little-endian size> <data> padded to
// even length.
bool SoundReaderHeader::sanitize_wave(std::vector<uint8_t>& bytes, std::string* reason,
                                      Result* result) {
    uint8_t* d = bytes.data();
    const uint64_t real = bytes.size() - 8;
    uint64_t riff = get_le32(d + 4);
    if (riff > real) {
        riff = real;
        put_le32(d + 4, uint32_t(riff));
    }
    const uint64_t end = 8 + riff;
    uint64_t blockAlign = 0;  // bytes per frame, from the fmt chunk
    bool fmt = false;
    bool data = false;
    uint64_t claimedBytes = 0;  // data size as written, when larger than what is present
    uint64_t pos = 12;
    while (pos + 8 <= end) {
        uint8_t* chunk = d + pos;
        uint64_t size = get_le32(chunk + 4);
        const uint64_t avail = end - pos - 8;
        if (size > avail) {
            // 0xFFFFFFFF (and 0) are what streaming writers leave when the length is unknown.
            if (std::memcmp(chunk, "data", 4) == 0 && size != 0xFFFFFFFFu)
                claimedBytes = size;
            size = avail;
            put_le32(chunk + 4, uint32_t(size));
        }
        if (std::memcmp(chunk, "fmt ", 4) == 0) {
            if (size < 16) {
                set_reason(reason, KLFmt("fmt chunk too short (%u bytes)", unsigned(size)));
                return false;
            }
            uint16_t tag = get_le16(chunk + 8);
            if (tag == 0xFFFE) {
                // WAVE_FORMAT_EXTENSIBLE: the real tag opens the sub-format GUID.
                if (size < 40) {
                    set_reason(reason, "extensible fmt chunk too short");
                    return false;
                }
                tag = get_le16(chunk + 8 + 24);
            }
            if (!wave_format_ok(tag)) {
                set_reason(reason, KLFmt("unsupported WAV encoding 0x%04x", unsigned(tag)));
                return false;
            }
            if (!check_layout(get_le16(chunk + 8 + 2), get_le32(chunk + 8 + 4), reason))
                return false;
            const int bits = get_le16(chunk + 8 + 14);
            if (bits < 1 || bits > 64) {
                set_reason(reason, KLFmt("bad sample size %d bits", bits));
                return false;
            }
            blockAlign = get_le16(chunk + 8 + 12);
            fmt = true;
        } else if (std::memcmp(chunk, "data", 4) == 0) {
            data = true;
        }
        pos += 8 + size + (size & 1);
    }
    if (!fmt) {
        set_reason(reason, "no fmt chunk (sample format) in the file");
        return false;
    }
    if (!data) {
        set_reason(reason, "no data chunk in the file");
        return false;
    }
    if (claimedBytes > 0 && blockAlign > 0)
        result->claimedFrames = (long long)(claimedBytes / blockAlign);
    return true;
}

// ".snd" <data offset> <data size> <encoding> <rate> <channels>, all big-endian 32-bit.
bool SoundReaderHeader::sanitize_next(std::vector<uint8_t>& bytes, std::string* reason,
                                      Result* result) {
    if (bytes.size() < 24) {
        set_reason(reason, "NeXT/Sun header too short");
        return false;
    }
    uint8_t* d = bytes.data();
    const uint64_t offset = get_be32(d + 4);
    if (offset < 24 || offset > bytes.size()) {
        set_reason(reason, KLFmt("bad NeXT/Sun data offset %llu", (unsigned long long)offset));
        return false;
    }
    const uint32_t encoding = get_be32(d + 12);
    // Bytes per sample of mu-law, 8/16/24/32-bit linear, float, double; A-law is 27.
    static const int kSampleBytes[] = {0, 1, 1, 2, 3, 4, 4, 8};
    const uint64_t sampleBytes = encoding < 8 ? kSampleBytes[encoding] : encoding == 27 ? 1 : 0;
    if (sampleBytes == 0) {
        set_reason(reason, KLFmt("unsupported NeXT/Sun encoding %u", unsigned(encoding)));
        return false;
    }
    if (!check_layout(get_be32(d + 20), get_be32(d + 16), reason))
        return false;
    const uint64_t avail = bytes.size() - offset;
    const uint64_t size = get_be32(d + 8);
    if (size > avail) {
        put_be32(d + 8, uint32_t(avail));
        const uint64_t frameBytes = sampleBytes * get_be32(d + 20);
        if (size != 0xFFFFFFFFu && frameBytes > 0)
            result->claimedFrames = (long long)(size / frameBytes);
    }
    return true;
}
