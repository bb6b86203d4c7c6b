#include "toolkit/CueChirrup.h"

namespace {
CueChirrupHost* theHost = nullptr;
}

int CueChirrup::CreateFloatSlider(CueRecognizer* recognizer, const char* name, float minimum,
                                  float maximum, float value, FloatCallback callback) {
    return theHost && name
               ? theHost->CreateFloatSlider(recognizer, name, minimum, maximum, value, callback)
               : 0;
}

int CueChirrup::SetFloatSlider(CueRecognizer* recognizer, const char* name, float value) {
    return theHost && name ? theHost->SetFloatSlider(recognizer, name, value) : 0;
}

int CueChirrup::CreateIntSlider(CueRecognizer* recognizer, const char* name, int minimum,
                                int maximum, int value, IntCallback callback) {
    return theHost && name
               ? theHost->CreateIntSlider(recognizer, name, minimum, maximum, value, callback)
               : 0;
}

int CueChirrup::SetIntSlider(CueRecognizer* recognizer, const char* name, int value) {
    return theHost && name ? theHost->SetIntSlider(recognizer, name, value) : 0;
}

int CueChirrup::CreateOption(CueRecognizer* recognizer, const char* name, int count,
                             const char* const* labels, int value, OptionCallback callback) {
    if (!theHost || !name || count < 0 || (count > 0 && !labels))
        return 0;
    return theHost->CreateOption(recognizer, name, count, labels, value, callback);
}

int CueChirrup::SetOption(CueRecognizer* recognizer, const char* name, int index) {
    return theHost && name ? theHost->SetOption(recognizer, name, index) : 0;
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
