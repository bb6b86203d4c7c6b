#include "scene/RawGeometry.h"

#include <array>
#include <cmath>
#include <cstdio>
#include <fstream>
#include <functional>

#include "scene/SceneChecker.h"
#include "scene/SceneDocument.h"

namespace {
using Matrix = std::array<double, 16>;  // column-major, as glTF stores it

Matrix identity() {
    return {1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1};
}

Matrix multiply(const Matrix& a, const Matrix& b) {
    Matrix r{};
    for (int c = 0; c < 4; c++)
        for (int row = 0; row < 4; row++) {
            double s = 0;
            for (int k = 0; k < 4; k++)
                s += a[k * 4 + row] * b[c * 4 + k];
            r[c * 4 + row] = s;
        }
    return r;
}

// The node's local rest transform: its matrix, or T * R * S.
Matrix local_matrix(const tinygltf::Node& node) {
    if (node.matrix.size() == 16) {
        Matrix m;
        for (int i = 0; i < 16; i++)
            m[i] = node.matrix[i];
        return m;
    }
    double t[3] = {0, 0, 0}, s[3] = {1, 1, 1}, q[4] = {0, 0, 0, 1};
    if (node.translation.size() == 3)
        for (int i = 0; i < 3; i++)
            t[i] = node.translation[i];
    if (node.scale.size() == 3)
        for (int i = 0; i < 3; i++)
            s[i] = node.scale[i];
    if (node.rotation.size() == 4)
        for (int i = 0; i < 4; i++)
            q[i] = node.rotation[i];
    double x = q[0], y = q[1], z = q[2], w = q[3];
    double r[9] = {1 - 2 * (y * y + z * z), 2 * (x * y + z * w),     2 * (x * z - y * w),
                   2 * (x * y - z * w),     1 - 2 * (x * x + z * z), 2 * (y * z + x * w),
                   2 * (x * z + y * w),     2 * (y * z - x * w),     1 - 2 * (x * x + y * y)};
    Matrix m = identity();
    for (int c = 0; c < 3; c++)
        for (int row = 0; row < 3; row++)
            m[c * 4 + row] = r[c * 3 + row] * s[c];
    for (int i = 0; i < 3; i++)
        m[12 + i] = t[i];
    return m;
}

// The indices of a primitive (checked to lie inside their buffer by the scene checker).
bool read_indices(const tinygltf::Model& m, int index, std::vector<unsigned>* out) {
    if (index < 0 || size_t(index) >= m.accessors.size())
        return false;
    const tinygltf::Accessor& a = m.accessors[size_t(index)];
    if (a.bufferView < 0)
        return false;
    const tinygltf::BufferView& v = m.bufferViews[size_t(a.bufferView)];
    int size = a.componentType == TINYGLTF_COMPONENT_TYPE_UNSIGNED_BYTE    ? 1
               : a.componentType == TINYGLTF_COMPONENT_TYPE_UNSIGNED_SHORT ? 2
               : a.componentType == TINYGLTF_COMPONENT_TYPE_UNSIGNED_INT   ? 4
                                                                           : 0;
    if (!size)
        return false;
    const std::vector<unsigned char>& data = m.buffers[size_t(v.buffer)].data;
    size_t stride = v.byteStride ? v.byteStride : size_t(size);
    size_t base = v.byteOffset + a.byteOffset;
    out->clear();
    for (size_t i = 0; i < a.count; i++) {
        size_t at = base + i * stride;
        if (at + size > data.size())
            return false;
        unsigned value = 0;
        for (int b = size - 1; b >= 0; b--)
            value = (value << 8) | data[at + b];
        out->push_back(value);
    }
    return true;
}
}  // namespace

bool RawGeometry::Write(const char* scenePath, const char* outPath, std::string* error) {
    std::string why;
    auto doc = SceneDocument::Load(scenePath ? scenePath : "", &why);
    if (!doc) {
        if (error)
            *error = why;
        return false;
    }
    const tinygltf::Model& m = doc->model();
    std::string temp = std::string(outPath) + ".tmp";
    std::ofstream out(temp);
    if (!out) {
        if (error)
            *error = std::string("Can't write the raw geometry file ") + outPath + ".";
        return false;
    }
    out << "# raw geometry of " << scenePath << ": meshes in world space at the rest pose\n";
    size_t vertexBase = 1;  // OBJ vertex numbers start at 1
    std::vector<float> positions;
    std::vector<unsigned> indices;
    std::function<void(int, const Matrix&)> walk = [&](int node, const Matrix& parent) {
        Matrix world = multiply(parent, local_matrix(m.nodes[size_t(node)]));
        const tinygltf::Node& n = m.nodes[size_t(node)];
        if (n.mesh >= 0 && size_t(n.mesh) < m.meshes.size()) {
            out << "o " << doc->NodeName(node) << "\n";
            for (const tinygltf::Primitive& p : m.meshes[size_t(n.mesh)].primitives) {
                if (p.mode != -1 && p.mode != TINYGLTF_MODE_TRIANGLES)
                    continue;
                auto pos = p.attributes.find("POSITION");
                if (pos == p.attributes.end() ||
                    !SceneChecker::ReadFloats(m, pos->second, 3, &positions, &why))
                    continue;
                size_t count = positions.size() / 3;
                for (size_t i = 0; i < count; i++) {
                    double v[3];
                    for (int r = 0; r < 3; r++)
                        v[r] = world[r] * positions[i * 3] + world[4 + r] * positions[i * 3 + 1] +
                               world[8 + r] * positions[i * 3 + 2] + world[12 + r];
                    out << "v " << v[0] << " " << v[1] << " " << v[2] << "\n";
                }
                if (p.indices >= 0) {
                    if (!read_indices(m, p.indices, &indices))
                        indices.clear();
                } else {
                    indices.resize(count);
                    for (size_t i = 0; i < count; i++)
                        indices[i] = unsigned(i);
                }
                for (size_t i = 0; i + 2 < indices.size(); i += 3) {
                    if (indices[i] >= count || indices[i + 1] >= count || indices[i + 2] >= count)
                        continue;
                    out << "f " << vertexBase + indices[i] << " " << vertexBase + indices[i + 1]
                        << " " << vertexBase + indices[i + 2] << "\n";
                }
                vertexBase += count;
            }
        }
        for (int child = doc->FirstChild(node); child >= 0; child = doc->NextSibling(child))
            walk(child, world);
    };
    for (int root = doc->FirstChild(-1); root >= 0; root = doc->NextSibling(root))
        walk(root, identity());
    out.close();
    if (!out || std::rename(temp.c_str(), outPath) != 0) {
        std::remove(temp.c_str());
        if (error)
            *error = std::string("Can't write the raw geometry file ") + outPath + ".";
        return false;
    }
    return true;
}
