#pragma once

#include <cstdint>
#include <vector>

class CueSound;

// The mix of a sound's channels at 16 kHz as 16-bit samples, the decoder's input. Reads the
// sound in blocks, so that only the result is held in full. Empty for an empty sound; false
// when the sound cannot be converted.
bool Resample16k(const CueSound& sound, std::vector<int16_t>& out);
