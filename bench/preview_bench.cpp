// Preview evaluation: the scene posed at one time by 10 keysets x 30 channels (kind 1, 120
// events each over 60 s), on a scene of 100 nodes with no meshes.
//   PreviewPose       the tracks' curves evaluated into the pose (KLTrackPreview::Pose)
//   SceneEvaluate     the whole KLScene::Evaluate: rest pose, preview, node matrices
//   RebuildAfterEdit  one key changed, then one evaluation (the curves of one track rebuilt)
#include <benchmark/benchmark.h>
#include <unistd.h>

#include <cstdio>
#include <fstream>
#include <memory>
#include <string>
#include <vector>

#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "model/KLTrackPreview.h"
#include "scene/KLScene.h"
#include "scene/KLWireSource.h"
#include "scene/ScenePose.h"
#include "toolkit/KLStdImp.h"

namespace {
constexpr int kKeysets = 10;
constexpr int kChannels = 30;
constexpr int kNodes = 100;
constexpr int kEvents = 120;
constexpr int kShapes = 12;

struct Fixture {
    Fixture() {
        path = "/tmp/chirrup-preview-bench-" + std::to_string(getpid()) + ".gltf";
        std::ofstream out(path);
        out << R"({"asset":{"version":"2.0"},"scene":0,"scenes":[{"nodes":[)";
        for (int n = 0; n < kNodes; ++n)
            out << (n ? "," : "") << n;
        out << "]}],\"nodes\":[";
        for (int n = 0; n < kNodes; ++n)
            out << (n ? "," : "") << "{\"name\":\"n" << n << "\",\"translation\":[" << n
                << ",0,0]}";
        out << "]}";
        out.close();
        wire = std::make_unique<KLWireSource>(path.c_str());
        for (int k = 0; k < kKeysets; ++k) {
            auto set = std::make_unique<KLKeySet>(("set" + std::to_string(k)).c_str(), "x");
            for (int s = 0; s < kShapes; ++s)
                set->keyShapes.push_back(
                    std::make_unique<KLKey>(float(s), ("s" + std::to_string(s)).c_str(), nullptr));
            set->keyShapeCount = kShapes;
            for (int s = 0; s < kShapes; ++s)
                set->keyShapes[size_t(s)]->index = s;
            for (int c = 0; c < kChannels; ++c) {
                const int slot = k * kChannels + c;  // 300 channels over 100 nodes x 3 axes
                auto* kc = new KLKeyChannel(("n" + std::to_string(slot / 3)).c_str(), 3 + slot % 3,
                                            kShapes);
                for (int s = 0; s < kShapes; ++s)
                    kc->Set(s, float((s * 7 + c) % 11) * 3.0f);
                set->keyChannels.push_back(kc);
            }
            auto track = std::make_unique<KLKeyTrack>(set.get());
            for (int e = 0; e < kEvents; ++e)
                track->InsertKey(e % kShapes, CueTime::FromFrames(e * 15 + k), nullptr, e % 3,
                                 1.0f);
            sets.push_back(std::move(set));
            tracks.push_back(std::move(track));
        }
        scene.LoadGeometry(wire.get());
        scene.SetPoseSource(std::make_unique<KLTrackPreview>([this] {
            std::vector<KLKeyTrack*> list;
            for (auto& t : tracks)
                list.push_back(t.get());
            return list;
        }));
    }
    ~Fixture() { std::remove(path.c_str()); }
    KLStdImp imp;
    std::string path;
    std::unique_ptr<KLWireSource> wire;
    std::vector<std::unique_ptr<KLKeySet>> sets;
    std::vector<std::unique_ptr<KLKeyTrack>> tracks;
    KLScene scene;
};

Fixture& F() {
    static Fixture f;
    return f;
}

void PreviewPose(benchmark::State& state) {
    Fixture& f = F();
    ScenePose pose;
    std::vector<ScenePose::Channels> rest(kNodes, ScenePose::Channels{});
    int frame = 0;
    for (auto _ : state) {
        pose.Reset(rest);
        f.scene.PoseSource()->Pose(f.wire.get(), CueTime::FromFrames(frame++ % 1800), &pose);
        benchmark::DoNotOptimize(pose);
    }
}
BENCHMARK(PreviewPose)->Unit(benchmark::kMicrosecond);

void SceneEvaluate(benchmark::State& state) {
    Fixture& f = F();
    int frame = 0;
    for (auto _ : state) {
        f.scene.Evaluate(CueTime::FromFrames(frame++ % 1800));
        benchmark::DoNotOptimize(f.scene.Pose());
    }
}
BENCHMARK(SceneEvaluate)->Unit(benchmark::kMicrosecond);

void RebuildAfterEdit(benchmark::State& state) {
    Fixture& f = F();
    KLKeyTrack& track = *f.tracks[3];
    const CueTime at = CueTime::FromFrames(7.5);
    for (auto _ : state) {
        track.InsertKey(1, at, nullptr, 0, 0.5f);
        f.scene.Evaluate(at);
        track.RemoveKey(at);
    }
}
BENCHMARK(RebuildAfterEdit)->Unit(benchmark::kMicrosecond);
}  // namespace

BENCHMARK_MAIN();
