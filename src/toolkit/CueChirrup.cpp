#include "toolkit/CueChirrup.h"

namespace {
CueChirrupHost* theHost = nullptr;

// Hands a control's operation to the host when there is one and the control has a name;
// 0 otherwise.
template <typename Call>
int to_host(const char* name, Call call) {
    return theHost && name ? call(*theHost) : 0;
}
}  // namespace

int CueChirrup::CreateFloatSlider(CueRecognizer* recognizer, const char* name, float minimum,
                                  float maximum, float value, FloatCallback callback) {
    return to_host(name, [&](CueChirrupHost& host) {
        return host.CreateFloatSlider(recognizer, name, minimum, maximum, value, callback);
    });
}

int CueChirrup::SetFloatSlider(CueRecognizer* recognizer, const char* name, float value) {
    return to_host(
        name, [&](CueChirrupHost& host) { return host.SetFloatSlider(recognizer, name, value); });
}

int CueChirrup::CreateIntSlider(CueRecognizer* recognizer, const char* name, int minimum,
                                int maximum, int value, IntCallback callback) {
    return to_host(name, [&](CueChirrupHost& host) {
        return host.CreateIntSlider(recognizer, name, minimum, maximum, value, callback);
    });
}

int CueChirrup::SetIntSlider(CueRecognizer* recognizer, const char* name, int value) {
    return to_host(
        name, [&](CueChirrupHost& host) { return host.SetIntSlider(recognizer, name, value); });
}

int CueChirrup::CreateOption(CueRecognizer* recognizer, const char* name, int count,
                             const char* const* labels, int value, OptionCallback callback) {
    if (count < 0 || (count > 0 && !labels))
        return 0;
    return to_host(name, [&](CueChirrupHost& host) {
        return host.CreateOption(recognizer, name, count, labels, value, callback);
    });
}

int CueChirrup::SetOption(CueRecognizer* recognizer, const char* name, int index) {
    return to_host(name,
                   [&](CueChirrupHost& host) { return host.SetOption(recognizer, name, index); });
}

void CueChirrup::Progress(CueRecognizer* recognizer, float done) {
    if (theHost)
        theHost->Progress(recognizer, done);
}

CueChirrupHost* CueChirrup::SetHost(CueChirrupHost* host) {
    CueChirrupHost* previous = theHost;
    theHost = host;
    return previous;
}

CueChirrupHost* CueChirrup::Host() {
    return theHost;
}
