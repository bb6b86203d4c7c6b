#pragma once

#include <cstdint>
#include <vector>

class CueSound;

// Whether a sound at `rate` frames per second can be converted to 16 kHz.
bool CanResample16k(double rate);

// The mix of a sound's channels at 16 kHz as 16-bit samples, the decoder's input, for the
// sound's frames [begin, end) (clamped to the sound). Reads the sound in blocks, so that
// only the result is held in full. Empty for an empty range; false when the sound cannot be
// converted.
bool Resample16k(const CueSound& sound, long begin, long end, std::vector<int16_t>& out);
