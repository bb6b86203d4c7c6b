// Batch apply timings, each against loading and storing the same scene with nothing applied:
//   DemoLoadStore / DemoBatchApply      the bundled demo (face, 3 keysets, dialogue)
//   LongLoadStore / LongBatchApply      a generated 10-minute track with 10 keysets on the
//                                       demo face (a frame keyset and nine shape sets, a key
//                                       every three frames: 6,000 keys each)
//   LongResultLoadStore                 loading and storing the scene the long apply wrote
// The ratios BatchApply / LoadStore are printed at the end. The program's progress lines are
// sent to /dev/null while timing.
#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <fstream>
#include <map>
#include <string>

#include "scene/KLWireSource.h"
#include "toolkit/CueTime.h"
#include "workspace/ConsoleGhost.h"
#include "workspace/Imp.h"

namespace {

const std::string kDemo = std::string(CHIRRUP_SOURCE_DIR) + "/resources/demo/";

// A scratch directory with the generated keyset description and track file.
const std::string& scratch() {
    static std::string dir = [] {
        char d[] = "/tmp/chirrup-batch-bench-XXXXXX";
        if (!mkdtemp(d))
            std::abort();
        std::string s(d);
        std::ofstream kset(s + "/long.kset");
        kset << "wire " << kDemo << "face.glb 0\n\nbegin keyset mouth head\n";
        const char* shapes[] = {"rest", "AI", "E", "O", "U", "MBP", "FV", "L", "WQ", "etc"};
        for (int i = 0; i < 10; ++i)
            kset << "    key " << shapes[i] << " " << i << "\n";
        kset << "end\n\n";
        // Nine shape sets, each driving its own channel.
        const char* drives[9][2] = {{"brow_L", "5"}, {"brow_R", "5"}, {"brow_L", "1"},
                                    {"brow_R", "1"}, {"head", "3"},   {"head", "4"},
                                    {"head", "5"},   {"tongue", "3"}, {"jaw", "4"}};
        for (int k = 0; k < 9; ++k) {
            kset << "begin shapeset set" << k << " " << drives[k][0] << " " << drives[k][1]
                 << " 0 1\n    key rest 0\n    key on 1\nend\n\n";
        }
        std::ofstream track(s + "/long.track");
        track << "fps 30\n\n";
        const char* smooth[] = {"Linear", "Ease", "Smooth"};
        for (int k = 0; k < 10; ++k) {
            track << "begin keytrack\t"
                  << (k == 0 ? std::string("mouth") : "set" + std::to_string(k - 1)) << "\n";
            for (int e = 0; e < 6000; ++e) {
                const char* shape = k == 0 ? shapes[(e * 7 + 3) % 10] : (e % 2 ? "on" : "rest");
                track << "    event " << e * 3 << " " << shape << " " << smooth[e % 3] << " "
                      << (k == 0 ? 0.5 + (e % 5) * 0.125 : (e % 7) * 1.5) << "\n";
            }
            track << "end\n\n";
        }
        return s;
    }();
    return dir;
}

// Runs `body` with the error stream sent to /dev/null.
template <class F>
void quietly(F body) {
    std::fflush(stderr);
    const int saved = dup(2);
    const int null = open("/dev/null", O_WRONLY);
    dup2(null, 2);
    body();
    std::fflush(stderr);
    dup2(saved, 2);
    close(null);
    close(saved);
}

void load_store(benchmark::State& state, const std::string& in) {
    const std::string out = scratch() + "/plain.glb";
    for (auto _ : state) {
        KLWireSource source(in.c_str());
        if (!source.Store(out.c_str()))
            state.SkipWithError("store failed");
    }
}

void batch_apply(benchmark::State& state, const std::string& kset, const std::string& track) {
    theImp.batchMode = 1;
    theGhost = &ConsoleGhost::Instance();
    const std::string out = scratch() + "/applied.glb";
    for (auto _ : state) {
        quietly([&] {
            theImp.BatchApply(kset.c_str(), track.c_str(), (kDemo + "face.glb").c_str(),
                              out.c_str(), "VX_ROOT", CueTime());
        });
    }
    if (access(out.c_str(), R_OK) != 0)
        state.SkipWithError("no output stored");
}

void BM_DemoLoadStore(benchmark::State& state) {
    load_store(state, kDemo + "face.glb");
}
void BM_DemoBatchApply(benchmark::State& state) {
    // The demo's track names its sound relative to the demo directory.
    if (chdir(kDemo.c_str()) != 0)
        state.SkipWithError("no demo directory");
    batch_apply(state, kDemo + "demo.kset", kDemo + "demo.track");
}
void BM_LongLoadStore(benchmark::State& state) {
    load_store(state, kDemo + "face.glb");
}
void BM_LongBatchApply(benchmark::State& state) {
    batch_apply(state, scratch() + "/long.kset", scratch() + "/long.track");
}
// Loading and storing the scene that the long apply wrote: the same work on a scene of the
// result's size.
void BM_LongResultLoadStore(benchmark::State& state) {
    load_store(state, scratch() + "/applied.glb");
}

BENCHMARK(BM_DemoLoadStore)->Unit(benchmark::kMillisecond)->MinTime(2);
BENCHMARK(BM_DemoBatchApply)->Unit(benchmark::kMillisecond)->MinTime(2);
BENCHMARK(BM_LongLoadStore)->Unit(benchmark::kMillisecond)->MinTime(2);
BENCHMARK(BM_LongBatchApply)->Unit(benchmark::kMillisecond)->MinTime(2);
BENCHMARK(BM_LongResultLoadStore)->Unit(benchmark::kMillisecond)->MinTime(2);

// Prints as usual and keeps each benchmark's CPU time for the ratios.
class RatioReporter : public benchmark::ConsoleReporter {
  public:
    void ReportRuns(const std::vector<Run>& runs) override {
        for (const Run& r : runs)
            if (r.run_type == Run::RT_Iteration && r.iterations > 0)
                cpu[r.run_name.function_name] = r.GetAdjustedCPUTime();
        ConsoleReporter::ReportRuns(runs);
    }
    std::map<std::string, double> cpu;
};

}  // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    RatioReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    auto ratio = [&](const char* a, const char* b) {
        if (reporter.cpu.count(a) && reporter.cpu.count(b) && reporter.cpu[b] > 0)
            std::printf("%s / %s = %.2f\n", a, b, reporter.cpu[a] / reporter.cpu[b]);
    };
    ratio("BM_DemoBatchApply", "BM_DemoLoadStore");
    ratio("BM_LongBatchApply", "BM_LongLoadStore");
    ratio("BM_LongBatchApply", "BM_LongResultLoadStore");
    for (const char* f : {"long.kset", "long.track", "applied.glb", "plain.glb"})
        std::remove((scratch() + "/" + f).c_str());
    rmdir(scratch().c_str());
    return 0;
}
