// Menu and view sensitivity, accelerators under lock modifiers, the option-menu helpers and
// quitting.
#include <Xm/RowColumn.h>
#include <Xm/ToggleBG.h>
#include <Xm/Xm.h>

#include <cstdlib>

#include "toolkit/KLString.h"
#include "toolkit/xm/KLAlert.h"
#include "toolkit/xm/KLFileManager.h"
#include "window/Gnome.h"
#include "workspace/Imp.h"

namespace {
void sensitive(const char* name, bool on) {
    if (Widget w = KLXmGnome::FindWidget(name))
        XtSetSensitive(w, on);
}

void manage(const char* name, bool on) {
    Widget w = KLXmGnome::FindWidget(name);
    if (!w)
        return;
    if (on)
        XtManageChild(w);
    else
        XtUnmanageChild(w);
}

void set_toggle(const char* name, bool on) {
    if (Widget w = KLXmGnome::FindWidget(name))
        XmToggleButtonGadgetSetState(w, on, False);
}

// The entries of an option menu's pulldown (null count when it has none).
WidgetList option_entries(Widget optionMenu, Cardinal* count) {
    *count = 0;
    if (!optionMenu)
        return nullptr;
    Widget history = nullptr;
    XtVaGetValues(optionMenu, XmNmenuHistory, &history, nullptr);
    if (!history)
        return nullptr;
    WidgetList children = nullptr;
    XtVaGetValues(XtParent(history), XmNchildren, &children, XmNnumChildren, count, nullptr);
    return children;
}
}  // namespace

void Gnome::SetMenuStatus() {
    bool shown = shownKeyset != nullptr;
    for (const char* name : {"saveKeyset", "openTrack", "saveTrack", "applyWire"})
        sensitive(name, shown);
    bool keyView = shown && !theImp.geometryActive;
    sensitive("keyVuSet", keyView);
    sensitive("keyVuClear", keyView);
}

void Gnome::SetViewStatus() {
    Widget keyToggle = FindWidget("keyVuToggle");
    Widget mixToggle = FindWidget("mixVuToggle");
    sensitive("keyVuSet", false);
    if (theImp.geometryActive) {
        for (const char* name : {"points", "lines", "polygons", "polygonsboth"})
            sensitive(name, true);
        set_toggle("loadGeometry", true);
        set_option_sensitive(keyToggle, 1, 1);
        if (!keyViewOn) {
            manage("keyFake", true);
            manage("keyVu", false);
            manage("keyScn", false);
        } else if (keyViewMode != 1) {
            set_option_value(keyToggle, 2);
            manage("keyVu", true);
            manage("keyScn", false);
            manage("keyFake", false);
        } else {
            set_option_value(keyToggle, 1);
            manage("keyScn", true);
            manage("keyVu", false);
            manage("keyFake", false);
            if (shownKeyset) {
                sensitive("keyVuSet", true);
                sensitive("keyVuClear", true);
            }
        }
        manage("mixScn", mixViewOn);
        manage("mixFake", !mixViewOn);
        set_option_value(mixToggle, mixViewOn ? 0 : 1);
        set_option_sensitive(mixToggle, 0, 1);
    } else {
        set_toggle("loadGeometry", false);
        for (const char* name : {"points", "lines", "polygons", "polygonsboth"})
            sensitive(name, false);
        if (keyViewOn) {
            if (keyViewMode == 1)
                keyViewMode = 0;
            set_option_value(keyToggle, 2);
            manage("keyVu", true);
            manage("keyScn", false);
            manage("keyFake", false);
        } else {
            manage("keyFake", true);
            manage("keyVu", false);
            manage("keyScn", false);
        }
        manage("mixFake", true);
        manage("mixScn", false);
        set_toggle("loadGeometry", false);
        set_option_value(mixToggle, 1);
        set_option_sensitive(mixToggle, 0, 0);
        set_option_sensitive(keyToggle, 1, 0);
    }
    bool reference = refViewOn || playblastViewOn;
    manage("refFake", !reference);
    manage("refVu", reference);
}

void Gnome::ResetFileManagers() {
    for (auto* manager : {keysetManager.get(), trackManager.get(), soundManager.get(),
                          applyManager.get(), referenceManager.get()})
        if (manager)
            manager->ResetDirectory();
}

void Gnome::set_option_callbacks(Widget optionMenu, XtCallbackProc function) {
    if (!optionMenu)
        return;
    Widget pulldown = nullptr;
    XtVaGetValues(optionMenu, XmNsubMenuId, &pulldown, nullptr);
    if (!pulldown)
        return;
    WidgetList children = nullptr;
    Cardinal count = 0;
    XtVaGetValues(pulldown, XmNchildren, &children, XmNnumChildren, &count, nullptr);
    for (Cardinal i = 0; i < count; i++) {
        XtAddCallback(children[i], XmNactivateCallback, function, XtPointer(long(i)));
        XtVaSetValues(children[i], XmNuserData, XtPointer(this), nullptr);
    }
}

void Gnome::set_option_value(Widget optionMenu, int index) {
    Cardinal count = 0;
    WidgetList children = option_entries(optionMenu, &count);
    if (!children || index < 0 || index >= int(count))
        return;
    XtVaSetValues(optionMenu, XmNmenuHistory, children[index], nullptr);
}

void Gnome::set_option_sensitive(Widget optionMenu, int index, int on) {
    Cardinal count = 0;
    WidgetList children = option_entries(optionMenu, &count);
    if (!children || index < 0 || index >= int(count))
        return;
    XtSetSensitive(children[index], on);
}

const char* Gnome::hotkey_prefix(unsigned int mask) {
    bool mod2 = mask & Mod2Mask, mod3 = mask & Mod3Mask;
    if (mod2 && mod3)
        return "Mod2 Mod3 ";
    if (mod2)
        return "Mod2 ";
    if (mod3)
        return "Mod3 ";
    return "";
}

void Gnome::fix_hotkeys() {
    Display* dpy = GetDisplay();
    if (!dpy)
        return;
    Window root = RootWindow(dpy, DefaultScreen(dpy)), child = 0, rootReturn = 0;
    int rx = 0, ry = 0, wx = 0, wy = 0;
    unsigned int mask = 0;
    XQueryPointer(dpy, root, &rootReturn, &child, &rx, &ry, &wx, &wy, &mask);
    const char* prefix = hotkey_prefix(mask);
    if (!*prefix)
        return;
    for (const char* name :
         {"openKeyset", "saveKeyset", "newTrack", "openTrack", "saveTrack", "applyWire", "quit",
          "undo", "addKeyframe", "deleteKeyframe", "deleteKeyframeRegion", "play"}) {
        Widget w = FindWidget(name);
        if (!w)
            continue;  // "undo" has no item
        char* accelerator = nullptr;
        XtVaGetValues(w, XmNaccelerator, &accelerator, nullptr);
        if (!accelerator)
            continue;
        // Xt keeps the string it was given; the new one lives for the rest of the run.
        std::string* fixed = new std::string(KLFmt("%s%s", prefix, accelerator));
        XtVaSetValues(w, XmNaccelerator, fixed->c_str(), nullptr);
    }
}

int Gnome::QuitQuestions() {
    if (std::getenv("VX_NOCONFIRM"))
        return 1;
    struct Question {
        int modified;
        const char* text;
        KLFileManager* manager;
    } questions[] = {
        {theImp.keysetModified, "Would you like to save your keyset changes?", keysetManager.get()},
        {theImp.trackModified, "Would you like to save your track changes?", trackManager.get()},
    };
    for (const Question& q : questions) {
        if (!q.modified)
            continue;
        int answer = attentionAlert->Confirm3(q.text, "Save", "Don't Save", "Cancel");
        if (answer == 0)
            return 0;
        if (answer == 1 && q.manager)
            q.manager->StoreAs(1);
    }
    return 1;
}

void Gnome::quit_cb(Widget, XtPointer, XtPointer) {
    Gnome* gnome = TheGnome();
    if (gnome && !gnome->QuitQuestions())
        return;
    exitFunction(0);
}
