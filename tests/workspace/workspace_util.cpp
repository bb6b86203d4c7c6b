#include <fcntl.h>
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
#include "toolkit/KLString.h"
#include "workspace/Imp.h"

extern char** environ;

namespace wstest {

std::string ReadFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    std::ostringstream text;
    text << in.rdbuf();
    return text.str();
}

void WriteFile(const std::string& path, const std::string& text) {
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out << text;
}

bool FileExists(const std::string& path) {
    return ::access(path.c_str(), F_OK) == 0;
}

std::string StdErr(const std::function<void()>& f) {
    testing::internal::CaptureStderr();
    f();
    return testing::internal::GetCapturedStderr();
}

TempDir::TempDir() {
    std::string pattern = std::filesystem::temp_directory_path().string() + "/chirrup-ws-XXXXXX";
    std::vector<char> name(pattern.begin(), pattern.end());
    name.push_back('\0');
    if (::mkdtemp(name.data()))
        path_ = name.data();
}

TempDir::~TempDir() {
    std::error_code ignored;
    if (!path_.empty())
        std::filesystem::remove_all(path_, ignored);
}

ScopedEnv::ScopedEnv(const char* name, const char* value) : name_(name) {
    if (const char* old = std::getenv(name))
        old_ = old;
    if (value)
        ::setenv(name, value, 1);
    else
        ::unsetenv(name);
    CuePrefs::Refresh();
}

ScopedEnv::~ScopedEnv() {
    if (old_)
        ::setenv(name_.c_str(), old_->c_str(), 1);
    else
        ::unsetenv(name_.c_str());
    CuePrefs::Refresh();
}

RunResult RunChirrup(const std::vector<std::string>& args, const std::string& cwd,
                     const std::vector<EnvChange>& env) {
    // The environment: ours without anything chirrup reads, then the test's changes.
    std::vector<std::string> vars;
    for (char** e = environ; *e; ++e) {
        const std::string var(*e);
        if (var.rfind("VX_", 0) == 0 || var.rfind("TESSEL_", 0) == 0 ||
            var.rfind("KL_PLUGIN", 0) == 0)
            continue;
        vars.push_back(var);
    }
    for (const EnvChange& change : env) {
        for (auto it = vars.begin(); it != vars.end();)
            it = it->rfind(change.first + "=", 0) == 0 ? vars.erase(it) : it + 1;
        if (change.second)
            vars.push_back(change.first + "=" + *change.second);
    }
    const std::string program = CHIRRUP_BINARY_DIR "/bin/chirrup";
    std::vector<char*> argv{const_cast<char*>(program.c_str())};
    for (const std::string& a : args)
        argv.push_back(const_cast<char*>(a.c_str()));
    argv.push_back(nullptr);
    std::vector<char*> envp;
    for (std::string& v : vars)
        envp.push_back(v.data());
    envp.push_back(nullptr);

    // Output and error go to files, so that neither can fill a pipe and stall the program.
    TempDir capture;
    const std::string outPath = capture / "out", errPath = capture / "err";
    RunResult result;
    const pid_t pid = ::fork();
    if (pid == 0) {
        const int out = ::open(outPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
        const int err = ::open(errPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
        if (out < 0 || err < 0 || ::chdir(cwd.c_str()) != 0)
            ::_exit(126);
        ::dup2(out, 1);
        ::dup2(err, 2);
        ::execve(program.c_str(), argv.data(), envp.data());
        ::_exit(127);
    }
    int status = 0;
    if (pid > 0 && ::waitpid(pid, &status, 0) == pid && WIFEXITED(status))
        result.status = WEXITSTATUS(status);
    result.out = ReadFile(outPath);
    result.err = ReadFile(errPath);
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

GhostScope::GhostScope(Ghost* ghost) : saved_(theGhost) {
    theGhost = ghost;
}
GhostScope::~GhostScope() {
    theGhost = saved_;
}

void ResetWorkspace() {
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

std::string FaceSceneJson() {
    // The buffer: jaw key times (3 floats) and translations (9), then the same for lip.
    return R"({"asset": {"version": "2.0"}, "scene": 0, "scenes": [{"name": "face", "nodes": [0]}],
 "nodes": [{"name": "head", "children": [1, 2]}, {"name": "jaw"}, {"name": "lip"}],
 "buffers": [{"byteLength": 96, "uri": "data:application/octet-stream;base64,)"
           "AAAAAKuqqj6rqio/AAAAAAAAAAAAAAAAAAAAAAAAgD8AAAAAAAAAAAAAAEAAAAAAAAAAAKuqqj6rqio/"
           "AAAAAAAAAAAAAAAAAAAAAAAAAAAAAEBAAACgQAAAAAAAAEBA"
           R"("}],
 "bufferViews": [{"buffer": 0, "byteOffset": 0, "byteLength": 12},
  {"buffer": 0, "byteOffset": 12, "byteLength": 36},
  {"buffer": 0, "byteOffset": 48, "byteLength": 12},
  {"buffer": 0, "byteOffset": 60, "byteLength": 36}],
 "accessors": [
  {"bufferView": 0, "componentType": 5126, "count": 3, "type": "SCALAR",
   "min": [0], "max": [0.666667]},
  {"bufferView": 1, "componentType": 5126, "count": 3, "type": "VEC3"},
  {"bufferView": 2, "componentType": 5126, "count": 3, "type": "SCALAR",
   "min": [0], "max": [0.666667]},
  {"bufferView": 3, "componentType": 5126, "count": 3, "type": "VEC3"}],
 "animations": [{"channels": [{"sampler": 0, "target": {"node": 1, "path": "translation"}},
                              {"sampler": 1, "target": {"node": 2, "path": "translation"}}],
                 "samplers": [{"input": 0, "output": 1, "interpolation": "LINEAR"},
                              {"input": 2, "output": 3, "interpolation": "LINEAR"}]}]}
)";
}

void WriteAiff(const std::string& path, int frames, int rate) {
    std::vector<uint8_t> b;
    auto be32 = [&b](uint32_t v) {
        for (int s = 24; s >= 0; s -= 8)
            b.push_back(uint8_t(v >> s));
    };
    auto be16 = [&b](uint16_t v) {
        b.push_back(uint8_t(v >> 8));
        b.push_back(uint8_t(v));
    };
    const uint32_t soundBytes = uint32_t(frames) * 2;
    b.insert(b.end(), {'F', 'O', 'R', 'M'});
    be32(4 + 26 + 16 + soundBytes);
    b.insert(b.end(), {'A', 'I', 'F', 'F', 'C', 'O', 'M', 'M'});
    be32(18);
    be16(1);
    be32(uint32_t(frames));
    be16(16);
    // The rate as an 80-bit extended float: exponent, then a 64-bit mantissa with its top
    // bit set.
    uint64_t mantissa = uint64_t(rate);
    int exponent = 16383 + 63;
    while (!(mantissa & (uint64_t(1) << 63)))
        mantissa <<= 1, --exponent;
    be16(uint16_t(exponent));
    be32(uint32_t(mantissa >> 32));
    be32(uint32_t(mantissa));
    b.insert(b.end(), {'S', 'S', 'N', 'D'});
    be32(8 + soundBytes);
    be32(0);
    be32(0);
    for (int i = 0; i < frames; ++i)
        be16(uint16_t(int16_t((i % 200) * 100 - 10000)));
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out.write(reinterpret_cast<const char*>(b.data()), std::streamsize(b.size()));
}

std::optional<double> EvalChannel(const std::string& path, const char* node, int channel,
                                  double frame) {
    KLWireSource source(path.c_str());
    if (!source.Valid())
        return std::nullopt;
    std::unique_ptr<OrDagNode> root(source.RootNode());
    std::unique_ptr<OrDagNode> found(KLWire::FetchDagNode(root.get(), node));
    if (!found)
        return std::nullopt;
    OrChannel* c = KLWire::FindChannel(found.get(), channel);
    if (!c)
        return std::nullopt;
    return c->eval(frame);
}

}  // namespace wstest
