// The apply dialog: what typed times mean, how each field corrects the others, the selected-item
// rule, the two alerts, and the apply-file manager's store with and without VX_RAWFILE.
#include <gtest/gtest.h>

#include <Xm/List.h>
#include <Xm/TextF.h>
#include <Xm/Xm.h>

#include <array>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <tuple>

#include "guitest/GuiTest.h"
#include "model/KLEdlEvent.h"
#include "model/KLKeySet.h"
#include "toolkit/xm/KLAlert.h"
#include "window/Gnome.h"
#include "window/EventPump.h"
#include "window/WindowTestUtil.h"
#include "window/WireFileApplyManager.h"
#include "workspace/Imp.h"

namespace fs = std::filesystem;

namespace {
// A widget's width or height (`resource`), and its top on the screen.
Dimension Extent(Widget w, const char* resource) {
    Dimension extent = 0;
    XtVaGetValues(w, resource, &extent, nullptr);
    return extent;
}
int RootY(Widget w) {
    Position x = 0, y = 0;
    XtTranslateCoords(w, 0, 0, &x, &y);
    return y;
}

CueTime Frames(int f) {
    return CueTime::FromTicks(f * 200);
}  // at 30 frames a second

TEST(ApplyTypein, TextBecomesTime) {
    CueTime::default_fps = 30;
    const std::pair<const char*, int32_t> cases[] = {
        {"1:2", 6000 + 400},         // seconds and frames
        {"1.2.3", 62 * 6000 + 600},  // minutes, seconds, frames
        {"1:0:0:0", 3600 * 6000},    // hours
        {"  12", 2400},              // a frame count
        {"2.5", 2 * 6000 + 1000},    // a point makes a time code
        {"abc", 0},                  // nothing read: time 0
        {"-3", -600}};
    for (const auto& [text, ticks] : cases)
        EXPECT_EQ(Gnome::parse_typein(text).Ticks(), ticks) << '"' << text << '"';
}

// Each field corrects the others: source 10..40, destination 100..130, duration 60 frames.
TEST(ApplyTypein, FieldCorrectsTheOthers) {
    using Case = std::tuple<const char*, int, std::array<int, 4>>;  // field, typed, event after
    for (auto [field, typed, after] : {Case{"src_in", 20, {20, 40, 100, 120}},
                                       Case{"src_in", 50, {50, 50, 100, 100}},   // out follows in
                                       Case{"src_out", 90, {10, 60, 100, 150}},  // cut to duration
                                       Case{"src_out", 5, {5, 5, 100, 100}},     // in follows out
                                       Case{"dst_in", 0, {10, 40, 0, 30}},
                                       Case{"dst_out", 200, {10, 40, 170, 200}},  // keeps length
                                       Case{"nonsense", 7, {10, 40, 100, 130}}}) {
        KLEdlEvent e("scene.glb", Frames(10), Frames(40), Frames(100), Frames(130));
        Gnome::apply_typein(&e, field, Frames(typed), Frames(60));
        EXPECT_EQ(
            (std::array{e.sourceIn, e.sourceOut, e.destIn, e.destOut}),
            (std::array{Frames(after[0]), Frames(after[1]), Frames(after[2]), Frames(after[3])}))
            << field << " " << typed;
    }
}

class ApplyDialogTest : public ::testing::Test {
  protected:
    void SetUp() override {
        gnome = &windowtest::TheDemoWindow();
        project = windowtest::DemoProject();
    }
    Gnome* gnome = nullptr;
    std::string project;
};

// Opening the apply file fills the dialog; a typed time is corrected; Apply without a dag
// node or a keyset alerts and keeps the dialog; Done closes it.
TEST_F(ApplyDialogTest, OpeningTheApplyFileFillsTheDialog) {
    theImp.OpenApplyWire((project + "/wire/face.glb").c_str());
    ASSERT_TRUE(theImp.applyEvent);
    Widget dialog = KLXmGnome::FindWidget("applyDialog");
    EXPECT_TRUE(XtIsManaged(dialog));
    Widget dags = KLXmGnome::FindWidget("dagLister");
    XmString first = XmStringCreateLocalized(const_cast<char*>("<ROOT>"));
    EXPECT_EQ(XmListItemPos(dags, first), 1);
    XmStringFree(first);
    // A typed source out beyond the duration shows its corrected value.
    Widget out = KLXmGnome::FindWidget("src_out");
    XmTextFieldSetString(out, const_cast<char*>("100000"));
    XtCallCallbacks(out, XmNactivateCallback, nullptr);
    EXPECT_EQ(theImp.applyEvent->sourceOut, theImp.duration);
    guitest::Screenshot("window-apply-dialog");

    // Apply without a dag node or a keyset selected: told, and the dialog stays.
    for (bool withDag : {false, true}) {
        XmListDeselectAllItems(KLXmGnome::FindWidget("keyLister"));
        XmListDeselectAllItems(dags);
        if (withDag)
            XmListSelectPos(dags, 1, False);
        EXPECT_EQ(windowtest::AnswerAlerts(gnome->attentionAlert.get(),
                                           [] { Gnome::apply_cb(nullptr, nullptr, nullptr); }),
                  withDag ? "You must select one or more keysets to apply."
                          : "You must select a dag node to apply under.");
        EXPECT_TRUE(XtIsManaged(dialog));
    }
    Gnome::done_cb(nullptr, nullptr, nullptr);
    EXPECT_FALSE(XtIsManaged(dialog));
    EXPECT_FALSE(theImp.applyEvent->wire);

    // Shown again it keeps its size, and the height it has to spare goes to the lists: the
    // buttons stay at the bottom.
    const Dimension firstHeight = Extent(dialog, XmNheight), firstWidth = Extent(dialog, XmNwidth);
    theImp.OpenApplyWire((project + "/wire/face.glb").c_str());
    windowtest::Pump([] { return false; }, 0.3);
    EXPECT_EQ(Extent(dialog, XmNheight), firstHeight);
    EXPECT_EQ(Extent(dialog, XmNwidth), firstWidth);
    Widget apply = KLXmGnome::FindWidget("apply_button");
    EXPECT_GT(RootY(apply) + Extent(apply, XmNheight), RootY(dialog) + firstHeight - 24);
    Gnome::done_cb(nullptr, nullptr, nullptr);
}

// The apply file is stored with its raw geometry only with VX_RAWFILE.
TEST_F(ApplyDialogTest, TheApplyFileIsStoredWithItsRawGeometryOnRequest) {
    std::string out = project + "/wire/applied.glb";
    for (bool raw : {false, true}) {
        fs::remove(out);
        fs::remove(out + ".raw");
        if (raw)
            setenv("VX_RAWFILE", "1", 1);
        else
            unsetenv("VX_RAWFILE");
        theImp.OpenApplyWire((project + "/wire/face.glb").c_str());
        theImp.applyEvent->OpenWire();
        WireFileApplyManager manager(nullptr);
        EXPECT_EQ(manager.StoreFile(out.c_str()), 1);
        EXPECT_TRUE(fs::exists(out));
        EXPECT_EQ(fs::exists(out + ".raw"), raw);
        Gnome::done_cb(nullptr, nullptr, nullptr);
    }
    unsetenv("VX_RAWFILE");
    std::ifstream in(out + ".raw");
    std::string line;
    int vertices = 0, faces = 0;
    while (std::getline(in, line)) {
        vertices += line.rfind("v ", 0) == 0;
        faces += line.rfind("f ", 0) == 0;
    }
    EXPECT_GT(vertices, 3);
    EXPECT_GT(faces, 0);
}

}  // namespace
