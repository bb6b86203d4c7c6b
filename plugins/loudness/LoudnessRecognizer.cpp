#include "loudness/LoudnessRecognizer.h"

#include <algorithm>
#include <cmath>
#include <ostream>

#include "toolkit/CueChirrup.h"
#include "toolkit/CuePlugin.h"
#include "toolkit/CueSound.h"
#include "toolkit/CueTokenList.h"

CHIRRUP_PLUGIN(LoudnessRecognizer)

LoudnessRecognizer::LoudnessRecognizer() : CueRecognizer("Loudness") {
    AddTarget("closed");
    AddTarget("half");
    AddTarget("open");
}

void LoudnessRecognizer::ResetSettings() {
    CueRecognizer::ResetSettings();
    halfLevel = kDefaultHalfLevel;
    openLevel = kDefaultOpenLevel;
}

CueRecognizer* LoudnessRecognizer::Clone() const {
    return new LoudnessRecognizer();
}

// Only the sound's inline accessors are used, so that the plug-in needs nothing of the
// program beyond CueRecognizer itself.
float LoudnessRecognizer::LevelOf(const CueSound& sound, long begin, long end) {
    const int channels = sound.ChannelCount();
    if (channels == 0 || end <= begin)
        return kSilenceLevel;
    double sum = 0.0;
    for (long i = begin; i < end; ++i) {
        double mix = 0.0;
        for (int c = 0; c < channels; ++c)
            mix += sound.Channel(c)[size_t(i)];
        mix /= channels;
        sum += mix * mix;
    }
    const double rms = std::sqrt(sum / double(end - begin));
    const double db = rms > 0.0 ? 20.0 * std::log10(rms) : kSilenceLevel;
    return float(std::fmax(db, kSilenceLevel));
}

// One result per step of the sound: results[i] covers samples [i * n, (i + 1) * n), where n
// is the step in samples; a last, shorter stretch gets a result of its own.
bool LoudnessRecognizer::Recognize(const CueSound& sound) {
    results.clear();
    if (!sound.Valid() || step <= CueTime())
        return false;
    const long perStep = std::lround(step.Seconds() * sound.Rate());
    if (perStep < 1)
        return false;
    const long frames = sound.FrameCount();
    for (long begin = 0; begin < frames; begin += perStep) {
        const long end = begin + perStep < frames ? begin + perStep : frames;
        const float level = LevelOf(sound, begin, end);
        const int target = level < halfLevel ? 0 : level < openLevel ? 1 : 2;
        results.push_back({targets[size_t(target)].keyShapeIndex, target});
    }
    return true;
}

// "levels HALF OPEN"; a pair that is out of order is refused and the levels stay as they are.
void LoudnessRecognizer::ReadParameter(const CueTokenList& s) {
    if (s.Matches("levels") && s.Count() == 3) {
        const float half = s.ArgFloat(1);
        const float open = s.ArgFloat(2);
        if (half < open) {
            halfLevel = half;
            openLevel = open;
        }
    }
}

void LoudnessRecognizer::WriteParameters(std::ostream& out) const {
    out << "    levels " << halfLevel << " " << openLevel << "\n";
}

namespace {
void step_changed(void* r, int frames) {
    static_cast<LoudnessRecognizer*>(r)->step = CueTime::FromFrames(frames);
}
// A level dragged past the other one takes the other one along, so that half stays below
// open.
void half_changed(void* r, float level) {
    auto* loudness = static_cast<LoudnessRecognizer*>(r);
    loudness->halfLevel = level;
    if (loudness->openLevel <= level) {
        loudness->openLevel = level + 1.0f;
        CueChirrup::SetFloatSlider(loudness, "open", loudness->openLevel);
    }
}
void open_changed(void* r, float level) {
    auto* loudness = static_cast<LoudnessRecognizer*>(r);
    loudness->openLevel = level;
    if (loudness->halfLevel >= level) {
        loudness->halfLevel = level - 1.0f;
        CueChirrup::SetFloatSlider(loudness, "half", loudness->halfLevel);
    }
}
}  // namespace

void LoudnessRecognizer::UpdatePanel() {
    CueChirrup::CreateIntSlider(this, "step", 1, 15, std::max(1, int(std::lround(step.Frames()))),
                                step_changed);
    CueChirrup::CreateFloatSlider(this, "half", -60.0f, -1.0f, halfLevel, half_changed);
    CueChirrup::CreateFloatSlider(this, "open", -59.0f, 0.0f, openLevel, open_changed);
}
