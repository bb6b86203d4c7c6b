// Imp: construction, the accessors and small operations, and the emergency save.
#include "workspace/Imp.h"

#include <csignal>
#include <cstdlib>
#include <cstring>
#include <iostream>

#include "model/KLEdlEvent.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "model/KLMarkTrack.h"
#include "model/KLTrackPreview.h"
#include "scene/KLKeyFrameList.h"
#include "scene/KLScene.h"
#include "scene/KLWireSource.h"
#include "toolkit/CueSound.h"
#include "toolkit/KLImageSGI.h"
#include "toolkit/KLString.h"
#include "toolkit/KLSoundControl.h"
#include "toolkit/OnSignal.h"
#include "workspace/ConsoleGhost.h"
#include "workspace/Ghost.h"

Imp theImp;

namespace {
// The signals that trigger the emergency save, in the order they are installed: segmentation
// violation, bad system call, termination, bus error, floating-point exception, trap (the
// nearest Linux has to an emulator trap), abort and illegal instruction; then the two user
// signals, whose default action also ends the program without a word.
const int kCrashSignals[] = {SIGSEGV, SIGSYS,  SIGTERM, SIGBUS,  SIGFPE,
                             SIGTRAP, SIGABRT, SIGILL,  SIGUSR2, SIGUSR1};
}  // namespace

Imp::Imp() {
    KLSoundControl::DisableAudioLibraryErrors();
    // The display settings reach the scene again at the next keyset clear or load, once the
    // entry has set the tesselation levels.
    scene = make_scene();
    duration = CueTime(0, 0, 5, 0, 0);
    for (int sig : kCrashSignals)
        OnSignal(sig, &Imp::save_on_crash, nullptr);
}

Imp::~Imp() {
    // Keysets own recognizers whose code may live in plug-ins that the catalogue unloads when
    // it goes: tracks and keysets go first.
    for (int i = 0; i < kMaxKeysets; ++i) {
        keyTracks[i].reset();
        keySets[i].reset();
    }
}

std::unique_ptr<KLScene> Imp::make_scene() {
    auto made = std::make_unique<KLScene>();
    if (evaluateDags)
        made->EvaluateDags();
    else
        made->DontEvaluateDags();
    made->SetDetail(tessU, tessV);
    // The views preview every keyset's track as apply would write it.
    made->SetPoseSource(std::make_unique<KLTrackPreview>([this]() {
        std::vector<KLKeyTrack*> tracks;
        for (int i = 0; i < keysetCount; ++i)
            tracks.push_back(keyTracks[i].get());
        return tracks;
    }));
    return made;
}

void Imp::Inform(const char* message, const char* button) {
    if (batchMode)
        ConsoleGhost::Instance().Inform(message, button);
    else
        theGhost->Inform(message, button);
}

int Imp::Confirm(const char* message, const char* yes, const char* no) {
    if (batchMode)
        return ConsoleGhost::Instance().Confirm(message, yes, no);
    return theGhost->Confirm(message, yes, no);
}

void Imp::report(const std::string& message) {
    if (batchMode)
        std::cerr << message << std::endl;
    else
        theGhost->Inform(message.c_str(), "Dismiss");
}

void Imp::SetFps(int n) {
    if (n > kMaxFps) {
        const std::string message = KLFmt(
            "Frame rate %d is above the highest supported, %d: %d is used.", n, kMaxFps, kMaxFps);
        if (batchMode || !theGhost)
            std::cerr << message << std::endl;
        else
            report(message);
        n = kMaxFps;
    }
    fps = n > 0 ? n : CueTime::kDefaultFps;
    CueTime::default_fps = fps;
}

KLKeySet* Imp::GetKeySet(int i) {
    return i >= 0 && i < keysetCount ? keySets[i].get() : nullptr;
}

KLKeySet* Imp::GetKeySet(const char* name) {
    const int id = GetKeySetId(name);
    return id == -1 ? nullptr : keySets[id].get();
}

int Imp::GetKeySetId(const char* name) {
    if (!name)
        return -1;
    for (int i = 0; i < keysetCount; ++i)
        if (keySets[i] && keySets[i]->Name() && !std::strcmp(keySets[i]->Name(), name))
            return i;
    return -1;
}

KLKeyTrack* Imp::GetKeyTrack(int i) {
    return i >= 0 && i < keysetCount ? keyTracks[i].get() : nullptr;
}

void Imp::PrepareKeyFrames(int /*unused*/) {
    for (int i = 0; i < keysetCount; ++i)
        if (keyTracks[i])
            keyTracks[i]->PrepareKeyFrames(nullptr);
}

void Imp::SetFeedback(int mode) {
    if (mode >= 0 && mode <= 3)
        feedback = mode;
    if (scene)
        scene->Feedback(feedback, nullptr);
}

void Imp::SetDuration(CueTime t) {
    requestedDuration = t;
    duration = compute_duration(t);
    theGhost->DisplayDuration(duration);
}

void Imp::SetReferenceOffset(CueTime t) {
    referenceOffset = t;
    theGhost->DisplayReferenceOffset(t);
}

void Imp::SetPlayblastOffset(CueTime t) {
    playblastOffset = t;
}

void Imp::SetErrorFilename(const char* name) {
    errorLog.reset();
    errorLog = std::make_unique<KLErrorLog>(name);
}

void Imp::ViewErrorLog() {
    if (errorLog)
        errorLog->View();
    UIClearErrorFlag();
}

void Imp::UIShowErrorFlag() {
    theGhost->ShowErrorFlag();
}
void Imp::UIClearErrorFlag() {
    theGhost->ClearErrorFlag();
}

void Imp::save_on_crash(int signal, void* /*data*/) {
    // One save at a time: a second call (a second signal, a fault inside the save) returns,
    // and its signal ends the program. The files are written through SafeFile, so that an
    // interrupted save leaves each of them complete or absent.
    static volatile std::sig_atomic_t saving = 0;
    if (saving || ::theImp.keysetCount == 0)
        return;  // the signal takes its course
    saving = 1;
    std::cerr << "EMERGENCY SAVE ON SIGNAL " << signal << " ... " << std::flush;
    ::theImp.SaveKeyset("_m.keyset");
    if (::theImp.sound)
        ::theImp.SaveTrack("_m.track");
    std::cerr << "Done." << std::endl;
    // Leave at once: after a fatal signal the program's state cannot be trusted to run the
    // static destructors.
    std::_Exit(-1);
}
