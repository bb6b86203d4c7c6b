// The chirrup program run as a program: command line, environment and batch runs end to end
// (progress lines, every early end, the stored scene value by value, damaged or unusual
// inputs); and its command-line parser on its own.
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/wait.h>

#include <filesystem>
#include <map>
#include <sstream>
#include <tuple>

#include "WorkspaceTestUtil.h"
#include "testkit/ValidateGltf.h"
#include "workspace/CommandLine.h"

using namespace wstest;

namespace {

const char* const kApplied = "Applying mouth\nApplying turn\n  Storing to %W/out.gltf\n";

// The runs add 12 frames of offset unless told otherwise.
class ProgramTest : public BatchTest {
  protected:
    std::string Header(const std::string& dag = "VX_ROOT", const std::string& apply = "face.gltf") {
        return Fill(
            "Batch mode.\n  Reading keyset %M/x.kset\n  Reading track %M/x.track\n"
            "  Reading apply file %W/" +
            apply + "\n  Applying to dag " + dag + " with offset 12\n");
    }
    std::string Log() const { return ReadFile(dir / "errlog.vx"); }
};

TEST_F(ProgramTest, MissingArgumentsAreToldExactlyAndEndWithTheirStatus) {
    // A short -B ends the program (the parser tests tell the other missing arguments).
    RunResult r = Run({"-B", "t", "a"});
    EXPECT_EQ(r.status, 1);
    EXPECT_EQ(r.err, "-B needs five arguments: track apply dag off out\n");
    EXPECT_EQ(r.out, "");
    // Without a display the window cannot open: said plainly, status 1, nothing else done.
    r = Run({"-nogeom", "-a", "x.kset"}, {{"DISPLAY", std::nullopt}});
    EXPECT_EQ(r.status, 1);
    EXPECT_EQ(r.err,
              "chirrup: cannot open the display \"\" for the window; use -B for batch mode.\n");
    EXPECT_FALSE(FileExists(dir / "work/_m.keyset"));
}

// The track's key at frame 30 lands at 30 / fps seconds in the stored scene. The key shapes
// are scene frames at the same rate: "wide" (frame 20) holds jaw TY = 3 * 20 / fps, at most 2.
// From the rest key at 0 the curve eases in and out, so it is at half the value halfway.
TEST_F(ProgramTest, FrameRateFromOptionOrEnvironmentDecidesWhereTheKeysLand) {
    Data("x.track", "begin keytrack mouth\n event 0 rest\n event 30 wide\nend\n");
    // The environment's rate, the option's over it, and a rate of 0: the default.
    const std::vector<std::tuple<std::optional<std::string>, std::vector<std::string>, int>> rows =
        {{"15", {}, 15}, {"15", {"-fps", "60"}, 60}, {"15", {"-fps", "0"}, 30}};
    for (auto [env, args, fps] : rows) {
        SCOPED_TRACE(env.value_or("unset") + " " + ::testing::PrintToString(args));
        for (const char* a : {"-B", "x.track", "face.gltf", "VX_ROOT", "0", "out.gltf", "x.kset"})
            args.push_back(a);
        ASSERT_EQ(Run(args, {{"VX_FPS", env}}).status, 0);
        const double keyFrame = 30.0 * 30.0 / fps;  // where the key stands, in 30 fps frames
        const double wide = std::min(2.0, 60.0 / fps);
        EXPECT_NEAR(EvalChannel(Out(), "jaw", 1, keyFrame).value_or(-1), wide, 1e-4);
        EXPECT_NEAR(EvalChannel(Out(), "jaw", 1, keyFrame / 2).value_or(-1), wide / 2, 1e-3);
    }
}

TEST_F(ProgramTest, BatchAppliesEveryKeysetAndStoresTheScene) {
    const RunResult r = Batch();
    EXPECT_EQ(r.status, 0);
    EXPECT_EQ(r.err, Header() + Fill(kApplied));
    ASSERT_TRUE(FileExists(Out()));

    // Kind 1: rest pose 0; value v of key shape s gives v * s per channel. Keys land 12
    // frames later than their events. Kind 2: the value itself on the driven channel (jaw RZ).
    struct Expect {
        const char* node;
        int channel;
        double frame, value;
    };
    // clang-format off
    const Expect keys[] = {
        {"jaw", 1, 12, 0}, {"jaw", 1, 27, 1}, {"jaw", 1, 57, 2},  {"lip", 0, 42, 2.5},
        {"lip", 2, 27, 3}, {"lip", 2, 57, 6}, {"jaw", 5, 18, 20}, {"jaw", 5, 48, -10},
        {"lip", 0, 34.5, 1.25},  // linear from 27 to 42 (0 to 2.5): halfway
    };
    // clang-format on
    for (const Expect& k : keys)
        EXPECT_NEAR(EvalChannel(Out(), k.node, k.channel, k.frame).value_or(-99), k.value, 1e-3)
            << k.node << " channel " << k.channel << " frame " << k.frame;
    EXPECT_EQ(ReadFile(dir / "wire/face.gltf"), FaceSceneJson()) << "the apply file is unchanged";

    testkit::ExpectValidGltf(Out());
}

// Batch runs whose inputs differ from the good ones: what each says after the header, and
// what it stores (node, channel, frame, value of the stored scene; no node: nothing stored).
TEST_F(ProgramTest, BatchRunsSayWhatHappenedAndStoreWhatTheyCan) {
    const std::string track = kBatchTrack;
    const std::string nothing =
        "Failed to find keyset [mouth].\nFailed to find keyset [turn].\n"
        "You must select one or more keysets to apply.\n";
    const std::string stored = "Applying mouth\nApplying turn\n  Storing to %W/out.gltf\n";
    struct Row {
        std::string dag;
        const char* keysets;  // the keyset file; null: missing
        std::string track;    // the track file; "-": missing
        std::string says;     // %W, %M: wire and data directories
        const char* node;
        int channel;
        double frame, value;
        const char* logged;
    };
    const Row rows[] = {
        {"head", kBatchKeysets, track, kApplied, "jaw", 1, 57, 2, ""},
        // The first keyset's failure ends the applying; the scene is stored as it was read.
        {"nothere", kBatchKeysets, track,
         "Applying mouth\nCannot find base dag [nothere] for apply ...\nThere was an error\n"
         "  Storing to %W/out.gltf\n",
         "jaw", 1, 10, 1, ""},
        {"VX_ROOT", kBatchKeysets, "sound gone.aiff\n" + track, kApplied, "jaw", 1, 57, 2,
         "\n\nAudio file [%M/gone.aiff] does not exist.\n"},
        {"VX_ROOT", kBatchKeysets, "-", "Failed to open track file [%M/x.track].\n" + stored, "jaw",
         1, 20, 2, ""},
        {"VX_ROOT", "wire face.gltf\n", track, nothing, nullptr, 0, 0, 0, ""},
        {"VX_ROOT", kMouth, track, "No wire file!\n", nullptr, 0, 0, 0, ""},
        {"VX_ROOT", "wire gone.gltf\n", track,
         "Could not read wire file %W/gone.gltf, cannot load keyset\n", nullptr, 0, 0, 0, ""},
        {"VX_ROOT", nullptr, track, "Failed to open keyset file [%M/x.kset].\n" + nothing, nullptr,
         0, 0, 0, ""}};
    for (const Row& c : rows) {
        SCOPED_TRACE(c.says);
        std::filesystem::remove(dir / "misc_data/x.kset");
        std::filesystem::remove(dir / "misc_data/x.track");
        std::filesystem::remove(Out());
        if (c.keysets)
            Data("x.kset", c.keysets);
        if (c.track != "-")
            Data("x.track", c.track);
        const RunResult r = Batch(c.dag);
        EXPECT_EQ(r.status, 0);
        EXPECT_EQ(r.err, Header(c.dag) + Fill(c.says));
        EXPECT_THAT(Log(), HasSubstr(Fill(c.logged)));
        if (!c.node)
            EXPECT_FALSE(FileExists(Out()));
        else
            EXPECT_NEAR(EvalChannel(Out(), c.node, c.channel, c.frame).value_or(-99), c.value,
                        1e-4);
    }
}

TEST_F(ProgramTest, AMissingOrUnwritableApplyFileIsTold) {
    RunResult r = Batch("VX_ROOT", "gone.gltf");
    EXPECT_EQ(r.status, 0);
    EXPECT_THAT(r.err, StartsWith(Header("VX_ROOT", "gone.gltf") +
                                  Fill("Could not read apply file %W/gone.gltf")));
    EXPECT_FALSE(FileExists(Out()));

    r = Run({"-B", "x.track", "face.gltf", "VX_ROOT", "0", "no-dir/o.gltf", "x.kset"});
    EXPECT_EQ(r.status, 0);
    const std::string storing = Fill("  Storing to %W/no-dir/o.gltf\n");
    ASSERT_THAT(r.err, HasSubstr(storing));
    EXPECT_THAT(r.err.substr(r.err.find(storing) + storing.size()), HasSubstr("no-dir/o.gltf"))
        << "a message after the storing line";
}

// --- batch runs on damaged or unusual inputs: each ends with status 0 and a line on the error
// stream saying what was refused, or with a valid scene, and never costs memory or disk out of
// proportion to what it applies. No offset unless told otherwise.
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

// --- the command-line parser on its own, with the environment given by the test

std::map<std::string, std::string> environment;
const char* Lookup(const char* name) {
    const auto it = environment.find(name);
    return it == environment.end() ? nullptr : it->second.c_str();
}

struct Parsed {
    CommandLine line;
    std::string err;
};

Parsed ParseLine(std::vector<const char*> args, std::map<std::string, std::string> env = {}) {
    environment = std::move(env);
    args.insert(args.begin(), "chirrup");
    std::ostringstream err;
    CommandLine line = CommandLine::Parse(int(args.size()), args.data(), err, Lookup);
    return {line, err.str()};
}

TEST(CommandLineTest, OptionsRunUpToTheInfileAndLaterOnesAreNotOptions) {
    const Parsed p =
        ParseLine({"-nogeom", "-a", "-v", "-tess", "4", "2", "-e", "log.vx", "-B", "t.track",
                   "a.gltf", "VX_ROOT", "12", "o.gltf", "x.kset", "-fps", "24"});
    EXPECT_EQ(p.err, "");
    const CommandLine& l = p.line;
    EXPECT_FALSE(l.exitNow);
    EXPECT_TRUE(l.noGeometry && l.beep && l.verbose && l.batchMode);
    EXPECT_EQ(std::make_pair(l.tessU, l.tessV), std::make_pair(4, 2));
    EXPECT_EQ(l.errorFile, "log.vx");
    EXPECT_EQ(l.batch.track + " " + l.batch.apply + " " + l.batch.dag + " " + l.batch.off + " " +
                  l.batch.out,
              "t.track a.gltf VX_ROOT 12 o.gltf");
    EXPECT_EQ(l.infile, "x.kset");
    EXPECT_EQ(l.fps, std::nullopt) << "-fps after the infile is not read";
}

// The frame rate: the environment's, then every -fps in order; negative rates are ignored and
// text or a missing number asks for the default rate (0).
TEST(CommandLineTest, FrameRateFromTheEnvironmentThenTheCommandLine) {
    const auto fps = [](std::vector<const char*> args, const char* env) {  // env: VX_FPS
        return ParseLine(std::move(args),
                         env ? decltype(environment){{"VX_FPS", env}} : decltype(environment){})
            .line.fps;
    };
    EXPECT_EQ(fps({}, nullptr), std::nullopt);
    EXPECT_EQ(fps({}, "25"), 25);
    EXPECT_EQ(fps({}, "-4"), std::nullopt);
    EXPECT_EQ(fps({}, "many"), 0);
    EXPECT_EQ(fps({"-fps", "24"}, "25"), 24);
    EXPECT_EQ(fps({"-fps", "-3"}, "25"), 25);
    EXPECT_EQ(fps({"-fps", "60", "-fps", "15"}, nullptr), 15);
    EXPECT_EQ(fps({"-fps"}, "25"), 0);
    const Parsed quiet = ParseLine({}, {{"VX_VERBOSE", ""}, {"VX_AUDIO", "1"}});
    EXPECT_TRUE(quiet.line.verbose && quiet.line.beep) << "set, even empty, counts";
}

TEST(CommandLineTest, MissingArgumentsAreToldAndEndWhereTheProgramEnds) {
    Parsed p = ParseLine({"-x", "-tess", "3"});
    EXPECT_EQ(p.err,
              "Unknown switch [-x]\n"
              "-tess needs two numbers; the tesselation levels stay at 1 1.\n");
    EXPECT_FALSE(p.line.exitNow);
    EXPECT_EQ(std::make_pair(p.line.tessU, p.line.tessV), std::make_pair(1, 1));

    p = ParseLine({"-e"});
    EXPECT_EQ(p.err, "-e needs a file name; the error log keeps its usual name.\n");
    EXPECT_EQ(p.line.errorFile, std::nullopt);

    // -H is -h; what comes after it is not read.
    p = ParseLine({"-H", "-zz"});
    EXPECT_TRUE(p.line.exitNow && p.line.exitStatus == 0);
    EXPECT_THAT(p.err, Not(HasSubstr("-zz")));
}

}  // namespace
