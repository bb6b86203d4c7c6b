// Scene layer timings on a generated ~20 MB .glb (1,200 mesh nodes, 300 of them animated):
//   Parse               load only
//   ParseAndExtract     load, then 60 key shapes sampled over the ~200 channels below "face"
//   StoreUnchanged      load and store with nothing changed
//   StoreChannels       load, 10 x 30 channels of 2,000 keys stored, then store
//   StoreChannelsMixedAxes   the same with translation and rotation channels on each node
//   StoreChannelsKeyedApart  the same on nodes whose other axes the file keys at other times
// (see Layout). The store cases check afterwards that the stored scene holds the stored keys'
// values.
// At the end the ratios StoreChannels* / StoreUnchanged (target under 1.5) and
// ParseAndExtract / Parse (target under 1.3) are printed. Each store reuses the memory the one
// before it freed, as a session that applies again and again does; with --fresh-heap the freed
// memory is given back to the system between stores (untimed), so that each starts on fresh
// memory as a batch run, a process of its own, does. With several repetitions,
// --benchmark_enable_random_interleaving=true spreads each case's runs over the whole run, so
// that a slow spell of a shared machine does not fall on one case alone.
// Then come paired rounds (--paired ROUNDS, 10 unless given; 0 for none): the four store cases
// one after another, store by store, so that a slow spell falls on every case alike; each
// case's median and spread, and each round's store over that round's unchanged one, in both
// ways of starting on memory.
#include <benchmark/benchmark.h>
#include <malloc.h>
#include <time.h>
#include <unistd.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include <tiny_gltf.h>

#include "GltfModelBuilder.h"
#include "scene/KLWire.h"
#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"
#include "scene/SceneDocument.h"
#include "toolkit/CueTime.h"

namespace {
constexpr int kNodes = 1200;
constexpr int kAnimated = 300;
constexpr int kVertices = 700;
constexpr int kKeys = 240;
constexpr int kFaceNodes = 34;  // 34 nodes x 6 animated channels: about 200 channels
bool fresh_heap = false;        // --fresh-heap

// Between two stores: with --fresh-heap, the freed memory goes back to the system.
void between_stores(benchmark::State& state) {
    if (fresh_heap) {
        state.PauseTiming();
        malloc_trim(0);
        state.ResumeTiming();
    }
}

// Writes the benchmark scene once per run; returns its path.
const std::string& scene_path() {
    static std::string path;
    if (!path.empty()) {
        return path;
    }
    path = "/tmp/chirrup-scene-bench-" + std::to_string(getpid()) + ".glb";
    GltfModelBuilder builder;
    tinygltf::Model& m = builder.m;
    m.asset.version = "2.0";
    m.buffers.emplace_back();
    m.scenes.emplace_back();
    m.defaultScene = 0;
    tinygltf::Animation anim;
    anim.name = "shapes";
    std::vector<float> times;
    for (int k = 0; k < kKeys; ++k) {
        times.push_back(float(k) / 30.0f);
    }
    int input = builder.Floats(times, 1, 0, true);
    for (int n = 0; n < kNodes; ++n) {
        std::vector<float> pos, nrm;
        for (int v = 0; v < kVertices; ++v) {
            double a = v * 0.37 + n, b = v * 0.11;
            pos.insert(pos.end(), {float(std::cos(a)), float(std::sin(a)), float(std::sin(b))});
            nrm.insert(nrm.end(), {0.0f, 0.0f, 1.0f});
        }
        tinygltf::Primitive prim;
        prim.mode = TINYGLTF_MODE_POINTS;
        prim.attributes["POSITION"] = builder.Floats(pos, 3, 0, true);
        prim.attributes["NORMAL"] = builder.Floats(nrm, 3);
        tinygltf::Mesh mesh;
        mesh.primitives.push_back(prim);
        m.meshes.push_back(mesh);
        tinygltf::Node node;
        node.name = "n" + std::to_string(n);
        node.mesh = n;
        m.nodes.push_back(node);
        if (n >= kFaceNodes) {
            m.scenes[0].nodes.push_back(n);
        }
        if (n < kAnimated) {
            std::vector<float> t, r;
            for (int k = 0; k < kKeys; ++k) {
                double s = std::sin(k * 0.1 + n);
                // Nodes 0..99 move in X and Y and turn about X only; nodes 100..199 also move
                // in Z and turn about Y.
                const bool allAxes = n >= 100 && n < 200;
                t.insert(t.end(), {float(s), float(k * 0.01),
                                   allAxes ? float(0.1 * std::cos(k * 0.07 + n)) : 0.0f});
                double h = s * 0.5, g = allAxes ? 0.2 * std::cos(k * 0.05 + n) : 0.0;
                // (cos g + j sin g)(cos h + i sin h): a turn about X by 2h, then about Y by 2g
                r.insert(r.end(),
                         {float(std::cos(g) * std::sin(h)), float(std::sin(g) * std::cos(h)),
                          float(-std::sin(g) * std::sin(h)), float(std::cos(g) * std::cos(h))});
            }
            const char* paths[2] = {"translation", "rotation"};
            std::vector<float>* values[2] = {&t, &r};
            for (int p = 0; p < 2; ++p) {
                tinygltf::AnimationSampler s;
                s.input = input;
                s.output = builder.Floats(*values[p], p ? 4 : 3);
                tinygltf::AnimationChannel c;
                c.sampler = int(anim.samplers.size());
                c.target_node = n;
                c.target_path = paths[p];
                anim.samplers.push_back(s);
                anim.channels.push_back(c);
            }
        }
    }
    m.animations.push_back(anim);
    // The first nodes sit under one group, the part of the scene a keyset is extracted from.
    tinygltf::Node face;
    face.name = "face";
    for (int n = 0; n < kFaceNodes; ++n) {
        face.children.push_back(n);
    }
    m.nodes.push_back(face);
    m.scenes[0].nodes.push_back(kNodes);
    tinygltf::TinyGLTF writer;
    writer.WriteGltfSceneToFile(&m, path, true, true, false, true);
    return path;
}

// Where store case `layout` (see Layout) writes: each case replaces its own last result, as
// running the same apply again does, and no case pays for removing another's larger file.
std::string out_path(int layout) {
    return scene_path() + "." + std::to_string(layout) + ".out.glb";
}

void BM_Parse(benchmark::State& state) {
    for (auto _ : state) {
        KLWireSource src(scene_path().c_str());
        benchmark::DoNotOptimize(src.Valid());
    }
}

void extract(OrDagNode* node, double frame, double* sum) {
    for (int c = 0; c < 9; ++c) {
        if (OrChannel* ch = KLWire::FindChannel(node, c)) {
            *sum += ch->eval(frame);
        }
    }
    if (node->asGroupNodePtr()) {
        for (std::unique_ptr<OrDagNode> child = node->childNode(); child;
             child = child->nextNode()) {
            extract(child.get(), frame, sum);
        }
    }
}

void BM_ParseAndExtract(benchmark::State& state) {
    for (auto _ : state) {
        KLWireSource src(scene_path().c_str());
        std::unique_ptr<OrDagNode> root(src.RootNode());
        std::unique_ptr<OrDagNode> face(KLWire::FetchDagNode(root.get(), "face"));
        double sum = 0;
        for (int shape = 0; shape < 60; ++shape) {
            for (std::unique_ptr<OrDagNode> n = face->childNode(); n; n = n->nextNode()) {
                extract(n.get(), shape * 3.0, &sum);
            }
        }
        benchmark::DoNotOptimize(sum);
    }
}

// 10 keysets x 30 channels, each channel 2,000 keys (one every 3 frames, mixed tangents),
// stored on 100 nodes. As apply does, the channels of one keyset share their key times.
// Unchanged: nothing is stored, the scene is loaded and stored as it is.
// Shared: keysets 0..7 drive TX TY TZ of nodes 0..79 and keysets 8..9 RX RY RZ of nodes 80..99,
// so that every path is written at the applied keys.
// MixedAxes: every node 0..99 gets TX TY and RX, translation and rotation on one node; the
// file holds its other axes still (TZ 0, no turn about Y or Z), so the translation is written at
// the applied keys and the rotation turns about one axis.
// KeyedApart: the same channels on nodes 100..199, whose other axes the file moves at its own
// key times (a key every frame for 8 s): each path is written at the union of both key times,
// the rotation turning about three axes.
enum class Layout { Unchanged, Shared, MixedAxes, KeyedApart };
constexpr const char* kLayoutNames[] = {"Unchanged", "Channels", "ChannelsMixedAxes",
                                        "ChannelsKeyedApart"};

// The keys every stored channel gets.
struct AppliedKeys {
    AppliedKeys() {
        for (int k = 0; k < 2000; ++k) {
            times.push_back(CueTime::FromTicks(k * 600));
            values.push_back(float(std::sin(k * 0.3)));
            in.push_back(k % 3);
            out.push_back((k + 1) % 3);
        }
    }
    std::vector<CueTime> times;
    std::vector<float> values;
    std::vector<int> in, out;
};
const AppliedKeys& applied_keys() {
    static const AppliedKeys keys;
    return keys;
}

// One load, the layout's channels stored, and one store; false when the store failed.
bool store_once(Layout layout) {
    const AppliedKeys& keys = applied_keys();
    KLWireSource src(scene_path().c_str());
    if (layout != Layout::Unchanged) {
        const bool mixedAxes = layout != Layout::Shared;
        const int firstNode = layout == Layout::KeyedApart ? 100 : 0;
        std::unique_ptr<OrDagNode> root(src.RootNode());
        for (int i = 0; i < 300; ++i) {
            int keyset = i / 30, node = firstNode + i / 3, axis = i % 3;
            int channel = mixedAxes ? (axis == 2 ? 3 : axis) : (keyset < 8 ? axis : 3 + axis);
            std::string name = "n" + std::to_string(node);
            std::unique_ptr<OrDagNode> n(KLWire::FetchDagNode(root.get(), name.c_str()));
            KLWire::alwaysClearChannel = 1;
            KLWire::StoreChannel(n.get(), channel, 2000, keys.times.data(), keys.values.data(),
                                 keys.in.data(), nullptr, keys.out.data(), nullptr);
        }
    }
    return src.Store(out_path(int(layout)).c_str()) != 0;
}

// What the last store of `layout` wrote: the first and a rotated node's channels at a few of
// their keys. Empty when right, else what is wrong.
std::string check_stored(Layout layout) {
    if (layout == Layout::Unchanged) {
        return {};
    }
    const AppliedKeys& keys = applied_keys();
    const bool mixedAxes = layout != Layout::Shared;
    const int firstNode = layout == Layout::KeyedApart ? 100 : 0;
    std::string error;
    auto back = SceneDocument::Load(out_path(int(layout)), &error);
    const std::pair<int, int> checked[] = {{0, 0}, {0, mixedAxes ? 3 : 1}, {95, mixedAxes ? 1 : 4}};
    for (auto [offset, channel] : checked) {
        const int node = firstNode + offset;
        const ChannelCurve* curve = back ? back->Curve(node, channel) : nullptr;
        for (int k : {0, 1, 2, 999, 1998, 1999}) {
            double got = curve ? curve->Evaluate(keys.times[size_t(k)].Seconds()) : 1e9;
            if (std::fabs(got - keys.values[size_t(k)]) > 2e-3) {
                return "wrong value stored on node " + std::to_string(node) + " channel " +
                       std::to_string(channel) + " " + error;
            }
        }
    }
    return {};
}

void store_case(benchmark::State& state, Layout layout) {
    for (auto _ : state) {
        if (!store_once(layout)) {
            state.SkipWithError("store failed");
        }
        between_stores(state);
    }
    const std::string wrong = check_stored(layout);
    if (!wrong.empty()) {
        state.SkipWithError(wrong.c_str());
    }
}

void BM_StoreUnchanged(benchmark::State& state) {
    store_case(state, Layout::Unchanged);
}
void BM_StoreChannels(benchmark::State& state) {
    store_case(state, Layout::Shared);
}
void BM_StoreChannelsMixedAxes(benchmark::State& state) {
    store_case(state, Layout::MixedAxes);
}
void BM_StoreChannelsKeyedApart(benchmark::State& state) {
    store_case(state, Layout::KeyedApart);
}

BENCHMARK(BM_Parse)->Unit(benchmark::kMillisecond)->MinTime(3);
BENCHMARK(BM_ParseAndExtract)->Unit(benchmark::kMillisecond)->MinTime(3);
// A store builds its samplers on more than one thread when there are many keys: the CPU time
// is the whole process's, so that the helper threads' work is counted too.
BENCHMARK(BM_StoreUnchanged)->Unit(benchmark::kMillisecond)->MinTime(3)->MeasureProcessCPUTime();
BENCHMARK(BM_StoreChannels)->Unit(benchmark::kMillisecond)->MinTime(3)->MeasureProcessCPUTime();
BENCHMARK(BM_StoreChannelsMixedAxes)
    ->Unit(benchmark::kMillisecond)
    ->MinTime(3)
    ->MeasureProcessCPUTime();
BENCHMARK(BM_StoreChannelsKeyedApart)
    ->Unit(benchmark::kMillisecond)
    ->MinTime(3)
    ->MeasureProcessCPUTime();

// Prints as usual and keeps each benchmark's real and CPU time for the ratios: the median of
// the repetitions when there are several (--benchmark_repetitions), else the one run. The CPU
// ratio is the steadier one on a shared machine; the real one includes the wait for the disk.
class RatioReporter : public benchmark::ConsoleReporter {
  public:
    void ReportRuns(const std::vector<Run>& runs) override {
        for (const Run& r : runs) {
            const std::string& name = r.run_name.function_name;
            bool median = r.run_type == Run::RT_Aggregate && r.aggregate_name == "median";
            if (median ||
                (r.run_type == Run::RT_Iteration && r.iterations > 0 && !fromMedian[name])) {
                real[name] = r.GetAdjustedRealTime();
                cpu[name] = r.GetAdjustedCPUTime();
                fromMedian[name] = median;
            }
        }
        ConsoleReporter::ReportRuns(runs);
    }
    std::map<std::string, double> real, cpu;
    std::map<std::string, bool> fromMedian;
};
// The paired rounds (see main): the four store cases one after another, each round starting at
// the next case, each store timed on its own, process CPU and wall clock (ms).
struct CaseTimes {
    std::vector<double> cpu, wall;
};
double clock_ms(clockid_t clock) {
    timespec t{};
    clock_gettime(clock, &t);
    return double(t.tv_sec) * 1e3 + double(t.tv_nsec) * 1e-6;
}
// The median of `v` and its spread as "median (lowest-highest)".
std::string median_spread(std::vector<double> v, const char* format) {
    std::sort(v.begin(), v.end());
    char text[96];
    std::snprintf(text, sizeof text, format, v[v.size() / 2], v.front(), v.back());
    return text;
}
bool paired_rounds(int rounds, bool fresh) {
    std::vector<CaseTimes> times(4);
    for (int c = 0; c < 4; ++c) {
        store_once(Layout(c));  // (untimed: the process's first stores touch fresh memory)
    }
    for (int r = 0; r < rounds; ++r) {
        for (int i = 0; i < 4; ++i) {
            const int c = (r + i) % 4;
            if (fresh) {
                malloc_trim(0);
            }
            const double cpu = clock_ms(CLOCK_PROCESS_CPUTIME_ID), wall = clock_ms(CLOCK_MONOTONIC);
            if (!store_once(Layout(c))) {
                std::printf("Store%s: store failed\n", kLayoutNames[c]);
                return false;
            }
            times[size_t(c)].cpu.push_back(clock_ms(CLOCK_PROCESS_CPUTIME_ID) - cpu);
            times[size_t(c)].wall.push_back(clock_ms(CLOCK_MONOTONIC) - wall);
            const std::string wrong = r + 1 == rounds ? check_stored(Layout(c)) : std::string();
            if (!wrong.empty()) {
                std::printf("Store%s: %s\n", kLayoutNames[c], wrong.c_str());
                return false;
            }
        }
    }
    std::printf("\nPaired rounds (%d), each store %s: median (lowest-highest)\n", rounds,
                fresh ? "on memory given back to the system (as a batch run starts)"
                      : "reusing the memory the one before it freed");
    for (int c = 0; c < 4; ++c) {
        std::printf("  Store%-19s CPU %s  wall %s", kLayoutNames[c],
                    median_spread(times[size_t(c)].cpu, "%6.1f ms (%.1f-%.1f)").c_str(),
                    median_spread(times[size_t(c)].wall, "%6.1f ms (%.1f-%.1f)").c_str());
        if (c > 0) {
            // Each round's store over that round's unchanged one.
            std::vector<double> cpu, wall;
            for (int r = 0; r < rounds; ++r) {
                cpu.push_back(times[size_t(c)].cpu[size_t(r)] / times[0].cpu[size_t(r)]);
                wall.push_back(times[size_t(c)].wall[size_t(r)] / times[0].wall[size_t(r)]);
            }
            std::printf("  / Unchanged: CPU %s, wall %s (target under 1.5)",
                        median_spread(cpu, "%.2f (%.2f-%.2f)").c_str(),
                        median_spread(wall, "%.2f (%.2f-%.2f)").c_str());
        }
        std::printf("\n");
    }
    return true;
}
}  // namespace

int main(int argc, char** argv) {
    // "scene_bench --write-scene PATH" only writes the benchmark scene to PATH (for
    // bench/batch-memory.sh).
    if (argc == 3 && std::string(argv[1]) == "--write-scene") {
        return std::rename(scene_path().c_str(), argv[2]) == 0 ? 0 : 1;
    }
    int rounds = 10;
    for (int i = 1; i < argc;) {
        const std::string arg = argv[i];
        int used = 0;
        if (arg == "--fresh-heap") {
            fresh_heap = true;
            used = 1;
        } else if (arg == "--paired" && i + 1 < argc) {
            rounds = std::max(0, std::atoi(argv[i + 1]));
            used = 2;
        }
        if (used == 0) {
            ++i;
            continue;
        }
        std::copy(argv + i + used, argv + argc, argv + i);
        argc -= used;
    }
    benchmark::Initialize(&argc, argv);
    std::printf("scene file: %s (%.1f MB)\n", scene_path().c_str(), [] {
        FILE* f = std::fopen(scene_path().c_str(), "rb");
        long n = 0;
        if (f) {
            std::fseek(f, 0, SEEK_END);
            n = std::ftell(f);
            std::fclose(f);
        }
        return double(n) / 1e6;
    }());
    RatioReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    auto ratio = [&](const char* a, const char* b, double target) {
        if (reporter.real.count(a) && reporter.real.count(b) && reporter.real[b] > 0 &&
            reporter.cpu[b] > 0) {
            std::printf("%s / %s = %.2f real, %.2f CPU (target under %.1f)\n", a, b,
                        reporter.real[a] / reporter.real[b], reporter.cpu[a] / reporter.cpu[b],
                        target);
        }
    };
    ratio("BM_StoreChannels", "BM_StoreUnchanged", 1.5);
    ratio("BM_StoreChannelsMixedAxes", "BM_StoreUnchanged", 1.5);
    ratio("BM_StoreChannelsKeyedApart", "BM_StoreUnchanged", 1.5);
    ratio("BM_ParseAndExtract", "BM_Parse", 1.3);
    if (rounds > 0 && reporter.real.count("BM_StoreUnchanged")) {
        std::printf(
            "(the store ratios above compare cases timed in blocks of their own, which a "
            "busy machine\n can slow unevenly; the paired rounds below time them store "
            "by store)\n");
    }
    bool paired = true;
    for (bool fresh : {false, true}) {
        paired = paired && (rounds == 0 || paired_rounds(rounds, fresh));
    }
    std::remove(scene_path().c_str());
    for (int layout = 0; layout < 4; ++layout) {
        std::remove(out_path(layout).c_str());
    }
    benchmark::Shutdown();
    return paired ? 0 : 1;
}
