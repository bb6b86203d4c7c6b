// The main window built from its table on the test display: the table, labels and toggles as
// the resource file gives them, menu and view sensitivity, the quit questions and the
// accelerators under Num Lock.
#include <gtest/gtest.h>

#include <X11/keysym.h>
#include <Xm/FileSB.h>
#include <Xm/ToggleBG.h>
#include <Xm/Xm.h>

#include <cstdlib>
#include <filesystem>
#include <string>
#include <tuple>

#include "guitest/AnswerScript.h"
#include "guitest/GuiTest.h"
#include "model/KLKeySet.h"
#include "toolkit/xm/KLAlert.h"
#include "toolkit/xm/KLFileManager.h"
#include "window/Gnome.h"
#include "window/WindowTestUtil.h"
#include "workspace/Imp.h"

namespace fs = std::filesystem;
using guitest::AnswerScript;
using guitest::ClickWhenViewable;
using windowtest::Label;
using windowtest::W;

namespace {

bool Managed(const char* name) {
    return W(name) && XtIsManaged(W(name));
}
bool Sensitive(const char* name) {
    return W(name) && XtIsSensitive(W(name));
}
Widget SubMenu(const char* cascade) {
    Widget sub = nullptr;
    XtVaGetValues(W(cascade), XmNsubMenuId, &sub, nullptr);
    return sub;
}
// The index of an option menu's current entry.
int OptionIndex(const char* name) {
    Widget history = nullptr;
    XtVaGetValues(W(name), XmNmenuHistory, &history, nullptr);
    const auto entries = guitest::Children(SubMenu(name));
    for (size_t i = 0; i < entries.size(); i++)
        if (entries[i] == history)
            return int(i);
    return -1;
}

TEST(WindowTest, BuiltFromTheTableAndTheResourceFile) {
    windowtest::TheWindow();
    EXPECT_EQ(widget_spec[widget_spec_rows].name, nullptr);
    for (int i = 0; i < widget_spec_rows; i++)
        EXPECT_NE(W(widget_spec[i].name), nullptr) << "row " << i + 1 << " " << widget_spec[i].name;
    // Parents by depth; pulldowns hang on the menu bar, attached to their cascades.
    EXPECT_EQ(XtParent(W("refExt")), W("refPrefixBox"));
    EXPECT_EQ(SubMenu("file"), W("fileMenu"));
    // Rows marked "-" start unmanaged; the help cascade is the menu bar's help widget.
    for (const char* name : {"fileBrowser", "applyDialog", "refDialog"})
        EXPECT_FALSE(Managed(name)) << name;
    Widget help = nullptr;
    XtVaGetValues(W("menuBar"), XmNmenuHelpWidget, &help, nullptr);
    EXPECT_EQ(help, W("help"));

    // Labels and toggles as the resource file writes them.
    EXPECT_EQ(Label("openTrack"), "Open Track...");
    EXPECT_EQ(guitest::Children(SubMenu("speedMenu")).size(), 4u);
    EXPECT_TRUE(XmToggleButtonGadgetGetState(W("midpoint")));
}

// Menu sensitivity by (keyset shown, geometry loaded), and exactly one alternative of each view
// managed, filling its frame, by (geometry, key view on, its mode, mix view on, reference view on,
// playblast on).
TEST(WindowTest, MenusAndViewsFollowTheState) {
    Gnome& gnome = windowtest::TheWindow();
    KLKeySet keyset("mouth", "face.glb");
    // (keyset shown, geometry loaded) -> keyset items, key-view camera items sensitive
    for (auto [shown, geometry, keysetItems, keyView] :
         {std::tuple{false, 0, false, false}, std::tuple{true, 1, true, false},
          std::tuple{true, 0, true, true}}) {
        SCOPED_TRACE(testing::Message() << "shown " << shown << " geometry " << geometry);
        gnome.shownKeyset = shown ? &keyset : nullptr;
        theImp.geometryActive = geometry;
        gnome.SetMenuStatus();
        for (const char* name : {"saveKeyset", "applyWire"})
            EXPECT_EQ(Sensitive(name), keysetItems) << name;
        EXPECT_EQ(Sensitive("keyVuSet"), keyView);
        EXPECT_TRUE(Sensitive("openKeyset"));
    }
    gnome.shownKeyset = nullptr;

    struct ViewCase {
        int geometry, keyOn, keyMode, mixOn, refOn, blastOn;
        const char* keyShown;  // the one managed of keyVu, keyScn, keyFake
        bool mixScene, refImages;
        int keyOption, mixOption, keyModeAfter;
    };
    for (ViewCase c : {ViewCase{1, 1, 1, 1, 1, 0, "keyScn", true, true, 1, 0, 1},
                       ViewCase{1, 1, 0, 1, 0, 1, "keyVu", true, true, 2, 0, 0},
                       ViewCase{1, 0, 1, 0, 0, 0, "keyFake", false, false, -1, 1, 1},
                       // Without geometry the scene turns to key images.
                       ViewCase{0, 1, 1, 1, 1, 0, "keyVu", false, true, 2, 1, 0}}) {
        SCOPED_TRACE(testing::Message() << c.geometry << c.keyOn << c.keyMode << c.mixOn);
        theImp.geometryActive = c.geometry;
        gnome.keyViewOn = c.keyOn;
        gnome.keyViewMode = c.keyMode;
        gnome.mixViewOn = c.mixOn;
        gnome.refViewOn = c.refOn;
        gnome.playblastViewOn = c.blastOn;
        gnome.SetViewStatus();
        for (const char* name : {"keyVu", "keyScn", "keyFake"})
            EXPECT_EQ(Managed(name), std::string(name) == c.keyShown) << name;
        // Whichever alternative shows fills the view's frame, even with no picture yet.
        guitest::Settle();
        for (const char* name : {c.keyShown, c.mixScene ? "mixScn" : "mixFake"}) {
            Dimension width = 0, height = 0;
            XtVaGetValues(W(name), XmNwidth, &width, XmNheight, &height, nullptr);
            EXPECT_TRUE(width >= 300 && height >= 220) << name << " " << width << "x" << height;
        }
        EXPECT_EQ(Managed("mixScn"), c.mixScene);
        EXPECT_EQ(Managed("mixFake"), !c.mixScene);
        EXPECT_EQ(Managed("refVu"), c.refImages);
        EXPECT_EQ(Managed("refFake"), !c.refImages);
        EXPECT_TRUE(c.keyOption < 0 || OptionIndex("keyVuToggle") == c.keyOption);
        EXPECT_EQ(OptionIndex("mixVuToggle"), c.mixOption);
        EXPECT_EQ(gnome.keyViewMode, c.keyModeAfter);
        EXPECT_EQ(bool(XmToggleButtonGadgetGetState(W("loadGeometry"))), bool(c.geometry));
        EXPECT_EQ(Sensitive("points"), bool(c.geometry));
    }
}

// The quit questions, answered through the real alert and file browser, on the demo keyset.
TEST(WindowTest, QuitAsksAboutModifiedFiles) {
    Gnome& gnome = windowtest::TheDemoWindow();
    static int exited = -1;
    Gnome::exitFunction = [](int status) { exited = status; };
    unsetenv("VX_NOCONFIRM");
    ASSERT_NE(gnome.shownKeyset, nullptr) << "the loaded keyset is shown";
    EXPECT_EQ(int(guitest::Children(W("keySetsMenu")).size()), theImp.keysetCount);
    guitest::Screenshot("window-demo-keyset");

    // Modified with VX_NOCONFIRM: ends at once (unmodified, the end-to-end run quits with 0).
    theImp.keysetModified = theImp.trackModified = 1;
    setenv("VX_NOCONFIRM", "1", 1);
    Gnome::quit_cb(nullptr, nullptr, nullptr);
    EXPECT_EQ(exited, 0);
    unsetenv("VX_NOCONFIRM");

    // Save the keyset, then Cancel at the track's question: saved, and the program runs on.
    exited = -1;
    KLAlert* alert = gnome.attentionAlert.get();
    const std::string saved = windowtest::DemoProject() + "/misc_data/quit-saved.kset";
    fs::remove(saved);
    {
        AnswerScript script({
            [&] { return alert->Waiting() && ClickWhenViewable(alert->Button(0)); },
            [&] {
                return gnome.keysetManager->Waiting() &&
                       windowtest::ChooseInBrowser(gnome.keysetManager->Browser(), saved);
            },
            [&] { return alert->Waiting() && ClickWhenViewable(alert->Button(2)); },
        });
        Gnome::quit_cb(nullptr, nullptr, nullptr);
        EXPECT_TRUE(script.Finished());
    }
    EXPECT_EQ(exited, -1);
    EXPECT_TRUE(fs::exists(saved));

    // Don't Save twice: ends with 0.
    theImp.keysetModified = theImp.trackModified = 1;
    AnswerScript script({
        [&] { return alert->Waiting() && ClickWhenViewable(alert->Button(1)); },
        [&] { return alert->Waiting() && ClickWhenViewable(alert->Button(1)); },
    });
    Gnome::quit_cb(nullptr, nullptr, nullptr);
    EXPECT_TRUE(script.Finished());
    EXPECT_EQ(exited, 0);
    theImp.keysetModified = theImp.trackModified = 0;
}

// fix_hotkeys puts the lock modifiers that are on before every accelerator: Ctrl+N with Num
// Lock on still opens the sound browser.
TEST(WindowTest, AcceleratorsWorkWithNumLockOn) {
    EXPECT_STREQ(Gnome::hotkey_prefix(ShiftMask | ControlMask), "");
    EXPECT_STREQ(Gnome::hotkey_prefix(Mod2Mask | Mod3Mask | ShiftMask), "Mod2 Mod3 ");
    Gnome& gnome = windowtest::TheWindow();
    Display* dpy = guitest::GetDisplay();
    guitest::TypeKey(XK_Num_Lock);
    Window root = DefaultRootWindow(dpy), r, c;
    int x, y, wx, wy;
    unsigned int mask = 0;
    XQueryPointer(dpy, root, &r, &c, &x, &y, &wx, &wy, &mask);
    ASSERT_TRUE(mask & Mod2Mask) << "Num Lock is not on Mod2 on this display";
    gnome.fix_hotkeys();
    char* accel = nullptr;
    XtVaGetValues(W("newTrack"), XmNaccelerator, &accel, nullptr);
    ASSERT_NE(accel, nullptr);
    EXPECT_EQ(std::string(accel).rfind("Mod2 ", 0), 0u) << accel;
    KLFileManager* sound = gnome.soundManager.get();
    bool opened = false;
    AnswerScript script({[&] {
        if (!sound->Waiting())
            return false;
        opened = true;
        return ClickWhenViewable(
            XmFileSelectionBoxGetChild(sound->Browser(), XmDIALOG_CANCEL_BUTTON));
    }});
    guitest::MoveTo(W("syncChart"));
    guitest::TypeKey(XK_n, ControlMask);
    guitest::WaitFor([&] { return script.Finished(); }, 10.0);
    EXPECT_TRUE(opened);
    guitest::TypeKey(XK_Num_Lock);
}

}  // namespace
