#include "model/KLTrackPreview.h"

#include <cmath>
#include <cstdint>
#include <limits>
#include <memory>

#include "model/KLApplyCurve.h"
#include "model/KLKey.h"
#include "model/KLKeyChannel.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "scene/KLChannel.h"
#include "scene/KLWire.h"
#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"
#include "scene/ScenePose.h"

namespace {
// Every event, whatever its time: the preview shows the whole track.
const CueTime kFirst = CueTime::FromTicks(std::numeric_limits<int32_t>::min());
const CueTime kLast = CueTime::FromTicks(std::numeric_limits<int32_t>::max());

// Index of the key shape whose key-shape channel value is `shapeValue`; the default when
// none is.
int shape_of(const KLKeySet& set, float shapeValue) {
    const long wanted = std::lround(shapeValue);
    for (size_t i = 0; i < set.keyShapes.size(); ++i) {
        if (set.keyShapes[i]->shapeValue == wanted) {
            return int(i);
        }
    }
    return set.defaultIndex;
}
}  // namespace

KLTrackPreview::KLTrackPreview(TrackList tracks) : tracks_(std::move(tracks)) {}

void KLTrackPreview::build(KLWireSource* source, TrackCurves* curves) {
    ++builds_;
    KLKeyTrack& track = *curves->track;
    curves->revision = track.previewRevision;
    curves->driven.clear();
    const KLKeySet* set = track.keySet;
    std::unique_ptr<OrDagNode> root(source ? source->RootNode() : nullptr);
    if (!set || !root) {
        return;
    }
    if (set->kind == 1) {
        for (const KLKeyChannel* kc : set->keyChannels) {
            bool ambiguous = false;
            std::unique_ptr<OrDagNode> node =
                KLFindChannelNode(root.get(), kc->Name() ? kc->Name() : "", &ambiguous);
            if (!node || kc->channel < 0 || kc->channel > 8) {
                continue;
            }
            Driven d;
            d.node = node->index();
            d.channel = kc->channel;
            d.keyChannel = kc;
            d.curve = KLApplyCurve(track, kc, kFirst, kLast, CueTime()).Curve();
            curves->driven.push_back(std::move(d));
        }
    } else if (set->kind == 2 && set->nodeName) {
        KLWire::DemangleNames(1);
        std::unique_ptr<OrDagNode> node(KLWire::FetchDagNode(root.get(), set->nodeName->c_str()));
        KLWire::DemangleNames(0);
        if (node && set->channelIndex >= 0 && set->channelIndex <= 8) {
            Driven d;
            d.node = node->index();
            d.channel = set->channelIndex;
            d.curve = KLApplyCurve(track, nullptr, kFirst, kLast, CueTime()).Curve();
            curves->driven.push_back(std::move(d));
        }
    }
}

bool KLTrackPreview::value(const KLKeyTrack& track, const Driven& d, CueTime t, double* out) const {
    const KLKeySet& set = *track.keySet;
    const KLChannel* shape = track.shapeChannel;
    const KLChannel* weight = track.weightChannel;
    if (set.kind == 1) {
        if (shape && weight && (track.vuKeyFrames || shape->IsStatic())) {
            const float rest = d.keyChannel->Get(set.defaultIndex);
            const float full = d.keyChannel->Get(shape_of(set, shape->Evaluate(t)));
            *out = rest + weight->Evaluate(t) * (full - rest);
            return true;
        }
    } else if (weight && (track.vuKeyFrames || weight->IsStatic())) {
        *out = weight->Evaluate(t);
        return true;
    }
    if (d.curve.empty()) {
        return false;  // apply stores nothing: the scene keeps its own animation
    }
    *out = d.curve.Evaluate(t.Seconds());
    return true;
}

void KLTrackPreview::Pose(KLWireSource* source, CueTime t, ScenePose* pose) {
    if (source != source_) {
        curves_.clear();
        source_ = source;
    }
    const std::vector<KLKeyTrack*> tracks = tracks_ ? tracks_() : std::vector<KLKeyTrack*>();
    if (curves_.size() != tracks.size()) {
        curves_.assign(tracks.size(), TrackCurves());
    }
    for (size_t i = 0; i < tracks.size(); ++i) {
        KLKeyTrack* track = tracks[i];
        if (!track || !track->keySet) {
            continue;
        }
        TrackCurves& curves = curves_[i];
        if (curves.track != track || curves.revision != track->previewRevision) {
            curves.track = track;
            build(source, &curves);
        }
        for (const Driven& d : curves.driven) {
            double v = 0;
            if (value(*track, d, t, &v)) {
                pose->Set(d.node, d.channel, v);
            }
        }
    }
}

long KLTrackPreview::Revision() {
    long revision = 17;
    for (KLKeyTrack* track : tracks_ ? tracks_() : std::vector<KLKeyTrack*>()) {
        const long id = long(reinterpret_cast<uintptr_t>(track) >> 4);
        revision = revision * 31 + id + (track ? track->previewRevision : 0);
    }
    return revision;
}
