// Imp: track files (sound, frame rate, marks, one key track per keyset, active keyset), the
// sound on its own, and the workspace duration.
#include <fstream>
#include <iostream>

#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "model/KLMarkTrack.h"
#include "toolkit/CueSound.h"
#include "toolkit/CueStatement.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLFilePath.h"
#include "toolkit/KLString.h"
#include "toolkit/SafeFile.h"
#include "workspace/Ghost.h"
#include "workspace/Imp.h"

namespace {

// The sound named by a track file, read from `path`; null with an error report when it is
// missing, unreadable or not a sound.
std::unique_ptr<CueSound> read_track_sound(const std::string& path) {
    if (!KLFilePath::Exists(path.c_str())) {
        KLError("Audio file [%s] does not exist.\n", path.c_str());
        return nullptr;
    }
    if (!KLFilePath::IsReadable(path.c_str())) {
        KLError("Audio file [%s] is unreadable.\n", path.c_str());
        return nullptr;
    }
    auto sound = std::make_unique<CueSound>(path.c_str());
    if (!sound->Valid()) {
        KLError("Audio file [%s] could not be read: %s\n", path.c_str(),
                sound->ErrorText().c_str());
        return nullptr;
    }
    if (!sound->ErrorText().empty())
        KLWarning("%s\n", sound->ErrorText().c_str());
    sound->ComputeMinMax();
    return sound;
}

}  // namespace

int Imp::LoadTrack(const char* name) {
    std::ifstream in(name ? name : "");
    if (!name || !in || KLFilePath::IsDirectory(name)) {
        report(KLFmt("Failed to open track file [%s].", name ? name : ""));
        return 0;
    }
    markTrack = std::make_unique<KLMarkTrack>();
    for (int i = 0; i < keysetCount; ++i)
        keyTracks[i]->Clear();
    activeKeyset = -1;

    CueStatement s;
    while (s.Read(in)) {
        const int n = s.Count();
        if (s.Matches("begin", 0) && s.Matches("marktrack", 1) && n == 2) {
            markTrack->Read(in);
        } else if (s.Matches("sound", 0) && n == 2) {
            sound.reset();
            soundFile = KLFilePath::Join(GetDataDirectory(), s.ArgText(1));
            sound = read_track_sound(soundFile);
            if (!sound)
                soundFile.clear();
        } else if (s.Matches("begin", 0) && s.Matches("keytrack", 1) && n == 3) {
            const int id = GetKeySetId(s.ArgText(2));
            if (id != -1) {
                keyTracks[id]->Clear();
                keyTracks[id]->Read(in, keySets[id].get());
            } else {
                // The block stays unread: its lines are skipped as unknown statements.
                report(KLFmt("Failed to find keyset [%s].", s.ArgText(2)));
            }
        } else if (s.Matches("active_keyset", 0) && n == 2) {
            activeKeyset = GetKeySetId(s.ArgText(1));
        } else if (s.Matches("fps", 0) && n == 2) {
            SetFps(s.ArgInt(1));
        }
    }

    if (!batchMode) {
        theGhost->InitSound(sound.get());
        theGhost->InitMarkTrack(markTrack.get());
        if (activeKeyset != -1)
            theGhost->SetActiveKeyset(activeKeyset);
        theGhost->SetMenuStatus();
        theGhost->SetViewStatus();
        PrepareKeyFrames(-1);
    }
    trackModified = 0;
    duration = compute_duration(requestedDuration);
    if (!batchMode)
        theGhost->DisplayDuration(duration);
    return 1;
}

int Imp::SaveTrack(const char* name) {
    SafeFile file(name ? name : "");
    if (!file.IsOpen()) {
        Inform(KLFmt("Failed to open track file [%s].", name ? name : "").c_str(), "Dismiss");
        return 0;
    }
    std::ostream& out = file.Stream();
    if (sound && !soundFile.empty())
        out << "sound " << KLQuote(KLFilePath::TrimHead(soundFile.c_str(), GetDataDirectory()))
            << "\n\n";
    out << "fps " << fps << "\n\n";
    out << "begin marktrack\n";
    if (markTrack)
        markTrack->Write(out);
    out << "end\n\n";
    for (int i = 0; i < keysetCount; ++i) {
        out << "begin keytrack\t" << KLQuote(keySets[i]->Name()) << "\n";
        keyTracks[i]->Write(out);
        out << "end\n\n";
    }
    if (KLKeySet* active = GetKeySet(theGhost->GetActiveKeyset()))
        out << "active_keyset " << KLQuote(active->Name()) << "\n\n";
    if (!file.Commit()) {
        Inform(KLFmt("Failed to open track file [%s].", name).c_str(), "Dismiss");
        return 0;
    }
    trackModified = 0;
    return 1;
}

int Imp::LoadSound(const char* name) {
    auto loaded = std::make_unique<CueSound>(name ? name : "");
    if (!loaded->Valid()) {
        // The sound held so far stays: a file that is not a sound replaces nothing.
        Inform(KLFmt("Could not read sound file [%s]: %s", name ? name : "",
                     loaded->ErrorText().c_str())
                   .c_str(),
               "Dismiss");
        return 0;
    }
    sound = std::move(loaded);
    soundFile = name;
    sound->ComputeMinMax();
    duration = compute_duration(requestedDuration);
    theGhost->DisplayDuration(duration);
    theGhost->InitSound(sound.get());
    trackModified = 1;
    return 1;
}

CueTime Imp::compute_duration(CueTime requested) {
    // The largest candidate wins; of equal ones the first in this order stands.
    CueTime result(0, 0, 1, 0, 0);  // no workspace is shorter than one second
    if (requested > result)
        result = requested;
    if (sound) {
        const CueTime length = CueTime::FromSeconds(sound->Length());
        if (length > result)
            result = length;
    }
    for (int i = 0; i < keysetCount; ++i) {
        if (!keyTracks[i])
            continue;
        const CueTime last = keyTracks[i]->Duration();
        if (last > result)
            result = last;
    }
    return result;
}
