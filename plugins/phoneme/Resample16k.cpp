#include "phoneme/Resample16k.h"

#include <samplerate.h>

#include <algorithm>
#include <cmath>

#include "toolkit/CueSound.h"

bool CanResample16k(double rate) {
    const double ratio = 16000.0 / rate;
    return ratio > 1.0 / 256 && ratio < 256;
}

bool Resample16k(const CueSound& sound, long first, long last, std::vector<int16_t>& out) {
    out.clear();
    const long all = sound.FrameCount();
    first = std::clamp(first, 0L, all);
    last = std::clamp(last, first, all);
    const long frames = last - first;
    const int channels = sound.ChannelCount();
    if (frames == 0 || channels == 0)
        return true;
    if (!CanResample16k(sound.Rate()))
        return false;
    const double ratio = 16000.0 / sound.Rate();
    int error = 0;
    SRC_STATE* state = src_new(SRC_SINC_FASTEST, 1, &error);
    if (!state)
        return false;
    out.reserve(size_t(double(frames) * ratio) + 16);
    constexpr long kBlock = 8192;
    std::vector<float> in(kBlock);
    std::vector<float> converted(size_t(kBlock * ratio) + 64);
    bool ok = true;
    for (long begin = 0; ok; begin += kBlock) {
        const long count = std::max(0L, std::min(kBlock, frames - begin));
        for (long i = 0; i < count; ++i) {
            float mix = 0.0f;
            for (int c = 0; c < channels; ++c)
                mix += sound.Channel(c)[size_t(first + begin + i)];
            in[size_t(i)] = mix / float(channels);
        }
        SRC_DATA data{};
        data.data_in = in.data();
        data.input_frames = count;
        data.src_ratio = ratio;
        data.end_of_input = begin + count >= frames;
        // One block of input may take several calls to be consumed.
        long used = 0;
        do {
            data.data_in = in.data() + used;
            data.input_frames = count - used;
            data.data_out = converted.data();
            data.output_frames = long(converted.size());
            if (src_process(state, &data) != 0) {
                ok = false;
                break;
            }
            for (long i = 0; i < data.output_frames_gen; ++i) {
                const float x = std::clamp(converted[size_t(i)], -1.0f, 1.0f);
                out.push_back(int16_t(std::lrint(x * 32767.0f)));
            }
            used += data.input_frames_used;
            if (data.input_frames_used == 0 && data.output_frames_gen == 0 && !data.end_of_input)
                break;
        } while (used < count || (data.end_of_input && data.output_frames_gen > 0));
        if (data.end_of_input)
            break;
    }
    src_delete(state);
    return ok;
}
