#pragma once

#include <memory>
#include <string>

#include "toolkit/CueRecognizerCatalog.h"
#include "toolkit/CueTime.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLStdImp.h"

class CueRecognizer;
class CueSound;
class CueStatement;
class KLEdlEvent;
class KLImageSGI;
class KLKeyFrameList;
class KLKeySet;
class KLKeyTrack;
class KLMarkTrack;
class KLScene;
class KLWireSource;

// The workspace: owns everything loaded (keysets and their key tracks, the mark track, the
// sound, the scene, reference and playblast images, the apply event, the recognizer
// catalogue) and performs every load, save and apply. It reaches the user only through
// theGhost.
class Imp : public KLStdImp {
  public:
    static constexpr int kMaxKeysets = 10;
    // The highest frame rate accepted (a frame must stay several ticks long); above it the
    // rate is clamped with a warning.
    static constexpr int kMaxFps = 1000;

    // The error log: a file that collects the toolkit's reports, opened and closed for every
    // message so that it is complete on disk at every moment.
    class KLErrorLog : public KLErrHandler {
      public:
        explicit KLErrorLog(const char* name);
        ~KLErrorLog() override;
        void Handle(KLErr* e) override;
        void append_msg(const char* text);
        void View();
        const char* FileName() const { return fileName.empty() ? nullptr : fileName.c_str(); }

        int handled = 0;
        int handledAtView = 0;
        std::string fileName;
    };

    Imp();
    ~Imp() override;

    // --- KLStdImp (the directories are the base's: the preference directories)
    float DefaultKeyFrame() override { return wireFrame; }
    void SetTrackModified() override { trackModified = 1; }
    int KeyFramePreparation() override { return geometryActive; }
    void Inform(const char* message, const char* button) override;
    int Confirm(const char* message, const char* yes, const char* no) override;

    // --- accessors and small operations
    void SetFps(int n);
    KLKeySet* GetKeySet(int i);
    KLKeySet* GetKeySet(const char* name);
    int GetKeySetId(const char* name);
    KLKeyTrack* GetKeyTrack(int i);
    void PrepareKeyFrames(int unused);
    void SetFeedback(int mode);
    void SetDuration(CueTime t);
    void SetReferenceOffset(CueTime t);
    void SetPlayblastOffset(CueTime t);
    void SetErrorFilename(const char* name);
    void ViewErrorLog();
    void UIShowErrorFlag();
    void UIClearErrorFlag();

    // --- keyset description and keyset files
    int LoadKeyset(const char* name);
    int SaveKeyset(const char* name);
    int VerifyKeysets();
    void clear_keyset_data();
    int ConfigureRecognizer(CueRecognizer* recognizer, const char* fileName);

    // --- track files and sound
    int LoadTrack(const char* name);
    int SaveTrack(const char* name);
    int LoadSound(const char* name);
    CueTime compute_duration(CueTime requested);

    // --- reference and playblast sequences
    int LoadReference(const char* name);
    // The playblast sequence: the same name rules and dialog as LoadReference.
    int LoadPlayblast(const char* name);
    void DeleteReference();
    void DeletePlayblast();
    CueTime ReferenceEnd();
    CueTime PlayblastEnd();
    // The picture shown at `t`: frame (t - offset).Frame() of the sequence at the workspace
    // rate, truncated toward zero like every frame number; null outside [0, count).
    KLImageSGI* GetReference(CueTime t);
    KLImageSGI* GetPlayblast(CueTime t);

    // --- apply and batch mode
    void OpenApplyWire(const char* name);
    int ApplyWire(KLWireSource* source, const char* keyset, const char* dag, CueTime start,
                  CueTime end, CueTime offset);
    void BatchApply(const char* keysetFile, const char* trackFile, const char* applyFile,
                    const char* outFile, const char* dag, CueTime offset);

    // Emergency save on a fatal signal: "_m.keyset" and, with a sound, "_m.track".
    static void save_on_crash(int signal, void* data);

    // --- fields, in the workspace's order
    std::unique_ptr<KLErrorLog> errorLog;
    int batchMode = 0;
    int fps = 30;
    int evaluateDags = 0;
    std::string wireFile;  // empty: none
    float wireFrame = 0.0f;
    int activeKeyset = -1;
    std::unique_ptr<KLScene> scene;
    std::unique_ptr<KLWireSource> wireSource;
    std::unique_ptr<KLKeyFrameList> keyFrames;
    int keysetCount = 0;
    std::unique_ptr<KLKeySet> keySets[kMaxKeysets];
    std::unique_ptr<KLMarkTrack> markTrack;
    std::unique_ptr<CueSound> sound;
    std::string soundFile;  // empty: none
    std::unique_ptr<KLKeyTrack> keyTracks[kMaxKeysets];
    int loadGeometry = 1;
    int geometryActive = 1;
    int beep = 0;
    int keysetModified = 0;
    int trackModified = 0;
    std::unique_ptr<std::unique_ptr<KLImageSGI>[]> referenceImages;
    std::unique_ptr<std::unique_ptr<KLImageSGI>[]> playblastImages;
    CueTime referenceOffset;
    CueTime playblastOffset;
    int referenceCount = 0;
    int playblastCount = 0;
    int referenceLoaded = 0;
    int playblastLoaded = 0;
    int referenceZoom = 2;
    CueRecognizerCatalog recognizers;
    CueTime duration;
    CueTime requestedDuration;
    std::unique_ptr<KLEdlEvent> applyEvent;
    int feedback = 2;
    int tessU = 0, tessV = 0;
    // Set in batch mode when a keyset load found no usable scene file: the batch run ends.
    int batchStop = 0;

  private:
    // Keyset description parsing.
    void parse_keyset_file(std::istream& in);
    void parse_keyset(CueStatement& s, std::istream& in);
    void parse_shapeset(CueStatement& s, std::istream& in);
    void parse_recog(std::istream& in, const char* recognizer, const char* keyset);
    void parse_recog_links(std::istream& in, const char* recognizer, const char* keyset);
    // Keyset description loading, in the order LoadKeyset runs them.
    void check_project(const char* name);
    bool load_wire_file();
    int read_wire_file(const char* name);
    void show_keysets();
    // A new scene with the workspace's display settings.
    std::unique_ptr<KLScene> make_scene();
    // Reports a load failure: Inform with "Dismiss" interactively, a line on the error
    // stream in batch mode.
    void report(const std::string& message);
};

// The one workspace.
extern Imp theImp;
