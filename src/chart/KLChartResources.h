#pragma once

#include <X11/Intrinsic.h>

#include "toolkit/xm/KLFiend.h"

// The sync chart's colours and view callbacks. The chart reads them from the resource
// database (as sub-resources of its form) straight into itself, so each is named once here
// and once in the chart's resource list.
struct KLChartResources {
    Pixel regionColor = 0, soundColor = 0, gridColor = 0, keylineColor = 0, keyColor = 0,
          keyActiveColor = 0, keyMovingColor = 0, easeColor = 0, linearColor = 0, smoothColor = 0;
    KLFiendCallback showKeyframeCallback, showKeyframeImageCallback, showReferenceImageCallback;
};
