#pragma once

#include <vector>

class CueSound;

// Loudness of a sound over time, read at its own rate so that no converted copy of the
// whole sound is needed: the RMS level in dBFS of the mix of its channels over `count`
// consecutive spans of `seconds` each, the first starting at the sound's start. A span that
// runs past the end is measured over what is there; one wholly past it, or digital
// silence, gives -180 dB.
class SoundLevels {
  public:
    static constexpr double kSilent = -180.0;

    static std::vector<double> Measure(const CueSound& sound, double seconds, long count);
    // Spans of `seconds` that cover the sound, a shorter last one included.
    static long SpanCount(const CueSound& sound, double seconds);
};
