#pragma once

#include <cstddef>
#include <vector>

#include "toolkit/CueTime.h"

// A scalar animation channel of the 3D preview (not a keyset's key channel, model/KLKeyChannel.h,
// nor a curve of a scene file, scene/OrChannel.h): keyed storage of (time, value) keys evaluated
// with linear interpolation between keys and held before the first and after the last, or a
// static value while the channel is marked static.
class KLChannel {
  public:
    virtual ~KLChannel() = default;

    void SetStorageKeyed() { keyed_ = true; }
    bool StorageKeyed() const { return keyed_; }
    void ClearAnimation() { keys_.clear(); }
    // Adds or replaces the key at `t`.
    void AddKey(CueTime t, float value);
    int KeyCount() const { return int(keys_.size()); }

    // Static mode: the channel gives `value` whatever the time.
    void SetStatic(bool on) { static_ = on; }
    bool IsStatic() const { return static_; }
    void SetValue(CueTime t, float value);

    virtual float Evaluate(CueTime t) const;

  protected:
    struct Key {
        CueTime time;
        float value;
    };
    // Index of the first key at or after `t` (keys_.size() when there is none).
    size_t keyAtOrAfter(CueTime t) const;

    std::vector<Key> keys_;  // in time order
    bool keyed_ = false;
    bool static_ = false;
    float staticValue_ = 0.0f;
};
