// Sound files are written here with audiofile's own writer (then damaged byte by byte where a
// case wants it) and read back through CueSound, checking the decoded samples themselves.

#include <audiofile.h>

#include <algorithm>
#include <cmath>
#include <cstring>
#include <fstream>
#include <iterator>
#include <tuple>

#include "toolkit/CueSound.h"
#include "toolkit_test_util.h"

namespace {

using Bytes = std::vector<uint8_t>;
using Samples = std::vector<std::vector<float>>;  // per channel

struct SoundFormat {
    const char* name;
    int fileFormat, sampleFormat, width, compression, channels;  // AF_... values, bits
    double rate;
    float tolerance;  // allowed difference from the exact value (lossy encodings)
};

constexpr long kFrames = 10000;  // more than one decoding chunk
constexpr float kExact = 1e-7f;
constexpr int kTwos = AF_SAMPFMT_TWOSCOMP, kFloat = AF_SAMPFMT_FLOAT, kNone = AF_COMPRESSION_NONE;

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
    // Integer samples are exact codes / 2^(width - 1); companded encodings take 16-bit ones.
    const double full = std::ldexp(1.0, (f.compression == kNone ? f.width : 16) - 1);
    afSetVirtualSampleFormat(out, AF_DEFAULT_TRACK, AF_SAMPFMT_DOUBLE, 64);
    std::vector<double> data;
    for (long i = 0; i < kFrames; ++i) {
        for (int c = 0; c < f.channels; ++c) {
            double v = c == 0 ? 0.8 * std::sin(2 * M_PI * 440.0 * double(i) / f.rate)
                              : -1.0 + 2.0 * double(i) / double(kFrames);
            double code = c == 1 && i == 0 ? -full : std::round(v * (full - 1));  // lowest first
            data.push_back(f.sampleFormat == kFloat ? double(float(v * 1.25)) : code / full);
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
    for (size_t c = 0; c < expected.size(); ++c)
        for (long i = 0; i < frames; ++i)
            ASSERT_NEAR(sound.Channel(int(c))[size_t(i)], expected[c][size_t(i)], tolerance)
                << "channel " << c << " frame " << i;
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
// Start of the COMM chunk's data: channels (2 bytes), frames (4), bits (2), rate (10),
// then in AIFF-C the compression type (4).
size_t comm(const Bytes& b) {
    return chunk(b, "COMM") + 8;
}

using SoundTest = TempDirTest;

// Every supported format reads back sample for sample.
class SoundFormatTest : public SoundTest, public ::testing::WithParamInterface<SoundFormat> {};

TEST_P(SoundFormatTest, ReadsBackWrittenSamples) {
    const SoundFormat& f = GetParam();
    const Samples expected = write_sound(Path(f.name), f);
    CueSound sound(Path(f.name).c_str());
    ASSERT_TRUE(sound.Valid()) << sound.ErrorText();
    EXPECT_DOUBLE_EQ(sound.Rate(), f.rate);
    EXPECT_FLOAT_EQ(sound.Length(), float(kFrames) / float(f.rate));
    expect_samples(sound, expected, f.tolerance, kFrames);
    EXPECT_TRUE(errors_.reports.empty());
}

const SoundFormat kFormats[] = {
    {"aiff8", AF_FILE_AIFF, kTwos, 8, kNone, 1, 8000, kExact},
    {"aiff24", AF_FILE_AIFF, kTwos, 24, kNone, 2, 44100, kExact},
    {"aifcfloat", AF_FILE_AIFFC, kFloat, 32, kNone, 2, 16000, 0.0f},
    {"aifculaw", AF_FILE_AIFFC, kTwos, 16, AF_COMPRESSION_G711_ULAW, 1, 8000, 0.04f},
    {"wav16", AF_FILE_WAVE, kTwos, 16, kNone, 2, 44100, kExact},
    {"wavfloat", AF_FILE_WAVE, kFloat, 32, kNone, 1, 32000, 0.0f},
    {"next16", AF_FILE_NEXTSND, kTwos, 16, kNone, 1, 8000, kExact}};
INSTANTIATE_TEST_SUITE_P(Formats, SoundFormatTest, ::testing::ValuesIn(kFormats),
                         [](const auto& info) { return std::string(info.param.name); });

// Damaged files: one mono 16-bit file of kFrames frames, changed in one way and read from
// memory under the name "bad".
struct Damage {
    const char* name;
    int fileFormat;  // AF_FILE_AIFF, AF_FILE_AIFFC or AF_FILE_WAVE
    void (*damage)(Bytes&);
    long frames;          // frames still read; 0: the file is refused
    const char* message;  // its start (more may explain the cause); "" when all is well
};

class DamagedSoundTest : public SoundTest, public ::testing::WithParamInterface<Damage> {};

TEST_P(DamagedSoundTest, KeepsWhatCanBeReadAndSaysWhy) {
    const Damage& d = GetParam();
    const Samples expected =
        write_sound(Path("good"), {"", d.fileFormat, kTwos, 16, kNone, 1, 8000, kExact});
    std::ifstream in(Path("good"), std::ios::binary);
    Bytes bytes(std::istreambuf_iterator<char>(in), {});
    d.damage(bytes);
    auto sound = CueSound::FromMemory(bytes.data(), bytes.size(), "bad");
    const bool refused = d.frames == 0;
    const std::string want = d.message;
    EXPECT_EQ(sound->ErrorText().substr(0, want.size()), want);  // more may explain the cause
    EXPECT_EQ(sound->ErrorText().empty(), want.empty());
    // The same text is reported once, as an error when nothing could be read.
    ASSERT_EQ(errors_.reports.size(), want.empty() ? 0u : 1u);
    if (!want.empty()) {
        EXPECT_EQ(errors_.reports[0].first, refused ? KLErr::kError : KLErr::kWarning);
        EXPECT_EQ(errors_.reports[0].second, sound->ErrorText() + "\n");
    }
    EXPECT_EQ(sound->Valid(), !refused);
    if (!refused)
        expect_samples(*sound, {{expected[0].begin(), expected[0].begin() + d.frames}}, kExact,
                       d.frames);
}

const Damage kDamages[] = {
    // Cut after 3001 whole frames and half of the next one.
    {"AiffCut", AF_FILE_AIFF, [](Bytes& b) { b.resize(chunk(b, "SSND") + 16 + 6003); }, 3001,
     "Sound file [bad] is short: read 3001 of 10000 sample frames"},
    // Sizes as streaming writers leave them.
    {"WavSizesUnknown", AF_FILE_WAVE,
     [](Bytes& b) { put32(b, 4, ~0u, false), put32(b, chunk(b, "data") + 4, ~0u, false); }, kFrames,
     ""},
    {"NaNRate", AF_FILE_AIFF, [](Bytes& b) { std::memcpy(&b[comm(b) + 8], "\x7F\xFF\xC0", 3); }, 0,
     "Could not open sound file [bad]: bad sample rate nan"},
    {"ZeroFrames", AF_FILE_AIFF, [](Bytes& b) { put32(b, comm(b) + 2, 0); }, 0,
     "Could not open sound file [bad]: no sample frames"},
    {"NoSoundData", AF_FILE_AIFF, [](Bytes& b) { b[chunk(b, "SSND")] = 'X'; }, 0,
     "Could not open sound file [bad]: no SSND chunk"},
    {"ShortComm", AF_FILE_AIFF, [](Bytes& b) { put32(b, chunk(b, "COMM") + 4, 6); }, 0,
     "Could not open sound file [bad]: COMM chunk too short"},
    {"UnsafeCompression", AF_FILE_AIFFC, [](Bytes& b) { std::memcpy(&b[comm(b) + 18], "ima4", 4); },
     0, "Could not open sound file [bad]: unsupported AIFF-C compression 'ima4'"},
    {"NotASound", AF_FILE_AIFF, [](Bytes& b) { b.assign(300, 'x'); }, 0,
     "Could not open sound file [bad]: not a sound file"},
    // NeXT/Sun: data at 44, 80 bytes of 16-bit samples at 8000 Hz in 6881280 channels, which
    // would take the sound library seconds to set up.
    {"NextHugeChannels", AF_FILE_AIFF,
     [](Bytes& b) {
         b.assign(124, 0);
         std::memcpy(b.data(), ".snd\0\0\0\x2c\0\0\0\x50\0\0\0\3\0\0\x1f\x40\0\x69\0\0", 24);
     },
     0, "Could not open sound file [bad]: bad channel count 6881280"}};
INSTANTIATE_TEST_SUITE_P(Damage, DamagedSoundTest, ::testing::ValuesIn(kDamages),
                         [](const auto& info) { return std::string(info.param.name); });

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
TEST(SoundOps, ReadsTheDemoDialogue) {
    CueSound sound((std::string(CHIRRUP_SOURCE_DIR) + "/resources/demo/dialogue.aiff").c_str());
    ASSERT_TRUE(sound.Valid()) << sound.ErrorText();
    EXPECT_EQ(std::make_tuple(sound.ChannelCount(), sound.Rate(), sound.FrameCount()),
              std::make_tuple(1, 22050.0, 84134L));
    sound.ComputeMinMax();  // excerpts then compute their own
    const auto pause = sound.Excerpt(0.90, 1.20), speech = sound.Excerpt(1.23, 1.43);
    EXPECT_TRUE(pause->Min() == 0.0f && pause->Max() == 0.0f);
    EXPECT_GT(speech->Max() - speech->Min(), 0.1f) << "the second sentence begins";
}

// 1000 frames per second: channel 0 counts frames (i / 1000), channel 1 is -0.5. An excerpt
// keeps [start, end) clamped to the sound, from the next whole frame on, with its range, and
// holds only that.
TEST(SoundOps, MixMinMaxAndExcerpt) {
    std::vector<float> a(2000), b(2000, -0.5f);
    for (size_t i = 0; i < a.size(); ++i)
        a[i] = float(i) / 1000.0f;
    auto sound = CueSound::FromSamples({a, b}, 1000.0);
    const std::vector<float> mix = sound->ChannelData(-1);
    ASSERT_EQ(mix.size(), 2000u);
    EXPECT_FLOAT_EQ(mix[1500], (1.5f - 0.5f) / 2);
    sound->ComputeMinMax();
    EXPECT_FLOAT_EQ(sound->Min(), -0.5f);
    EXPECT_FLOAT_EQ(sound->Max(), 1.999f);
    using Range = std::tuple<double, double, long, float>;  // start, end, frames kept, first
    for (auto [start, end, frames, first] :
         {Range{0.25, 0.5, 250, 0.25f}, Range{-3.0, 99.0, 2000, 0.0f}, Range{1.9995, 5.0, 0, 0},
          Range{1.0, 0.5, 0, 0}, Range{0.0, 0.001, 1, 0.0f}}) {
        SCOPED_TRACE(std::to_string(start) + " .. " + std::to_string(end));
        const auto excerpt = sound->Excerpt(start, end);
        ASSERT_EQ(excerpt->ChannelCount(), 2);
        EXPECT_EQ(excerpt->Rate(), 1000.0);
        const auto from = a.begin() + std::lround(first * 1000);
        EXPECT_EQ(excerpt->Channel(0), std::vector<float>(from, from + frames));
        EXPECT_EQ(excerpt->Channel(1), std::vector<float>(size_t(frames), -0.5f));
        EXPECT_LE(excerpt->Channel(0).capacity(), size_t(frames) + 16);
        if (frames > 0) {
            EXPECT_EQ(excerpt->Min(), -0.5f);
            EXPECT_FLOAT_EQ(excerpt->Max(), first + float(frames - 1) / 1000.0f);
        }
    }
    EXPECT_FALSE(CueSound().Excerpt(0.0, 1.0)->Valid());

    CaptureErrors quiet;  // inconsistent channels and rates are refused
    EXPECT_FALSE(CueSound::FromSamples({}, 8000)->Valid());
    EXPECT_FALSE(CueSound::FromSamples({{1, 2}, {1}}, 8000)->Valid());
    EXPECT_FALSE(CueSound::FromSamples({{1, 2}}, 0)->Valid());
    EXPECT_FALSE(CueSound::FromSamples({{1, 2}}, std::nan(""))->Valid());
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
    for (size_t i = 1; i < out.size(); ++i)
        rising += out[i - 1] < 0 && out[i] >= 0;
    EXPECT_NEAR(rising, 440, 1);
    EXPECT_NEAR(*std::max_element(out.begin() + 1000, out.end() - 1000), 0.5f, 0.01f);
    EXPECT_EQ(sound->Resampled(rate), sound->ChannelData(-1));
    EXPECT_TRUE(sound->Resampled(0).empty());
    EXPECT_TRUE(sound->Resampled(rate * 1000).empty());  // beyond the converter's range
}

}  // namespace
