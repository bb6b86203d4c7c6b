#pragma once

#include <iosfwd>
#include <memory>
#include <vector>

#include "model/KLKeyEvent.h"
#include "toolkit/CueTime.h"
#include "toolkit/KLSkipList.h"

class KLChannel;
class KLGraphNode;
class KLKey;
class KLKeyFrameList;
class KLKeySet;
class KLWireSource;

// The time line of one keyset: key events sorted by time, at most one per instant, each
// calling up a key shape of the keyset. The track owns its events.
class KLKeyTrack {
  public:
    // Lookup modes: the key at or before a time, or the nearest key.
    enum LookupMode { kPrevious = 0, kNearest = 1 };

    // One fast-access entry per frame of the prepared range.
    struct FastEntry {
        KLKeyEvent* prev;     // last key at or before the frame
        KLKeyEvent* nearest;  // the nearer of the bracketing pair (the earlier at one half)
        KLKeyEvent* prev2;    // first key of the bracketing pair (same as prev)
        KLKeyEvent* next;     // first key after the frame
        float fraction;       // position between prev2 and next, 0 to 1
    };

    explicit KLKeyTrack(KLKeySet* keySet);
    ~KLKeyTrack();
    KLKeyTrack(const KLKeyTrack&) = delete;
    KLKeyTrack& operator=(const KLKeyTrack&) = delete;

    // The new event, or null when an event already stands at exactly t (the old one stays).
    // Either way the workspace's tracks are marked modified.
    KLKeyEvent* InsertKey(int shapeIndex, CueTime t, KLKey* key, int smoothing, float value);
    // 1 when an event stood at exactly t and was removed (tracks marked modified), else 0.
    // Discards the fast-access table, which could refer to the removed event.
    int RemoveKey(CueTime t);

    // kPrevious: the last event at or before t. kNearest: the nearer of that event and the
    // one after it, the later one on a tie. Null on an empty track or another mode.
    KLKeyEvent* key_from_time(CueTime t) const;
    // As key_from_time from the fast-access table: t is taken to its whole frame within the
    // prepared range and clamped to it; at exactly one half between two keys the earlier one
    // is the nearest here. Without a table, falls back to key_from_time.
    KLKeyEvent* key_from_time_fast(CueTime t) const;
    // The events around t (*prev at or before, *next after; either may be null) and t's
    // position between them, 0 to 1: 1.0 before the first key, 0.0 after the last or on an
    // empty track. From the fast-access table when there is one.
    float bracket_keys_from_time(CueTime t, KLKeyEvent** prev, KLKeyEvent** next) const;
    // Builds the fast-access table: one entry per whole frame from start (inclusive) for
    // truncate((end - start) in frames) frames. Nothing happens unless start < end; a range
    // too long to hold in memory leaves no table.
    void PrepareFastAccess(CueTime start, CueTime end);
    void FinishFastAccess();

    // Time of the last event; zero for an empty track.
    CueTime Duration() const;
    // Removes every event and releases the track's preview channels.
    void Clear();

    // Static mode: the preview channels show the rest pose whatever the time.
    void SetStatic();
    void ClearStatic();
    // Animates the node's channel that the keyset drives and keeps it (borrowed) as the
    // weight channel.
    void SetControlGraphNode(KLGraphNode* node);

    // Writes the track into the scene (see KLKeyTrackApply.cpp). 1 when applied, 0 when the
    // base node is missing or the user cancelled.
    int Apply(KLWireSource* wire, const char* dagName, CueTime start, CueTime end, CueTime offset);
    // Fills the preview channels with one key per event (see KLKeyTrackApply.cpp).
    void PrepareKeyFrames(KLKeyFrameList* list);
    // Fills the preview channels for the key-shape pictures instead: at each key shape's
    // frame (as a time) the key-shape channel holds the shape and the value channel 1, so
    // that the views show key shape i posed in full at that time (see KLKeyTrackApply.cpp).
    // PrepareKeyFrames returns the track to its events.
    void PrepareVuKeyFrames(KLKeyFrameList* list);

    // The key-track block: "event <frame> <key shape> [<smoothing> [<value>]]" lines up to
    // "end"; Read adds to the events already there, Write writes the event lines only.
    void Read(std::istream& in, KLKeySet* keySet);
    void Write(std::ostream& out) const;

    KLKeySet* keySet;                    // borrowed
    KLGraphNode* graphNode = nullptr;    // borrowed
    KLChannel* shapeChannel = nullptr;   // kind 1: key-shape number; owned (ownShape_)
    KLChannel* weightChannel = nullptr;  // key value; owned (ownWeight_) or the node's
    KLSkipList<KLKeyEvent> events;
    std::vector<FastEntry> fastTable;  // empty while there is no table
    int fastCount = 0;                 // entries in fastTable
    int lookupMode = kPrevious;
    CueTime fastStart;  // time of entry 0
    CueTime fastEnd;    // end of the prepared range
    // True between PrepareVuKeyFrames and the next PrepareKeyFrames: the preview channels
    // hold the key shapes, not the events.
    bool vuKeyFrames = false;
    // Grows whenever the events or the preview channels change, so that the preview knows
    // when to build its curves again.
    int previewRevision = 0;

  private:
    KLKeyEvent* prev_event(CueTime t) const;
    // Empties the two preview channels, or makes them and registers them with `list` (the
    // keyset's list when null); false, doing nothing, when there is no list or the workspace
    // is not preparing key frames.
    bool make_channels(KLKeyFrameList* list);
    void release_channels();

    std::unique_ptr<KLChannel> ownShape_;
    std::unique_ptr<KLChannel> ownWeight_;
};
