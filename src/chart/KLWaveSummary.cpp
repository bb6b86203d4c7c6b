#include "chart/KLWaveSummary.h"

#include <algorithm>
#include <cmath>

#include "chart/KLChartGeometry.h"

namespace {
// NaN never raises or lowers an extent: the comparisons are false for it.
inline void take(float s, float* hi, float* lo) {
    if (s > *hi)
        *hi = s;
    if (s < *lo)
        *lo = s;
}

int16_t to_row(double row) {
    if (!(row == row))
        return 0;
    return int16_t(std::clamp(row, -32768.0, 32767.0));
}
}  // namespace

void KLWaveSummary::Clear() {
    samples_ = nullptr;
    count_ = 0;
    levels_.clear();
}

void KLWaveSummary::Build(const float* samples, long count) {
    Clear();
    samples_ = samples;
    count_ = samples ? std::max(count, 0L) : 0;
    long blocks = count_ >> kFirstLevelShift;
    if (blocks == 0)
        return;
    std::vector<MinMax> first(size_t(blocks), MinMax{0.0f, 0.0f});
    for (long b = 0; b < blocks; b++) {
        MinMax m{0.0f, 0.0f};
        const float* p = samples_ + (b << kFirstLevelShift);
        for (int i = 0; i < (1 << kFirstLevelShift); i++)
            take(p[i], &m.hi, &m.lo);
        first[size_t(b)] = m;
    }
    levels_.push_back(std::move(first));
    while (levels_.back().size() >= 2) {
        const std::vector<MinMax>& below = levels_.back();
        std::vector<MinMax> up(below.size() / 2);
        for (size_t b = 0; b < up.size(); b++) {
            up[b].hi = std::max(below[2 * b].hi, below[2 * b + 1].hi);
            up[b].lo = std::min(below[2 * b].lo, below[2 * b + 1].lo);
        }
        levels_.push_back(std::move(up));
    }
}

void KLWaveSummary::ScanExtent(const float* samples, long count, long i0, long i1, float* hi,
                               float* lo) {
    *hi = 0.0f;
    *lo = 0.0f;
    if (!samples)
        return;
    i0 = std::max(i0, 0L);
    i1 = std::min(i1, count);
    for (long i = i0; i < i1; i++)
        take(samples[i], hi, lo);
}

void KLWaveSummary::Extent(long i0, long i1, float* hi, float* lo) const {
    *hi = 0.0f;
    *lo = 0.0f;
    if (!samples_)
        return;
    long i = std::max(i0, 0L);
    const long end = std::min(i1, count_);
    const long firstBlock = 1L << kFirstLevelShift;
    while (i < end) {
        if ((i & (firstBlock - 1)) != 0 || i + firstBlock > end) {
            take(samples_[i], hi, lo);
            i++;
            continue;
        }
        // The largest aligned block that starts at i and ends by `end`.
        size_t level = 0;
        while (level + 1 < levels_.size()) {
            const long size = firstBlock << (level + 1);
            if ((i & (size - 1)) != 0 || i + size > end)
                break;
            level++;
        }
        const MinMax& m = levels_[level][size_t(i >> (kFirstLevelShift + level))];
        if (m.hi > *hi)
            *hi = m.hi;
        if (m.lo < *lo)
            *lo = m.lo;
        i += firstBlock << level;
    }
}

int SketchWave(const KLChartGeometry& geometry, const float* samples, const KLWaveSummary& summary,
               long sampleCount, CueTime soundLength, float peak,
               std::vector<KLWaveSegment>& segments, bool plain) {
    segments.resize(geometry.width);
    if (sampleCount <= 1 || !samples || peak == 0.0f || !(peak == peak))
        return 0;
    const double bandRows = double(geometry.waveHeight) - 1.0;
    const int width = int(std::min<uint32_t>(geometry.width, 32767));
    long i0 = geometry.IndexFromPos(geometry.FractionFromColumn(0), sampleCount, soundLength);
    for (int x = 0; x < width; x++) {
        const long i1 =
            geometry.IndexFromPos(geometry.FractionFromColumn(x + 1), sampleCount, soundLength);
        float hi, lo;
        if (plain)
            KLWaveSummary::ScanExtent(samples, sampleCount, i0, i1, &hi, &lo);
        else
            summary.Extent(i0, i1, &hi, &lo);
        // Positive samples are drawn downward, toward larger rows.
        KLWaveSegment& s = segments[size_t(x)];
        s.x1 = s.x2 = int16_t(x);
        s.y1 = to_row(geometry.waveTop + std::trunc(((hi / peak) + 1.0) / 2.0 * bandRows));
        s.y2 = to_row(geometry.waveTop + std::trunc(((lo / peak) + 1.0) / 2.0 * bandRows));
        i0 = i1;
    }
    return width;
}
