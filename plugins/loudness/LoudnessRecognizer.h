#pragma once

#include "toolkit/CueRecognizer.h"

// Opens the mouth with the loudness of the sound: the RMS level of each analysis step, in
// decibels relative to full scale, picks one of the targets "closed" (below the half level),
// "half" (from the half level up to the open level) and "open" (the open level and above).
//
// Settings statement: "levels HALF OPEN", two dBFS values (HALF below OPEN); the defaults
// are -36 and -24.
class LoudnessRecognizer : public CueRecognizer {
  public:
    static constexpr float kDefaultHalfLevel = -36.0f;
    static constexpr float kDefaultOpenLevel = -24.0f;
    // The level given to a step of pure silence, in dBFS.
    static constexpr float kSilenceLevel = -120.0f;

    LoudnessRecognizer();

    float halfLevel = kDefaultHalfLevel;
    float openLevel = kDefaultOpenLevel;

    void ResetSettings() override;
    bool Recognize(const CueSound& sound) override;
    // The panel's sliders: the analysis step in frames and the two levels in dBFS.
    void UpdatePanel() override;
    CueRecognizer* Clone() const override;

    // The RMS level in dBFS of samples [begin, end) of the mix of `sound`'s channels.
    static float LevelOf(const CueSound& sound, long begin, long end);

  protected:
    void ReadParameter(const CueTokenList& statement) override;
    void WriteParameters(std::ostream& out) const override;
};
