#include "scene/SceneSerializer.h"

#include <sys/uio.h>
#include <unistd.h>

#include <cctype>
#include <cstdint>
#include <cstdio>
#include <sstream>
#include <vector>

#include "scene/ModelCompactor.h"
#include "toolkit/SafeFile.h"

namespace {
bool write_image_bytes(const std::string*, const std::string*, const tinygltf::Image* image, bool,
                       std::string* uri, void*) {
    if (!image->uri.empty() || image->image.empty()) {
        return false;  // the original uri is kept
    }
    std::string mime = image->mimeType.empty() ? "image/png" : image->mimeType;
    *uri = "data:" + mime + ";base64," +
           SceneSerializer::Base64(image->image.data(), image->image.size());
    return true;
}

// A JSON string literal of `text`.
std::string json_string(const std::string& text) {
    std::string out = "\"";
    for (unsigned char c : text) {
        if (c == '"' || c == '\\') {
            out += '\\';
            out += char(c);
        } else if (c < 0x20) {
            char escaped[8];
            std::snprintf(escaped, sizeof escaped, "\\u%04x", c);
            out += escaped;
        } else {
            out += char(c);
        }
    }
    return out + "\"";
}

void put_u32(std::ostream& out, uint32_t v) {
    const char bytes[4] = {char(v & 0xFF), char(v >> 8 & 0xFF), char(v >> 16 & 0xFF),
                           char(v >> 24 & 0xFF)};
    out.write(bytes, 4);
}

// Where each buffer starts in a binary chunk that joins them all, 16-byte aligned, when each
// is `lengths` long, and the chunk's length (before its padding to 4 bytes).
std::vector<size_t> join_bases(const std::vector<size_t>& lengths, size_t* length) {
    std::vector<size_t> base(lengths.size(), 0);
    size_t at = 0;
    for (size_t b = 0; b < lengths.size(); ++b) {
        at = (at + 15) & ~size_t(15);
        base[b] = at;
        at += lengths[b];
    }
    *length = at;
    return base;
}

std::vector<size_t> buffer_lengths(const tinygltf::Model& model) {
    std::vector<size_t> lengths;
    for (const tinygltf::Buffer& b : model.buffers) {
        lengths.push_back(b.data.size());
    }
    return lengths;
}

// Writes a .glb whose binary chunk is buffer 0 (with `join`, every buffer one after another)
// straight from the model, leaving out the bytes no buffer view covers (see
// ModelCompactor::LiveSpans): the JSON comes from the serialiser with the buffers taken out, one
// marked empty buffer in their place and the views moved onto it, and the marked buffer's object
// is then replaced by the chunk's real length. False when the model does not allow it (the
// caller then lets the serialiser write the whole container); the model is left as it was.
bool write_glb_direct(tinygltf::TinyGLTF* writer, tinygltf::Model* model, bool join, bool closeGaps,
                      SafeFile& file) {
    if (model->buffers.empty() || (!join && model->buffers.size() > 1) ||
        !SceneSerializer::CanJoinBuffers(*model) || !model->buffers[0].uri.empty()) {
        return false;
    }
    std::vector<size_t> spanOfView, lengths;
    std::vector<std::vector<ModelCompactor::Span>> spans;
    if (closeGaps) {
        spans = ModelCompactor::LiveSpans(*model, &spanOfView, &lengths);
    } else {
        // Each buffer whole, as one span where it is.
        lengths = buffer_lengths(*model);
        spanOfView.assign(model->bufferViews.size(), 0);
        for (size_t length : lengths) {
            spans.push_back({ModelCompactor::Span{0, 0, length}});
        }
    }
    size_t length = 0;
    const std::vector<size_t> base = join_bases(lengths, &length);
    if (length == 0 || length > 0xFFFFFFF0u) {
        return false;
    }
    const std::string marker = "chirrup binary chunk " + std::to_string(::getpid()) + " " +
                               std::to_string(reinterpret_cast<uintptr_t>(model));
    std::vector<tinygltf::Buffer> buffers(1);
    buffers[0].name = marker;
    buffers.swap(model->buffers);
    std::vector<std::pair<int, size_t>> placed;  // each view's buffer and offset, to restore
    placed.reserve(model->bufferViews.size());
    for (size_t i = 0; i < model->bufferViews.size(); ++i) {
        tinygltf::BufferView& v = model->bufferViews[i];
        placed.emplace_back(v.buffer, v.byteOffset);
        if (v.buffer >= 0 && size_t(v.buffer) < base.size()) {
            const ModelCompactor::Span& s = spans[size_t(v.buffer)][spanOfView[i]];
            v.byteOffset = base[size_t(v.buffer)] + s.to + (v.byteOffset - s.from);
            v.buffer = 0;
        }
    }
    std::ostringstream text;
    bool ok = writer->WriteGltfSceneToStream(model, text, false, false);
    buffers.swap(model->buffers);
    for (size_t i = 0; i < placed.size(); ++i) {
        model->bufferViews[i].buffer = placed[i].first;
        model->bufferViews[i].byteOffset = placed[i].second;
    }
    std::string json = text.str();
    const std::string quoted = json_string(marker);
    size_t at = json.find(quoted);
    if (!ok || at == std::string::npos || json.find(quoted, at + 1) != std::string::npos) {
        return false;
    }
    size_t start = json.rfind('{', at), end = json.find('}', at);
    if (start == std::string::npos || end == std::string::npos) {
        return false;
    }
    const tinygltf::Buffer& first = model->buffers[0];
    std::string object = "{\"byteLength\":" + std::to_string(length);
    if (!first.name.empty()) {
        object += ",\"name\":" + json_string(first.name);
    }
    json.replace(start, end + 1 - start, object + "}");
    while (!json.empty() && (json.back() == '\n' || json.back() == ' ')) {
        json.pop_back();
    }
    json.resize((json.size() + 3) & ~size_t(3), ' ');
    size_t binLength = (length + 3) & ~size_t(3);
    uint64_t total = 12 + 8 + json.size() + 8 + binLength;
    if (total > 0xFFFFFFFFu) {
        return false;
    }
    std::ostream& out = file.Stream();
    out.write("glTF", 4);
    put_u32(out, 2);
    put_u32(out, uint32_t(total));
    put_u32(out, uint32_t(json.size()));
    put_u32(out, 0x4E4F534A);  // "JSON"
    out.write(json.data(), std::streamsize(json.size()));
    put_u32(out, uint32_t(binLength));
    put_u32(out, 0x004E4942);  // "BIN"
    // Spans that keep their distance from the one before (the bytes between them fewer than
    // 16, the alignment gap) go out as one block with those bytes; the blocks and the zeros
    // between them are written together.
    static const char kZeros[16] = {};
    std::vector<struct iovec> blocks;
    auto put = [&blocks](const char* data, size_t size) {
        if (size > 0) {
            blocks.push_back({const_cast<char*>(data), size});
        }
    };
    size_t written = 0;
    for (size_t b = 0; b < model->buffers.size(); ++b) {
        const char* data = reinterpret_cast<const char*>(model->buffers[b].data.data());
        const std::vector<ModelCompactor::Span>& in = spans[b];
        for (size_t k = 0; k < in.size();) {
            size_t j = k + 1;
            while (j < in.size() && in[j].from - in[j].to == in[k].from - in[k].to) {
                ++j;
            }
            const size_t at = base[b] + in[k].to;
            const size_t bytes = in[j - 1].from + in[j - 1].length - in[k].from;
            put(kZeros, at - written);
            put(data + in[k].from, bytes);
            written = at + bytes;
            k = j;
        }
    }
    put(kZeros, binLength - written);
    // (a failed write leaves the file's stream bad, which its Commit reports)
    file.WriteGathered(blocks.data(), blocks.size());
    return true;
}

// Serialises `model` through a SafeFile: `path` is either the old file or the whole new one.
bool write_safely(tinygltf::TinyGLTF* writer, tinygltf::Model* model, bool binary, bool join,
                  bool closeGaps, const std::string& path, std::string* error) {
    SafeFile file(path);
    if (!file.IsOpen()) {
        *error = "Cannot write scene file [" + path + "]: " + file.ErrorText();
        return false;
    }
    bool written = binary && write_glb_direct(writer, model, join, closeGaps, file);
    if (!written && closeGaps) {
        ModelCompactor(*model).CloseGaps();
    }
    if (!written && !writer->WriteGltfSceneToStream(model, file.Stream(), !binary, binary)) {
        *error = "Cannot write scene file [" + path + "]: the scene could not be serialised";
        return false;  // the SafeFile removes what was written
    }
    if (!file.Commit()) {
        *error = "Cannot write scene file [" + path + "]: " + file.ErrorText();
        return false;
    }
    return true;
}
}  // namespace

bool SceneSerializer::IsBinaryPath(const std::string& path) {
    static const char kTail[] = ".glb";
    size_t n = sizeof kTail - 1;
    if (path.size() < n) {
        return false;
    }
    for (size_t i = 0; i < n; ++i) {
        if (std::tolower(static_cast<unsigned char>(path[path.size() - n + i])) != kTail[i]) {
            return false;
        }
    }
    return true;
}

std::string SceneSerializer::Base64(const unsigned char* bytes, size_t size) {
    static const char kDigits[] =
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::string out;
    out.reserve((size + 2) / 3 * 4);
    size_t i = 0;
    for (; i + 3 <= size; i += 3) {
        unsigned v = unsigned(bytes[i]) << 16 | unsigned(bytes[i + 1]) << 8 | bytes[i + 2];
        out += kDigits[v >> 18];
        out += kDigits[v >> 12 & 63];
        out += kDigits[v >> 6 & 63];
        out += kDigits[v & 63];
    }
    if (i < size) {
        unsigned v = unsigned(bytes[i]) << 16 | (i + 1 < size ? unsigned(bytes[i + 1]) << 8 : 0u);
        out += kDigits[v >> 18];
        out += kDigits[v >> 12 & 63];
        out += i + 1 < size ? kDigits[v >> 6 & 63] : '=';
        out += '=';
    }
    return out;
}

bool SceneSerializer::CanJoinBuffers(const tinygltf::Model& model) {
    size_t length = 0;
    join_bases(buffer_lengths(model), &length);
    for (const tinygltf::Buffer& b : model.buffers) {
        if (b.extras.Type() != tinygltf::NULL_TYPE) {
            return false;  // a joined buffer has no place for them
        }
    }
    return length <= 0xFFFFFFF0u;
}

bool SceneSerializer::Write(tinygltf::Model& model, const std::string& path, bool joinBuffers,
                            bool closeGaps, std::string* error) {
    // The serialiser writes an object with no properties as null, which no reader accepts:
    // such a node gets its (default) translation written out, such a scene a name.
    for (tinygltf::Node& n : model.nodes) {
        if (n.name.empty() && n.children.empty() && n.translation.empty() && n.rotation.empty() &&
            n.scale.empty() && n.matrix.empty() && n.weights.empty() && n.mesh == -1 &&
            n.skin == -1 && n.camera == -1 && n.extras.Type() == tinygltf::NULL_TYPE &&
            n.extensions.empty()) {
            n.translation = {0, 0, 0};
        }
    }
    for (tinygltf::Scene& scene : model.scenes) {
        if (scene.name.empty() && scene.nodes.empty() && scene.extensions.empty() &&
            scene.extras.Type() == tinygltf::NULL_TYPE) {
            scene.name = "root";
        }
    }
    tinygltf::TinyGLTF writer;
    writer.SetImageWriter(write_image_bytes, nullptr);
    return write_safely(&writer, &model, IsBinaryPath(path), joinBuffers, closeGaps, path, error);
}
