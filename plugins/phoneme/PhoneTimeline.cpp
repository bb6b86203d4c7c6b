#include "phoneme/PhoneTimeline.h"

#include <algorithm>
#include <cmath>

long PhoneTimeline::StepCount(double length, double step) {
    if (!(length > 0.0) || !(step > 0.0))
        return 0;
    // A sliver of a microsecond beyond a whole step is rounding, not a step of its own.
    return long(std::ceil(length / step - 1e-6));
}

std::vector<int> PhoneTimeline::StepTargets(const std::vector<Segment>& segments, double step,
                                            long count, int silence) {
    std::vector<int> out(size_t(std::max(0L, count)), silence);
    std::vector<double> covered(out.size(), 0.0);
    for (const Segment& s : segments) {
        if (!(s.end > s.start) || step <= 0.0)
            continue;
        const long first = std::max(0L, long(std::floor(s.start / step)));
        const long last = std::min(count - 1, long(std::floor(s.end / step)));
        for (long i = first; i <= last; ++i) {
            const double overlap = std::min(s.end, (i + 1) * step) - std::max(s.start, i * step);
            if (overlap > covered[size_t(i)]) {
                covered[size_t(i)] = overlap;
                out[size_t(i)] = s.target;
            }
        }
    }
    return out;
}

void PhoneTimeline::SilenceQuietSteps(std::vector<int>& targets, const std::vector<double>& levels,
                                      double floor, int silence) {
    for (size_t i = 0; i < targets.size() && i < levels.size(); ++i)
        if (levels[i] < floor)
            targets[i] = silence;
}

double PhoneTimeline::SpeechLevel(const std::vector<double>& levels, double belowPeak,
                                  double aboveFloor) {
    if (levels.empty())
        return HUGE_VAL;
    std::vector<double> sorted = levels;
    const auto tenth = sorted.begin() + long(sorted.size() / 10);
    std::nth_element(sorted.begin(), tenth, sorted.end());
    const double background = *tenth;
    const double peak = *std::max_element(levels.begin(), levels.end());
    return std::max(peak - belowPeak, background + aboveFloor);
}

void PhoneTimeline::FillLoudSilence(std::vector<int>& targets, const std::vector<double>& levels,
                                    double speech, long reach, int silence) {
    const std::vector<int> heard = targets;
    const long n = long(std::min(targets.size(), levels.size()));
    for (long i = 0; i < n; ++i) {
        if (heard[size_t(i)] != silence || !(levels[size_t(i)] >= speech))
            continue;
        for (long d = 1; d <= reach; ++d) {
            if (i - d >= 0 && heard[size_t(i - d)] != silence) {
                targets[size_t(i)] = heard[size_t(i - d)];
                break;
            }
            if (i + d < long(heard.size()) && heard[size_t(i + d)] != silence) {
                targets[size_t(i)] = heard[size_t(i + d)];
                break;
            }
        }
    }
}

namespace {
struct Run {
    int target;
    long length;
};
}  // namespace

void PhoneTimeline::AbsorbShortRuns(std::vector<int>& targets, int minimum) {
    std::vector<Run> runs;
    for (int t : targets) {
        if (!runs.empty() && runs.back().target == t)
            ++runs.back().length;
        else
            runs.push_back({t, 1});
    }
    // Lengths 1, 2, ... in turn: every run of at most that length joins a neighbour in one
    // linear pass, so that the whole takes `minimum` passes however long the sound.
    for (long limit = 1; limit < minimum; ++limit) {
        bool changed = true;
        while (changed && runs.size() > 1) {
            changed = false;
            std::vector<Run> out;
            out.reserve(runs.size());
            for (size_t i = 0; i < runs.size(); ++i) {
                const Run r = runs[i];
                const bool hasAfter = i + 1 < runs.size();
                if (r.length <= limit && (!out.empty() || hasAfter)) {
                    changed = true;
                    if (!out.empty() && (!hasAfter || out.back().length >= runs[i + 1].length))
                        out.back().length += r.length;
                    else
                        runs[i + 1].length += r.length;
                    continue;
                }
                if (!out.empty() && out.back().target == r.target)
                    out.back().length += r.length;
                else
                    out.push_back(r);
            }
            runs.swap(out);
        }
    }
    targets.clear();
    for (const Run& r : runs)
        targets.insert(targets.end(), size_t(r.length), r.target);
}
