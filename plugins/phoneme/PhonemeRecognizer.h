#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "phoneme/PhoneDecoder.h"
#include "toolkit/CueRecognizer.h"

// Recognises the phones of English speech with PocketSphinx (the en-us acoustic model and its
// phonetic language model): one target per phone of the model ("AA" ... "ZH", ARPAbet names)
// and "SIL" for silence and noise, one result per analysis step.
//
// Settings statements, besides "step" and "target":
//     minimum STEPS          runs of one phone shorter than this many steps join a neighbour
//                            (default 2: one-step flickers vanish)
//     speed fast|balanced|accurate   the decoder's speed against accuracy (default fast)
//     threads N              decoders run side by side (0, the default: one per core)
//     models DIR             the model folder (default /usr/share/pocketsphinx/model/en-us)
//
// Every target's sound is a short spoken sample of the phone, shipped beside the plug-in in
// "Phoneme-samples/PHONE.wav", for auditioning in the link dialog.
class PhonemeRecognizer : public CueRecognizer {
  public:
    static constexpr const char* kDefaultModels = "/usr/share/pocketsphinx/model/en-us";
    static constexpr int kDefaultMinimum = 2;
    static constexpr int kMaximumMinimum = 10;
    static constexpr int kMaximumThreads = 16;
    // Steps quieter than this (dBFS) are silence whatever the decoder says.
    static constexpr double kQuietLevel = -60.0;
    // Steps within this many dB of the loudest and this many above the background are
    // speech: where the decoder hears silence in one, the nearest phone within kSpeechReach
    // seconds is taken instead.
    static constexpr double kSpeechBelowPeak = 25.0;
    static constexpr double kSpeechAboveFloor = 20.0;
    static constexpr double kSpeechReach = 0.2;
    static const char* const kSpeedNames[3];

    PhonemeRecognizer();
    ~PhonemeRecognizer() override;

    int minimum = kDefaultMinimum;
    PhoneDecoder::Effort speed = PhoneDecoder::kFast;
    int threads = 0;
    std::string models = kDefaultModels;

    void ResetSettings() override;
    bool Recognize(const CueSound& sound) override;
    void UpdatePanel() override;
    CueRecognizer* Clone() const override;

    // The folder of the phone samples: "Phoneme-samples" beside the plug-in file.
    static std::string SampleFolder();

  protected:
    void ReadParameter(const CueTokenList& statement) override;
    void WriteParameters(std::ostream& out) const override;

  private:
    void set_sample_sounds();
    bool recognize(const CueSound& sound);
    // Decoders for the current models and speed, `count` of them; false when the decoder
    // cannot start.
    bool ready_decoders(size_t count);
    int thread_count() const;

    std::vector<std::unique_ptr<PhoneDecoder>> decoders_;
    std::string decoderModels_;
    PhoneDecoder::Effort decoderSpeed_ = PhoneDecoder::kFast;
};
