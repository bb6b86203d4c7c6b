#include <sys/wait.h>
#include <unistd.h>

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <memory>
#include <sstream>

#include "WorkspaceTestUtil.h"
#include "model/KLEdlEvent.h"
#include "scene/KLWire.h"
#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"
#include "toolkit/CuePrefs.h"
#include "toolkit/CueSound.h"
#include "workspace/Imp.h"

extern char** environ;

namespace wstest {

std::string ReadFile(const std::string& path) {
    std::ostringstream text;
    text << std::ifstream(path, std::ios::binary).rdbuf();
    return text.str();
}

void WriteFile(const std::string& path, const std::string& text) {
    std::ofstream(path, std::ios::binary | std::ios::trunc) << text;
}

bool FileExists(const std::string& path) {
    return ::access(path.c_str(), F_OK) == 0;
}

ScopedEnv::ScopedEnv(const char* name, const char* value) : name_(name) {
    if (const char* old = std::getenv(name))
        old_ = old;
    value ? ::setenv(name, value, 1) : ::unsetenv(name);
    CuePrefs::Refresh();
}

ScopedEnv::~ScopedEnv() {
    old_ ? ::setenv(name_.c_str(), old_->c_str(), 1) : ::unsetenv(name_.c_str());
    CuePrefs::Refresh();
}

RunResult RunChirrup(const std::vector<std::string>& args, const std::string& cwd,
                     const std::vector<EnvChange>& env) {
    const std::string program = CHIRRUP_BINARY_DIR "/bin/chirrup";
    TempDir capture;  // files, so that a full pipe cannot stall the program
    const pid_t pid = ::fork();
    if (pid == 0) {
        std::vector<std::string> read;
        for (char** e = environ; *e; ++e)
            for (const char* prefix : {"VX_", "TESSEL_", "KL_PLUGIN"})
                if (std::strncmp(*e, prefix, std::strlen(prefix)) == 0)
                    read.push_back(std::string(*e, std::strchr(*e, '=')));
        for (const std::string& name : read)
            ::unsetenv(name.c_str());
        for (const auto& [name, value] : env)
            value ? ::setenv(name.c_str(), value->c_str(), 1) : ::unsetenv(name.c_str());
        std::vector<char*> argv{const_cast<char*>(program.c_str())};
        for (const std::string& a : args)
            argv.push_back(const_cast<char*>(a.c_str()));
        argv.push_back(nullptr);
        if (!std::freopen((capture / "out").c_str(), "w", stdout) ||
            !std::freopen((capture / "err").c_str(), "w", stderr) || ::chdir(cwd.c_str()) != 0)
            ::_exit(126);
        ::execv(program.c_str(), argv.data());
        ::_exit(127);
    }
    RunResult result;
    int status = 0;
    if (pid > 0 && ::waitpid(pid, &status, 0) == pid && WIFEXITED(status))
        result.status = WEXITSTATUS(status);
    result.out = ReadFile(capture / "out");
    result.err = ReadFile(capture / "err");
    return result;
}

std::vector<std::string> RecordingGhost::Calls(const std::string& prefix) const {
    std::vector<std::string> found;
    for (const std::string& c : calls)
        if (c.rfind(prefix, 0) == 0)
            found.push_back(c);
    return found;
}

void RecordingGhost::UpdateApplyDialog(KLEdlEvent* event) {
    Log(KLFmt("UpdateApplyDialog(%s)", event && event->WireFile() ? event->WireFile() : ""));
}

std::string SettingsText(const CueRecognizer& r) {
    std::ostringstream out;
    r.WriteSettings(out);
    return out.str();
}

bool ReadSettingsText(CueRecognizer& r, const std::string& text) {
    std::istringstream in(text);
    return r.GuardedReadSettings(in);
}

// Empties theImp: no keysets, sound, log or apply event; 30 frames per second; interactive.
static void ResetWorkspace() {
    theImp.batchMode = 0;
    theImp.clear_keyset_data();
    theImp.sound.reset();
    theImp.soundFile.clear();
    theImp.applyEvent.reset();
    theImp.errorLog.reset();
    theImp.SetFps(30);
    theImp.activeKeyset = -1;
    theImp.requestedDuration = CueTime();
    theImp.duration = CueTime(0, 0, 5, 0, 0);
    theImp.loadGeometry = theImp.geometryActive = 1;
    theImp.keysetModified = theImp.trackModified = 0;
    theImp.wireFrame = 0.0f;
}

void ProjectTest::TearDown() {
    ResetWorkspace();
}

void ProjectTest::SetUp() {
    for (const char* sub : {"misc_data", "wire", "work"})
        std::filesystem::create_directory(dir / sub);
    WriteFile(dir / "wire/face.gltf", FaceSceneJson());
    ResetWorkspace();
    ghost.calls.clear();
}

std::string ProjectTest::Data(const std::string& name, const std::string& text) const {
    WriteFile(dir / ("misc_data/" + name), text);
    return dir / ("misc_data/" + name);
}

std::string ProjectTest::Fill(std::string text) const {
    for (const auto& [key, value] : {std::pair<std::string, std::string>{"%W", dir / "wire"},
                                     {"%M", dir / "misc_data"},
                                     {"%D", dir.path()}})
        for (size_t at = text.find(key); at != std::string::npos;
             at = text.find(key, at + value.size()))
            text.replace(at, 2, value);
    return text;
}

int ProjectTest::BatchLoadKeyset(const std::string& path) {
    theImp.batchMode = 1;
    int loaded = 0;
    StdErr([&] { loaded = theImp.LoadKeyset(path.c_str()); });
    theImp.batchMode = 0;
    return loaded;
}

void BatchTest::SetUp() {
    ProjectTest::SetUp();
    Data("x.kset", kBatchKeysets);
    Data("x.track", kBatchTrack);
}

RunResult BatchTest::Run(std::vector<std::string> args, std::vector<EnvChange> env) {
    env.insert(env.begin(), {"TESSEL_PROJECT", dir.path()});
    env.insert(env.begin(), {"DISPLAY", std::nullopt});  // the window cannot open here
    return RunChirrup(args, dir / "work", env);
}

RunResult BatchTest::Batch(const std::string& dag, const std::string& apply,
                           const std::string& offset) {
    return Run({"-B", "x.track", apply, dag, offset, "out.gltf", "x.kset"});
}

std::string FaceSceneJson() {
    // The buffer: jaw key times (3 floats) and translations (9), then the same for lip.
    return R"({"asset": {"version": "2.0"}, "scene": 0, "scenes": [{"nodes": [0]}],
 "nodes": [{"name": "head", "children": [1, 2]}, {"name": "jaw"}, {"name": "lip"}],
 "buffers": [{"byteLength": 96, "uri": "data:application/octet-stream;base64,)"
           "AAAAAKuqqj6rqio/AAAAAAAAAAAAAAAAAAAAAAAAgD8AAAAAAAAAAAAAAEAAAAAAAAAAAKuqqj6rqio/"
           "AAAAAAAAAAAAAAAAAAAAAAAAAAAAAEBAAACgQAAAAAAAAEBA"
           R"("}],
 "bufferViews": [{"buffer": 0, "byteLength": 12}, {"buffer": 0, "byteOffset": 12,
  "byteLength": 36}, {"buffer": 0, "byteOffset": 48, "byteLength": 12}, {"buffer": 0,
  "byteOffset": 60, "byteLength": 36}],
 "accessors": [{"bufferView": 0, "componentType": 5126, "count": 3, "type": "SCALAR", "min": [0],
   "max": [0.666667]}, {"bufferView": 1, "componentType": 5126, "count": 3, "type": "VEC3"},
  {"bufferView": 2, "componentType": 5126, "count": 3, "type": "SCALAR", "min": [0],
   "max": [0.666667]}, {"bufferView": 3, "componentType": 5126, "count": 3, "type": "VEC3"}],
 "animations": [{"channels": [{"sampler": 0, "target": {"node": 1, "path": "translation"}},
   {"sampler": 1, "target": {"node": 2, "path": "translation"}}],
  "samplers": [{"input": 0, "output": 1}, {"input": 2, "output": 3}]}]}
)";
}

void WriteAiff(const std::string& path, int frames) {
    std::string b;
    auto be = [&b](uint32_t v, int bytes) {
        for (int s = 8 * (bytes - 1); s >= 0; s -= 8)
            b += char(v >> s);
    };
    const uint32_t soundBytes = uint32_t(frames) * 2;
    b += "FORM", be(46 + soundBytes, 4), b += "AIFFCOMM", be(18, 4);
    be(1, 2), be(uint32_t(frames), 4), be(16, 2);
    be(0x400B, 2), be(0xFA000000, 4), be(0, 4);  // 8000 as an 80-bit extended float
    b += "SSND", be(8 + soundBytes, 4), be(0, 4), be(0, 4);
    for (int i = 0; i < frames; ++i)
        be(uint16_t((i % 200) * 100 - 10000), 2);  // a slow ramp
    WriteFile(path, b);
}

std::optional<double> EvalChannel(const std::string& path, const char* node, int channel,
                                  double frame) {
    KLWireSource source(path.c_str());
    if (!source.Valid())
        return std::nullopt;
    std::unique_ptr<OrDagNode> root = source.RootNode();
    std::unique_ptr<OrDagNode> found = KLWire::FetchDagNode(root.get(), node);
    OrChannel* c = found ? KLWire::FindChannel(found.get(), channel) : nullptr;
    return c ? std::optional<double>(c->eval(frame)) : std::nullopt;
}

}  // namespace wstest
