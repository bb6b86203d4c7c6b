// The main window on the test display: the views' alternatives, the quit questions and the
// accelerators' lock modifiers.
#include <gtest/gtest.h>

#include <Xm/Xm.h>

#include <cstdlib>
#include <filesystem>
#include <string>

#include "guitest/AnswerScript.h"
#include "guitest/GuiTest.h"
#include "toolkit/xm/KLAlert.h"
#include "toolkit/xm/KLFileManager.h"
#include "window/Gnome.h"
#include "window/WindowTestUtil.h"
#include "workspace/Imp.h"

namespace fs = std::filesystem;
using guitest::AnswerScript;
using guitest::ClickWhenViewable;
using windowtest::W;

namespace {

bool Managed(const char* name) {
    return W(name) && XtIsManaged(W(name));
}

// Exactly one alternative of each view managed, filling its frame, by (geometry, key view on,
// its mode, mix view on, reference view on, playblast on).
TEST(WindowTest, ViewsFollowTheState) {
    Gnome& gnome = windowtest::TheWindow();
    struct ViewCase {
        int geometry, keyOn, keyMode, mixOn, refOn, blastOn;
        const char* keyShown;  // the one managed of keyVu, keyScn, keyFake
        bool mixScene, refImages;
        int keyModeAfter;
    };
    for (ViewCase c : {ViewCase{1, 1, 1, 1, 1, 0, "keyScn", true, true, 1},
                       ViewCase{1, 1, 0, 1, 0, 1, "keyVu", true, true, 0},
                       ViewCase{1, 0, 1, 0, 0, 0, "keyFake", false, false, 1},
                       // Without geometry the scene turns to key images.
                       ViewCase{0, 1, 1, 1, 1, 0, "keyVu", false, true, 0}}) {
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
        EXPECT_EQ(gnome.keyViewMode, c.keyModeAfter);
    }
}

// The quit questions, answered through the real alert and file browser, on the demo keyset.
TEST(WindowTest, QuitAsksAboutModifiedFiles) {
    Gnome& gnome = windowtest::TheDemoWindow();
    static int exited = -1;
    Gnome::exitFunction = [](int status) { exited = status; };
    unsetenv("VX_NOCONFIRM");
    ASSERT_NE(gnome.shownKeyset, nullptr) << "the loaded keyset is shown";
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
    const auto press = [alert](int button) -> std::function<bool()> {
        return [=] { return alert->Waiting() && ClickWhenViewable(alert->Button(button)); };
    };
    const std::string saved = windowtest::DemoProject() + "/misc_data/quit-saved.kset";
    fs::remove(saved);
    {
        AnswerScript script({press(0),
                             [&] {
                                 return gnome.keysetManager->Waiting() &&
                                        windowtest::ChooseInBrowser(gnome.keysetManager->Browser(),
                                                                    saved);
                             },
                             press(2)});
        Gnome::quit_cb(nullptr, nullptr, nullptr);
        EXPECT_TRUE(script.Finished());
    }
    EXPECT_EQ(exited, -1);
    EXPECT_TRUE(fs::exists(saved));

    // Don't Save twice: ends with 0.
    theImp.keysetModified = theImp.trackModified = 1;
    AnswerScript script({press(1), press(1)});
    Gnome::quit_cb(nullptr, nullptr, nullptr);
    EXPECT_TRUE(script.Finished());
    EXPECT_EQ(exited, 0);
    theImp.keysetModified = theImp.trackModified = 0;
}

// The lock modifiers that are on go before every accelerator, so that they work with Num Lock on.
TEST(WindowTest, HotkeyPrefixNamesTheLockModifiers) {
    EXPECT_STREQ(Gnome::hotkey_prefix(ShiftMask | ControlMask), "");
    EXPECT_STREQ(Gnome::hotkey_prefix(Mod2Mask | Mod3Mask | ShiftMask), "Mod2 Mod3 ");
}

}  // namespace
