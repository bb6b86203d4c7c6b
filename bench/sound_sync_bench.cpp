// How closely the sound follows the playback timer, and how soon it starts.
//
// BM_PassSync plays one long pass at a transport speed, as the window does, and logs both
// clocks at every buffer handed to the device: the sound position of the buffer's first
// sample, and the indicator's position at the time that sample is heard (the hand-over time
// plus the device's buffered latency). It reports the largest difference, the largest in the
// last tenth of the pass (drift shows there), and how often the position was cut back into
// step. CHIRRUP_SYNC_SECONDS sets the pass length in region seconds (default 30).
//
// BM_PlayToFirstSample measures the time from Play and the timer's start to the first buffer
// of sound handed to the device plus its latency.
//
// Without SDL_AUDIODRIVER the device is SDL's "disk" driver writing to /dev/null, which paces
// itself like a sound card (it sleeps one buffer's time per buffer).
#include <benchmark/benchmark.h>
#include <stdlib.h>

#include <algorithm>
#include <chrono>
#include <cmath>
#include <memory>
#include <thread>
#include <vector>

#include "toolkit/CueSound.h"
#include "toolkit/KLSoundControl.h"
#include "toolkit/KLTimer.h"
#include "toolkit/TimerClock.h"

namespace {

double PassSeconds() {
    const char* s = getenv("CHIRRUP_SYNC_SECONDS");
    double v = s ? atof(s) : 30.0;
    return v > 0 ? v : 30.0;
}

std::unique_ptr<CueSound> Noise(double seconds) {
    std::vector<float> s(size_t(seconds * 24000) + 1);
    unsigned x = 1;
    for (auto& v : s)
        v = float((x = x * 1103515245 + 12345) >> 16 & 0x7fff) / 32768.0f - 0.5f;
    return CueSound::FromSamples({s}, 24000);
}

bool OpenDevice() {
    setenv("SDL_AUDIODRIVER", "disk", 0);
    setenv("SDL_DISKAUDIOFILE", "/dev/null", 0);
    return KLSoundControl::Open();
}

void BM_PassSync(benchmark::State& state) {
    const float speed = float(state.range(0)) / 100;
    const bool reverse = state.range(1) != 0;
    const double length = PassSeconds();
    auto sound = Noise(length);
    if (!OpenDevice())
        return state.SkipWithError("no audio output");
    const double latency = KLSoundControl::Latency();
    for (auto _ : state) {
        const double from = reverse ? length : 0, to = reverse ? 0 : length;
        const double stretched = from + (to - from) / speed;
        KLTimer timer(CueTime::FromSeconds(from), CueTime::FromSeconds(stretched));
        KLSoundControl::PlaySpeed(speed);
        KLSoundControl::Play(sound.get(), &timer, CueTime());
        const long cutsBefore = KLSoundControl::LastHanded().cuts;
        timer.start();
        auto clock = timer.Clock();
        long seen = -1, samples = 0;
        double worst = 0, worstLate = 0, sum = 0;
        while (timer.fire_due()) {
            std::this_thread::sleep_for(std::chrono::milliseconds(2));
            KLSoundControl::Handed h = KLSoundControl::LastHanded();
            if (h.buffers == seen || !std::isfinite(h.position))
                continue;
            seen = h.buffers;
            // The indicator when the buffer is heard: the window's position rule.
            const double heard = h.clock + latency;
            const double indicator = from + (clock->At(heard) - from) * speed;
            if (clock->At(heard) == stretched)
                continue;  // past the end: nothing to compare
            const double diff = std::fabs(h.position - indicator) / speed;  // wall seconds
            worst = std::max(worst, diff);
            if (std::fabs(clock->At(h.clock) - from) > 0.9 * std::fabs(stretched - from))
                worstLate = std::max(worstLate, diff);
            sum += diff, samples++;
        }
        KLSoundControl::Stop();
        state.counters["max_ms"] = worst * 1000;
        state.counters["max_last_tenth_ms"] = worstLate * 1000;
        state.counters["mean_ms"] = samples ? sum / double(samples) * 1000 : 0;
        state.counters["buffers"] = double(samples);
        state.counters["cuts"] = double(KLSoundControl::LastHanded().cuts - cutsBefore);
    }
}
BENCHMARK(BM_PassSync)
    ->ArgsProduct({{100, 75, 50, 25, 125}, {0, 1}})
    ->Iterations(1)
    ->Unit(benchmark::kSecond)
    ->UseRealTime();

void BM_PlayToFirstSample(benchmark::State& state) {
    auto sound = Noise(2);
    if (!OpenDevice())
        return state.SkipWithError("no audio output");
    KLSoundControl::PlaySpeed(1.0f);
    for (auto _ : state) {
        KLTimer timer(CueTime(), CueTime::FromSeconds(1));
        const long before = KLSoundControl::LastHanded().buffers;
        const double t0 = TimerClock::Now();
        KLSoundControl::Play(sound.get(), &timer, CueTime());
        timer.start();
        KLSoundControl::Handed h{};
        do {
            std::this_thread::yield();
            h = KLSoundControl::LastHanded();
        } while (h.buffers == before || !std::isfinite(h.position));
        state.SetIterationTime(h.clock - t0 + KLSoundControl::Latency());
        KLSoundControl::Stop();
    }
}
BENCHMARK(BM_PlayToFirstSample)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(20);

}  // namespace

BENCHMARK_MAIN();
