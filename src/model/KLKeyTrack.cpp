#include "model/KLKeyTrack.h"

#include <algorithm>
#include <cmath>
#include <iostream>
#include <new>

#include "model/FloatText.h"
#include "model/KLKey.h"
#include "model/KLKeySet.h"
#include "scene/KLChannel.h"
#include "scene/KLGraphNode.h"
#include "scene/KLKeyFrameList.h"
#include "toolkit/CueStatement.h"
#include "toolkit/KLStdImp.h"
#include "toolkit/KLString.h"

namespace {
// t's position between two keys, each time converted to frames as a float first. Keys whose
// frames round to the same float count as t standing on the first.
float fraction_between(CueTime t, CueTime prev, CueTime next) {
    const float tf = float(t.Frames());
    const float pf = float(prev.Frames());
    const float span = float(next.Frames()) - pf;
    return span == 0.0f ? 0.0f : (tf - pf) / span;
}
}  // namespace

KLKeyTrack::KLKeyTrack(KLKeySet* a_keySet)
    : keySet(a_keySet), events(KLKeyEvent::CompareByTimestamp) {}

KLKeyTrack::~KLKeyTrack() {
    Clear();
}

KLKeyEvent* KLKeyTrack::InsertKey(int shapeIndex, CueTime t, KLKey* key, int smoothing,
                                  float value) {
    KLStdImp::Workspace().SetTrackModified();
    ++previewRevision;
    KLKeyEvent* event = new KLKeyEvent(shapeIndex, t, key, smoothing, value);
    if (!events.Insert(event)) {
        delete event;
        return nullptr;
    }
    return event;
}

int KLKeyTrack::RemoveKey(CueTime t) {
    const KLKeyEvent probe(0, t, nullptr, KLKeyEvent::kEase, 1.0f);
    KLKeyEvent* event = events.Remove(&probe);
    if (!event)
        return 0;
    FinishFastAccess();
    delete event;
    KLStdImp::Workspace().SetTrackModified();
    ++previewRevision;
    return 1;
}

KLKeyEvent* KLKeyTrack::prev_event(CueTime t) const {
    const KLKeyEvent probe(0, t, nullptr, KLKeyEvent::kEase, 1.0f);
    return events.Search(&probe);
}

KLKeyEvent* KLKeyTrack::key_from_time(CueTime t) const {
    if (lookupMode == kPrevious)
        return prev_event(t);
    if (lookupMode != kNearest)
        return nullptr;
    KLKeyEvent* prev = prev_event(t);
    KLKeyEvent* next = prev ? events.Next(prev) : events.Head();
    if (!prev || !next)
        return prev ? prev : next;
    const int64_t before = int64_t(t.Ticks()) - prev->time.Ticks();
    const int64_t after = int64_t(next->time.Ticks()) - t.Ticks();
    return before < after ? prev : next;
}

KLKeyEvent* KLKeyTrack::key_from_time_fast(CueTime t) const {
    if (fastTable.empty())
        return key_from_time(t);
    const double frames = std::trunc((t - fastStart).Frames());
    const int i = frames < 0.0 ? 0 : (frames >= fastCount ? fastCount - 1 : int(frames));
    return lookupMode == kPrevious ? fastTable[i].prev : fastTable[i].nearest;
}

float KLKeyTrack::bracket_keys_from_time(CueTime t, KLKeyEvent** prev, KLKeyEvent** next) const {
    KLKeyEvent* p;
    KLKeyEvent* n;
    float fraction;
    if (!fastTable.empty()) {
        const double frames = std::trunc((t - fastStart).Frames());
        const int i = frames < 0.0 ? 0 : (frames >= fastCount ? fastCount - 1 : int(frames));
        p = fastTable[i].prev2;
        n = fastTable[i].next;
        fraction = fastTable[i].fraction;
    } else {
        p = prev_event(t);
        n = p ? events.Next(p) : events.Head();
        if (p && n) {
            fraction = fraction_between(t, p->time, n->time);
        } else {
            fraction = n ? 1.0f : 0.0f;
        }
    }
    if (prev)
        *prev = p;
    if (next)
        *next = n;
    return fraction;
}

// Fills the table in one sweep over the events in time order; each entry is what
// bracket_keys_from_time gives without a table at start + i frames.
void KLKeyTrack::PrepareFastAccess(CueTime start, CueTime end) {
    if (!(start < end))
        return;
    fastTable.clear();  // keeps the memory of an earlier table for this one
    fastCount = 0;
    fastStart = start;
    fastEnd = end;
    const double frames = std::trunc((end - start).Frames());
    const int count = frames > 0.0 ? int(frames) : 0;
    try {
        fastTable.reserve(size_t(count));
    } catch (const std::bad_alloc&) {
        // A range too long to tabulate leaves no table: lookups take the slow path.
        std::cerr << "KLKeyTrack::PrepareFastAccess() range too long" << std::endl;
        return;
    }
    fastCount = count;

    std::vector<KLKeyEvent*> order(events.begin(), events.end());
    const CueTime step(0, 0, 0, 1, 0);
    size_t next = 0;  // first event after the entry's time
    KLKeyEvent* p = nullptr;
    KLKeyEvent* n = order.empty() ? nullptr : order[0];
    float prevFrames = 0.0f, span = 0.0f;  // of the bracketing pair, as fraction_between has them
    CueTime t = start;
    for (int i = 0; i < fastCount; ++i, t += step) {
        if (next < order.size() && order[next]->time <= t) {
            while (next < order.size() && order[next]->time <= t)
                ++next;
            p = order[next - 1];
            n = next < order.size() ? order[next] : nullptr;
            if (n) {
                prevFrames = float(p->time.Frames());
                span = float(n->time.Frames()) - prevFrames;
            }
        }
        float fraction;
        if (p && n) {
            fraction = span == 0.0f ? 0.0f : (float(t.Frames()) - prevFrames) / span;
        } else {
            fraction = n ? 1.0f : 0.0f;
        }
        fastTable.push_back(FastEntry{p, fraction > 0.5f ? n : p, p, n, fraction});
    }
}

void KLKeyTrack::FinishFastAccess() {
    fastTable.clear();
    fastTable.shrink_to_fit();
    fastCount = 0;
}

CueTime KLKeyTrack::Duration() const {
    KLKeyEvent* last = events.Tail();
    return last ? last->time : CueTime();
}

void KLKeyTrack::Clear() {
    ++previewRevision;
    FinishFastAccess();
    events.DeleteAll();
    release_channels();
}

void KLKeyTrack::release_channels() {
    KLKeyFrameList* list = keySet ? keySet->keyFrameList : nullptr;
    if (list) {
        if (shapeChannel)
            list->RemoveKeyChannel(shapeChannel);
        if (weightChannel)
            list->RemoveKeyChannel(weightChannel);
    }
    shapeChannel = nullptr;
    weightChannel = nullptr;
    ownShape_.reset();
    ownWeight_.reset();
}

void KLKeyTrack::SetStatic() {
    if (!keySet)
        return;
    if (keySet->kind == 1 && shapeChannel) {
        const float rest =
            keySet->keyShapeCount > 0 ? float(keySet->GetDefaultKeyShape()->shapeValue) : 0.0f;
        shapeChannel->SetStatic(true);
        shapeChannel->SetValue(CueTime(), rest);
        if (weightChannel) {
            weightChannel->SetStatic(true);
            weightChannel->SetValue(CueTime(), 1.0f);
        }
    } else if (keySet->kind == 2 && weightChannel) {
        weightChannel->SetStatic(true);
        weightChannel->SetValue(CueTime(), keySet->lowValue);
    }
}

void KLKeyTrack::ClearStatic() {
    if (shapeChannel)
        shapeChannel->SetStatic(false);
    if (weightChannel)
        weightChannel->SetStatic(false);
}

void KLKeyTrack::SetControlGraphNode(KLGraphNode* node) {
    if (!node) {
        std::cerr << "NO GRAPH NODE" << std::endl;
        return;
    }
    graphNode = node;
    const int c = keySet ? keySet->channelIndex : 0;
    node->Transform()->AnimateChannel(c);
    KLChannel* channel = node->Transform()->Channel(c);
    if (ownWeight_ && ownWeight_.get() != channel) {
        KLKeyFrameList* list = keySet ? keySet->keyFrameList : nullptr;
        if (list)
            list->RemoveKeyChannel(ownWeight_.get());
        ownWeight_.reset();
    }
    weightChannel = channel;
}

// Key-track block: "event <frame> <key shape> [<smoothing> [<value>]]", the time in frames
// (fractions allowed) at the workspace frame rate; smoothing Ease and value 1.0 unless given.
// A key shape missing from the keyset is reported and its line skipped; other statement
// shapes are skipped silently. A repeated time keeps the first event.
void KLKeyTrack::Read(std::istream& in, KLKeySet* set) {
    if (!set)
        set = keySet;
    CueStatement st;
    while (st.Read(in)) {
        const int n = st.Count();
        if (n >= 1 && st.Matches("end"))
            break;
        if (n < 3 || !st.Matches("event") || !set)
            continue;
        const CueTime t(st.ArgFloat(1), 0);
        const char* shapeName = st.ArgText(2);
        const int index = set->GetKeyShapeId(shapeName);
        KLKey* key = set->GetKeyShape(index);
        if (!key) {
            KLStdImp::Workspace().Inform(KLFmt("Failed to find keyshape [%s] in keyset [%s].",
                                               shapeName, set->Name() ? set->Name() : "")
                                             .c_str(),
                                         "Dismiss");
            continue;
        }
        if (n == 3) {
            InsertKey(index, t, key, KLKeyEvent::kEase, 1.0f);
        } else if (n == 4) {
            InsertKey(index, t, key, SmoothFromString(st.ArgText(3)), 1.0f);
        } else if (n == 5) {
            InsertKey(index, t, key, SmoothFromString(st.ArgText(3)), st.ArgFloat(4));
        }
    }
}

// One line per event: four blanks, "event", the time in frames, the key shape's name and the
// smoothing name (each quoted when it holds a blank or a tab) and the value. Times and values
// are written as "%g" writes them unless that loses the exact tick or float; then with the
// few more digits needed.
void KLKeyTrack::Write(std::ostream& out) const {
    for (const KLKeyEvent* event : events) {
        const KLKey* key = event->key;
        if (!key && keySet)
            key = keySet->GetKeyShape(event->shapeIndex);
        const char* shapeName = key ? key->Name() : nullptr;
        out << "    event " << event->time.Text() << " " << KLQuote(shapeName ? shapeName : "")
            << " " << KLQuote(event->GetSmoothName()) << " " << FloatText(event->value)
            << std::endl;
    }
}
