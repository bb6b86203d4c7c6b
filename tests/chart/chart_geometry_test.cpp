// The chart's layout without a display: its geometry, the key layer's shapes and the
// waveform sketch.
#include <gtest/gtest.h>

#include <cmath>
#include <random>
#include <sstream>
#include <tuple>
#include <vector>

#include "chart/KLChartGeometry.h"
#include "chart/KLKeyDrawing.h"
#include "chart/KLWaveSummary.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"

namespace {

// A chart of the given size showing `seconds` seconds (at 30 frames a second).
KLChartGeometry chart(uint32_t width, uint32_t height = 200, double seconds = 10.0) {
    KLChartGeometry g;
    g.SetSize(width, height);
    g.duration = CueTime::FromSeconds(seconds);
    return g;
}

// Zooming out doubles the visible part clamping each end separately; an asked-for span is
// clamped and ordered. Both clear the region.
TEST(ChartZoom, OutAndPanClampEachEndAndClearTheRegion) {
    const struct {
        bool zoomOut;      // ZoomOut from (start, end), else SetZoomPan(start, end)
        float start, end;  // visible part before, or the span asked for
        float wantStart, wantEnd;
    } cases[] = {{true, 0.0f, 0.5f, 0.0f, 0.75f},  {true, 0.4f, 0.6f, 0.3f, 0.7f},
                 {true, 0.8f, 0.9f, 0.75f, 0.95f}, {true, 0.0f, 1.0f, 0.0f, 1.0f},
                 {false, -0.5f, 2, 0, 1},          {false, 0.6f, 0.4f, 0.6f, 0.6f},
                 {false, NAN, NAN, 0.0f, 1.0f}};
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::Message() << c.zoomOut << " " << c.start << " " << c.end);
        auto g = chart(400);
        g.regionStart = 0.2f;
        g.regionEnd = 0.25f;
        if (c.zoomOut) {
            g.zoomStart = c.start, g.zoomEnd = c.end;
            g.ZoomOut();
        } else {
            g.SetZoomPan(c.start, c.end);
        }
        EXPECT_FLOAT_EQ(g.zoomStart, c.wantStart);
        EXPECT_FLOAT_EQ(g.zoomEnd, c.wantEnd);
        EXPECT_FALSE(g.RegionSelected());
    }
}

// Zooming in takes the region, then halves about the centre; the indicator keeps its
// fraction or hides.
TEST(ChartZoom, InOnRegionThenAboutTheCentreKeepingTheIndicator) {
    auto g = chart(400);
    g.regionStart = 0.2f;
    g.regionEnd = 0.6f;
    g.ZoomIn();
    EXPECT_EQ(std::make_pair(g.zoomStart, g.zoomEnd), std::make_pair(0.2f, 0.6f));
    EXPECT_FALSE(g.RegionSelected());
    g.ZoomIn();
    EXPECT_FLOAT_EQ(g.zoomStart, 0.3f);
    EXPECT_FLOAT_EQ(g.zoomEnd, 0.5f);

    g.ZoomReset();
    g.indicatorX = 100;  // fraction 0.25
    g.SetZoomPan(0.0f, 0.5f);
    EXPECT_EQ(g.indicatorX, 200);
    g.SetZoomPan(0.5f, 1.0f);
    EXPECT_EQ(g.indicatorX, -1);
    // Hidden, it reports the point one pixel left of the visible part.
    EXPECT_NEAR(g.IndicatorFraction(), 0.5 - 0.5 / 400, 1e-9);
}

TEST(ChartMapping, TimesFractionsColumnsAndSamplesAgree) {
    auto g = chart(300, 200, 10.0);  // 300 frames over 300 columns
    EXPECT_DOUBLE_EQ(g.FractionFromTime(CueTime::FromSeconds(2.5)), 0.25);
    EXPECT_EQ(g.ColumnFromTime(CueTime::FromSeconds(2.5)), 75);
    EXPECT_EQ(g.TimeFromColumn(75), CueTime::FromSeconds(2.5));
    EXPECT_EQ(g.ColumnFromFraction(1.0), 300);  // zoomEnd: just outside
    EXPECT_FALSE(g.ValidColumn(300));
    // A 5-second sound of 1000 samples on the 10-second chart; the last sample from its end.
    const CueTime half = CueTime::FromSeconds(5.0);
    using Index = std::tuple<double, long, CueTime, long>;
    for (auto [f, count, length, want] : {Index{0.25, 1000, half, 500}, Index{0.9, 1000, half, 999},
                                          Index{0.25, 0, half, 0}, Index{0.25, 1000, CueTime(), 0}})
        EXPECT_EQ(g.IndexFromPos(f, count, length), want) << f << " " << count;
    g.duration = CueTime();
    EXPECT_EQ(g.FractionFromTime(CueTime::FromSeconds(3)), 0.0);

    g = chart(0);  // zero width maps every column to 0
    g.zoomStart = 0.3f;
    g.zoomEnd = 0.6f;
    EXPECT_EQ(g.FractionFromColumn(17), 0.0);
    EXPECT_EQ(g.IndicatorFraction(), 0.0);
    EXPECT_EQ(g.ColumnFromFraction(0.5), 0);
    EXPECT_FALSE(g.ValidColumn(0));
    EXPECT_TRUE(g.GridColumns().empty());
}

TEST(ChartDuration, IsTheLargestOfWhatIsShownAndAtLeastASecond) {
    KLChartGeometry g;
    EXPECT_EQ(g.duration, CueTime(0, 0, 5, 0, 0));
    g.userDuration = CueTime(0, 0, 1, 0, 0);
    g.ComputeDuration(false, CueTime(), false, CueTime());
    EXPECT_EQ(g.duration, CueTime(0, 0, 1, 0, 0));
    g.ComputeDuration(true, CueTime::FromSeconds(7), true, CueTime::FromSeconds(3));
    EXPECT_EQ(g.duration, CueTime::FromSeconds(7));
    g.ComputeDuration(true, CueTime::FromSeconds(7), true, CueTime::FromSeconds(30));
    EXPECT_EQ(g.duration, CueTime::FromSeconds(30));
}

TEST(ChartBands, MapValuesToRows) {
    auto g = chart(400, 300);            // lower band 200 .. base 280
    using Tick = std::pair<float, int>;  // the tick's extra pixel at the top
    for (auto [value, row] : {Tick{0.0f, 280}, Tick{1.0f, 240}, Tick{2.0f, 201}, Tick{5.0f, 201}})
        EXPECT_EQ(g.TickRow(value), row) << value;
    EXPECT_FLOAT_EQ(g.ValueFromRow(240), 1.0f);
    EXPECT_FLOAT_EQ(g.ValueFromRow(150), 2.0f);
    EXPECT_FLOAT_EQ(g.ValueFromRow(400), 0.0f);
    EXPECT_FALSE(g.SetSize(400, 300));
    EXPECT_TRUE(g.SetSize(400, 1));  // a 1-pixel chart: negative bands, no trouble
    EXPECT_EQ(g.textBaseline, -19);
    EXPECT_EQ(g.ValueFromRow(0), 0.0f);
    EXPECT_FALSE(KLChartGeometry::Hits(-100, 0) || KLChartGeometry::Hits(INT32_MIN, INT32_MAX));
}

// A 400 x 300 chart of ten seconds (lower band 200, base line 280) over a track of keyset
// "rest AI E".
class KeyDrawing : public testing::Test {
  protected:
    void SetUp() override {
        std::istringstream keys("key rest 0\nkey AI 1\nkey E 2\nend\n");
        keyset.Read(keys);
        g.SetSize(400, 300);
        g.duration = CueTime::FromSeconds(10);
    }
    void Key(int shape, double seconds, int smoothing, float value = 1.0f) {
        track.InsertKey(shape, CueTime::FromSeconds(seconds), keyset.GetKeyShape(shape), smoothing,
                        value);
    }
    KLKeySet keyset{"mouth", "face.glb"};
    KLKeyTrack track{&keyset};
    KLChartGeometry g;
    KLKeyDrawing d;
};

// Curves rise into the key they lead to, in that key's kind (Ease and Smooth one segment per
// column); into a key of the same shape the line is flat on the base line whatever the values.
TEST_F(KeyDrawing, CurvesTakeTheirKeysKindAndHeldShapesAreFlat) {
    Key(0, 0, 0);
    Key(1, 1, 0, 2.0f);  // Linear to the top of the band
    Key(2, 2, 1);        // Ease
    Key(0, 3, 2);        // Smooth
    Key(0, 5, 2, 0.2f);  // held
    d.Build(g, track);
    const auto ends = [](const KLWaveSegment& s) {
        return std::vector<int>{s.x1, s.y1, s.x2, s.y2};
    };
    ASSERT_EQ(d.linear.size(), 2u);
    EXPECT_EQ(ends(d.linear[0]), (std::vector<int>{0, 280, 40, 200}));
    EXPECT_EQ(ends(d.linear[1]), (std::vector<int>{120, 280, 200, 280}));
    ASSERT_EQ(d.ease.size(), 40u);
    EXPECT_EQ(d.ease.front().y1, 280);
    EXPECT_EQ(d.ease.back().y2, 240);
    EXPECT_EQ(d.smooth.size(), 40u);
}

// Keys whose shape has an empty name, or none, draw a stick and a tick but no letter.
TEST_F(KeyDrawing, NamelessKeysHaveNoLetter) {
    keyset.keyShapes.push_back(std::make_unique<KLKey>(3.0f, "", nullptr));
    track.InsertKey(3, CueTime::FromSeconds(1), keyset.keyShapes.back().get(), 1, 1.0f);
    track.InsertKey(1, CueTime::FromSeconds(2), nullptr, 1, 1.0f);
    d.Build(g, track);
    EXPECT_TRUE(d.letters.empty());
    EXPECT_EQ(d.sticks.size(), 4u);
}

TEST_F(KeyDrawing, FarZoomsStayWithinTheDrawableRange) {
    Key(0, 0, 1);
    Key(1, 9, 1);
    Key(2, 9.5, 2);
    Key(0, 9.9, 0);
    for (int i = 0; i < 60; i++)
        g.ZoomIn();  // a span of 2^-60 around the middle
    d.Build(g, track);
    for (const auto* list : {&d.linear, &d.ease, &d.smooth}) {
        EXPECT_LE(list->size(), 500u);
        for (const auto& s : *list) {
            EXPECT_GE(std::min(s.x1, s.x2), -17);
            EXPECT_LE(std::max(s.x1, s.x2), 417);
        }
    }
    EXPECT_TRUE(d.sticks.empty());  // no key lies in view
}

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
