#pragma once

#include <memory>
#include <optional>
#include <string>

// One animated transform parameter of one scene node, with its value at each key shape of a
// keyset (slot i belongs to the key shape of index i). Not the preview's animation channel
// (scene/KLChannel.h) nor a curve of a scene file (scene/OrChannel.h).
class KLKeyChannel {
  public:
    enum Channel { kTX, kTY, kTZ, kRX, kRY, kRZ, kSX, kSY, kSZ };
    // The value Get returns for a slot out of range.
    static constexpr float kOutOfRange = -10000.0f;

    // `size` slots, all 0 until Set (a negative or unallocatable size leaves no slots and
    // prints why; a zero size prints a warning and goes on).
    KLKeyChannel(const char* name, int channel, int size);
    ~KLKeyChannel();
    KLKeyChannel(const KLKeyChannel&) = delete;
    KLKeyChannel& operator=(const KLKeyChannel&) = delete;

    // "TX" .. "SZ"; an unknown channel prints a message and gives "TX".
    const char* GetChannelName() const;
    // Stores v in slot i and counts the call (a slot set twice counts twice); an i out of
    // range is ignored silently.
    void Set(int i, float v);
    // Slot i; out of range prints "KLKeyChannel::Get() out of range" and gives -10000.0.
    float Get(int i) const;
    // 1 when the channel carries no change between key shapes: no Set yet, a Set count that
    // differs from the number of slots (not completely filled, or a slot set twice), or all
    // values exactly equal. 0 otherwise.
    int Constant() const;
    // Prints the first `count` values on the error stream (debugging aid).
    void Dump() const;

    const char* Name() const { return name ? name->c_str() : nullptr; }

    std::optional<std::string> name;  // the scene node's name
    int channel = 0;                  // Channel
    int count = 0;                    // number of Set calls so far
    int size = 0;                     // number of slots
    std::unique_ptr<float[]> values;  // `size` slots, or null when none could be allocated
};
