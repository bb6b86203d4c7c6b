#pragma once

#include <X11/Intrinsic.h>

#include <functional>
#include <string>
#include <vector>

#include "window/DemoProject.h"

class Gnome;

// Helpers of the main-window tests: the one Gnome of the test program, built on the test
// display with the program's own resource file, and a script of answers given to modal
// dialogs while the code under test waits in its nested event loop.
namespace windowtest {

// The window, built once per test program (Xt cannot reopen the display).
Gnome& TheWindow();

// Steps run from a short timeout while the test waits in a modal loop: each step is tried
// every few milliseconds until it returns true, then the next is tried.
class AnswerScript {
  public:
    explicit AnswerScript(std::vector<std::function<bool()>> steps);
    ~AnswerScript();
    bool Finished() const { return next_ >= steps_.size(); }

  private:
    static void tick(XtPointer self, XtIntervalId*);
    std::vector<std::function<bool()>> steps_;
    size_t next_ = 0;
    XtIntervalId timer_ = 0;
};

// Whether a dialog (or any widget) is on the screen.
bool Viewable(Widget widget);
// Clicks a push button when it is viewable; false when it is not (yet).
bool ClickWhenViewable(Widget button);
// Types `path` into a file browser's name field and presses its OK button.
bool ChooseInBrowser(Widget browser, const std::string& path);

}  // namespace windowtest
