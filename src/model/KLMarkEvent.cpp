#include "model/KLMarkEvent.h"

#include "model/EventOrder.h"

int KLMarkEvent::CompareByTimestamp(const void* a, const void* b) {
    return CompareEventTimes<KLMarkEvent>(a, b);
}
