// Partly built: the start-up load, the active keyset's title and the keyset menu work; the
// tile panels, tile selection, display styles and key-image grabbing are placeholders with
// empty bodies, so that the window links, until this part of the window is written.
#include <Xm/ToggleB.h>
#include <Xm/Xm.h>

#include <cstdlib>
#include <string>

#include "model/KLKeySet.h"
#include "toolkit/KLFilePath.h"
#include "toolkit/KLString.h"
#include "toolkit/xm/KLFileManager.h"
#include "window/Gnome.h"
#include "window/KeysetFileManager.h"
#include "workspace/Imp.h"

namespace {
void set_label(const char* name, const std::string& text) {
    Widget w = KLXmGnome::FindWidget(name);
    if (!w)
        return;
    XmString s = XmStringCreateLocalized(const_cast<char*>(text.c_str()));
    XtVaSetValues(w, XmNlabelString, s, nullptr);
    XmStringFree(s);
}
}  // namespace

int Gnome::GetActiveKeyset() {
    return activeKeyset;
}

void Gnome::SetActiveKeyset(int index) {
    ShowKeySet(index);
}

void Gnome::ShowKeySet(int k) {
    activeKeyset = k;
    shownKeyset = theImp.GetKeySet(k);
    for (int i = 0; i < kMaxKeysets; i++)
        if (keysetMenuEntries[i])
            XmToggleButtonSetState(keysetMenuEntries[i], i == k, False);
    const char* name = shownKeyset ? shownKeyset->Name() : nullptr;
    set_label("keyVuLabel", name ? KLFmt("%s:", name) : std::string("Keyset:"));
    set_label("infoKeysetTitle", name ? std::string(name) : std::string("No Keyset Loaded"));
    // The window's title names the active keyset, so that it shows in the task bar too.
    if (Widget shell = AppShell()) {
        std::string title = name ? KLFmt("Chirrup: %s", name) : std::string("Chirrup");
        XtVaSetValues(shell, XmNtitle, title.c_str(), nullptr);
    }
}

void Gnome::DressKeysetMenu() {
    Widget menu = FindWidget("keySetsMenu");
    EmptyMenu(menu, 0);
    for (Widget& entry : keysetMenuEntries)
        entry = nullptr;
    for (int i = 0; i < theImp.keysetCount && i < kMaxKeysets; i++) {
        KLKeySet* set = theImp.GetKeySet(i);
        const char* name = set && set->Name() ? set->Name() : "";
        keysetMenuEntries[i] = AddMenuToggle(menu, name, select_keyset_cb, XtPointer(long(i)));
    }
}

void Gnome::ClearKeysetMenu() {
    EmptyMenu(FindWidget("keySetsMenu"), 0);
    for (Widget& entry : keysetMenuEntries)
        entry = nullptr;
}

void Gnome::select_keyset_cb(Widget w, XtPointer clientData, XtPointer) {
    Gnome* g = TheGnome();
    if (!g)
        return;
    set_label("infoKeysetTitle", XtName(w));
    g->SetActiveKeyset(int(long(clientData)));
    theImp.PrepareKeyFrames(g->activeKeyset);
}

void Gnome::PostLoadKeyset(const char* path) {
    if (!path || !AppContext())
        return;
    // The name is kept until the work procedure has run.
    XtAppAddWorkProc(AppContext(), loadkeyset_workproc, KLNewString(path));
}

Boolean Gnome::loadkeyset_workproc(XtPointer data) {
    char* path = static_cast<char*>(data);
    Gnome* g = TheGnome();
    if (g && g->keysetManager && path) {
        std::string full = KLFilePath::Join(theImp.GetDataDirectory(), path);
        g->keysetManager->RetrieveFile(full.c_str());
    }
    delete[] path;
    return True;
}

void Gnome::InitKeyset(int index) {
    DressKeyset(index);
}
void Gnome::DressKeyset(int) {}
void Gnome::ClearKeysets(int) {}
void Gnome::ClearKeyTracks() {}
void Gnome::InitSound(CueSound*) {}
void Gnome::InitMarkTrack(KLMarkTrack*) {}
void Gnome::MakeKeysetImages() {}
void Gnome::update_keyset_tiles() {}
void Gnome::DisplayKeyShapeImages(int, int, float) {}
void Gnome::set_static_keytracks(void*) {}
void Gnome::clear_static_keytracks(void*) {}
void Gnome::TileButtonDown(Widget, XtPointer, XtPointer) {}
void Gnome::TileButtonClick2(Widget, XtPointer, XtPointer) {}
void Gnome::display_style_cb(Widget, XtPointer, XtPointer) {}
