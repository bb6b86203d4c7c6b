#pragma once

#include "toolkit/CueChirrupHost.h"

// The static interface through which recognizer plug-ins put sliders and option menus on
// their settings panels (from CueRecognizer::UpdatePanel) and report the progress of a long
// recognition. Each operation forwards to the host the window installed; without one (batch
// mode, tests) the operations do nothing and return 0.
class CueChirrup {
  public:
    using FloatCallback = CueChirrupHost::FloatCallback;
    using IntCallback = CueChirrupHost::IntCallback;
    using OptionCallback = CueChirrupHost::OptionCallback;

    static int CreateFloatSlider(CueRecognizer* recognizer, const char* name, float minimum,
                                 float maximum, float value, FloatCallback callback);
    static int SetFloatSlider(CueRecognizer* recognizer, const char* name, float value);
    static int CreateIntSlider(CueRecognizer* recognizer, const char* name, int minimum,
                               int maximum, int value, IntCallback callback);
    static int SetIntSlider(CueRecognizer* recognizer, const char* name, int value);
    static int CreateOption(CueRecognizer* recognizer, const char* name, int count,
                            const char* const* labels, int value, OptionCallback callback);
    static int SetOption(CueRecognizer* recognizer, const char* name, int index);
    static void Progress(CueRecognizer* recognizer, float done);

    // The host the operations go to (borrowed; null removes it). Returns the previous one.
    static CueChirrupHost* SetHost(CueChirrupHost* host);
    static CueChirrupHost* Host();
};
