// GoogleTest first: the X headers define macros (None, Bool) that its names collide with.
#include <gtest/gtest.h>

#include "window/WindowTestUtil.h"

#include <Xm/FileSB.h>
#include <Xm/TextF.h>
#include <Xm/Xm.h>

#include "guitest/AnswerScript.h"
#include "guitest/GuiTest.h"
#include "toolkit/xm/KLAlert.h"
#include "window/FallbackResources.h"
#include "window/Gnome.h"
#include "workspace/Imp.h"

namespace windowtest {

Widget W(const char* name) {
    return KLXmGnome::FindWidget(name);
}

std::string Label(Widget widget) {
    return widget ? guitest::XmText(widget, XmNlabelString) : "<none>";
}

Gnome& TheWindow() {
    static Gnome* gnome = [] {
        guitest::Shell(chirrup_fallback_resources());
        auto* g = new Gnome;
        theGhost = g;
        int argc = 1;
        char name[] = "chirrup";
        char* argv[] = {name, nullptr};
        EXPECT_EQ(g->Initialize("chirrup", "Chirrup", widget_spec, &argc, argv,
                                chirrup_fallback_resources()),
                  1);
        guitest::WaitMapped(KLXmGnome::AppShell());
        return g;
    }();
    return *gnome;
}

Gnome& TheDemoWindow(bool track) {
    Gnome& gnome = TheWindow();
    const std::string demo = DemoProject() + "/misc_data/demo.";
    if (theImp.keysetCount == 0) {
        EXPECT_EQ(theImp.LoadKeyset((demo + "kset").c_str()), 1);
        if (track) {
            EXPECT_EQ(theImp.LoadTrack((demo + "track").c_str()), 1);
        }
    }
    return gnome;
}

bool ChooseInBrowser(Widget browser, const std::string& path) {
    Widget ok = XmFileSelectionBoxGetChild(browser, XmDIALOG_OK_BUTTON);
    if (!guitest::Viewable(ok))
        return false;
    Widget text = XmFileSelectionBoxGetChild(browser, XmDIALOG_TEXT);
    XmTextFieldSetString(text, const_cast<char*>(path.c_str()));
    guitest::Click(ok);
    return true;
}

std::string AnswerAlerts(KLAlert* alert, const std::function<void()>& action, int button) {
    std::string told;
    auto answer = [&] {
        if (!alert->Waiting() || !guitest::Viewable(alert->Button(button)))
            return false;
        told = guitest::XmText(alert->GetDialog(), XmNmessageString);
        return guitest::ClickWhenViewable(alert->Button(button));
    };
    guitest::AnswerScript script({answer, answer, answer, answer});
    action();
    return told;
}

void ChooseOption(Widget optionMenu, int index) {
    Widget pulldown = nullptr;
    XtVaGetValues(optionMenu, XmNsubMenuId, &pulldown, nullptr);
    ASSERT_NE(pulldown, nullptr);
    const auto entries = guitest::Children(pulldown);
    ASSERT_LT(size_t(index), entries.size());
    XtCallCallbacks(entries[size_t(index)], XmNactivateCallback, nullptr);
}

}  // namespace windowtest
