// The keyset panels of tiles (one image button per key shape), tile selection, the keyset
// menu, the key image view's display styles, the hooks around the key view's evaluation and
// the start-up load of a keyset.
#include <Xm/Label.h>
#include <Xm/RowColumn.h>
#include <Xm/ToggleB.h>
#include <Xm/ToggleBG.h>
#include <Xm/Xm.h>

#include <cstdlib>
#include <string>

#include "chart/KLSyncChart.h"
#include "model/KLKey.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "toolkit/KLFilePath.h"
#include "toolkit/KLImageSGI.h"
#include "toolkit/KLString.h"
#include "toolkit/xm/KLFileManager.h"
#include "toolkit/xm/KLImageButton.h"
#include "toolkit/xm/KLImageView.h"
#include "window/Gnome.h"
#include "window/KeysetFileManager.h"
#include "workspace/Imp.h"

#include "scene/gl/KLSceneView.h"

namespace {
void set_label(const char* name, const std::string& text) {
    KLXmGnome::SetLabel(KLXmGnome::FindWidget(name), text);
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
    if (syncChart)
        syncChart->SetKeyTrack(theImp.GetKeyTrack(k));
    for (int i = 0; i < kMaxKeysets; i++)
        if (tileBoxes[i]) {
            if (i == k)
                XtManageChild(tileBoxes[i]);
            else if (XtIsManaged(tileBoxes[i]))
                XtUnmanageChild(tileBoxes[i]);
        }
    update_recognizer_dialogs();
    if (theImp.geometryActive) {
        theImp.PrepareKeyFrames(k);
        for (KLSceneView* view : {keyScene, mixScene})
            if (view)
                view->SetScene(theImp.scene.get());
    }
    ShowKeyframeImage();
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
    // Only the keyset active at load had its key pictures grabbed; one shown for the first
    // time here gets them now, so that its tiles are not left black.
    if (KLKeySet* set = g->shownKeyset) {
        bool missing = false;
        for (int i = 0; i < set->keyShapeCount && !missing; i++)
            missing = !set->GetKeyShape(i)->GetImage();
        if (missing)
            g->MakeKeysetImages();
    }
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
namespace {
// The picture of tiles whose key shape has none: one blank 80 x 60 image for all of them.
KLImageSGI* blank_icon() {
    static std::unique_ptr<KLImageSGI> blank;
    if (!blank)
        blank = std::make_unique<KLImageSGI>(80, 60);
    return blank.get();
}

int read_tiles_per_row(Widget tiles) {
    int perRow = 4;
    if (tiles) {
        XtResource r = {const_cast<char*>("tilesPerRow"),
                        const_cast<char*>("TilesPerRow"),
                        XmRInt,
                        sizeof(int),
                        0,
                        XmRImmediate,
                        XtPointer(4)};
        XtGetApplicationResources(tiles, &perRow, &r, 1, nullptr, 0);
    }
    return perRow > 0 ? perRow : 4;
}

// The tile (keyset k, shape i) behind a button, as k * kMaxTiles + i; -1 when none.
int tile_of(Gnome* g, KLFiend* button) {
    for (int k = 0; k < Gnome::kMaxKeysets; k++)
        for (int i = 0; i < g->tileCount[k] && i < Gnome::kMaxTiles; i++)
            if (g->tiles[k][i] && g->tiles[k][i] == button)
                return k * Gnome::kMaxTiles + i;
    return -1;
}
}  // namespace

void Gnome::DressKeyset(int k) {
    KLKeySet* set = theImp.GetKeySet(k);
    Widget parent = FindWidget("tiles");
    if (k < 0 || k >= kMaxKeysets || !set || !parent)
        return;
    if (tilesPerRow < 0)
        tilesPerRow = read_tiles_per_row(parent);
    if (tileBoxes[k])
        XtDestroyWidget(tileBoxes[k]);  // a keyset loaded again: its old panel goes
    Widget box = XmCreateRowColumn(parent, const_cast<char*>("tileBox"), nullptr, 0);
    tileBoxes[k] = box;
    tileCount[k] = std::min(set->keyShapeCount, int(kMaxTiles));
    Widget row = nullptr;
    for (int i = 0; i < tileCount[k]; i++) {
        if (i % tilesPerRow == 0) {
            row = XmCreateRowColumn(box, const_cast<char*>("tileRow"), nullptr, 0);
            XtVaSetValues(row, XmNorientation, XmHORIZONTAL, nullptr);
            XtManageChild(row);
        }
        Widget tile = XmCreateRowColumn(row, const_cast<char*>("tile"), nullptr, 0);
        XtManageChild(tile);
        const char* name = set->GetKeyShapeName(i);
        auto* button = new KLImageButton(tile, name && *name ? name : "tileButton");
        button->SetPressCallback(TileButtonDown, this);
        button->SetDoubleClickCallback(TileButtonClick2, this);
        KLImageSGI* icon = set->GetKeyShapeIcon(i);
        button->SetImage(icon ? icon : blank_icon());
        button->SetButtonStyle(1);
        XtManageChild(button->GetWidget());
        Widget label = XmCreateLabel(tile, const_cast<char*>("tileLabel"), nullptr, 0);
        KLXmGnome::SetLabel(label, name ? name : "");
        XtManageChild(label);
        set->GetKeyShapeImage(i);  // loads the picture
        tiles[k][i] = button;
    }
    XtRealizeWidget(box);
}

void Gnome::ClearKeysets(int index) {
    halt_playback();
    for (int k = (index < 0 ? 0 : index); k < kMaxKeysets && (index < 0 || k == index); k++) {
        if (tileBoxes[k])
            XtDestroyWidget(tileBoxes[k]);  // the buttons go with their widgets
        tileBoxes[k] = nullptr;
        for (KLImageButton*& b : tiles[k])
            b = nullptr;
        tileCount[k] = 0;
    }
    if (index < 0 || index == activeKeyset) {
        activeKeyset = -1;
        shownKeyset = nullptr;
    }
}

void Gnome::ClearKeyTracks() {
    halt_playback();
    // The workspace replaces its mark track next: the chart must not draw the old one.
    if (syncChart) {
        syncChart->SetKeyTrack(nullptr);
        syncChart->SetMarkTrack(nullptr);
    }
}

void Gnome::InitSound(CueSound* sound) {
    halt_playback();
    chart_follows_workspace(false);
    if (syncChart)
        syncChart->SetSound(sound);
}

void Gnome::InitMarkTrack(KLMarkTrack* track) {
    if (syncChart)
        syncChart->SetMarkTrack(track);
}

void Gnome::update_keyset_tiles() {
    if (!shownKeyset || activeKeyset < 0 || activeKeyset >= kMaxKeysets)
        return;
    for (int i = 0; i < tileCount[activeKeyset]; i++)
        if (KLImageSGI* icon = shownKeyset->GetKeyShapeIcon(i))
            if (tiles[activeKeyset][i])
                tiles[activeKeyset][i]->SetImage(icon);
}

void Gnome::DisplayKeyShapeImages(int a, int b, float fraction) {
    if (!shownKeyset)
        return;
    KLKey* ka = shownKeyset->GetKeyShape(a);
    KLKey* kb = shownKeyset->GetKeyShape(b);
    show_key_images(ka, kb, ka != nullptr, kb != nullptr, fraction);
}

void Gnome::set_static_keytracks(void* gnome) {
    auto* g = static_cast<Gnome*>(gnome);
    for (int i = 0; i < theImp.keysetCount && i < kMaxKeysets; i++)
        if (KLKeyTrack* track = theImp.GetKeyTrack(i))
            if (!g || i != g->activeKeyset)
                track->SetStatic();
}

void Gnome::clear_static_keytracks(void*) {
    for (int i = 0; i < theImp.keysetCount && i < kMaxKeysets; i++)
        if (KLKeyTrack* track = theImp.GetKeyTrack(i))
            track->ClearStatic();
}

// Makes `pressed` the only set tile of the active keyset; returns its index (-1: not one
// of the active keyset's tiles).
int Gnome::select_tile(KLFiend* pressed) {
    int found = tile_of(this, pressed);
    int k = activeKeyset;
    if (k < 0 || k >= kMaxKeysets)
        return -1;
    int index = found >= 0 && found / kMaxTiles == k ? found % kMaxTiles : -1;
    for (int i = 0; i < tileCount[k]; i++) {
        KLImageButton* b = tiles[k][i];
        if (!b)
            continue;
        if (i == index) {
            if (!b->GetState())
                b->SetState(1);
        } else if (b->GetState()) {
            b->SetState(0);
        }
    }
    return index;
}

void Gnome::TileButtonDown(Widget, XtPointer clientData, XtPointer callData) {
    if (auto* g = static_cast<Gnome*>(clientData))
        g->select_tile(static_cast<KLFiend*>(callData));
}

void Gnome::TileButtonClick2(Widget, XtPointer clientData, XtPointer callData) {
    auto* g = static_cast<Gnome*>(clientData);
    if (!g || !g->shownKeyset)
        return;
    int index = std::max(0, g->select_tile(static_cast<KLFiend*>(callData)));
    g->add_key(index);
}

void Gnome::display_style_cb(Widget w, XtPointer clientData, XtPointer) {
    auto* g = static_cast<Gnome*>(clientData);
    if (!g)
        return;
    static const char* const names[] = {"midpoint", "keyframe", "dissolve"};
    for (int i = 0; i < 3; i++) {
        Widget toggle = FindWidget(names[i]);
        bool mine = toggle == w;
        if (toggle)
            XmToggleButtonGadgetSetState(toggle, mine, False);
        if (mine)
            g->displayStyle = i;
    }
}
