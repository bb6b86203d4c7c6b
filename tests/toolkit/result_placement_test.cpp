// Where recognizer results become keyframes: a scripted result list against the keys placed.
#include <gtest/gtest.h>

#include "toolkit/CueResultPlacement.h"

using Key = CueResultPlacement::Key;

std::ostream& operator<<(std::ostream& out, const Key& k) {
    return out << "(" << k.time.Ticks() << ", " << k.shapeIndex << ")";
}

namespace {

std::vector<CueRecognizer::Result> script(std::initializer_list<int> shapes) {
    std::vector<CueRecognizer::Result> out;
    for (int s : shapes)
        out.push_back({s, s < 0 ? 0 : s});
    return out;
}
Key key(int ticks, int shape) {
    return {CueTime::FromTicks(ticks), shape};
}
// Steps of 0.1 s (600 ticks): result i stands for 300 + 600 i ticks after the region start.
const CueTime kStep = CueTime::FromTicks(600);

struct PlacementCase {
    const char* name;
    std::vector<CueRecognizer::Result> results;
    int regionStart;
    std::vector<Key> keys;
};

class Placement : public ::testing::TestWithParam<PlacementCase> {};

TEST_P(Placement, PlacesKeysAtChangesAndAtTheEndsOfHeldShapes) {
    const PlacementCase& c = GetParam();
    EXPECT_EQ(CueResultPlacement::Keys(c.results, CueTime::FromTicks(c.regionStart), kStep),
              c.keys);
}

INSTANTIATE_TEST_SUITE_P(
    Scripted, Placement,
    ::testing::Values(
        PlacementCase{"Empty", {}, 0, {}},
        PlacementCase{
            "OneShapeHeldThroughoutPlacesOnlyItsStart", script({2, 2, 2, 2}), 0, {key(300, 2)}},
        // 1 held three results, 2 held two, 3 to the end: each held shape gets a second key
        // at its last result, just before the change.
        PlacementCase{"HeldShapesStayUntilTheChange",
                      script({1, 1, 1, 2, 2, 3, 3, 3}),
                      0,
                      {key(300, 1), key(1500, 1), key(2100, 2), key(2700, 2), key(3300, 3)}},
        PlacementCase{"OneResultFlickersGetNoHoldKey",
                      script({1, 2, 1, 1}),
                      0,
                      {key(300, 1), key(900, 2), key(1500, 1)}},
        PlacementCase{"TimesStartAtTheRegionStartPlusHalfAStep",
                      script({0, 5, 5, 0}),
                      6000,
                      {key(6300, 0), key(6900, 5), key(7500, 5), key(8100, 0)}},
        // Unlinked results place nothing, and a shape before them still ends there.
        PlacementCase{"UnlinkedResultsPlaceNothing",
                      script({1, 1, -1, -1, 2, -1}),
                      0,
                      {key(300, 1), key(900, 1), key(2700, 2)}},
        PlacementCase{"NothingLinkedPlacesNothing", script({-1, -1}), 0, {}}),
    [](const auto& info) { return std::string(info.param.name); });

// A long recognition (ten hours of one-frame steps) keeps its times exact to the tick.
TEST(PlacementProgress, LongRunsKeepExactTimes) {
    const CueTime frame = CueTime::FromTicks(200);
    std::vector<CueRecognizer::Result> results(30 * 36000, {0, 0});
    results.back() = {1, 1};
    const std::vector<Key> keys = CueResultPlacement::Keys(results, CueTime(), frame);
    ASSERT_EQ(keys.size(), 3u);
    EXPECT_EQ(keys[2], key(100 + 200 * int(results.size() - 1), 1));
}

}  // namespace
