#pragma once

#include "toolkit/CueTime.h"
#include "workspace/Ghost.h"

// The user interface of batch mode and of programs without a window: messages go to the
// error stream, questions are answered yes, everything that would change a widget does
// nothing. theGhost points here until a main window takes over.
class ConsoleGhost : public Ghost {
  public:
    static ConsoleGhost& Instance();

    // The workspace's own record of the active keyset (there is no menu to ask).
    int GetActiveKeyset() override;
    void SetActiveKeyset(int) override {}
    void InitSound(CueSound*) override {}
    void InitMarkTrack(KLMarkTrack*) override {}
    void CenterKeyView() override {}
    void CenterMixView() override {}
    void ClearViews() override {}
    void ClearKeyTracks() override {}
    void ClearKeysets(int) override {}
    void InitKeyset(int) override {}
    void ClearKeysetMenu() override {}
    void DressKeysetMenu() override {}
    void ShowRecognizerGui(CueRecognizer*) override {}
    void SetMenuStatus() override {}
    void SetViewStatus() override {}
    void MakeKeysetImages() override {}
    // No dialog to ask: the load is cancelled, nothing is loaded.
    int AdjustRelLoad(char**, char**, int*, int*, int*, int*) override { return 0; }
    void DisplayDuration(CueTime) override {}
    void DisplayReferenceOffset(CueTime) override {}
    // The message on a line of its own on the error stream.
    void Inform(const char* message, const char* button) override;
    // The message, then "Assuming OK"; answers yes.
    int Confirm(const char* message, const char* yes, const char* no) override;
    void UpdateApplyDialog(KLEdlEvent*) override {}
    void ResetFileManagers() override {}
    void ShowErrorFlag() override {}
    void ClearErrorFlag() override {}
};
