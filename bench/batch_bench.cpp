// Batch apply timings, each against loading and storing the same scene with nothing applied:
//   DemoLoadStore / DemoBatchApply      the bundled demo (face, 3 keysets, dialogue)
//   LongLoadStore / LongBatchApply      a generated 10-minute track with 10 keysets on the
//                                       demo face (a frame keyset and nine shape sets, a key
//                                       every three frames: 6,000 keys each)
//   LongResultLoadStore                 loading and storing the scene the long apply wrote
// The ratios BatchApply / LoadStore (the scene the apply started from) and, for the long case,
// BatchApply / LongResultLoadStore are printed at the end in wall time (which includes the
// store's fsync) and CPU time. Each apply checks afterwards that the stored scene holds the
// applied values of a few channels. The program's progress lines are sent to /dev/null while
// timing.
#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <unistd.h>

#include <cmath>
#include <cstdio>
#include <fstream>
#include <map>
#include <string>

#include "scene/KLWireSource.h"
#include "scene/SceneDocument.h"
#include "toolkit/CueTime.h"
#include "workspace/ConsoleGhost.h"
#include "workspace/Imp.h"

namespace {

const std::string kDemo = std::string(CHIRRUP_SOURCE_DIR) + "/resources/demo/";

// The applied value of shape set k (1..9) at frame 3e of the long track: event e's value.
double long_value(int e) {
    return (e % 7) * 1.5;
}

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
                      << (k == 0 ? 0.5 + (e % 5) * 0.125 : long_value(e)) << "\n";
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

// Whether the long apply's scene holds the shape sets' event values at a few of their frames.
bool long_result_right(const std::string& path, std::string* why) {
    auto doc = SceneDocument::Load(path, why);
    if (!doc)
        return false;
    // Shape sets 4, 5 and 8 drive head RX, head RY and jaw RY.
    const std::pair<const char*, int> channels[] = {{"head", 3}, {"head", 4}, {"jaw", 4}};
    for (auto [name, channel] : channels) {
        int node = -1;
        for (int i = 0; i < doc->NodeCount(); ++i)
            if (doc->NodeName(i) == name)
                node = i;
        const ChannelCurve* curve = doc->Curve(node, channel);
        for (int e : {0, 1, 2, 700, 3001, 5999}) {
            const double got = curve ? curve->Evaluate(e * 3 / 30.0) : -1e9;
            if (std::fabs(got - long_value(e)) > 2e-3) {
                *why = std::string(name) + " channel " + std::to_string(channel) + " at event " +
                       std::to_string(e) + " holds " + std::to_string(got);
                return false;
            }
        }
    }
    return true;
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
    std::string why;
    if (access(out.c_str(), R_OK) != 0)
        state.SkipWithError("no output stored");
    else if (kset.find("long.kset") != std::string::npos && !long_result_right(out, &why))
        state.SkipWithError(("wrong values stored: " + why).c_str());
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

// Prints as usual and keeps each benchmark's wall and CPU time for the ratios.
class RatioReporter : public benchmark::ConsoleReporter {
  public:
    void ReportRuns(const std::vector<Run>& runs) override {
        for (const Run& r : runs)
            if (r.run_type == Run::RT_Iteration && r.iterations > 0) {
                real[r.run_name.function_name] = r.GetAdjustedRealTime();
                cpu[r.run_name.function_name] = r.GetAdjustedCPUTime();
            }
        ConsoleReporter::ReportRuns(runs);
    }
    std::map<std::string, double> real, cpu;
};

}  // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    RatioReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    auto ratio = [&](const char* a, const char* b) {
        if (reporter.cpu.count(a) && reporter.cpu.count(b) && reporter.cpu[b] > 0 &&
            reporter.real[b] > 0)
            std::printf("%s / %s = %.2f wall, %.2f CPU\n", a, b,
                        reporter.real[a] / reporter.real[b], reporter.cpu[a] / reporter.cpu[b]);
    };
    ratio("BM_DemoBatchApply", "BM_DemoLoadStore");
    ratio("BM_LongBatchApply", "BM_LongLoadStore");
    ratio("BM_LongBatchApply", "BM_LongResultLoadStore");
    for (const char* f : {"long.kset", "long.track", "applied.glb", "plain.glb"})
        std::remove((scratch() + "/" + f).c_str());
    rmdir(scratch().c_str());
    return 0;
}
