#include "toolkit/SoundVoice.h"

#include <algorithm>
#include <cmath>

#include "toolkit/CueSound.h"

namespace {
constexpr long kBlockFrames = 256;  // input frames handed to the resampler per pull
}

SoundVoice::SoundVoice(int deviceRate, int deviceChannels)
    : deviceRate_(deviceRate), channels_(deviceChannels) {
    int error = 0;
    if (deviceRate_ > 0 && channels_ > 0)
        state_ = src_callback_new(&SoundVoice::pull, SRC_SINC_FASTEST, channels_, &error, this);
    input_.assign(size_t(kBlockFrames * std::max(channels_, 1)), 0.0f);
}

SoundVoice::~SoundVoice() {
    if (state_)
        src_delete(state_);
}

void SoundVoice::Set(const CueSound* sound, int direction, double speed) {
    sound_ = sound && sound->Valid() && sound->FrameCount() > 0 ? sound : nullptr;
    direction_ = direction < 0 ? -1 : 1;
    speed_ = speed > 0 ? speed : 1.0;
}

void SoundVoice::Jump(double frame) {
    // On a whole frame, so that output frames fall exactly on the resampler's input.
    next_ = std::lround(frame);
    position_ = double(next_);
    if (state_)
        src_reset(state_);
}

double SoundVoice::Step() const {
    double rate = sound_ ? sound_->Rate() : deviceRate_;
    return direction_ * speed_ * rate / deviceRate_;
}

void SoundVoice::Render(float* out, long frames) {
    long done = 0;
    if (state_ && sound_) {
        // Device frames per sound frame; libsamplerate accepts 1/256 to 256.
        double ratio = std::clamp(deviceRate_ / (sound_->Rate() * speed_), 1.0 / 256, 256.0);
        done = std::max(0L, src_callback_read(state_, ratio, frames, out));
    }
    std::fill(out + done * channels_, out + frames * channels_, 0.0f);
    for (long i = 0; i < done * channels_; i++)
        out[i] = std::clamp(out[i], -1.0f, 1.0f);
    position_ += Step() * double(frames);
}

long SoundVoice::pull(void* self, float** data) {
    auto* voice = static_cast<SoundVoice*>(self);
    *data = voice->input_.data();
    return voice->fill();
}

// One block from next_ in the play direction. Device channels take the sound's channel of
// the same number (the last one when the sound has fewer); a mono device takes the mix.
long SoundVoice::fill() {
    const long count = sound_ ? sound_->FrameCount() : 0;
    const int soundChannels = sound_ ? sound_->ChannelCount() : 0;
    float* out = input_.data();
    for (long i = 0; i < kBlockFrames; i++, out += channels_) {
        long f = next_ + direction_ * i;
        bool inside = f >= 0 && f < count;
        if (!inside) {
            std::fill(out, out + channels_, 0.0f);
        } else if (channels_ == 1 && soundChannels > 1) {
            float sum = 0.0f;
            for (int c = 0; c < soundChannels; c++)
                sum += sound_->Channel(c)[size_t(f)];
            out[0] = sum / float(soundChannels);
        } else {
            for (int c = 0; c < channels_; c++)
                out[c] = sound_->Channel(std::min(c, soundChannels - 1))[size_t(f)];
        }
    }
    next_ += direction_ * kBlockFrames;
    return kBlockFrames;
}
