// Feeds arbitrary text to the keyset, key-track and mark-track block readers (one after the
// other on the same stream, as a track file holds them), then writes the blocks, reads the
// written key track back and exercises the lookups and the fast-access table.
#include <cstddef>
#include <cstdint>
#include <sstream>
#include <string>

#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "model/KLMarkTrack.h"
#include "toolkit/KLStdImp.h"

namespace {
// A quiet workspace: no picture directory, no dialogs.
class FuzzImp : public KLStdImp {
  public:
    const char* GetPixDirectory() override { return "/nonexistent-chirrup-fuzz"; }
    float DefaultKeyFrame() override { return 1.0f; }
    void Inform(const char*, const char*) override {}
    int Confirm(const char*, const char*, const char*) override { return 1; }
};
}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static FuzzImp imp;
    const std::string text(reinterpret_cast<const char*>(data), size);
    const bool kindTwo = size > 0 && (data[0] & 1);
    KLKeySet set = kindTwo ? KLKeySet("set", "node", 0, 0.0f, 1.0f) : KLKeySet("set", "scene");
    KLKeyTrack track(&set);
    KLMarkTrack marks;

    std::istringstream in(text);
    set.Read(in);
    track.Read(in, &set);
    marks.Read(in);

    // Keep the picture names as read so that writing stores no pictures.
    set.imagesOnFile = 1;
    set.imagesChanged = 0;
    std::ostringstream out;
    set.Write(out);
    track.Write(out);
    marks.Write(out);

    KLKeyTrack again(&set);
    std::ostringstream written;
    track.Write(written);
    std::istringstream back(written.str());
    again.Read(back, &set);

    if (KLKeyEvent* first = track.events.Head()) {
        const CueTime start = first->time - CueTime(2.0, 0);
        track.PrepareFastAccess(start, start + CueTime(500.0, 0));
        for (int mode = 0; mode < 2; ++mode) {
            track.lookupMode = mode;
            for (const KLKeyEvent* e : track.events) {
                track.key_from_time(e->time);
                track.key_from_time_fast(e->time);
                KLKeyEvent *p, *n;
                track.bracket_keys_from_time(e->time, &p, &n);
            }
        }
        track.FinishFastAccess();
    }
    KLMarkEvent *before, *after;
    marks.BracketMarks(CueTime(), &before, &after);
    return 0;
}
