#include <gtest/gtest.h>

#include <memory>
#include <random>
#include <tuple>
#include <vector>

#include "toolkit/DeviceClock.h"
#include "toolkit/KLTimer.h"
#include "toolkit/KLTimerBeat.h"
#include "toolkit/TimerClock.h"

namespace {

double fakeNow = 100.0;

// Runs timers on a clock the test moves by hand.
class TimerTest : public ::testing::Test {
  protected:
    void SetUp() override {
        fakeNow = 100.0;
        fired.clear();
        TimerClock::SetSource([] { return fakeNow; });
    }
    void TearDown() override { TimerClock::SetSource(nullptr); }
    static void Advance(double seconds) { fakeNow += seconds; }

    // Records each trigger's data and the timer's time when it fired.
    static void Note(KLTimer* timer, void* data) {
        fired.push_back({*static_cast<int*>(data), timer->CurrentSeconds()});
    }
    static inline std::vector<std::pair<int, double>> fired;
};

using Case = std::tuple<double, double, double, double>;  // from, to, elapsed, expected (s)

class TimerArithmetic : public TimerTest, public ::testing::WithParamInterface<Case> {};

TEST_P(TimerArithmetic, RunsTowardsItsEndAtWallClockRateAndStopsThere) {
    auto [from, to, elapsed, expected] = GetParam();
    KLTimer timer(CueTime::FromSeconds(from), CueTime::FromSeconds(to));
    EXPECT_DOUBLE_EQ(timer.CurrentSeconds(), from) << "not started";
    EXPECT_EQ(timer.Reverse(), to < from);
    timer.start();
    Advance(elapsed);
    EXPECT_NEAR(timer.CurrentSeconds(), expected, 1e-9);
    const bool atEnd = expected == to;
    EXPECT_EQ(timer.fire_due(), !atEnd) << "the beat stops the timer at its end";
    EXPECT_EQ(timer.Running(), !atEnd);
    if (atEnd) {
        EXPECT_EQ(timer.Current(), CueTime::FromSeconds(to));
    }
}

INSTANTIATE_TEST_SUITE_P(ForwardReverseAndEnds, TimerArithmetic,
                         ::testing::Values(Case{1.0, 3.0, 0.5, 1.5}, Case{1.0, 3.0, 9.0, 3.0},
                                           Case{3.0, 1.0, 0.5, 2.5}, Case{3.0, 1.0, 2.5, 1.0},
                                           Case{2.0, 2.0, 5.0, 2.0}));

TEST_F(TimerTest, TriggersFireOnceWhenTheirTimeIsReachedInTheTimersDirection) {
    for (bool reverse : {false, true}) {
        fired.clear();  // each direction afresh
        CueTime a = CueTime::FromSeconds(1), b = CueTime::FromSeconds(2);
        KLTimer timer(reverse ? b : a, reverse ? a : b);
        int mid = 1, end = 2;
        timer.post_trigger(Note, &end, timer.To());
        timer.post_trigger(Note, &mid, CueTime::FromSeconds(reverse ? 1.25 : 1.75));
        timer.fire_due();
        EXPECT_TRUE(fired.empty()) << "nothing fires before start";
        timer.start();
        Advance(0.5);
        timer.fire_due();
        EXPECT_TRUE(fired.empty()) << "half way, neither is due";
        Advance(0.3);
        timer.fire_due();
        ASSERT_EQ(fired.size(), 1u);
        EXPECT_EQ(fired[0].first, 1);
        Advance(0.3);
        EXPECT_FALSE(timer.fire_due());
        timer.fire_due();
        ASSERT_EQ(fired.size(), 2u) << "each fires once";
        EXPECT_EQ(fired[1].first, 2);
        EXPECT_DOUBLE_EQ(fired[1].second, timer.To().Seconds());
    }
}

// Stopping freezes the time and keeps the triggers not yet due; an empty timer ends, with
// its trigger, on the first beat.
TEST_F(TimerTest, StopFreezesTimeAndAnEmptyTimerEndsOnTheFirstBeat) {
    KLTimer timer(CueTime::FromSeconds(0), CueTime::FromSeconds(1));
    int end = 7;
    timer.post_trigger(Note, &end, timer.To());
    timer.start();
    Advance(0.4);
    timer.stop();
    Advance(10);
    EXPECT_NEAR(timer.CurrentSeconds(), 0.4, 1e-9);
    EXPECT_FALSE(timer.fire_due());
    EXPECT_TRUE(fired.empty());
    timer.start();  // resumes where it stopped
    Advance(0.1);
    EXPECT_NEAR(timer.CurrentSeconds(), 0.5, 1e-9);

    KLTimer empty(CueTime::FromSeconds(3), CueTime::FromSeconds(3));
    empty.post_trigger(Note, &end, empty.To());
    empty.start();
    KLTimerBeat::Tick();
    EXPECT_EQ(fired.size(), 1u);
    EXPECT_FALSE(empty.Running());
}

// A trigger may end playback: destroy its own timer and another one during the beat.
TEST_F(TimerTest, TheBeatSurvivesTriggersThatDestroyTimers) {
    std::unique_ptr<KLTimer> timers[2] = {
        std::make_unique<KLTimer>(CueTime(), CueTime::FromSeconds(1)),
        std::make_unique<KLTimer>(CueTime(), CueTime::FromSeconds(1))};
    auto destroy = [](KLTimer*, void* data) {
        for (int i = 0; i < 2; i++)
            static_cast<std::unique_ptr<KLTimer>*>(data)[i].reset();
    };
    for (auto& t : timers) {
        t->post_trigger(destroy, timers, t->To());
        t->start();
    }
    Advance(2);
    KLTimerBeat::Tick();
    EXPECT_TRUE(timers[0] == nullptr && timers[1] == nullptr);
}

// The clock a sound thread holds outlives the timer and stays frozen where it stopped.
TEST_F(TimerTest, TheSharedClockOutlivesItsTimer) {
    std::shared_ptr<const TimerClock> clock;
    {
        KLTimer timer(CueTime::FromSeconds(5), CueTime::FromSeconds(4));
        clock = timer.Clock();
        timer.start();
        Advance(0.25);
        timer.stop();
    }
    Advance(1);
    EXPECT_FALSE(clock->Running());
    EXPECT_NEAR(clock->At(TimerClock::Now()), 4.75, 1e-9);
}

// The device clock follows a device that asks for buffers at a steady pace (here 3% faster
// than its nominal period, as a sleeping driver may) through wake-up jitter of +-4 ms.
TEST(DeviceClockTest, FiltersWakeUpJitterFollowsTheDevicesRateAndRelocksAfterAJump) {
    for (double pace : {1.0, 0.97, 1.03}) {
        DeviceClock clock;
        std::mt19937 random(7);
        std::uniform_real_distribution<double> jitter(0.0, 0.004);  // waking is only ever late
        const double period = 512.0 / 48000;
        double worst = 0, worstRaw = 0;
        for (int i = 0; i < 3000; i++) {  // half a minute
            const double device = 10.0 + i * period * pace;
            const double woke = device + jitter(random);
            const double filtered = clock.Update(woke, period);
            if (i > 1500) {
                // The filter may settle with a constant offset (half the mean lateness).
                worst = std::max(worst, std::fabs(filtered - device - 0.002));
                worstRaw = std::max(worstRaw, std::fabs(woke - device - 0.002));
            }
        }
        EXPECT_LT(worst, 0.001) << "pace " << pace;
        EXPECT_GT(worstRaw, 0.0015) << "the raw wake-ups jitter";
        // A pause of seconds relocks at once.
        EXPECT_DOUBLE_EQ(clock.Update(100.0, period), 100.0) << "pace " << pace;
        EXPECT_NEAR(clock.Update(100.0 + period, period), 100.0 + period, 1e-9);
    }
}

}  // namespace
