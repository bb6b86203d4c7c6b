// Display updates during playback in the main window: the demo track looping in the window
// with the chart 1,600 pixels wide, the key image view and the reference view showing a
// picture per frame (argument 1: the mix view draws the 3D face too). Reports the updates per
// second (the stop watch's marks) and the program's CPU time over wall time. Needs a display:
// bench/playback-display runs it on its own Xvfb. CHIRRUP_PLAY_SECONDS sets the wall time played
// per repetition (default 10).
#include <benchmark/benchmark.h>
#include <stdlib.h>
#include <sys/resource.h>

#include <X11/Intrinsic.h>

#include <chrono>
#include <memory>
#include <string>

#include "chart/KLSyncChart.h"
#include "toolkit/KLImageSGI.h"
#include "toolkit/MonotonicClock.h"
#include "window/DemoProject.h"
#include "window/EventPump.h"
#include "window/FallbackResources.h"
#include "window/Gnome.h"
#include "workspace/Imp.h"

namespace {

double CpuSeconds() {
    rusage u{};
    getrusage(RUSAGE_SELF, &u);
    return double(u.ru_utime.tv_sec + u.ru_stime.tv_sec) +
           double(u.ru_utime.tv_usec + u.ru_stime.tv_usec) * 1e-6;
}

// The window on a copy of the demo project, with a reference picture for every frame.
Gnome* OpenWindow() {
    static Gnome* gnome = [] {
        const std::string dir = windowtest::DemoProject();
        setenv("VX_NOCONFIRM", "1", 1);
        auto* g = new Gnome;
        theGhost = g;
        int argc = 1;
        char name[] = "chirrup";
        char* argv[] = {name, nullptr};
        if (!g->Initialize("chirrup", "Chirrup", widget_spec, &argc, argv,
                           chirrup_fallback_resources()))
            return static_cast<Gnome*>(nullptr);
        XtVaSetValues(KLXmGnome::AppShell(), XtNwidth, 1640, XtNheight, 1000, nullptr);
        theImp.LoadKeyset((dir + "/misc_data/demo.kset").c_str());
        theImp.LoadTrack((dir + "/misc_data/demo.track").c_str());
        // Reference pictures, one per frame of the track.
        const int frames = int(theImp.duration.Frames()) + 1;
        theImp.referenceImages = std::make_unique<std::unique_ptr<KLImageSGI>[]>(size_t(frames));
        for (int i = 0; i < frames; i++) {
            theImp.referenceImages[size_t(i)] = std::make_unique<KLImageSGI>(160, 121);
            uint8_t* p = theImp.referenceImages[size_t(i)]->Pixels();
            for (int k = 0; k < 160 * 121 * 4; k++)
                p[k] = uint8_t(i * 7 + k);
        }
        theImp.referenceCount = frames;
        theImp.referenceLoaded = 1;
        g->refViewOn = 1;
        g->keyViewMode = 2;  // key images
        g->SetViewStatus();
        g->SetActiveKeyset(0);
        return g;
    }();
    return gnome;
}

void BM_PlaybackDisplayRate(benchmark::State& state) {
    Gnome* g = OpenWindow();
    if (!g || !g->syncChart)
        return state.SkipWithError("no display or no window");
    const char* s = getenv("CHIRRUP_PLAY_SECONDS");
    const double seconds = s && atof(s) > 0 ? atof(s) : 10.0;
    XtAppContext context = KLXmGnome::AppContext();
    // Argument: 1 with the mix view drawing the 3D scene as well, 0 without it.
    g->mixViewOn = int(state.range(0));
    g->SetViewStatus();
    for (auto _ : state) {
        g->repeatMode = 1;
        g->stopWatch.Reset();
        const double cpu0 = CpuSeconds(), wall0 = MonotonicSeconds();
        g->PlayForward();
        while (MonotonicSeconds() - wall0 < seconds)
            windowtest::PumpRound(context);
        const double cpu = CpuSeconds() - cpu0, wall = MonotonicSeconds() - wall0;
        state.counters["updates_per_s"] = g->stopWatch.FrameRate();
        state.counters["cpu_percent"] = 100.0 * cpu / wall;
        state.counters["chart_px"] = double(g->syncChart->geometry.width);
        g->PlayStop();
        while (g->playTimer)
            windowtest::PumpRound(context);
    }
}
BENCHMARK(BM_PlaybackDisplayRate)
    ->Arg(0)
    ->Arg(1)
    ->Iterations(1)
    ->Repetitions(3)
    ->Unit(benchmark::kSecond)
    ->UseRealTime();

}  // namespace

BENCHMARK_MAIN();
