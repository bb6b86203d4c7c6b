#pragma once

#include <iosfwd>

#include "model/KLMarkEvent.h"
#include "toolkit/CueTime.h"
#include "toolkit/KLSkipList.h"

// The marks of the sound, sorted by time, at most one per instant. The track owns its marks.
class KLMarkTrack {
  public:
    KLMarkTrack();
    ~KLMarkTrack();
    KLMarkTrack(const KLMarkTrack&) = delete;
    KLMarkTrack& operator=(const KLMarkTrack&) = delete;

    // Removes and destroys every mark.
    void Clear();
    // The new mark, or null (and nothing changed) when a mark already stands at exactly t.
    KLMarkEvent* InsertMark(CueTime t, char c);
    // 1 when a mark stood at exactly t and was removed, else 0.
    int RemoveMark(CueTime t);
    // *before = last mark at or before t, *after = the mark following it (either may be
    // null; either pointer may be null when not wanted). Returns the mark after.
    KLMarkEvent* BracketMarks(CueTime t, KLMarkEvent** before, KLMarkEvent** after) const;

    // The mark-track block: "mark <frame> <label>" lines up to "end"; Read adds to the marks
    // already there, Write writes the mark lines only.
    void Read(std::istream& in);
    void Write(std::ostream& out) const;

    KLSkipList<KLMarkEvent> marks;
};
