// Key-track storage and lookups at the sizes playback meets: an hour-long track at 30 fps
// with 20,000 keys.
#include <benchmark/benchmark.h>

#include <memory>
#include <random>

#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "toolkit/KLStdImp.h"

namespace {

constexpr int32_t kHourTicks = 3600 * CueTime::kTicksPerSecond;

// 20,000 (or `keys`) distinct key times spread at random over one hour.
std::vector<int32_t> KeyTimes(int keys) {
    std::mt19937 random(42);
    std::uniform_int_distribution<int32_t> tick(0, kHourTicks - 1);
    std::vector<int32_t> times;
    std::vector<bool> used(size_t(kHourTicks), false);
    while (int(times.size()) < keys) {
        const int32_t t = tick(random);
        if (!used[size_t(t)]) {
            used[size_t(t)] = true;
            times.push_back(t);
        }
    }
    return times;
}

std::unique_ptr<KLKeyTrack> MakeTrack(KLKeySet* set, int keys) {
    auto track = std::make_unique<KLKeyTrack>(set);
    for (int32_t t : KeyTimes(keys))
        track->InsertKey(0, CueTime::FromTicks(t), nullptr, 1, 1.0f);
    return track;
}

void BM_InsertKeys(benchmark::State& state) {
    KLKeySet set("mouth", nullptr);
    const std::vector<int32_t> times = KeyTimes(int(state.range(0)));
    for (auto _ : state) {
        KLKeyTrack track(&set);
        for (int32_t t : times)
            track.InsertKey(0, CueTime::FromTicks(t), nullptr, 1, 1.0f);
        benchmark::DoNotOptimize(track.events.Count());
    }
    state.SetItemsProcessed(state.iterations() * state.range(0));
}
BENCHMARK(BM_InsertKeys)->Arg(20000)->Unit(benchmark::kMillisecond);

// One lookup per frame of the hour, in both modes.
void BM_KeyFromTime(benchmark::State& state) {
    KLKeySet set("mouth", nullptr);
    auto track = MakeTrack(&set, 20000);
    track->lookupMode = int(state.range(0));
    int32_t t = 0;
    for (auto _ : state) {
        benchmark::DoNotOptimize(track->key_from_time(CueTime::FromTicks(t)));
        t = (t + 200) % kHourTicks;
    }
    state.SetLabel(state.range(0) ? "nearest" : "previous");
}
BENCHMARK(BM_KeyFromTime)->Arg(0)->Arg(1);

void BM_PrepareFastAccessHour(benchmark::State& state) {
    KLKeySet set("mouth", nullptr);
    auto track = MakeTrack(&set, int(state.range(0)));
    for (auto _ : state) {
        track->PrepareFastAccess(CueTime(), CueTime::FromTicks(kHourTicks));
        benchmark::DoNotOptimize(track->fastTable.data());
    }
    state.counters["entries"] = track->fastCount;
}
BENCHMARK(BM_PrepareFastAccessHour)->Arg(20000)->Unit(benchmark::kMillisecond);

// Constant time: the same cost over 200 and 20,000 keys.
void BM_KeyFromTimeFast(benchmark::State& state) {
    KLKeySet set("mouth", nullptr);
    auto track = MakeTrack(&set, int(state.range(0)));
    track->lookupMode = KLKeyTrack::kNearest;
    track->PrepareFastAccess(CueTime(), CueTime::FromTicks(kHourTicks));
    int32_t t = 0;
    for (auto _ : state) {
        benchmark::DoNotOptimize(track->key_from_time_fast(CueTime::FromTicks(t)));
        t = (t + 7919) % kHourTicks;
    }
}
BENCHMARK(BM_KeyFromTimeFast)->Arg(200)->Arg(20000);

}  // namespace

BENCHMARK_MAIN();
