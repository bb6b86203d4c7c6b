// Partly built: ClearViews forgets the shown keyset and blanks the key image view; the camera
// drags, look-at, feedback, geometry and view-choice callbacks are placeholders with empty
// bodies, so that the window links, until this part of the window is written.
#include "toolkit/xm/KLImageView.h"
#include "window/Gnome.h"

void Gnome::ClearViews() {
    shownKeyset = nullptr;
    if (keyImageView)
        keyImageView->SetImage(nullptr);
}

void Gnome::CenterKeyView() {}
void Gnome::CenterMixView() {}
void Gnome::do_one_tumble(int) {}
Boolean Gnome::tumble_workproc(XtPointer) {
    return True;
}
void Gnome::tumble_key_cb(Widget, XtPointer, XtPointer) {}
void Gnome::tumble_mix_cb(Widget, XtPointer, XtPointer) {}
void Gnome::key_vu_lookat_cb(Widget, XtPointer, XtPointer) {}
void Gnome::mix_vu_lookat_cb(Widget, XtPointer, XtPointer) {}
void Gnome::feedback_cb(Widget, XtPointer, XtPointer) {}
void Gnome::load_geometry_cb(Widget, XtPointer, XtPointer) {}
void Gnome::toggle_key_view_cb(Widget, XtPointer, XtPointer) {}
void Gnome::toggle_mix_view_cb(Widget, XtPointer, XtPointer) {}
void Gnome::toggle_ref_view_cb(Widget, XtPointer, XtPointer) {}
void Gnome::key_view_set_cb(Widget, XtPointer, XtPointer) {}
void Gnome::key_view_clear_cb(Widget, XtPointer, XtPointer) {}
