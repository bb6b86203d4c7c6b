#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <limits>
#include <string>
#include <vector>

#include "scene/KLWire.h"
#include "scene/KLWireSource.h"
#include "scene/SceneDocument.h"
#include "scene/scene_util.h"

namespace tinygltf {
std::string base64_encode(unsigned char const* bytes, unsigned int len);
}

namespace {
std::string data_uri(const std::vector<float>& v) {
    return "data:application/octet-stream;base64," +
           tinygltf::base64_encode(reinterpret_cast<const unsigned char*>(v.data()),
                                   unsigned(v.size() * 4));
}

// A valid scene: node "a" (child "b") whose translation is animated by two keys; `data` holds
// the two key times, then the two values.
const std::vector<float> kData = {0, 1, 0, 0, 0, 1, 1, 1};
std::string base_scene(const std::vector<float>& data = kData) {
    return R"({"asset":{"version":"2.0"},"scenes":[{"nodes":[0]}],"scene":0,)"
           R"("nodes":[{"name":"a","children":[1]},{"name":"b"}],)"
           R"("buffers":[{"byteLength":32,"uri":")" +
           data_uri(data) +
           R"("}],"bufferViews":[{"buffer":0,"byteOffset":0,"byteLength":8},)"
           R"({"buffer":0,"byteOffset":8,"byteLength":24}],)"
           R"("accessors":[{"bufferView":0,"componentType":5126,"count":2,"type":"SCALAR",)"
           R"("min":[0],"max":[1]},{"bufferView":1,"componentType":5126,"count":2,"type":"VEC3"}],)"
           R"("animations":[{"channels":[{"sampler":0,"target":{"node":0,"path":"translation"}}],)"
           R"("samplers":[{"input":0,"output":1,"interpolation":"LINEAR"}]}]})";
}

struct Case {
    const char* name;
    const char* from;  // replaced once in the base scene
    const char* to;
    const char* reason;  // expected in the message
    std::vector<float> data = kData;
};
const float kNaN = std::numeric_limits<float>::quiet_NaN();

}  // namespace

TEST(SceneMalformed, BaseSceneIsValid) {
    std::string path = MakeTempDir() + "/ok.gltf", error;
    WriteFile(path, base_scene());
    auto doc = SceneDocument::Load(path, &error);
    ASSERT_TRUE(doc) << error;
    EXPECT_NEAR(doc->Curve(0, 2)->eval(15), 0.5, 1e-6);
}

class MalformedScene : public ::testing::TestWithParam<Case> {};

TEST_P(MalformedScene, GivesAnErrorNamingTheFile) {
    const Case& c = GetParam();
    std::string path = MakeTempDir() + "/broken.gltf";
    std::string text = base_scene(c.data);
    size_t at = text.find(c.from);
    ASSERT_NE(at, std::string::npos) << c.from;
    WriteFile(path, text.replace(at, std::strlen(c.from), c.to));
    KLWireSource source(path.c_str());
    EXPECT_FALSE(source.Valid());
    EXPECT_NE(source.ErrorText().find("[" + path + "]"), std::string::npos) << source.ErrorText();
    EXPECT_NE(source.ErrorText().find(c.reason), std::string::npos) << source.ErrorText();
    EXPECT_EQ(source.RootNode(), nullptr);
    EXPECT_EQ(KLWire::IsWireFile(path.c_str()), 0);
    // The same bytes from memory fail the same way.
    std::string error;
    EXPECT_FALSE(SceneDocument::LoadFromMemory(reinterpret_cast<const unsigned char*>(text.data()),
                                               text.size(), "mem", &error));
    EXPECT_NE(error.find("[mem]"), std::string::npos);
}

INSTANTIATE_TEST_SUITE_P(
    Cases, MalformedScene,
    ::testing::Values(
        Case{"NotJson", R"({"asset")", "garbage{", "not a usable glTF scene"},
        Case{"ChildOutOfRange", R"("children":[1])", R"("children":[7])", "child 7"},
        Case{"SelfChild", R"("children":[1])", R"("children":[0])", "its own child"},
        Case{"Cycle", R"({"name":"b"})", R"({"name":"b","children":[0]})", "cycle"},
        Case{"SceneRootHasParent", R"("nodes":[0]})", R"("nodes":[1]})", "has a parent"},
        Case{"TwoParents", R"({"name":"b"})", R"({"name":"b"},{"name":"c","children":[1]})",
             "two parents"},
        Case{"SceneNodeOutOfRange", R"("nodes":[0]})", R"("nodes":[5]})", "node 5"},
        Case{"AccessorViewOutOfRange", R"({"bufferView":1,)", R"({"bufferView":9,)",
             "buffer view 9"},
        Case{"ViewBufferOutOfRange", R"({"buffer":0,"byteOffset":8)",
             R"({"buffer":3,"byteOffset":8)", "buffer 3"},
        Case{"AccessorPastView", R"("count":2,"type":"VEC3")", R"("count":3,"type":"VEC3")",
             "past the end of buffer view 1"},
        Case{"BufferShorterThanView", R"("byteOffset":8,"byteLength":24)",
             R"("byteOffset":16,"byteLength":24)", "too short"},
        Case{"SamplerOutOfRange", R"({"sampler":0,)", R"({"sampler":4,)", "sampler 4"},
        Case{"SamplerAccessorOutOfRange", R"({"input":0,)", R"({"input":12,)",
             "accessor that does not exist"},
        Case{"TargetNodeOutOfRange", R"("target":{"node":0)", R"("target":{"node":8)", "node 8"},
        Case{"UnknownInterpolation", R"("LINEAR")", R"("WOBBLY")", "WOBBLY"},
        Case{"WrongOutputType", R"("count":2,"type":"VEC3")", R"("count":6,"type":"SCALAR")",
             "wrong element type"},
        Case{"MissingExternalBuffer", R"("uri":"data:)", R"("uri":"missing.bin","x":")",
             "missing.bin"},
        Case{"NaNKeyValue", "", "", "NaN", {0, 1, 0, kNaN, 0, 1, 1, 1}},
        Case{"KeyBeyond100Hours", "", "", "100 hours", {0, 1e30f, 0, 0, 0, 1, 1, 1}},
        Case{"KeysOutOfOrder", "", "", "strictly increasing", {1, 0, 0, 0, 0, 1, 1, 1}},
        Case{"EqualKeyTimes", "", "", "strictly increasing", {0, 0, 0, 0, 0, 1, 1, 1}}),
    [](const ::testing::TestParamInfo<Case>& info) { return std::string(info.param.name); });

TEST(SceneMalformed, MissingEmptyAndTruncatedFiles) {
    std::string dir = MakeTempDir(), error;
    auto refused = [&](const std::string& leaf, const std::string& bytes, const char* reason) {
        if (!bytes.empty()) {
            WriteFile(dir + "/" + leaf, bytes);
        }
        EXPECT_FALSE(SceneDocument::Load(dir + "/" + leaf, &error)) << leaf;
        EXPECT_NE(error.find(leaf), std::string::npos) << error;
        EXPECT_NE(error.find(reason), std::string::npos) << error;
    };
    refused("none.glb", "", "");
    refused("", "", "not a regular file");  // the directory itself
    WriteFile(dir + "/empty.gltf", "");
    refused("empty.gltf", "", "empty");

    ASSERT_TRUE(MakeFaceScene().Write(dir + "/face.glb", TestScene::kBinary));
    std::string glb = ReadFile(dir + "/face.glb");
    ASSERT_TRUE(SceneDocument::Load(dir + "/face.glb", &error)) << error;
    // Cut at every few bytes: never a crash, always a message naming the file.
    for (size_t cut = 1; cut < glb.size(); cut += 97) {
        refused("cut.glb", glb.substr(0, cut), "");
    }
    std::string big = glb;  // a length field larger than the file
    big[8] = big[9] = char(0xff);
    refused("big.glb", big, "chunk lengths");
    // A few bytes after the JSON chunk: too short for a chunk header.
    uint32_t jsonLength = 0;
    std::memcpy(&jsonLength, glb.data() + 12, 4);
    std::string stub = glb.substr(0, 20 + jsonLength) + "BIN!";
    uint32_t total = uint32_t(stub.size());
    std::memcpy(&stub[8], &total, 4);
    refused("stub.glb", stub, "chunk lengths");
}
