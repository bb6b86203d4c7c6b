#pragma once

// The phones of the en-us acoustic model (its context-independent phones, ARPAbet names) and
// the silence target, in target order; the noise phones of the model count as silence.
class PhoneSet {
  public:
    static constexpr int kCount = 40;
    static constexpr int kSilence = kCount - 1;  // "SIL"

    static const char* Name(int index);
    // The target index of a phone named by the decoder; noises, fillers and anything the
    // set does not know give kSilence.
    static int IndexOf(const char* phone);
};
