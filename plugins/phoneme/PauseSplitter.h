#pragma once

#include <cstdint>
#include <vector>

// Cuts a long sound into pieces that can be recognised independently: at the middle of each
// pause, and, in a stretch that runs on too long without one, at its quietest moment. The
// pieces cover the sound without gaps or overlaps, in order.
class PauseSplitter {
  public:
    struct Piece {
        long begin;  // first sample (or block)
        long end;    // one past the last sample (or block)
    };

    // 10 ms at 16 kHz: the unit in which loudness is measured.
    static constexpr long kBlock = 160;

    long minimumPause = 30;    // blocks of quiet that make a pause (0.3 s)
    long longestPiece = 3000;  // blocks a piece may run without a pause (30 s)
    // Blocks a piece runs at least before a pause ends it (10 s): the decoder does better
    // with some context, and a short sound stays whole.
    long shortestPiece = 1000;
    // A block is quiet when its RMS level is this many dB below the loudest block, or
    // below the floor (in dBFS), whichever is higher.
    double quietBelowPeak = 35.0;
    double floor = -55.0;

    // Pieces of 16 kHz samples.
    std::vector<Piece> Split(const std::vector<int16_t>& samples) const;
    // Pieces in blocks, from the RMS level in dBFS of every 10 ms block of a sound at any
    // rate (a shorter last block included).
    std::vector<Piece> SplitLevels(const std::vector<double>& levels) const;

  private:
    // RMS level in dBFS of every block (a shorter last block included).
    static std::vector<double> block_levels(const std::vector<int16_t>& samples);
};
