#include "model/KLApplyCurve.h"

#include <string>

#include "model/KLKey.h"
#include "model/KLKeyChannel.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "scene/KLWire.h"
#include "scene/OrDagNode.h"

namespace {
// The scene's tangent code for a key set with this smoothing.
int tangent_code(int smoothing) {
    switch (smoothing) {
        case KLKeyEvent::kLinear:
            return KLWire::kLinear;
        case KLKeyEvent::kSmooth:
            return KLWire::kSmooth;
        default:
            return KLWire::kFlat;
    }
}
}  // namespace

KLApplyCurve::KLApplyCurve(const KLKeyTrack& track, const KLKeyChannel* channel, CueTime start,
                           CueTime end, CueTime offset) {
    const size_t events = size_t(track.events.Count());
    times_.resize(events + 1);
    values_.resize(events + 1);
    in_.resize(events + 1);
    out_.resize(events + 1);
    const KLKeySet* set = track.keySet;
    const float rest = channel && set ? channel->Get(set->defaultIndex) : 0.0f;
    for (const KLKeyEvent* event : track.events) {
        if (event->time < start || event->time > end) {
            continue;
        }
        float value = event->value;
        if (channel) {
            const int shape = event->key ? event->key->index : event->shapeIndex;
            value = rest + event->value * (channel->Get(shape) - rest);
        }
        add(event->time + offset, value, event->smoothing);
    }
}

void KLApplyCurve::add(CueTime t, float value, int smoothing) {
    if (count_ == 0) {
        out_[0] = KLWire::kFlat;
    }
    times_[size_t(count_)] = t;
    values_[size_t(count_)] = value;
    in_[size_t(count_)] = tangent_code(smoothing);
    out_[size_t(count_) + 1] = tangent_code(smoothing);
    ++count_;
}

void KLApplyCurve::Store(OrDagNode* node, int channel) const {
    if (count_ == 0) {
        return;
    }
    KLWire::alwaysClearChannel = 1;
    KLWire::StoreChannel(node, channel, count_, times_.data(), values_.data(), in_.data(), nullptr,
                         out_.data(), nullptr);
}

ChannelCurve KLApplyCurve::Curve() const {
    std::vector<ChannelCurve::Key> keys;
    ChannelCurve curve;
    if (ChannelCurve::FromApplyArrays(count_, times_.data(), values_.data(), in_.data(),
                                      out_.data(), &keys)) {
        for (const ChannelCurve::Key& k : keys) {
            curve.Merge(k);
        }
    }
    return curve;
}

std::unique_ptr<OrDagNode> KLFindChannelNode(OrDagNode* base, const char* name, bool* ambiguous) {
    *ambiguous = false;
    std::unique_ptr<OrDagNode> node(KLWire::FetchDagNode(base, name));
    if (node) {
        return node;
    }
    std::string cut(name);
    const size_t hash = cut.find('#');
    if (hash != std::string::npos) {
        cut.erase(hash);
    }
    if (KLWire::UniqueDagName(base, cut.c_str())) {
        KLWire::DemangleNames(1);
        node.reset(KLWire::FetchDagNode(base, cut.c_str()));
        KLWire::DemangleNames(0);
    } else {
        *ambiguous = true;
    }
    return node;
}
