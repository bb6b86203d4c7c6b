// Keyset tiles and key editing in the main window on the demo: tile panels, keyset switching,
// the value field, through real input.
#include <gtest/gtest.h>

#include <Xm/TextF.h>
#include <Xm/Xm.h>

#include <cstdlib>
#include <string>

#include "chart/KLSyncChart.h"
#include "guitest/GuiTest.h"
#include "model/KLKey.h"
#include "model/KLKeyEvent.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "toolkit/xm/KLImageButton.h"
#include "window/Gnome.h"
#include "window/WindowTestUtil.h"
#include "workspace/Imp.h"

namespace {

using guitest::Children;
using windowtest::W;

// The demo's keysets: a mouth of 11 shapes and two brows of 3.
class TilesTest : public ::testing::Test {
  protected:
    void SetUp() override {
        setenv("SDL_AUDIODRIVER", "dummy", 1);
        gnome = &windowtest::TheDemoWindow();
        chart = gnome->syncChart;
        ASSERT_NE(chart, nullptr);
        gnome->SetActiveKeyset(0);
    }
    Gnome* gnome = nullptr;
    KLSyncChart* chart = nullptr;
};

// A panel holds rows of tiles, one per shape; a press selects one tile and a second keeps it;
// a double click adds a key of the tile's shape at the indicator.
TEST_F(TilesTest, TilesShowTheShapesAndPickThem) {
    ASSERT_NE(gnome->tileBoxes[0], nullptr);
    EXPECT_EQ(gnome->tileCount[0], 11);
    const int perRow = Gnome::tilesPerRow;
    EXPECT_EQ(int(Children(gnome->tileBoxes[0]).size()), (11 + perRow - 1) / perRow) << "rows";
    gnome->HighlightKeyframe(-1);
    EXPECT_EQ(gnome->CurrentKeyShape(), -1);
    guitest::Click(gnome->tiles[0][1]->GetWidget());
    ASSERT_TRUE(guitest::WaitFor([&] { return gnome->CurrentKeyShape() == 1; }));
    // Slower than a double click, so that it is a second single press.
    guitest::WaitFor([] { return false; }, 0.6);
    guitest::Click(gnome->tiles[0][1]->GetWidget());
    guitest::Settle();
    EXPECT_EQ(gnome->CurrentKeyShape(), 1);
    guitest::Click(gnome->tiles[0][4]->GetWidget());
    ASSERT_TRUE(guitest::WaitFor([&] { return gnome->CurrentKeyShape() == 4; }));
    EXPECT_EQ(gnome->tiles[0][1]->GetState(), 0) << "the old selection is cleared";

    KLKeyTrack* track = theImp.GetKeyTrack(0);
    chart->activeKey = nullptr;
    chart->SetIndicatorTime(CueTime::FromSeconds(1.5));
    const CueTime t = chart->GetIndicatorTime();
    guitest::WaitFor([] { return false; }, 0.6);
    guitest::DoubleClick(gnome->tiles[0][5]->GetWidget());
    KLKeyEvent *prev = nullptr, *next = nullptr;
    ASSERT_TRUE(guitest::WaitFor([&] {
        track->bracket_keys_from_time(t, &prev, &next);
        return prev && prev->time == t;
    }));
    EXPECT_EQ(prev->shapeIndex, 5);
    EXPECT_EQ(gnome->CurrentKeyShape(), 5);
}

// The Keysets menu switches the chart's track and the tile panel; shown for the first time, the
// keyset's key shapes get their pictures from the key view.
TEST_F(TilesTest, TheKeysetMenuSwitchesChartAndPanel) {
    ASSERT_NE(gnome->keysetMenuEntries[1], nullptr);
    XtCallCallbacks(gnome->keysetMenuEntries[1], XmNvalueChangedCallback, nullptr);
    EXPECT_EQ(gnome->GetActiveKeyset(), 1);
    EXPECT_EQ(chart->keyTrack, theImp.GetKeyTrack(1));
    EXPECT_TRUE(XtIsManaged(gnome->tileBoxes[1]) && !XtIsManaged(gnome->tileBoxes[0]));
    ASSERT_TRUE(theImp.geometryActive);
    KLKeySet* brows = theImp.GetKeySet(1);
    for (int i = 0; i < brows->keyShapeCount; i++)
        EXPECT_NE(brows->GetKeyShape(i)->GetImage(), nullptr) << brows->GetKeyShape(i)->Name();
}

// Types into the value field with real keys: the text, then Return.
void TypeValue(const std::string& text) {
    XmTextFieldSetString(W("valTypein"), const_cast<char*>(""));
    guitest::Click(W("valTypein"));
    guitest::TypeText(text + "\n");
}

TEST_F(TilesTest, TheValueFieldSetsTheActiveKeyOnlyForOneFiniteNumber) {
    KLKeyTrack* track = theImp.GetKeyTrack(0);
    KLKeyEvent* key = track->InsertKey(1, CueTime::FromSeconds(2.2), nullptr, 1, 1.0f);
    ASSERT_NE(key, nullptr);
    // The key at the indicator is the chart's active key; its value is shown, its tile selected.
    chart->SetIndicatorTime(key->time);
    chart->UpdateDisplay();
    ASSERT_EQ(chart->activeKey, key);
    char* shown = XmTextFieldGetString(W("valTypein"));
    EXPECT_STREQ(shown, "1");
    XtFree(shown);
    EXPECT_EQ(gnome->CurrentKeyShape(), 1);
    gnome->ActivateKeyValue(1);
    TypeValue("1.5");
    EXPECT_FLOAT_EQ(key->value, 1.5f);
    for (const char* ignored : {"word", "nan", "1e40"}) {
        TypeValue(ignored);
        EXPECT_FLOAT_EQ(key->value, 1.5f) << '"' << ignored << '"';
    }
    chart->SetIndicatorTime(CueTime::FromSeconds(3.5));
    chart->UpdateDisplay();
    ASSERT_EQ(chart->activeKey, nullptr);
    TypeValue("0.25");
    EXPECT_FLOAT_EQ(key->value, 1.5f) << "no active key: nothing";
}

}  // namespace
