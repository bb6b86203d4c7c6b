#include "phoneme/PauseSplitter.h"

#include <algorithm>
#include <cmath>

std::vector<double> PauseSplitter::block_levels(const std::vector<int16_t>& samples) {
    std::vector<double> levels;
    const long n = long(samples.size());
    for (long begin = 0; begin < n; begin += kBlock) {
        const long end = std::min(n, begin + kBlock);
        double sum = 0.0;
        for (long i = begin; i < end; ++i) {
            const double x = samples[size_t(i)] / 32768.0;
            sum += x * x;
        }
        const double rms = std::sqrt(sum / double(end - begin));
        levels.push_back(rms > 1e-9 ? 20.0 * std::log10(rms) : -180.0);
    }
    return levels;
}

std::vector<PauseSplitter::Piece> PauseSplitter::Split(const std::vector<int16_t>& samples) const {
    std::vector<Piece> pieces = SplitLevels(block_levels(samples));
    for (Piece& p : pieces) {
        p.begin *= kBlock;
        p.end = std::min(long(samples.size()), p.end * kBlock);
    }
    return pieces;
}

std::vector<PauseSplitter::Piece> PauseSplitter::SplitLevels(
    const std::vector<double>& levels) const {
    std::vector<Piece> pieces;
    if (levels.empty())
        return pieces;
    const long blocks = long(levels.size());
    const double peak = *std::max_element(levels.begin(), levels.end());
    const double quiet = std::max(floor, peak - quietBelowPeak);

    // Cut points in blocks, increasing.
    std::vector<long> cuts;
    long lastCut = 0;
    long runStart = -1;  // first block of the current quiet run
    for (long b = 0; b <= blocks; ++b) {
        const bool isQuiet = b < blocks && levels[size_t(b)] < quiet;
        if (isQuiet && runStart < 0)
            runStart = b;
        if (!isQuiet && runStart >= 0) {
            // A pause inside the sound (not at its ends) is cut at its middle, once the piece
            // is long enough.
            if (b - runStart >= minimumPause && runStart > 0 && b < blocks) {
                const long middle = (runStart + b) / 2;
                if (middle - lastCut >= shortestPiece) {
                    cuts.push_back(middle);
                    lastCut = middle;
                }
            }
            runStart = -1;
        }
        // Too long without a pause: cut at the quietest block of the piece's last quarter.
        if (b < blocks && b - lastCut >= longestPiece) {
            long best = b;
            for (long c = b - longestPiece / 4; c <= b; ++c)
                if (levels[size_t(c)] < levels[size_t(best)])
                    best = c;
            cuts.push_back(best);
            lastCut = best;
        }
    }
    long begin = 0;
    for (long cut : cuts) {
        pieces.push_back({begin, cut});
        begin = cut;
    }
    pieces.push_back({begin, blocks});
    return pieces;
}
