// Writes the demo face rig as a binary glTF file: a head mesh (head, ears, eyes, nose, lips,
// mouth, teeth, tongue, brows) skinned to a small skeleton, and one animation "shapes" that holds
// one mouth shape per frame at 30 fps (frames 0..10) and one brow pose per frame (20..23).
// Units are metres; the face looks down +Z, +Y is up, +X is the face's left.
// Usage: make_demo_face OUTPUT.glb      (the output is the same byte for byte on every run)

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include <tiny_gltf.h>

#include "GltfModelBuilder.h"

namespace {
constexpr double kPi = 3.14159265358979323846;
constexpr int kFps = 30;
using V3 = std::array<double, 3>;

enum Joint {
    kHead,
    kJaw,
    kUpperLip,
    kLowerLip,
    kCornerL,
    kCornerR,
    kTongue,
    kBrowL,
    kBrowR,
    kJoints
};
const char* const kJointNames[kJoints] = {
    "head",           "jaw",    "upper_lip", "lower_lip", "mouth_corner_L",
    "mouth_corner_R", "tongue", "brow_L",    "brow_R"};
const int kJointParent[kJoints] = {-1, kHead, kHead, kJaw, kHead, kHead, kJaw, kHead, kHead};
// Bind positions in head space (world).
const V3 kJointWorld[kJoints] = {
    {0, 0, 0},          {0, -0.01, 0.01},       {0, -0.035, 0.088},
    {0, -0.047, 0.086}, {0.028, -0.041, 0.082}, {-0.028, -0.041, 0.082},
    {0, -0.046, 0.062}, {0.035, 0.045, 0.088},  {-0.035, 0.045, 0.088}};

V3 local_bind(int j) {
    V3 p = kJointWorld[j];
    if (kJointParent[j] >= 0) {
        for (int a = 0; a < 3; ++a) {
            p[a] -= kJointWorld[kJointParent[j]][a];
        }
    }
    return p;
}

struct Vertex {
    V3 pos, normal;
    std::array<int, 2> joints;  // two influences are enough here
    double weight;              // of joints[0]; joints[1] gets the rest
};

class Builder : public GltfModelBuilder {
  public:
    Builder() { m.asset.generator = "chirrup make_demo_face"; }

    int Material(const char* name, double r, double g, double b, double roughness) {
        tinygltf::Material mat;
        mat.name = name;
        mat.pbrMetallicRoughness.baseColorFactor = {r, g, b, 1.0};
        mat.pbrMetallicRoughness.metallicFactor = 0.0;
        mat.pbrMetallicRoughness.roughnessFactor = roughness;
        m.materials.push_back(mat);
        return int(m.materials.size()) - 1;
    }

    // One primitive from vertices and triangle indices.
    void Primitive(tinygltf::Mesh* mesh, const std::vector<Vertex>& vs,
                   const std::vector<uint16_t>& tris, int material) {
        std::vector<float> pos, nrm, wts;
        std::vector<uint8_t> jts;
        for (const Vertex& v : vs) {
            for (int a = 0; a < 3; ++a) {
                pos.push_back(float(v.pos[a]));
                nrm.push_back(float(v.normal[a]));
            }
            // Two influences at most; an unused slot holds joint 0 with weight 0.
            int j0 = v.joints[0], j1 = v.joints[1];
            float w0 = float(v.weight), w1 = 1.0f - w0;
            if (j0 == j1 || w1 <= 0.0f) {
                w0 = 1.0f, w1 = 0.0f, j1 = 0;
            } else if (w0 <= 0.0f) {
                j0 = j1, w0 = 1.0f, w1 = 0.0f, j1 = 0;
            }
            jts.insert(jts.end(), {uint8_t(j0), uint8_t(j1), 0, 0});
            wts.insert(wts.end(), {w0, w1, 0, 0});
        }
        tinygltf::Primitive p;
        p.attributes["POSITION"] = Floats(pos, 3, 0, true, TINYGLTF_TARGET_ARRAY_BUFFER);
        p.attributes["NORMAL"] = Floats(nrm, 3, 0, false, TINYGLTF_TARGET_ARRAY_BUFFER);
        p.attributes["JOINTS_0"] =
            Accessor(jts.data(), vs.size(), 4, TINYGLTF_COMPONENT_TYPE_UNSIGNED_BYTE, 1, 0,
                     TINYGLTF_TARGET_ARRAY_BUFFER);
        p.attributes["WEIGHTS_0"] = Floats(wts, 4, 0, false, TINYGLTF_TARGET_ARRAY_BUFFER);
        p.indices = Accessor(tris.data(), tris.size(), 1, TINYGLTF_COMPONENT_TYPE_UNSIGNED_SHORT, 2,
                             0, TINYGLTF_TARGET_ELEMENT_ARRAY_BUFFER);
        p.material = material;
        p.mode = TINYGLTF_MODE_TRIANGLES;
        mesh->primitives.push_back(p);
    }
};

// A UV ellipsoid; `skin` gives each vertex its joints and weight from its position.
template <typename Skin>
void ellipsoid(Builder* b, tinygltf::Mesh* mesh, V3 c, V3 r, int rings, int segments, int material,
               Skin skin) {
    std::vector<Vertex> vs;
    std::vector<uint16_t> tris;
    for (int i = 0; i <= rings; ++i) {
        double th = kPi * i / rings;
        for (int j = 0; j <= segments; ++j) {
            double ph = 2 * kPi * j / segments;
            V3 unit = {std::sin(th) * std::sin(ph), std::cos(th), std::sin(th) * std::cos(ph)};
            Vertex v;
            V3 n;
            double len = 0;
            for (int a = 0; a < 3; ++a) {
                v.pos[a] = c[a] + r[a] * unit[a];
                n[a] = unit[a] / r[a];
                len += n[a] * n[a];
            }
            len = std::sqrt(len);
            for (int a = 0; a < 3; ++a) {
                v.normal[a] = len > 0 ? n[a] / len : (a == 1 ? 1.0 : 0.0);
            }
            skin(&v);
            vs.push_back(v);
        }
    }
    for (int i = 0; i < rings; ++i) {
        for (int j = 0; j < segments; ++j) {
            uint16_t a = uint16_t(i * (segments + 1) + j), bb = uint16_t(a + segments + 1);
            if (i != 0) {
                tris.insert(tris.end(), {a, bb, uint16_t(a + 1)});
            }
            if (i != rings - 1) {
                tris.insert(tris.end(), {uint16_t(a + 1), bb, uint16_t(bb + 1)});
            }
        }
    }
    b->Primitive(mesh, vs, tris, material);
}

auto rigid(int joint) {
    return [joint](Vertex* v) {
        v->joints = {joint, joint};
        v->weight = 1.0;
    };
}

double smoothstep(double e0, double e1, double x) {
    double t = std::clamp((x - e0) / (e1 - e0), 0.0, 1.0);
    return t * t * (3 - 2 * t);
}

// A lip: the middle follows the lip joint, the ends the mouth corners.
auto lip(int joint) {
    return [joint](Vertex* v) {
        double w = smoothstep(0.012, 0.026, std::fabs(v->pos[0]));
        v->joints = {joint, v->pos[0] > 0 ? kCornerL : kCornerR};
        v->weight = 1.0 - w;
    };
}

// One mouth shape or brow pose as offsets from the bind pose.
struct Pose {
    double jawDeg = 0;  // jaw opening about +X
    double upperY = 0, lowerY = 0, lipZ = 0, lowerZ = 0;
    double cornerX = 0, cornerY = 0;  // outwards, up
    double tongueY = 0, tongueZ = 0;
    double browY = 0, browX = 0, browTilt = 0;  // up, inwards, inner end up (degrees)
};

std::vector<Pose> poses() {
    std::vector<Pose> p(24);
    p[1].jawDeg = 14, p[1].cornerX = 0.004, p[1].upperY = 0.003;                           // AI
    p[2].jawDeg = 7, p[2].cornerX = 0.009, p[2].cornerY = 0.002, p[2].upperY = 0.002;      // E
    p[3].jawDeg = 12, p[3].cornerX = -0.009, p[3].lipZ = 0.007;                            // O
    p[4].jawDeg = 5, p[4].cornerX = -0.013, p[4].lipZ = 0.011;                             // U
    p[5].upperY = -0.003, p[5].lowerY = 0.004;                                             // MBP
    p[6].jawDeg = 3, p[6].lowerY = 0.005, p[6].lowerZ = -0.007;                            // FV
    p[7].jawDeg = 9, p[7].tongueY = 0.02, p[7].tongueZ = 0.012;                            // L
    p[8].jawDeg = 4, p[8].cornerX = -0.015, p[8].lipZ = 0.013;                             // WQ
    p[9].jawDeg = 6, p[9].cornerX = 0.003, p[9].tongueY = 0.008;                           // etc
    p[10].jawDeg = 2, p[10].cornerX = 0.008, p[10].upperY = 0.004, p[10].lowerY = -0.004;  // teeth
    p[21].browY = 0.008;                                                                   // raised
    p[22].browY = -0.004, p[22].browX = 0.003, p[22].browTilt = -12;                       // frown
    p[23].browY = 0.014, p[23].browTilt = 8;  // surprised-high
    return p;
}

std::array<float, 4> quat_x(double deg) {
    double h = deg * kPi / 360.0;
    return {float(std::sin(h)), 0, 0, float(std::cos(h))};
}
std::array<float, 4> quat_z(double deg) {
    double h = deg * kPi / 360.0;
    return {0, 0, float(std::sin(h)), float(std::cos(h))};
}
}  // namespace

int main(int argc, char** argv) {
    if (argc != 2) {
        std::fprintf(stderr, "usage: make_demo_face OUTPUT.glb\n");
        return 2;
    }
    Builder b;
    tinygltf::Model& m = b.m;
    int skin = b.Material("skin", 0.86, 0.64, 0.53, 0.7);
    int white = b.Material("eye_white", 0.95, 0.95, 0.92, 0.3);
    int dark = b.Material("dark", 0.05, 0.03, 0.03, 0.5);
    int lips = b.Material("lips", 0.72, 0.28, 0.3, 0.5);
    int brow = b.Material("brow", 0.25, 0.16, 0.1, 0.9);
    int tongue = b.Material("tongue", 0.85, 0.4, 0.45, 0.4);

    tinygltf::Mesh mesh;
    mesh.name = "face";
    // The head: its lower front (the chin) goes with the jaw.
    ellipsoid(&b, &mesh, {0, 0, 0}, {0.08, 0.11, 0.095}, 24, 32, skin, [](Vertex* v) {
        double w = smoothstep(-0.035, -0.06, v->pos[1]) * smoothstep(0.0, 0.05, v->pos[2]);
        v->joints = {kHead, kJaw};
        v->weight = 1.0 - w;
    });
    for (double side : {1.0, -1.0}) {
        ellipsoid(&b, &mesh, {0.08 * side, 0.0, 0.0}, {0.012, 0.026, 0.016}, 8, 12, skin,
                  rigid(kHead));  // ear
        ellipsoid(&b, &mesh, {0.033 * side, 0.02, 0.074}, {0.014, 0.012, 0.014}, 10, 16, white,
                  rigid(kHead));  // eye
        ellipsoid(&b, &mesh, {0.033 * side, 0.02, 0.087}, {0.005, 0.005, 0.003}, 6, 10, dark,
                  rigid(kHead));  // pupil
        ellipsoid(&b, &mesh, {0.035 * side, 0.045, 0.088}, {0.018, 0.003, 0.005}, 6, 12, brow,
                  rigid(side > 0 ? kBrowL : kBrowR));
    }
    ellipsoid(&b, &mesh, {0, -0.005, 0.098}, {0.011, 0.022, 0.018}, 10, 14, skin, rigid(kHead));
    ellipsoid(&b, &mesh, {0, -0.041, 0.078}, {0.025, 0.011, 0.01}, 8, 16, dark, [](Vertex* v) {
        v->joints = {v->pos[1] < -0.041 ? kJaw : kHead, kHead};
        v->weight = 1.0;
        v->joints[1] = v->joints[0];
    });  // mouth cavity
    ellipsoid(&b, &mesh, {0, -0.037, 0.082}, {0.019, 0.004, 0.005}, 6, 14, white,
              rigid(kHead));  // upper teeth
    ellipsoid(&b, &mesh, {0, -0.046, 0.080}, {0.017, 0.004, 0.005}, 6, 14, white,
              rigid(kJaw));  // lower teeth
    ellipsoid(&b, &mesh, {0, -0.046, 0.066}, {0.014, 0.005, 0.017}, 6, 12, tongue, rigid(kTongue));
    ellipsoid(&b, &mesh, {0, -0.035, 0.089}, {0.028, 0.0055, 0.008}, 8, 20, lips, lip(kUpperLip));
    ellipsoid(&b, &mesh, {0, -0.047, 0.087}, {0.026, 0.0065, 0.008}, 8, 20, lips, lip(kLowerLip));
    m.meshes.push_back(mesh);

    // Skeleton nodes 0..8, then the skinned mesh node and the rig root.
    for (int j = 0; j < kJoints; ++j) {
        tinygltf::Node n;
        n.name = kJointNames[j];
        V3 t = local_bind(j);
        if (j == kHead) {
            t = {0, 1.6, 0};  // the head stands at eye height; the mesh follows through the skin
        }
        n.translation = {t[0], t[1], t[2]};
        m.nodes.push_back(n);
    }
    for (int j = 0; j < kJoints; ++j) {
        if (kJointParent[j] >= 0) {
            m.nodes[size_t(kJointParent[j])].children.push_back(j);
        }
    }
    std::vector<float> ibm;
    for (int j = 0; j < kJoints; ++j) {
        // Mesh vertices are in head space, so the bind pose is the joints' head-space places.
        V3 w = kJointWorld[j];
        std::vector<float> mat = {
            1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, float(-w[0]), float(-w[1]), float(-w[2]), 1};
        ibm.insert(ibm.end(), mat.begin(), mat.end());
    }
    tinygltf::Skin sk;
    sk.name = "face_skeleton";
    sk.skeleton = kHead;
    sk.inverseBindMatrices = b.Floats(ibm, 16);
    for (int j = 0; j < kJoints; ++j) {
        sk.joints.push_back(j);
    }
    m.skins.push_back(sk);
    tinygltf::Node meshNode;
    meshNode.name = "face_mesh";
    meshNode.mesh = 0;
    meshNode.skin = 0;
    m.nodes.push_back(meshNode);
    tinygltf::Scene scene;
    scene.name = "face_rig";
    scene.nodes = {kHead, int(m.nodes.size()) - 1};
    m.scenes.push_back(scene);
    m.defaultScene = 0;

    // Animation "shapes": every joint keyed at every frame 0..23, held (STEP).
    std::vector<Pose> ps = poses();
    std::vector<float> times;
    for (size_t f = 0; f < ps.size(); ++f) {
        times.push_back(float(double(f) / kFps));
    }
    int input = b.Floats(times, 1, 0, true);
    tinygltf::Animation anim;
    anim.name = "shapes";
    auto channel = [&](int node, const char* path, const std::vector<float>& values, int width) {
        tinygltf::AnimationSampler s;
        s.input = input;
        s.output = b.Floats(values, width);
        s.interpolation = "STEP";
        tinygltf::AnimationChannel c;
        c.sampler = int(anim.samplers.size());
        c.target_node = node;
        c.target_path = path;
        anim.samplers.push_back(s);
        anim.channels.push_back(c);
    };
    auto moved = [&](int joint, auto offset) {
        std::vector<float> v;
        for (const Pose& p : ps) {
            V3 t = local_bind(joint), d = offset(p);
            for (int a = 0; a < 3; ++a) {
                v.push_back(float(t[a] + d[a]));
            }
        }
        channel(joint, "translation", v, 3);
    };
    std::vector<float> jaw, browL, browR;
    for (const Pose& p : ps) {
        auto q = quat_x(p.jawDeg);
        jaw.insert(jaw.end(), q.begin(), q.end());
        auto l = quat_z(-p.browTilt), r = quat_z(p.browTilt);
        browL.insert(browL.end(), l.begin(), l.end());
        browR.insert(browR.end(), r.begin(), r.end());
    }
    channel(kJaw, "rotation", jaw, 4);
    moved(kUpperLip, [](const Pose& p) { return V3{0, p.upperY, p.lipZ}; });
    moved(kLowerLip, [](const Pose& p) { return V3{0, p.lowerY, p.lipZ + p.lowerZ}; });
    moved(kCornerL, [](const Pose& p) { return V3{p.cornerX, p.cornerY, 0}; });
    moved(kCornerR, [](const Pose& p) { return V3{-p.cornerX, p.cornerY, 0}; });
    moved(kTongue, [](const Pose& p) { return V3{0, p.tongueY, p.tongueZ}; });
    moved(kBrowL, [](const Pose& p) { return V3{-p.browX, p.browY, 0}; });
    moved(kBrowR, [](const Pose& p) { return V3{p.browX, p.browY, 0}; });
    channel(kBrowL, "rotation", browL, 4);
    channel(kBrowR, "rotation", browR, 4);
    m.animations.push_back(anim);

    tinygltf::TinyGLTF writer;
    if (!writer.WriteGltfSceneToFile(&m, argv[1], true, true, false, true)) {
        std::fprintf(stderr, "make_demo_face: cannot write %s\n", argv[1]);
        return 1;
    }
    return 0;
}
