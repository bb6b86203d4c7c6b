#pragma once

#include <iosfwd>
#include <string>
#include <vector>

#include "toolkit/CueTime.h"

class CueSound;
class KLImageSGI;

// A recognizer: listens to a sound and proposes, one result per analysis step, which target
// (a phoneme class, a loudness band ...) is heard; each target may be linked to a key shape
// of the keyset the recognizer belongs to. Plug-ins derive from this class.
class CueRecognizer {
public:
    // One recognised target class, linked to a key shape by index (-1: not linked).
    struct Target {
        std::string name;
        int keyShapeIndex = -1;
        std::string pictureFile;  // optional picture of the target, for the link dialog
        std::string soundFile;    // optional sound of the target, for auditioning
    };
    struct Result {
        int shapeIndex;  // the linked key shape of the recognised target, -1 when unlinked
        int targetIndex;
    };

    explicit CueRecognizer(std::string name);
    virtual ~CueRecognizer();

    const char* Name() const { return name_.c_str(); }

    int shown = 0;           // 1 while the settings panel is up
    CueTime step;            // time between two results
    std::vector<Result> results;
    std::vector<Target> targets;

    Target* FindTarget(const char* name);
    // True once every target is linked to a key shape (it can then be run).
    virtual bool Configured() const;

    // Settings: reset to the defaults, read the body of a "begin recognizer" block up to and
    // including its "end" (false on a malformed block), write the body lines (the caller
    // writes "begin" and "end").
    virtual void ResetSettings() {}
    virtual bool ReadSettings(std::istream& in);
    virtual void WriteSettings(std::ostream& out) const;

    // Fills `results` from `sound`; false when the sound cannot be analysed.
    virtual bool Recognize(const CueSound& sound) = 0;
    // Puts the recognizer's own controls on its settings panel (through CueChirrup).
    virtual void UpdatePanel() {}
    // A new recognizer of the same kind with default settings.
    virtual CueRecognizer* Clone() const = 0;

private:
    std::string name_;
};
