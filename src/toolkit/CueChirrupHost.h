#pragma once

// What the program's window offers recognizers for their settings panels; CueChirrup forwards
// its static operations to the one host installed (see CueChirrup::SetHost). `recognizer` is
// the recognizer object whose panel gets the control; `name` is the control's name there.
class CueRecognizer;

class CueChirrupHost {
  public:
    typedef void (*FloatCallback)(void* recognizer, float value);
    typedef void (*IntCallback)(void* recognizer, int value);
    typedef void (*OptionCallback)(void* recognizer, int index);

    virtual ~CueChirrupHost() = default;

    // Each Create* adds the control to the panel (returns 1) or, when a control of that name
    // exists already, only sets its value and returns 0; each Set* sets an existing control.
    virtual int CreateFloatSlider(CueRecognizer* recognizer, const char* name, float minimum,
                                  float maximum, float value, FloatCallback callback) = 0;
    virtual int SetFloatSlider(CueRecognizer* recognizer, const char* name, float value) = 0;
    virtual int CreateIntSlider(CueRecognizer* recognizer, const char* name, int minimum,
                                int maximum, int value, IntCallback callback) = 0;
    virtual int SetIntSlider(CueRecognizer* recognizer, const char* name, int value) = 0;
    virtual int CreateOption(CueRecognizer* recognizer, const char* name, int count,
                             const char* const* labels, int value, OptionCallback callback) = 0;
    virtual int SetOption(CueRecognizer* recognizer, const char* name, int index) = 0;
    // Called from the thread that runs Recognize while a long recognition is under way, with
    // the share done (0 to 1); the host shows it and keeps its window alive.
    virtual void Progress(CueRecognizer* recognizer, float done) = 0;
};
