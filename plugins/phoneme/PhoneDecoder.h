#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "phoneme/PhoneTimeline.h"

struct ps_decoder_s;
struct cmd_ln_s;

// One PocketSphinx decoder doing phone recognition: the en-us acoustic model with the
// phonetic language model, over 16 kHz mono 16-bit samples. Not shareable between threads;
// the recognizer makes one per worker.
class PhoneDecoder {
  public:
    // How the decoder trades speed for accuracy: the widths of its search beams.
    enum Effort { kFast = 0, kBalanced = 1, kAccurate = 2 };

    // The files of a model folder that the decoder needs, relative to the folder.
    static const std::vector<std::string>& ModelFiles();
    // The first needed file missing from `modelDir`, empty when all are there.
    static std::string MissingFile(const std::string& modelDir);

    // Whether a decoder can start on the model in `modelDir`, tried in a child process: the
    // decoder library ends the whole process on a damaged model file. Asked once per folder
    // for the life of the process.
    static bool ModelLoads(const std::string& modelDir);

    PhoneDecoder(const std::string& modelDir, Effort effort);
    ~PhoneDecoder();
    PhoneDecoder(const PhoneDecoder&) = delete;
    PhoneDecoder& operator=(const PhoneDecoder&) = delete;

    bool Ready() const { return decoder_ != nullptr; }
    // The phones heard in samples [begin, end) of `samples`, times in seconds from the start
    // of `samples`; false when the decoder failed.
    bool Decode(const std::vector<int16_t>& samples, long begin, long end,
                std::vector<PhoneTimeline::Segment>& out);

  private:
    ps_decoder_s* decoder_ = nullptr;
    cmd_ln_s* config_ = nullptr;
    std::vector<int16_t> piece_;  // the piece being decoded, dithered
};
