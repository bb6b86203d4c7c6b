#pragma once

#include "scene/KLChannel.h"

// A channel whose keys are joined by a smooth (Catmull-Rom) curve.
class KLSplineChannel : public KLChannel {
  public:
    float Evaluate(CueTime t) const override;
};
