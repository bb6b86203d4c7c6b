#include "scene/ModelCompactor.h"

#include <algorithm>
#include <cstring>
#include <vector>

namespace {
// The image type of bytes from their signature (the mimeType a buffer-view image needs).
std::string sniff_mime(const std::vector<unsigned char>& b) {
    if (b.size() >= 3 && b[0] == 0xFF && b[1] == 0xD8 && b[2] == 0xFF) {
        return "image/jpeg";
    }
    if (b.size() >= 12 && std::memcmp(b.data(), "RIFF", 4) == 0 &&
        std::memcmp(b.data() + 8, "WEBP", 4) == 0) {
        return "image/webp";
    }
    return "image/png";
}

// Keeps the elements of `v` for whose index `keep` says so, in order, moving them down in
// place (no second array of the scene's accessors or views).
template <class T, class Keep>
void keep_where(std::vector<T>* v, const Keep& keep) {
    size_t to = 0;
    for (size_t i = 0; i < v->size(); ++i) {
        if (keep(i)) {
            if (to != i) {
                (*v)[to] = std::move((*v)[i]);
            }
            ++to;
        }
    }
    v->resize(to);
}

template <class F>
void each_accessor_ref(tinygltf::Model& m, F f) {
    for (tinygltf::Mesh& mesh : m.meshes) {
        for (tinygltf::Primitive& p : mesh.primitives) {
            f(p.indices);
            for (auto& kv : p.attributes) {
                f(kv.second);
            }
            for (auto& t : p.targets) {
                for (auto& kv : t) {
                    f(kv.second);
                }
            }
        }
    }
    for (tinygltf::Skin& s : m.skins) {
        f(s.inverseBindMatrices);
    }
    for (tinygltf::Animation& a : m.animations) {
        for (tinygltf::AnimationSampler& s : a.samplers) {
            f(s.input);
            f(s.output);
        }
    }
}

template <class F>
void each_view_ref(tinygltf::Model& m, F f) {
    for (tinygltf::Accessor& a : m.accessors) {
        f(a.bufferView);
        if (a.sparse.isSparse) {
            f(a.sparse.indices.bufferView);
            f(a.sparse.values.bufferView);
        }
    }
    for (tinygltf::Image& image : m.images) {
        f(image.bufferView);
    }
}
}  // namespace

bool ModelCompactor::RenumberingSafe() const {
    static const char* const kSafe[] = {"KHR_texture_transform",  "KHR_lights_punctual",
                                        "KHR_mesh_quantization",  "KHR_texture_basisu",
                                        "KHR_materials_variants", "KHR_xmp_json_ld"};
    for (const std::string& e : m_.extensionsUsed) {
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

void ModelCompactor::RemoveUnusedAccessors(const std::set<int>& candidates) {
    if (candidates.empty() || !RenumberingSafe()) {
        return;
    }
    std::vector<char> live(m_.accessors.size(), 0);
    each_accessor_ref(m_, [&](int& i) {
        if (i >= 0) {
            live[size_t(i)] = 1;
        }
    });
    std::vector<int> remap(m_.accessors.size());
    std::set<int> freedViews;
    int next = 0;
    for (size_t i = 0; i < m_.accessors.size(); ++i) {
        bool dead = candidates.count(int(i)) && !live[i];
        remap[i] = dead ? -1 : next++;
        if (dead && m_.accessors[i].bufferView >= 0) {
            freedViews.insert(m_.accessors[i].bufferView);
        }
    }
    if (next == int(m_.accessors.size())) {
        return;
    }
    each_accessor_ref(m_, [&](int& i) { i = i >= 0 ? remap[size_t(i)] : i; });
    keep_where(&m_.accessors, [&](size_t i) { return remap[i] >= 0; });

    // Views freed with them, unless something else still refers to them.
    each_view_ref(m_, [&](int& v) { freedViews.erase(v); });
    if (freedViews.empty()) {
        return;
    }
    std::vector<int> viewMap(m_.bufferViews.size());
    int kept = 0;
    for (size_t i = 0; i < m_.bufferViews.size(); ++i) {
        viewMap[i] = freedViews.count(int(i)) ? -1 : kept++;
    }
    keep_where(&m_.bufferViews, [&](size_t i) { return viewMap[i] >= 0; });
    each_view_ref(m_, [&](int& v) { v = v >= 0 ? viewMap[size_t(v)] : v; });
}

std::vector<std::vector<ModelCompactor::Span>> ModelCompactor::LiveSpans(
    const tinygltf::Model& m, std::vector<size_t>* spanOfView, std::vector<size_t>* lengths) {
    const std::vector<tinygltf::BufferView>& views = m.bufferViews;
    std::vector<size_t> order;
    order.reserve(views.size());
    for (size_t i = 0; i < views.size(); ++i) {
        if (views[i].buffer >= 0 && size_t(views[i].buffer) < m.buffers.size()) {
            order.push_back(i);
        }
    }
    std::sort(order.begin(), order.end(), [&](size_t x, size_t y) {
        return views[x].buffer != views[y].buffer ? views[x].buffer < views[y].buffer
                                                  : views[x].byteOffset < views[y].byteOffset;
    });
    std::vector<std::vector<Span>> spans(m.buffers.size());
    spanOfView->assign(views.size(), 0);
    lengths->assign(m.buffers.size(), 0);
    for (size_t k = 0; k < order.size();) {
        const size_t b = size_t(views[order[k]].buffer);
        size_t start = views[order[k]].byteOffset, end = start + views[order[k]].byteLength;
        size_t j = k + 1;
        while (j < order.size() && size_t(views[order[j]].buffer) == b &&
               views[order[j]].byteOffset < end) {
            end = std::max(end, size_t(views[order[j]].byteOffset + views[order[j]].byteLength));
            ++j;
        }
        size_t& written = (*lengths)[b];
        const size_t at = written + (start % 16 + 16 - written % 16) % 16;
        for (size_t v = k; v < j; ++v) {
            (*spanOfView)[order[v]] = spans[b].size();
        }
        spans[b].push_back(Span{start, at, end - start});
        written = at + (end - start);
        k = j;
    }
    return spans;
}

void ModelCompactor::CloseGaps() {
    std::vector<size_t> spanOfView, lengths;
    const std::vector<std::vector<Span>> spans = LiveSpans(m_, &spanOfView, &lengths);
    for (size_t b = 0; b < m_.buffers.size(); ++b) {
        if (spans[b].empty()) {
            continue;  // (a buffer no view uses is left for RemoveUnusedBuffers)
        }
        // Every span goes to or below where it was: moved down in place, in order.
        std::vector<unsigned char>& bytes = m_.buffers[b].data;
        size_t written = 0;
        for (const Span& s : spans[b]) {
            std::fill(bytes.begin() + long(written), bytes.begin() + long(s.to), 0);
            if (s.to != s.from) {
                std::memmove(bytes.data() + s.to, bytes.data() + s.from, s.length);
            }
            written = s.to + s.length;
        }
        bytes.resize((written + 3) & ~size_t(3), 0);
    }
    for (size_t v = 0; v < m_.bufferViews.size(); ++v) {
        tinygltf::BufferView& view = m_.bufferViews[v];
        if (view.buffer >= 0) {
            const Span& s = spans[size_t(view.buffer)][spanOfView[v]];
            view.byteOffset = view.byteOffset - s.from + s.to;
        }
    }
}

void ModelCompactor::RemoveUnusedBuffers() {
    if (!RenumberingSafe()) {
        return;
    }
    std::vector<char> used(m_.buffers.size(), 0);
    for (const tinygltf::BufferView& v : m_.bufferViews) {
        if (v.buffer >= 0 && size_t(v.buffer) < used.size()) {
            used[size_t(v.buffer)] = 1;
        }
    }
    std::vector<int> remap(m_.buffers.size(), -1);
    int kept = 0;
    for (size_t i = 0; i < m_.buffers.size(); ++i) {
        remap[i] = used[i] ? kept++ : -1;
    }
    if (size_t(kept) == m_.buffers.size()) {
        return;
    }
    keep_where(&m_.buffers, [&](size_t i) { return used[i] != 0; });
    for (tinygltf::BufferView& v : m_.bufferViews) {
        v.buffer = remap[size_t(v.buffer)];
    }
}

size_t ModelCompactor::appendToFirst(const std::vector<unsigned char>& bytes) {
    std::vector<unsigned char>& data = m_.buffers[0].data;
    size_t at = (data.size() + 15) & ~size_t(15);
    data.resize(at, 0);
    data.insert(data.end(), bytes.begin(), bytes.end());
    return at;
}

void ModelCompactor::PackIntoFirstBuffer(bool moveBuffers) {
    bool images = false;
    for (const tinygltf::Image& image : m_.images) {
        images = images || (image.bufferView < 0 && !image.image.empty() &&
                            (image.uri.empty() || image.uri.rfind("data:", 0) == 0));
    }
    if (m_.buffers.empty() && !images) {
        return;
    }
    if (m_.buffers.empty()) {
        m_.buffers.emplace_back();
    }
    m_.buffers[0].uri.clear();
    if (!RenumberingSafe()) {
        return;  // buffer 0 still travels in the binary chunk; the others stay as they are
    }
    if (moveBuffers) {
        moveIntoFirst();
    }
    for (tinygltf::Image& image : m_.images) {
        if (image.bufferView >= 0 || image.image.empty() ||
            !(image.uri.empty() || image.uri.rfind("data:", 0) == 0)) {
            continue;
        }
        tinygltf::BufferView view;
        view.buffer = 0;
        view.byteOffset = appendToFirst(image.image);
        view.byteLength = image.image.size();
        if (image.mimeType.empty()) {
            image.mimeType = sniff_mime(image.image);
        }
        image.bufferView = int(m_.bufferViews.size());
        image.uri.clear();
        image.image.clear();
        m_.bufferViews.push_back(view);
    }
}

void ModelCompactor::moveIntoFirst() {
    std::vector<size_t> base(m_.buffers.size(), 0);
    for (size_t b = 1; b < m_.buffers.size(); ++b) {
        base[b] = appendToFirst(m_.buffers[b].data);
        m_.buffers[b].data.clear();
        m_.buffers[b].data.shrink_to_fit();
    }
    for (tinygltf::BufferView& v : m_.bufferViews) {
        if (v.buffer > 0) {
            v.byteOffset += base[size_t(v.buffer)];
            v.buffer = 0;
        }
    }
    m_.buffers.resize(1);
}
