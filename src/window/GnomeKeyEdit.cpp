// Not built yet: these operations are placeholders with empty bodies, so that the window
// links; they do nothing until this part of the window is written.
#include "window/Gnome.h"

int Gnome::CurrentKeyShape() {
    return -1;
}
void Gnome::HighlightKeyframe(int) {}
void Gnome::SetKeyValue(float) {}
void Gnome::ActivateKeyValue(int) {}
void Gnome::add_keyframe_cb(Widget, XtPointer, XtPointer) {}
void Gnome::delete_keyframe_cb(Widget, XtPointer, XtPointer) {}
void Gnome::delete_keyframe_region_cb(Widget, XtPointer, XtPointer) {}
void Gnome::linear_keyframe_cb(Widget, XtPointer, XtPointer) {}
void Gnome::ease_keyframe_cb(Widget, XtPointer, XtPointer) {}
void Gnome::smooth_keyframe_cb(Widget, XtPointer, XtPointer) {}
void Gnome::val_typein_cb(Widget, XtPointer, XtPointer) {}
void Gnome::set_duration_cb(Widget, XtPointer, XtPointer) {}
