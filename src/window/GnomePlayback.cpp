// Not built yet: these operations are placeholders with empty bodies, so that the window
// links; they do nothing until this part of the window is written.
#include "window/Gnome.h"

#include "toolkit/KLTimer.h"

void Gnome::PlayForward() {}
void Gnome::PlayReverse() {}
void Gnome::FastForward() {}
void Gnome::FastReverse() {}
void Gnome::PlayStop() {}
void Gnome::PlayForwardSave() {}
void Gnome::begin_playback(CueTime, CueTime, float) {}
void Gnome::end_playback() {}
void Gnome::GoToTime(CueTime) {}
Boolean Gnome::playback_workproc(XtPointer) {
    return True;
}
void Gnome::play_finish_cb(KLTimer*, void*) {}
void Gnome::play_forward_cb(Widget, XtPointer, XtPointer) {}
void Gnome::play_reverse_cb(Widget, XtPointer, XtPointer) {}
void Gnome::fast_forward_cb(Widget, XtPointer, XtPointer) {}
void Gnome::fast_reverse_cb(Widget, XtPointer, XtPointer) {}
void Gnome::play_stop_cb(Widget, XtPointer, XtPointer) {}
void Gnome::play_forward_save_cb(Widget, XtPointer, XtPointer) {}
void Gnome::change_speed_cb(Widget, XtPointer, XtPointer) {}
void Gnome::change_repeat_cb(Widget, XtPointer, XtPointer) {}
