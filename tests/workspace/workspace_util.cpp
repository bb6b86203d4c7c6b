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

int RecordingGhost::GetActiveKeyset() {
    return activeKeyset;
}
void RecordingGhost::SetActiveKeyset(int index) {
    calls.push_back(KLFmt("SetActiveKeyset(%d)", index));
    activeKeyset = index;
}
void RecordingGhost::InitSound(CueSound* sound) {
    calls.push_back(sound ? "InitSound(sound)" : "InitSound(null)");
}
void RecordingGhost::InitMarkTrack(KLMarkTrack* track) {
    calls.push_back(track ? "InitMarkTrack(track)" : "InitMarkTrack(null)");
}
void RecordingGhost::CenterKeyView() {
    calls.push_back("CenterKeyView()");
}
void RecordingGhost::CenterMixView() {
    calls.push_back("CenterMixView()");
}
void RecordingGhost::ClearViews() {
    calls.push_back("ClearViews()");
}
void RecordingGhost::ClearKeyTracks() {
    calls.push_back("ClearKeyTracks()");
}
void RecordingGhost::ClearKeysets(int index) {
    calls.push_back(KLFmt("ClearKeysets(%d)", index));
}
void RecordingGhost::InitKeyset(int index) {
    calls.push_back(KLFmt("InitKeyset(%d)", index));
}
void RecordingGhost::ClearKeysetMenu() {
    calls.push_back("ClearKeysetMenu()");
}
void RecordingGhost::DressKeysetMenu() {
    calls.push_back("DressKeysetMenu()");
}
void RecordingGhost::ShowRecognizerGui(CueRecognizer*) {
    calls.push_back("ShowRecognizerGui()");
}
void RecordingGhost::SetMenuStatus() {
    calls.push_back("SetMenuStatus()");
}
void RecordingGhost::SetViewStatus() {
    calls.push_back("SetViewStatus()");
}
void RecordingGhost::MakeKeysetImages() {
    calls.push_back("MakeKeysetImages()");
}
int RecordingGhost::AdjustRelLoad(char**, char**, int*, int*, int*, int*) {
    calls.push_back("AdjustRelLoad()");
    return 0;
}
void RecordingGhost::DisplayDuration(CueTime duration) {
    calls.push_back(KLFmt("DisplayDuration(%d)", duration.Ticks()));
}
void RecordingGhost::DisplayReferenceOffset(CueTime offset) {
    calls.push_back(KLFmt("DisplayReferenceOffset(%d)", offset.Ticks()));
}
void RecordingGhost::Inform(const char* message, const char* button) {
    calls.push_back(KLFmt("Inform(%s|%s)", message, button));
}
int RecordingGhost::Confirm(const char* message, const char* yes, const char* no) {
    calls.push_back(KLFmt("Confirm(%s|%s|%s)", message, yes, no));
    return confirmAnswer;
}
void RecordingGhost::UpdateApplyDialog(KLEdlEvent* event) {
    calls.push_back(
        KLFmt("UpdateApplyDialog(%s)", event && event->WireFile() ? event->WireFile() : ""));
}
void RecordingGhost::ResetFileManagers() {
    calls.push_back("ResetFileManagers()");
}
void RecordingGhost::ShowErrorFlag() {
    calls.push_back("ShowErrorFlag()");
}
void RecordingGhost::ClearErrorFlag() {
    calls.push_back("ClearErrorFlag()");
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

namespace {

std::string base64(const std::vector<uint8_t>& bytes) {
    static const char* digits = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::string text;
    for (size_t i = 0; i < bytes.size(); i += 3) {
        uint32_t v = uint32_t(bytes[i]) << 16;
        if (i + 1 < bytes.size())
            v |= uint32_t(bytes[i + 1]) << 8;
        if (i + 2 < bytes.size())
            v |= bytes[i + 2];
        text += digits[(v >> 18) & 63];
        text += digits[(v >> 12) & 63];
        text += i + 1 < bytes.size() ? digits[(v >> 6) & 63] : '=';
        text += i + 2 < bytes.size() ? digits[v & 63] : '=';
    }
    return text;
}

void put_float(std::vector<uint8_t>& bytes, float f) {
    uint8_t raw[4];
    std::memcpy(raw, &f, 4);  // glTF buffers are little-endian, as is this machine
    bytes.insert(bytes.end(), raw, raw + 4);
}

}  // namespace

std::string MakeSceneJson(const std::vector<NodeSpec>& nodes, const std::string& sceneName) {
    std::vector<uint8_t> buffer;
    std::ostringstream views, accessors, channels, samplers, nodeText;
    int accessor = 0;
    for (size_t i = 0; i < nodes.size(); ++i) {
        const NodeSpec& n = nodes[i];
        std::string children;
        for (size_t j = 0; j < nodes.size(); ++j)
            if (nodes[j].parent == int(i))
                children += (children.empty() ? "" : ",") + std::to_string(j);
        nodeText << (i ? "," : "") << "{\"name\":\"" << n.name << "\"";
        if (!children.empty())
            nodeText << ",\"children\":[" << children << "]";
        nodeText << "}";
        if (n.times.empty())
            continue;
        // Input accessor (times), then output accessor (translations).
        const size_t inOffset = buffer.size();
        float lo = n.times.front(), hi = n.times.front();
        for (float t : n.times) {
            put_float(buffer, t);
            lo = std::min(lo, t), hi = std::max(hi, t);
        }
        const size_t outOffset = buffer.size();
        for (const auto& v : n.translations)
            for (float c : v)
                put_float(buffer, c);
        const int count = int(n.times.size());
        views << (accessor ? "," : "") << "{\"buffer\":0,\"byteOffset\":" << inOffset
              << ",\"byteLength\":" << count * 4 << "},{\"buffer\":0,\"byteOffset\":" << outOffset
              << ",\"byteLength\":" << count * 12 << "}";
        accessors << (accessor ? "," : "") << "{\"bufferView\":" << accessor
                  << ",\"componentType\":5126,\"count\":" << count
                  << ",\"type\":\"SCALAR\",\"min\":[" << lo << "],\"max\":[" << hi
                  << "]},{\"bufferView\":" << accessor + 1
                  << ",\"componentType\":5126,\"count\":" << count << ",\"type\":\"VEC3\"}";
        const int sampler = accessor / 2;
        samplers << (sampler ? "," : "") << "{\"input\":" << accessor
                 << ",\"output\":" << accessor + 1 << ",\"interpolation\":\"LINEAR\"}";
        channels << (sampler ? "," : "") << "{\"sampler\":" << sampler
                 << ",\"target\":{\"node\":" << i << ",\"path\":\"translation\"}}";
        accessor += 2;
    }
    std::string roots;
    for (size_t i = 0; i < nodes.size(); ++i)
        if (nodes[i].parent < 0)
            roots += (roots.empty() ? "" : ",") + std::to_string(i);
    std::ostringstream json;
    json << "{\"asset\":{\"version\":\"2.0\"},\"scene\":0,\"scenes\":[{";
    if (!sceneName.empty())
        json << "\"name\":\"" << sceneName << "\",";
    json << "\"nodes\":[" << roots << "]}],\"nodes\":[" << nodeText.str() << "]";
    if (accessor) {
        json << ",\"buffers\":[{\"byteLength\":" << buffer.size()
             << ",\"uri\":\"data:application/octet-stream;base64," << base64(buffer) << "\"}]"
             << ",\"bufferViews\":[" << views.str() << "],\"accessors\":[" << accessors.str()
             << "],\"animations\":[{\"channels\":[" << channels.str() << "],\"samplers\":["
             << samplers.str() << "]}]";
    }
    json << "}\n";
    return json.str();
}

std::string FaceSceneJson(const std::string& sceneName) {
    const std::vector<float> keys{0.0f, 10.0f / 30, 20.0f / 30};
    return MakeSceneJson({{"head", -1, {}, {}},
                          {"jaw", 0, keys, {{0, 0, 0}, {0, 1, 0}, {0, 2, 0}}},
                          {"lip", 0, keys, {{0, 0, 0}, {0, 0, 3}, {5, 0, 3}}}},
                         sceneName);
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
