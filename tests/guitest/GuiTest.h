#pragma once

#include <functional>
#include <string>
#include <vector>

#include <X11/Intrinsic.h>

// Helpers of the window tests. Every test program that uses them shares one display (the
// "xvfb" fixture's, named in the file $CHIRRUP_DISPLAY_FILE) and one application context for
// all its tests, since Xt cannot reopen a display in the same process.
namespace guitest {

// Opens the application shell once (KLXmGnome::OpenApplication, class "Chirrup") with the
// given fallback resources (only the first call's are used). Fails the test when no display
// can be opened.
Widget Shell(const char* const* fallbackResources = nullptr);
Display* GetDisplay();

// Processes events until `done` returns true or `seconds` pass; returns what `done` last said.
bool WaitFor(const std::function<bool()>& done, double seconds = 5.0);
// Processes events for a short while (until the server has answered everything sent so far).
void Settle();
// Whether a widget is on the screen: managed (shells excepted) and its window viewable; a
// gadget (a dialog's buttons) by its parent's window.
bool Viewable(Widget widget);
// Waits until `widget` (a top-level or dialog shell, a dialog's button) is viewable.
bool WaitMapped(Widget widget, double seconds = 5.0);
// The children of a composite (a menu's entries, a row's tiles).
std::vector<Widget> Children(Widget widget);

// Real input through XTest, at widget-relative positions (x or y of -1: the widget's centre).
void MoveTo(Widget widget, int x = -1, int y = -1);
void Press(int button, unsigned int modifiers = 0);
void Release(int button, unsigned int modifiers = 0);
void Click(Widget widget, int button = 1, int x = -1, int y = -1, unsigned int modifiers = 0);
void DoubleClick(Widget widget, int button = 1, int x = -1, int y = -1);
// Clicks a button when it is viewable; false when it is not (yet).
bool ClickWhenViewable(Widget button);
// Types one key (a keysym such as XK_BackSpace or XK_a) with ShiftMask/ControlMask/Mod1Mask
// modifiers held; the key goes to the window under the pointer (no window manager).
void TypeKey(unsigned long keysym, unsigned int modifiers = 0);
void TypeText(const std::string& text);

// The pixel at (x, y) of a widget's window, as the server holds it.
unsigned long PixelAt(Widget widget, int x, int y);
// The pixel value of a named colour on the default colormap.
unsigned long NamedPixel(const char* colourName);

// Asks a dialog's shell to close as the window manager does (WM_DELETE_WINDOW).
void CloseFromWindowManager(Widget dialog);

// The text of a compound-string resource of a widget (XmNlabelString, XmNmessageString...);
// empty when it has none.
std::string XmText(Widget widget, const char* resource);

// Saves a screenshot of the whole display as build/test-screens/<name>.png (ImageMagick's
// import). Failing to save is not a test failure; it is reported on the error stream.
void Screenshot(const std::string& name);

}  // namespace guitest
