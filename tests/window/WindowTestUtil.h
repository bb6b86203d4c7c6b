#pragma once

#include <X11/Intrinsic.h>

#include <functional>
#include <string>

#include "window/DemoProject.h"

class Gnome;
class KLAlert;

// Helpers of the main-window tests: the one Gnome of the test program, built on the test
// display with the program's own resource file.
namespace windowtest {

// The widget registered under `name`.
Widget W(const char* name);
// A widget's label string; "<none>" when there is no widget.
std::string Label(Widget widget);

// The window, built once per test program (Xt cannot reopen the display).
Gnome& TheWindow();
// The window with the demo keyset (and, when `track`, its track and sound) loaded from the
// demo project, loaded once unless a keyset is there already.
Gnome& TheDemoWindow(bool track = false);

// Types `path` into a file browser's name field and presses its OK button.
bool ChooseInBrowser(Widget browser, const std::string& path);

// Runs `action`, answering every question `alert` asks meanwhile with its button `button`; the
// last message told, empty when none was.
std::string AnswerAlerts(KLAlert* alert, const std::function<void()>& action, int button = 0);

// The option menu's entry `index` chosen as a click on it would (its activate callbacks).
void ChooseOption(Widget optionMenu, int index);

}  // namespace windowtest
