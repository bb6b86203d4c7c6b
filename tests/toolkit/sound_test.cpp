// Sound files are written here with audiofile's own writer (then damaged byte by byte where a
// case wants it) and read back through CueSound, checking the decoded samples themselves.

#include <audiofile.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <cmath>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "toolkit/CueSound.h"
#include "toolkit/KLErrHandler.h"

namespace fs = std::filesystem;

namespace {

using Bytes = std::vector<uint8_t>;
using Samples = std::vector<std::vector<float>>;  // per channel

// Keeps the reports of the toolkit instead of printing them.
class CaptureErrors : public KLErrHandler {
  public:
    void Handle(KLErr* e) override { reports.push_back({e->Level(), e->Message()}); }
    std::vector<std::pair<int, std::string>> reports;
};

// How one test file is written: container, sample format and layout.
struct SoundFormat {
    const char* name;
    int fileFormat;    // AF_FILE_...
    int sampleFormat;  // AF_SAMPFMT_TWOSCOMP or AF_SAMPFMT_FLOAT
    int width;         // bits per sample in the file
    int compression;   // AF_COMPRESSION_...
    int channels;
    double rate;
    float tolerance;  // allowed difference from the exact value (lossy encodings)
};

constexpr long kFrames = 10000;  // more than one decoding chunk
constexpr float kExact = 1e-7f;
const SoundFormat kAiff16 = {
    "aiff16", AF_FILE_AIFF, AF_SAMPFMT_TWOSCOMP, 16, AF_COMPRESSION_NONE, 1, 8000, kExact};

Bytes read_bytes(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return Bytes(std::istreambuf_iterator<char>(in), {});
}
void write_bytes(const std::string& path, const Bytes& bytes) {
    std::ofstream(path, std::ios::binary)
        .write(reinterpret_cast<const char*>(bytes.data()), std::streamsize(bytes.size()));
}

// Writes kFrames frames in `f` and returns the values a reader should get back: a 440 Hz sine
// on channel 0 and a ramp from the most negative code on channel 1, as floats in -1..1 for
// integer formats (float files go beyond -1..1 and must stay so).
Samples write_sound(const std::string& path, const SoundFormat& f) {
    AFfilesetup setup = afNewFileSetup();
    afInitFileFormat(setup, f.fileFormat);
    afInitChannels(setup, AF_DEFAULT_TRACK, f.channels);
    afInitRate(setup, AF_DEFAULT_TRACK, f.rate);
    afInitSampleFormat(setup, AF_DEFAULT_TRACK, f.sampleFormat, f.width);
    afInitCompression(setup, AF_DEFAULT_TRACK, f.compression);
    AFfilehandle out = afOpenFile(path.c_str(), "w", setup);
    afFreeFileSetup(setup);
    Samples expected(size_t(f.channels));
    EXPECT_NE(out, AF_NULL_FILEHANDLE) << path;
    if (out == AF_NULL_FILEHANDLE)
        return expected;
    // Integer samples are given as exact codes / 2^(width - 1) in doubles; companded encodings
    // take 16-bit samples.
    const bool isFloat = f.sampleFormat == AF_SAMPFMT_FLOAT;
    const double full = std::ldexp(1.0, (f.compression == AF_COMPRESSION_NONE ? f.width : 16) - 1);
    afSetVirtualSampleFormat(out, AF_DEFAULT_TRACK, AF_SAMPFMT_DOUBLE, 64);
    std::vector<double> data;
    for (long i = 0; i < kFrames; ++i) {
        for (int c = 0; c < f.channels; ++c) {
            double v = c == 0 ? 0.8 * std::sin(2 * M_PI * 440.0 * double(i) / f.rate)
                              : -1.0 + 2.0 * double(i) / double(kFrames);
            double code = c == 1 && i == 0 ? -full : std::round(v * (full - 1));  // lowest first
            data.push_back(isFloat ? double(float(v * 1.25)) : code / full);
            expected[size_t(c)].push_back(float(data.back()));
        }
    }
    EXPECT_EQ(afWriteFrames(out, AF_DEFAULT_TRACK, data.data(), int(kFrames)), kFrames);
    afCloseFile(out);
    return expected;
}

// The first `frames` frames of every channel of `sound` are `expected`, and no more.
void expect_samples(const CueSound& sound, const Samples& expected, float tolerance, long frames) {
    ASSERT_EQ(sound.ChannelCount(), int(expected.size()));
    ASSERT_EQ(sound.FrameCount(), frames);
    for (size_t c = 0; c < expected.size(); ++c) {
        for (long i = 0; i < frames; ++i) {
            ASSERT_NEAR(sound.Channel(int(c))[size_t(i)], expected[c][size_t(i)], tolerance)
                << "channel " << c << " frame " << i;
        }
    }
}

// Offset of the first chunk with this id, or 0 when there is none.
size_t chunk(const Bytes& bytes, const char* id) {
    for (size_t i = 12; i + 4 <= bytes.size(); ++i)
        if (std::memcmp(&bytes[i], id, 4) == 0)
            return i;
    return 0;
}
void put32(Bytes& b, size_t at, uint32_t v, bool bigEndian = true) {
    for (int k = 0; k < 4; ++k)
        b[at + size_t(k)] = uint8_t(v >> (bigEndian ? 24 - 8 * k : 8 * k));
}
// A NeXT/Sun header with data at 44, 80 bytes of 16-bit linear samples, and the data.
Bytes next_header(uint32_t rate, uint32_t channels) {
    Bytes b(124, 0);
    std::memcpy(b.data(), ".snd", 4);
    for (auto [at, v] :
         {std::pair<size_t, uint32_t>{4, 44}, {8, 80}, {12, 3}, {16, rate}, {20, channels}})
        put32(b, at, v);
    return b;
}
// Start of the COMM chunk's data: channels (2 bytes), frames (4), bits (2), rate (10),
// then in AIFF-C the compression type (4).
size_t comm(const Bytes& b) {
    return chunk(b, "COMM") + 8;
}

class SoundTest : public ::testing::Test {
  protected:
    void SetUp() override {
        dir_ = fs::temp_directory_path() /
               ("chirrup-sound-" + std::to_string(getpid()) + "-" +
                ::testing::UnitTest::GetInstance()->current_test_info()->name());
        fs::remove_all(dir_);
        fs::create_directories(dir_);
    }
    void TearDown() override { fs::remove_all(dir_); }
    std::string Path(const std::string& leaf) const { return (dir_ / leaf).string(); }

    fs::path dir_;
    CaptureErrors errors_;
};

// ---- Every supported format reads back sample for sample, from a file and from memory ----

class SoundFormatTest : public SoundTest, public ::testing::WithParamInterface<SoundFormat> {};

TEST_P(SoundFormatTest, ReadsBackWrittenSamples) {
    const SoundFormat& f = GetParam();
    const std::string path = Path(std::string("sound-") + f.name);
    const Samples expected = write_sound(path, f);
    CueSound sound(path.c_str());
    ASSERT_TRUE(sound.Valid()) << sound.ErrorText();
    EXPECT_EQ(sound.ErrorText(), "");
    EXPECT_DOUBLE_EQ(sound.Rate(), f.rate);
    EXPECT_FLOAT_EQ(sound.Length(), float(kFrames) / float(f.rate));
    expect_samples(sound, expected, f.tolerance, kFrames);
    EXPECT_TRUE(errors_.reports.empty());
    const Bytes bytes = read_bytes(path);
    auto fromMemory = CueSound::FromMemory(bytes.data(), bytes.size(), "memory");
    ASSERT_TRUE(fromMemory->Valid()) << fromMemory->ErrorText();
    expect_samples(*fromMemory, expected, f.tolerance, kFrames);
}

#define FORMAT(name, file, sample, width, compression, channels, rate, tolerance)                 \
    SoundFormat {                                                                                 \
        name, AF_FILE_##file, AF_SAMPFMT_##sample, width, AF_COMPRESSION_##compression, channels, \
            rate, tolerance                                                                       \
    }
INSTANTIATE_TEST_SUITE_P(
    Formats, SoundFormatTest,
    ::testing::Values(FORMAT("aiff8", AIFF, TWOSCOMP, 8, NONE, 1, 8000, kExact),
                      FORMAT("aiff16", AIFF, TWOSCOMP, 16, NONE, 2, 22050, kExact),
                      FORMAT("aiff24", AIFF, TWOSCOMP, 24, NONE, 2, 44100, kExact),
                      FORMAT("aiff32", AIFF, TWOSCOMP, 32, NONE, 1, 48000, kExact),
                      FORMAT("aifcfloat", AIFFC, FLOAT, 32, NONE, 2, 16000, 0.0f),
                      FORMAT("aifc16", AIFFC, TWOSCOMP, 16, NONE, 1, 11025, kExact),
                      FORMAT("aifculaw", AIFFC, TWOSCOMP, 16, G711_ULAW, 1, 8000, 0.04f),
                      FORMAT("wav16", WAVE, TWOSCOMP, 16, NONE, 2, 44100, kExact),
                      FORMAT("wav24", WAVE, TWOSCOMP, 24, NONE, 1, 96000, kExact),
                      FORMAT("wavfloat", WAVE, FLOAT, 32, NONE, 1, 32000, 0.0f),
                      FORMAT("next16", NEXTSND, TWOSCOMP, 16, NONE, 1, 8000, kExact)),
    [](const ::testing::TestParamInfo<SoundFormat>& info) { return info.param.name; });

// ---- Damaged files: one mono 16-bit file of kFrames frames, changed in one way ----

struct Damage {
    const char* name;
    int fileFormat;  // AF_FILE_AIFF, AF_FILE_AIFFC or AF_FILE_WAVE, written as mono 16-bit
    void (*damage)(Bytes&);
    long frames;          // frames still read; 0: the file is refused
    const char* message;  // after "[path]", the whole message; "" when all is well
};

class DamagedSoundTest : public SoundTest, public ::testing::WithParamInterface<Damage> {};

TEST_P(DamagedSoundTest, KeepsWhatCanBeReadAndSaysWhy) {
    const Damage& d = GetParam();
    SoundFormat f = kAiff16;
    f.fileFormat = d.fileFormat;
    const Samples expected = write_sound(Path("good"), f);
    Bytes bytes = read_bytes(Path("good"));
    d.damage(bytes);
    const std::string path = Path("bad");
    write_bytes(path, bytes);
    CueSound sound(path.c_str());
    const bool refused = d.frames == 0, warned = !refused && *d.message;
    const std::string want =
        *d.message
            ? (refused ? "Could not open sound file [" : "Sound file [") + path + "]" + d.message
            : "";
    EXPECT_EQ(sound.ErrorText().substr(0, want.size()), want);  // more may explain the cause
    EXPECT_EQ(sound.ErrorText().empty(), want.empty());
    ASSERT_EQ(errors_.reports.size(), refused || warned ? 1u : 0u);
    if (refused) {
        EXPECT_FALSE(sound.Valid());
        EXPECT_EQ(sound.ChannelCount(), 0);
        EXPECT_EQ(sound.Length(), 0.0f);
        EXPECT_EQ(errors_.reports[0].first, KLErr::kError);
        EXPECT_EQ(errors_.reports[0].second, sound.ErrorText() + "\n");
        return;
    }
    ASSERT_TRUE(sound.Valid());
    expect_samples(sound,
                   {Samples::value_type(expected[0].begin(), expected[0].begin() + d.frames)},
                   kExact, d.frames);
    if (warned) {
        EXPECT_EQ(errors_.reports[0].first, KLErr::kWarning);
    }
}

INSTANTIATE_TEST_SUITE_P(
    Damage, DamagedSoundTest,
    ::testing::Values(
        // Cut after 3001 whole frames and half of the next one.
        Damage{"AiffCut", AF_FILE_AIFF, [](Bytes& b) { b.resize(chunk(b, "SSND") + 16 + 6003); },
               3001, " is short: read 3001 of 10000 sample frames"},
        Damage{"AiffFormSizePastTheEnd", AF_FILE_AIFF, [](Bytes& b) { put32(b, 4, ~0u - 15); },
               kFrames, ""},
        // A sound data chunk claiming more than the file holds: a short read, not a hang.
        Damage{"AiffSoundDataPastTheEnd", AF_FILE_AIFF,
               [](Bytes& b) {
                   put32(b, chunk(b, "SSND") + 4, 0x7FFFFFF0u), b.resize(b.size() - 1000);
               },
               kFrames - 500, " is short: read 9500 of 10000 sample frames"},
        // Sizes as streaming writers leave them.
        Damage{
            "WavSizesUnknown", AF_FILE_WAVE,
            [](Bytes& b) { put32(b, 4, ~0u, false), put32(b, chunk(b, "data") + 4, ~0u, false); },
            kFrames, ""},
        Damage{"WavCut", AF_FILE_WAVE, [](Bytes& b) { b.resize(b.size() - 8001); }, 5999,
               " is short: read 5999 of 10000 sample frames"},
        Damage{"ZeroRate", AF_FILE_AIFF, [](Bytes& b) { std::memset(&b[comm(b) + 8], 0, 10); }, 0,
               ": bad sample rate 0"},
        Damage{"NaNRate", AF_FILE_AIFF,
               [](Bytes& b) { std::memcpy(&b[comm(b) + 8], "\x7F\xFF\xC0", 3); }, 0,
               ": bad sample rate nan"},
        Damage{"ZeroChannels", AF_FILE_AIFF, [](Bytes& b) { b[comm(b) + 1] = 0; }, 0,
               ": bad channel count 0"},
        Damage{"HugeChannels", AF_FILE_AIFF, [](Bytes& b) { b[comm(b)] = 0x69; }, 0,
               ": bad channel count 26881"},
        Damage{"ZeroFrames", AF_FILE_AIFF, [](Bytes& b) { put32(b, comm(b) + 2, 0); }, 0,
               ": no sample frames"},
        Damage{"NoSoundData", AF_FILE_AIFF, [](Bytes& b) { b[chunk(b, "SSND")] = 'X'; }, 0,
               ": no SSND chunk"},
        Damage{"ShortComm", AF_FILE_AIFF, [](Bytes& b) { put32(b, chunk(b, "COMM") + 4, 6); }, 0,
               ": COMM chunk too short"},
        Damage{"UnsafeCompression", AF_FILE_AIFFC,
               [](Bytes& b) { std::memcpy(&b[comm(b) + 18], "ima4", 4); }, 0,
               ": unsupported AIFF-C compression 'ima4'"},
        Damage{"NotASound", AF_FILE_AIFF, [](Bytes& b) { b.assign(300, 'x'); }, 0,
               ": not a sound file"},
        Damage{"Empty", AF_FILE_AIFF, [](Bytes& b) { b.clear(); }, 0, ": the file is empty"},
        Damage{"HeaderOnly", AF_FILE_AIFF, [](Bytes& b) { b.resize(12); }, 0, ": no COMM chunk"},
        // 6881280 channels would take the sound library seconds to set up.
        Damage{"NextHugeChannels", AF_FILE_AIFF, [](Bytes& b) { b = next_header(8000, 0x690000); },
               0, ": bad channel count 6881280"},
        Damage{"NextZeroRate", AF_FILE_AIFF, [](Bytes& b) { b = next_header(0, 1); }, 0,
               ": bad sample rate 0"}),
    [](const ::testing::TestParamInfo<Damage>& info) { return info.param.name; });

TEST_F(SoundTest, MissingFileAndDirectoryAreNamedInTheMessage) {
    const std::string missing = Path("nowhere.aiff");
    EXPECT_EQ(CueSound(missing.c_str()).ErrorText(),
              "Could not open sound file [" + missing + "]: no such file");
    EXPECT_EQ(CueSound(dir_.c_str()).ErrorText(),
              "Could not open sound file [" + dir_.string() + "]: it is a directory");
    EXPECT_EQ(errors_.reports.size(), 2u);
}

// The demo's recording was written by sox, not by audiofile: it must read as espeak-ng made
// it, silent in the pause its phoneme list gives between the two sentences.
TEST_F(SoundTest, ReadsTheDemoDialogue) {
    CueSound sound((std::string(CHIRRUP_SOURCE_DIR) + "/resources/demo/dialogue.aiff").c_str());
    ASSERT_TRUE(sound.Valid()) << sound.ErrorText();
    EXPECT_EQ(sound.ChannelCount(), 1);
    EXPECT_EQ(sound.Rate(), 22050.0);
    EXPECT_EQ(sound.FrameCount(), 84134);
    auto range = [&](double from, double to) {  // of the samples in [from, to) seconds
        auto part = sound.Copy();
        part->Trim(from, to);
        part->ComputeMinMax();
        return std::make_pair(part->Min(), part->Max());
    };
    EXPECT_LT(range(0, 99).first, -0.2f);
    EXPECT_GT(range(0, 99).second, 0.2f);
    EXPECT_EQ(range(0.90, 1.20), std::make_pair(0.0f, 0.0f));
    EXPECT_GT(range(1.23, 1.43).second - range(1.23, 1.43).first, 0.1f);
}

// ---- Operations on a sound in memory ----

TEST(SoundOps, ChannelsMinMaxAndTrim) {
    // Two channels at 1000 frames per second: channel 0 counts frames (i / 1000), channel 1
    // is constant -0.5.
    std::vector<float> a(2000), b(2000, -0.5f);
    for (size_t i = 0; i < a.size(); ++i)
        a[i] = float(i) / 1000.0f;
    auto sound = CueSound::FromSamples({a, b}, 1000.0);
    ASSERT_TRUE(sound->Valid());
    EXPECT_EQ(sound->ChannelData(1), b);
    const std::vector<float> mix = sound->ChannelData(-1);
    ASSERT_EQ(mix.size(), 2000u);
    EXPECT_FLOAT_EQ(mix[0], -0.25f);
    EXPECT_FLOAT_EQ(mix[1500], (1.5f - 0.5f) / 2);
    EXPECT_TRUE(sound->ChannelData(2).empty());
    EXPECT_TRUE(sound->ChannelData(-2).empty());
    EXPECT_EQ(sound->Min(), 0.0f);  // not computed yet
    sound->ComputeMinMax();
    EXPECT_FLOAT_EQ(sound->Min(), -0.5f);
    EXPECT_FLOAT_EQ(sound->Max(), 1.999f);
    EXPECT_FLOAT_EQ(sound->Length(), 2.0f);
    CueSound empty;
    empty.ComputeMinMax();
    EXPECT_TRUE(empty.Min() == 0 && empty.Max() == 0 && empty.Length() == 0);
    EXPECT_TRUE(empty.ChannelData(-1).empty() && empty.Resampled(16000).empty());

    auto copy = sound->Copy();
    copy->Trim(0.25, 0.5);  // [0.25, 0.5)
    ASSERT_EQ(copy->FrameCount(), 250);
    EXPECT_FLOAT_EQ(copy->Channel(0).front(), 0.25f);
    EXPECT_FLOAT_EQ(copy->Channel(0).back(), 0.499f);
    EXPECT_EQ(copy->Channel(1).size(), 250u);
    EXPECT_FLOAT_EQ(copy->Max(), 0.499f);  // a computed range is computed again
    EXPECT_EQ(sound->FrameCount(), 2000);  // the original is untouched
    copy = sound->Copy();
    copy->Trim(-3.0, 99.0);  // clamped to the whole sound
    EXPECT_EQ(copy->FrameCount(), 2000);
    copy->Trim(1.9995, 5.0);  // starts between frames: the next whole frame
    EXPECT_EQ(copy->FrameCount(), 0);
    copy = sound->Copy();
    copy->Trim(1.0, 0.5);  // end before start keeps nothing
    EXPECT_EQ(copy->FrameCount(), 0);
    EXPECT_TRUE(copy->Valid());
}

TEST(SoundOps, FromSamplesRefusesInconsistentChannelsAndRates) {
    CaptureErrors quiet;
    EXPECT_FALSE(CueSound::FromSamples({}, 8000)->Valid());
    EXPECT_FALSE(CueSound::FromSamples({{1, 2}, {1}}, 8000)->Valid());
    EXPECT_FALSE(CueSound::FromSamples({{1, 2}}, 0)->Valid());
    EXPECT_FALSE(CueSound::FromSamples({{1, 2}}, std::nan(""))->Valid());
    EXPECT_TRUE(CueSound::FromSamples({{1, 2}}, 8000)->Valid());
}

TEST(SoundOps, MixResampledTo16kKeepsPitchAndLevel) {
    const double rate = 44100;
    std::vector<float> tone(44100);
    for (size_t i = 0; i < tone.size(); ++i)
        tone[i] = float(0.5 * std::sin(2 * M_PI * 440.0 * double(i) / rate));
    auto sound = CueSound::FromSamples({tone, tone}, rate);
    const std::vector<float> out = sound->Resampled(16000);
    EXPECT_NEAR(double(out.size()), 16000.0, 2.0);
    int rising = 0;  // sign changes from negative to non-negative
    float peak = 0;
    for (size_t i = 1; i < out.size(); ++i) {
        rising += out[i - 1] < 0 && out[i] >= 0;
        if (i > 1000 && i + 1000 < out.size())
            peak = std::max(peak, std::fabs(out[i]));
    }
    EXPECT_NEAR(rising, 440, 1);
    EXPECT_NEAR(peak, 0.5f, 0.01f);
    EXPECT_EQ(sound->Resampled(rate), sound->ChannelData(-1));
    EXPECT_TRUE(sound->Resampled(0).empty());
    EXPECT_TRUE(sound->Resampled(rate * 1000).empty());  // beyond the converter's range
}

}  // namespace
