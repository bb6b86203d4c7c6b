#include "model/KLMarkTrack.h"

#include <iostream>

#include "toolkit/CueStatement.h"

KLMarkTrack::KLMarkTrack() : marks(KLMarkEvent::CompareByTimestamp) {}

KLMarkTrack::~KLMarkTrack() {
    marks.DeleteAll();
}

void KLMarkTrack::Clear() {
    marks.DeleteAll();
}

KLMarkEvent* KLMarkTrack::InsertMark(CueTime t, char c) {
    KLMarkEvent* mark = new KLMarkEvent(t, c);
    if (!marks.Insert(mark)) {
        delete mark;
        return nullptr;
    }
    return mark;
}

int KLMarkTrack::RemoveMark(CueTime t) {
    const KLMarkEvent probe(t, 0);
    KLMarkEvent* mark = marks.Remove(&probe);
    if (!mark)
        return 0;
    delete mark;
    return 1;
}

KLMarkEvent* KLMarkTrack::BracketMarks(CueTime t, KLMarkEvent** before, KLMarkEvent** after) const {
    const KLMarkEvent probe(t, 0);
    KLMarkEvent* b = marks.Search(&probe);
    KLMarkEvent* a = b ? marks.Next(b) : marks.Head();
    if (before)
        *before = b;
    if (after)
        *after = a;
    return a;
}

// Mark-track block: "mark <frame> <label>" with the time in frames (fractions allowed) at the
// workspace frame rate and the label's first character as the mark. A repeated time keeps the
// first mark; statements of any other shape, and an empty label, are skipped silently.
void KLMarkTrack::Read(std::istream& in) {
    CueStatement st;
    while (st.Read(in)) {
        const int n = st.Count();
        if (n >= 1 && st.Matches("end"))
            break;
        if (n != 3 || !st.Matches("mark"))
            continue;
        const char label = st.ArgText(2)[0];
        if (label == '\0')
            continue;
        InsertMark(CueTime(st.ArgDouble(1), 0), label);
    }
}

// One line per mark: four blanks, "mark", the time in frames, a tab and the label in double
// quotes. The time is written as "%g" writes it unless that loses the exact tick. A label that is
// itself a double quote is written as it is and does not read back.
void KLMarkTrack::Write(std::ostream& out) const {
    for (const KLMarkEvent* mark : marks) {
        out << "    mark " << mark->time.Text() << "\t\"" << mark->label << "\"" << std::endl;
    }
}
