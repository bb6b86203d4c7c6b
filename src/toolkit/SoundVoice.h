#pragma once

#include <samplerate.h>

#include <vector>

class CueSound;

// Reads a sound at a varying position for the output device: forwards or backwards, at a
// speed (pitch moves with speed, as on tape), resampled to the device's rate and channel
// count through libsamplerate's pull interface. All buffers are made by the constructor, so
// Render and Jump never allocate and may run on the sound thread. Positions are in frames of
// the sound (fractional); frames outside the sound read as silence.
class SoundVoice {
  public:
    SoundVoice(int deviceRate, int deviceChannels);
    ~SoundVoice();
    SoundVoice(const SoundVoice&) = delete;
    SoundVoice& operator=(const SoundVoice&) = delete;

    bool Valid() const { return state_ != nullptr; }

    // Borrows `sound` (null: silence) and sets the direction (+1 or -1) and speed (> 0). The
    // position is undefined until the next Jump.
    void Set(const CueSound* sound, int direction, double speed);
    // Moves the position to the frame nearest `frame` and forgets the resampler's history (a cut).
    void Jump(double frame);
    // The position of the next frame Render writes.
    double Position() const { return position_; }
    // Sound frames the position moves per device frame (signed).
    double Step() const;

    // Writes `frames` interleaved device frames into `out` and moves the position on.
    void Render(float* out, long frames);

  private:
    static long pull(void* self, float** data);
    long fill();

    int deviceRate_, channels_;
    SRC_STATE* state_ = nullptr;
    std::vector<float> input_;  // one block of input frames in device channels

    const CueSound* sound_ = nullptr;
    int direction_ = 1;
    double speed_ = 1.0;
    double position_ = 0.0;  // sound frame of the next output frame
    long next_ = 0;          // sound frame the next input block starts at
};
