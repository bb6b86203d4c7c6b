// Sound files are written here with audiofile's own writer (or built byte by byte for the
// damaged ones) and read back through CueSound, checking the decoded samples themselves.

#include <audiofile.h>
#include <gtest/gtest.h>
#include <unistd.h>

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

// The exact value of frame i of channel c as the test writes it: a 440 Hz sine on channel 0,
// a rising ramp on channel 1 that starts at the most negative value.
double source_value(long i, int c, double rate) {
    if (c == 0)
        return 0.8 * std::sin(2 * M_PI * 440.0 * double(i) / rate);
    return -1.0 + 2.0 * double(i) / double(kFrames);
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

    // Writes `format` with the given samples and returns the values a reader should get back
    // (per channel, as floats in -1..1 for integer formats).
    std::vector<std::vector<float>> WriteSound(const std::string& path, const SoundFormat& f,
                                               long frames = kFrames) {
        AFfilesetup setup = afNewFileSetup();
        afInitFileFormat(setup, f.fileFormat);
        afInitChannels(setup, AF_DEFAULT_TRACK, f.channels);
        afInitRate(setup, AF_DEFAULT_TRACK, f.rate);
        afInitSampleFormat(setup, AF_DEFAULT_TRACK, f.sampleFormat, f.width);
        afInitCompression(setup, AF_DEFAULT_TRACK, f.compression);
        AFfilehandle out = afOpenFile(path.c_str(), "w", setup);
        afFreeFileSetup(setup);
        EXPECT_NE(out, AF_NULL_FILEHANDLE) << path;
        std::vector<std::vector<float>> expected(size_t(f.channels));
        if (out == AF_NULL_FILEHANDLE)
            return expected;

        const bool isFloat = f.sampleFormat == AF_SAMPFMT_FLOAT;
        // Companded encodings take 16-bit samples from the program.
        const int width = f.compression == AF_COMPRESSION_NONE ? f.width : 16;
        const double full = std::ldexp(1.0, width - 1);
        std::vector<float> floats;
        std::vector<int8_t> i8;
        std::vector<int16_t> i16;
        std::vector<int32_t> i32;  // 24-bit samples travel in 32-bit words
        for (long i = 0; i < frames; ++i) {
            for (int c = 0; c < f.channels; ++c) {
                double v = source_value(i, c, f.rate);
                if (isFloat) {
                    v *= 1.25;  // float files may go beyond -1..1 and must stay so
                    floats.push_back(float(v));
                    expected[size_t(c)].push_back(float(v));
                    continue;
                }
                long code = std::lround(v * (full - 1));
                if (c == 1 && i == 0)
                    code = long(-full);  // the most negative code
                if (width == 8)
                    i8.push_back(int8_t(code));
                if (width == 16)
                    i16.push_back(int16_t(code));
                if (width > 16)
                    i32.push_back(int32_t(code));
                expected[size_t(c)].push_back(float(double(code) / full));
            }
        }
        const void* data = isFloat       ? (const void*)floats.data()
                           : width == 8  ? (const void*)i8.data()
                           : width == 16 ? (const void*)i16.data()
                                         : (const void*)i32.data();
        EXPECT_EQ(afWriteFrames(out, AF_DEFAULT_TRACK, data, int(frames)), frames);
        afCloseFile(out);
        return expected;
    }

    static std::vector<uint8_t> ReadBytes(const std::string& path) {
        std::ifstream in(path, std::ios::binary);
        return std::vector<uint8_t>(std::istreambuf_iterator<char>(in), {});
    }
    void WriteBytes(const std::string& path, const std::vector<uint8_t>& bytes) const {
        std::ofstream out(path, std::ios::binary);
        out.write(reinterpret_cast<const char*>(bytes.data()), std::streamsize(bytes.size()));
    }

    fs::path dir_;
    CaptureErrors errors_;
};

void ExpectSamples(const CueSound& sound, const std::vector<std::vector<float>>& expected,
                   float tolerance, long frames) {
    ASSERT_EQ(sound.ChannelCount(), int(expected.size()));
    for (size_t c = 0; c < expected.size(); ++c) {
        const std::vector<float>& got = sound.Channel(int(c));
        ASSERT_EQ(long(got.size()), frames);
        for (long i = 0; i < frames; ++i) {
            ASSERT_NEAR(got[size_t(i)], expected[c][size_t(i)], tolerance)
                << "channel " << c << " frame " << i;
        }
    }
}

// ---- Every supported format reads back sample for sample ----

class SoundFormatTest : public SoundTest, public ::testing::WithParamInterface<SoundFormat> {};

TEST_P(SoundFormatTest, ReadsBackWrittenSamples) {
    const SoundFormat& f = GetParam();
    const std::string path = Path(std::string("sound-") + f.name);
    const auto expected = WriteSound(path, f);

    CueSound sound(path.c_str());
    ASSERT_TRUE(sound.Valid()) << sound.ErrorText();
    EXPECT_EQ(sound.ErrorText(), "");
    EXPECT_EQ(sound.FileName(), path);
    EXPECT_DOUBLE_EQ(sound.Rate(), f.rate);
    EXPECT_EQ(sound.FrameCount(), kFrames);
    EXPECT_FLOAT_EQ(sound.Length(), float(kFrames) / float(f.rate));
    ExpectSamples(sound, expected, f.tolerance, kFrames);
    EXPECT_TRUE(errors_.reports.empty());

    // The same bytes from memory decode the same.
    const std::vector<uint8_t> bytes = ReadBytes(path);
    auto fromMemory = CueSound::FromMemory(bytes.data(), bytes.size(), "memory");
    ASSERT_TRUE(fromMemory->Valid()) << fromMemory->ErrorText();
    ExpectSamples(*fromMemory, expected, f.tolerance, kFrames);
}

constexpr float kExact = 1e-7f;

INSTANTIATE_TEST_SUITE_P(
    Formats, SoundFormatTest,
    ::testing::Values(SoundFormat{"aiff8", AF_FILE_AIFF, AF_SAMPFMT_TWOSCOMP, 8,
                                  AF_COMPRESSION_NONE, 1, 8000, kExact},
                      SoundFormat{"aiff16", AF_FILE_AIFF, AF_SAMPFMT_TWOSCOMP, 16,
                                  AF_COMPRESSION_NONE, 2, 22050, kExact},
                      SoundFormat{"aiff24", AF_FILE_AIFF, AF_SAMPFMT_TWOSCOMP, 24,
                                  AF_COMPRESSION_NONE, 2, 44100, kExact},
                      SoundFormat{"aiff32", AF_FILE_AIFF, AF_SAMPFMT_TWOSCOMP, 32,
                                  AF_COMPRESSION_NONE, 1, 48000, kExact},
                      SoundFormat{"aifcfloat", AF_FILE_AIFFC, AF_SAMPFMT_FLOAT, 32,
                                  AF_COMPRESSION_NONE, 2, 16000, 0.0f},
                      SoundFormat{"aifc16", AF_FILE_AIFFC, AF_SAMPFMT_TWOSCOMP, 16,
                                  AF_COMPRESSION_NONE, 1, 11025, kExact},
                      SoundFormat{"aifculaw", AF_FILE_AIFFC, AF_SAMPFMT_TWOSCOMP, 16,
                                  AF_COMPRESSION_G711_ULAW, 1, 8000, 0.04f},
                      SoundFormat{"wav16", AF_FILE_WAVE, AF_SAMPFMT_TWOSCOMP, 16,
                                  AF_COMPRESSION_NONE, 2, 44100, kExact},
                      SoundFormat{"wav24", AF_FILE_WAVE, AF_SAMPFMT_TWOSCOMP, 24,
                                  AF_COMPRESSION_NONE, 1, 96000, kExact},
                      SoundFormat{"wavfloat", AF_FILE_WAVE, AF_SAMPFMT_FLOAT, 32,
                                  AF_COMPRESSION_NONE, 1, 32000, 0.0f},
                      SoundFormat{"next16", AF_FILE_NEXTSND, AF_SAMPFMT_TWOSCOMP, 16,
                                  AF_COMPRESSION_NONE, 1, 8000, kExact}),
    [](const ::testing::TestParamInfo<SoundFormat>& info) { return info.param.name; });

// ---- Damaged and missing files ----

const SoundFormat kAiff16 = {
    "aiff16", AF_FILE_AIFF, AF_SAMPFMT_TWOSCOMP, 16, AF_COMPRESSION_NONE, 1, 8000, kExact};
const SoundFormat kWav16 = {"wav16", AF_FILE_WAVE, AF_SAMPFMT_TWOSCOMP, 16, AF_COMPRESSION_NONE, 1,
                            8000,    kExact};

// Offset of the first chunk with this id, or 0 when there is none.
size_t find_chunk(const std::vector<uint8_t>& bytes, const char* id) {
    for (size_t i = 12; i + 4 <= bytes.size(); ++i)
        if (std::memcmp(&bytes[i], id, 4) == 0)
            return i;
    return 0;
}

void put_be32(std::vector<uint8_t>& b, size_t at, uint32_t v) {
    for (int k = 0; k < 4; ++k)
        b[at + size_t(k)] = uint8_t(v >> (24 - 8 * k));
}
void put_le32(std::vector<uint8_t>& b, size_t at, uint32_t v) {
    for (int k = 0; k < 4; ++k)
        b[at + size_t(k)] = uint8_t(v >> (8 * k));
}

TEST_F(SoundTest, TruncatedFileKeepsWhatWasReadAndSaysSo) {
    const std::string good = Path("good.aiff");
    const auto expected = WriteSound(good, kAiff16);
    std::vector<uint8_t> bytes = ReadBytes(good);
    const size_t ssnd = find_chunk(bytes, "SSND");
    ASSERT_GT(ssnd, 0u);
    const long keep = 3001;                          // frames left whole after the cut
    bytes.resize(ssnd + 16 + size_t(keep) * 2 + 1);  // and half of the next one
    const std::string cut = Path("cut.aiff");
    WriteBytes(cut, bytes);

    CueSound sound(cut.c_str());
    ASSERT_TRUE(sound.Valid()) << sound.ErrorText();
    EXPECT_EQ(sound.FrameCount(), keep);
    EXPECT_EQ(sound.ErrorText(),
              "Sound file [" + cut + "] is short: read 3001 of 10000 sample frames");
    std::vector<std::vector<float>> prefix = {
        std::vector<float>(expected[0].begin(), expected[0].begin() + keep)};
    ExpectSamples(sound, prefix, kExact, keep);
    ASSERT_EQ(errors_.reports.size(), 1u);
    EXPECT_EQ(errors_.reports[0].first, KLErr::kWarning);
}

TEST_F(SoundTest, ContainerSizeBeyondTheFileIsClamped) {
    const std::string good = Path("good.aiff");
    const auto expected = WriteSound(good, kAiff16);
    std::vector<uint8_t> bytes = ReadBytes(good);
    put_be32(bytes, 4, 0xFFFFFFF0u);  // FORM size far past the end
    auto sound = CueSound::FromMemory(bytes.data(), bytes.size(), "huge-form.aiff");
    ASSERT_TRUE(sound->Valid()) << sound->ErrorText();
    EXPECT_EQ(sound->ErrorText(), "");
    ExpectSamples(*sound, expected, kExact, kFrames);

    // An SSND chunk that claims more than the file holds gives a short read, not a hang.
    put_be32(bytes, find_chunk(bytes, "SSND") + 4, 0x7FFFFFF0u);
    bytes.resize(bytes.size() - 1000);
    sound = CueSound::FromMemory(bytes.data(), bytes.size(), "huge-ssnd.aiff");
    ASSERT_TRUE(sound->Valid()) << sound->ErrorText();
    EXPECT_EQ(sound->FrameCount(), kFrames - 500);
    EXPECT_NE(sound->ErrorText().find("is short"), std::string::npos);
}

TEST_F(SoundTest, WaveSizesBeyondTheFileAreClamped) {
    const std::string good = Path("good.wav");
    const auto expected = WriteSound(good, kWav16);
    std::vector<uint8_t> bytes = ReadBytes(good);
    put_le32(bytes, 4, 0xFFFFFFFFu);
    put_le32(bytes, find_chunk(bytes, "data") + 4, 0xFFFFFFFFu);  // as streaming writers do
    auto sound = CueSound::FromMemory(bytes.data(), bytes.size(), "stream.wav");
    ASSERT_TRUE(sound->Valid()) << sound->ErrorText();
    EXPECT_EQ(sound->ErrorText(), "");
    ExpectSamples(*sound, expected, kExact, kFrames);

    // A WAV file cut short: its data chunk still claims every frame.
    bytes = ReadBytes(good);
    bytes.resize(bytes.size() - 2 * 4000 - 1);
    sound = CueSound::FromMemory(bytes.data(), bytes.size(), "cut.wav");
    ASSERT_TRUE(sound->Valid()) << sound->ErrorText();
    EXPECT_EQ(sound->ErrorText(),
              "Sound file [cut.wav] is short: read 5999 of 10000 sample frames");
    ExpectSamples(*sound, {std::vector<float>(expected[0].begin(), expected[0].begin() + 5999)},
                  kExact, 5999);
}

// A header field made bad in an otherwise good file, and what the message must say.
struct BadHeader {
    const char* name;
    void (*damage)(std::vector<uint8_t>&);
    const char* reason;  // expected text after "Could not open sound file [name]: "
};

class BadHeaderTest : public SoundTest, public ::testing::WithParamInterface<BadHeader> {};

TEST_P(BadHeaderTest, IsRefusedWithAReason) {
    const std::string good = Path("good.aiff");
    WriteSound(good, kAiff16);
    std::vector<uint8_t> bytes = ReadBytes(good);
    GetParam().damage(bytes);
    const std::string bad = Path("bad.aiff");
    WriteBytes(bad, bytes);

    CueSound sound(bad.c_str());
    EXPECT_FALSE(sound.Valid());
    EXPECT_EQ(sound.ChannelCount(), 0);
    EXPECT_EQ(sound.FrameCount(), 0);
    EXPECT_EQ(sound.Length(), 0.0f);
    const std::string head = "Could not open sound file [" + bad + "]: ";
    ASSERT_EQ(sound.ErrorText().substr(0, head.size()), head);
    EXPECT_NE(sound.ErrorText().find(GetParam().reason), std::string::npos) << sound.ErrorText();
    ASSERT_EQ(errors_.reports.size(), 1u);
    EXPECT_EQ(errors_.reports[0].first, KLErr::kError);
    EXPECT_EQ(errors_.reports[0].second, sound.ErrorText() + "\n");
}

// COMM data: channels (2 bytes), frames (4), bits (2), rate (80-bit extended).
constexpr size_t kCommData = 8;

INSTANTIATE_TEST_SUITE_P(
    Damage, BadHeaderTest,
    ::testing::Values(
        BadHeader{"ZeroRate",
                  [](std::vector<uint8_t>& b) {
                      std::memset(&b[find_chunk(b, "COMM") + kCommData + 8], 0, 10);
                  },
                  "sample rate"},
        BadHeader{"NaNRate",
                  [](std::vector<uint8_t>& b) {
                      uint8_t* r = &b[find_chunk(b, "COMM") + kCommData + 8];
                      r[0] = 0x7F, r[1] = 0xFF, r[2] = 0xC0;
                  },
                  "sample rate"},
        BadHeader{"ZeroChannels",
                  [](std::vector<uint8_t>& b) {
                      b[find_chunk(b, "COMM") + kCommData] = 0;
                      b[find_chunk(b, "COMM") + kCommData + 1] = 0;
                  },
                  "channel"},
        BadHeader{"HugeChannels",
                  [](std::vector<uint8_t>& b) { b[find_chunk(b, "COMM") + kCommData] = 0x69; },
                  "bad channel count 26881"},
        BadHeader{
            "ZeroFrames",
            [](std::vector<uint8_t>& b) { put_be32(b, find_chunk(b, "COMM") + kCommData + 2, 0); },
            "no sample frames"},
        BadHeader{"NoSoundData", [](std::vector<uint8_t>& b) { b[find_chunk(b, "SSND")] = 'X'; },
                  "no SSND chunk"},
        BadHeader{"ShortComm",
                  [](std::vector<uint8_t>& b) { put_be32(b, find_chunk(b, "COMM") + 4, 6); },
                  "COMM chunk too short"},
        BadHeader{"NotASound", [](std::vector<uint8_t>& b) { b.assign(300, 'x'); },
                  "not a sound file"},
        BadHeader{"Empty", [](std::vector<uint8_t>& b) { b.clear(); }, "the file is empty"},
        BadHeader{"HeaderOnly", [](std::vector<uint8_t>& b) { b.resize(12); }, "no COMM chunk"}),
    [](const ::testing::TestParamInfo<BadHeader>& info) { return info.param.name; });

TEST_F(SoundTest, MissingFileAndDirectoryAreNamedInTheMessage) {
    const std::string missing = Path("nowhere.aiff");
    CueSound sound(missing.c_str());
    EXPECT_FALSE(sound.Valid());
    EXPECT_EQ(sound.ErrorText(), "Could not open sound file [" + missing + "]: no such file");

    CueSound dir(dir_.string().c_str());
    EXPECT_FALSE(dir.Valid());
    EXPECT_EQ(dir.ErrorText(),
              "Could not open sound file [" + dir_.string() + "]: it is a directory");
    EXPECT_EQ(errors_.reports.size(), 2u);
}

TEST_F(SoundTest, CompressedEncodingsOutsideTheSafeSetAreRefused) {
    const std::string good = Path("good.aifc");
    WriteSound(good, {"aifc16", AF_FILE_AIFFC, AF_SAMPFMT_TWOSCOMP, 16, AF_COMPRESSION_NONE, 1,
                      8000, kExact});
    std::vector<uint8_t> bytes = ReadBytes(good);
    std::memcpy(&bytes[find_chunk(bytes, "COMM") + kCommData + 18], "ima4", 4);
    auto sound = CueSound::FromMemory(bytes.data(), bytes.size(), "adpcm.aifc");
    EXPECT_FALSE(sound->Valid());
    EXPECT_EQ(sound->ErrorText(),
              "Could not open sound file [adpcm.aifc]: unsupported AIFF-C compression 'ima4'");
}

TEST_F(SoundTest, NextHeaderWithAbsurdLayoutIsRefusedBeforeDecoding) {
    // .snd, data at 44, 80 bytes, 16-bit linear, 8000 Hz, 6881280 channels: the sound
    // library would spend seconds setting up that many channels.
    std::vector<uint8_t> b = {'.', 's', 'n', 'd', 0, 0, 0,    44,   0, 0,    0, 80,
                              0,   0,   0,   3,   0, 0, 0x1f, 0x40, 0, 0x69, 0, 0};
    b.resize(124, 0);
    auto sound = CueSound::FromMemory(b.data(), b.size(), "wide.au");
    EXPECT_EQ(sound->ErrorText(), "Could not open sound file [wide.au]: bad channel count 6881280");
    b[21] = 0;
    b[23] = 1;          // one channel
    b[18] = b[19] = 0;  // 0 Hz
    sound = CueSound::FromMemory(b.data(), b.size(), "still.au");
    EXPECT_EQ(sound->ErrorText(), "Could not open sound file [still.au]: bad sample rate 0");
    b[18] = 0x1f;
    sound = CueSound::FromMemory(b.data(), b.size(), "ok.au");
    EXPECT_TRUE(sound->Valid()) << sound->ErrorText();
    EXPECT_EQ(sound->FrameCount(), 40);
}

// The demo's recording was written by sox, not by audiofile: it must read as espeak-ng made
// it, silent in the pause its phoneme list gives between the two sentences.
TEST_F(SoundTest, ReadsTheDemoDialogue) {
    const std::string path = std::string(CHIRRUP_SOURCE_DIR) + "/resources/demo/dialogue.aiff";
    CueSound sound(path.c_str());
    ASSERT_TRUE(sound.Valid()) << sound.ErrorText();
    EXPECT_EQ(sound.ChannelCount(), 1);
    EXPECT_EQ(sound.Rate(), 22050.0);
    EXPECT_EQ(sound.FrameCount(), 84134);
    sound.ComputeMinMax();
    EXPECT_GT(sound.Max(), 0.2f);
    EXPECT_LT(sound.Min(), -0.2f);
    auto pause = sound.Copy();
    pause->Trim(0.90, 1.20);
    pause->ComputeMinMax();
    EXPECT_EQ(pause->Min(), 0.0f);
    EXPECT_EQ(pause->Max(), 0.0f);
    auto would = sound.Copy();
    would->Trim(1.23, 1.43);
    would->ComputeMinMax();
    EXPECT_GT(would->Max() - would->Min(), 0.1f);
}

// ---- Operations on a sound in memory ----

class SoundOpsTest : public SoundTest {
  protected:
    // Two channels at 1000 frames per second: channel 0 counts frames (i / 1000), channel 1
    // is constant -0.5.
    void SetUp() override {
        SoundTest::SetUp();
        std::vector<float> a(2000), b(2000, -0.5f);
        for (size_t i = 0; i < a.size(); ++i)
            a[i] = float(i) / 1000.0f;
        sound_ = CueSound::FromSamples({a, b}, 1000.0);
        ASSERT_TRUE(sound_->Valid());
    }
    std::unique_ptr<CueSound> sound_;
};

TEST_F(SoundOpsTest, ChannelDataGivesChannelsAndTheirMean) {
    EXPECT_EQ(sound_->ChannelData(1), std::vector<float>(2000, -0.5f));
    const std::vector<float> mix = sound_->ChannelData(-1);
    ASSERT_EQ(mix.size(), 2000u);
    EXPECT_FLOAT_EQ(mix[0], -0.25f);
    EXPECT_FLOAT_EQ(mix[1500], (1.5f - 0.5f) / 2);
    EXPECT_TRUE(sound_->ChannelData(2).empty());
    EXPECT_TRUE(sound_->ChannelData(-2).empty());
    EXPECT_TRUE(CueSound().ChannelData(-1).empty());
}

TEST_F(SoundOpsTest, MinMaxAndLength) {
    EXPECT_EQ(sound_->Min(), 0.0f);  // not computed yet
    sound_->ComputeMinMax();
    EXPECT_FLOAT_EQ(sound_->Min(), -0.5f);
    EXPECT_FLOAT_EQ(sound_->Max(), 1.999f);
    EXPECT_FLOAT_EQ(sound_->Length(), 2.0f);
    CueSound empty;
    empty.ComputeMinMax();
    EXPECT_EQ(empty.Min(), 0.0f);
    EXPECT_EQ(empty.Max(), 0.0f);
    EXPECT_EQ(empty.Length(), 0.0f);
}

TEST_F(SoundOpsTest, TrimKeepsTheHalfOpenRangeAndCopiesAreIndependent) {
    auto copy = sound_->Copy();
    copy->Trim(0.25, 0.5);
    ASSERT_EQ(copy->FrameCount(), 250);
    EXPECT_FLOAT_EQ(copy->Channel(0).front(), 0.25f);
    EXPECT_FLOAT_EQ(copy->Channel(0).back(), 0.499f);
    EXPECT_EQ(copy->Channel(1).size(), 250u);
    EXPECT_EQ(sound_->FrameCount(), 2000);  // the original is untouched

    copy = sound_->Copy();
    copy->Trim(-3.0, 99.0);  // clamped to the whole sound
    EXPECT_EQ(copy->FrameCount(), 2000);
    copy->Trim(1.9995, 5.0);  // starts between frames: the next whole frame
    ASSERT_EQ(copy->FrameCount(), 0);
    copy = sound_->Copy();
    copy->Trim(1.0, 0.5);  // end before start keeps nothing
    EXPECT_EQ(copy->FrameCount(), 0);
    EXPECT_TRUE(copy->Valid());
}

TEST_F(SoundOpsTest, TrimRecomputesAComputedMinMax) {
    sound_->ComputeMinMax();
    sound_->Trim(0.0, 1.0);
    EXPECT_FLOAT_EQ(sound_->Max(), 0.999f);
}

TEST(SoundFromSamples, RefusesInconsistentChannelsAndRates) {
    CaptureErrors quiet;
    EXPECT_FALSE(CueSound::FromSamples({}, 8000)->Valid());
    EXPECT_FALSE(CueSound::FromSamples({{1, 2}, {1}}, 8000)->Valid());
    EXPECT_FALSE(CueSound::FromSamples({{1, 2}}, 0)->Valid());
    EXPECT_FALSE(CueSound::FromSamples({{1, 2}}, std::nan(""))->Valid());
    EXPECT_TRUE(CueSound::FromSamples({{1, 2}}, 8000)->Valid());
}

// Number of sign changes from negative to non-negative.
int rising_crossings(const std::vector<float>& v) {
    int n = 0;
    for (size_t i = 1; i < v.size(); ++i)
        if (v[i - 1] < 0 && v[i] >= 0)
            ++n;
    return n;
}

TEST(SoundResample, MixAt16kKeepsPitchAndLevel) {
    const double rate = 44100;
    const size_t n = 44100;
    std::vector<float> left(n), right(n);
    for (size_t i = 0; i < left.size(); ++i) {
        left[i] = float(0.5 * std::sin(2 * M_PI * 440.0 * double(i) / rate));
        right[i] = left[i];
    }
    auto sound = CueSound::FromSamples({left, right}, rate);
    const std::vector<float> out = sound->Resampled(16000);
    EXPECT_NEAR(double(out.size()), 16000.0, 2.0);
    EXPECT_NEAR(rising_crossings(out), 440, 1);
    float peak = 0;
    for (size_t i = 1000; i + 1000 < out.size(); ++i)
        peak = std::max(peak, std::fabs(out[i]));
    EXPECT_NEAR(peak, 0.5f, 0.01f);

    EXPECT_EQ(sound->Resampled(rate), sound->ChannelData(-1));
    EXPECT_TRUE(sound->Resampled(0).empty());
    EXPECT_TRUE(sound->Resampled(rate * 1000).empty());  // beyond the converter's range
    EXPECT_TRUE(CueSound().Resampled(16000).empty());
}

}  // namespace
