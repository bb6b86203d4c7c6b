#include "scene/SceneWriter.h"

#include <algorithm>
#include <atomic>
#include <cstdint>
#include <cstring>
#include <map>
#include <thread>
#include <unordered_map>

#include "scene/EulerRotation.h"
#include "scene/ModelCompactor.h"
#include "scene/SceneDocument.h"
#include "scene/SceneSerializer.h"
#include "toolkit/CueTime.h"

namespace {
const char* const kPaths[3] = {"translation", "rotation", "scale"};
// Samplers are built on more than one thread only when the curves hold this many keys per
// thread: below it, starting a thread costs more than it saves.
constexpr size_t kKeysPerThread = 20000;
constexpr size_t kMaxHelperThreads = 7;
// Marks the buffers that each hold one path's values after a .glb store (see appendSamplers);
// never written to a file. It starts with a control character, which no name a scene file
// gives a buffer is likely to hold.
const char* const kPathBufferName = "\x01chirrup path values";

int path_index(const std::string& path) {
    for (int p = 0; p < 3; ++p) {
        if (path == kPaths[p]) {
            return p;
        }
    }
    return -1;
}

// What samplers that share their key times are looked up by: the count of the times and a
// few of them, evenly spread (a match is confirmed byte for byte, so this only has to tell
// most different times apart; hashing every time cost more than the rare false match).
size_t times_key(const std::vector<float>& times) {
    size_t key = times.size();
    for (size_t i = 0; i < 16 && !times.empty(); ++i) {
        uint32_t bits;
        std::memcpy(&bits, &times[i * (times.size() - 1) / 15], sizeof bits);
        key = key * 1000003 ^ bits;
    }
    return key;
}
}  // namespace

SceneWriter::SceneWriter(SceneDocument& doc) : doc_(doc), m_(doc.model()) {}

bool SceneWriter::Write(const std::string& path, std::string* error) {
    std::vector<Target> targets;
    std::string why;
    if (!buildTargets(&targets, &why)) {
        *error = "Cannot write scene file [" + path + "]: " + why;
        return false;
    }
    const bool binary = SceneSerializer::IsBinaryPath(path);
    ModelCompactor compactor(m_);
    // Whether buffers and their bytes may be renumbered and moved: no extension in use could
    // refer to them by index or offset. Bytes no view covers are then left out of the file.
    const bool closeGaps = compactor.RenumberingSafe();
    if (!targets.empty()) {
        // The bytes of the views removed with the old channels are left out as the file is
        // written (a .glb never moves them).
        compactor.RemoveUnusedAccessors(removeOldChannels(&targets));
        appendSamplers(&targets, binary);
        compactor.RemoveUnusedBuffers();
        doc_.ClearTouched();
    }
    bool join = false;
    if (!binary) {
        joinPathBuffers();
    } else {
        // Every buffer goes into the binary chunk: joined as the file is written where the
        // serialiser can (no copy of the bytes), else moved into buffer 0 first.
        join = closeGaps && SceneSerializer::CanJoinBuffers(m_);
        compactor.PackIntoFirstBuffer(!join);
    }
    return SceneSerializer::Write(m_, path, join, closeGaps, error);
}

bool SceneWriter::buildTargets(std::vector<Target>* targets, std::string* why) {
    int fps = CueTime::default_fps > 0 ? CueTime::default_fps : 30;
    size_t keys = 0;  // how much work the samplers are, to decide whether to share it out
    for (int node = 0; node < doc_.NodeCount(); ++node) {
        for (int path = 0; doc_.Touched(node) && path < 3; ++path) {
            if (!doc_.TouchedPath(node, path)) {
                continue;
            }
            targets->push_back(Target{node, path, -1, {}});
            for (int a = 0; a < 3; ++a) {
                const ChannelCurve* c = doc_.Curve(node, path * 3 + a);
                keys += c ? c->keys().size() : 0;
            }
        }
    }
    // Each path's sampler is built on its own from the document's curves (only read), so the
    // paths are shared out among a few threads when there are enough keys to be worth it.
    std::vector<std::string> reasons(targets->size());
    std::vector<char> built(targets->size(), 0);
    std::atomic<size_t> next{0};
    auto work = [&]() {
        for (size_t i = next++; i < targets->size(); i = next++) {
            Target& t = (*targets)[i];
            const ChannelCurve* curves[3];
            double rest[3];
            for (int a = 0; a < 3; ++a) {
                curves[a] = doc_.Curve(t.node, t.path * 3 + a);
                rest[a] = doc_.RestValue(t.node, t.path * 3 + a);
            }
            SamplerBuilder builder(curves, rest, fps);
            built[i] = t.path == 1 ? builder.BuildRotation(&t.sampler, &reasons[i])
                                   : builder.BuildVector(&t.sampler, &reasons[i]);
        }
    };
    const size_t helpers =
        keys < kKeysPerThread
            ? 0
            : std::min<size_t>({std::max(1u, std::thread::hardware_concurrency()) - 1,
                                keys / kKeysPerThread, kMaxHelperThreads});
    std::vector<std::thread> threads;
    for (size_t h = 0; h < helpers; ++h) {
        threads.emplace_back(work);
    }
    work();
    for (std::thread& thread : threads) {
        thread.join();
    }
    for (size_t i = 0; i < targets->size(); ++i) {
        if (!built[i]) {
            const Target& t = (*targets)[i];
            *why = "the " + std::string(kPaths[t.path]) + " of node [" + doc_.NodeName(t.node) +
                   "] cannot be written: " + reasons[i];
            targets->clear();
            return false;
        }
    }
    return true;
}

std::set<int> SceneWriter::removeOldChannels(std::vector<Target>* targets) {
    std::map<std::pair<int, int>, Target*> byPath;
    for (Target& t : *targets) {
        byPath[{t.node, t.path}] = &t;
    }
    std::set<int> freed;
    for (size_t ai = 0; ai < m_.animations.size(); ++ai) {
        tinygltf::Animation& anim = m_.animations[ai];
        std::set<int> dropped, kept;
        std::vector<tinygltf::AnimationChannel> channels;
        for (tinygltf::AnimationChannel& c : anim.channels) {
            auto hit = byPath.find({c.target_node, path_index(c.target_path)});
            if (hit != byPath.end()) {
                if (hit->second->clip < 0) {
                    hit->second->clip = int(ai);  // the first clip that animated the path
                }
                dropped.insert(c.sampler);
            } else {
                kept.insert(c.sampler);
                channels.push_back(std::move(c));
            }
        }
        anim.channels = std::move(channels);
        if (dropped.empty()) {
            continue;
        }
        std::vector<int> remap(anim.samplers.size(), -1);
        std::vector<tinygltf::AnimationSampler> samplers;
        for (size_t i = 0; i < anim.samplers.size(); ++i) {
            if (dropped.count(int(i)) && !kept.count(int(i))) {
                freed.insert(anim.samplers[i].input);
                freed.insert(anim.samplers[i].output);
                continue;
            }
            remap[i] = int(samplers.size());
            samplers.push_back(std::move(anim.samplers[i]));
        }
        for (tinygltf::AnimationChannel& c : anim.channels) {
            c.sampler = remap[size_t(c.sampler)];
        }
        anim.samplers = std::move(samplers);
    }
    return freed;
}

void SceneWriter::joinPathBuffers() {
    // A .gltf carries the animation bytes of a store as one embedded buffer: the key times and
    // the buffers of single paths' values that a .glb store left are joined into the first.
    int into = -1;
    std::vector<size_t> base(m_.buffers.size(), 0);
    std::vector<char> joined(m_.buffers.size(), 0);
    for (size_t b = 0; b < m_.buffers.size(); ++b) {
        tinygltf::Buffer& buffer = m_.buffers[b];
        if (buffer.name != kPathBufferName) {
            continue;
        }
        buffer.name.clear();
        if (into < 0) {
            into = int(b);
            continue;
        }
        std::vector<unsigned char>& data = m_.buffers[size_t(into)].data;
        base[b] = (data.size() + 3) & ~size_t(3);
        data.resize(base[b], 0);
        data.insert(data.end(), buffer.data.begin(), buffer.data.end());
        buffer.data.clear();
        buffer.data.shrink_to_fit();
        joined[b] = 1;
    }
    if (into < 0) {
        return;
    }
    for (tinygltf::BufferView& v : m_.bufferViews) {
        if (v.buffer >= 0 && joined[size_t(v.buffer)]) {
            v.byteOffset += base[size_t(v.buffer)];
            v.buffer = into;
        }
    }
    ModelCompactor(m_).RemoveUnusedBuffers();
}

void SceneWriter::appendSamplers(std::vector<Target>* targets, bool binary) {
    bool any = false;
    for (Target& t : *targets) {
        if (t.sampler.times.empty()) {
            continue;  // the path is left unanimated
        }
        any = true;
        if (t.clip < 0) {
            if (m_.animations.empty()) {
                tinygltf::Animation anim;
                anim.name = "chirrup";
                m_.animations.push_back(anim);
            }
            t.clip = 0;
        }
    }
    if (any) {
        // The new bytes go into a buffer of their own, sized once, so that the scene's buffers
        // are never copied; a scene with extensions that may refer to buffers by index, or
        // without buffers, gets them at the end of buffer 0.
        if (m_.buffers.empty() || !ModelCompactor(m_).RenumberingSafe()) {
            buffer_ = 0;
            if (m_.buffers.empty()) {
                m_.buffers.emplace_back();
            }
        } else {
            buffer_ = int(m_.buffers.size());
            m_.buffers.emplace_back();
        }
        // For a .glb, each path's values become a buffer of their own, taken over without a
        // copy and joined only as the file is written; the key times stay together here.
        const bool pathBuffers = binary && buffer_ > 0;
        size_t bytes = 0;
        for (const Target& t : *targets) {
            bytes += t.sampler.times.size() * sizeof(float) +
                     (pathBuffers ? 0 : t.sampler.valueBytes.size());
        }
        m_.buffers.reserve(m_.buffers.size() + (pathBuffers ? targets->size() : 0));
        if (pathBuffers) {
            m_.buffers[size_t(buffer_)].name = kPathBufferName;  // joined with them for a .gltf
        }
        m_.bufferViews.reserve(m_.bufferViews.size() + 1 + targets->size());
        std::vector<unsigned char>& data = m_.buffers[size_t(buffer_)].data;
        data.reserve(((data.size() + 3) & ~size_t(3)) + bytes);
        data.resize((data.size() + 3) & ~size_t(3), 0);
        view_ = int(m_.bufferViews.size());
        viewStart_ = data.size();
        m_.bufferViews.emplace_back();  // filled in once its bytes are all there
        m_.accessors.reserve(m_.accessors.size() + 2 * targets->size());
        // Samplers with the same key times (the paths one keyset drives share them) share one
        // input accessor: found by their times' key, confirmed byte for byte.
        std::unordered_multimap<size_t, int> inputs;
        for (Target& t : *targets) {
            if (t.sampler.times.empty()) {
                continue;
            }
            makeNodeTrs(t.node);
            const BuiltSampler& s = t.sampler;
            tinygltf::AnimationSampler sampler;
            const size_t timeBytes = s.times.size() * sizeof(float);
            const size_t hash = times_key(s.times);
            auto same = inputs.equal_range(hash);
            for (auto it = same.first; it != same.second && sampler.input < 0; ++it) {
                const tinygltf::Accessor& a = m_.accessors[size_t(it->second)];
                if (a.count == s.times.size() &&
                    std::memcmp(data.data() + viewStart_ + a.byteOffset, s.times.data(),
                                timeBytes) == 0) {
                    sampler.input = it->second;
                }
            }
            if (sampler.input < 0) {
                sampler.input = appendAccessor(s.times.data(), s.times.size(), TINYGLTF_TYPE_SCALAR,
                                               s.times.size(), true);
                inputs.emplace(hash, sampler.input);
            }
            const int type = s.width == 4 ? TINYGLTF_TYPE_VEC4 : TINYGLTF_TYPE_VEC3;
            const size_t count = s.ValueCount() / size_t(s.width);
            if (pathBuffers) {
                tinygltf::BufferView view;
                view.buffer = int(m_.buffers.size());
                view.byteLength = t.sampler.valueBytes.size();
                tinygltf::Accessor a;
                a.bufferView = int(m_.bufferViews.size());
                a.componentType = TINYGLTF_COMPONENT_TYPE_FLOAT;
                a.type = type;
                a.count = count;
                m_.buffers.emplace_back();
                m_.buffers.back().name = kPathBufferName;
                m_.buffers.back().data = std::move(t.sampler.valueBytes);
                m_.bufferViews.push_back(view);
                m_.accessors.push_back(std::move(a));
                sampler.output = int(m_.accessors.size()) - 1;
            } else {
                sampler.output = appendAccessor(s.Values(), s.ValueCount(), type, count, false);
            }
            sampler.interpolation = s.interpolation;
            tinygltf::Animation& anim = m_.animations[size_t(t.clip)];
            tinygltf::AnimationChannel channel;
            channel.sampler = int(anim.samplers.size());
            channel.target_node = t.node;
            channel.target_path = kPaths[t.path];
            anim.samplers.push_back(sampler);
            anim.channels.push_back(channel);
            t.sampler = BuiltSampler();  // its bytes are in the buffer now
        }
        tinygltf::BufferView& view = m_.bufferViews[size_t(view_)];
        view.buffer = buffer_;
        view.byteOffset = viewStart_;
        view.byteLength = m_.buffers[size_t(buffer_)].data.size() - viewStart_;
    }
    // A clip left without channels is no longer a valid animation.
    m_.animations.erase(
        std::remove_if(m_.animations.begin(), m_.animations.end(),
                       [](const tinygltf::Animation& a) { return a.channels.empty(); }),
        m_.animations.end());
}

void SceneWriter::makeNodeTrs(int node) {
    tinygltf::Node& n = m_.nodes[size_t(node)];
    if (n.matrix.size() != 16) {
        return;  // an animated node must carry TRS, not a matrix
    }
    EulerRotation::Vec3 t, s;
    EulerRotation::Quat r;
    EulerRotation::Decompose(n.matrix.data(), &t, &r, &s);
    n.matrix.clear();
    n.translation.assign(t.begin(), t.end());
    n.rotation.assign(r.begin(), r.end());
    n.scale.assign(s.begin(), s.end());
}

int SceneWriter::appendAccessor(const float* values, size_t floats, int type, size_t count,
                                bool withMinMax) {
    std::vector<unsigned char>& data = m_.buffers[size_t(buffer_)].data;
    tinygltf::Accessor a;
    a.bufferView = view_;
    a.byteOffset = data.size() - viewStart_;
    a.componentType = TINYGLTF_COMPONENT_TYPE_FLOAT;
    a.type = type;
    a.count = count;
    if (withMinMax && floats > 0) {
        auto mm = std::minmax_element(values, values + floats);
        a.minValues = {double(*mm.first) + 0.0};
        a.maxValues = {double(*mm.second) + 0.0};
    }
    const unsigned char* bytes = reinterpret_cast<const unsigned char*>(values);
    data.insert(data.end(), bytes, bytes + floats * sizeof(float));
    m_.accessors.push_back(std::move(a));
    return int(m_.accessors.size()) - 1;
}
