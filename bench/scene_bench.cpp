// Scene layer timings on a generated ~20 MB .glb (1,200 mesh nodes, 300 of them animated):
//   Parse               load only
//   ParseAndExtract     load, then 60 key shapes sampled over the ~200 channels below "face"
//   StoreUnchanged      load and store with nothing changed
//   StoreChannels       load, 10 x 30 channels of 2,000 keys stored, then store
//   StoreChannelsMixedAxes   the same with translation and rotation channels on each node
//   StoreChannelsKeyedApart  the same on nodes whose other axes the file keys at other times
// (see store_channels). The store cases check afterwards that the stored scene holds the
// stored keys' values.
// At the end the ratios StoreChannels* / StoreUnchanged (target under 1.5) and
// ParseAndExtract / Parse (target under 1.3) are printed. Each store reuses the memory the one
// before it freed, as a session that applies again and again does; with --fresh-heap the freed
// memory is given back to the system between stores (untimed), so that each starts on fresh
// memory as a batch run, a process of its own, does. With several repetitions,
// --benchmark_enable_random_interleaving=true spreads each case's runs over the whole run, so
// that a slow spell of a shared machine does not fall on one case alone.
#include <benchmark/benchmark.h>
#include <malloc.h>
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

std::string out_path() {
    return scene_path() + ".out.glb";
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

void BM_StoreUnchanged(benchmark::State& state) {
    for (auto _ : state) {
        {
            KLWireSource src(scene_path().c_str());
            if (!src.Store(out_path().c_str())) {
                state.SkipWithError("store failed");
            }
        }
        between_stores(state);
    }
}

// 10 keysets x 30 channels, each channel 2,000 keys (one every 3 frames, mixed tangents),
// stored on 100 nodes. As apply does, the channels of one keyset share their key times.
// Shared: keysets 0..7 drive TX TY TZ of nodes 0..79 and keysets 8..9 RX RY RZ of nodes 80..99,
// so that every path is written at the applied keys.
// MixedAxes: every node 0..99 gets TX TY and RX, translation and rotation on one node; the
// file holds its other axes still (TZ 0, no turn about Y or Z), so the translation is written at
// the applied keys and the rotation turns about one axis.
// KeyedApart: the same channels on nodes 100..199, whose other axes the file moves at its own
// key times (a key every frame for 8 s): each path is written at the union of both key times,
// the rotation turning about three axes.
enum class Layout { Shared, MixedAxes, KeyedApart };
void store_channels(benchmark::State& state, Layout layout) {
    const bool mixedAxes = layout != Layout::Shared;
    const int firstNode = layout == Layout::KeyedApart ? 100 : 0;
    std::vector<CueTime> times;
    std::vector<float> values;
    std::vector<int> in, out;
    for (int k = 0; k < 2000; ++k) {
        times.push_back(CueTime::FromTicks(k * 600));
        values.push_back(float(std::sin(k * 0.3)));
        in.push_back(k % 3);
        out.push_back((k + 1) % 3);
    }
    for (auto _ : state) {
        {
            KLWireSource src(scene_path().c_str());
            std::unique_ptr<OrDagNode> root(src.RootNode());
            for (int i = 0; i < 300; ++i) {
                int keyset = i / 30, node = firstNode + i / 3, axis = i % 3;
                int channel = mixedAxes ? (axis == 2 ? 3 : axis) : (keyset < 8 ? axis : 3 + axis);
                std::string name = "n" + std::to_string(node);
                std::unique_ptr<OrDagNode> n(KLWire::FetchDagNode(root.get(), name.c_str()));
                KLWire::alwaysClearChannel = 1;
                KLWire::StoreChannel(n.get(), channel, 2000, times.data(), values.data(), in.data(),
                                     nullptr, out.data(), nullptr);
            }
            if (!src.Store(out_path().c_str())) {
                state.SkipWithError("store failed");
            }
        }
        between_stores(state);
    }
    // What was stored: the first and a rotated node's channels at a few of their keys.
    std::string error;
    auto back = SceneDocument::Load(out_path(), &error);
    const std::pair<int, int> checked[] = {{0, 0}, {0, mixedAxes ? 3 : 1}, {95, mixedAxes ? 1 : 4}};
    for (auto [offset, channel] : checked) {
        const int node = firstNode + offset;
        const ChannelCurve* curve = back ? back->Curve(node, channel) : nullptr;
        for (int k : {0, 1, 2, 999, 1998, 1999}) {
            double got = curve ? curve->Evaluate(times[size_t(k)].Seconds()) : 1e9;
            if (std::fabs(got - values[size_t(k)]) > 2e-3) {
                state.SkipWithError(("wrong value stored on node " + std::to_string(node) +
                                     " channel " + std::to_string(channel) + " " + error)
                                        .c_str());
                return;
            }
        }
    }
}

void BM_StoreChannels(benchmark::State& state) {
    store_channels(state, Layout::Shared);
}
void BM_StoreChannelsMixedAxes(benchmark::State& state) {
    store_channels(state, Layout::MixedAxes);
}
void BM_StoreChannelsKeyedApart(benchmark::State& state) {
    store_channels(state, Layout::KeyedApart);
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
}  // namespace

int main(int argc, char** argv) {
    // "scene_bench --write-scene PATH" only writes the benchmark scene to PATH (for
    // bench/batch-memory.sh).
    if (argc == 3 && std::string(argv[1]) == "--write-scene") {
        return std::rename(scene_path().c_str(), argv[2]) == 0 ? 0 : 1;
    }
    for (int i = 1; i < argc; ++i) {
        if (std::string(argv[i]) == "--fresh-heap") {
            fresh_heap = true;
            std::copy(argv + i + 1, argv + argc, argv + i);
            --argc;
            break;
        }
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
    std::remove(scene_path().c_str());
    std::remove(out_path().c_str());
    benchmark::Shutdown();
    return 0;
}
