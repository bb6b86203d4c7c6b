#include "scene/SceneDocument.h"

#include <sys/stat.h>

#include <cmath>
#include <cstring>
#include <fstream>
#include <limits>
#include <set>

#include "scene/EulerRotation.h"
#include "scene/SceneChecker.h"
#include "scene/SceneWriter.h"

namespace {
const char* const kPaths[3] = {"translation", "rotation", "scale"};
// Key times beyond the workspace's time range (a CueTime reaches about 99 hours) are refused:
// nothing could address them, and storing samples every frame up to them would never end.
constexpr double kMaxSeconds = 360000.0;
const char* const kNotRegular = " is not a regular file";

// Whether each key lies later than the one before by more than ChannelCurve::Merge's "same
// time", so that merging them one by one into an empty curve would keep them as they are.
bool separate_times(const std::vector<ChannelCurve::Key>& keys) {
    for (size_t k = 1; k < keys.size(); ++k) {
        if (!(keys[k].time > keys[k - 1].time + ChannelCurve::kSameTime)) {
            return false;
        }
    }
    return true;
}

// Images are kept as the bytes they were read as (never decoded), so that they are written
// back unchanged; images stored in buffer views stay there.
bool keep_image_bytes(tinygltf::Image* image, const int, std::string*, std::string*, int, int,
                      const unsigned char* bytes, int size, void*) {
    if (image->bufferView == -1 && bytes && size > 0) {
        image->image.assign(bytes, bytes + size);
    }
    image->as_is = true;
    return true;
}

// In-memory documents open no files: external buffers are reported missing.
bool no_file_exists(const std::string&, void*) {
    return false;
}
std::string same_path(const std::string& path, void*) {
    return path;
}
bool no_file_read(std::vector<unsigned char>*, std::string* err, const std::string& path, void*) {
    if (err) {
        *err += "external file " + path + " cannot be opened here\n";
    }
    return false;
}
bool no_file_write(std::string*, const std::string&, const std::vector<unsigned char>&, void*) {
    return false;
}

// Buffers and images named by a uri are read only from regular files: a directory, a device or
// a pipe is reported as unreadable instead of being read as bytes.
bool read_regular_file(std::vector<unsigned char>* out, std::string* err, const std::string& path,
                       void* data) {
    struct stat st;
    if (::stat(path.c_str(), &st) != 0 || !S_ISREG(st.st_mode)) {
        if (err) {
            *err += "file " + path + kNotRegular + "\n";
        }
        return false;
    }
    return tinygltf::ReadWholeFile(out, err, path, data);
}

std::string dir_of(const std::string& path) {
    size_t slash = path.find_last_of('/');
    return slash == std::string::npos ? std::string() : path.substr(0, slash);
}
}  // namespace

std::shared_ptr<SceneDocument> SceneDocument::Load(const std::string& path, std::string* error) {
    struct stat st;
    if (::stat(path.c_str(), &st) == 0 && !S_ISREG(st.st_mode)) {
        *error = "Cannot open scene file [" + path + "]: not a regular file";
        return nullptr;
    }
    std::ifstream in(path, std::ios::binary);
    if (!in) {
        *error = "Cannot open scene file [" + path + "]: " + std::strerror(errno);
        return nullptr;
    }
    in.seekg(0, std::ios::end);
    std::streamoff size = in.tellg();
    in.seekg(0, std::ios::beg);
    std::vector<unsigned char> bytes(size > 0 ? size_t(size) : 0);
    if (size < 0 ||
        !in.read(reinterpret_cast<char*>(bytes.data()), std::streamsize(bytes.size()))) {
        *error = "Cannot read scene file [" + path + "]";
        return nullptr;
    }
    auto doc = parse(bytes.data(), bytes.size(), path, dir_of(path), true, error);
    if (doc) {
        doc->path_ = path;
    }
    return doc;
}

std::shared_ptr<SceneDocument> SceneDocument::LoadFromMemory(const unsigned char* data, size_t size,
                                                             const std::string& name,
                                                             std::string* error) {
    return parse(data, size, name, "", false, error);
}

std::shared_ptr<SceneDocument> SceneDocument::parse(const unsigned char* data, size_t size,
                                                    const std::string& name,
                                                    const std::string& baseDir, bool allowFiles,
                                                    std::string* error) {
    auto bad = [&](const std::string& why) {
        *error = "Scene file [" + name + "] is not a usable glTF scene: " + why;
        while (!error->empty() && (error->back() == '\n' || error->back() == ' ')) {
            error->pop_back();
        }
        return nullptr;
    };
    if (size == 0) {
        return bad("the file is empty");
    }
    if (size >= std::numeric_limits<unsigned int>::max()) {
        return bad("the file is larger than 4 GB");
    }
    std::shared_ptr<SceneDocument> doc(new SceneDocument());
    tinygltf::TinyGLTF loader;
    loader.SetImageLoader(keep_image_bytes, nullptr);
    if (allowFiles) {
        loader.SetFsCallbacks({tinygltf::FileExists, tinygltf::ExpandFilePath, read_regular_file,
                               tinygltf::WriteWholeFile, nullptr});
    } else {
        loader.SetFsCallbacks({no_file_exists, same_path, no_file_read, no_file_write, nullptr});
    }
    std::string err, warn;
    bool ok;
    if (size >= 4 && std::memcmp(data, "glTF", 4) == 0) {
        size_t used = 0;
        std::string why;
        if (!SceneChecker::CheckGlb(data, size, &used, &why)) {
            return bad(why);
        }
        ok = loader.LoadBinaryFromMemory(&doc->model_, &err, &warn, data, unsigned(used), baseDir);
    } else {
        ok = loader.LoadASCIIFromString(&doc->model_, &err, &warn,
                                        reinterpret_cast<const char*>(data), unsigned(size),
                                        baseDir);
    }
    if (!ok) {
        return bad(err.empty() ? "it does not parse as glTF" : err);
    }
    // An image that could not be read is only a warning to the loader; one named by something
    // other than a file is an error here, as it is for a buffer.
    size_t notFile = warn.find(kNotRegular);
    if (notFile != std::string::npos) {
        size_t from = warn.rfind('\n', notFile);
        from = from == std::string::npos ? 0 : from + 1;
        return bad(warn.substr(from, warn.find('\n', notFile) - from));
    }
    std::string why;
    if (!SceneChecker::Check(doc->model_, &why) || !doc->buildHierarchy(&why)) {
        return bad(why);
    }
    doc->buildNames();
    if (!doc->readAnimations(&why)) {
        return bad(why);
    }
    return doc;
}

bool SceneDocument::buildHierarchy(std::string* why) {
    size_t n = model_.nodes.size();
    parent_.assign(n, -1);
    next_.assign(n, -1);
    for (size_t i = 0; i < n; ++i) {
        const std::vector<int>& kids = model_.nodes[i].children;
        for (size_t k = 0; k < kids.size(); ++k) {
            size_t c = size_t(kids[k]);
            if (c == i || parent_[c] != -1) {
                *why = "node " + std::to_string(c) +
                       (c == i ? " is its own child" : " has two parents");
                return false;
            }
            parent_[c] = int(i);
            next_[c] = k + 1 < kids.size() ? kids[k + 1] : -1;
        }
    }
    // With at most one parent each, a cycle is a parent chain that never ends.
    std::vector<int> seenIn(n, -1);  // the walk that first reached the node
    std::vector<char> done(n, 0);
    for (size_t i = 0; i < n; ++i) {
        int at = int(i);
        while (at >= 0 && !done[size_t(at)]) {
            if (seenIn[size_t(at)] == int(i)) {
                *why = "the node hierarchy has a cycle through node " + std::to_string(at);
                return false;
            }
            seenIn[size_t(at)] = int(i);
            at = parent_[size_t(at)];
        }
        for (at = int(i); at >= 0 && !done[size_t(at)]; at = parent_[size_t(at)]) {
            done[size_t(at)] = 1;
        }
    }
    int scene = model_.defaultScene >= 0 ? model_.defaultScene : (model_.scenes.empty() ? -1 : 0);
    roots_.clear();
    rootName_ = "root";
    if (scene >= 0) {
        const tinygltf::Scene& s = model_.scenes[size_t(scene)];
        if (!s.name.empty()) {
            rootName_ = s.name;
        }
        std::set<int> listed;
        for (int r : s.nodes) {
            if (parent_[size_t(r)] != -1 || !listed.insert(r).second) {
                *why = "scene " + std::to_string(scene) + " lists node " + std::to_string(r) +
                       " twice or although it has a parent";
                return false;
            }
            roots_.push_back(r);
        }
    } else {
        for (size_t i = 0; i < n; ++i) {
            if (parent_[i] == -1) {
                roots_.push_back(int(i));
            }
        }
    }
    inScene_.assign(n, 0);
    for (size_t k = 0; k < roots_.size(); ++k) {
        next_[size_t(roots_[k])] = k + 1 < roots_.size() ? roots_[k + 1] : -1;
        inScene_[size_t(roots_[k])] = 1;
    }
    return true;
}

void SceneDocument::buildNames() {
    size_t n = model_.nodes.size();
    names_.assign(n, std::string());
    byName_.clear();
    byName_.reserve(n);
    for (size_t i = 0; i < n; ++i) {
        std::string base = model_.nodes[i].name;
        if (base.empty()) {
            base = "node" + std::to_string(i);
        }
        std::string name = base;
        for (int k = 2; byName_.count(name); ++k) {
            name = base + "#" + std::to_string(k);
        }
        byName_.emplace(name, int(i));
        names_[i] = name;
    }
    curves_.clear();
    curves_.resize(n);
    touched_.assign(n, 0);
}

bool SceneDocument::readAnimations(std::string* why) {
    for (size_t ai = 0; ai < model_.animations.size(); ++ai) {
        const tinygltf::Animation& anim = model_.animations[ai];
        for (const tinygltf::AnimationChannel& ch : anim.channels) {
            int path = -1;
            for (int p = 0; p < 3; ++p) {
                if (ch.target_path == kPaths[p]) {
                    path = p;
                }
            }
            if (path < 0 || ch.target_node < 0 || curves_[size_t(ch.target_node)][path * 3]) {
                continue;  // weights, extension targets, or already given by an earlier one
            }
            std::array<std::vector<ChannelCurve::Key>, 3> keys;
            if (!readSampler(anim.samplers[size_t(ch.sampler)], path, &keys, why)) {
                *why = "animation " + std::to_string(ai) + ": " + *why;
                return false;
            }
            for (int a = 0; a < 3; ++a) {
                curves_[size_t(ch.target_node)][path * 3 + a] =
                    std::make_unique<ChannelCurve>(std::move(keys[size_t(a)]));
            }
        }
    }
    return true;
}

bool SceneDocument::readSampler(const tinygltf::AnimationSampler& s, int path,
                                std::array<std::vector<ChannelCurve::Key>, 3>* keys,
                                std::string* why) const {
    bool cubic = s.interpolation == "CUBICSPLINE";
    bool step = s.interpolation == "STEP";
    if (!cubic && !step && s.interpolation != "LINEAR" && !s.interpolation.empty()) {
        *why = "unknown interpolation \"" + s.interpolation + "\"";
        return false;
    }
    int width = path == 1 ? 4 : 3;
    std::vector<float> times, values;
    if (!SceneChecker::ReadFloats(model_, s.input, 1, &times, why) ||
        !SceneChecker::ReadFloats(model_, s.output, width, &values, why)) {
        return false;
    }
    size_t n = times.size();
    if (values.size() != n * size_t(width) * (cubic ? 3 : 1)) {
        *why = "sampler output count does not match its input count";
        return false;
    }
    for (size_t k = 0; k < n; ++k) {
        if (std::fabs(times[k]) > kMaxSeconds) {
            *why = "a key time lies outside +-100 hours";
            return false;
        }
        if (k > 0 && !(times[k] > times[k - 1])) {
            *why = "key times are not strictly increasing";
            return false;
        }
    }
    for (auto& axis : *keys) {
        axis.reserve(n);
    }
    EulerRotation::Vec3 previous = {0, 0, 0};
    for (size_t k = 0; k < n; ++k) {
        const float* v = values.data() + (cubic ? (3 * k + 1) : k) * size_t(width);
        const float* in = cubic ? v - width : nullptr;
        const float* out = cubic ? v + width : nullptr;
        double val[3], inSlope[3] = {0, 0, 0}, outSlope[3] = {0, 0, 0};
        if (path == 1) {
            EulerRotation::Quat q = {v[0], v[1], v[2], v[3]};
            EulerRotation::Vec3 e = EulerRotation::ToEuler(q);
            if (k > 0) {
                e = EulerRotation::Unwrap(previous, e);
            }
            previous = e;
            for (int a = 0; a < 3; ++a) {
                val[a] = e[a];
            }
            if (cubic) {  // the Euler slope of a quaternion tangent, by a small step
                const double h = 1e-4;
                for (int side = 0; side < 2; ++side) {
                    const float* t = side ? out : in;
                    EulerRotation::Quat qs = {v[0] + h * t[0], v[1] + h * t[1], v[2] + h * t[2],
                                              v[3] + h * t[3]};
                    EulerRotation::Vec3 es = EulerRotation::Unwrap(e, EulerRotation::ToEuler(qs));
                    for (int a = 0; a < 3; ++a) {
                        (side ? outSlope : inSlope)[a] = (es[a] - e[a]) / h;
                    }
                }
            }
        } else {
            for (int a = 0; a < 3; ++a) {
                val[a] = v[a];
                inSlope[a] = cubic ? in[a] : 0;
                outSlope[a] = cubic ? out[a] : 0;
            }
        }
        for (int a = 0; a < 3; ++a) {
            ChannelCurve::Key key;
            key.time = times[k];
            key.value = val[a];
            key.in = cubic ? ChannelCurve::kExplicit : ChannelCurve::kLinear;
            key.out = cubic ? ChannelCurve::kExplicit
                            : (step ? ChannelCurve::kStep : ChannelCurve::kLinear);
            key.inSlope = float(inSlope[a]);
            key.outSlope = float(outSlope[a]);
            (*keys)[size_t(a)].push_back(key);
        }
    }
    return true;
}

const std::string& SceneDocument::NodeName(int index) const {
    return index < 0 ? rootName_ : names_[size_t(index)];
}

int SceneDocument::FindNode(const std::string& name) const {
    auto it = byName_.find(name);
    return it == byName_.end() ? -2 : it->second;
}

bool SceneDocument::Below(int node, int ancestor) const {
    int top = node;
    for (int up = node; up >= 0; up = parent_[size_t(up)]) {
        if (up == ancestor) {
            return true;
        }
        top = up;
    }
    // Every node of the scene is below the root group; nodes outside the scene are not.
    return ancestor == -1 && top >= 0 && inScene_[size_t(top)];
}

int SceneDocument::FirstChild(int index) const {
    if (index < 0) {
        return roots_.empty() ? -1 : roots_.front();
    }
    const std::vector<int>& kids = model_.nodes[size_t(index)].children;
    return kids.empty() ? -1 : kids.front();
}

int SceneDocument::NextSibling(int index) const {
    return index < 0 ? -1 : next_[size_t(index)];
}

ChannelCurve* SceneDocument::Curve(int node, int channel) const {
    if (node < 0 || node >= NodeCount() || channel < 0 || channel >= kChannels) {
        return nullptr;
    }
    return curves_[size_t(node)][size_t(channel)].get();
}

size_t SceneDocument::SetCurve(int node, int channel, std::vector<ChannelCurve::Key> keys,
                               bool clearFirst) {
    auto& slot = curves_[size_t(node)][size_t(channel)];
    if (clearFirst || !slot) {
        slot = std::make_unique<ChannelCurve>();
    }
    if (slot->empty() && separate_times(keys)) {
        slot->keys() = std::move(keys);  // in time order, no two at one time: taken as they are
    } else {
        // Of two keys at one time the later wins, as Merge has it.
        for (const ChannelCurve::Key& k : keys) {
            slot->Merge(k);
        }
    }
    size_t dropped = slot->TrimBefore(0.0);
    if (slot->empty()) {
        slot.reset();
    }
    touched_[size_t(node)] |= 1u << channel;
    return dropped;
}

double SceneDocument::RestValue(int node, int channel) const {
    const tinygltf::Node& n = model_.nodes[size_t(node)];
    EulerRotation::Vec3 t = {0, 0, 0}, s = {1, 1, 1};
    EulerRotation::Quat r = {0, 0, 0, 1};
    if (n.matrix.size() == 16) {
        EulerRotation::Decompose(n.matrix.data(), &t, &r, &s);
    } else {
        for (size_t a = 0; a < 3; ++a) {
            if (n.translation.size() == 3) {
                t[a] = n.translation[a];
            }
            if (n.scale.size() == 3) {
                s[a] = n.scale[a];
            }
        }
        if (n.rotation.size() == 4) {
            r = {n.rotation[0], n.rotation[1], n.rotation[2], n.rotation[3]};
        }
    }
    if (channel < 3) {
        return t[size_t(channel)];
    }
    if (channel < 6) {
        return EulerRotation::ToEuler(r)[size_t(channel - 3)];
    }
    return s[size_t(channel - 6)];
}

void SceneDocument::ClearTouched() {
    touched_.assign(touched_.size(), 0);
}

bool SceneDocument::Store(const std::string& path, std::string* error) {
    return SceneWriter(*this).Write(path, error);
}
