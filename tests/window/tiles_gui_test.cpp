// Keyset tiles and key editing in the main window on the demo: tile panels, keyset switching,
// the display styles, the value field and the duration prompt, through real input.
#include <gtest/gtest.h>

#include <Xm/SelectioB.h>
#include <Xm/TextF.h>
#include <Xm/ToggleB.h>
#include <Xm/ToggleBG.h>
#include <Xm/Xm.h>

#include <cstdlib>
#include <fstream>
#include <string>

#include "chart/KLSyncChart.h"
#include "guitest/AnswerScript.h"
#include "guitest/GuiTest.h"
#include "model/KLKey.h"
#include "model/KLKeyEvent.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "toolkit/KLImageSGI.h"
#include "toolkit/xm/KLImageButton.h"
#include "toolkit/xm/KLPrompt.h"
#include "window/EventPump.h"
#include "window/Gnome.h"
#include "window/WindowTestUtil.h"
#include "workspace/Imp.h"

namespace {

using guitest::Children;
using windowtest::Label;
using windowtest::W;

// The demo's keysets (mouth with 11 shapes, two brows with 3) and a fourth of 9 shapes,
// loaded once with 4 tiles per row.
class TilesTest : public ::testing::Test {
  protected:
    void SetUp() override {
        setenv("SDL_AUDIODRIVER", "dummy", 1);
        gnome = &windowtest::TheWindow();
        const std::string project = windowtest::DemoProject();
        if (theImp.keysetCount != 4) {
            std::ifstream demo(project + "/misc_data/demo.kset");
            std::string text((std::istreambuf_iterator<char>(demo)), {});
            text += "\nbegin shapeset nine jaw 5 0 1\n";
            for (int i = 0; i < 9; i++)
                text += "    key s" + std::to_string(i) + " " + std::to_string(i) + "\n";
            text += "end\n";
            std::ofstream(project + "/misc_data/nine.kset") << text;
            Gnome::tilesPerRow = 4;
            ASSERT_EQ(theImp.LoadKeyset((project + "/misc_data/nine.kset").c_str()), 1);
            ASSERT_EQ(theImp.keysetCount, 4);
        }
        chart = gnome->syncChart;
        ASSERT_NE(chart, nullptr);
        gnome->SetActiveKeyset(0);
    }
    Gnome* gnome = nullptr;
    KLSyncChart* chart = nullptr;
};

// Panels hold rows of tiles, each a button named after its shape and a label, pictureless
// shapes sharing one blank icon; a press selects one tile and a second keeps it; a double click
// adds a key of the tile's shape at the indicator.
TEST_F(TilesTest, TilesShowTheShapesAndPickThem) {
    Widget box = gnome->tileBoxes[3];
    ASSERT_NE(box, nullptr);
    EXPECT_EQ(gnome->tileCount[3], 9);
    std::vector<int> rows;
    for (Widget row : Children(box))
        rows.push_back(int(Children(row).size()));
    EXPECT_EQ(rows, (std::vector<int>{4, 4, 1}));
    auto parts = Children(Children(Children(box)[0])[0]);
    ASSERT_EQ(parts.size(), 2u);
    EXPECT_STREQ(XtName(parts[0]), "s0");
    EXPECT_EQ(Label(parts[1]), "s0");
    KLImageSGI* blank = gnome->tiles[3][0]->Image();
    ASSERT_NE(blank, nullptr);
    EXPECT_EQ(gnome->tiles[3][8]->Image(), blank);

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

TEST_F(TilesTest, TheKeysetMenuSwitchesChartTitleAndPanel) {
    ASSERT_NE(gnome->keysetMenuEntries[1], nullptr);
    Widget status = XtNameToWidget(gnome->AppShell(), "*statusLine");
    ASSERT_NE(status, nullptr);
    // The event loop as the program runs it, work procedures included, until "Ready.".
    auto ready = [&] { return windowtest::Pump([&] { return Label(status) == "Ready."; }); };
    ASSERT_TRUE(ready()) << "after loading";
    XtCallCallbacks(gnome->keysetMenuEntries[1], XmNvalueChangedCallback, nullptr);
    EXPECT_EQ(gnome->GetActiveKeyset(), 1);
    EXPECT_EQ(chart->keyTrack, theImp.GetKeyTrack(1));
    EXPECT_EQ(Label(W("infoKeysetTitle")), "brow_L");
    EXPECT_TRUE(XtIsManaged(gnome->tileBoxes[1]));
    EXPECT_FALSE(XtIsManaged(gnome->tileBoxes[0]));
    EXPECT_FALSE(XmToggleButtonGetState(gnome->keysetMenuEntries[0]));
    // Shown for the first time, the keyset's key shapes get their pictures from the key view.
    ASSERT_TRUE(theImp.geometryActive);
    KLKeySet* brows = theImp.GetKeySet(1);
    for (int i = 0; i < brows->keyShapeCount; i++)
        EXPECT_NE(brows->GetKeyShape(i)->GetImage(), nullptr) << brows->GetKeyShape(i)->Name();
    EXPECT_TRUE(ready()) << "the status line still says " << Label(status);
}

// Types into the value field with real keys: the text, then Return.
void TypeValue(const std::string& text) {
    XmTextFieldSetString(W("valTypein"), const_cast<char*>(""));
    guitest::Click(W("valTypein"));
    guitest::TypeText(text + "\n");
}
std::string Shown() {
    char* text = XmTextFieldGetString(W("valTypein"));
    std::string shown = text;
    XtFree(text);
    return shown;
}

TEST_F(TilesTest, TheValueFieldSetsTheActiveKeyOnlyForOneFiniteNumber) {
    KLKeyTrack* track = theImp.GetKeyTrack(0);
    KLKeyEvent* key = track->InsertKey(1, CueTime::FromSeconds(2.2), nullptr, 1, 1.0f);
    ASSERT_NE(key, nullptr);
    // The key at the indicator is the chart's active key; its value is shown, its tile selected.
    chart->SetIndicatorTime(key->time);
    chart->UpdateDisplay();
    ASSERT_EQ(chart->activeKey, key);
    EXPECT_EQ(Shown(), "1");
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
    gnome->SetKeyValue(0.125f);
    EXPECT_EQ(Shown(), "0.125");
    gnome->ActivateKeyValue(0);
    EXPECT_FALSE(XtIsSensitive(W("valLabel")));
    gnome->ActivateKeyValue(1);
}

// The display styles are a radio group; the duration button asks for a new duration.
TEST_F(TilesTest, TheStyleRadioGroupAndTheDurationPrompt) {
    const char* names[] = {"midpoint", "keyframe", "dissolve"};
    for (int pick : {2, 1, 1, 0}) {
        XmToggleButtonGadgetSetState(W(names[pick]), pick != 1, False);  // a click toggles
        XtCallCallbacks(W(names[pick]), XmNvalueChangedCallback, nullptr);
        EXPECT_EQ(gnome->displayStyle, pick);
        for (int i = 0; i < 3; i++)
            EXPECT_EQ(bool(XmToggleButtonGadgetGetState(W(names[i]))), i == pick) << names[i];
    }

    Widget dialog = gnome->prompt->GetDialog();
    Widget ok = XmSelectionBoxGetChild(dialog, XmDIALOG_OK_BUTTON);
    std::string question;
    guitest::AnswerScript answers({[&] {
        if (!guitest::Viewable(ok))
            return false;
        question = guitest::XmText(dialog, XmNselectionLabelString);
        XmTextFieldSetString(XmSelectionBoxGetChild(dialog, XmDIALOG_TEXT),
                             const_cast<char*>("450"));
        guitest::Click(ok);
        return true;
    }});
    guitest::Click(W("infoDurationValue"));
    ASSERT_TRUE(guitest::WaitFor([&] { return answers.Finished(); }, 10));
    guitest::Settle();
    EXPECT_EQ(question, "Enter New Duration:");
    EXPECT_EQ(theImp.requestedDuration, CueTime::FromFrames(450));
}

}  // namespace
