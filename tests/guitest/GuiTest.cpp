// GoogleTest first: the X headers define macros (None, Bool) that its names collide with.
#include <gtest/gtest.h>

#include "guitest/GuiTest.h"

#include <X11/XKBlib.h>
#include <X11/Xlib.h>
#include <X11/extensions/XTest.h>
#include <X11/keysym.h>
#include <Xm/Xm.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <map>
#include <thread>

#include "toolkit/xm/KLXmGnome.h"

namespace guitest {
namespace {

// Points DISPLAY at the fixture's display when the fixture file names one.
void use_fixture_display() {
    const char* file = getenv("CHIRRUP_DISPLAY_FILE");
    if (!file)
        return;
    std::ifstream in(file);
    std::string display;
    if (in >> display)
        setenv("DISPLAY", display.c_str(), 1);
}

void sync_and_process() {
    XSync(GetDisplay(), False);
    KLXmGnome::ProcessPending();
}

void modifier_keys(unsigned int modifiers, bool press) {
    Display* d = GetDisplay();
    const std::pair<unsigned int, KeySym> keys[] = {
        {ShiftMask, XK_Shift_L}, {ControlMask, XK_Control_L}, {Mod1Mask, XK_Alt_L}};
    for (auto& [mask, sym] : keys)
        if (modifiers & mask)
            XTestFakeKeyEvent(d, XKeysymToKeycode(d, sym), press, CurrentTime);
}

// Lets the application go idle once, as its main loop does between events: the work procedures
// run (the status line's "Ready." among them) while a short timer keeps the wait bounded.
void run_idle_work() {
    XtAppContext context = KLXmGnome::AppContext();
    if (!context)
        return;
    bool fired = false;
    XtAppAddTimeOut(
        context, 20, [](XtPointer done, XtIntervalId*) { *static_cast<bool*>(done) = true; },
        &fired);
    while (!fired)
        XtAppProcessEvent(context, XtIMAll);
}

}  // namespace

Widget Shell(const char* const* fallbackResources) {
    static Widget shell = nullptr;
    if (!shell) {
        use_fixture_display();
        static char name[] = "chirrup";
        static char* argv[] = {name, nullptr};
        int argc = 1;
        shell = KLXmGnome::OpenApplication("chirrup", "Chirrup", &argc, argv, fallbackResources);
    }
    if (!shell)
        ADD_FAILURE() << "no display: run the window tests under the xvfb fixture";
    return shell;
}

Display* GetDisplay() {
    return KLXmGnome::GetDisplay();
}

bool WaitFor(const std::function<bool()>& done, double seconds) {
    auto limit = std::chrono::steady_clock::now() + std::chrono::duration<double>(seconds);
    XtAppContext context = KLXmGnome::AppContext();
    while (true) {
        if (done())
            return true;
        if (std::chrono::steady_clock::now() > limit)
            return done();
        if (GetDisplay())
            XFlush(GetDisplay());
        if (context && XtAppPending(context))
            XtAppProcessEvent(context, XtIMAll);
        else
            std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
}

void Settle() {
    for (int i = 0; i < 3; i++) {
        sync_and_process();
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    sync_and_process();
}

bool Viewable(Widget widget) {
    if (!widget || (!XtIsShell(widget) && !XtIsManaged(widget)))
        return false;
    Widget windowed = XtIsWidget(widget) ? widget : XtParent(widget);
    XWindowAttributes attributes;
    return XtIsRealized(windowed) &&
           XGetWindowAttributes(XtDisplay(windowed), XtWindow(windowed), &attributes) &&
           attributes.map_state == IsViewable;
}

bool WaitMapped(Widget widget, double seconds) {
    return WaitFor([widget] { return Viewable(widget); }, seconds);
}

std::vector<Widget> Children(Widget widget) {
    WidgetList children = nullptr;
    Cardinal count = 0;
    XtVaGetValues(widget, XmNchildren, &children, XmNnumChildren, &count, nullptr);
    return std::vector<Widget>(children, children + count);
}

void MoveTo(Widget widget, int x, int y) {
    Dimension width = 0, height = 0;
    XtVaGetValues(widget, XmNwidth, &width, XmNheight, &height, nullptr);
    Position rootX = 0, rootY = 0;
    XtTranslateCoords(widget, Position(x < 0 ? width / 2 : x), Position(y < 0 ? height / 2 : y),
                      &rootX, &rootY);
    XTestFakeMotionEvent(GetDisplay(), -1, rootX, rootY, CurrentTime);
    Settle();
}

void Press(int button, unsigned int modifiers) {
    modifier_keys(modifiers, true);
    XTestFakeButtonEvent(GetDisplay(), button, True, CurrentTime);
    Settle();
}

void Release(int button, unsigned int modifiers) {
    XTestFakeButtonEvent(GetDisplay(), button, False, CurrentTime);
    modifier_keys(modifiers, false);
    Settle();
}

void Click(Widget widget, int button, int x, int y, unsigned int modifiers) {
    MoveTo(widget, x, y);
    Press(button, modifiers);
    Release(button, modifiers);
}

void DoubleClick(Widget widget, int button, int x, int y) {
    MoveTo(widget, x, y);
    Display* d = GetDisplay();
    for (int i = 0; i < 2; i++) {
        XTestFakeButtonEvent(d, button, True, CurrentTime);
        XTestFakeButtonEvent(d, button, False, CurrentTime);
    }
    Settle();
}

bool ClickWhenViewable(Widget button) {
    if (!Viewable(button))
        return false;
    Click(button);
    return true;
}

void TypeKey(unsigned long keysym, unsigned int modifiers) {
    Display* d = GetDisplay();
    KeyCode code = XKeysymToKeycode(d, keysym);
    if (code == 0) {
        ADD_FAILURE() << "no key code for keysym " << keysym;
        return;
    }
    // A keysym that is the shifted symbol of its key needs Shift.
    if (XkbKeycodeToKeysym(d, code, 0, 0) != keysym && XkbKeycodeToKeysym(d, code, 0, 1) == keysym)
        modifiers |= ShiftMask;
    modifier_keys(modifiers, true);
    XTestFakeKeyEvent(d, code, True, CurrentTime);
    XTestFakeKeyEvent(d, code, False, CurrentTime);
    modifier_keys(modifiers, false);
    Settle();
}

void TypeText(const std::string& text) {
    static const std::map<char, KeySym> named = {
        {' ', XK_space}, {'\n', XK_Return}, {'.', XK_period}, {'-', XK_minus}, {':', XK_colon}};
    for (char c : text)
        TypeKey(named.count(c) ? named.at(c) : static_cast<KeySym>(c));
}

unsigned long PixelAt(Widget widget, int x, int y) {
    XSync(GetDisplay(), False);
    XImage* image = XGetImage(XtDisplay(widget), XtWindow(widget), x, y, 1, 1, AllPlanes, ZPixmap);
    if (!image)
        return ~0ul;
    unsigned long pixel = XGetPixel(image, 0, 0);
    XDestroyImage(image);
    return pixel;
}

unsigned long NamedPixel(const char* colourName) {
    Display* d = GetDisplay();
    XColor exact, screen;
    if (!XAllocNamedColor(d, DefaultColormap(d, DefaultScreen(d)), colourName, &screen, &exact))
        return ~0ul;
    return screen.pixel;
}

void Screenshot(const std::string& name) {
    run_idle_work();
    Settle();
    std::string dir = std::string(CHIRRUP_BINARY_DIR) + "/test-screens";
    std::string command = "mkdir -p '" + dir + "' && import -display " +
                          DisplayString(GetDisplay()) + " -window root '" + dir + "/" + name +
                          ".png' 2>/dev/null";
    XSync(GetDisplay(), False);
    if (system(command.c_str()) != 0)
        fprintf(stderr, "guitest: could not save the screenshot %s\n", name.c_str());
}

void CloseFromWindowManager(Widget dialog) {
    Widget shell = XtParent(dialog);
    Display* dpy = XtDisplay(shell);
    XClientMessageEvent ev{};
    ev.type = ClientMessage;
    ev.window = XtWindow(shell);
    ev.message_type = XInternAtom(dpy, "WM_PROTOCOLS", False);
    ev.format = 32;
    ev.data.l[0] = long(XInternAtom(dpy, "WM_DELETE_WINDOW", False));
    ev.data.l[1] = CurrentTime;
    XSendEvent(dpy, XtWindow(shell), False, NoEventMask, reinterpret_cast<XEvent*>(&ev));
}

std::string XmText(Widget widget, const char* resource) {
    XmString s = nullptr;
    XtVaGetValues(widget, resource, &s, nullptr);
    if (!s)
        return "";
    char* text = nullptr;
    XmStringGetLtoR(s, const_cast<char*>(XmFONTLIST_DEFAULT_TAG), &text);
    std::string result = text ? text : "";
    XtFree(text);
    XmStringFree(s);
    return result;
}

}  // namespace guitest
