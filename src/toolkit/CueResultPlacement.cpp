#include "toolkit/CueResultPlacement.h"

namespace {
// The time of result i, in ticks; a double so that long sounds cannot overflow on the way.
CueTime result_time(CueTime regionStart, CueTime step, long i) {
    const double ticks = regionStart.Ticks() + step.Ticks() / 2.0 + double(i) * step.Ticks();
    return CueTime::FromSeconds(ticks / CueTime::kTicksPerSecond);
}
}  // namespace

void CueResultPlacement::Place(const std::vector<CueRecognizer::Result>& results,
                               CueTime regionStart, CueTime step,
                               const std::function<void(const Key&)>& place,
                               const std::function<void(long)>& progress) {
    int previous = 0;
    bool any = false;  // a result has been seen: `previous` holds its shape
    long runLength = 0;
    for (long i = 0; i < long(results.size()); ++i) {
        const int index = results[size_t(i)].shapeIndex;
        if (!any || index != previous) {
            if (any && runLength > 1 && previous >= 0)
                place({result_time(regionStart, step, i - 1), previous});
            if (index >= 0)
                place({result_time(regionStart, step, i), index});
            previous = index;
            any = true;
            runLength = 1;
        } else {
            ++runLength;
        }
        if (progress && (i + 1) % kProgressEvery == 0)
            progress(i + 1);
    }
}

std::vector<CueResultPlacement::Key> CueResultPlacement::Keys(
    const std::vector<CueRecognizer::Result>& results, CueTime regionStart, CueTime step) {
    std::vector<Key> keys;
    Place(results, regionStart, step, [&](const Key& k) { keys.push_back(k); });
    return keys;
}
