// The chart's key and region operations, a table of cases on one window.
#include "chart/ChartTestUtil.h"

#include <cmath>

using charttest::Seconds;

namespace {

// A chart of twenty seconds (30 pixels a second) with keys at 0, 2, 5 and 10 seconds (shapes
// 0, 1, 2, 3; values 1, 1, 0.5, 1; Linear, Ease, Smooth, Linear) and the indicator at 3
// seconds with no key active.
class ChartOps : public charttest::ChartTest {
  protected:
    ChartOps() : ChartTest(20) {}
    void SetUp() override {
        ChartTest::SetUp();
        Reset();
    }
    // The starting keys on a fresh track, everything visible, no region, keyset kind 1.
    void Reset() {
        chart->SetKeyTrack(nullptr);
        track = std::make_unique<KLKeyTrack>(keyset.get());
        const double times[] = {0, 2, 5, 10};
        const float values[] = {1, 1, 0.5f, 1};
        for (int i = 0; i < 4; i++)
            Key(i, times[i], i % 3, values[i]);
        keyset->kind = 1;
        chart->SetKeyTrack(track.get());
        chart->ZoomReset();
        chart->SetIndicatorTime(Seconds(3));
        KLSyncChartTestAccess::Feedback(chart);
    }

    // "shape@frame/smoothing/value" for every key, in time order.
    std::string Keys() {
        std::ostringstream text;
        for (const KLKeyEvent* e : track->events)
            text << e->shapeIndex << "@" << e->time.Text() << "/" << e->smoothing << "/" << e->value
                 << " ";
        return text.str();
    }
    int ActiveFrame() { return chart->activeKey ? chart->activeKey->time.Frame() : -1; }
};

const char kStart[] = "0@0/0/1 1@60/1/1 2@150/2/0.5 3@300/0/1 ";

// One operation on the starting keys after the keyset's kind, the visible part, the
// indicator, the active key and the region are set: what it returns, the keys afterwards
// and the active key's frame (-2: not looked at).
struct OpCase {
    const char* name;
    int (*op)(KLSyncChart*, KLKeySet*);
    int kind;
    float zoomStart, zoomEnd;
    double indicator, active;       // seconds; active -1: none
    double regionStart, regionEnd;  // seconds; equal for no region
    int result;
    const char* keys;
    int activeFrame;
};

int add(KLSyncChart* c, KLKeySet* k) {
    return c->AddKeyframe(2, k->GetKeyShape(2), 1);
}
int delete_region(KLSyncChart* c, KLKeySet*) {
    return c->DeleteActiveKeyframeRegion(), 0;
}
int smooth(KLSyncChart* c, KLKeySet*) {
    return c->SetRegionSmoothing(1), 0;
}

const OpCase kOperations[] = {
    // Add Key by the keyset's kind, at the indicator or replacing the active key; the
    // new key is active until the repaint's feedback finds no key at the indicator.
    OpCase{"AddKindOne", add, 1, 0, 1, 3, -1, 0, 0, 1,
           "0@0/0/1 1@60/1/1 2@90/1/1 2@150/2/0.5 3@300/0/1 ", 90},
    OpCase{"AddKindTwoTakesTheShapesFrame", add, 2, 0, 1, 3, -1, 0, 0, 1,
           "0@0/0/1 1@60/1/1 2@90/1/2 2@150/2/0.5 3@300/0/1 ", 90},
    OpCase{"AddOtherKindOnlyPicksTheKeyAtTheIndicator", add, 3, 0, 1, 3, -1, 0, 0, 0, kStart, 60},
    OpCase{"AddReplacesTheActiveKey", add, 1, 0, 1, 3, 5, 0, 0, 1,
           "0@0/0/1 1@60/1/1 2@150/1/1 3@300/0/1 ", -1},
    // Delete Region: the region or the visible span, ends included.
    OpCase{"DeleteVisibleSpanWithItsEnds", delete_region, 1, 0.1f, 0.25f, 3, -1, 0, 0, 0,
           "0@0/0/1 3@300/0/1 ", -2},
    OpCase{"DeleteRegion", delete_region, 1, 0, 1, 3, -1, 1, 3, 0, "0@0/0/1 2@150/2/0.5 3@300/0/1 ",
           -2},
    // Smoothing: the active key, the region with its ends or the next key to the right.
    OpCase{"SmoothNextKeyRightOfTheIndicator", smooth, 1, 0, 1, 3, -1, 0, 0, 0,
           "0@0/0/1 1@60/1/1 2@150/1/0.5 3@300/0/1 ", -2},
    OpCase{"SmoothActiveKey", smooth, 1, 0, 1, 3, 0, 0, 0, 0,
           "0@0/1/1 1@60/1/1 2@150/2/0.5 3@300/0/1 ", -2},
    OpCase{"SmoothNoKeyToTheRight", smooth, 1, 0, 1, 12, -1, 0, 0, 0, kStart, -2},
    OpCase{"SmoothRegionWithItsEnds", smooth, 1, 0, 1, 3, -1, 5, 10, 0,
           "0@0/0/1 1@60/1/1 2@150/1/0.5 3@300/1/1 ", -2}};

TEST_F(ChartOps, OperationsActOnTheActiveKeyTheIndicatorTheRegionOrTheVisibleSpan) {
    for (const OpCase& c : kOperations) {
        SCOPED_TRACE(c.name);
        Reset();
        keyset->kind = c.kind;
        chart->SetZoomPan(c.zoomStart, c.zoomEnd);
        chart->SetIndicatorTime(Seconds(c.indicator));
        if (c.active >= 0)
            KLSyncChartTestAccess::SetActiveKey(chart, track->key_from_time(Seconds(c.active)));
        if (c.regionStart != c.regionEnd)
            chart->SetRegionRange(Seconds(c.regionStart), Seconds(c.regionEnd));
        EXPECT_EQ(c.op(chart, keyset.get()), c.result);
        EXPECT_EQ(Keys(), c.keys);
        if (c.activeFrame != -2) {
            EXPECT_EQ(ActiveFrame(), c.activeFrame);
        }
    }
}

// A hidden indicator (as on a fresh chart or after opening a track) sits one pixel left of
// the chart, next to the key at time 0: that key must not become active, or Delete Key
// removes a key nobody chose; and Add Key puts its key at time 0, never before it.
TEST_F(ChartOps, AHiddenIndicatorMakesNoKeyActiveAndAddsAtTimeZero) {
    chart->geometry.indicatorX = -1;
    KLSyncChartTestAccess::Feedback(chart);
    EXPECT_EQ(chart->activeKey, nullptr);
    chart->DeleteActiveKeyframe();
    EXPECT_EQ(Keys(), kStart);
    keyset->kind = 1;
    track->RemoveKey(Seconds(0));
    ASSERT_LT(chart->GetIndicatorTime(), CueTime());
    EXPECT_EQ(chart->AddKeyframe(2, keyset->GetKeyShape(2), 1), 1);
    EXPECT_EQ(Keys(), "2@0/1/1 1@60/1/1 2@150/2/0.5 3@300/0/1 ");
    // Shown at the start again, the key there is picked as before.
    chart->SetIndicatorTime(CueTime());
    KLSyncChartTestAccess::Feedback(chart);
    EXPECT_EQ(ActiveFrame(), 0);
}

// Keys added and deleted at a time or as the active key; without a key track nothing
// changes.
TEST_F(ChartOps, KeysByTimeAndTheActiveKey) {
    keyset->kind = 2;  // AddTimeKeyframe ignores the kind
    EXPECT_EQ(chart->AddTimeKeyframe(3, Seconds(4), keyset->GetKeyShape(3), 1), 1);
    EXPECT_EQ(Keys(), "0@0/0/1 1@60/1/1 3@120/1/1 2@150/2/0.5 3@300/0/1 ");
    // An occupied time is refused, and the active key is not replaced.
    KLSyncChartTestAccess::SetActiveKey(chart, track->key_from_time(Seconds(0)));
    EXPECT_EQ(chart->AddTimeKeyframe(1, Seconds(5), keyset->GetKeyShape(1), 0), 0);
    EXPECT_EQ(ActiveFrame(), 150);
    EXPECT_EQ(track->events.Count(), 5);

    Reset();
    chart->DeleteActiveKeyframe();  // none active: nothing
    EXPECT_EQ(Keys(), kStart);
    KLSyncChartTestAccess::SetActiveKey(chart, track->key_from_time(Seconds(2)));
    chart->DeleteActiveKeyframe();
    EXPECT_EQ(chart->activeKey, nullptr);
    EXPECT_EQ(Keys(), "0@0/0/1 2@150/2/0.5 3@300/0/1 ");

    Reset();
    chart->SetKeyTrack(nullptr);
    EXPECT_EQ(chart->AddKeyframe(1, keyset->GetKeyShape(1), 1), 0);
    EXPECT_EQ(chart->AddTimeKeyframe(1, Seconds(1), keyset->GetKeyShape(1), 1), 0);
    chart->DeleteActiveKeyframeRegion();
    chart->SetRegionSmoothing(2);
    EXPECT_EQ(Keys(), kStart);
}

// The region range defaults to the visible span; the duration follows the sound and stays
// when it goes; odd sounds still show, one longer than the time line saturates the duration.
TEST_F(ChartOps, RangesDurationAndOddSounds) {
    CueTime a, b;
    chart->SetZoomPan(0.25f, 0.5f);
    chart->GetRegionRange(a, b);
    EXPECT_EQ(std::make_pair(a, b), std::make_pair(Seconds(5), Seconds(10)));

    chart->SetKeyTrack(nullptr);  // its keys would stretch the duration
    chart->SetUserDuration(CueTime());
    auto sound = charttest::Sound(std::vector<float>(48000 * 3, 0.1f), 48000);
    chart->SetSound(sound.get());
    EXPECT_EQ(chart->geometry.duration, Seconds(3));
    chart->SetSound(nullptr);
    EXPECT_EQ(chart->geometry.duration, Seconds(3));

    for (const std::vector<float>& samples :
         {std::vector<float>{0.5f}, {NAN, 0.25f, NAN, -0.5f}, std::vector<float>(1000, 0.0f)}) {
        auto odd = charttest::Sound(samples, 48000);
        chart->SetSound(odd.get());
        guitest::Settle();
        EXPECT_TRUE(std::isfinite(chart->peak));
    }
    EXPECT_EQ(chart->waveSegmentCount, 0);
    auto endless = charttest::Sound(std::vector<float>(400000, 0.5f), 1.0);
    chart->SetSound(endless.get());
    EXPECT_EQ(chart->geometry.duration, CueTime::FromTicks(INT32_MAX));
    EXPECT_EQ(chart->waveSegmentCount, int(chart->geometry.width));
    chart->SetSound(nullptr);
}

}  // namespace
