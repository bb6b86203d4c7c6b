// The sound thread against the event loop replacing and destroying what it reads mid-pass,
// and the program ending while sound plays, under SDL's "dummy" (thread mostly asleep) and
// "disk" (thread always busy) drivers. Use-after-free shows under the sanitizer build.

#include <chrono>
#include <cmath>
#include <cstdlib>
#include <memory>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include "toolkit/CueSound.h"
#include "toolkit/KLSoundControl.h"
#include "toolkit/KLTimer.h"
#include "toolkit_test_util.h"

namespace {

std::unique_ptr<CueSound> tone(double rate, long frames, int channels = 1) {
    std::vector<float> wave(static_cast<size_t>(frames));
    for (size_t i = 0; i < wave.size(); i++)
        wave[i] = float(0.4 * std::sin(double(i) * 0.05));
    return CueSound::FromSamples(std::vector<std::vector<float>>(size_t(channels), wave), rate);
}

// Waits until the device has asked for `count` more buffers (two seconds at most).
bool wait_buffers(long count) {
    const long until = KLSoundControl::LastHanded().buffers + count;
    auto limit = std::chrono::steady_clock::now() + std::chrono::seconds(2);
    while (KLSoundControl::LastHanded().buffers < until) {
        if (std::chrono::steady_clock::now() > limit)
            return false;
        std::this_thread::yield();
    }
    return true;
}

class SoundLifetimeTest : public ::testing::TestWithParam<const char*> {
  protected:
    void SetUp() override {
        UseSoundDriver(GetParam());
        ASSERT_TRUE(KLSoundControl::Open());
        ASSERT_STREQ(KLSoundControl::DriverName(), GetParam());
        KLSoundControl::PlaySpeed(1.0f);
    }
    void TearDown() override {
        KLSoundControl::Stop();
        KLSoundControl::Close();
        KLSoundControl::PlaySpeed(1.0f);
    }
};

// Transport, audition, scrubbing and driver changes in a random order, the device running.
TEST_P(SoundLifetimeTest, ReplacingAndDestroyingWhatPlaysWhileTheDeviceRuns) {
    std::mt19937 random(7);
    std::unique_ptr<CueSound> sound;
    std::unique_ptr<KLTimer> timer;
    auto position = std::make_unique<float>(0.0f);
    const long lengths[] = {1, 2, 300, 4800, 48000};
    const double rates[] = {8000, 16000, 44100, 48000, 192000};
    const float speeds[] = {0.25f, 0.5f, 0.75f, 1.0f, 1.25f};
    for (int step = 0; step < 200; step++) {
        switch (random() % 9) {
            case 0:  // a new sound loaded over the playing one (a track switched)
                sound = tone(rates[random() % 5], lengths[random() % 5], 1 + int(random() % 6));
                break;
            case 1:  // the sound goes away mid-pass
                sound.reset();
                break;
            case 2:  // the pass's timer goes away mid-pass (a pass ends, an audition is replaced)
                timer.reset();
                break;
            case 3: {  // a new pass, forwards or backwards, at a transport speed
                if (!sound)
                    sound = tone(48000, 4800);
                const bool reverse = random() % 2;
                const double seconds = double(sound->FrameCount()) / sound->Rate();
                timer = std::make_unique<KLTimer>(CueTime::FromSeconds(reverse ? seconds : 0),
                                                  CueTime::FromSeconds(reverse ? 0 : seconds));
                KLSoundControl::PlaySpeed(speeds[random() % 5]);
                KLSoundControl::Play(sound.get(), timer.get(), CueTime());
                timer->start();
                break;
            }
            case 4:  // scrubbing at a pointer that moves, with or without a timer
                if (!sound)
                    sound = tone(16000, 16000);
                KLSoundControl::PlayDrag(sound.get(), random() % 2 ? timer.get() : nullptr, 100,
                                         position.get());
                break;
            case 5: {  // the pointer moves
                float at = float(random() % 1000) / 1000.0f;
                __atomic_store(position.get(), &at, __ATOMIC_RELAXED);
                break;
            }
            case 6:
                KLSoundControl::Stop();
                break;
            case 7:  // another audition: Stop, then a fresh sound and timer
                KLSoundControl::Stop();
                sound = tone(22050, 2205 * (1 + long(random() % 4)));
                timer = std::make_unique<KLTimer>(CueTime(), CueTime::FromSeconds(0.4));
                timer->start();
                KLSoundControl::Play(sound.get(), timer.get(), CueTime());
                break;
            case 8:  // the device closed and reopened (a driver change) while a pass plays
                KLSoundControl::Close();
                ASSERT_TRUE(KLSoundControl::Open());
                break;
        }
        ASSERT_TRUE(wait_buffers(1)) << "the device stopped asking for sound at step " << step;
    }
    // The scrub position is the caller's: it may go while a drag plays, once stopped.
    KLSoundControl::Stop();
    position.reset();
    ASSERT_TRUE(wait_buffers(2));
}

// The program ends while sound plays, the sound and timer in statics destroyed after the
// output's state: the output's thread must be gone first.
std::unique_ptr<CueSound> theSoundAtExit;
std::unique_ptr<KLTimer> theTimerAtExit;

[[noreturn]] void exit_while_playing(const char* driver) {
    UseSoundDriver(driver);
    theSoundAtExit = tone(48000, 48000 * 5);
    theTimerAtExit = std::make_unique<KLTimer>(CueTime(), CueTime::FromSeconds(5));
    theTimerAtExit->start();
    if (KLSoundControl::Play(theSoundAtExit.get(), theTimerAtExit.get(), CueTime()) != 1 ||
        !wait_buffers(3))
        std::_Exit(3);
    std::exit(0);
}

TEST_P(SoundLifetimeTest, TheProgramMayEndWhileSoundPlays) {
    KLSoundControl::Close();
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    for (int i = 0; i < 5; i++)
        EXPECT_EXIT(exit_while_playing(GetParam()), ::testing::ExitedWithCode(0), "");
}

INSTANTIATE_TEST_SUITE_P(Drivers, SoundLifetimeTest, ::testing::Values("dummy", "disk"));

}  // namespace
