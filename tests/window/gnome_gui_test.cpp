// The main window built from its table on the test display: the table, menu and view
// sensitivity, the quit questions and the accelerators under Num Lock.
#include <gtest/gtest.h>

#include <X11/keysym.h>
#include <Xm/FileSB.h>
#include <Xm/RowColumn.h>
#include <Xm/ToggleBG.h>
#include <Xm/Xm.h>

#include <cstdlib>
#include <filesystem>
#include <set>
#include <string>

#include "guitest/GuiTest.h"
#include "model/KLKeySet.h"
#include "toolkit/xm/KLAlert.h"
#include "toolkit/xm/KLFileManager.h"
#include "window/Gnome.h"
#include "window/WindowTestUtil.h"
#include "workspace/Imp.h"

namespace fs = std::filesystem;
using windowtest::TheWindow;

namespace {

Widget W(const char* name) {
    return KLXmGnome::FindWidget(name);
}

bool Managed(const char* name) {
    return W(name) && XtIsManaged(W(name));
}

bool Sensitive(const char* name) {
    return W(name) && XtIsSensitive(W(name));
}

// The index of an option menu's current entry.
int OptionIndex(const char* name) {
    Widget history = nullptr;
    XtVaGetValues(W(name), XmNmenuHistory, &history, nullptr);
    if (!history)
        return -1;
    WidgetList children = nullptr;
    Cardinal count = 0;
    XtVaGetValues(XtParent(history), XmNchildren, &children, XmNnumChildren, &count, nullptr);
    for (Cardinal i = 0; i < count; i++)
        if (children[i] == history)
            return int(i);
    return -1;
}

class WindowTest : public ::testing::Test {
  protected:
    void SetUp() override {
        gnome = &TheWindow();
        saved = {gnome->shownKeyset,    theImp.geometryActive, gnome->keyViewOn,
                 gnome->keyViewMode,    gnome->mixViewOn,      gnome->refViewOn,
                 gnome->playblastViewOn};
    }
    void TearDown() override {
        gnome->shownKeyset = saved.shown;
        theImp.geometryActive = saved.geometry;
        gnome->keyViewOn = saved.keyViewOn;
        gnome->keyViewMode = saved.keyViewMode;
        gnome->mixViewOn = saved.mixViewOn;
        gnome->refViewOn = saved.refViewOn;
        gnome->playblastViewOn = saved.playblastViewOn;
        gnome->SetMenuStatus();
        gnome->SetViewStatus();
    }
    Gnome* gnome = nullptr;
    struct {
        KLKeySet* shown;
        int geometry, keyViewOn, keyViewMode, mixViewOn, refViewOn, playblastViewOn;
    } saved{};
};

TEST_F(WindowTest, TableHasEveryRowUnderItsParent) {
    ASSERT_EQ(widget_spec_rows, 166);
    EXPECT_STREQ(widget_spec[165].name, "syncChart");
    EXPECT_EQ(widget_spec[166].name, nullptr);
    for (int i = 0; i < widget_spec_rows; i++)
        EXPECT_NE(W(widget_spec[i].name), nullptr) << "row " << i + 1 << " " << widget_spec[i].name;
    // Parents by depth; pulldowns hang on the menu bar, attached to their cascades.
    EXPECT_EQ(XtParent(W("refExt")), W("refPrefixBox"));
    EXPECT_EQ(XtParent(W("console")), KLXmGnome::AppShell());
    Widget sub = nullptr;
    XtVaGetValues(W("file"), XmNsubMenuId, &sub, nullptr);
    EXPECT_EQ(sub, W("fileMenu"));
    XtVaGetValues(W("help"), XmNsubMenuId, &sub, nullptr);
    EXPECT_EQ(sub, W("helpMenu"));
    EXPECT_EQ(XtParent(W("syncChart")), W("layoutBank"));
    EXPECT_EQ(XtParent(W("infoDurationValue")), W("infoDurationBox"));
    // Rows marked "-" start unmanaged; the help cascade is the menu bar's help widget.
    for (const char* name : {"messageDialog", "fileBrowser", "applyDialog", "refDialog", "info"})
        EXPECT_FALSE(Managed(name)) << name;
    Widget help = nullptr;
    XtVaGetValues(W("menuBar"), XmNmenuHelpWidget, &help, nullptr);
    EXPECT_EQ(help, W("help"));
    EXPECT_EQ(gnome->helpCascade, W("help"));
    EXPECT_EQ(gnome->topShell, KLXmGnome::AppShell());
}

TEST_F(WindowTest, ResourceFileGivesLabelsAndOptionEntries) {
    auto label = [](const char* name) { return guitest::XmText(W(name), XmNlabelString); };
    EXPECT_EQ(label("openTrack"), "Open Track...");
    EXPECT_EQ(label("infoFrameValue"), "0");
    struct {
        const char* menu;
        Cardinal entries;
    } menus[] = {{"speedMenu", 4},
                 {"repeatMenu", 2},
                 {"keyVuToggle", 3},
                 {"mixVuToggle", 2},
                 {"refVuToggle", 3}};
    for (const auto& m : menus) {
        Widget pulldown = nullptr;
        XtVaGetValues(W(m.menu), XmNsubMenuId, &pulldown, nullptr);
        ASSERT_NE(pulldown, nullptr) << m.menu;
        Cardinal count = 0;
        XtVaGetValues(pulldown, XmNnumChildren, &count, nullptr);
        EXPECT_EQ(count, m.entries) << m.menu;
    }
    char* accel = nullptr;
    XtVaGetValues(W("quit"), XmNaccelerator, &accel, nullptr);
    ASSERT_NE(accel, nullptr);
    EXPECT_NE(std::string(accel).find("<Key>q"), std::string::npos);
}

TEST_F(WindowTest, DisplayTogglesStartAsWritten) {
    const std::pair<const char*, bool> states[] = {
        {"midpoint", true}, {"keyframe", false}, {"dissolve", false},    {"points", false},
        {"lines", false},   {"polygons", true},  {"polygonsboth", false}};
    for (const auto& [name, on] : states)
        EXPECT_EQ(bool(XmToggleButtonGadgetGetState(W(name))), on) << name;
}

// Menu sensitivity by (keyset shown, geometry loaded).
struct MenuCase {
    bool shown;
    int geometry;
    bool keysetItems;  // saveKeyset, openTrack, saveTrack, applyWire
    bool keyView;      // keyVuSet, keyVuClear
};

class MenuStatusTest : public WindowTest, public ::testing::WithParamInterface<MenuCase> {};

TEST_P(MenuStatusTest, ItemsFollowTheShownKeyset) {
    const MenuCase& c = GetParam();
    KLKeySet keyset("mouth", "face.glb");
    gnome->shownKeyset = c.shown ? &keyset : nullptr;
    theImp.geometryActive = c.geometry;
    gnome->SetMenuStatus();
    for (const char* name : {"saveKeyset", "openTrack", "saveTrack", "applyWire"})
        EXPECT_EQ(Sensitive(name), c.keysetItems) << name;
    for (const char* name : {"keyVuSet", "keyVuClear"})
        EXPECT_EQ(Sensitive(name), c.keyView) << name;
    for (const char* name : {"openKeyset", "newTrack", "quit"})
        EXPECT_TRUE(Sensitive(name)) << name;
    gnome->shownKeyset = nullptr;
}

INSTANTIATE_TEST_SUITE_P(States, MenuStatusTest,
                         ::testing::Values(MenuCase{false, 1, false, false},
                                           MenuCase{false, 0, false, false},
                                           MenuCase{true, 1, true, false},
                                           MenuCase{true, 0, true, true}));

// View alternatives by (geometry, keyViewOn, keyViewMode, mixViewOn, refViewOn, playblast).
struct ViewCase {
    const char* label;
    int geometry, keyOn, keyMode, mixOn, refOn, blastOn;
    const char* keyShown;  // the one managed of keyVu, keyScn, keyFake
    bool mixScene;
    bool refImages;
    int keyOption, mixOption, keyModeAfter;
};

class ViewStatusTest : public WindowTest, public ::testing::WithParamInterface<ViewCase> {};

TEST_P(ViewStatusTest, ExactlyOneAlternativeOfEachViewIsManaged) {
    const ViewCase& c = GetParam();
    gnome->shownKeyset = nullptr;
    theImp.geometryActive = c.geometry;
    gnome->keyViewOn = c.keyOn;
    gnome->keyViewMode = c.keyMode;
    gnome->mixViewOn = c.mixOn;
    gnome->refViewOn = c.refOn;
    gnome->playblastViewOn = c.blastOn;
    gnome->SetViewStatus();
    for (const char* name : {"keyVu", "keyScn", "keyFake"})
        EXPECT_EQ(Managed(name), std::string(name) == c.keyShown) << name;
    EXPECT_EQ(Managed("mixScn"), c.mixScene);
    EXPECT_EQ(Managed("mixFake"), !c.mixScene);
    EXPECT_EQ(Managed("refVu"), c.refImages);
    EXPECT_EQ(Managed("refFake"), !c.refImages);
    if (c.keyOption >= 0) {
        EXPECT_EQ(OptionIndex("keyVuToggle"), c.keyOption);
    }
    EXPECT_EQ(OptionIndex("mixVuToggle"), c.mixOption);
    EXPECT_EQ(gnome->keyViewMode, c.keyModeAfter);
    EXPECT_EQ(bool(XmToggleButtonGadgetGetState(W("loadGeometry"))), bool(c.geometry));
    for (const char* name : {"points", "lines", "polygons", "polygonsboth"})
        EXPECT_EQ(Sensitive(name), bool(c.geometry)) << name;
    EXPECT_FALSE(Sensitive("keyVuSet"));  // no keyset shown
}

INSTANTIATE_TEST_SUITE_P(
    States, ViewStatusTest,
    ::testing::Values(
        ViewCase{"scene", 1, 1, 1, 1, 1, 0, "keyScn", true, true, 1, 0, 1},
        ViewCase{"images", 1, 1, 0, 1, 0, 1, "keyVu", true, true, 2, 0, 0},
        ViewCase{"keyOff", 1, 0, 1, 0, 0, 0, "keyFake", false, false, -1, 1, 1},
        ViewCase{"noGeometryTurnsSceneToImages", 0, 1, 1, 1, 1, 0, "keyVu", false, true, 2, 1, 0},
        ViewCase{"noGeometryKeyOff", 0, 0, 1, 1, 0, 0, "keyFake", false, false, -1, 1, 1}),
    [](const auto& info) { return std::string(info.param.label); });

TEST(HotkeyPrefix, LockModifiersGiveTheirPrefix) {
    EXPECT_STREQ(Gnome::hotkey_prefix(0), "");
    EXPECT_STREQ(Gnome::hotkey_prefix(ShiftMask | ControlMask), "");
    EXPECT_STREQ(Gnome::hotkey_prefix(Mod2Mask), "Mod2 ");
    EXPECT_STREQ(Gnome::hotkey_prefix(Mod3Mask | ShiftMask), "Mod3 ");
    EXPECT_STREQ(Gnome::hotkey_prefix(Mod2Mask | Mod3Mask), "Mod2 Mod3 ");
}

// The quit questions, answered through the real alert and file browser.
class QuitTest : public WindowTest {
  protected:
    void SetUp() override {
        WindowTest::SetUp();
        exited = -1;
        Gnome::exitFunction = [](int status) { exited = status; };
        unsetenv("VX_NOCONFIRM");
        project = windowtest::DemoProject();
        if (theImp.keysetCount == 0) {
            ASSERT_EQ(theImp.LoadKeyset((project + "/misc_data/demo.kset").c_str()), 1);
            loadedShown = gnome->shownKeyset;
        }
        saved.shown = loadedShown;
    }
    void TearDown() override {
        theImp.keysetModified = 0;
        theImp.trackModified = 0;
        unsetenv("VX_NOCONFIRM");
        WindowTest::TearDown();
    }
    static int exited;
    static KLKeySet* loadedShown;  // the keyset the load showed
    std::string project;
};
int QuitTest::exited = -1;
KLKeySet* QuitTest::loadedShown = nullptr;

TEST_F(QuitTest, CancelAtTheSecondQuestionKeepsTheSavedKeysetAndRuns) {
    theImp.keysetModified = 1;
    theImp.trackModified = 1;
    std::string saved = project + "/misc_data/quit-saved.kset";
    fs::remove(saved);
    KLAlert* alert = gnome->attentionAlert.get();
    windowtest::AnswerScript script({
        [&] { return alert->Waiting() && windowtest::ClickWhenViewable(alert->Button(0)); },
        [&] {
            return gnome->keysetManager->Waiting() &&
                   windowtest::ChooseInBrowser(gnome->keysetManager->Browser(), saved);
        },
        [&] { return alert->Waiting() && windowtest::ClickWhenViewable(alert->Button(2)); },
    });
    Gnome::quit_cb(nullptr, nullptr, nullptr);
    EXPECT_TRUE(script.Finished());
    EXPECT_EQ(exited, -1) << "Cancel keeps the program running";
    EXPECT_TRUE(fs::exists(saved));
}

TEST_F(QuitTest, DontSaveTwiceExitsWithZero) {
    theImp.keysetModified = 1;
    theImp.trackModified = 1;
    KLAlert* alert = gnome->attentionAlert.get();
    windowtest::AnswerScript script({
        [&] { return alert->Waiting() && windowtest::ClickWhenViewable(alert->Button(1)); },
        [&] { return alert->Waiting() && windowtest::ClickWhenViewable(alert->Button(1)); },
    });
    Gnome::quit_cb(nullptr, nullptr, nullptr);
    EXPECT_TRUE(script.Finished());
    EXPECT_EQ(exited, 0);
}

TEST_F(QuitTest, NothingModifiedOrNoConfirmExitsAtOnce) {
    Gnome::quit_cb(nullptr, nullptr, nullptr);
    EXPECT_EQ(exited, 0);
    exited = -1;
    theImp.keysetModified = 1;
    theImp.trackModified = 1;
    setenv("VX_NOCONFIRM", "1", 1);
    Gnome::quit_cb(nullptr, nullptr, nullptr);
    EXPECT_EQ(exited, 0);
}

TEST_F(QuitTest, LoadedKeysetIsShownInTheWindow) {
    ASSERT_NE(gnome->shownKeyset, nullptr);
    EXPECT_EQ(gnome->GetActiveKeyset(), 0);
    EXPECT_TRUE(Sensitive("saveTrack"));
    Widget menu = W("keySetsMenu");
    Cardinal count = 0;
    XtVaGetValues(menu, XmNnumChildren, &count, nullptr);
    EXPECT_EQ(int(count), theImp.keysetCount);
    guitest::Settle();
    guitest::Screenshot("window-demo-keyset");
}

// The accelerators stay rewritten for Num Lock afterwards; no later test types them.
TEST_F(WindowTest, AcceleratorsWorkWithNumLockOn) {
    Display* dpy = guitest::GetDisplay();
    guitest::TypeKey(XK_Num_Lock);
    guitest::Settle();
    Window root = DefaultRootWindow(dpy), r, c;
    int x, y, wx, wy;
    unsigned int mask = 0;
    XQueryPointer(dpy, root, &r, &c, &x, &y, &wx, &wy, &mask);
    ASSERT_TRUE(mask & Mod2Mask) << "Num Lock is not on Mod2 on this display";
    gnome->fix_hotkeys();
    char* accel = nullptr;
    XtVaGetValues(W("newTrack"), XmNaccelerator, &accel, nullptr);
    ASSERT_NE(accel, nullptr);
    EXPECT_EQ(std::string(accel).rfind("Mod2 ", 0), 0u) << accel;
    // Ctrl+N with Num Lock on opens the sound browser.
    KLFileManager* sound = gnome->soundManager.get();
    bool opened = false;
    windowtest::AnswerScript script({
        [&] {
            if (!sound->Waiting())
                return false;
            opened = true;
            return windowtest::ClickWhenViewable(
                XmFileSelectionBoxGetChild(sound->Browser(), XmDIALOG_CANCEL_BUTTON));
        },
    });
    guitest::MoveTo(W("syncChart"));
    guitest::TypeKey(XK_n, ControlMask);
    guitest::WaitFor([&] { return script.Finished(); }, 10.0);
    EXPECT_TRUE(opened);
    guitest::TypeKey(XK_Num_Lock);
    guitest::Settle();
}

}  // namespace
