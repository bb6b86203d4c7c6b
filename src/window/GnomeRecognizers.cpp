// Not built yet: these operations are placeholders with empty bodies, so that the window
// links; they do nothing until this part of the window is written.
#include "window/Gnome.h"

void Gnome::ShowRecognizerGui(CueRecognizer*) {}
void Gnome::load_recognizers() {}
void Gnome::dress_recognizer_menu() {}
void Gnome::dress_recognizer_widgets() {}
void Gnome::update_recognizer_dialogs() {}
void Gnome::stash_recognizer_widget(const char*, const char*, Widget, void*) {}
Widget Gnome::find_recognizer_widget(const char*, const char*, void**) {
    return nullptr;
}
void Gnome::UpdateDisplay() {}
void Gnome::create_recognize_cb(Widget, XtPointer, XtPointer) {}
void Gnome::configure_cb(Widget, XtPointer, XtPointer) {}
void Gnome::recognize_cb(Widget, XtPointer, XtPointer) {}
void Gnome::dismiss_cb(Widget, XtPointer, XtPointer) {}
