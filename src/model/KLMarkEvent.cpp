#include "model/KLMarkEvent.h"

int KLMarkEvent::CompareByTimestamp(const void* a, const void* b) {
    const CueTime ta = static_cast<const KLMarkEvent*>(a)->time;
    const CueTime tb = static_cast<const KLMarkEvent*>(b)->time;
    if (ta == tb)
        return 0;
    return ta < tb ? -1 : 1;
}
