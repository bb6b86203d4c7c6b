#pragma once

#include <memory>
#include <vector>

#include "scene/ChannelCurve.h"
#include "toolkit/CueTime.h"

class KLKeyChannel;
class KLKeyTrack;
class OrDagNode;

// The keys that apply writes for one animated parameter of a key track: one per event with
// start <= time <= end (in ticks, both ends inclusive), at time + offset. A kind-1 key
// channel blends from the rest pose (value 0) to the event's key shape (value 1) and beyond:
// d + value * (s - d); a kind-2 keyset's channel takes the values as they stand. Each key
// arrives in the manner its own event was set and leaves in the manner of the event before
// it (the first one flat). Apply stores these keys into the scene and the 3D preview
// evaluates the very same curve.
class KLApplyCurve {
  public:
    // `channel` null: the keyset's own channel (kind 2).
    KLApplyCurve(const KLKeyTrack& track, const KLKeyChannel* channel, CueTime start, CueTime end,
                 CueTime offset);

    int Count() const { return count_; }
    // Replaces the node's channel animation with the keys (nothing when there are none).
    void Store(OrDagNode* node, int channel) const;
    // The curve the scene holds after Store.
    ChannelCurve Curve() const;

  private:
    void add(CueTime t, float value, int smoothing);

    // One spare entry: the out-tangent of key k is written at k + 1.
    std::vector<CueTime> times_;
    std::vector<float> values_;
    std::vector<int> in_;
    std::vector<int> out_;
    int count_ = 0;
};

// The node that a kind-1 key channel names, below `base`. A name that is not found whole is
// cut at its first "#" and, when exactly one node bears the cut name, looked up again with
// name demangling on. Sets *ambiguous when the cut name is not unique (or not there at all).
std::unique_ptr<OrDagNode> KLFindChannelNode(OrDagNode* base, const char* name, bool* ambiguous);
