#pragma once

#include <iosfwd>
#include <memory>
#include <string>
#include <vector>

#include "toolkit/CueTime.h"

class CueSound;
class CueTokenList;
class KLImageSGI;

// A recognizer: listens to a sound and proposes, one result per analysis step, which target
// (a phoneme class, a loudness band ...) is heard; each target may be linked to a key shape
// of the keyset the recognizer belongs to. Plug-ins derive from this class (see CuePlugin.h).
//
// Settings block. In a keyset file or a recognizer settings file the statement
// "begin recognizer NAME ..." is followed by the recognizer's settings and a closing "end":
//
//     step FRAMES                                   analysis step, in frames (> 0)
//     target NAME [picture FILE] [sound FILE]       a target's picture and sound
//     ...                                           the plug-in's own statements
//   end
//
// ReadSettings reads these statements up to and including the "end"; statements it does not
// know are handed to ReadParameter, nested begin ... end blocks are skipped whole, and a
// "target" line naming a target the recognizer does not have is skipped. WriteSettings
// writes the statements without the "end" (the caller writes "begin" and "end"). The links
// from targets to key shapes are not settings: they are written in the keyset file's
// "recognizer-links" block.
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

    int shown = 0;  // 1 while the settings panel is up
    // Time between two results; ResetSettings restores defaultStep (one frame at 30 frames
    // per second unless the plug-in sets another).
    CueTime defaultStep = CueTime::FromTicks(CueTime::kTicksPerSecond / CueTime::kDefaultFps);
    CueTime step = defaultStep;
    std::vector<Result> results;
    std::vector<Target> targets;

    Target* FindTarget(const char* name);
    // Index of the target called `name` in `targets`, -1 when there is none.
    int TargetIndex(const char* name) const;
    // Adds a target (unlinked) unless one of that name exists; returns its index.
    int AddTarget(const char* name);
    // True once every target is linked to a key shape (it can then be run).
    virtual bool Configured() const;

    // Settings (see above): reset to the defaults (step, target pictures and sounds; the
    // links stay), read a block up to and including its "end" (false when the stream ends
    // first), write the block's statements.
    virtual void ResetSettings();
    virtual bool ReadSettings(std::istream& in);
    virtual void WriteSettings(std::ostream& out) const;

    // Fills `results` from `sound`; false when the sound cannot be analysed.
    virtual bool Recognize(const CueSound& sound) = 0;
    // Puts the recognizer's own controls on its settings panel (through CueChirrup).
    virtual void UpdatePanel() {}
    // A new recognizer of the same kind with default settings.
    virtual CueRecognizer* Clone() const = 0;

    // The same operations for callers outside plug-in code: an exception thrown by the
    // plug-in is caught, reported as a warning ("Recognizer [NAME] failed: ...") and turned
    // into a failure (false, or null). GuardedRecognize leaves no results on failure.
    bool GuardedReadSettings(std::istream& in);
    bool GuardedWriteSettings(std::ostream& out) const;
    bool GuardedResetSettings();
    bool GuardedRecognize(const CueSound& sound);
    std::unique_ptr<CueRecognizer> GuardedClone() const;

    // The recognizer's settings file "%s/%s.config": the data directory (CuePrefs::MiscDir)
    // when a project is set, else the current directory ".", and the recognizer's name.
    std::string ConfigFileName() const;

  protected:
    // A statement of the settings block that ReadSettings does not handle itself (anything
    // but "step", "target", "begin" and "end"); unknown statements are to be ignored.
    virtual void ReadParameter(const CueTokenList& statement);
    // Writes the plug-in's own statements, each line indented by four blanks.
    virtual void WriteParameters(std::ostream& out) const;

  private:
    void read_target(const CueTokenList& statement);

    std::string name_;
};
