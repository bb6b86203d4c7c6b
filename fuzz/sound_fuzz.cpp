// Decodes arbitrary bytes as a sound file: whatever they hold, CueSound must give a sound or
// a message, within the time limit, without touching memory it does not own.

#include <cstddef>
#include <cstdint>

#include "toolkit/CueSound.h"
#include "toolkit/KLErrHandler.h"

namespace {

// Drops the toolkit's reports so that the run is not slowed by printing them.
class Silent : public KLErrHandler {
public:
    void Handle(KLErr*) override {}
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static Silent silent;
    auto sound = CueSound::FromMemory(data, size, "fuzz");
    if (sound->Valid()) {
        sound->ComputeMinMax();
        (void)sound->ChannelData(-1);
        (void)sound->Length();
    }
    return 0;
}
