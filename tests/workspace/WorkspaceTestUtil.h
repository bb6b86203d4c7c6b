#pragma once

// Helpers shared by the workspace tests, and the matchers they use.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "testkit/CaptureStderr.h"
#include "testkit/TempDir.h"
#include "toolkit/CueRecognizer.h"
#include "toolkit/CueTime.h"
#include "toolkit/CueTokenList.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLString.h"
#include "workspace/Ghost.h"

namespace wstest {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::StartsWith;

std::string ReadFile(const std::string& path);  // empty when the file cannot be read
void WriteFile(const std::string& path, const std::string& text);
bool FileExists(const std::string& path);
using testkit::StdErr;  // what a function writes on the error stream
using testkit::TempDir;

// Sets (a null value: unsets) an environment variable while it lives; the preferences are
// read again on both ends.
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

struct RunResult {
    int status = -1;  // -1 when the program did not exit normally
    std::string out, err;
};
using EnvChange = std::pair<std::string, std::optional<std::string>>;  // nullopt: unset
// Runs the chirrup program in `cwd` with this process's environment less everything the
// program reads (VX_*, TESSEL_*, KL_PLUGIN*), plus `env`.
RunResult RunChirrup(const std::vector<std::string>& args, const std::string& cwd,
                     const std::vector<EnvChange>& env = {});

// A window interface that writes down every call as "Name(arguments)", answers questions
// with `confirmAnswer` and reports `activeKeyset`.
class RecordingGhost : public Ghost {
  public:
    std::vector<std::string> calls;
    int confirmAnswer = 1;
    int activeKeyset = -1;

    std::vector<std::string> Calls(const std::string& prefix) const;  // those starting so

    int GetActiveKeyset() override { return activeKeyset; }
    void SetActiveKeyset(int i) override { Log(KLFmt("SetActiveKeyset(%d)", activeKeyset = i)); }
    void InitSound(CueSound* s) override { Log(s ? "InitSound(sound)" : "InitSound(null)"); }
    void InitMarkTrack(KLMarkTrack* t) override {
        Log(t ? "InitMarkTrack(track)" : "InitMarkTrack(null)");
    }
    void ClearKeysets(int i) override { Log(KLFmt("ClearKeysets(%d)", i)); }
    void InitKeyset(int i) override { Log(KLFmt("InitKeyset(%d)", i)); }
    void ShowRecognizerGui(CueRecognizer*) override { Log("ShowRecognizerGui()"); }
    void CenterKeyView() override { Log("CenterKeyView()"); }
    void CenterMixView() override { Log("CenterMixView()"); }
    void ClearViews() override { Log("ClearViews()"); }
    void ClearKeyTracks() override { Log("ClearKeyTracks()"); }
    void ClearKeysetMenu() override { Log("ClearKeysetMenu()"); }
    void DressKeysetMenu() override { Log("DressKeysetMenu()"); }
    void SetMenuStatus() override { Log("SetMenuStatus()"); }
    void SetViewStatus() override { Log("SetViewStatus()"); }
    void MakeKeysetImages() override { Log("MakeKeysetImages()"); }
    void ResetFileManagers() override { Log("ResetFileManagers()"); }
    void ShowErrorFlag() override { Log("ShowErrorFlag()"); }
    void ClearErrorFlag() override { Log("ClearErrorFlag()"); }
    int AdjustRelLoad(char**, char**, int*, int*, int*, int*) override { return 0; }
    void DisplayDuration(CueTime d) override { Log(KLFmt("DisplayDuration(%d)", d.Ticks())); }
    void DisplayReferenceOffset(CueTime o) override {
        Log(KLFmt("DisplayReferenceOffset(%d)", o.Ticks()));
    }
    void Inform(const char* message, const char* button) override {
        Log(KLFmt("Inform(%s|%s)", message, button));
    }
    int Confirm(const char* message, const char* yes, const char* no) override {
        Log(KLFmt("Confirm(%s|%s|%s)", message, yes, no));
        return confirmAnswer;
    }
    void UpdateApplyDialog(KLEdlEvent* event) override;

  private:
    void Log(const std::string& call) { calls.push_back(call); }
};

// Makes `ghost` the workspace's window interface while it lives.
class GhostScope {
  public:
    explicit GhostScope(Ghost* ghost) : saved_(theGhost) { theGhost = ghost; }
    ~GhostScope() { theGhost = saved_; }

  private:
    Ghost* saved_;
};

// A recognizer compiled into the tests: targets "a" and "e" and a setting "gain".
class VowelRecognizer : public CueRecognizer {
  public:
    VowelRecognizer() : CueRecognizer("Vowel") { AddTarget("a"), AddTarget("e"); }
    float gain = 1.0f;
    void ResetSettings() override { CueRecognizer::ResetSettings(), gain = 1.0f; }
    bool Recognize(const CueSound&) override { return true; }
    CueRecognizer* Clone() const override { return new VowelRecognizer(); }

  protected:
    void ReadParameter(const CueTokenList& s) override {
        if (s.Matches("gain") && s.Count() == 2)
            gain = s.ArgFloat(1);
    }
    void WriteParameters(std::ostream& out) const override { out << "    gain " << gain << "\n"; }
};

// Where the program's own recognizer plug-ins are built.
inline const std::string kShippedPlugins = CHIRRUP_BINARY_DIR "/lib/chirrup/plugins";
// A recognizer's settings block as it writes it; reading `text` as one (false: refused).
std::string SettingsText(const CueRecognizer& r);
bool ReadSettingsText(CueRecognizer& r, const std::string& text);

// Collects the toolkit's reports at or above `level` while installed.
struct Reports : KLErrHandler {
    explicit Reports(int level = KLErr::kWarning) : level(level) {}
    void Handle(KLErr* e) override { text += e->Level() >= level ? e->Message() : ""; }
    std::string text;
    int level;
};

inline const char* const kMouth =
    "begin keyset mouth\n    key rest 0\n    key open 10\n    key wide 20\nend\n";

// A project DIR with DIR/wire/face.gltf (the face scene) and empty DIR/misc_data and
// DIR/work; the workspace emptied, a recording window interface, no error-log viewer.
class ProjectTest : public ::testing::Test {
  protected:
    void SetUp() override;
    void TearDown() override;  // empties the workspace again
    std::string Data(const std::string& name, const std::string& text) const;  // its path
    // `text` with %W, %M and %D replaced by the wire, data and project directories.
    std::string Fill(std::string text) const;
    int BatchLoadKeyset(const std::string& path);  // no window, no project question

    TempDir dir;
    ScopedEnv project{"TESSEL_PROJECT", dir.path().c_str()};
    ScopedEnv misc{"TESSEL_MISC_DIR", nullptr};
    ScopedEnv viewer{"TESSEL_USER_ERROR_READER", "true"};
    RecordingGhost ghost;
    GhostScope scope{&ghost};
};

// The batch runs' keysets over the face scene: "mouth" (kind 1) and "turn" (kind 2, jaw RZ).
inline const char* const kBatchKeysets =
    "wire face.gltf\n"
    "begin keyset mouth\n    key rest 0\n    key open 10\n    key wide 20\nend\n"
    "begin shapeset turn jaw 5 0 1\n    key left 0\n    key right 1\nend\n";
// Their track; events in frames.
inline const char* const kBatchTrack =
    "begin keytrack mouth\n    event 0 rest\n    event 15 open Linear\n"
    "    event 30 wide Smooth 0.5\n    event 45 open Ease 2\nend\n"
    "begin keytrack turn\n    event 6 right Ease 20\n    event 36 left Linear -10\nend\n";

// ProjectTest with DIR/misc_data/x.kset (kBatchKeysets) and x.track (kBatchTrack); the program
// runs in DIR/work with the project DIR and no display.
class BatchTest : public ProjectTest {
  protected:
    void SetUp() override;
    RunResult Run(std::vector<std::string> args, std::vector<EnvChange> env = {});
    // "-B x.track APPLY DAG OFFSET out.gltf x.kset"; the scene is stored as Out().
    RunResult Batch(const std::string& dag = "VX_ROOT", const std::string& apply = "face.gltf",
                    const std::string& offset = "12");
    std::string Out() const { return dir / "wire/out.gltf"; }
};

// A glTF face: root "head" with children "jaw" and "lip"; key shapes at frames 0, 10 and 20
// (30 per second): jaw TY 0, 1, 2; lip TX 0, 0, 5; lip TZ 0, 3, 3.
std::string FaceSceneJson();

// A 16-bit mono 8000 Hz AIFF file of `frames` sample frames.
void WriteAiff(const std::string& path, int frames);

// Node `node`'s channel (0..8) at `frame` (30 per second) in scene file `path`, if there.
std::optional<double> EvalChannel(const std::string& path, const char* node, int channel,
                                  double frame);

}  // namespace wstest
