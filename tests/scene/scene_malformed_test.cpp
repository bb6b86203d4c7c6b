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

// A valid scene: node "a" (child "b") whose translation is animated by two keys.
std::string base_scene(const std::vector<float>& data = {0, 1, 0, 0, 0, 1, 1, 1}) {
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
};

std::ostream& operator<<(std::ostream& out, const Case& c) {
    return out << c.name;
}

std::string replaced(std::string s, const Case& c) {
    size_t at = s.find(c.from);
    EXPECT_NE(at, std::string::npos) << c.name;
    if (at != std::string::npos) {
        s.replace(at, std::strlen(c.from), c.to);
    }
    return s;
}
}  // namespace

TEST(SceneMalformed, BaseSceneIsValid) {
    std::string dir = MakeTempDir();
    WriteFile(dir + "/ok.gltf", base_scene());
    std::string error;
    auto doc = SceneDocument::Load(dir + "/ok.gltf", &error);
    ASSERT_TRUE(doc) << error;
    EXPECT_NEAR(doc->Curve(0, 2)->eval(15), 0.5, 1e-6);
}

class MalformedScene : public ::testing::TestWithParam<Case> {};

TEST_P(MalformedScene, GivesAnErrorNamingTheFile) {
    const Case& c = GetParam();
    std::string path = MakeTempDir() + "/broken.gltf";
    WriteFile(path, replaced(base_scene(), c));
    KLWireSource source(path.c_str());
    EXPECT_FALSE(source.Valid());
    EXPECT_NE(source.ErrorText().find("[" + path + "]"), std::string::npos) << source.ErrorText();
    EXPECT_NE(source.ErrorText().find(c.reason), std::string::npos) << source.ErrorText();
    EXPECT_EQ(source.RootNode(), nullptr);
    EXPECT_EQ(KLWire::IsWireFile(path.c_str()), 0);
    // The same bytes from memory fail the same way.
    std::string text = ReadFile(path), error;
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
             "missing.bin"}));

TEST(SceneMalformed, NanAndUnorderedKeysAreErrors) {
    std::string dir = MakeTempDir();
    std::string error;
    float nan = std::numeric_limits<float>::quiet_NaN();
    WriteFile(dir + "/nan.gltf", base_scene({0, 1, 0, nan, 0, 1, 1, 1}));
    EXPECT_FALSE(SceneDocument::Load(dir + "/nan.gltf", &error));
    EXPECT_NE(error.find("NaN"), std::string::npos) << error;
    EXPECT_NE(error.find("nan.gltf"), std::string::npos);
    WriteFile(dir + "/far.gltf", base_scene({0, 1e30f, 0, 0, 0, 1, 1, 1}));
    EXPECT_FALSE(SceneDocument::Load(dir + "/far.gltf", &error));
    EXPECT_NE(error.find("100 hours"), std::string::npos) << error;
    WriteFile(dir + "/order.gltf", base_scene({1, 0, 0, 0, 0, 1, 1, 1}));
    EXPECT_FALSE(SceneDocument::Load(dir + "/order.gltf", &error));
    EXPECT_NE(error.find("strictly increasing"), std::string::npos) << error;
}

TEST(SceneMalformed, MissingEmptyAndTruncatedFiles) {
    std::string dir = MakeTempDir();
    std::string error;
    EXPECT_FALSE(SceneDocument::Load(dir + "/none.glb", &error));
    EXPECT_NE(error.find("none.glb"), std::string::npos);
    EXPECT_FALSE(SceneDocument::Load(dir, &error));
    EXPECT_NE(error.find("not a regular file"), std::string::npos) << error;
    WriteFile(dir + "/empty.gltf", "");
    EXPECT_FALSE(SceneDocument::Load(dir + "/empty.gltf", &error));
    EXPECT_NE(error.find("empty"), std::string::npos);

    TestScene s = MakeFaceScene();
    ASSERT_TRUE(s.Write(dir + "/face.glb", TestScene::kBinary));
    std::string glb = ReadFile(dir + "/face.glb");
    ASSERT_TRUE(SceneDocument::Load(dir + "/face.glb", &error)) << error;
    // Cut at every few bytes: never a crash, always a message naming the file.
    for (size_t cut = 0; cut < glb.size(); cut += 97) {
        WriteFile(dir + "/cut.glb", glb.substr(0, cut));
        EXPECT_FALSE(SceneDocument::Load(dir + "/cut.glb", &error)) << cut;
        EXPECT_NE(error.find("cut.glb"), std::string::npos);
    }
    // A length field larger than the file.
    std::string big = glb;
    big[8] = char(0xff);
    big[9] = char(0xff);
    WriteFile(dir + "/big.glb", big);
    EXPECT_FALSE(SceneDocument::Load(dir + "/big.glb", &error));
    EXPECT_NE(error.find("chunk lengths"), std::string::npos) << error;
    // A few bytes after the JSON chunk: too short for a chunk header.
    uint32_t jsonLength = 0;
    std::memcpy(&jsonLength, glb.data() + 12, 4);
    std::string stub = glb.substr(0, 20 + jsonLength) + "BIN!";
    uint32_t total = uint32_t(stub.size());
    std::memcpy(&stub[8], &total, 4);
    WriteFile(dir + "/stub.glb", stub);
    EXPECT_FALSE(SceneDocument::Load(dir + "/stub.glb", &error));
    EXPECT_NE(error.find("chunk lengths"), std::string::npos) << error;
}
