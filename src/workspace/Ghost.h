#pragma once

class CueSound;
class KLMarkTrack;
class CueRecognizer;
class KLEdlEvent;
class CueTime;

// The user interface as the workspace sees it. The main window implements it; batch mode
// and tests use other implementations. The order of the operations is fixed.
class Ghost {
public:
    virtual ~Ghost() = default;

    virtual int GetActiveKeyset() = 0;
    virtual void SetActiveKeyset(int index) = 0;
    virtual void InitSound(CueSound* sound) = 0;
    virtual void InitMarkTrack(KLMarkTrack* track) = 0;
    virtual void CenterKeyView() = 0;
    virtual void CenterMixView() = 0;
    virtual void ClearViews() = 0;
    virtual void ClearKeyTracks() = 0;
    virtual void ClearKeysets(int index) = 0;
    virtual void InitKeyset(int index) = 0;
    virtual void ClearKeysetMenu() = 0;
    virtual void DressKeysetMenu() = 0;
    virtual void ShowRecognizerGui(CueRecognizer* recognizer) = 0;
    virtual void SetMenuStatus() = 0;
    virtual void SetViewStatus() = 0;
    virtual void MakeKeysetImages() = 0;
    // The reference-load dialog: may change every argument; 0 when the user cancelled.
    // *prefix and *ext are new[] strings (KLNewString; *ext is "" for no extension): to
    // change one, delete[] it and store a new KLNewString. The caller frees both.
    virtual int AdjustRelLoad(char** prefix, char** ext, int* start, int* end, int* by,
                              int* zoom) = 0;
    virtual void DisplayDuration(CueTime duration) = 0;
    virtual void DisplayReferenceOffset(CueTime offset) = 0;
    // A message box with one button.
    virtual void Inform(const char* message, const char* button) = 0;
    // A question with two buttons; nonzero when the first (`yes`) was chosen.
    virtual int Confirm(const char* message, const char* yes, const char* no) = 0;
    virtual void UpdateApplyDialog(KLEdlEvent* event) = 0;
    virtual void ResetFileManagers() = 0;
    virtual void ShowErrorFlag() = 0;
    virtual void ClearErrorFlag() = 0;
};

// The window interface that the workspace calls (the main window, or the console in batch
// mode).
extern Ghost* theGhost;
