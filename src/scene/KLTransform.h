#pragma once

#include <memory>

#include "scene/KLChannel.h"

// The transform of a preview scene node: nine channels (TX..SZ), each made animatable on
// request.
class KLTransform {
  public:
    // Makes channel `c` (0..8) animated and returns it; null for another number.
    KLChannel* AnimateChannel(int c);
    // The channel if it was made animated, else null.
    KLChannel* Channel(int c) const;

  private:
    std::unique_ptr<KLChannel> channels_[9];
};
