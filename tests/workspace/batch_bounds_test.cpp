// Batch runs on damaged or unusual inputs, run as a program: each ends with status 0 and a
// line on the error stream saying what was refused, or with a valid scene, and never costs
// memory or disk out of proportion to what it applies.
#include <gtest/gtest.h>

#include <sys/resource.h>
#include <sys/wait.h>

#include <filesystem>

#include "WorkspaceTestUtil.h"
#include "testkit/ValidateGltf.h"

using namespace wstest;

namespace {

// The runs apply kBatchTrack with kBatchKeysets, without offset unless told otherwise.
using BatchBoundsTest = BatchTest;

// A buffer or an image whose uri names a directory: the apply scene is refused with the reason.
TEST_F(BatchBoundsTest, AUriNamingADirectoryIsRefused) {
    std::filesystem::create_directory(dir / "wire/sub");
    for (const char* json :
         {R"({"asset":{"version":"2.0"},"buffers":[{"byteLength":8,"uri":"sub"}]})",
          R"({"asset":{"version":"2.0"},"images":[{"uri":"sub"}]})"}) {
        WriteFile(dir / "wire/dir.gltf", json);
        const RunResult r = Batch("VX_ROOT", "dir.gltf", "0");
        EXPECT_EQ(r.status, 0);
        EXPECT_THAT(r.err, HasSubstr("Could not read apply file " + (dir / "wire/dir.gltf")));
        EXPECT_THAT(r.err, HasSubstr("is not a regular file"));
        EXPECT_FALSE(FileExists(Out()));
    }
}

// A keyset scene of 100,000 nodes in one chain is walked without running out of stack.
TEST_F(BatchBoundsTest, AHundredThousandNodeChainIsWalked) {
    std::string nodes;
    const int n = 100000;
    for (int i = 0; i < n; ++i) {
        nodes += std::string(i ? "," : "") + "{\"name\":\"n" + std::to_string(i) + "\"" +
                 (i + 1 < n ? ",\"children\":[" + std::to_string(i + 1) + "]" : "") + "}";
    }
    WriteFile(dir / "wire/chain.gltf", R"({"asset":{"version":"2.0"},"scenes":[{"nodes":[0]}],)"
                                       R"("nodes":[)" +
                                           nodes + "]}");
    Data("x.kset",
         "wire chain.gltf\nbegin shapeset turn n99999 3 0 1\n    key left 0\n"
         "    key right 1\nend\nbegin keyset mouth\n    key a 0\nend\n");
    Data("x.track", "begin keytrack turn\n    event 0 right Ease 20\nend\n");
    const RunResult r = Batch("VX_ROOT", "chain.gltf", "0");
    EXPECT_EQ(r.status, 0) << r.err;
    EXPECT_THAT(r.err, HasSubstr("Storing to"));
    EXPECT_NEAR(EvalChannel(Out(), "n99999", 3, 0).value_or(-99), 20, 1e-3);
}

// A frame rate above the highest supported is clamped with a warning; an event beyond the
// time range is reported and skipped; neither makes the stored scene grow.
TEST_F(BatchBoundsTest, FrameRateAndEventTimesOutOfRangeAreToldAndBounded) {
    Data("x.track", std::string("fps 2147483647\n") + kBatchTrack);
    RunResult r = Batch("VX_ROOT", "face.gltf", "0");
    EXPECT_EQ(r.status, 0);
    EXPECT_THAT(r.err,
                HasSubstr("Frame rate 2147483647 is above the highest supported, 1000: 1000 is "
                          "used."));
    EXPECT_LT(ReadFile(Out()).size(), 200000u);
    testkit::ExpectValidGltf(Out());

    Data("x.track", std::string(kBatchTrack) +
                        "begin keytrack turn\n    event 1e12 right Ease 20\n"
                        "    event 30 left Linear -10\nend\n");
    r = Batch("VX_ROOT", "face.gltf", "0");
    EXPECT_EQ(r.status, 0);
    EXPECT_THAT(r.err, HasSubstr("Event at frame 1e12 in keyset [turn] is beyond the supported "
                                 "time range, skipped."));
    EXPECT_LT(ReadFile(Out()).size(), 20000u);
    testkit::ExpectValidGltf(Out());
}

// A negative offset would put keys before time 0: each curve is cut at 0, the keys dropped
// are counted per keyset, and the scene stays valid.
TEST_F(BatchBoundsTest, KeysBeforeTimeZeroAreDroppedAndCounted) {
    ASSERT_EQ(Batch("VX_ROOT", "face.gltf", "0").status, 0);
    const double at20 = EvalChannel(Out(), "jaw", 5, 20).value_or(-99);
    const double at25 = EvalChannel(Out(), "jaw", 5, 25).value_or(-99);
    const RunResult r = Batch("VX_ROOT", "face.gltf", "-20");
    EXPECT_EQ(r.status, 0);
    EXPECT_THAT(r.err, HasSubstr("Keyset [mouth]: 2 keys before time 0 dropped"));
    EXPECT_THAT(r.err, HasSubstr("Keyset [turn]: 1 key before time 0 dropped"));
    // From time 0 on, the curve is the one the run without offset stored 20 frames later.
    EXPECT_NEAR(EvalChannel(Out(), "jaw", 5, 0).value_or(-99), at20, 1e-3);
    EXPECT_NEAR(EvalChannel(Out(), "jaw", 5, 5).value_or(-99), at25, 1e-3);
    testkit::ExpectValidGltf(Out());
}

// A scene of under a kilobyte with one rotation key at 359,000 s, driven by a 1.5-second
// track: the run stays small in memory and on disk.
TEST_F(BatchBoundsTest, AFarKeyInASmallSceneCostsLittle) {
    WriteFile(dir / "wire/far.gltf",
              R"({"asset":{"version":"2.0"},"scenes":[{"nodes":[0]}],"nodes":[{"name":"head",)"
              R"("children":[1]},{"name":"jaw"}],"buffers":[{"byteLength":20,"uri":)"
              R"("data:application/octet-stream;base64,AEuvSPMENT8AAAAAAAAAAPMENT8="}],)"
              R"("bufferViews":[{"buffer":0,"byteLength":4},{"buffer":0,"byteOffset":4,)"
              R"("byteLength":16}],"accessors":[{"bufferView":0,"componentType":5126,"count":1,)"
              R"("type":"SCALAR","min":[359000],"max":[359000]},{"bufferView":1,)"
              R"("componentType":5126,"count":1,"type":"VEC4"}],"animations":[{"channels":[)"
              R"({"sampler":0,"target":{"node":1,"path":"rotation"}}],"samplers":[{"input":0,)"
              R"("output":1}]}]})");
    EXPECT_LT(ReadFile(dir / "wire/far.gltf").size(), 800u);
    const pid_t child = fork();
    if (child == 0) {
        // Limited to 600 MB of address space: the unbounded run needed about 1 GB.
        struct rlimit limit = {600u << 20, 600u << 20};
        setrlimit(RLIMIT_AS, &limit);
        const RunResult r = Batch("VX_ROOT", "far.gltf", "0");
        _exit(r.status == 0 ? 0 : 1);
    }
    int status = 0;
    waitpid(child, &status, 0);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0);
    EXPECT_LT(ReadFile(Out()).size(), 10000u);
    EXPECT_NEAR(EvalChannel(Out(), "jaw", 5, 0).value_or(-99), 20, 1e-3);
    testkit::ExpectValidGltf(Out());
}

// A keyset whose key shapes are all the same pose has nothing to apply: the run says so.
TEST_F(BatchBoundsTest, AKeysetWithoutChannelsIsTold) {
    Data("x.kset", "wire face.gltf\nbegin keyset same\n    key a 0\n    key b 0\nend\n");
    Data("x.track", "begin keytrack same\n    event 0 a\nend\n");
    const RunResult r = Batch("VX_ROOT", "face.gltf", "0");
    EXPECT_EQ(r.status, 0);
    EXPECT_THAT(r.err, HasSubstr("Keyset [same]: its key shapes differ in no channel, so it has "
                                 "no key channels."));
}

}  // namespace
