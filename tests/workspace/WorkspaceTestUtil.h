#pragma once

// Helpers shared by the workspace tests: temporary directories, files, environment, running
// the chirrup program, a window interface that records what the workspace asks of it, and
// small generated scene and sound files.
#include <array>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "toolkit/CueTime.h"
#include "workspace/Ghost.h"

namespace wstest {

std::string ReadFile(const std::string& path);  // empty when the file cannot be read
void WriteFile(const std::string& path, const std::string& text);
bool FileExists(const std::string& path);

// A fresh directory under the system's temporary directory, removed with everything in it.
class TempDir {
  public:
    TempDir();
    ~TempDir();
    TempDir(const TempDir&) = delete;
    TempDir& operator=(const TempDir&) = delete;
    const std::string& path() const { return path_; }
    std::string operator/(const std::string& name) const { return path_ + "/" + name; }

  private:
    std::string path_;
};

// Sets (or with a null value unsets) an environment variable while it lives; the
// preferences are read again on both ends.
class ScopedEnv {
  public:
    ScopedEnv(const char* name, const char* value);
    ~ScopedEnv();
    ScopedEnv(const ScopedEnv&) = delete;
    ScopedEnv& operator=(const ScopedEnv&) = delete;

  private:
    std::string name_;
    std::optional<std::string> old_;
};

// What a run of the chirrup program did: exit status (-1 when it did not exit normally),
// its standard output and error stream.
struct RunResult {
    int status = -1;
    std::string out;
    std::string err;
};
using EnvChange = std::pair<std::string, std::optional<std::string>>;  // nullopt: unset
// Runs CHIRRUP_BINARY_DIR/bin/chirrup with `args` in `cwd`. The environment is this
// process's without the variables the program reads (VX_*, TESSEL_*), plus `env`.
RunResult RunChirrup(const std::vector<std::string>& args, const std::string& cwd,
                     const std::vector<EnvChange>& env = {});

// A window interface that writes down every call as "Name(arguments)" in order, answers
// questions with `confirmAnswer` and reports `activeKeyset`.
class RecordingGhost : public Ghost {
  public:
    std::vector<std::string> calls;
    int confirmAnswer = 1;
    int activeKeyset = -1;

    // The calls whose text begins with `prefix`.
    std::vector<std::string> Calls(const std::string& prefix) const;

    int GetActiveKeyset() override;
    void SetActiveKeyset(int index) override;
    void InitSound(CueSound* sound) override;
    void InitMarkTrack(KLMarkTrack* track) override;
    void CenterKeyView() override;
    void CenterMixView() override;
    void ClearViews() override;
    void ClearKeyTracks() override;
    void ClearKeysets(int index) override;
    void InitKeyset(int index) override;
    void ClearKeysetMenu() override;
    void DressKeysetMenu() override;
    void ShowRecognizerGui(CueRecognizer* recognizer) override;
    void SetMenuStatus() override;
    void SetViewStatus() override;
    void MakeKeysetImages() override;
    int AdjustRelLoad(char** prefix, char** ext, int* start, int* end, int* by, int* zoom) override;
    void DisplayDuration(CueTime duration) override;
    void DisplayReferenceOffset(CueTime offset) override;
    void Inform(const char* message, const char* button) override;
    int Confirm(const char* message, const char* yes, const char* no) override;
    void UpdateApplyDialog(KLEdlEvent* event) override;
    void ResetFileManagers() override;
    void ShowErrorFlag() override;
    void ClearErrorFlag() override;
};

// Makes `ghost` the workspace's window interface while it lives.
class GhostScope {
  public:
    explicit GhostScope(Ghost* ghost);
    ~GhostScope();

  private:
    Ghost* saved_;
};

// Empties theImp: no keysets, sound, log or apply event; 30 frames per second; interactive.
void ResetWorkspace();

// One node of a generated scene: its parent (-1 for a root node) and, optionally, a
// translation animation (key times in seconds, LINEAR).
struct NodeSpec {
    std::string name;
    int parent = -1;
    std::vector<float> times;
    std::vector<std::array<float, 3>> translations;
};
// A glTF 2.0 scene (embedded buffer) with those nodes; `sceneName` names the scene.
std::string MakeSceneJson(const std::vector<NodeSpec>& nodes, const std::string& sceneName = "");
// A face: root "head" with children "jaw" and "lip". Key shapes stand at frames 0 (rest),
// 10 and 20 at 30 frames per second: jaw TY 0, 1, 2; lip TX 0, 0, 5; lip TZ 0, 3, 3.
std::string FaceSceneJson(const std::string& sceneName = "face");

// A 16-bit mono AIFF file of `frames` sample frames at `rate` (a slow ramp).
void WriteAiff(const std::string& path, int frames, int rate);

// The value of node `node`'s channel (0..8) at `frame` (30 frames per second) in the scene
// file `path`; nullopt when the file, node or channel is missing.
std::optional<double> EvalChannel(const std::string& path, const char* node, int channel,
                                  double frame);

}  // namespace wstest
