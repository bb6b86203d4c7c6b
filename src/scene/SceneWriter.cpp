#include "scene/SceneWriter.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstring>
#include <fstream>
#include <map>

#include "scene/EulerRotation.h"
#include "scene/SceneDocument.h"
#include "toolkit/CueTime.h"

namespace tinygltf {
// Exported by the tinygltf library, declared only inside its implementation section.
std::string base64_encode(unsigned char const* bytes, unsigned int len);
}  // namespace tinygltf

namespace {
// Extensions known not to refer to accessors or buffer views by index: with only these in use,
// accessors freed by rewritten animation can be removed and the indices renumbered safely.
bool renumbering_safe(const tinygltf::Model& m) {
    static const char* const kSafe[] = {"KHR_texture_transform",  "KHR_lights_punctual",
                                        "KHR_mesh_quantization",  "KHR_texture_basisu",
                                        "KHR_materials_variants", "KHR_xmp_json_ld"};
    for (const std::string& e : m.extensionsUsed) {
        bool ok = e.rfind("KHR_materials_", 0) == 0;
        for (const char* s : kSafe) {
            ok = ok || e == s;
        }
        if (!ok) {
            return false;
        }
    }
    return true;
}

// Images read as bytes are written back as the same bytes; images with a file name keep it.
bool write_image_bytes(const std::string*, const std::string*, const tinygltf::Image* image, bool,
                       std::string* uri, void*) {
    if (!image->uri.empty() || image->image.empty()) {
        return false;  // the original uri is kept
    }
    std::string mime = image->mimeType.empty() ? "image/png" : image->mimeType;
    *uri = "data:" + mime + ";base64," +
           tinygltf::base64_encode(image->image.data(), unsigned(image->image.size()));
    return true;
}

bool ends_with(const std::string& s, const char* tail) {
    size_t n = std::strlen(tail);
    if (s.size() < n) {
        return false;
    }
    for (size_t i = 0; i < n; ++i) {
        if (std::tolower(static_cast<unsigned char>(s[s.size() - n + i])) != tail[i]) {
            return false;
        }
    }
    return true;
}

// Serialises `model` into a temporary file beside `path`, flushed to disk, then renamed over
// `path`; on any failure the temporary file is removed and `path` is left as it was.
bool write_atomically(tinygltf::TinyGLTF* writer, tinygltf::Model* model, bool binary,
                      const std::string& path, std::string* error) {
    std::string tmpl = path + ".XXXXXX";
    std::vector<char> name(tmpl.begin(), tmpl.end());
    name.push_back('\0');
    int fd = mkstemp(name.data());
    if (fd < 0) {
        *error = "Cannot write scene file [" + path + "]: " + std::strerror(errno);
        return false;
    }
    mode_t mask = umask(0);
    umask(mask);
    fchmod(fd, 0666 & ~mask);
    bool ok;
    {
        std::ofstream out(name.data(), std::ios::binary | std::ios::trunc);
        ok = out.is_open() && writer->WriteGltfSceneToStream(model, out, !binary, binary);
        out.flush();
        ok = ok && out.good();
    }
    int saved = ok ? 0 : (errno ? errno : EIO);
    if (ok && fsync(fd) != 0) {
        ok = false;
        saved = errno;
    }
    if (::close(fd) != 0 && ok) {
        ok = false;
        saved = errno;
    }
    if (ok && std::rename(name.data(), path.c_str()) != 0) {
        ok = false;
        saved = errno;
    }
    if (!ok) {
        ::unlink(name.data());
        *error = "Cannot write scene file [" + path + "]: " + std::strerror(saved ? saved : EIO);
    }
    return ok;
}
}  // namespace

SceneWriter::SceneWriter(SceneDocument& doc) : doc_(doc), m_(doc.model()) {}

bool SceneWriter::Write(const std::string& path, std::string* error) {
    rewriteAnimation();
    // The serialiser writes an object with no properties as null, which no reader accepts:
    // such a node gets its (default) translation written out.
    for (tinygltf::Node& n : m_.nodes) {
        if (n.name.empty() && n.children.empty() && n.translation.empty() && n.rotation.empty() &&
            n.scale.empty() && n.matrix.empty() && n.weights.empty() && n.mesh == -1 &&
            n.skin == -1 && n.camera == -1 && n.extras.Type() == tinygltf::NULL_TYPE &&
            n.extensions.empty()) {
            n.translation = {0, 0, 0};
        }
    }
    for (tinygltf::Scene& scene : m_.scenes) {
        if (scene.name.empty() && scene.nodes.empty() && scene.extensions.empty() &&
            scene.extras.Type() == tinygltf::NULL_TYPE) {
            scene.name = "root";
        }
    }
    bool binary = ends_with(path, ".glb");
    if (binary && !m_.buffers.empty()) {
        m_.buffers[0].uri.clear();  // buffer 0 travels in the binary chunk
    }
    tinygltf::TinyGLTF writer;
    writer.SetImageWriter(write_image_bytes, nullptr);
    return write_atomically(&writer, &m_, binary, path, error);
}

void SceneWriter::rewriteAnimation() {
    std::vector<int> touched;
    for (int i = 0; i < doc_.NodeCount(); ++i) {
        if (doc_.Touched(i)) {
            touched.push_back(i);
        }
    }
    if (touched.empty()) {
        return;
    }
    std::set<int> freed;
    if (!m_.animations.empty()) {
        freed = removeTouchedChannels(&m_.animations[0]);
    }
    collectGarbage(freed);
    for (int node : touched) {
        makeNodeTrs(node);
        sampleTranslationScale(node, 0, "translation");
        sampleRotation(node);
        sampleTranslationScale(node, 6, "scale");
    }
    if (m_.animations.empty() && !samplers_.empty()) {
        tinygltf::Animation anim;
        anim.name = "chirrup";
        m_.animations.push_back(anim);
    }
    if (!samplers_.empty()) {
        if (m_.buffers.empty()) {
            m_.buffers.emplace_back();
        }
        tinygltf::Buffer& buffer = m_.buffers[0];
        buffer.data.resize((buffer.data.size() + 3) & ~size_t(3), 0);
        tinygltf::BufferView view;
        view.buffer = 0;
        view.byteOffset = buffer.data.size();
        view_ = int(m_.bufferViews.size());
        tinygltf::Animation& anim = m_.animations[0];
        for (const NewSampler& s : samplers_) {
            tinygltf::AnimationSampler sampler;
            sampler.input = appendAccessor(s.times, TINYGLTF_TYPE_SCALAR, s.times.size(), true);
            sampler.output =
                appendAccessor(s.values, s.width == 4 ? TINYGLTF_TYPE_VEC4 : TINYGLTF_TYPE_VEC3,
                               s.values.size() / size_t(s.width), false);
            sampler.interpolation = s.interpolation;
            tinygltf::AnimationChannel channel;
            channel.sampler = int(anim.samplers.size());
            channel.target_node = s.node;
            channel.target_path = s.path;
            anim.samplers.push_back(sampler);
            anim.channels.push_back(channel);
        }
        view.byteLength = data_.size();
        buffer.data.insert(buffer.data.end(), data_.begin(), data_.end());
        m_.bufferViews.push_back(view);
    }
    if (!m_.animations.empty() && m_.animations[0].channels.empty()) {
        m_.animations.erase(m_.animations.begin());  // nothing left animated in it
    }
    doc_.ClearTouched();
}

std::set<int> SceneWriter::removeTouchedChannels(tinygltf::Animation* anim) {
    std::set<int> dropped, kept;
    std::vector<tinygltf::AnimationChannel> channels;
    for (tinygltf::AnimationChannel& c : anim->channels) {
        bool trs = c.target_path == "translation" || c.target_path == "rotation" ||
                   c.target_path == "scale";
        if (trs && c.target_node >= 0 && doc_.Touched(c.target_node)) {
            dropped.insert(c.sampler);
        } else {
            kept.insert(c.sampler);
            channels.push_back(std::move(c));
        }
    }
    std::set<int> freed;
    std::vector<int> remap(anim->samplers.size(), -1);
    std::vector<tinygltf::AnimationSampler> samplers;
    for (size_t i = 0; i < anim->samplers.size(); ++i) {
        if (dropped.count(int(i)) && !kept.count(int(i))) {
            freed.insert(anim->samplers[i].input);
            freed.insert(anim->samplers[i].output);
            continue;
        }
        remap[i] = int(samplers.size());
        samplers.push_back(std::move(anim->samplers[i]));
    }
    for (tinygltf::AnimationChannel& c : channels) {
        c.sampler = remap[size_t(c.sampler)];
    }
    anim->channels = std::move(channels);
    anim->samplers = std::move(samplers);
    return freed;
}

void SceneWriter::collectGarbage(const std::set<int>& freed) {
    if (freed.empty() || !renumbering_safe(m_)) {
        return;  // left in place, unused
    }
    // Every other user of an accessor keeps it alive.
    std::vector<char> live(m_.accessors.size(), 0);
    for (const tinygltf::Mesh& mesh : m_.meshes) {
        for (const tinygltf::Primitive& p : mesh.primitives) {
            if (p.indices >= 0) {
                live[size_t(p.indices)] = 1;
            }
            for (const auto& kv : p.attributes) {
                live[size_t(kv.second)] = 1;
            }
            for (const auto& t : p.targets) {
                for (const auto& kv : t) {
                    live[size_t(kv.second)] = 1;
                }
            }
        }
    }
    for (const tinygltf::Skin& s : m_.skins) {
        if (s.inverseBindMatrices >= 0) {
            live[size_t(s.inverseBindMatrices)] = 1;
        }
    }
    for (const tinygltf::Animation& a : m_.animations) {
        for (const tinygltf::AnimationSampler& s : a.samplers) {
            live[size_t(s.input)] = live[size_t(s.output)] = 1;
        }
    }
    std::vector<int> remap(m_.accessors.size());
    std::set<int> freedViews;
    int next = 0;
    for (size_t i = 0; i < m_.accessors.size(); ++i) {
        bool dead = freed.count(int(i)) && !live[i];
        remap[i] = dead ? -1 : next++;
        if (dead && m_.accessors[i].bufferView >= 0) {
            freedViews.insert(m_.accessors[i].bufferView);
        }
    }
    if (next == int(m_.accessors.size())) {
        return;
    }
    auto re = [&](int& index) { index = index >= 0 ? remap[size_t(index)] : index; };
    for (tinygltf::Mesh& mesh : m_.meshes) {
        for (tinygltf::Primitive& p : mesh.primitives) {
            re(p.indices);
            for (auto& kv : p.attributes) {
                re(kv.second);
            }
            for (auto& t : p.targets) {
                for (auto& kv : t) {
                    re(kv.second);
                }
            }
        }
    }
    for (tinygltf::Skin& s : m_.skins) {
        re(s.inverseBindMatrices);
    }
    for (tinygltf::Animation& a : m_.animations) {
        for (tinygltf::AnimationSampler& s : a.samplers) {
            re(s.input);
            re(s.output);
        }
    }
    std::vector<tinygltf::Accessor> accessors;
    for (size_t i = 0; i < m_.accessors.size(); ++i) {
        if (remap[i] >= 0) {
            accessors.push_back(std::move(m_.accessors[i]));
        }
    }
    m_.accessors = std::move(accessors);

    // Buffer views freed with them, unless something else still refers to them.
    for (const tinygltf::Accessor& a : m_.accessors) {
        freedViews.erase(a.bufferView);
        if (a.sparse.isSparse) {
            freedViews.erase(a.sparse.indices.bufferView);
            freedViews.erase(a.sparse.values.bufferView);
        }
    }
    for (const tinygltf::Image& image : m_.images) {
        freedViews.erase(image.bufferView);
    }
    if (freedViews.empty()) {
        return;
    }
    std::vector<int> viewMap(m_.bufferViews.size());
    std::set<int> shrunk;
    std::vector<tinygltf::BufferView> views;
    for (size_t i = 0; i < m_.bufferViews.size(); ++i) {
        if (freedViews.count(int(i))) {
            viewMap[i] = -1;
            shrunk.insert(m_.bufferViews[i].buffer);
        } else {
            viewMap[i] = int(views.size());
            views.push_back(std::move(m_.bufferViews[i]));
        }
    }
    m_.bufferViews = std::move(views);
    auto rv = [&](int& index) { index = index >= 0 ? viewMap[size_t(index)] : index; };
    for (tinygltf::Accessor& a : m_.accessors) {
        rv(a.bufferView);
        if (a.sparse.isSparse) {
            rv(a.sparse.indices.bufferView);
            rv(a.sparse.values.bufferView);
        }
    }
    for (tinygltf::Image& image : m_.images) {
        rv(image.bufferView);
    }
    compactBuffers(shrunk);
}

void SceneWriter::compactBuffers(const std::set<int>& buffers) {
    for (int b : buffers) {
        // Byte ranges still covered by a view, merged where they overlap, are moved down
        // keeping their offset modulo 16 so that every alignment rule still holds.
        std::vector<size_t> order;
        for (size_t i = 0; i < m_.bufferViews.size(); ++i) {
            if (m_.bufferViews[i].buffer == b) {
                order.push_back(i);
            }
        }
        std::sort(order.begin(), order.end(), [&](size_t x, size_t y) {
            return m_.bufferViews[x].byteOffset < m_.bufferViews[y].byteOffset;
        });
        const std::vector<unsigned char>& old = m_.buffers[size_t(b)].data;
        std::vector<unsigned char> data;
        size_t k = 0;
        while (k < order.size()) {
            size_t start = m_.bufferViews[order[k]].byteOffset;
            size_t end = start + m_.bufferViews[order[k]].byteLength;
            size_t j = k + 1;
            while (j < order.size() && m_.bufferViews[order[j]].byteOffset < end) {
                const tinygltf::BufferView& v = m_.bufferViews[order[j]];
                end = std::max(end, size_t(v.byteOffset + v.byteLength));
                ++j;
            }
            size_t at = data.size();
            at += (start % 16 + 16 - at % 16) % 16;
            data.resize(at, 0);
            data.insert(data.end(), old.begin() + long(start), old.begin() + long(end));
            for (size_t v = k; v < j; ++v) {
                m_.bufferViews[order[v]].byteOffset =
                    m_.bufferViews[order[v]].byteOffset - start + at;
            }
            k = j;
        }
        data.resize((data.size() + 3) & ~size_t(3), 0);
        m_.buffers[size_t(b)].data = std::move(data);
    }
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

std::vector<double> SceneWriter::sampleTimes(int node, int first, bool frames) const {
    double lo = 0, hi = 0;
    bool any = false;
    for (int c = first; c < first + 3; ++c) {
        if (const ChannelCurve* curve = doc_.Curve(node, c)) {
            lo = any ? std::min(lo, curve->keys().front().time) : curve->keys().front().time;
            hi = any ? std::max(hi, curve->keys().back().time) : curve->keys().back().time;
            any = true;
        }
    }
    std::vector<double> times, merged;
    int fps = CueTime::default_fps > 0 ? CueTime::default_fps : 30;
    // At most one frame per 1/fps s across the CueTime range (about 99 hours), and never more.
    double f0 = std::ceil(lo * fps - 1e-6), last = std::floor(hi * fps + 1e-6);
    last = std::min(last, f0 + 360000.0 * fps);
    for (double f = f0; frames && any && f <= last; ++f) {
        times.push_back(f / fps);
    }
    // Key times are in order already: merge them in.
    for (int c = first; c < first + 3; ++c) {
        if (const ChannelCurve* curve = doc_.Curve(node, c)) {
            merged.clear();
            merged.reserve(times.size() + curve->keys().size());
            auto key = curve->keys().begin(), end = curve->keys().end();
            for (double t : times) {
                for (; key != end && key->time < t; ++key) {
                    merged.push_back(key->time);
                }
                merged.push_back(t);
            }
            for (; key != end; ++key) {
                merged.push_back(key->time);
            }
            times.swap(merged);
        }
    }
    // Times are stored as floats: keep one sample per distinct float.
    std::vector<double> out;
    out.reserve(times.size());
    for (double t : times) {
        if (out.empty() || float(t) > float(out.back())) {
            out.push_back(t);
        }
    }
    return out;
}

void SceneWriter::evaluateAxes(int node, int first, const std::vector<double>& times,
                               std::vector<double> axis[3]) const {
    for (int a = 0; a < 3; ++a) {
        if (const ChannelCurve* curve = doc_.Curve(node, first + a)) {
            curve->EvaluateSorted(times, &axis[a]);
        } else {
            axis[a].assign(times.size(), doc_.RestValue(node, first + a));
        }
    }
}

void SceneWriter::sampleTranslationScale(int node, int first, const char* path) {
    const ChannelCurve* c[3];
    const ChannelCurve* lead = nullptr;
    for (int a = 0; a < 3; ++a) {
        c[a] = doc_.Curve(node, first + a);
        lead = lead ? lead : c[a];
    }
    if (!lead) {
        return;
    }
    NewSampler s{node, path, "LINEAR", {}, {}, 3};
    bool shared = true, allLinear = true, allStep = true, anyStep = false;
    for (int a = 0; a < 3; ++a) {
        if (!c[a]) {
            continue;
        }
        const auto& keys = c[a]->keys();
        shared = shared && keys.size() == lead->keys().size();
        for (size_t k = 0; k < keys.size(); ++k) {
            shared = shared && float(keys[k].time) == float(lead->keys()[k].time);
            anyStep = anyStep || (k + 1 < keys.size() && keys[k].out == ChannelCurve::kStep);
        }
        allLinear = allLinear && c[a]->AllLinear();
        allStep = allStep && c[a]->AllStep();
    }
    for (size_t k = 1; shared && k < lead->keys().size(); ++k) {
        shared = float(lead->keys()[k].time) > float(lead->keys()[k - 1].time);
    }
    if (shared && (allLinear || allStep || !anyStep)) {
        bool cubic = !allLinear && !allStep;
        s.interpolation = allLinear ? "LINEAR" : (allStep ? "STEP" : "CUBICSPLINE");
        for (size_t k = 0; k < lead->keys().size(); ++k) {
            s.times.push_back(float(lead->keys()[k].time));
            for (int part = cubic ? 0 : 1; part < (cubic ? 3 : 2); ++part) {
                for (int a = 0; a < 3; ++a) {
                    double v = 0;
                    if (part == 1) {
                        v = c[a] ? c[a]->keys()[k].value : doc_.RestValue(node, first + a);
                    } else if (c[a]) {
                        v = part == 0 ? c[a]->InSlope(k) : c[a]->OutSlope(k);
                    }
                    s.values.push_back(float(v));
                }
            }
        }
    } else if (!anyStep) {
        // Axes keyed at different times: cut every axis's cubic pieces at the union of the key
        // times; a piece of a cubic is a cubic, so this is exact too.
        s.interpolation = "CUBICSPLINE";
        std::vector<double> times = sampleTimes(node, first, false);
        std::vector<double> axis[3];
        evaluateAxes(node, first, times, axis);
        for (size_t k = 0; k < times.size(); ++k) {
            s.times.push_back(float(times[k]));
            for (int part = 0; part < 3; ++part) {
                for (int a = 0; a < 3; ++a) {
                    double v =
                        part == 1 ? axis[a][k] : (c[a] ? c[a]->SlopeAt(times[k], part == 2) : 0.0);
                    s.values.push_back(float(v));
                }
            }
        }
    } else {
        std::vector<double> times = sampleTimes(node, first, true);
        std::vector<double> axis[3];
        evaluateAxes(node, first, times, axis);
        for (size_t k = 0; k < times.size(); ++k) {
            s.times.push_back(float(times[k]));
            for (int a = 0; a < 3; ++a) {
                s.values.push_back(float(axis[a][k]));
            }
        }
    }
    samplers_.push_back(std::move(s));
}

void SceneWriter::sampleRotation(int node) {
    const ChannelCurve* c[3];
    bool any = false;
    for (int a = 0; a < 3; ++a) {
        c[a] = doc_.Curve(node, 3 + a);
        any = any || c[a];
    }
    if (!any) {
        return;
    }
    NewSampler s{node, "rotation", "LINEAR", {}, {}, 4};
    EulerRotation::Quat previous = {0, 0, 0, 1};
    std::vector<double> times = sampleTimes(node, 3, true);
    std::vector<double> axis[3];
    evaluateAxes(node, 3, times, axis);
    s.times.reserve(times.size());
    s.values.reserve(times.size() * 4);
    for (size_t k = 0; k < times.size(); ++k) {
        double t = times[k];
        EulerRotation::Vec3 e = {axis[0][k], axis[1][k], axis[2][k]};
        EulerRotation::Quat q = EulerRotation::ToQuaternion(e);
        double dot =
            q[0] * previous[0] + q[1] * previous[1] + q[2] * previous[2] + q[3] * previous[3];
        if (dot < 0) {  // stay on the hemisphere of the previous key: shortest way round
            for (double& v : q) {
                v = -v;
            }
        }
        previous = q;
        s.times.push_back(float(t));
        s.values.insert(s.values.end(), q.begin(), q.end());
    }
    samplers_.push_back(std::move(s));
}

int SceneWriter::appendAccessor(const std::vector<float>& data, int type, size_t count,
                                bool withMinMax) {
    tinygltf::Accessor a;
    a.bufferView = view_;
    a.byteOffset = data_.size();
    a.componentType = TINYGLTF_COMPONENT_TYPE_FLOAT;
    a.type = type;
    a.count = count;
    if (withMinMax && !data.empty()) {
        auto mm = std::minmax_element(data.begin(), data.end());
        a.minValues = {double(*mm.first)};
        a.maxValues = {double(*mm.second)};
    }
    size_t at = data_.size();
    data_.resize(at + data.size() * sizeof(float));
    std::memcpy(data_.data() + at, data.data(), data.size() * sizeof(float));
    m_.accessors.push_back(a);
    return int(m_.accessors.size()) - 1;
}
