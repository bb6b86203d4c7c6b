// GoogleTest first: the X headers define macros (None, Bool) that its names collide with.
#include <gtest/gtest.h>

#include "window/WindowTestUtil.h"

#include <Xm/FileSB.h>
#include <Xm/TextF.h>
#include <Xm/Xm.h>

#include <cstdlib>

#include "guitest/GuiTest.h"
#include "window/FallbackResources.h"
#include "window/Gnome.h"
#include "workspace/Imp.h"

namespace windowtest {

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

AnswerScript::AnswerScript(std::vector<std::function<bool()>> steps) : steps_(std::move(steps)) {
    timer_ = XtAppAddTimeOut(KLXmGnome::AppContext(), 20, tick, this);
}

AnswerScript::~AnswerScript() {
    if (timer_)
        XtRemoveTimeOut(timer_);
}

void AnswerScript::tick(XtPointer self, XtIntervalId*) {
    auto* script = static_cast<AnswerScript*>(self);
    script->timer_ = 0;
    if (script->next_ < script->steps_.size() && script->steps_[script->next_]())
        script->next_++;
    if (script->next_ < script->steps_.size())
        script->timer_ = XtAppAddTimeOut(KLXmGnome::AppContext(), 20, tick, self);
}

bool Viewable(Widget widget) {
    if (!widget || !XtIsManaged(widget))
        return false;
    // Dialog buttons are gadgets: their window is their parent's.
    Widget windowed = XtIsWidget(widget) ? widget : XtParent(widget);
    if (!XtIsRealized(windowed))
        return false;
    XWindowAttributes attrs;
    if (!XGetWindowAttributes(XtDisplay(windowed), XtWindow(windowed), &attrs))
        return false;
    return attrs.map_state == IsViewable;
}

bool ClickWhenViewable(Widget button) {
    if (!Viewable(button))
        return false;
    guitest::Click(button);
    return true;
}

bool ChooseInBrowser(Widget browser, const std::string& path) {
    Widget ok = XmFileSelectionBoxGetChild(browser, XmDIALOG_OK_BUTTON);
    if (!Viewable(ok))
        return false;
    Widget text = XmFileSelectionBoxGetChild(browser, XmDIALOG_TEXT);
    XmTextFieldSetString(text, const_cast<char*>(path.c_str()));
    guitest::Click(ok);
    return true;
}

}  // namespace windowtest
