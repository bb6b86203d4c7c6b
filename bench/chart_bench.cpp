// The sync chart's costs: re-sketching a long sound's waveform from the min/max summaries
// (against the plain column-by-column scan), a full redraw of a busy chart, and an indicator
// move. The drawing benchmarks need a display ($DISPLAY, e.g. an Xvfb) and are skipped
// without one; their real time includes the X server's drawing (XSync after each), and with
// $CHART_BENCH_SERVER_PID set to the server's process id they also report the server's CPU
// time per iteration (server_ms), which a busy machine does not inflate.
#include <benchmark/benchmark.h>

#include <unistd.h>

#include <X11/Shell.h>
#include <Xm/Xm.h>

#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <fstream>
#include <memory>
#include <string>
#include <vector>

#include "chart/KLChartGeometry.h"
#include "chart/KLSyncChart.h"
#include "chart/KLWaveSummary.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "model/KLMarkTrack.h"
#include "toolkit/CueSound.h"
#include "toolkit/xm/KLXmGnome.h"

// Reaches the chart's repaint for the benchmarks.
class KLSyncChartTestAccess {
  public:
    static void Redraw(KLSyncChart* c) {
        c->needRedraw = true;
        c->expose(nullptr);
    }
};

namespace {

constexpr double kRate = 48000.0;
constexpr long kHourSamples = long(60 * 60 * kRate);

// Speech-like test signal: a tone under a slow swell, with a little noise.
std::vector<float> make_samples(long count) {
    std::vector<float> samples(static_cast<size_t>(count));
    uint32_t noise = 12345;
    for (long i = 0; i < count; i++) {
        noise = noise * 1664525u + 1013904223u;
        const double t = double(i) / kRate;
        const float swell = float(0.5 + 0.5 * std::sin(t * 1.3));
        samples[size_t(i)] = swell * float(std::sin(t * 1400.0)) * 0.6f +
                             (float(noise >> 8) / float(1 << 24) - 0.5f) * 0.05f;
    }
    return samples;
}

struct Hour {
    std::vector<float> samples = make_samples(kHourSamples);
    KLWaveSummary summary;
    float peak = 0;
    Hour() {
        summary.Build(samples.data(), long(samples.size()));
        for (float s : samples)
            peak = std::max(peak, std::fabs(s));
    }
};

Hour& hour() {
    static Hour h;
    return h;
}

// A 1,600 x 300 chart over the hour: all of it, or one second from the middle.
KLChartGeometry hour_chart(bool oneSecond) {
    KLChartGeometry g;
    g.SetSize(1600, 300);
    g.duration = CueTime::FromSeconds(3600);
    if (oneSecond) {
        g.zoomStart = 0.5f;
        g.zoomEnd = 0.5f + 1.0f / 3600.0f;
    }
    return g;
}

void BM_SketchWave(benchmark::State& state) {
    Hour& h = hour();
    const KLChartGeometry g = hour_chart(state.range(0) == 1);
    const bool plain = state.range(1) == 1;
    std::vector<KLWaveSegment> segments;
    for (auto _ : state) {
        SketchWave(g, h.samples.data(), h.summary, long(h.samples.size()),
                   CueTime::FromSeconds(3600), h.peak, segments, plain);
        benchmark::DoNotOptimize(segments.data());
    }
    state.SetLabel(std::string(state.range(0) ? "1 s span" : "full hour") +
                   (plain ? ", plain scan" : ", summaries"));
}
BENCHMARK(BM_SketchWave)
    ->ArgsProduct({{0, 1}, {0, 1}})
    ->Unit(benchmark::kMillisecond)
    ->UseRealTime();

void BM_BuildSummary(benchmark::State& state) {
    Hour& h = hour();
    for (auto _ : state) {
        KLWaveSummary s;
        s.Build(h.samples.data(), long(h.samples.size()));
        benchmark::DoNotOptimize(&s);
    }
}
BENCHMARK(BM_BuildSummary)->Unit(benchmark::kMillisecond)->UseRealTime()->Iterations(3);

// A realized 1,600-pixel chart with 20,000 keys, 2,000 marks and 20 minutes of sound.
struct BusyChart {
    Widget shell = nullptr;
    KLSyncChart* chart = nullptr;
    std::unique_ptr<KLKeySet> keyset;
    std::unique_ptr<KLKeyTrack> track;
    KLMarkTrack marks;
    std::unique_ptr<CueSound> sound;

    BusyChart() {
        static char name[] = "chart_bench";
        static char* argv[] = {name, nullptr};
        int argc = 1;
        Widget app = KLXmGnome::OpenApplication("chart_bench", "Chirrup", &argc, argv, nullptr);
        if (!app)
            return;
        shell = XtVaCreatePopupShell("bench", topLevelShellWidgetClass, app, nullptr);
        Widget top = KLSyncChart::Create(shell, const_cast<char*>("syncChart"), nullptr, 0);
        chart = static_cast<KLSyncChart*>(KLFiend::FromWidget(top));
        XtVaSetValues(chart->drawingArea, XmNwidth, 1600, XmNheight, 300, nullptr);
        XtManageChild(top);
        XtPopup(shell, XtGrabNone);
        while (!chart->geometry.width || chart->needRedraw) {
            XSync(KLXmGnome::GetDisplay(), False);
            XtAppProcessEvent(KLXmGnome::AppContext(), XtIMAll);
        }
        keyset = std::make_unique<KLKeySet>("mouth", "face.glb");
        for (const char* n : {"rest", "AI", "E", "O", "U", "MBP", "FV", "L", "WQ", "etc"})
            keyset->keyShapes.push_back(std::make_unique<KLKey>(0.0f, n, nullptr));
        keyset->keyShapeCount = int(keyset->keyShapes.size());
        track = std::make_unique<KLKeyTrack>(keyset.get());
        for (int i = 0; i < 20000; i++)  // one key every 60 ms
            track->InsertKey(i % 10, CueTime::FromTicks(i * 360), keyset->GetKeyShape(i % 10),
                             i % 3, float(i % 7) / 3.0f);
        for (int i = 0; i < 2000; i++)
            marks.InsertMark(CueTime::FromTicks(i * 3600), char('a' + i % 26));
        sound = CueSound::FromSamples({make_samples(long(20 * 60 * kRate))}, kRate);
        chart->SetSound(sound.get());
        chart->SetKeyTrack(track.get());
        chart->SetMarkTrack(&marks);
        XSync(KLXmGnome::GetDisplay(), False);
    }
};

// CPU seconds the X server has used, when $CHART_BENCH_SERVER_PID names it (its drawing is
// not in this process's CPU time); -1 otherwise.
double server_cpu_seconds() {
    const char* pid = getenv("CHART_BENCH_SERVER_PID");
    if (!pid)
        return -1;
    std::ifstream stat(std::string("/proc/") + pid + "/stat");
    std::string field;
    unsigned long utime = 0, stime = 0;
    for (int i = 1; stat >> field; i++) {
        if (i == 14)
            utime = std::stoul(field);
        if (i == 15) {
            stime = std::stoul(field);
            break;
        }
    }
    return double(utime + stime) / double(sysconf(_SC_CLK_TCK));
}

// Adds the server's CPU time per iteration as the counter "server_ms".
class ServerClock {
  public:
    ServerClock() : start_(server_cpu_seconds()) {}
    void Report(benchmark::State& state) {
        const double end = server_cpu_seconds();
        if (start_ >= 0 && end >= 0 && state.iterations() > 0)
            state.counters["server_ms"] = (end - start_) * 1000.0 / double(state.iterations());
    }

  private:
    double start_;
};

BusyChart* busy() {
    static BusyChart* b = new BusyChart;  // lives for the run: the display cannot reopen
    return b->chart ? b : nullptr;
}

void BM_FullRedraw(benchmark::State& state) {
    BusyChart* b = busy();
    if (!b) {
        state.SkipWithError("no display");
        return;
    }
    ServerClock server;
    for (auto _ : state) {
        KLSyncChartTestAccess::Redraw(b->chart);
        XSync(KLXmGnome::GetDisplay(), False);
    }
    server.Report(state);
    state.SetLabel("1600 px, 20000 keys, 2000 marks, 20 min sound");
}
BENCHMARK(BM_FullRedraw)->Unit(benchmark::kMillisecond)->UseRealTime();

void BM_IndicatorMove(benchmark::State& state) {
    BusyChart* b = busy();
    if (!b) {
        state.SkipWithError("no display");
        return;
    }
    float f = 0.0f;
    ServerClock server;
    for (auto _ : state) {
        f = f > 0.9f ? 0.0f : f + 0.001f;
        b->chart->SetIndicatorPos(f);
        XSync(KLXmGnome::GetDisplay(), False);
    }
    server.Report(state);
}
BENCHMARK(BM_IndicatorMove)->Unit(benchmark::kMicrosecond)->UseRealTime();

}  // namespace

BENCHMARK_MAIN();
