#pragma once

#include "toolkit/CueTime.h"

class ScenePose;
class KLWireSource;

// What a scene is posed with at a time, besides its own rest animation: the key tracks
// previewed in the 3D views. The scene calls Pose with its channels at rest; the source sets
// the channels it drives.
class KLPoseSource {
  public:
    virtual ~KLPoseSource() = default;
    virtual void Pose(KLWireSource* source, CueTime t, ScenePose* pose) = 0;
    // Changes whenever what Pose would give changes (an edit of the animation), so that a
    // view can tell that it should draw again.
    virtual long Revision() { return 0; }
};
