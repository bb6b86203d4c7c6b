#include "phoneme/SoundLevels.h"

#include <algorithm>
#include <cmath>

#include "toolkit/CueSound.h"

long SoundLevels::SpanCount(const CueSound& sound, double seconds) {
    if (!sound.Valid() || !(seconds > 0.0))
        return 0;
    const double spans = double(sound.FrameCount()) / (sound.Rate() * seconds);
    return long(std::ceil(spans - 1e-9));
}

std::vector<double> SoundLevels::Measure(const CueSound& sound, double seconds, long count) {
    std::vector<double> levels;
    if (count <= 0)
        return levels;
    levels.reserve(size_t(count));
    const long frames = sound.FrameCount();
    const int channels = sound.ChannelCount();
    const double perSpan = seconds * sound.Rate();
    for (long i = 0; i < count; ++i) {
        const long begin = std::min(frames, std::lround(double(i) * perSpan));
        const long end = std::min(frames, std::lround(double(i + 1) * perSpan));
        double sum = 0.0;
        for (long f = begin; f < end; ++f) {
            double mix = 0.0;
            for (int c = 0; c < channels; ++c)
                mix += sound.Channel(c)[size_t(f)];
            mix /= channels;
            sum += mix * mix;
        }
        const double rms = end > begin ? std::sqrt(sum / double(end - begin)) : 0.0;
        levels.push_back(rms > 1e-9 ? 20.0 * std::log10(rms) : kSilent);
    }
    return levels;
}
