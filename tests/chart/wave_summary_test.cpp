#include <gtest/gtest.h>

#include <cmath>
#include <random>

#include "chart/KLChartGeometry.h"
#include "chart/KLWaveSummary.h"

namespace {

std::vector<float> noise(size_t count, unsigned seed) {
    std::mt19937 random(seed);
    std::normal_distribution<float> sample(0.0f, 0.3f);
    std::vector<float> samples(count);
    for (float& s : samples)
        s = sample(random);
    return samples;
}

bool same(const KLWaveSegment& a, const KLWaveSegment& b) {
    return a.x1 == b.x1 && a.y1 == b.y1 && a.x2 == b.x2 && a.y2 == b.y2;
}

// An empty range, and one of positive samples only, reach the centre line.
TEST(WaveSummary, EmptyAndPositiveRangesReachTheCentreLine) {
    KLWaveSummary summary;
    std::vector<float> ones(1000, 0.5f);
    summary.Build(ones.data(), 1000);
    float hi, lo;
    summary.Extent(10, 10, &hi, &lo);
    EXPECT_EQ(std::make_pair(hi, lo), std::make_pair(0.0f, 0.0f));
    summary.Extent(0, 1000, &hi, &lo);
    EXPECT_EQ(std::make_pair(hi, lo), std::make_pair(0.5f, 0.0f));
}

// The sketch from the summaries against the column-by-column scan, at random chart sizes,
// zooms, durations and sound lengths, over samples that include a NaN and an infinity.
TEST(WaveSketch, SummaryGivesTheScansSegmentsAtRandomZooms) {
    std::mt19937 random(3);
    for (int round = 0; round < 60; round++) {
        const size_t count = std::uniform_int_distribution<size_t>(2, 400000)(random);
        auto samples = noise(count, unsigned(round));
        samples[count / 3] = NAN;
        samples[count / 2] = INFINITY;
        KLWaveSummary summary;
        summary.Build(samples.data(), long(count));
        float peak = 0;
        for (float s : samples)
            peak = std::isfinite(s) ? std::max(peak, std::fabs(s)) : peak;

        KLChartGeometry g;
        g.SetSize(std::uniform_int_distribution<uint32_t>(1, 1700)(random),
                  std::uniform_int_distribution<uint32_t>(1, 400)(random));
        const double soundSeconds = double(count) / 48000.0;
        g.duration = CueTime::FromSeconds(soundSeconds *
                                          std::uniform_real_distribution<double>(0.5, 3.0)(random));
        const float a = std::uniform_real_distribution<float>(0, 1)(random);
        const float span = std::pow(0.5f, std::uniform_int_distribution<int>(0, 20)(random));
        g.zoomStart = a;
        g.zoomEnd = std::min(1.0f, a + span);
        const CueTime length = CueTime::FromSeconds(soundSeconds);

        std::vector<KLWaveSegment> fast, plain;
        const int n = SketchWave(g, samples.data(), summary, long(count), length, peak, fast);
        const int m =
            SketchWave(g, samples.data(), summary, long(count), length, peak, plain, true);
        ASSERT_EQ(n, m);
        ASSERT_EQ(n, int(g.width));
        for (int x = 0; x < n; x++) {
            ASSERT_TRUE(same(fast[size_t(x)], plain[size_t(x)])) << "round " << round << " x " << x;
            ASSERT_EQ(fast[size_t(x)].x1, x);
        }
    }
}

// Positive samples go downward from the centre line; without a peak, or with one sample,
// nothing is sketched.
TEST(WaveSketch, PositiveSamplesGoDownwardAndSilenceDrawsNothing) {
    KLChartGeometry g;
    g.SetSize(10, 215);  // wave band 15 .. 114, B = 99
    g.duration = CueTime::FromSeconds(1);
    std::vector<float> samples(1000, 1.0f);
    KLWaveSummary summary;
    summary.Build(samples.data(), 1000);
    std::vector<KLWaveSegment> segments;
    const CueTime second = CueTime::FromSeconds(1);
    ASSERT_EQ(SketchWave(g, samples.data(), summary, 1000, second, 1.0f, segments), 10);
    EXPECT_EQ(segments[3].y1, 15 + 99);  // hi = peak: the bottom
    EXPECT_EQ(segments[3].y2, 15 + 49);  // lo = 0: the centre line
    EXPECT_EQ(SketchWave(g, samples.data(), summary, 1000, second, 0.0f, segments), 0);
    EXPECT_EQ(SketchWave(g, samples.data(), summary, 1, second, 1.0f, segments), 0);
    EXPECT_EQ(segments.size(), 10u);
}

}  // namespace
