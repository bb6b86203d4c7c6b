#pragma once

// One animated channel of a node of an open scene file, as the scene programming interface
// hands it out (KLWire::FindChannel): a key curve (times in seconds) evaluated at frames of
// the workspace frame rate. Not to be confused with the key channels of a keyset
// (model/KLKeyChannel.h) or the preview's animation channels (scene/KLChannel.h).
class OrChannel {
  public:
    virtual ~OrChannel() = default;
    virtual double eval(double frame) const = 0;
};
