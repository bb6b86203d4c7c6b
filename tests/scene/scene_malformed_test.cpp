#include <cstring>

#include "scene/SceneDocument.h"
#include "scene/scene_util.h"

namespace {
// The face scene broken one way: `from` replaced once by `to`, or the jaw's translation keys
// (times at 9..11, values from 12) patched by `patch`; `reason` is expected in the message.
struct Case {
    const char *name, *from, *to, *reason;
    std::vector<std::pair<size_t, float>> patch = {};
};
}  // namespace

class MalformedScene : public ::testing::TestWithParam<Case> {};

TEST_P(MalformedScene, GivesAnErrorNamingTheFile) {
    const Case& c = GetParam();
    std::vector<float> data = kFaceData;
    for (auto [index, value] : c.patch) {
        data[index] = value;
    }
    std::string path = MakeTempDir() + "/broken.gltf", text = FaceSceneJson(data);
    size_t at = text.find(c.from);
    ASSERT_NE(at, std::string::npos) << c.from;
    WriteFile(path, text.replace(at, std::strlen(c.from), c.to));
    KLWireSource source(path.c_str());
    const std::string& error = source.ErrorText();
    EXPECT_TRUE(!source.Valid() && !source.RootNode());
    EXPECT_EQ(error.find("Scene file [" + path + "] is not a usable glTF scene: "), 0u) << error;
    EXPECT_NE(error.find(c.reason), std::string::npos) << error;
}

INSTANTIATE_TEST_SUITE_P(
    Cases, MalformedScene,
    ::testing::Values(
        Case{"NotJson", R"({"asset")", "garbage{", "not a usable glTF scene"},
        Case{"ChildOutOfRange", R"("children":[5])", R"("children":[7])", "child 7"},
        Case{"SelfChild", R"("children":[5])", R"("children":[1])", "its own child"},
        Case{"Cycle", R"({"name":"brow"})", R"({"name":"brow","children":[0]})", "cycle"},
        Case{"SceneRootHasParent", R"("face","nodes":[0])", R"("face","nodes":[1])",
             "has a parent"},
        Case{"TwoParents", R"({"name":"lip"})", R"({"name":"lip","children":[5]})", "two parents"},
        Case{"SceneNodeOutOfRange", R"("face","nodes":[0])", R"("face","nodes":[9])", "node 9"},
        Case{"AccessorViewOutOfRange", R"({"bufferView":8,)", R"({"bufferView":12,)",
             "buffer view 12"},
        Case{"ViewBufferOutOfRange", R"({"buffer":0,"byteOffset":212)",
             R"({"buffer":3,"byteOffset":212)", "buffer 3"},
        Case{"AccessorPastView", R"(8,"componentType":5126,"count":2)",
             R"(8,"componentType":5126,"count":3)", "past the end of buffer view 8"},
        Case{"BufferShorterThanView", R"("byteOffset":212,)", R"("byteOffset":220,)", "too short"},
        Case{"SamplerOutOfRange", R"({"sampler":0,)", R"({"sampler":4,)", "sampler 4"},
        Case{"SamplerAccessorOutOfRange", R"({"input":1,)", R"({"input":12,)",
             "accessor that does not exist"},
        Case{"TargetNodeOutOfRange", R"("target":{"node":1)", R"("target":{"node":8)", "node 8"},
        Case{"UnknownInterpolation", R"("LINEAR")", R"("WOBBLY")", "WOBBLY"},
        Case{"WrongOutputType", R"("count":2,"type":"VEC3")", R"("count":6,"type":"SCALAR")",
             "wrong element type"},
        Case{"MissingExternalBuffer", R"("uri":"data:)", R"("uri":"missing.bin","x":")",
             "missing.bin"},
        Case{"BufferUriNamesADirectory", R"("uri":"data:)", R"("uri":".","x":")",
             "is not a regular file"},
        Case{"NaNKeyValue", "", "", "NaN", {{13, NAN}}},
        Case{"KeyBeyond100Hours", "", "", "100 hours", {{11, 1e30f}}},
        Case{"EqualKeyTimes", "", "", "strictly increasing", {{10, 0}}}),
    [](const ::testing::TestParamInfo<Case>& info) { return std::string(info.param.name); });

TEST(SceneMalformed, MissingEmptyAndTruncatedFiles) {
    std::string dir = MakeTempDir() + "/", error;
    auto refused = [&](const std::string& leaf) {
        EXPECT_FALSE(SceneDocument::Load(dir + leaf, &error)) << leaf;
        return error;
    };
    auto unusable = [&](const std::string& leaf, const std::string& why) {
        return "Scene file [" + dir + leaf + "] is not a usable glTF scene: " + why;
    };
    EXPECT_EQ(refused("none.glb"),
              "Cannot open scene file [" + dir + "none.glb]: No such file or directory");
    EXPECT_EQ(refused(""), "Cannot open scene file [" + dir + "]: not a regular file");
    WriteFile(dir + "empty.gltf", "");
    EXPECT_EQ(refused("empty.gltf"), unusable("empty.gltf", "the file is empty"));
    ASSERT_TRUE(WriteFaceScene(dir + "face.glb", kBinary));
    std::string glb = ReadFile(dir + "face.glb");
    auto chunks = unusable("bad.glb", "binary container has inconsistent chunk lengths");
    WriteFile(dir + "bad.glb", glb.substr(0, 12));
    EXPECT_EQ(refused("bad.glb"), unusable("bad.glb", "binary container is truncated"));
    WriteFile(dir + "bad.glb", glb.substr(0, glb.size() / 2));  // shorter than its length field
    EXPECT_EQ(refused("bad.glb"), chunks);
    // Four bytes after the JSON chunk: too short for a chunk header.
    uint32_t jsonLength = 0;
    std::memcpy(&jsonLength, glb.data() + 12, 4);
    std::string stub = glb.substr(0, 20 + jsonLength) + "BIN!";
    uint32_t total = uint32_t(stub.size());
    std::memcpy(&stub[8], &total, 4);
    WriteFile(dir + "bad.glb", stub);
    EXPECT_EQ(refused("bad.glb"), chunks);
}
