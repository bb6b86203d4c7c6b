// The transport: passes over the chart's region with sound, the work procedure that moves
// the display to the timer's position, and GoToTime, the one way the indicator jumps.
#include <Xm/Xm.h>
#include <poll.h>

#include <algorithm>
#include <chrono>
#include <thread>

#include "chart/KLSyncChart.h"
#include "model/KLKey.h"
#include "model/KLKeyEvent.h"
#include "model/KLKeyTrack.h"
#include "toolkit/KLImageSGI.h"
#include "toolkit/KLSoundControl.h"
#include "toolkit/KLTimer.h"
#include "toolkit/KLTimerBeat.h"
#include "toolkit/MonotonicClock.h"
#include "toolkit/xm/KLImageView.h"
#include "window/Gnome.h"
#include "window/PlaybackPass.h"
#include "workspace/Imp.h"

#include "scene/gl/KLSceneView.h"

namespace {
// The display is updated at most this often during playback (about once per display frame).
constexpr double kFrameSeconds = 1.0 / 120;

void set_views_playing(Gnome* g, int playing) {
    for (KLSceneView* view : {g->keyScene, g->mixScene})
        if (view)
            view->playing = playing;
}
}  // namespace

void Gnome::play_forward_cb(Widget, XtPointer, XtPointer) {
    TheGnome()->PlayForward();
}
void Gnome::play_reverse_cb(Widget, XtPointer, XtPointer) {
    TheGnome()->PlayReverse();
}
void Gnome::fast_forward_cb(Widget, XtPointer, XtPointer) {
    TheGnome()->FastForward();
}
void Gnome::fast_reverse_cb(Widget, XtPointer, XtPointer) {
    TheGnome()->FastReverse();
}
void Gnome::play_stop_cb(Widget, XtPointer, XtPointer) {
    TheGnome()->PlayStop();
}
void Gnome::play_forward_save_cb(Widget, XtPointer, XtPointer) {
    TheGnome()->PlayForwardSave();
}

void Gnome::change_speed_cb(Widget w, XtPointer clientData, XtPointer) {
    XtPointer user = nullptr;
    XtVaGetValues(w, XmNuserData, &user, nullptr);
    if (auto* g = static_cast<Gnome*>(user))
        g->playSpeed = PlaybackPass::MenuSpeed(int(long(clientData)), g->playSpeed);
}

void Gnome::change_repeat_cb(Widget w, XtPointer clientData, XtPointer) {
    XtPointer user = nullptr;
    XtVaGetValues(w, XmNuserData, &user, nullptr);
    if (auto* g = static_cast<Gnome*>(user))
        g->repeatMode = int(long(clientData));
}

// The four passes differ in direction and speed only.
void Gnome::start_pass(bool reverse, float speed) {
    if (soundPlaying || playTimer || !syncChart)
        return;  // a press while playing is ignored
    CueTime start, end;
    syncChart->GetRegionRange(start, end);
    if (reverse)
        std::swap(start, end);
    playbackWorkProc = XtAppAddWorkProc(AppContext(), playback_workproc, this);
    nextFrame = 0.0;
    begin_playback(start, PlaybackPass::StretchedEnd(start, end, speed), speed);
}

void Gnome::PlayForward() {
    start_pass(false, playSpeed);
}
void Gnome::PlayReverse() {
    start_pass(true, playSpeed);
}
void Gnome::FastForward() {
    start_pass(false, PlaybackPass::FastSpeed(playSpeed));
}
void Gnome::FastReverse() {
    start_pass(true, PlaybackPass::FastSpeed(playSpeed));
}

void Gnome::PlayStop() {
    if (!soundPlaying && !playTimer)
        return;
    stopRequested = 1;
}

void Gnome::play_finish_cb(KLTimer*, void* gnome) {
    static_cast<Gnome*>(gnome)->soundPlaying = 0;
}

void Gnome::begin_playback(CueTime from, CueTime to, float speed) {
    if (speed == 0.0f)
        speed = 1.0f;
    playFrom = from;
    playTo = to;
    passSpeed = speed;
    soundPlaying = 1;
    stopRequested = 0;
    playTimer = std::make_unique<KLTimer>(from, to);
    playTimer->post_trigger(play_finish_cb, this, to);
    if (theImp.sound) {
        KLSoundControl::PlaySpeed(speed);
        KLSoundControl::Play(theImp.sound.get(), playTimer.get(), CueTime());
    }
    if (shownKeyset)
        if (KLKeyTrack* track = theImp.GetKeyTrack(activeKeyset)) {
            // Over the region the pass shows, whichever way it runs.
            CueTime last = PlaybackPass::Position(from, to, speed);
            track->PrepareFastAccess(std::min(from, last), std::max(from, last));
        }
    KLTimerBeat::start();
    playTimer->start();
    set_views_playing(this, 1);
}

void Gnome::end_playback() {
    if (playTimer)
        playTimer->stop();
    KLTimerBeat::stop();
    KLSoundControl::Stop();
    // A tenth of a second for the sound and the beat to settle, as the sound device drains.
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
    playTimer.reset();
    if (shownKeyset)
        if (KLKeyTrack* track = theImp.GetKeyTrack(activeKeyset))
            track->FinishFastAccess();
    set_views_playing(this, 0);
}

Boolean Gnome::playback_workproc(XtPointer gnome) {
    auto* g = static_cast<Gnome*>(gnome);
    if (!g->playTimer) {
        g->playbackWorkProc = 0;
        return True;
    }
    const CueTime position =
        PlaybackPass::Position(g->playFrom, g->playTimer->Current(), g->passSpeed);
    if (g->stopRequested || (!g->soundPlaying && !g->repeatMode)) {
        g->stopRequested = 0;
        g->soundPlaying = 0;
        g->GoToTime(position);
        g->end_playback();
        if (g->syncChart)
            g->DisplayTimecode(g->syncChart->GetIndicatorTime());
        g->playbackWorkProc = 0;
        return True;
    }
    if (!g->soundPlaying) {
        // The pass ended and repeat is on: the same pass again, with its sound.
        g->GoToTime(position);
        g->end_playback();
        g->begin_playback(g->playFrom, g->playTo, g->passSpeed);
        return False;
    }
    // Paced to the display: wait for the next frame time, but wake for any X event so that
    // the stop button and the pointer stay live; never spin.
    const double now = MonotonicSeconds();
    if (now < g->nextFrame) {
        pollfd x{ConnectionNumber(GetDisplay()), POLLIN, 0};
        if (!XtAppPending(AppContext()))
            poll(&x, 1, std::max(1, int((g->nextFrame - now) * 1000)));
        return False;
    }
    g->nextFrame = std::max(g->nextFrame + kFrameSeconds, now);
    g->GoToTime(position);
    return False;
}

// The mix view and the key view (its scene, or the key images around `t`) at time `t`.
void Gnome::show_views_at(CueTime t) {
    if (mixViewOn && theImp.geometryActive && mixScene) {
        mixScene->time = t;
        mixScene->Draw();
    }
    if (shownKeyset && keyViewOn) {
        if (keyViewMode == 1 && theImp.geometryActive) {
            if (keyScene) {
                keyScene->time = t;
                keyScene->Draw();
            }
        } else if (KLKeyTrack* track = theImp.GetKeyTrack(activeKeyset)) {
            KLKeyEvent* prev = nullptr;
            KLKeyEvent* next = nullptr;
            float fraction = track->bracket_keys_from_time(t, &prev, &next);
            show_key_images(prev ? prev->key : nullptr, next ? next->key : nullptr, prev != nullptr,
                            next != nullptr, fraction);
        }
    }
}

void Gnome::GoToTime(CueTime t) {
    if (syncChart)
        syncChart->SetIndicatorTime(t);
    show_views_at(t);
    DisplayReference(t);
    if (soundPlaying)
        stopWatch.Mark();
}

void Gnome::show_key_images(KLKey* prev, KLKey* next, bool hasPrev, bool hasNext, float fraction) {
    if (!keyImageView)
        return;
    KeyImageChoice c = KeyImageChoice::Choose(displayStyle, hasPrev, hasNext, fraction);
    switch (c.show) {
        case KeyImageChoice::kNone:
            keyImageView->SetImage(nullptr);
            break;
        case KeyImageChoice::kPrev:
            keyImageView->SetImage(prev ? prev->GetImage() : nullptr);
            break;
        case KeyImageChoice::kNext:
            keyImageView->SetImage(next ? next->GetImage() : nullptr);
            break;
        case KeyImageChoice::kDissolve:
            keyImageView->SetImages(prev ? prev->GetImage() : nullptr,
                                    next ? next->GetImage() : nullptr, c.fade);
            break;
    }
}

void Gnome::PlayForwardSave() {
    if (soundPlaying || playTimer || !syncChart)
        return;
    CueTime start, end;
    syncChart->GetRegionRange(start, end);
    const int frames = std::max(0, PlaybackPass::RegionFrames(start, end));
    // The playblast table: one picture per frame, filled as the mix view draws each frame.
    // The reference view lets go of the old table's picture first.
    if (refImageView)
        refImageView->SetImage(nullptr);
    theImp.playblastImages = std::make_unique<std::unique_ptr<KLImageSGI>[]>(size_t(frames));
    theImp.playblastCount = frames;
    Widget mixScn = FindWidget("mixScn");
    Widget mixFake = FindWidget("mixFake");
    if (mixScn)
        XtManageChild(mixScn);
    if (mixFake)
        XtUnmanageChild(mixFake);
    if (theImp.geometryActive)
        for (int i = 0; i < frames; i++) {
            CueTime t = start + CueTime(double(i), 0);
            GoToTime(t);
            DisplayTimecode(t);
            grab_playblast_frame(i);
        }
    if (theImp.geometryActive && frames > 0)
        show_playblast(start);
    if (!mixViewOn) {
        if (mixFake)
            XtManageChild(mixFake);
        if (mixScn)
            XtUnmanageChild(mixScn);
    }
}

void Gnome::halt_playback() {
    if (!playTimer && !soundPlaying)
        return;
    if (playbackWorkProc)
        XtRemoveWorkProc(playbackWorkProc);
    playbackWorkProc = 0;
    stopRequested = 0;
    soundPlaying = 0;
    end_playback();
}
