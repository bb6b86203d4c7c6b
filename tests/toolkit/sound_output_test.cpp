// Sound output through SDL's "disk" driver: the file holds exactly what a listener would hear,
// and timers run on the device's sample count, so a pass takes milliseconds.

#include <SDL2/SDL.h>
#include <samplerate.h>

#include <chrono>
#include <cmath>
#include <fstream>
#include <memory>
#include <thread>
#include <tuple>

#include "toolkit/CueSound.h"
#include "toolkit/KLSoundControl.h"
#include "toolkit/KLTimer.h"
#include "toolkit/TimerClock.h"
#include "toolkit_test_util.h"

namespace {

using Samples = std::vector<float>;

// A rising tone at half the device's rate: no two stretches alike.
std::unique_ptr<CueSound> chirp(double rate, double seconds = 1.0) {
    Samples s(size_t(rate * seconds));
    for (size_t i = 0; i < s.size(); i++) {
        double t = double(i) / rate;
        s[i] = float(0.5 * std::sin(2 * M_PI * (200 * t + 1400 * t * t / seconds)));
    }
    return CueSound::FromSamples({s}, rate);
}

Samples resampled(const Samples& in, double ratio) {
    Samples out(size_t(double(in.size()) * ratio) + 16);
    SRC_DATA d{in.data(), out.data(), long(in.size()), long(out.size()), 0, 0, 1, ratio};
    EXPECT_EQ(src_simple(&d, SRC_SINC_FASTEST, 1), 0);
    out.resize(size_t(d.output_frames_gen));
    return out;
}

using Segment = std::pair<long, long>;  // [first, end) frames

// Stretches of `out` louder than silence.
std::vector<Segment> segments(const Samples& out) {
    std::vector<Segment> found;
    long quiet = 1 << 30;
    for (long i = 0; i < long(out.size()); i++) {
        if (std::fabs(out[size_t(i)]) <= 1e-4f) {
            quiet++;
            continue;
        }
        if (quiet > 256)
            found.push_back({i, i + 1});
        quiet = 0;
        found.back().second = i + 1;
    }
    return found;
}

// Where in `ref` the stretch `out`[at, at + 512) is found (the least squared difference).
long locate(const Samples& out, long at, const Samples& ref) {
    long best = -1;
    double bestError = 1e30;
    for (long r = 0; r + 512 <= long(ref.size()); r++) {
        double e = 0;
        for (long i = 0; i < 512 && e < bestError; i++) {
            double d = out[size_t(at + i)] - ref[size_t(r + i)];
            e += d * d;
        }
        if (e < bestError)
            bestError = e, best = r;
    }
    return best;
}

// Where in `ref` the first frame of `seg` lies, matched at the middle of the segment.
long origin(const Samples& out, Segment seg, const Samples& ref) {
    const long middle = (seg.first + seg.second) / 2 - 256;
    return locate(out, middle, ref) - (middle - seg.first);
}

// The largest difference between `seg` and `ref` from its origin, leaving `edge` frames at
// each end of the segment.
float mismatch(const Samples& out, Segment seg, const Samples& ref, long edge) {
    const long lag = seg.first - origin(out, seg, ref);
    float worst = 0;
    for (long i = seg.first + edge; i < seg.second - edge; i++) {
        const long r = i - lag;
        const float expected = r >= 0 && r < long(ref.size()) ? ref[size_t(r)] : 0.0f;
        worst = std::max(worst, std::fabs(out[size_t(i)] - expected));
    }
    return worst;
}

class SoundOutputTest : public TempDirTest {
  protected:
    void SetUp() override {
        TempDirTest::SetUp();
        file_ = Path("device.raw");
        UseSoundDriver("disk", file_.c_str());
        ASSERT_TRUE(KLSoundControl::Open());
        ASSERT_STREQ(KLSoundControl::DriverName(), "disk");
        rate_ = KLSoundControl::DeviceRate();
        channels_ = KLSoundControl::DeviceChannels();
        ASSERT_GT(rate_, 0);
        // The device clock, moved back by the output latency so that the samples handed at a
        // timer time are the ones a timer on the wall clock would hear then.
        TimerClock::SetSource(
            [] { return KLSoundControl::DeviceSeconds() - KLSoundControl::Latency(); });
        KLSoundControl::PlaySpeed(1.0f);
    }
    void TearDown() override {
        KLSoundControl::Stop();
        KLSoundControl::Close();
        TimerClock::SetSource(nullptr);
        TempDirTest::TearDown();
    }

    // Lets the device run for `seconds` of its own clock (ten seconds of real time at most).
    static void Run(double seconds) {
        double until = KLSoundControl::DeviceSeconds() + seconds;
        auto limit = std::chrono::steady_clock::now() + std::chrono::seconds(10);
        while (KLSoundControl::DeviceSeconds() < until && std::chrono::steady_clock::now() < limit)
            std::this_thread::yield();
        ASSERT_GE(KLSoundControl::DeviceSeconds(), until) << "the disk device stalled";
    }

    // One pass over [from, to] seconds of `sound` at `speed`, as the transport runs it: the
    // timer spans the region stretched by the speed; the device runs a little past its end.
    int Pass(CueSound* sound, double from, double to, float speed) {
        KLSoundControl::PlaySpeed(speed);
        double stretched = from + (to - from) / speed;
        KLTimer timer(CueTime::FromSeconds(from), CueTime::FromSeconds(stretched));
        int started = KLSoundControl::Play(sound, &timer, CueTime());
        timer.start();
        Run(std::fabs(stretched - from) + 0.1);
        return started;
    }

    // Channel 0 of everything written since Open (the device is closed to flush the file).
    Samples Written() {
        KLSoundControl::Close();
        std::ifstream in(file_, std::ios::binary);
        std::vector<float> all;
        float frame[8];
        while (in.read(reinterpret_cast<char*>(frame), std::streamsize(sizeof(float) * channels_)))
            all.push_back(frame[0]);
        return all;
    }

    std::string file_;
    int rate_ = 0, channels_ = 0;
};

// Two passes (a loop) over 0.25 .. 0.75 s each way at each speed: each is one stretch as long
// as the region over the speed, the sound resampled (reversed backwards) from the region's start.
class SoundPassTest : public SoundOutputTest,
                      public ::testing::WithParamInterface<std::tuple<float, bool>> {};

TEST_P(SoundPassTest, WritesTheResampledRegionForEveryPass) {
    auto [speed, reverse] = GetParam();
    auto sound = chirp(rate_ / 2.0);
    for (int i = 0; i < 2; i++)
        ASSERT_EQ(Pass(sound.get(), reverse ? 0.75 : 0.25, reverse ? 0.25 : 0.75, speed), 1);
    Samples out = Written();
    auto seg = segments(out);
    ASSERT_EQ(seg.size(), 2u) << "one unbroken stretch of sound per pass";
    Samples ref = resampled(sound->Channel(0), rate_ / (sound->Rate() * speed));
    if (reverse)
        std::reverse(ref.begin(), ref.end());
    // One output latency, plus a buffer the device may already be filling, is lost.
    const double late = 2 * KLSoundControl::Latency() * rate_ + 64;
    for (auto s : seg) {
        EXPECT_NEAR(double(s.second - s.first), double(ref.size() / 2), late) << "region / speed";
        EXPECT_LT(mismatch(out, s, ref, 64), 0.01f);
        EXPECT_NEAR(double(origin(out, s, ref)), double(ref.size() / 4), late) << "region start";
    }
}

INSTANTIATE_TEST_SUITE_P(SpeedsAndDirections, SoundPassTest,
                         ::testing::Combine(::testing::Values(1.0f, 0.5f, 0.25f, 1.25f),
                                            ::testing::Bool()));

TEST_F(SoundOutputTest, AScrubGrainIsTheSoundAtThePointerAndRestingIsSilent) {
    auto sound = chirp(rate_ / 2.0);
    Samples ref = resampled(sound->Channel(0), 2.0);
    float pointer = 0.5f;
    ASSERT_EQ(KLSoundControl::PlayDrag(sound.get(), nullptr, 100, &pointer), 1);
    Run(0.3);
    const float moved = 0.25f;
    __atomic_store(&pointer, &moved, __ATOMIC_RELAXED);
    Run(0.3);
    Samples out = Written();
    auto seg = segments(out);
    ASSERT_EQ(seg.size(), 2u) << "one grain per move, nothing while resting";
    for (size_t i = 0; i < 2; i++) {
        EXPECT_NEAR(double(seg[i].second - seg[i].first), double(rate_ / 10), 2.0) << "a grain";
        EXPECT_LT(mismatch(out, seg[i], ref, 64), 0.01f);
        EXPECT_NEAR(double(origin(out, seg[i], ref)), double(ref.size() * (2 - i) / 4), 2.0) << i;
    }
}

// The workspace may replace its sound while a pass plays it: the output lets go first.
TEST_F(SoundOutputTest, ASoundDestroyedWhilePlayingFallsSilent) {
    auto sound = chirp(rate_ / 2.0, 2.0);
    KLTimer timer(CueTime(), CueTime::FromSeconds(2));
    // On the device's clock, which does not count the silence written while it was paused.
    const double start = KLSoundControl::DeviceSeconds();
    ASSERT_EQ(KLSoundControl::Play(sound.get(), &timer, CueTime()), 1);
    timer.start();
    Run(0.5);
    sound.reset();
    const double cut = KLSoundControl::DeviceSeconds();
    Run(0.5);
    auto seg = segments(Written());
    ASSERT_EQ(seg.size(), 1u);
    EXPECT_LE(double(seg[0].second - seg[0].first) / rate_, cut - start + 0.05)
        << "nothing after the sound went";
}

// Odd sounds play for as long as they last, whatever their rate and channel count; a region
// past the end of the sound is silence; the speed out of range plays at 1.
// rate, channels, frames, region from and to (s), speed, frames heard at 48 kHz (0: silent)
using OddSound = std::tuple<double, int, long, double, double, float, long>;

class OddSoundTest : public SoundOutputTest, public ::testing::WithParamInterface<OddSound> {};

TEST_P(OddSoundTest, PlaysWithoutHarm) {
    const auto [rate, channels, frames, from, to, speed, expected] = GetParam();
    ASSERT_EQ(rate_, 48000);
    Samples wave(static_cast<size_t>(frames));
    for (long i = 0; i < frames; i++)
        wave[size_t(i)] = i % 2 ? 0.5f : -0.5f;
    auto sound = CueSound::FromSamples(std::vector<Samples>(size_t(channels), wave), rate);
    ASSERT_EQ(Pass(sound.get(), from, to, speed), 1);
    auto seg = segments(Written());
    long heard = seg.empty() ? 0 : seg.back().second - seg.front().first;
    EXPECT_NEAR(double(heard), double(expected), 1100.0);
}

INSTANTIATE_TEST_SUITE_P(Odd, OddSoundTest,
                         ::testing::Values(OddSound{8000, 1, 8000, 0, 1, 1.0f, 48000},
                                           OddSound{192000, 6, 96000, 0, 0.5, 1.0f, 24000},
                                           OddSound{16000, 1, 16000, 2, 3, 1.0f, 0},
                                           OddSound{16000, 1, 16000, 0.5, 2, 1.0f, 24000}));

// Without a usable device the silent driver takes over, the user is told once, and passes
// still run (nothing to play plays nothing); the audio library's own messages become the
// program's reports.
class SoundFallback : public ::testing::Test {
  protected:
    void TearDown() override { KLSoundControl::Close(); }
    CaptureErrors errors;
};

TEST_F(SoundFallback, NoDeviceFallsBackToTheSilentDriverAndReportsThroughTheProgram) {
    setenv("SDL_AUDIODRIVER", "nosuchdriver", 1);
    ASSERT_TRUE(KLSoundControl::Open());
    EXPECT_STREQ(KLSoundControl::DriverName(), "dummy");
    ASSERT_FALSE(errors.reports.empty());
    EXPECT_EQ(errors.reports[0].first, KLErr::kWarning);
    EXPECT_NE(errors.reports[0].second.find("No audio output could be opened"), std::string::npos);
    auto sound = chirp(24000);
    KLTimer timer(CueTime(), CueTime::FromSeconds(0.2));
    EXPECT_EQ(KLSoundControl::Play(sound.get(), &timer, CueTime()), 1);
    timer.start();
    auto empty = CueSound::FromSamples({{}}, 8000);
    float pointer = 0.5f;
    EXPECT_EQ(KLSoundControl::Play(nullptr, &timer, CueTime()), 0);
    EXPECT_EQ(KLSoundControl::Play(empty.get(), &timer, CueTime()), 0);
    EXPECT_EQ(KLSoundControl::PlayDrag(empty.get(), nullptr, 100, &pointer), 0);
    KLSoundControl::Stop();

    errors.reports.clear();
    KLSoundControl::DisableAudioLibraryErrors();
    SDL_LogError(SDL_LOG_CATEGORY_AUDIO, "device %d lost", 3);
    ASSERT_EQ(errors.reports.size(), 1u);
    EXPECT_EQ(errors.reports[0].first, KLErr::kError);
    EXPECT_NE(errors.reports[0].second.find("device 3 lost"), std::string::npos);
}

// A machine without a sound card: SDL's ALSA driver fails, and the ALSA library would print
// its own lines on the error stream; the program says it once, in its own words.
TEST_F(SoundFallback, TheAudioLibraryPrintsNothingOfItsOwn) {
    setenv("SDL_AUDIODRIVER", "alsa", 1);
    setenv("ALSA_CONFIG_PATH", "/nonexistent/chirrup-no-alsa.conf", 1);  // no card here either
    KLSoundControl::DisableAudioLibraryErrors();
    testing::internal::CaptureStderr();
    const bool opened = KLSoundControl::Open();
    const std::string printed = testing::internal::GetCapturedStderr();
    unsetenv("ALSA_CONFIG_PATH");
    EXPECT_TRUE(opened);
    EXPECT_EQ(printed.find("ALSA lib"), std::string::npos) << printed;
}

}  // namespace
