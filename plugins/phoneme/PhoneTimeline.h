#pragma once

#include <vector>

// Turns the decoder's phone segments into one target per analysis step. Pure arithmetic, so
// that it can be tested without the decoder.
class PhoneTimeline {
  public:
    // A recognised phone: its target index and its span in seconds from the start of the
    // sound, start inclusive, end exclusive.
    struct Segment {
        int target;
        double start;
        double end;
    };

    // The number of steps of `step` seconds that cover `length` seconds: a last, shorter
    // stretch counts as a step of its own.
    static long StepCount(double length, double step);
    // One target per step: step i covers [i * step, (i + 1) * step) and takes the target of
    // the segment that covers most of it; `silence` where no segment covers it.
    static std::vector<int> StepTargets(const std::vector<Segment>& segments, double step,
                                        long count, int silence);
    // Steps whose level (`levels`, dBFS, one per step) is below `floor` become `silence`:
    // the decoder names some phone even in digital silence.
    static void SilenceQuietSteps(std::vector<int>& targets, const std::vector<double>& levels,
                                  double floor, int silence);
    // The level (dBFS) from which a step sounds like speech rather than a pause: within
    // `belowPeak` dB of the loudest step and at least `aboveFloor` dB above the background
    // (the level that a tenth of the steps stay under). Without steps, +infinity.
    static double SpeechLevel(const std::vector<double>& levels, double belowPeak,
                              double aboveFloor);
    // The decoder takes some spoken stretches for silence (nasals, the weak ends of
    // syllables). A `silence` step at least as loud as `speech` takes the nearest other
    // target within `reach` steps (the earlier one when two are as near); one further away
    // stays silence.
    static void FillLoudSilence(std::vector<int>& targets, const std::vector<double>& levels,
                                double speech, long reach, int silence);
    // Runs shorter than `minimum` steps are absorbed by the longer of their neighbours (the
    // earlier one on a tie), one-step runs first, so that flickers vanish while every run
    // that is long enough keeps its place.
    static void AbsorbShortRuns(std::vector<int>& targets, int minimum);
};
