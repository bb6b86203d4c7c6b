// The 3D views on a generated face-sized scene: a sheet of 20,000 triangles (101 x 101
// vertices) skinned to 60 joints, with 50 morph targets all active (weight 0.5, each moving
// a quarter of the vertices) and a base-colour texture, driven by a keyset of 60 key shapes
// (the joints' poses at frames 0..59) with 120 keys. Needs a display with GLX ($DISPLAY).
//   LoadToShown         LoadKeyset with geometry, then both views given the scene, framed
//                       and drawn once
//   Evaluate            the scene posed at a new time on the CPU (preview, skin, morphs)
//   DrawKeyView/...     one view evaluated and drawn at 640 x 480 at a new time, finished
//   DrawMixView/...     (playing: the fast mode without textures; still: with textures)
//   DrawEmptyView       a view with no scene: clearing and showing the pixels only
#include <benchmark/benchmark.h>
#include <unistd.h>

#include <Xm/Xm.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>

#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "scene/KLScene.h"
#include "scene/gl/KLSceneView.h"
#include "scene/gl/TestScenes.h"
#include "scene/gl/ViewPair.h"
#include "toolkit/CuePrefs.h"
#include "toolkit/xm/KLXmGnome.h"
#include "workspace/Imp.h"

namespace fs = std::filesystem;

namespace {
// The views' size: 640 x 480, or CHIRRUP_VIEWS_BENCH_WIDTH x 3/4 of it.
const int kWidth =
    getenv("CHIRRUP_VIEWS_BENCH_WIDTH") ? atoi(getenv("CHIRRUP_VIEWS_BENCH_WIDTH")) : 640;
const int kHeight = kWidth * 3 / 4;
KLSceneView* views[2] = {nullptr, nullptr};
std::string keysetPath;

bool open_views() {
    static char name[] = "views_bench";
    static char* argv[] = {name, nullptr};
    int argc = 1;
    Widget shell = KLXmGnome::OpenApplication("views_bench", "Chirrup", &argc, argv, nullptr);
    if (!shell)
        return false;
    testscenes::MakeViewPair(shell, kWidth, kHeight, views);
    XtRealizeWidget(shell);
    for (int i = 0; i < 200; ++i) {
        XSync(XtDisplay(shell), False);
        KLXmGnome::ProcessPending();
        usleep(5000);
    }
    return views[0]->HasGL();
}

// A project folder with the face scene and a keyset description of 60 key shapes.
void make_project() {
    const std::string dir = "/tmp/chirrup-views-bench-" + std::to_string(getpid());
    for (const char* sub : {"misc_data", "wire", "pix"})
        fs::create_directories(dir + "/" + sub);
    testscenes::Sheet face;
    // CHIRRUP_VIEWS_BENCH_COLUMNS: another number of quads per side than 100.
    const char* columns = getenv("CHIRRUP_VIEWS_BENCH_COLUMNS");
    face.columns = face.rows = columns ? std::max(1, atoi(columns)) : 100;
    face.joints = 60;
    face.morphTargets = 50;
    face.morphWeights.assign(50, 0.5f);
    face.texture = true;
    face.animatedFrames = 60;
    if (!testscenes::WriteSheet(dir + "/wire/face.glb", face)) {
        std::fprintf(stderr, "views_bench: cannot write the face scene\n");
        std::exit(1);
    }
    keysetPath = dir + "/misc_data/face.kset";
    std::ofstream kset(keysetPath);
    kset << "wire face.glb 0\n\nbegin keyset face joint0\n";
    for (int k = 0; k < 60; ++k)
        kset << "    key k" << k << " " << k << "\n";
    kset << "end\n";
    setenv("TESSEL_PROJECT", dir.c_str(), 1);
    unsetenv("TESSEL_MISC_DIR");
    CuePrefs::Refresh();
}

void load_and_show() {
    if (!theImp.LoadKeyset(keysetPath.c_str())) {
        std::fprintf(stderr, "views_bench: the keyset did not load\n");
        std::exit(1);
    }
    for (KLSceneView* view : views) {
        view->SetScene(nullptr);
        view->SetScene(theImp.scene.get());
        view->Draw();
    }
    XSync(XtDisplay(views[0]->GetWidget()), False);
}

void LoadToShown(benchmark::State& state) {
    for (auto _ : state)
        load_and_show();
}
BENCHMARK(LoadToShown)->Unit(benchmark::kMillisecond)->MinTime(2.0);

// Keys on the face's track: every half second another key shape.
void animate() {
    static bool done = false;
    if (done)
        return;
    done = true;
    load_and_show();
    KLKeyTrack* track = theImp.GetKeyTrack(0);
    KLKeySet* set = theImp.GetKeySet(0);
    for (int e = 0; e < 120; ++e)
        track->InsertKey(e * 7 % 60, CueTime::FromFrames(e * 15), set->GetKeyShape(e * 7 % 60),
                         e % 3, 1.0f);
    theImp.PrepareKeyFrames(-1);
}

void Evaluate(benchmark::State& state) {
    animate();
    int frame = 0;
    for (auto _ : state)
        theImp.scene->Evaluate(CueTime::FromFrames(frame++ % 1800));
}
BENCHMARK(Evaluate)->Unit(benchmark::kMillisecond);

void Draw(benchmark::State& state, int which, int playing) {
    animate();
    KLSceneView* view = views[which];
    view->playing = playing;
    Display* display = XtDisplay(view->GetWidget());
    int frame = 0;
    for (auto _ : state) {
        view->time = CueTime::FromFrames(frame++ % 1800);
        view->Draw();
        XSync(display, False);
    }
    view->playing = 0;
}
// The cost of a view with nothing in it: clearing and showing 640 x 480 pixels.
void DrawEmptyView(benchmark::State& state) {
    KLSceneView* view = views[0];
    KLScene* scene = view->GetScene();
    view->SetScene(nullptr);
    Display* display = XtDisplay(view->GetWidget());
    for (auto _ : state) {
        view->Draw();
        XSync(display, False);
    }
    view->SetScene(scene);
}
BENCHMARK(DrawEmptyView)->Unit(benchmark::kMillisecond);

BENCHMARK_CAPTURE(Draw, KeyViewPlaying, 0, 1)->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(Draw, MixViewPlaying, 1, 1)->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(Draw, KeyViewStill, 0, 0)->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(Draw, MixViewStill, 1, 0)->Unit(benchmark::kMillisecond);
}  // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    if (!open_views()) {
        std::fprintf(stderr, "views_bench: needs a display with direct-rendering GLX\n");
        return 1;
    }
    make_project();
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
