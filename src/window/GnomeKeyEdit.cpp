// The edit commands: keys added, deleted and smoothed on the chart's key track, the active
// key's value typed in, and the workspace duration asked for.
#include <Xm/TextF.h>
#include <Xm/Xm.h>

#include <cmath>
#include <cstdio>
#include <sstream>

#include "chart/KLSyncChart.h"
#include "model/KLKeyEvent.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "toolkit/KLString.h"
#include "toolkit/xm/KLImageButton.h"
#include "toolkit/xm/KLPrompt.h"
#include "window/Gnome.h"
#include "workspace/Imp.h"

namespace {
// The chart of the one window, or null.
KLSyncChart* chart() {
    Gnome* g = TheGnome();
    return g ? g->syncChart : nullptr;
}

void rebuild() {
    if (Gnome* g = TheGnome())
        theImp.PrepareKeyFrames(g->activeKeyset);
}
}  // namespace

int Gnome::CurrentKeyShape() {
    if (activeKeyset < 0 || activeKeyset >= kMaxKeysets)
        return -1;
    for (int i = 0; i < tileCount[activeKeyset]; i++)
        if (tiles[activeKeyset][i] && tiles[activeKeyset][i]->GetState())
            return i;
    return -1;
}

void Gnome::HighlightKeyframe(int index) {
    if (activeKeyset < 0 || activeKeyset >= kMaxKeysets)
        return;
    for (int i = 0; i < tileCount[activeKeyset]; i++) {
        KLImageButton* b = tiles[activeKeyset][i];
        if (!b)
            continue;
        if (i == index)
            b->SetState(1);
        else if (b->GetState())
            b->SetState(0);
    }
}

void Gnome::SetKeyValue(float value) {
    if (Widget field = FindWidget("valTypein"))
        XmTextFieldSetString(field, const_cast<char*>(KLFmt("%g", double(value)).c_str()));
}

void Gnome::ActivateKeyValue(int sensitive) {
    for (const char* name : {"valTypein", "valLabel"})
        if (Widget w = FindWidget(name))
            XtSetSensitive(w, sensitive ? True : False);
}

void Gnome::add_key(int index) {
    KLKey* key = shownKeyset ? shownKeyset->GetKeyShape(index) : nullptr;
    if (!syncChart || !key)
        return;
    if (syncChart->AddKeyframe(index, key, 1) && theImp.beep)
        if (Display* dpy = GetDisplay())
            XBell(dpy, 0);
    theImp.PrepareKeyFrames(activeKeyset);
}

void Gnome::add_keyframe_cb(Widget, XtPointer, XtPointer) {
    Gnome* g = TheGnome();
    if (!g)
        return;
    int index = g->CurrentKeyShape();
    if (index >= 0)
        g->add_key(index);
}

void Gnome::delete_keyframe_cb(Widget, XtPointer, XtPointer) {
    if (KLSyncChart* c = chart()) {
        c->DeleteActiveKeyframe();
        rebuild();
    }
}

void Gnome::delete_keyframe_region_cb(Widget, XtPointer, XtPointer) {
    if (KLSyncChart* c = chart()) {
        c->DeleteActiveKeyframeRegion();
        rebuild();
    }
}

void Gnome::linear_keyframe_cb(Widget, XtPointer, XtPointer) {
    if (KLSyncChart* c = chart()) {
        c->SetRegionSmoothing(KLKeyEvent::kLinear);
        rebuild();
    }
}

void Gnome::ease_keyframe_cb(Widget, XtPointer, XtPointer) {
    if (KLSyncChart* c = chart()) {
        c->SetRegionSmoothing(KLKeyEvent::kEase);
        rebuild();
    }
}

void Gnome::smooth_keyframe_cb(Widget, XtPointer, XtPointer) {
    if (KLSyncChart* c = chart()) {
        c->SetRegionSmoothing(KLKeyEvent::kSmooth);
        rebuild();
    }
}

// One number and an active key: the key's new value. Anything else is left as typed.
void Gnome::val_typein_cb(Widget, XtPointer, XtPointer) {
    Widget field = FindWidget("valTypein");
    KLSyncChart* c = chart();
    if (!field || !c)
        return;
    char* text = XmTextFieldGetString(field);
    float value = 0.0f;
    int read = text ? std::sscanf(text, "%f", &value) : 0;
    XtFree(text);
    // A value that is not finite ("nan", "1e40" as a float) would spoil the track: ignored.
    if (read != 1 || !std::isfinite(value) || !c->activeKey)
        return;
    c->activeKey->value = value;
    c->needRedraw = true;
    if (c->keyTrack)
        c->keyTrack->PrepareKeyFrames(nullptr);
    c->UpdateDisplay();
}

void Gnome::set_duration_cb(Widget, XtPointer, XtPointer) {
    Gnome* g = TheGnome();
    if (!g || !g->prompt)
        return;
    std::ostringstream current;
    theImp.duration.Write(current);  // the text form, or the binary form in binary mode
    if (!g->prompt->Prompt("Enter New Duration:", current.str().c_str()))
        return;
    const char* answer = g->prompt->ResponseText();
    if (!answer || !*answer)
        return;
    CueTime t;
    std::istringstream in(answer);
    if (t.Read(in))
        theImp.SetDuration(t);
}
