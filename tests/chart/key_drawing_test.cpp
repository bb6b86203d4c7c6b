#include <gtest/gtest.h>

#include <sstream>
#include <vector>

#include "chart/KLChartGeometry.h"
#include "chart/KLKeyDrawing.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"

namespace {

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

}  // namespace
