#pragma once

#include <functional>
#include <vector>

#include "scene/ChannelCurve.h"
#include "scene/KLPoseSource.h"

class KLKeyChannel;
class KLKeyTrack;

// Poses a scene with the workspace's key tracks for the 3D views. For every animated
// parameter of every keyset it evaluates the curve apply would write (KLApplyCurve: the same
// keys, tangents and curve code), so that the preview at time t equals the applied scene at
// t. A track in static mode holds its keyset's default key shape (kind 1) or rest value
// (kind 2); a track prepared for key-shape pictures (PrepareVuKeyFrames) poses the key shape
// its preview channels give at t. Curves are built again only when a track changes.
class KLTrackPreview : public KLPoseSource {
  public:
    // Gives the tracks to preview, in keyset order (later ones win where two drive the
    // same parameter, as with apply).
    using TrackList = std::function<std::vector<KLKeyTrack*>()>;

    explicit KLTrackPreview(TrackList tracks);

    void Pose(KLWireSource* source, CueTime t, ScenePose* pose) override;
    // From the tracks and their preview revisions.
    long Revision() override;
    // Number of curve builds so far (one per track change).
    int Builds() const { return builds_; }

  private:
    // One parameter a track drives.
    struct Driven {
        int node = -1;
        int channel = 0;
        const KLKeyChannel* keyChannel = nullptr;  // kind 1
        ChannelCurve curve;
    };
    struct TrackCurves {
        KLKeyTrack* track = nullptr;
        int revision = -1;
        std::vector<Driven> driven;
    };

    void build(KLWireSource* source, TrackCurves* curves);
    // The value of one parameter at t.
    bool value(const KLKeyTrack& track, const Driven& d, CueTime t, double* out) const;

    TrackList tracks_;
    std::vector<TrackCurves> curves_;
    KLWireSource* source_ = nullptr;
    int builds_ = 0;
};
