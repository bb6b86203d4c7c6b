// Scene layer timings on a generated ~20 MB .glb (1,200 mesh nodes, 300 of them animated):
//   Parse               load only
//   ParseAndExtract     load, then 60 key shapes sampled over every node's channels
//   StoreUnchanged      load and store with nothing changed
//   StoreChannels       load, 10 x 30 channels of 2,000 keys stored, then store
// At the end the ratios StoreChannels / StoreUnchanged (target under 2) and
// ParseAndExtract / Parse (target under 1.3) are printed.
#include <benchmark/benchmark.h>
#include <unistd.h>

#include <cmath>
#include <cstdio>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include <tiny_gltf.h>

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

int add_floats(tinygltf::Model* m, const std::vector<float>& v, int type, int width, bool minMax) {
    tinygltf::Buffer& b = m->buffers[0];
    tinygltf::BufferView view;
    view.buffer = 0;
    view.byteOffset = b.data.size();
    view.byteLength = v.size() * 4;
    const unsigned char* p = reinterpret_cast<const unsigned char*>(v.data());
    b.data.insert(b.data.end(), p, p + v.size() * 4);
    m->bufferViews.push_back(view);
    tinygltf::Accessor a;
    a.bufferView = int(m->bufferViews.size()) - 1;
    a.componentType = TINYGLTF_COMPONENT_TYPE_FLOAT;
    a.type = type;
    a.count = v.size() / size_t(width);
    if (minMax) {
        a.minValues.assign(size_t(width), 1e30);
        a.maxValues.assign(size_t(width), -1e30);
        for (size_t i = 0; i < v.size(); ++i) {
            a.minValues[i % size_t(width)] = std::min(a.minValues[i % size_t(width)], double(v[i]));
            a.maxValues[i % size_t(width)] = std::max(a.maxValues[i % size_t(width)], double(v[i]));
        }
    }
    m->accessors.push_back(a);
    return int(m->accessors.size()) - 1;
}

// Writes the benchmark scene once per run; returns its path.
const std::string& scene_path() {
    static std::string path;
    if (!path.empty()) {
        return path;
    }
    path = "/tmp/chirrup-scene-bench-" + std::to_string(getpid()) + ".glb";
    tinygltf::Model m;
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
    int input = add_floats(&m, times, TINYGLTF_TYPE_SCALAR, 1, true);
    for (int n = 0; n < kNodes; ++n) {
        std::vector<float> pos, nrm;
        for (int v = 0; v < kVertices; ++v) {
            double a = v * 0.37 + n, b = v * 0.11;
            pos.insert(pos.end(), {float(std::cos(a)), float(std::sin(a)), float(std::sin(b))});
            nrm.insert(nrm.end(), {0.0f, 0.0f, 1.0f});
        }
        tinygltf::Primitive prim;
        prim.attributes["POSITION"] = add_floats(&m, pos, TINYGLTF_TYPE_VEC3, 3, true);
        prim.attributes["NORMAL"] = add_floats(&m, nrm, TINYGLTF_TYPE_VEC3, 3, false);
        tinygltf::Mesh mesh;
        mesh.primitives.push_back(prim);
        m.meshes.push_back(mesh);
        tinygltf::Node node;
        node.name = "n" + std::to_string(n);
        node.mesh = n;
        m.nodes.push_back(node);
        m.scenes[0].nodes.push_back(n);
        if (n < kAnimated) {
            std::vector<float> t, r;
            for (int k = 0; k < kKeys; ++k) {
                double s = std::sin(k * 0.1 + n);
                t.insert(t.end(), {float(s), float(k * 0.01), 0.0f});
                double h = s * 0.5;
                r.insert(r.end(), {float(std::sin(h)), 0.0f, 0.0f, float(std::cos(h))});
            }
            const char* paths[2] = {"translation", "rotation"};
            std::vector<float>* values[2] = {&t, &r};
            for (int p = 0; p < 2; ++p) {
                tinygltf::AnimationSampler s;
                s.input = input;
                s.output = add_floats(&m, *values[p], p ? TINYGLTF_TYPE_VEC4 : TINYGLTF_TYPE_VEC3,
                                      p ? 4 : 3, false);
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
        for (std::unique_ptr<OrDagNode> child(node->childNode()); child;
             child.reset(child->nextNode())) {
            extract(child.get(), frame, sum);
        }
    }
}

void BM_ParseAndExtract(benchmark::State& state) {
    for (auto _ : state) {
        KLWireSource src(scene_path().c_str());
        std::unique_ptr<OrDagNode> root(src.RootNode());
        double sum = 0;
        for (int shape = 0; shape < 60; ++shape) {
            extract(root.get(), shape * 3.0, &sum);
        }
        benchmark::DoNotOptimize(sum);
    }
}

void BM_StoreUnchanged(benchmark::State& state) {
    for (auto _ : state) {
        KLWireSource src(scene_path().c_str());
        if (!src.Store(out_path().c_str())) {
            state.SkipWithError("store failed");
        }
    }
}

void BM_StoreChannels(benchmark::State& state) {
    // 10 keysets x 30 channels of 2,000 keys each (a key every 3 frames, mixed tangents) on
    // translation and rotation channels of 100 nodes.
    std::vector<CueTime> times;
    std::vector<float> values;
    std::vector<int> in, out;
    for (int k = 0; k < 2000; ++k) {
        times.push_back(CueTime::FromTicks(k * 600));
        values.push_back(float(std::sin(k * 0.3)));
        in.push_back(k % 3);
        out.push_back((k + 1) % 3);
    }
    const int channels[3] = {0, 1, 3};
    for (auto _ : state) {
        KLWireSource src(scene_path().c_str());
        std::unique_ptr<OrDagNode> root(src.RootNode());
        for (int i = 0; i < 300; ++i) {
            std::string name = "n" + std::to_string(i / 3);
            std::unique_ptr<OrDagNode> node(KLWire::FetchDagNode(root.get(), name.c_str()));
            KLWire::alwaysClearChannel = 1;
            KLWire::StoreChannel(node.get(), channels[i % 3], 2000, times.data(), values.data(),
                                 in.data(), nullptr, out.data(), nullptr);
        }
        if (!src.Store(out_path().c_str())) {
            state.SkipWithError("store failed");
        }
    }
}

BENCHMARK(BM_Parse)->Unit(benchmark::kMillisecond)->MinTime(3);
BENCHMARK(BM_ParseAndExtract)->Unit(benchmark::kMillisecond)->MinTime(3);
BENCHMARK(BM_StoreUnchanged)->Unit(benchmark::kMillisecond)->MinTime(3);
BENCHMARK(BM_StoreChannels)->Unit(benchmark::kMillisecond)->MinTime(3);

// Prints as usual and keeps each benchmark's mean real time for the ratios.
class RatioReporter : public benchmark::ConsoleReporter {
  public:
    void ReportRuns(const std::vector<Run>& runs) override {
        for (const Run& r : runs) {
            if (r.run_type == Run::RT_Iteration && r.iterations > 0) {
                times[r.run_name.function_name] = r.GetAdjustedRealTime();
            }
        }
        ConsoleReporter::ReportRuns(runs);
    }
    std::map<std::string, double> times;
};
}  // namespace

int main(int argc, char** argv) {
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
        if (reporter.times.count(a) && reporter.times.count(b) && reporter.times[b] > 0) {
            double r = reporter.times[a] / reporter.times[b];
            std::printf("%s / %s = %.2f (target under %.1f)\n", a, b, r, target);
        }
    };
    ratio("BM_StoreChannels", "BM_StoreUnchanged", 2.0);
    ratio("BM_ParseAndExtract", "BM_Parse", 1.3);
    std::remove(scene_path().c_str());
    std::remove(out_path().c_str());
    benchmark::Shutdown();
    return 0;
}
