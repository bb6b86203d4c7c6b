#pragma once

#include <cstdint>
#include <vector>

#include "toolkit/CueTime.h"

class KLChartGeometry;

// One vertical waveform segment of a pixel column, laid out as the X protocol's segment.
struct KLWaveSegment {
    int16_t x1, y1, x2, y2;
};

// Min/max summaries of a sound's samples in aligned blocks of 64, 128, 256, ... samples, so
// that the extent of any index range comes from O(log n) summaries and at most 126 samples
// instead of a scan of every sample. The extents equal those of the plain scan exactly: both
// start from zero and ignore NaN samples. The samples are borrowed and must outlive Build's
// use; the summaries are owned.
class KLWaveSummary {
  public:
    static constexpr int kFirstLevelShift = 6;  // the smallest summary block: 64 samples

    // Summarises `count` samples (kept by pointer for the ends of ranges).
    void Build(const float* samples, long count);
    void Clear();

    // The largest sample of [i0, i1) raised to at least 0 into *hi and the smallest lowered
    // to at most 0 into *lo; both 0 for an empty range. The range is cut to the samples.
    void Extent(long i0, long i1, float* hi, float* lo) const;
    // The same by looking at every sample.
    static void ScanExtent(const float* samples, long count, long i0, long i1, float* hi,
                           float* lo);

    long Count() const { return count_; }

  private:
    struct MinMax {
        float hi;
        float lo;
    };
    const float* samples_ = nullptr;
    long count_ = 0;
    // levels_[j] holds one summary per whole block of 2^(kFirstLevelShift + j) samples.
    std::vector<std::vector<MinMax>> levels_;
};

// Reduces a sound to one segment per pixel column of the chart (columns 0 .. width - 1),
// from the summary (or, with `plain` set, by scanning every sample). Returns the number of
// segments written into `segments` (resized to the chart's width): 0, and nothing sketched,
// unless there is more than one sample and a non-zero peak.
int SketchWave(const KLChartGeometry& geometry, const float* samples, const KLWaveSummary& summary,
               long sampleCount, CueTime soundLength, float peak,
               std::vector<KLWaveSegment>& segments, bool plain = false);
