#include "toolkit/CueSound.h"

#include <af_vfs.h>
#include <audiofile.h>
#include <samplerate.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <mutex>

#include "toolkit/KLErrHandler.h"
#include "toolkit/KLSoundControl.h"
#include "toolkit/KLString.h"
#include "toolkit/SoundReaderHeader.h"

namespace {

// Limits beyond which a header is taken to be damaged rather than describing a real sound.
constexpr double kMaxRate = SoundReaderHeader::kMaxRate;       // frames per second
constexpr int kMaxChannels = SoundReaderHeader::kMaxChannels;  // channels in one file
constexpr long long kMaxFrames = 1LL << 40;                    // sample frames claimed by a header
constexpr long long kMaxFileBytes = 1LL << 31;  // bytes of a sound file read into memory
constexpr int kReadChunk = 8192;                // frames decoded per call

// Messages of the sound library while a load is under way on this thread; null between
// loads, when the few messages that can still arrive become warnings.
thread_local std::string* af_messages = nullptr;

void af_error_cb(long /*code*/, const char* message) {
    const char* text = message ? message : "unknown error";
    if (af_messages) {
        if (!af_messages->empty())
            *af_messages += "; ";
        *af_messages += text;
    } else {
        KLWarning("Sound library: %s\n", text);
    }
}

// Routes the sound library's messages to af_error_cb for as long as it lives; the library
// itself then never writes to the terminal.
class AfMessageScope {
  public:
    AfMessageScope() : previous_(af_messages) {
        static std::once_flag installed;
        std::call_once(installed, [] { afSetErrorHandler(af_error_cb); });
        af_messages = &text_;
    }
    ~AfMessageScope() { af_messages = previous_; }
    AfMessageScope(const AfMessageScope&) = delete;
    AfMessageScope& operator=(const AfMessageScope&) = delete;
    const std::string& Text() const { return text_; }

  private:
    std::string text_;
    std::string* previous_;
};

// A read-only file over a byte range owned by the caller, for afOpenVirtualFile. The library
// owns the AFvirtualfile itself and calls destroy when it closes the handle; the bytes stay
// the caller's.
struct MemoryFile {
    const uint8_t* data;
    size_t size;
    size_t pos;
};

MemoryFile* memory_of(AFvirtualfile* vf) {
    return static_cast<MemoryFile*>(vf->closure);
}

ssize_t mem_read(AFvirtualfile* vf, void* out, size_t nbytes) {
    MemoryFile* m = memory_of(vf);
    if (m->pos >= m->size)
        return 0;
    const size_t n = std::min(nbytes, m->size - m->pos);
    std::memcpy(out, m->data + m->pos, n);
    m->pos += n;
    return ssize_t(n);
}

AFfileoffset mem_length(AFvirtualfile* vf) {
    return AFfileoffset(memory_of(vf)->size);
}

ssize_t mem_write(AFvirtualfile*, const void*, size_t) {
    return -1;
}

void mem_destroy(AFvirtualfile*) {}

AFfileoffset mem_seek(AFvirtualfile* vf, AFfileoffset offset, int is_relative) {
    MemoryFile* m = memory_of(vf);
    const long long base = is_relative ? (long long)m->pos : 0;
    if (offset > 0 && base > LLONG_MAX - offset)
        return -1;
    const long long target = base + offset;
    if (target < 0)
        return -1;
    // Seeking past the end is allowed, as on a real file; reads there give nothing.
    m->pos = size_t(target);
    return AFfileoffset(target);
}

AFfileoffset mem_tell(AFvirtualfile* vf) {
    return AFfileoffset(memory_of(vf)->pos);
}

// Closes a sound library handle on every way out of load().
struct HandleCloser {
    AFfilehandle handle;
    ~HandleCloser() {
        if (handle != AF_NULL_FILEHANDLE)
            afCloseFile(handle);
    }
};

// The whole of the file `path` in `bytes`; false with the reason otherwise.
bool read_whole_file(const char* path, std::vector<uint8_t>& bytes, std::string* reason) {
    struct stat st;
    if (stat(path, &st) != 0) {
        *reason = errno == ENOENT ? "no such file" : std::strerror(errno);
        return false;
    }
    if (S_ISDIR(st.st_mode)) {
        *reason = "it is a directory";
        return false;
    }
    FILE* f = std::fopen(path, "rb");
    if (!f) {
        *reason = std::strerror(errno);
        return false;
    }
    // Read to the end rather than trusting st_size, which is 0 for pipes and devices.
    bytes.clear();
    uint8_t block[65536];
    size_t n;
    while ((n = std::fread(block, 1, sizeof block, f)) > 0) {
        if ((long long)(bytes.size() + n) > kMaxFileBytes) {
            std::fclose(f);
            *reason = "the file is too large for a sound file";
            return false;
        }
        bytes.insert(bytes.end(), block, block + n);
    }
    const bool failed = std::ferror(f) != 0;
    std::fclose(f);
    if (failed) {
        *reason = "read error";
        return false;
    }
    return true;
}

}  // namespace
CueSound::~CueSound() {
    KLSoundControl::Forget(this);
}

CueSound::CueSound(const char* path) {
    fileName_ = path ? path : "";
    if (!path || !*path) {
        fail("no file name given");
        return;
    }
    std::vector<uint8_t> bytes;
    std::string reason;
    if (!read_whole_file(path, bytes, &reason)) {
        fail(reason);
        return;
    }
    load(bytes);
}

std::unique_ptr<CueSound> CueSound::FromMemory(const void* data, size_t size, const char* name) {
    auto sound = std::make_unique<CueSound>();
    sound->fileName_ = name ? name : "";
    if (!data && size > 0) {
        sound->fail("no data");
        return sound;
    }
    if ((long long)size > kMaxFileBytes) {
        sound->fail("the file is too large for a sound file");
        return sound;
    }
    const uint8_t* begin = static_cast<const uint8_t*>(data);
    std::vector<uint8_t> bytes(begin, begin + size);
    sound->load(bytes);
    return sound;
}

std::unique_ptr<CueSound> CueSound::FromSamples(std::vector<std::vector<float>> channels,
                                                double rate) {
    auto sound = std::make_unique<CueSound>();
    if (channels.empty()) {
        sound->fail("no channels");
        return sound;
    }
    for (const auto& c : channels) {
        if (c.size() != channels[0].size()) {
            sound->fail("channels of different lengths");
            return sound;
        }
    }
    if (!(rate > 0 && rate <= kMaxRate)) {
        sound->fail(KLFmt("bad sample rate %g", rate));
        return sound;
    }
    sound->channels_ = std::move(channels);
    sound->rate_ = rate;
    return sound;
}

void CueSound::fail(const std::string& reason) {
    channels_.clear();
    rate_ = 0.0;
    min_ = max_ = 0.0f;
    error_ = "Could not open sound file [" + fileName_ + "]: " + reason;
    KLError("%s\n", error_.c_str());
}

void CueSound::load(std::vector<uint8_t>& bytes) {
    std::string reason;
    SoundReaderHeader::Result header;
    if (!SoundReaderHeader::Sanitize(bytes, &reason, &header)) {
        fail(reason);
        return;
    }

    MemoryFile memory{bytes.data(), bytes.size(), 0};
    AFvirtualfile* vf = af_virtual_file_new();
    if (!vf) {
        fail("out of memory");
        return;
    }
    vf->read = mem_read;
    vf->length = mem_length;
    vf->write = mem_write;
    vf->destroy = mem_destroy;
    vf->seek = mem_seek;
    vf->tell = mem_tell;
    vf->closure = &memory;

    AfMessageScope messages;
    HandleCloser closer{afOpenVirtualFile(vf, "r", AF_NULL_FILESETUP)};
    AFfilehandle fh = closer.handle;
    if (fh == AF_NULL_FILEHANDLE) {
        fail(messages.Text().empty() ? "the sound library could not read it" : messages.Text());
        return;
    }

    const double rate = afGetRate(fh, AF_DEFAULT_TRACK);
    const int channels = afGetChannels(fh, AF_DEFAULT_TRACK);
    const long long frames = afGetFrameCount(fh, AF_DEFAULT_TRACK);
    // Written so that NaN fails every test.
    if (!(rate >= 1.0 && rate <= kMaxRate)) {
        fail(KLFmt("bad sample rate %g", rate));
        return;
    }
    if (channels < 1 || channels > kMaxChannels) {
        fail(KLFmt("bad channel count %d", channels));
        return;
    }
    if (frames <= 0 || frames > kMaxFrames) {
        fail(frames == 0 ? std::string("no sample frames")
                         : KLFmt("bad sample frame count %lld", frames));
        return;
    }
    if (afSetVirtualSampleFormat(fh, AF_DEFAULT_TRACK, AF_SAMPFMT_FLOAT, 32) != 0 ||
        afSetVirtualByteOrder(fh, AF_DEFAULT_TRACK,
                              __BYTE_ORDER__ == __ORDER_BIG_ENDIAN__
                                  ? AF_BYTEORDER_BIGENDIAN
                                  : AF_BYTEORDER_LITTLEENDIAN) != 0) {
        fail(messages.Text().empty() ? "cannot convert its samples to float" : messages.Text());
        return;
    }

    // Decode in chunks and let the channel vectors grow with what really arrives: the frame
    // count of a damaged header may be far larger than the data.
    channels_.assign(size_t(channels), {});
    rate_ = rate;
    std::vector<float> buffer(size_t(kReadChunk) * size_t(channels));
    long long total = 0;
    while (total < frames) {
        const int want = int(std::min<long long>(kReadChunk, frames - total));
        const int got = afReadFrames(fh, AF_DEFAULT_TRACK, buffer.data(), want);
        if (got <= 0)
            break;
        const int n = std::min(got, want);
        for (int c = 0; c < channels; ++c) {
            std::vector<float>& out = channels_[size_t(c)];
            const size_t base = out.size();
            out.resize(base + size_t(n));
            const float* in = buffer.data() + c;
            for (int i = 0; i < n; ++i, in += channels) {
                // Float files may hold NaN or infinities; they would poison every sum.
                out[base + size_t(i)] = std::isfinite(*in) ? *in : 0.0f;
            }
        }
        total += n;
        if (n < want)
            break;
    }

    if (total == 0) {
        fail(messages.Text().empty() ? "no sample frames could be read" : messages.Text());
        return;
    }
    // A cut file has had its header shortened to the frames present; the frame count it
    // first claimed is what the user should hear about.
    const long long claimed = std::max(frames, header.claimedFrames);
    if (total < claimed) {
        error_ = KLFmt("Sound file [%s] is short: read %lld of %lld sample frames",
                       fileName_.c_str(), total, claimed);
        if (!messages.Text().empty())
            error_ += " (" + messages.Text() + ")";
        KLWarning("%s\n", error_.c_str());
    }
}

float CueSound::Length() const {
    if (rate_ <= 0)
        return 0.0f;
    return float(FrameCount()) / float(rate_);
}

void CueSound::ComputeMinMax() {
    bool any = false;
    float lo = 0.0f;
    float hi = 0.0f;
    for (const auto& channel : channels_) {
        for (float v : channel) {
            if (!any) {
                lo = hi = v;
                any = true;
            } else {
                lo = std::min(lo, v);
                hi = std::max(hi, v);
            }
        }
    }
    min_ = lo;
    max_ = hi;
}

std::vector<float> CueSound::ChannelData(int channel) const {
    if (channel >= 0) {
        if (channel >= ChannelCount())
            return {};
        return channels_[size_t(channel)];
    }
    if (channel != -1 || channels_.empty())
        return {};
    if (channels_.size() == 1)
        return channels_[0];
    std::vector<float> mix(channels_[0].size(), 0.0f);
    for (const auto& c : channels_)
        for (size_t i = 0; i < mix.size(); ++i)
            mix[i] += c[i];
    const float scale = 1.0f / float(channels_.size());
    for (float& v : mix)
        v *= scale;
    return mix;
}

std::unique_ptr<CueSound> CueSound::Copy() const {
    return std::make_unique<CueSound>(*this);
}

std::unique_ptr<CueSound> CueSound::Excerpt(double startSeconds, double endSeconds) const {
    auto excerpt = std::make_unique<CueSound>();
    excerpt->rate_ = rate_;
    excerpt->fileName_ = fileName_;
    excerpt->error_ = error_;
    if (channels_.empty() || rate_ <= 0)
        return excerpt;
    long begin = 0, end = 0;
    frame_range(startSeconds, endSeconds, begin, end);
    for (const auto& c : channels_)
        excerpt->channels_.emplace_back(c.begin() + begin, c.begin() + end);
    if (min_ != 0.0f || max_ != 0.0f)
        excerpt->ComputeMinMax();
    return excerpt;
}

void CueSound::frame_range(double startSeconds, double endSeconds, long& begin, long& end) const {
    const long frames = FrameCount();
    // Frame i sounds at i / rate seconds; keep the frames whose time is in [start, end). The
    // small tolerance keeps a time that is a whole frame in decimal (0.1 s at 44.1 kHz) on
    // that frame despite rounding.
    auto first_frame_at = [&](double seconds) -> long {
        if (!(seconds > 0))
            return 0;  // also NaN
        const double f = std::ceil(seconds * rate_ - 1e-6);
        return f >= double(frames) ? frames : long(f);
    };
    begin = first_frame_at(startSeconds);
    end = std::max(begin, first_frame_at(endSeconds));
}

void CueSound::Trim(double startSeconds, double endSeconds) {
    if (channels_.empty() || rate_ <= 0)
        return;
    long begin = 0, end = 0;
    frame_range(startSeconds, endSeconds, begin, end);
    for (auto& c : channels_) {
        c.erase(c.begin() + end, c.end());
        c.erase(c.begin(), c.begin() + begin);
    }
    if (min_ != 0.0f || max_ != 0.0f)
        ComputeMinMax();
}

std::vector<float> CueSound::Resampled(double rate) const {
    std::vector<float> mix = ChannelData(-1);
    if (mix.empty() || rate_ <= 0 || !(rate > 0))
        return {};
    const double ratio = rate / rate_;
    if (ratio == 1.0)
        return mix;
    if (!src_is_valid_ratio(ratio))
        return {};
    std::vector<float> out(size_t(std::ceil(double(mix.size()) * ratio)) + 64);
    SRC_DATA data{};
    data.data_in = mix.data();
    data.data_out = out.data();
    data.input_frames = long(mix.size());
    data.output_frames = long(out.size());
    data.src_ratio = ratio;
    data.end_of_input = 1;
    // The fastest band-limited converter: clean enough for recognizers, and a minute of sound
    // converts in about a second.
    if (src_simple(&data, SRC_SINC_FASTEST, 1) != 0)
        return {};
    out.resize(size_t(data.output_frames_gen));
    return out;
}
