// Recognizers in the window: panels from the shipped plug-ins, "Recognize" on the demo, and the
// link dialog driven through real input.
#include <gtest/gtest.h>

#include <Xm/List.h>
#include <Xm/Xm.h>

#include <cmath>
#include <cstdlib>
#include <fstream>
#include <sstream>
#include <string>

#include "chart/KLSyncChart.h"
#include "guitest/GuiTest.h"
#include "model/KLKeyEvent.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "toolkit/CueRecognizer.h"
#include "toolkit/CueSound.h"
#include "toolkit/KLSoundControl.h"
#include "toolkit/xm/KLAlert.h"
#include "window/Gnome.h"
#include "window/WindowTestUtil.h"
#include "workspace/Imp.h"

namespace {

const char* const PhonemeModels = "/usr/share/pocketsphinx/model/en-us";

// The shipped plug-ins, and the silent sound driver unless the run asks for another.
const bool kEnvironment = [] {
    setenv("TESSEL_PLUGIN_PATH", CHIRRUP_BINARY_DIR "/lib/chirrup/plugins", 1);
    setenv("SDL_AUDIODRIVER", "dummy", 0);
    setenv("SDL_DISKAUDIOFILE", "/dev/null", 0);
    return true;
}();

using windowtest::Label;
using windowtest::W;

// A widget of the link dialog (other dialogs use some of the same names).
Widget L(const char* name) {
    return XtNameToWidget(KLXmGnome::FindWidget("linkDialog"), (std::string("*") + name).c_str());
}

// Brings a dialog to the top: with no window manager, panels and the link dialog overlap.
void raise(Widget dialog) {
    Widget shell = XtParent(dialog);
    if (shell && XtIsRealized(shell))
        XRaiseWindow(XtDisplay(shell), XtWindow(shell));
    guitest::Settle();
}

// Clicks item `position` of a list, first waiting out the multi-click time so that a single
// click is not taken for the second of two.
void click_item(Widget list, int position, bool twice = false) {
    guitest::WaitFor([] { return false; }, XtGetMultiClickTime(XtDisplay(list)) / 1000.0 + 0.05);
    XmListSetPos(list, position);
    guitest::Settle();
    Position x = 0, y = 0;
    Dimension w = 0, h = 0;
    ASSERT_TRUE(XmListPosToBounds(list, position, &x, &y, &w, &h));
    if (twice)
        guitest::DoubleClick(list, 1, x + 10, y + h / 2);
    else
        guitest::Click(list, 1, x + 10, y + h / 2);
}

class Recognizers : public ::testing::Test {
  protected:
    void SetUp() override {
        gnome = &windowtest::TheDemoWindow();
        project = windowtest::DemoProject();
        guitest::Settle();
        mouth = theImp.GetKeySet("mouth");
        ASSERT_TRUE(mouth);
        gnome->SetActiveKeyset(0);
    }
    // Chooses Recognizer > `name` with the pointer; the recognizer it made.
    CueRecognizer* choose_from_menu(const char* name) {
        guitest::Click(W("recognizer"));
        Widget entry = nullptr;
        if (!guitest::WaitFor([&] {
                for (Widget child : guitest::Children(W("recognizerMenu")))
                    if (Label(child) == name)
                        entry = child;
                return guitest::Viewable(entry);
            }))
            return nullptr;
        guitest::Click(entry);
        guitest::Settle();
        return mouth->GetRecognizer(name);
    }
    // Clicks a button of a recognizer's panel, the panel raised first.
    void click_panel(const char* recognizer, const char* item) {
        raise(XtParent(panel_item(recognizer, nullptr)));
        guitest::Click(panel_item(recognizer, item));
    }
    Widget panel_item(const char* recognizer, const char* item) {
        return gnome->find_recognizer_widget(recognizer, item, nullptr);
    }
    // The chart shows the mouth's track over the dialogue and `after` seconds more.
    KLSyncChart* ChartOverDialogue(double after) {
        EXPECT_EQ(theImp.LoadSound((project + "/misc_data/dialogue.aiff").c_str()), 1);
        KLSyncChart* chart = gnome->syncChart;
        chart->SetSound(theImp.sound.get());
        chart->SetKeyTrack(theImp.GetKeyTrack(0));
        chart->SetUserDuration(CueTime::FromSeconds(theImp.sound->Length() + after));
        chart->ZoomReset();
        return chart;
    }
    Gnome* gnome = nullptr;
    std::string project;
    KLKeySet* mouth = nullptr;
};

// The panel comes from the plug-in; Recognize fills the mouth's track.
TEST_F(Recognizers, PanelShowsAndRecognizeFillsTheMouthTrack) {
    ChartOverDialogue(0);
    CueRecognizer* r = choose_from_menu("Phoneme");
    ASSERT_TRUE(r);
    Widget container = panel_item("Phoneme", nullptr);
    ASSERT_TRUE(guitest::WaitMapped(container));
    EXPECT_TRUE(XtIsSensitive(panel_item("Phoneme", "Recognize"))) << "every phone is linked";

    // Recognize over the whole sound (no region: the visible span).
    KLKeyTrack* track = theImp.GetKeyTrack(0);
    click_panel("Phoneme", "Recognize");
    ASSERT_TRUE(guitest::WaitFor([&] { return track->events.Count() > 10; }, 30.0));
    guitest::Settle();
    EXPECT_FALSE(guitest::Viewable(gnome->informationAlert->GetDialog()));
    // With the indicator hidden, the information bar still shows a time.
    EXPECT_EQ(Label(W("infoTimeValue")).find('-'), std::string::npos) << Label(W("infoTimeValue"));
    guitest::Screenshot("window-phoneme-recognized");

    click_panel("Phoneme", "Dismiss");
    EXPECT_TRUE(guitest::WaitFor([&] { return !guitest::Viewable(container); }));
}

// A recognizer that cannot run, or a region past the end of the sound, leaves the region's
// keys as they were.
TEST_F(Recognizers, RecognitionThatFindsNothingKeepsTheRegionsKeys) {
    KLSyncChart* chart = ChartOverDialogue(2.0);
    const double length = theImp.sound->Length();
    Gnome::create_recognize_cb(nullptr, const_cast<char*>("Phoneme"), nullptr);
    CueRecognizer* r = mouth->GetRecognizer("Phoneme");
    KLKeyTrack* track = theImp.GetKeyTrack(0);
    const int open = mouth->GetKeyShapeId("O");
    ASSERT_TRUE(r && track && open >= 0);
    auto keys = [&] {
        std::vector<std::pair<double, int>> out;
        for (KLKeyEvent* e = track->events.Head(); e; e = track->events.Next(e))
            out.push_back({e->time.Seconds(), e->shapeIndex});
        return out;
    };
    chart->AddTimeKeyframe(open, CueTime::FromSeconds(1.0), mouth->GetKeyShape(open), 0);
    chart->AddTimeKeyframe(open, CueTime::FromSeconds(length + 1.0), mouth->GetKeyShape(open), 0);
    const auto before = keys();

    // With no speech model, over the speech; with it, past the sound's end; then over speech
    // the region's keys make way for the results.
    const auto run = [&](const std::string& models, double from, double to) {
        std::istringstream settings("models \"" + models + "\"\nend\n");
        r->ReadSettings(settings);
        chart->SetRegionRange(CueTime::FromSeconds(from), CueTime::FromSeconds(to));
        Gnome::recognize_cb(nullptr, r, nullptr);
        return keys();
    };
    EXPECT_EQ(run("/nonexistent/chirrup-no-speech-model", 0.5, 2.0), before);
    EXPECT_FALSE(guitest::Viewable(gnome->informationAlert->GetDialog()));
    EXPECT_EQ(run(PhonemeModels, length + 0.5, length + 1.5), before);
    EXPECT_NE(run(PhonemeModels, 0.5, 2.0), before);
    for (const auto& [t, shape] : keys())
        EXPECT_FALSE(t == 1.0 && shape == open) << "the key at 1 s is replaced";
    chart->SetRegionRange(CueTime(), CueTime());
}

// The link dialog through the pointer: link by button and by double click, "Audition" only
// with a sound, and the links saved with the keyset.
TEST_F(Recognizers, LinkDialogLinksTargetsToKeyShapes) {
    CueRecognizer* r = choose_from_menu("Loudness");
    ASSERT_TRUE(r);
    for (auto& t : r->targets)
        t.keyShapeIndex = -1;
    gnome->ShowRecognizerGui(r);
    click_panel("Loudness", "Configure");
    Widget dialog = W("linkDialog");
    ASSERT_TRUE(guitest::WaitMapped(dialog));
    raise(dialog);
    Widget targets = L("targetLister"), shapes = L("keyshapeLister");
    // Select "closed" and "rest", press "Link"; then "half" and a double click on "E".
    click_item(targets, 1);
    ASSERT_TRUE(guitest::WaitFor([&] { return Label(L("targetLabel")) == "closed"; }));
    EXPECT_FALSE(XtIsSensitive(L("audition_button"))) << "Loudness's targets have no sound";
    click_item(shapes, mouth->GetKeyShapeId("rest") + 1);
    ASSERT_TRUE(guitest::WaitFor([&] { return Label(L("keyshapeLabel")) == "rest"; }));
    guitest::Click(L("link_button"));
    ASSERT_TRUE(guitest::WaitFor(
        [&] { return r->FindTarget("closed")->keyShapeIndex == mouth->GetKeyShapeId("rest"); }));
    raise(dialog);
    click_item(targets, 2);
    ASSERT_TRUE(guitest::WaitFor([&] { return Label(L("targetLabel")) == "half"; }));
    click_item(shapes, mouth->GetKeyShapeId("E") + 1, true);
    ASSERT_TRUE(guitest::WaitFor(
        [&] { return r->FindTarget("half")->keyShapeIndex == mouth->GetKeyShapeId("E"); }));
    EXPECT_FALSE(XtIsSensitive(panel_item("Loudness", "Recognize"))) << "\"open\" is unlinked";
    guitest::Screenshot("window-link-dialog");

    const std::string saved = project + "/misc_data/linked.kset";
    ASSERT_EQ(theImp.SaveKeyset(saved.c_str()), 1);
    std::stringstream text;
    text << std::ifstream(saved).rdbuf();
    EXPECT_NE(text.str().find("begin recognizer-links Loudness mouth\n    link closed to rest\n"
                              "    link half to E\nend\n"),
              std::string::npos)
        << text.str();
    raise(dialog);
    guitest::Click(L("done_button"));
    EXPECT_TRUE(guitest::WaitFor([&] { return !guitest::Viewable(dialog); }));
    click_panel("Loudness", "Dismiss");
}

// The Phoneme recognizer's targets have their samples: "Audition" comes alive.
TEST_F(Recognizers, AuditionNeedsATargetWithASound) {
    CueRecognizer* r = choose_from_menu("Phoneme");
    ASSERT_TRUE(r);
    click_panel("Phoneme", "Configure");
    ASSERT_TRUE(guitest::WaitMapped(W("linkDialog")));
    raise(W("linkDialog"));
    click_item(L("targetLister"), r->TargetIndex("OW") + 1);
    ASSERT_TRUE(guitest::WaitFor([&] { return Label(L("targetLabel")) == "OW"; }));
    EXPECT_TRUE(XtIsSensitive(L("audition_button")));
    EXPECT_EQ(Label(L("keyshapeLabel")), "O") << "the demo links OW to O";
    // The sample reaches the output, a second press replaces it while it plays, and
    // dismissing the dialog silences it. The program then ends with the output still open.
    for (int press = 0; press < 2; press++) {
        const long before = KLSoundControl::LastHanded().sounding;
        guitest::Click(L("audition_button"));
        ASSERT_TRUE(guitest::WaitFor([&] {
            return KLSoundControl::LastHanded().sounding > before;
        })) << "driver "
            << KLSoundControl::DriverName();
    }
    guitest::Click(L("done_button"));
    EXPECT_TRUE(guitest::WaitFor([&] { return !guitest::Viewable(W("linkDialog")); }));
    EXPECT_TRUE(guitest::WaitFor([] { return std::isnan(KLSoundControl::LastHanded().position); }))
        << "Dismiss stops the audition";
    click_panel("Phoneme", "Dismiss");
}

}  // namespace
