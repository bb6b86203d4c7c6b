#include "toolkit/xm/KLXmGnome.h"

#include <Xm/CascadeB.h>
#include <Xm/CascadeBG.h>
#include <Xm/PushB.h>
#include <Xm/RowColumn.h>
#include <Xm/ToggleB.h>
#include <Xm/Xm.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <vector>

#include "toolkit/xm/KLFiend.h"

KLXmGnome* KLXmGnome::theGnome = nullptr;

namespace {
XtAppContext appContext = nullptr;
Widget appShell = nullptr;

// Every widget built from a table or registered, in creation order.
std::vector<Widget>& registry() {
    static std::vector<Widget> widgets;
    return widgets;
}

void unregister_cb(Widget widget, XtPointer, XtPointer) {
    auto& widgets = registry();
    for (auto it = widgets.begin(); it != widgets.end(); ++it) {
        if (*it == widget) {
            widgets.erase(it);
            return;
        }
    }
}

bool is_under(Widget widget, Widget root) {
    for (Widget w = widget; w; w = XtParent(w))
        if (w == root)
            return true;
    return false;
}

int marker_depth(const char* marker) {
    int depth = 0;
    while (marker[depth] == '.')
        depth++;
    return depth;
}

bool is_pulldown(KLWidgetCreateProc create) {
    return create == XmCreatePulldownMenu;
}

bool is_cascade(Widget w) {
    return w && (XmIsCascadeButton(w) || XmIsCascadeButtonGadget(w));
}

Widget add_entry(Widget menu, const char* label, XtCallbackProc function, XtPointer clientData,
                 int position, bool toggle) {
    Arg args[2];
    Cardinal n = 0;
    XmString text = XmStringCreateLocalized(const_cast<char*>(label));
    XtSetArg(args[n], XmNlabelString, text), n++;
    if (position >= 0)
        XtSetArg(args[n], XmNpositionIndex, position), n++;
    Widget entry = toggle ? XmCreateToggleButton(menu, const_cast<char*>(label), args, n)
                          : XmCreatePushButton(menu, const_cast<char*>(label), args, n);
    XmStringFree(text);
    if (function)
        XtAddCallback(entry, toggle ? XmNvalueChangedCallback : XmNactivateCallback, function,
                      clientData);
    XtManageChild(entry);
    return entry;
}
}  // namespace

KLXmGnome::KLXmGnome() {
    theGnome = this;
}

KLXmGnome::~KLXmGnome() {
    if (theGnome == this)
        theGnome = nullptr;
}

Widget KLXmGnome::OpenApplication(const char* appName, const char* appClass, int* argc, char** argv,
                                  const char* const* fallbackResources) {
    if (appShell)
        return appShell;
    XtToolkitInitialize();
    appContext = XtCreateApplicationContext();
    if (fallbackResources)
        XtAppSetFallbackResources(appContext, const_cast<String*>(fallbackResources));
    int count = argc ? *argc : 0;
    Display* display = XtOpenDisplay(appContext, nullptr, const_cast<char*>(appName),
                                     const_cast<char*>(appClass), nullptr, 0, &count, argv);
    if (argc)
        *argc = count;
    if (!display)
        return nullptr;  // the caller says so, in its own words
    Arg args[1];
    XtSetArg(args[0], XmNdeleteResponse, XmDO_NOTHING);
    appShell = XtAppCreateShell(appName, appClass, applicationShellWidgetClass, display, args, 1);
    return appShell;
}

int KLXmGnome::Initialize(const char* appName, const char* appClass, const KLWidgetSpec* spec,
                          int* argc, char** argv, const char* const* fallbackResources) {
    Widget shell = OpenApplication(appName, appClass, argc, argv, fallbackResources);
    if (!shell)
        return 0;
    BuildWidgetTree(shell, spec);
    DressWidgets();
    XtRealizeWidget(shell);
    return 1;
}

void KLXmGnome::BuildWidgetTree(Widget parent, const KLWidgetSpec* spec) {
    // parents[d] is the last widget built at depth d - 1, the parent of the next depth-d row.
    std::vector<Widget> parents{parent};
    Widget previous = nullptr;  // the row before, for attaching a pulldown to its cascade
    for (const KLWidgetSpec* row = spec; row && row->marker && row->name && row->create; ++row) {
        int depth = marker_depth(row->marker);
        size_t length = strlen(row->marker);
        bool manage = length > 0 && row->marker[length - 1] == '+';
        if (depth >= static_cast<int>(parents.size()) || !parents[depth]) {
            fprintf(stderr, "KLXmGnome::BuildWidgetTree() row \"%s\" has no parent, skipped\n",
                    row->name);
            continue;
        }
        Widget rowParent = parents[depth];
        Widget created;
        if (is_pulldown(row->create) && is_cascade(previous) && XtParent(previous) == rowParent) {
            // A pulldown is created on the menu bar (or menu) that holds its cascade, never on
            // the cascade itself, and hangs from the cascade as its sub-menu.
            created = row->create(rowParent, const_cast<char*>(row->name), nullptr, 0);
            XtVaSetValues(previous, XmNsubMenuId, created, nullptr);
        } else if (is_pulldown(row->create) && is_cascade(rowParent)) {
            created = row->create(XtParent(rowParent), const_cast<char*>(row->name), nullptr, 0);
            XtVaSetValues(rowParent, XmNsubMenuId, created, nullptr);
        } else {
            created = row->create(rowParent, const_cast<char*>(row->name), nullptr, 0);
        }
        if (!created) {
            parents.resize(depth + 1);
            parents.push_back(nullptr);
            continue;
        }
        RegisterWidget(created);
        // Pulldowns stay unmanaged: the cascade pops them up.
        if (manage && !is_pulldown(row->create))
            XtManageChild(created);
        parents.resize(depth + 1);
        parents.push_back(created);
        previous = created;
    }
}

Widget KLXmGnome::FindWidget(const char* name, Widget root) {
    if (!name)
        return nullptr;
    for (Widget w : registry()) {
        if (strcmp(XtName(w), name) == 0 && (!root || is_under(w, root)))
            return w;
    }
    return nullptr;
}

void KLXmGnome::RegisterWidget(Widget widget) {
    if (!widget)
        return;
    registry().push_back(widget);
    XtAddCallback(widget, XtNdestroyCallback, unregister_cb, nullptr);
}

KLFiend* KLXmGnome::FindFiend(const char* name, Widget root) {
    return KLFiend::FromWidget(FindWidget(name, root));
}

void KLXmGnome::AddCallback(const char* name, const char* callbackName, XtCallbackProc function,
                            XtPointer clientData) {
    Widget w = FindWidget(name);
    if (w && callbackName && XtHasCallbacks(w, const_cast<char*>(callbackName)) != XtCallbackNoList)
        XtAddCallback(w, callbackName, function, clientData);
}

Widget KLXmGnome::AddMenuEntry(Widget menu, const char* label, XtCallbackProc function,
                               XtPointer clientData, int position) {
    if (!menu)
        return nullptr;
    return add_entry(menu, label ? label : "", function, clientData, position, false);
}

Widget KLXmGnome::AddMenuToggle(Widget menu, const char* label, XtCallbackProc function,
                                XtPointer clientData, int position) {
    if (!menu)
        return nullptr;
    return add_entry(menu, label ? label : "", function, clientData, position, true);
}

void KLXmGnome::SetLabel(Widget widget, const std::string& text) {
    if (!widget)
        return;
    // A label draws a tab character as nothing ("Select\tDagnode:" would read as one word):
    // it is shown as a space.
    std::string shown = text;
    std::replace(shown.begin(), shown.end(), '\t', ' ');
    XmString s = XmStringCreateLocalized(const_cast<char*>(shown.c_str()));
    XtVaSetValues(widget, XmNlabelString, s, nullptr);
    XmStringFree(s);
}

void KLXmGnome::EmptyMenu(Widget menu, int keep) {
    if (!menu)
        return;
    WidgetList children = nullptr;
    Cardinal count = 0;
    XtVaGetValues(menu, XmNchildren, &children, XmNnumChildren, &count, nullptr);
    std::vector<Widget> doomed;
    for (Cardinal i = keep < 0 ? 0 : keep; i < count; i++)
        doomed.push_back(children[i]);
    for (Widget w : doomed)
        XtDestroyWidget(w);
}

void KLXmGnome::LoadFiendResources(const char* const* resources) {
    if (!appShell || !resources)
        return;
    XrmDatabase fallback = nullptr;
    for (const char* const* line = resources; *line; ++line)
        XrmPutLineResource(&fallback, *line);
    XrmDatabase db = XtDatabase(XtDisplay(appShell));
    // Entries already in the database (resource files, -xrm) win over the fallbacks.
    XrmCombineDatabase(fallback, &db, False);
}

void KLXmGnome::MainLoop() {
    if (appContext)
        XtAppMainLoop(appContext);
}

void KLXmGnome::ProcessUntil(const std::function<bool()>& done) {
    while (appContext && !done())
        XtAppProcessEvent(appContext, XtIMAll);
}

void KLXmGnome::ProcessPending() {
    if (!appContext)
        return;
    while (XtAppPending(appContext))
        XtAppProcessEvent(appContext, XtIMAll);
}

XtAppContext KLXmGnome::AppContext() {
    return appContext;
}
Widget KLXmGnome::AppShell() {
    return appShell;
}
Display* KLXmGnome::GetDisplay() {
    return appShell ? XtDisplay(appShell) : nullptr;
}
