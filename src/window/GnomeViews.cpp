// The key and mix 3D views: camera drags at a rate, look-at, feedback styles, the geometry
// and view choices, the key view's stored camera, and the key-shape pictures grabbed from the
// key view.
#include <X11/cursorfont.h>
#include <Xm/ToggleB.h>
#include <Xm/Xm.h>

#include <algorithm>
#include <memory>

#include "model/KLKey.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "scene/KLScene.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLImageSGI.h"
#include "toolkit/xm/KLAlert.h"
#include "toolkit/xm/KLImageView.h"
#include "window/Gnome.h"
#include "workspace/Imp.h"

#include "scene/gl/KLSceneView.h"

namespace {
// The mouse button of a button event, else 0.
int event_button(XtPointer callData) {
    const auto* cbs = static_cast<XmAnyCallbackStruct*>(callData);
    if (!cbs || !cbs->event)
        return 0;
    const int type = cbs->event->type;
    return type == ButtonPress || type == ButtonRelease ? int(cbs->event->xbutton.button) : 0;
}

int callback_reason(XtPointer callData) {
    const auto* cbs = static_cast<XmAnyCallbackStruct*>(callData);
    return cbs ? cbs->reason : 0;
}

// The window that shows a widget or gadget.
Window window_of(Widget w) {
    return XtIsWidget(w) ? XtWindow(w) : XtWindow(XtParent(w));
}
}  // namespace

void Gnome::dress_scene_views() {
    if (keyScene)
        keyScene->SetEvaluationHooks(set_static_keytracks, clear_static_keytracks, this);
    AddCallback("showTextures", XmNvalueChangedCallback, show_textures_cb, nullptr);
    if (Widget w = FindWidget("showTextures"))
        XmToggleButtonSetState(w, True, False);
}

void Gnome::show_textures_cb(Widget w, XtPointer, XtPointer) {
    Gnome* g = TheGnome();
    if (!g)
        return;
    const int on = XmToggleButtonGetState(w) ? 1 : 0;
    for (KLSceneView* view : {g->keyScene, g->mixScene}) {
        if (view) {
            view->showTextures = on;
            view->Draw();
        }
    }
}

// Look-at: the stored camera of the view when it has one, else the subject's bounding box at
// the view's time, seen from the camera's direction.
void Gnome::CenterKeyView() {
    if (keyScene && keyScene->GetScene()) {
        keyScene->LookAt();
        keyScene->Draw();
    }
}

void Gnome::CenterMixView() {
    if (mixScene && mixScene->GetScene()) {
        mixScene->LookAt();
        mixScene->Draw();
    }
}

void Gnome::ClearViews() {
    shownKeyset = nullptr;
    if (keyImageView)
        keyImageView->SetImage(nullptr);
    for (KLSceneView* view : {keyScene, mixScene}) {
        if (view) {
            view->SetScene(nullptr);
            view->Draw();
        }
    }
}

// One camera step: the pointer's offset from the anchor, locked to one axis by the middle
// (horizontal) and right (vertical) buttons, turns, zooms or pans the view.
void Gnome::do_one_tumble(int view) {
    KLSceneView* scene = view == 1 ? keyScene : mixScene;
    Display* display = XtDisplay(topShell);
    Window root, child;
    int rootX = 0, rootY = 0, winX = 0, winY = 0;
    unsigned int mask = 0;
    if (!XQueryPointer(display, XtWindow(topShell), &root, &child, &rootX, &rootY, &winX, &winY,
                       &mask))
        return;
    dragDX = rootX - anchorX;
    dragDY = rootY - anchorY;
    if (dragButton == 2)
        dragDY = 0;
    else if (dragButton == 3)
        dragDX = 0;
    if (!scene)
        return;
    switch (dragMode) {
        case 0:
            scene->CameraTumble(float(dragDX), float(dragDY), (mask & ShiftMask) ? 1 : 0);
            break;
        case 1:
            scene->CameraZoom(float(dragDX), float(dragDY));
            break;
        default:
            scene->CameraMove(float(dragDX), float(dragDY));
            break;
    }
    scene->Draw();
}

Boolean Gnome::tumble_workproc(XtPointer view) {
    if (Gnome* g = TheGnome())
        g->do_one_tumble(int(long(view)));
    return False;  // runs until the disarm removes it
}

void Gnome::camera_drag(Widget w, XtPointer clientData, XtPointer callData, int view) {
    const int button = event_button(callData);
    const int reason = callback_reason(callData);
    Display* display = XtDisplay(topShell);
    if (reason == XmCR_ARM) {
        if (dragging)
            return;  // a second button neither starts a drag nor ends the first
        dragButton = button;
        dragMode = int(long(clientData));
        if (!soundPlaying) {
            const XtWorkProcId id =
                XtAppAddWorkProc(AppContext(), tumble_workproc, XtPointer(long(view)));
            XtVaSetValues(w, XmNuserData, XtPointer(id), nullptr);
        }
        static Cursor cursor = XCreateFontCursor(display, XC_fleur);
        XDefineCursor(display, window_of(w), cursor);
        Screen* screen = XtScreen(topShell);
        anchorX = WidthOfScreen(screen) / 2;
        anchorY = HeightOfScreen(screen) / 2;
        XWarpPointer(display, None, RootWindowOfScreen(screen), 0, 0, 0, 0, anchorX, anchorY);
        dragDX = dragDY = 0;
        dragging = 1;
    } else if (reason == XmCR_DISARM && dragging && button == dragButton) {
        dragButton = 0;
        Dimension width = 0, height = 0;
        XtVaGetValues(w, XmNwidth, &width, XmNheight, &height, nullptr);
        Position x = 0, y = 0;
        XtTranslateCoords(w, Position(width / 2), Position(height / 2), &x, &y);
        XWarpPointer(display, None, RootWindowOfScreen(XtScreen(topShell)), 0, 0, 0, 0, x, y);
        XtPointer id = nullptr;
        XtVaGetValues(w, XmNuserData, &id, nullptr);
        if (id) {
            XtRemoveWorkProc(XtWorkProcId(id));
            XtVaSetValues(w, XmNuserData, XtPointer(nullptr), nullptr);
        }
        XFlush(display);
        XUndefineCursor(display, window_of(w));
        if (KLSceneView* scene = view == 1 ? keyScene : mixScene)
            scene->CameraEnd();
        dragging = 0;
    }
}

void Gnome::tumble_key_cb(Widget w, XtPointer clientData, XtPointer callData) {
    if (Gnome* g = TheGnome())
        g->camera_drag(w, clientData, callData, 1);
}

void Gnome::tumble_mix_cb(Widget w, XtPointer clientData, XtPointer callData) {
    if (Gnome* g = TheGnome())
        g->camera_drag(w, clientData, callData, 0);
}

void Gnome::key_vu_lookat_cb(Widget, XtPointer, XtPointer) {
    if (Gnome* g = TheGnome())
        g->CenterKeyView();
}

void Gnome::mix_vu_lookat_cb(Widget, XtPointer, XtPointer) {
    if (Gnome* g = TheGnome())
        g->CenterMixView();
}

// The four feedback toggles act as one radio group; the style goes to the workspace's scene.
void Gnome::feedback_cb(Widget w, XtPointer, XtPointer) {
    Gnome* g = TheGnome();
    if (!g)
        return;
    if (g->informationAlert)
        g->informationAlert->Show("Changing feedback ...");
    const char* names[] = {"points", "lines", "polygons", "polygonsboth"};
    int mode = 2;
    for (int i = 0; i < 4; i++) {
        Widget toggle = FindWidget(names[i]);
        if (toggle == w)
            mode = i;
        if (toggle)
            XmToggleButtonSetState(toggle, toggle == w, False);
    }
    theImp.SetFeedback(mode);
    for (KLSceneView* view : {g->keyScene, g->mixScene})
        if (view)
            view->Draw();
    if (g->informationAlert)
        g->informationAlert->Hide();
}

void Gnome::load_geometry_cb(Widget w, XtPointer, XtPointer) {
    Gnome* g = TheGnome();
    if (!g)
        return;
    if (!g->geometryInformed) {
        g->geometryInformed = 1;
        g->Inform("This change will take effect when the next keyset is loaded.", "Dismiss");
    }
    theImp.loadGeometry = XmToggleButtonGetState(w) ? 1 : 0;
}

// The key view's stored camera: keyVuSet keeps the key view's camera as it is now; from then
// on look-at (also the one after every keyset load) returns the key view to it and the
// key-shape pictures are grabbed through it. keyVuClear forgets it: look-at frames the
// subject again.
void Gnome::key_view_set_cb(Widget, XtPointer, XtPointer) {
    Gnome* g = TheGnome();
    if (g && g->keyScene)
        g->keyScene->StoreCamera();
}

void Gnome::key_view_clear_cb(Widget, XtPointer, XtPointer) {
    Gnome* g = TheGnome();
    if (g && g->keyScene)
        g->keyScene->ForgetCamera();
}

// Draws every key shape of the active keyset from the key view, the other keysets at their
// default shapes, as the key shape's picture.
void Gnome::MakeKeysetImages() {
    if (!theImp.geometryActive || activeKeyset < 0 || !shownKeyset || !keyScene)
        return;
    KLKeyTrack* track = theImp.GetKeyTrack(activeKeyset);
    if (!track)
        return;
    // Through the status hook, so that "Ready." follows once the window is idle again.
    status_hook("Grabbing key images; please wait...", this);
    track->PrepareVuKeyFrames(nullptr);
    const CueTime shown = keyScene->time;
    for (int i = 0; i < shownKeyset->keyShapeCount; i++) {
        KLKey* key = shownKeyset->GetKeyShape(i);
        set_static_keytracks(this);
        keyScene->time = CueTime::FromFrames(key->frame);
        std::unique_ptr<KLImageSGI> picture =
            keyScene->DrawPix(KLKey::kImageWidth, KLKey::kImageHeight);
        clear_static_keytracks(this);
        if (picture) {
            key->SetImage(picture.release());
            shownKeyset->imagesChanged = 1;
        }
    }
    keyScene->time = shown;
    update_keyset_tiles();
    theImp.PrepareKeyFrames(activeKeyset);
    keyScene->Draw();
}

void Gnome::grab_playblast_frame(int i) {
    if (!mixScene || i < 0 || i >= theImp.playblastCount || !theImp.playblastImages)
        return;
    Dimension width = 0, height = 0;
    XtVaGetValues(mixScene->GetWidget(), XmNwidth, &width, XmNheight, &height, nullptr);
    theImp.playblastImages[size_t(i)] =
        mixScene->DrawPix(std::max<int>(width, 1), std::max<int>(height, 1));
}

void Gnome::show_playblast(CueTime start) {
    theImp.playblastOffset = start;
    theImp.playblastLoaded = 1;
    toggle_ref_view_cb(nullptr, XtPointer(1), nullptr);
    DisplayReference(start);
}

// View choices: each sets the view fields, then the window manages the right alternative.
void Gnome::toggle_key_view_cb(Widget, XtPointer clientData, XtPointer) {
    Gnome* g = TheGnome();
    if (!g)
        return;
    const int entry = int(long(clientData));
    if (entry == 0) {
        g->keyViewOn = 0;
    } else {
        g->keyViewOn = 1;
        g->keyViewMode = entry == 1 ? 1 : 0;
    }
    g->SetViewStatus();
}

void Gnome::toggle_mix_view_cb(Widget, XtPointer clientData, XtPointer) {
    Gnome* g = TheGnome();
    if (!g)
        return;
    g->mixViewOn = int(long(clientData)) == 1 ? 0 : 1;
    g->SetViewStatus();
}

void Gnome::toggle_ref_view_cb(Widget, XtPointer clientData, XtPointer) {
    Gnome* g = TheGnome();
    if (!g)
        return;
    switch (int(long(clientData))) {
        case 0:
            g->refViewOn = 1;
            g->playblastViewOn = 0;
            if (g->refImageView)
                g->refImageView->SetZoom(theImp.referenceZoom);
            break;
        case 1:
            g->refViewOn = 0;
            g->playblastViewOn = 1;
            if (g->refImageView)
                g->refImageView->SetZoom(1);
            break;
        default:
            g->refViewOn = 0;
            g->playblastViewOn = 0;
            break;
    }
    g->SetViewStatus();
}
