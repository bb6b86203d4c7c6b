#include "scene/SceneSerializer.h"

#include <cctype>
#include <vector>

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

// Serialises `model` through a SafeFile: `path` is either the old file or the whole new one.
bool write_safely(tinygltf::TinyGLTF* writer, tinygltf::Model* model, bool binary,
                  const std::string& path, std::string* error) {
    SafeFile file(path);
    if (!file.IsOpen()) {
        *error = "Cannot write scene file [" + path + "]: " + file.ErrorText();
        return false;
    }
    if (!writer->WriteGltfSceneToStream(model, file.Stream(), !binary, binary)) {
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

bool SceneSerializer::Write(tinygltf::Model& model, const std::string& path, std::string* error) {
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
    return write_safely(&writer, &model, IsBinaryPath(path), path, error);
}
