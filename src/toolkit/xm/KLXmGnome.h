#pragma once

#include <functional>
#include <string>

#include <X11/Intrinsic.h>
#include <X11/StringDefs.h>

#include "toolkit/xm/KLWidgetSpec.h"

class KLFiend;

// The application and main-window base of the toolkit: opens the display, builds a widget
// table, keeps the widget-by-name registry and runs the event loop. One object of a derived
// class (the main window) exists per interactive run; the services are static so that the
// fiends and dialogs can use them without holding the object.
class KLXmGnome {
  public:
    KLXmGnome();
    virtual ~KLXmGnome();
    KLXmGnome(const KLXmGnome&) = delete;
    KLXmGnome& operator=(const KLXmGnome&) = delete;

    // Opens the display and creates the application shell (XtOpenApplication) with the given
    // null-terminated fallback resources, which are used only when no app-defaults file of
    // the class is found. Returns the shell, or null when the display cannot be opened. Runs
    // once per process: a second call returns the shell of the first (Xt cannot reopen a
    // display after destroying its context).
    static Widget OpenApplication(const char* appName, const char* appClass, int* argc, char** argv,
                                  const char* const* fallbackResources);

    // OpenApplication, BuildWidgetTree of `spec` under the shell, the virtual DressWidgets,
    // then realize. Returns 1, or 0 when the display could not be opened.
    int Initialize(const char* appName, const char* appClass, const KLWidgetSpec* spec, int* argc,
                   char** argv, const char* const* fallbackResources = nullptr);

    // Dresses the built widgets (callbacks, fiends, initial states); called once by
    // Initialize. Returns 1.
    virtual int DressWidgets() { return 1; }

    // Creates every row of `spec` in order under the parent its depth gives (depth 0 under
    // `parent`), managing the rows marked "+". A pulldown menu is created on the parent of
    // the cascade button before it and attached to it with XmNsubMenuId. Every widget is
    // entered in the name registry. A malformed marker (depth more than one below the row
    // before it) is reported and the row skipped with its subtree.
    static void BuildWidgetTree(Widget parent, const KLWidgetSpec* spec);

    // The first registered widget of that name that is `root` or lies under it (root null:
    // anywhere); null when none. Widgets leave the registry when destroyed.
    static Widget FindWidget(const char* name, Widget root = nullptr);
    // Enters a widget made outside a table, so that FindWidget finds it.
    static void RegisterWidget(Widget widget);

    // The toolkit object behind the widget of that name (KLFiend::FromWidget), or null.
    static KLFiend* FindFiend(const char* name, Widget root = nullptr);

    // Adds `function` to the callback list `callbackName` of the widget found by name;
    // nothing when the name is unknown.
    static void AddCallback(const char* name, const char* callbackName, XtCallbackProc function,
                            XtPointer clientData);

    // Adds a push button labelled `label` to `menu` at `position` (-1: at the end), with
    // `function` as its activate callback. Returns the entry.
    static Widget AddMenuEntry(Widget menu, const char* label, XtCallbackProc function,
                               XtPointer clientData, int position = -1);
    // Adds a toggle entry (for radio-like menus such as the keyset menu).
    static Widget AddMenuToggle(Widget menu, const char* label, XtCallbackProc function,
                                XtPointer clientData, int position = -1);
    // Destroys the entries of `menu` after the first `keep`.
    static void EmptyMenu(Widget menu, int keep = 0);
    // Sets the label string of a label or button (nothing for a null widget); a tab shows as a
    // space.
    static void SetLabel(Widget widget, const std::string& text);

    // Merges class-wide fallback resource lines (as in a resource file) into the display's
    // database, below anything the database already says. Null-terminated.
    static void LoadFiendResources(const char* const* resources);

    // Runs the event loop for ever.
    static void MainLoop();
    // Processes events until `done` is true (checked after every event), for modal dialogs.
    static void ProcessUntil(const std::function<bool()>& done);
    // Processes every pending event and returns.
    static void ProcessPending();

    static XtAppContext AppContext();
    static Widget AppShell();
    static Display* GetDisplay();

    // The one main window of the run (null before one is constructed).
    static KLXmGnome* theGnome;
};
