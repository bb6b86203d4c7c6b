#pragma once

// GoogleTest first: the X headers define macros (None, Bool) that its names collide with.
#include <gtest/gtest.h>

#include "guitest/GuiTest.h"

#include <X11/Shell.h>
#include <X11/Xutil.h>
#include <Xm/Xm.h>

#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include "chart/KLSyncChart.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "model/KLMarkTrack.h"
#include "toolkit/CueSound.h"
#include "toolkit/xm/KLXmGnome.h"

// Reaches the chart's private state and steps for the tests.
class KLSyncChartTestAccess {
  public:
    static void Feedback(KLSyncChart* c) { c->feedback_meter_movement(); }
    static void SetActiveKey(KLSyncChart* c, KLKeyEvent* e) { c->set_active_key(e); }
};

namespace charttest {

// A chart on a top-level window of its own, its drawing area `width` x `height` pixels.
// Destroying the window deletes the chart.
class ChartWindow {
  public:
    ChartWindow(const char* name, int width, int height) {
        shell = XtVaCreatePopupShell("chartTestShell", topLevelShellWidgetClass, guitest::Shell(),
                                     XmNallowShellResize, True, nullptr);
        Widget top = KLSyncChart::Create(shell, const_cast<char*>(name), nullptr, 0);
        chart = static_cast<KLSyncChart*>(KLFiend::FromWidget(top));
        XtVaSetValues(chart->drawingArea, XmNwidth, width, XmNheight, height, nullptr);
        XtManageChild(top);
        XtPopup(shell, XtGrabNone);
        guitest::WaitMapped(shell);
        guitest::WaitFor([this] { return chart->geometry.width > 0 && !chart->needRedraw; });
        guitest::Settle();
    }
    ~ChartWindow() {
        XtDestroyWidget(shell);
        guitest::Settle();
    }
    ChartWindow(const ChartWindow&) = delete;
    ChartWindow& operator=(const ChartWindow&) = delete;
    unsigned long Pixel(int x, int y) {
        guitest::Settle();
        return guitest::PixelAt(chart->drawingArea, x, y);
    }

    Widget shell = nullptr;
    KLSyncChart* chart = nullptr;
};

// A kind-1 keyset "mouth" with the given key shapes, one a frame from frame 0.
inline std::unique_ptr<KLKeySet> Keyset(const std::string& names) {
    auto set = std::make_unique<KLKeySet>("mouth", "face.glb");
    std::istringstream in(names);
    std::ostringstream block;
    std::string name;
    for (int frame = 0; in >> name; frame++)
        block << "key " << name << " " << frame << "\n";
    std::istringstream keys(block.str());
    set->Read(keys);
    return set;
}

// A time `seconds` into the chart.
inline CueTime Seconds(double seconds) {
    return CueTime::FromSeconds(seconds);
}

// A mono sound of the given samples at `rate`.
inline std::unique_ptr<CueSound> Sound(std::vector<float> samples, double rate) {
    return CueSound::FromSamples({std::move(samples)}, rate);
}

// A 600 x 260 chart of `seconds` seconds on its own window, with a key track of keyset
// "rest AI E O" that the test fills (Key) and shows.
class ChartTest : public ::testing::Test {
  protected:
    explicit ChartTest(double seconds = 10) : seconds_(seconds) {}
    void SetUp() override {
        window = std::make_unique<ChartWindow>("syncChart", 600, 260);
        chart = window->chart;
        chart->SetUserDuration(Seconds(seconds_));
        keyset = Keyset("rest AI E O");
        track = std::make_unique<KLKeyTrack>(keyset.get());
    }
    void TearDown() override { window.reset(); }
    void Key(int shape, double seconds, int smoothing, float value) {
        track->InsertKey(shape, Seconds(seconds), keyset->GetKeyShape(shape), smoothing, value);
    }

    std::unique_ptr<ChartWindow> window;
    KLSyncChart* chart = nullptr;
    std::unique_ptr<KLKeySet> keyset;
    std::unique_ptr<KLKeyTrack> track;

  private:
    double seconds_;
};

}  // namespace charttest
