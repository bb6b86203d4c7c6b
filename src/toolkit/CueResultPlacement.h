#pragma once

#include <functional>
#include <vector>

#include "toolkit/CueRecognizer.h"
#include "toolkit/CueTime.h"

// Where a recognizer's results become keyframes on the time line. Result i stands for the
// time regionStart + step / 2 + i * step. A result whose shape index differs from the one
// before it places a keyframe of its shape at its own time; when the shape before it had
// lasted more than one result, a keyframe of that shape is placed first at the time of its
// last result, so that a held shape stays held until the change. Equal consecutive results
// place nothing, and unlinked results (shape index -1) place nothing but still end the shape
// before them.
class CueResultPlacement {
  public:
    struct Key {
        CueTime time;
        int shapeIndex;
        bool operator==(const Key& o) const { return time == o.time && shapeIndex == o.shapeIndex; }
    };

    // Results between two calls of `progress`.
    static constexpr long kProgressEvery = 100;

    // The keyframes for `results` in time order, handed to `place` as they are found;
    // `progress(n)` is called after every kProgressEvery-th result with the count so far.
    static void Place(const std::vector<CueRecognizer::Result>& results, CueTime regionStart,
                      CueTime step, const std::function<void(const Key&)>& place,
                      const std::function<void(long)>& progress = nullptr);
    // The same, gathered into a list.
    static std::vector<Key> Keys(const std::vector<CueRecognizer::Result>& results,
                                 CueTime regionStart, CueTime step);
};
