#pragma once

#include <X11/Intrinsic.h>

class KLSceneView;

namespace testscenes {

// Two scene views of `width` x `height` side by side in a managed form under `parent`, named as
// the window names its key and mix views ("keyScn", "mixScn"). The parent is not realized.
void MakeViewPair(Widget parent, int width, int height, KLSceneView* views[2]);

}  // namespace testscenes
