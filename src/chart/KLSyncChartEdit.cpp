// The sync chart's content and key operations: the tracks and sound it shows, adding and
// deleting keys, and the smoothing of keys.
#include <algorithm>
#include <cmath>
#include <vector>

#include "chart/KLSyncChart.h"
#include "model/KLKey.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "model/KLMarkTrack.h"
#include "toolkit/CueSound.h"

namespace {
KLKeyEvent* event_at(KLKeyTrack* track, CueTime t) {
    return track->fastTable.empty() ? track->key_from_time(t) : track->key_from_time_fast(t);
}
}  // namespace

void KLSyncChart::SetKeyTrack(KLKeyTrack* track) {
    keyTrack = track;
    hitKey = nullptr;
    set_active_key(nullptr);
    recompute_duration();
    // The mapping follows the duration.
    sketch_sound();
    sketch_grid();
    needRedraw = true;
    full_expose();
}

void KLSyncChart::SetMarkTrack(KLMarkTrack* track) {
    markTrack = track;
    hitMark = nullptr;
    set_active_mark(nullptr);
    needRedraw = true;
    full_expose();
}

void KLSyncChart::SetSound(CueSound* newSound) {
    waveSummary.Clear();
    samples.clear();
    samples.shrink_to_fit();
    sound = newSound;
    if (sound) {
        // The sound as one channel: a mono sound's samples, else the mix of its channels.
        samples = sound->ChannelData(-1);
        sampleCount = long(samples.size());
        peak = 0.0f;
        for (float s : samples) {
            const float a = std::fabs(s);
            if (a > peak && std::isfinite(a))
                peak = a;
        }
        waveSummary.Build(samples.data(), sampleCount);
        recompute_duration();
    }
    sketch_sound();
    sketch_grid();
    needRedraw = true;
    full_expose();
}

int KLSyncChart::AddKeyframe(int shapeIndex, KLKey* key, int update) {
    if (!keyTrack)
        return 0;
    CueTime t;
    if (activeKey) {
        // The new key replaces the one under edit.
        t = activeKey->time;
        activeKey = nullptr;
        keyTrack->RemoveKey(t);
    } else {
        // A hidden indicator reports the point one pixel left of the visible part, which is
        // before time 0 when the chart shows its start: a key never goes there.
        t = std::max(GetIndicatorTime(), CueTime());
    }
    KLKeyEvent* inserted = nullptr;
    const int kind = keyTrack->keySet ? keyTrack->keySet->kind : 0;
    if (kind == 1)
        inserted = keyTrack->InsertKey(shapeIndex, t, key, KLKeyEvent::kEase, 1.0f);
    else if (kind == 2)
        inserted =
            keyTrack->InsertKey(shapeIndex, t, key, KLKeyEvent::kEase, key ? key->frame : 0.0f);
    set_active_key(event_at(keyTrack, t));
    needRedraw = true;
    if (inserted && update)
        UpdateDisplay();
    return inserted ? 1 : 0;
}

int KLSyncChart::AddTimeKeyframe(int shapeIndex, CueTime t, KLKey* key, int update) {
    if (!keyTrack)
        return 0;
    KLKeyEvent* inserted = keyTrack->InsertKey(shapeIndex, t, key, KLKeyEvent::kEase, 1.0f);
    set_active_key(event_at(keyTrack, t));
    needRedraw = true;
    if (inserted && update)
        UpdateDisplay();
    return inserted ? 1 : 0;
}

void KLSyncChart::remove_key(CueTime t) {
    if (activeKey && activeKey->time == t)
        set_active_key(nullptr);
    if (hitKey && hitKey->time == t)
        hitKey = nullptr;
    keyTrack->RemoveKey(t);
}

void KLSyncChart::DeleteTimeKeyframe(CueTime t) {
    if (keyTrack)
        remove_key(t);
    needRedraw = true;
    full_expose();
}

void KLSyncChart::DeleteActiveKeyframe() {
    if (activeKey) {
        DeleteTimeKeyframe(activeKey->time);
        return;
    }
    needRedraw = true;
    full_expose();
}

void KLSyncChart::DeleteActiveKeyframeRegion() {
    if (keyTrack) {
        CueTime start, end;
        GetRegionRange(start, end);
        std::vector<CueTime> doomed;
        for (const KLKeyEvent* e : keyTrack->events) {
            if (e->time > end)
                break;
            if (e->time >= start)
                doomed.push_back(e->time);
        }
        for (CueTime t : doomed)
            remove_key(t);
    }
    needRedraw = true;
    full_expose();
}

void KLSyncChart::SetRegionSmoothing(int smoothing) {
    if (!keyTrack)
        return;
    if (!geometry.RegionSelected()) {
        KLKeyEvent* target = activeKey;
        if (!target) {
            // The curve under the indicator is the one leading into the next key.
            KLKeyEvent *before = nullptr, *after = nullptr;
            keyTrack->bracket_keys_from_time(GetIndicatorTime(), &before, &after);
            target = after;
        }
        if (!target)
            return;
        target->smoothing = smoothing;
    } else {
        CueTime start, end;
        GetRegionRange(start, end);
        for (KLKeyEvent* e : keyTrack->events) {
            if (e->time > end)
                break;
            if (e->time >= start)
                e->smoothing = smoothing;
        }
    }
    needRedraw = true;
    full_expose();
    feedback_meter_movement();
}

void KLSyncChart::UpdateDisplay() {
    full_expose();
    feedback_meter_movement();
}
