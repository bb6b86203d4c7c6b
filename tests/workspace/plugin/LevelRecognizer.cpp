// A recognizer plug-in for the tests: sorts each step by its peak amplitude into "silent"
// (below the first threshold), "quiet" (below the second) and "loud". Settings:
// "threshold QUIET LOUD"; "throw" throws, as does a one-sample sound above 1, so that the
// tests can check that no exception leaves a plug-in call.
#include <cmath>
#include <ostream>
#include <stdexcept>

#include "toolkit/CuePlugin.h"
#include "toolkit/CueSound.h"
#include "toolkit/CueTokenList.h"

class LevelRecognizer : public CueRecognizer {
  public:
    LevelRecognizer() : CueRecognizer("Level") {
        AddTarget("silent"), AddTarget("quiet"), AddTarget("loud");
        defaultStep = step = CueTime::FromTicks(600);  // 0.1 s
    }
    float quiet = 0.01f, loud = 0.5f;

    void ResetSettings() override { CueRecognizer::ResetSettings(), quiet = 0.01f, loud = 0.5f; }
    bool Recognize(const CueSound& sound) override {
        results.clear();
        if (sound.ChannelCount() == 0)
            return false;
        const std::vector<float>& samples = sound.Channel(0);
        if (samples.size() == 1 && samples[0] > 1.0f)
            throw std::runtime_error("sample out of range");
        const size_t perStep = size_t(std::lround(step.Seconds() * sound.Rate()));
        for (size_t begin = 0; begin < samples.size(); begin += perStep) {
            float peak = 0.0f;
            for (size_t i = begin; i < samples.size() && i < begin + perStep; ++i)
                peak = std::fmax(peak, std::fabs(samples[i]));
            const int t = peak < quiet ? 0 : peak < loud ? 1 : 2;
            results.push_back({targets[size_t(t)].keyShapeIndex, t});
        }
        return true;
    }
    CueRecognizer* Clone() const override { return new LevelRecognizer(); }

  protected:
    void ReadParameter(const CueTokenList& s) override {
        if (s.Matches("threshold") && s.Count() == 3)
            quiet = s.ArgFloat(1), loud = s.ArgFloat(2);
        else if (s.Matches("throw"))
            throw std::runtime_error("told to throw");
    }
    void WriteParameters(std::ostream& out) const override {
        out << "    threshold " << quiet << " " << loud << "\n";
    }
};

CHIRRUP_PLUGIN(LevelRecognizer)
