// The chart's key and region operations, as tables of cases.
#include "chart/ChartTestUtil.h"

#include <cmath>

using charttest::ChartWindow;
using charttest::Seconds;

namespace {

// One shared 600 x 260 chart of twenty seconds (30 pixels a second); every case gives it a
// fresh key track with keys at 0, 2, 5 and 10 seconds (shapes 0, 1, 2, 3; values 1, 1, 0.5,
// 1; Linear, Ease, Smooth, Linear) and the indicator at 3 seconds with no key active.
class ChartOps : public testing::Test {
  protected:
    static void SetUpTestSuite() { window = new ChartWindow("syncChart", 600, 260); }
    static void TearDownTestSuite() {
        delete window;
        window = nullptr;
    }
    void SetUp() override {
        chart = window->chart;
        keyset = charttest::Keyset("rest AI E O");
        track = std::make_unique<KLKeyTrack>(keyset.get());
        const double times[] = {0, 2, 5, 10};
        const float values[] = {1, 1, 0.5f, 1};
        for (int i = 0; i < 4; i++)
            track->InsertKey(i, Seconds(times[i]), keyset->GetKeyShape(i), i % 3, values[i]);
        chart->SetUserDuration(Seconds(20));
        chart->SetKeyTrack(track.get());
        chart->ZoomReset();
        chart->SetIndicatorTime(Seconds(3));
        KLSyncChartTestAccess::Feedback(chart);
    }
    void TearDown() override { chart->SetKeyTrack(nullptr); }

    // "shape@frame/smoothing/value" for every key, in time order.
    std::string Keys() {
        std::string text;
        for (const KLKeyEvent* e : track->events) {
            char value[16];
            snprintf(value, sizeof value, "%g", e->value);
            text += std::to_string(e->shapeIndex) + "@" + e->time.Text() + "/" +
                    std::to_string(e->smoothing) + "/" + value + " ";
        }
        return text;
    }
    int ActiveFrame() { return chart->activeKey ? chart->activeKey->time.Frame() : -1; }

    static ChartWindow* window;
    KLSyncChart* chart = nullptr;
    std::unique_ptr<KLKeySet> keyset;
    std::unique_ptr<KLKeyTrack> track;
};
ChartWindow* ChartOps::window = nullptr;

const char kStart[] = "0@0/0/1 1@60/1/1 2@150/2/0.5 3@300/0/1 ";

struct AddCase {
    const char* name;
    int kind;       // the keyset's kind
    double active;  // time of the active key, or -1 for none
    int result;
    const char* keys;
    int activeFrame;  // the active key's frame afterwards
};

class AddKeyframe : public ChartOps, public testing::WithParamInterface<AddCase> {};

TEST_P(AddKeyframe, InsertsByKindAtTheActiveKeyOrTheIndicator) {
    const auto& c = GetParam();
    keyset->kind = c.kind;
    if (c.active >= 0)
        KLSyncChartTestAccess::SetActiveKey(chart, track->key_from_time(Seconds(c.active)));
    EXPECT_EQ(chart->AddKeyframe(2, keyset->GetKeyShape(2), 1), c.result);
    EXPECT_EQ(Keys(), c.keys);
    EXPECT_EQ(ActiveFrame(), c.activeFrame);
}

INSTANTIATE_TEST_SUITE_P(
    Cases, AddKeyframe,
    testing::Values(
        AddCase{"KindOneAtIndicator", 1, -1, 1, "0@0/0/1 1@60/1/1 2@90/1/1 2@150/2/0.5 3@300/0/1 ",
                90},
        AddCase{"KindTwoTakesTheShapesFrame", 2, -1, 1,
                "0@0/0/1 1@60/1/1 2@90/1/2 2@150/2/0.5 3@300/0/1 ", 90},
        AddCase{"OtherKindInsertsNothingButPicksTheKeyAtTheIndicator", 3, -1, 0, kStart, 60},
        // The new key is active until the repaint's feedback finds no key at the indicator.
        AddCase{"ReplacesTheActiveKey", 1, 5, 1, "0@0/0/1 1@60/1/1 2@150/1/1 3@300/0/1 ", -1}),
    [](const auto& info) { return std::string(info.param.name); });

// With the indicator hidden (as on a fresh chart) it reports one pixel before the chart's
// start; the new key goes to time 0 instead, never before it.
TEST_F(ChartOps, AddKeyframeWithTheIndicatorHiddenNeverGoesBeforeTimeZero) {
    keyset->kind = 1;
    track->RemoveKey(Seconds(0));
    chart->geometry.indicatorX = -1;
    ASSERT_LT(chart->GetIndicatorTime(), CueTime());
    EXPECT_EQ(chart->AddKeyframe(2, keyset->GetKeyShape(2), 1), 1);
    EXPECT_EQ(Keys(), "2@0/1/1 1@60/1/1 2@150/2/0.5 3@300/0/1 ");
}

// A hidden indicator (as after opening a track) sits one pixel left of the chart, next to the
// key at time 0; that key must not become active, or Delete Key removes a key nobody chose.
TEST_F(ChartOps, AHiddenIndicatorMakesNoKeyActive) {
    chart->geometry.indicatorX = -1;
    KLSyncChartTestAccess::Feedback(chart);
    EXPECT_EQ(chart->activeKey, nullptr);
    chart->DeleteActiveKeyframe();
    EXPECT_EQ(Keys(), kStart);
    // Shown at the start again, the key there is picked as before.
    chart->SetIndicatorTime(CueTime());
    KLSyncChartTestAccess::Feedback(chart);
    EXPECT_EQ(ActiveFrame(), 0);
}

TEST_F(ChartOps, AddTimeKeyframeIgnoresTheKindAndRefusesAnOccupiedTime) {
    keyset->kind = 2;
    EXPECT_EQ(chart->AddTimeKeyframe(3, Seconds(4), keyset->GetKeyShape(3), 1), 1);
    EXPECT_EQ(Keys(), "0@0/0/1 1@60/1/1 3@120/1/1 2@150/2/0.5 3@300/0/1 ");
    // The active key stays where it is: AddTimeKeyframe does not replace it.
    KLSyncChartTestAccess::SetActiveKey(chart, track->key_from_time(Seconds(0)));
    EXPECT_EQ(chart->AddTimeKeyframe(1, Seconds(5), keyset->GetKeyShape(1), 0), 0);
    EXPECT_EQ(ActiveFrame(), 150);
    EXPECT_EQ(track->events.Count(), 5);
}

TEST_F(ChartOps, NothingWithoutAKeyTrack) {
    chart->SetKeyTrack(nullptr);
    EXPECT_EQ(chart->AddKeyframe(1, keyset->GetKeyShape(1), 1), 0);
    EXPECT_EQ(chart->AddTimeKeyframe(1, Seconds(1), keyset->GetKeyShape(1), 1), 0);
    chart->DeleteActiveKeyframeRegion();
    chart->SetRegionSmoothing(2);
    chart->DeleteTimeKeyframe(Seconds(2));
    EXPECT_EQ(Keys(), kStart);
}

struct RegionCase {
    const char* name;
    float zoomStart, zoomEnd;
    double regionStart, regionEnd;  // seconds; equal for no region
    const char* keys;
};

class DeleteRegion : public ChartOps, public testing::WithParamInterface<RegionCase> {};

TEST_P(DeleteRegion, RemovesKeysInTheRegionOrTheVisibleSpanEndsIncluded) {
    const auto& c = GetParam();
    chart->SetZoomPan(c.zoomStart, c.zoomEnd);
    if (c.regionStart != c.regionEnd)
        chart->SetRegionRange(Seconds(c.regionStart), Seconds(c.regionEnd));
    chart->DeleteActiveKeyframeRegion();
    EXPECT_EQ(Keys(), c.keys);
}

INSTANTIATE_TEST_SUITE_P(
    Cases, DeleteRegion,
    testing::Values(RegionCase{"VisibleSpanWithItsEnds", 0.1f, 0.25f, 0, 0, "0@0/0/1 3@300/0/1 "},
                    RegionCase{"Everything", 0.0f, 1.0f, 0, 0, ""},
                    RegionCase{"Region", 0.0f, 1.0f, 1, 3, "0@0/0/1 2@150/2/0.5 3@300/0/1 "},
                    RegionCase{"RegionReversedIsNoRegion", 0.5f, 1.0f, 3, 1,
                               "0@0/0/1 1@60/1/1 2@150/2/0.5 "}),
    [](const auto& info) { return std::string(info.param.name); });

struct SmoothCase {
    const char* name;
    double active;                  // seconds, -1 none
    double regionStart, regionEnd;  // seconds; equal for none
    double indicator;               // seconds
    const char* keys;
};

class RegionSmoothing : public ChartOps, public testing::WithParamInterface<SmoothCase> {};

TEST_P(RegionSmoothing, SetsTheActiveKeyTheNextKeyOrTheRegion) {
    const auto& c = GetParam();
    chart->SetIndicatorTime(Seconds(c.indicator));
    if (c.active >= 0)
        KLSyncChartTestAccess::SetActiveKey(chart, track->key_from_time(Seconds(c.active)));
    if (c.regionStart != c.regionEnd)
        chart->SetRegionRange(Seconds(c.regionStart), Seconds(c.regionEnd));
    chart->SetRegionSmoothing(1);
    EXPECT_EQ(Keys(), c.keys);
}

INSTANTIATE_TEST_SUITE_P(Cases, RegionSmoothing,
                         testing::Values(SmoothCase{"NextKeyRightOfTheIndicator", -1, 0, 0, 3,
                                                    "0@0/0/1 1@60/1/1 2@150/1/0.5 3@300/0/1 "},
                                         SmoothCase{"ActiveKey", 0, 0, 0, 3,
                                                    "0@0/1/1 1@60/1/1 2@150/2/0.5 3@300/0/1 "},
                                         SmoothCase{"NoKeyToTheRight", -1, 0, 0, 12, kStart},
                                         SmoothCase{"RegionWithItsEnds", -1, 5, 10, 3,
                                                    "0@0/0/1 1@60/1/1 2@150/1/0.5 3@300/1/1 "}),
                         [](const auto& info) { return std::string(info.param.name); });

TEST_F(ChartOps, DeletingTheActiveKeyOrAKeyByTime) {
    chart->DeleteActiveKeyframe();  // none active: nothing
    EXPECT_EQ(Keys(), kStart);
    KLSyncChartTestAccess::SetActiveKey(chart, track->key_from_time(Seconds(2)));
    chart->DeleteActiveKeyframe();
    EXPECT_EQ(chart->activeKey, nullptr);
    chart->DeleteTimeKeyframe(Seconds(5));
    chart->DeleteTimeKeyframe(Seconds(7));
    EXPECT_EQ(Keys(), "0@0/0/1 3@300/0/1 ");
}

TEST_F(ChartOps, RegionRangeReadsBackAndDefaultsToTheVisibleSpan) {
    CueTime a, b;
    chart->SetZoomPan(0.25f, 0.5f);
    chart->GetRegionRange(a, b);
    EXPECT_EQ(a, Seconds(5));
    EXPECT_EQ(b, Seconds(10));
    chart->SetRegionRange(Seconds(1), Seconds(2));
    chart->GetRegionRange(a, b);
    EXPECT_EQ(a, Seconds(1));
    EXPECT_EQ(b, Seconds(2));
    chart->SetZoomRange(Seconds(4), Seconds(6));
    chart->GetZoomRange(a, b);
    EXPECT_EQ(a, Seconds(4));
    EXPECT_EQ(b, Seconds(6));
    EXPECT_FALSE(chart->geometry.RegionSelected());
}

TEST_F(ChartOps, DurationFollowsUserSoundAndTrack) {
    chart->SetUserDuration(CueTime());
    EXPECT_EQ(chart->geometry.duration, Seconds(10));  // the track's last key
    chart->SetKeyTrack(nullptr);
    chart->SetUserDuration(CueTime());
    EXPECT_EQ(chart->geometry.duration, Seconds(1));
    auto sound = charttest::Sound(std::vector<float>(48000 * 3, 0.1f), 48000);
    chart->SetSound(sound.get());
    EXPECT_EQ(chart->geometry.duration, Seconds(3));
    EXPECT_FLOAT_EQ(chart->peak, 0.1f);
    EXPECT_EQ(chart->sampleCount, 48000 * 3);
    chart->SetSound(nullptr);
    EXPECT_EQ(chart->geometry.duration, Seconds(3));
    EXPECT_EQ(chart->sampleCount, 48000 * 3);
}

TEST_F(ChartOps, SoundsThatAreOddStillShow) {
    const std::vector<std::vector<float>> odd = {
        {0.5f}, {NAN, 0.25f, NAN, -0.5f}, std::vector<float>(1000, 0.0f)};
    for (const auto& samples : odd) {
        auto sound = charttest::Sound(samples, 48000);
        chart->SetSound(sound.get());
        guitest::Settle();
        EXPECT_TRUE(std::isfinite(chart->peak));
    }
    EXPECT_EQ(chart->waveSegmentCount, 0);
    // Longer than the time line holds (2^31 ticks is about 99 hours): the duration saturates.
    auto endless = charttest::Sound(std::vector<float>(400000, 0.5f), 1.0);
    chart->SetSound(endless.get());
    EXPECT_EQ(chart->geometry.duration, CueTime::FromTicks(INT32_MAX));
    EXPECT_EQ(chart->waveSegmentCount, int(chart->geometry.width));
    chart->SetSound(nullptr);
}

namespace {
int calls[3];
void count0(Widget, XtPointer, KLFiend*) {
    calls[0]++;
}
void count1(Widget, XtPointer, KLFiend*) {
    calls[1]++;
}
void count2(Widget, XtPointer, KLFiend*) {
    calls[2]++;
}
}  // namespace

TEST_F(ChartOps, FeedbackCallsTheCallbacksAndPicksTheKeysAround) {
    EXPECT_TRUE(chart->SetFiendCallback("showKeyframeCallback", count0, nullptr));
    EXPECT_TRUE(chart->SetFiendCallback("showKeyframeImageCallback", count1, nullptr));
    EXPECT_TRUE(chart->SetFiendCallback("showReferenceImageCallback", count2, nullptr));
    EXPECT_FALSE(chart->SetFiendCallback("noSuchCallback", count0, nullptr));
    calls[0] = calls[1] = calls[2] = 0;
    chart->SetIndicatorTime(Seconds(3.5));  // halfway from 2 s to 5 s
    chart->UpdateDisplay();
    EXPECT_EQ(chart->feedbackKeyBefore, 1);
    EXPECT_EQ(chart->feedbackKeyAfter, 2);
    EXPECT_NEAR(chart->feedbackBlend, 0.5f, 0.02f);  // to the pixel
    EXPECT_EQ(chart->activeKey, nullptr);
    EXPECT_EQ(calls[0], 0);
    EXPECT_EQ(calls[1], 1);
    EXPECT_EQ(calls[2], 1);
    chart->SetIndicatorTime(Seconds(5));
    chart->UpdateDisplay();
    EXPECT_EQ(ActiveFrame(), 150);
    EXPECT_EQ(calls[0], 1);
    for (const char* name :
         {"showKeyframeCallback", "showKeyframeImageCallback", "showReferenceImageCallback"})
        chart->SetFiendCallback(name, nullptr, nullptr);
}

}  // namespace
