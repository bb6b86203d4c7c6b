// Not built yet: these operations are placeholders with empty bodies, so that the window
// links; they do nothing until this part of the window is written.
#include "window/Gnome.h"

void Gnome::create_link_dialog() {}
void Gnome::update_link_dialog(KLKeySet*, CueRecognizer*) {}
void Gnome::update_target_lister(CueRecognizer*) {}
void Gnome::update_keyshape_lister(KLKeySet*) {}
void Gnome::select_target_cb(Widget, XtPointer, XtPointer) {}
void Gnome::select_keyshape_cb(Widget, XtPointer, XtPointer) {}
void Gnome::link_link_cb(Widget, XtPointer, XtPointer) {}
void Gnome::link_audition_cb(Widget, XtPointer, XtPointer) {}
void Gnome::link_done_cb(Widget, XtPointer, XtPointer) {}
