#pragma once

#include <gtest/gtest.h>
#include <stdlib.h>

#include <cmath>
#include <fstream>
#include <iterator>
#include <memory>
#include <string>
#include <vector>

#include <tiny_gltf.h>

#include "scene/KLWire.h"
#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"
#include "scene/SceneSerializer.h"
#include "testkit/TempDir.h"
#include "testkit/ValidateGltf.h"
#include "toolkit/CueTime.h"

enum SceneFormat { kEmbedded, kSideCar, kBinary };
using Node = std::unique_ptr<OrDagNode>;

// The face scene's buffer: each accessor's floats in turn, at the byte offsets in FaceSceneJson.
// clang-format off
const std::vector<float> kFaceData = {
    0, 0, 0, 1, 0, 0, 0, 1, 0,                             // 0: the head's triangle
    0, 1 / 30.0f, 2 / 30.0f,                               // 36: jaw translation, LINEAR
    0, 0, 0, 0, -1, 0, 0, -2, 1,                           // 48
    0, 0.1f,                                               // 84: jaw rotation, STEP
    0, 0, 0, 1, 0.70710678f, 0, 0, 0.70710678f,            // 92: 0 and 90 degrees about X
    0, 1,                                                  // 124: brow scale, CUBICSPLINE
    0, 0, 0, 1, 1, 1, 2, 0, 0, 0, 0, 0, 3, 1, 1, 0, 0, 0,  // 132: in-tangent, value, out-tangent
    0, 1,                                                  // 204: first lip translation, LINEAR
    0, 0, 0, 5, 5, 5};                                     // 212; 236 bytes in all
// clang-format on

// The face scene of README.md as glTF JSON with its buffer (`data`) embedded.
inline std::string FaceSceneJson(const std::vector<float>& data = kFaceData) {
    return R"({"asset":{"version":"2.0"},"scenes":[{"name":"face","nodes":[0]}],"nodes":[
{"name":"head","children":[1,2,3,4],"mesh":0,"translation":[0,1.5,0],"extras":"kept"},
{"name":"jaw","children":[5]},{"name":"brow"},{"translation":[0,0,0]},{"name":"lip"},
{"name":"lip"}],"meshes":[{"primitives":[{"attributes":{"POSITION":0}}]}],"bufferViews":[
{"buffer":0,"byteOffset":0,"byteLength":36},{"buffer":0,"byteOffset":36,"byteLength":12},
{"buffer":0,"byteOffset":48,"byteLength":36},{"buffer":0,"byteOffset":84,"byteLength":8},
{"buffer":0,"byteOffset":92,"byteLength":32},{"buffer":0,"byteOffset":124,"byteLength":8},
{"buffer":0,"byteOffset":132,"byteLength":72},{"buffer":0,"byteOffset":204,"byteLength":8},
{"buffer":0,"byteOffset":212,"byteLength":24}],"accessors":[
{"bufferView":0,"componentType":5126,"count":3,"type":"VEC3","min":[0,0,0],"max":[1,1,0]},
{"bufferView":1,"componentType":5126,"count":3,"type":"SCALAR","min":[0],"max":[0.0666666701]},
{"bufferView":2,"componentType":5126,"count":3,"type":"VEC3"},
{"bufferView":3,"componentType":5126,"count":2,"type":"SCALAR","min":[0],"max":[0.100000001]},
{"bufferView":4,"componentType":5126,"count":2,"type":"VEC4"},
{"bufferView":5,"componentType":5126,"count":2,"type":"SCALAR","min":[0],"max":[1]},
{"bufferView":6,"componentType":5126,"count":6,"type":"VEC3"},
{"bufferView":7,"componentType":5126,"count":2,"type":"SCALAR","min":[0],"max":[1]},
{"bufferView":8,"componentType":5126,"count":2,"type":"VEC3"}],"animations":[{"name":"shapes",
"channels":[{"sampler":0,"target":{"node":1,"path":"translation"}},{"sampler":1,"target":
{"node":1,"path":"rotation"}},{"sampler":2,"target":{"node":2,"path":"scale"}}],"samplers":[
{"input":1,"output":2,"interpolation":"LINEAR"},{"input":3,"output":4,"interpolation":"STEP"},
{"input":5,"output":6,"interpolation":"CUBICSPLINE"}]},{"name":"other","channels":[{"sampler":0,
"target":{"node":4,"path":"translation"}}],"samplers":[{"input":7,"output":8,"interpolation":
"LINEAR"}]}],"buffers":[{"byteLength":236,"uri":"data:application/octet-stream;base64,)" +
           SceneSerializer::Base64(reinterpret_cast<const unsigned char*>(data.data()),
                                   data.size() * 4) +
           "\"}]}";
}

// Writes the face scene as embedded .gltf, .gltf with a side-car .bin, or .glb.
inline bool WriteFaceScene(const std::string& path, SceneFormat format) {
    tinygltf::Model m;
    tinygltf::TinyGLTF io;
    std::string err, warn, json = FaceSceneJson();
    return io.LoadASCIIFromString(&m, &err, &warn, json.c_str(), unsigned(json.size()), "") &&
           io.WriteGltfSceneToFile(&m, path, true, format != kSideCar, true, format == kBinary);
}

// A fresh empty directory, removed when the test program ends.
inline std::string MakeTempDir() {
    static std::vector<std::unique_ptr<testkit::TempDir>> made;
    made.push_back(std::make_unique<testkit::TempDir>());
    return made.back()->path();
}
inline void WriteFile(const std::string& path, const std::string& bytes) {
    std::ofstream(path, std::ios::binary) << bytes;
}
inline std::string ReadFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

// A scene file opened through KLWireSource, with the wire layer reset and 30 frames a second.
struct OpenScene {
    ::testing::AssertionResult Open(const std::string& path) {
        KLWire::Initialize();
        CueTime::default_fps = 30;
        source = std::make_unique<KLWireSource>(path.c_str());
        root = source->RootNode();  // null when the file is not a valid scene
        return source->Valid() ? ::testing::AssertionSuccess()
                               : ::testing::AssertionFailure() << source->ErrorText();
    }
    // The node named `name` at or below `below` (the root when null); null when not found.
    Node Fetch(const char* name, OrDagNode* below = nullptr) const {
        return KLWire::FetchDagNode(below ? below : root.get(), name);
    }
    // Channel `channel` of node `name` at `frame`; a failure and NaN when there is none.
    double Eval(const char* name, int channel, double frame) const {
        Node n = Fetch(name);
        OrChannel* c = n ? KLWire::FindChannel(n.get(), channel) : nullptr;
        EXPECT_TRUE(c) << name << " channel " << channel;
        return c ? c->eval(frame) : NAN;
    }
    std::unique_ptr<KLWireSource> source;
    Node root;
};

// One key for KLWire::StoreChannel: time in ticks, value, in- and out-tangent codes.
struct StoreKey {
    int ticks;
    float value;
    int in, out;
};
// StoreChannel's result (1 on success); old keys are replaced when `clear`, else merged.
inline int StoreKeys(OrDagNode* node, int channel, const std::vector<StoreKey>& keys,
                     bool clear = true) {
    std::vector<CueTime> times;
    std::vector<float> values;
    std::vector<int> in, out;
    for (const StoreKey& k : keys) {
        times.push_back(CueTime::FromTicks(k.ticks)), values.push_back(k.value);
        in.push_back(k.in), out.push_back(k.out);
    }
    KLWire::alwaysClearChannel = clear ? 1 : 0;
    return KLWire::StoreChannel(node, channel, int(keys.size()), times.data(), values.data(),
                                in.data(), nullptr, out.data(), nullptr);
}

using testkit::ExpectValidGltf;
