#include "window/FallbackResources.h"

#include "toolkit/xm/KLResourceLines.h"

namespace {
// Generated at build time from resources/Chirrup.
const char kResourceText[] =
#include "ChirrupResources.inc"
    ;
}  // namespace

const char* const* chirrup_fallback_resources() {
    static const KLResourceLines lines(kResourceText);
    return lines.Lines();
}
