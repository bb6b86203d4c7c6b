#include "model/KLKeyEvent.h"

#include <cstring>

#include "model/EventOrder.h"

int SmoothFromString(const char* name) {
    if (!name)
        return KLKeyEvent::kEase;
    for (const char* s : {"Linear", "LINEAR", "linear"}) {
        if (std::strcmp(name, s) == 0)
            return KLKeyEvent::kLinear;
    }
    for (const char* s : {"Smooth", "SMOOTH", "smooth"}) {
        if (std::strcmp(name, s) == 0)
            return KLKeyEvent::kSmooth;
    }
    return KLKeyEvent::kEase;
}

const char* KLKeyEvent::GetSmoothName() const {
    switch (smoothing) {
        case kLinear:
            return "Linear";
        case kEase:
            return "Ease";
        case kSmooth:
            return "Smooth";
        default:
            return "Unknown";
    }
}

int KLKeyEvent::CompareByTimestamp(const void* a, const void* b) {
    return CompareEventTimes<KLKeyEvent>(a, b);
}
