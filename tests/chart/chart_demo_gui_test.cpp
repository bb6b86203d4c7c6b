// The demo's dialogue, marks and mouth keys on a chart, saved as a screenshot for people to
// look at (build/test-screens/chart-demo.png).
#include "chart/ChartTestUtil.h"

#include <fstream>

using charttest::ChartWindow;

namespace {

const std::string demo = std::string(CHIRRUP_SOURCE_DIR) + "/resources/demo/";

// Positions `in` just after the line that starts with `header`; false when there is none.
bool seek_block(std::istream& in, const std::string& header) {
    std::string line;
    while (std::getline(in, line))
        if (line.compare(0, header.size(), header) == 0)
            return true;
    return false;
}

TEST(ChartDemo, DialogueMarksAndMouthKeys) {
    auto keyset = std::make_unique<KLKeySet>("mouth", "face.glb");
    std::ifstream kset(demo + "demo.kset");
    ASSERT_TRUE(seek_block(kset, "begin keyset mouth"));
    keyset->Read(kset);
    ASSERT_EQ(keyset->keyShapeCount, 11);

    KLKeyTrack track(keyset.get());
    KLMarkTrack marks;
    {
        std::ifstream in(demo + "demo.track");
        ASSERT_TRUE(seek_block(in, "begin marktrack"));
        marks.Read(in);
        ASSERT_TRUE(seek_block(in, "begin keytrack\tmouth"));
        track.Read(in, keyset.get());
    }
    ASSERT_EQ(marks.marks.Count(), 9);
    ASSERT_EQ(track.events.Count(), 29);
    CueSound sound((demo + "dialogue.aiff").c_str());
    ASSERT_TRUE(sound.Valid()) << sound.ErrorText();

    ChartWindow window("syncChart", 1200, 300);
    KLSyncChart* chart = window.chart;
    chart->SetUserDuration(CueTime::FromSeconds(1));
    chart->SetSound(&sound);
    chart->SetKeyTrack(&track);
    chart->SetMarkTrack(&marks);
    chart->SetIndicatorTime(CueTime::FromFrames(40));
    chart->UpdateDisplay();
    guitest::Settle();

    // The waveform, the key sticks and the grid are all on screen.
    auto pixels = window.Pixels(0, 0, int(chart->geometry.width), int(chart->geometry.height));
    int wave = 0, keys = 0, grid = 0;
    for (unsigned long p : pixels) {
        wave += p == chart->soundColor;
        keys += p == chart->keyColor;
        grid += p == chart->gridColor;
    }
    EXPECT_GT(wave, 5000);
    EXPECT_GT(keys, 29 * 3 * 40);
    EXPECT_GT(grid, 1000);
    guitest::Screenshot("chart-demo");

    // Zoomed in on the first two seconds, with a region swept over the "w" mark.
    chart->SetZoomRange(CueTime(), CueTime::FromSeconds(2));
    chart->SetRegionRange(CueTime::FromFrames(35), CueTime::FromFrames(45));
    chart->UpdateDisplay();
    guitest::Settle();
    guitest::Screenshot("chart-demo-zoomed");
}

}  // namespace
