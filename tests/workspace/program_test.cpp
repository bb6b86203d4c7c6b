// The chirrup program run as a program: command line, environment, error log location and
// batch runs end to end (progress lines, every early end, the stored scene value by value).
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <regex>

#include "WorkspaceTestUtil.h"

using namespace wstest;
using ::testing::HasSubstr;
using ::testing::Not;
using ::testing::StartsWith;

namespace {

const std::string kBanner =
    "Tessel|Marlin Parlando and Facial Animation Version 2.0 (9704300208)\n";
const std::string kUsage =
    " usage: chirrup [-e STRING] [-fps #] [-nogeom]\n"
    "            [-v] [-tess # #] [-B track apply dag off out] infile\n"
    "\n"
    "\t-nogeom\t\tSuppress loading of geometry (images only)\n"
    "\t-v \t\tShow all messages (verbose)\n"
    "\t-a \t\tEnable a beep on keyframe insertion\n"
    "\t-fps #\t\tSet the frames per second to #\n"
    "\t-tess # #\tSet the U and V tesselation level\n"
    "\t-e STRING\tSet the error file to STRING\n"
    "\t-B track apply dag off out\n"
    " \t\t\tUse batch mode; track is the trackfile name,\n"
    " \t\t\tdag is the apply dag, off is the frame offset, \n"
    " \t\t\tout is the output filename\n";
const std::regex kLogHeader(
    "---------- Chirrup Error Log ---------- "
    "[A-Z][a-z]{2} [A-Z][a-z]{2} [ 0-9]\\d \\d\\d:\\d\\d:\\d\\d \\d{4}\n\n");

const char* const kKeysets =
    "wire face.gltf\n"
    "begin keyset mouth\n    key rest 0\n    key open 10\n    key wide 20\nend\n"
    "begin shapeset turn jaw 5 0 1\n    key left 0\n    key right 1\nend\n";
// Events in frames; the runs add 12 frames of offset unless told otherwise.
const char* const kTrack =
    "begin keytrack mouth\n    event 0 rest\n    event 15 open Linear\n"
    "    event 30 wide Smooth 0.5\n    event 45 open Ease 2\nend\n"
    "begin keytrack turn\n    event 6 right Ease 20\n    event 36 left Linear -10\nend\n";
const char* const kApplied = "Applying mouth\nApplying turn\n  Storing to %W/out.gltf\n";

// Runs start in DIR/work; the project is DIR unless the test says otherwise.
class ProgramTest : public ProjectTest {
  protected:
    void SetUp() override {
        ProjectTest::SetUp();
        Data("x.kset", kKeysets);
        Data("x.track", kTrack);
    }
    RunResult Run(std::vector<std::string> args, std::vector<EnvChange> env = {}) {
        env.insert(env.begin(), {"TESSEL_PROJECT", dir.path()});
        return RunChirrup(args, dir / "work", env);
    }
    RunResult Batch(const std::string& dag = "VX_ROOT", const std::string& apply = "face.gltf",
                    std::vector<std::string> before = {}, std::vector<EnvChange> env = {}) {
        for (const char* a : {"-B", "x.track"})
            before.push_back(a);
        for (const std::string& a : {apply, dag, std::string("12"), std::string("out.gltf")})
            before.push_back(a);
        before.push_back("x.kset");
        return Run(before, env);
    }
    std::string Header(const std::string& dag = "VX_ROOT", const std::string& apply = "face.gltf") {
        return Fill(
            "Batch mode.\n  Reading keyset %M/x.kset\n  Reading track %M/x.track\n"
            "  Reading apply file %W/" +
            apply + "\n  Applying to dag " + dag + " with offset 12\n");
    }
    std::string Out() const { return dir / "wire/out.gltf"; }
    std::string Log() const { return ReadFile(dir / "errlog.vx"); }
};

// --- command line

TEST_F(ProgramTest, InformationAndHelpPrintBannerAndUsageExactly) {
    const RunResult info = Run({"-i", "-h"});
    EXPECT_EQ(info.status, 0);
    EXPECT_EQ(info.err, kBanner) << "-i ends the program before -h is seen";
    EXPECT_EQ(info.out, "");
    EXPECT_FALSE(FileExists(dir / "errlog.vx")) << "the log is named after the options";
    for (const char* opt : {"-h", "-H"}) {
        const RunResult help = Run({"-v", opt, "file"});
        EXPECT_EQ(help.status, 0) << opt;
        EXPECT_EQ(help.err, kBanner + kUsage) << opt;
    }
}

TEST_F(ProgramTest, OddSwitchesAreToldOrReadAsZeroAndTheRunGoesOn) {
    std::vector<std::string> args{"-x",      "-v",        "-tess",   "x",     "y",        "-B",
                                  "x.track", "face.gltf", "VX_ROOT", "later", "out.gltf", "x.kset"};
    const RunResult r = Run(args);
    EXPECT_EQ(r.status, 0);
    EXPECT_THAT(r.err, StartsWith("Unknown switch [-x]\nBatch mode.\n"));
    EXPECT_THAT(r.err, HasSubstr("  Applying to dag VX_ROOT with offset 0\n"));
    EXPECT_THAT(Log(), HasSubstr("Verifying keysets ...\nKeysets are OK.\n"))
        << "-v after the unknown switch still turns on every message";
    EXPECT_TRUE(FileExists(Out()));
    ASSERT_EQ(Batch().status, 0);
    EXPECT_THAT(Log(), Not(HasSubstr("Verifying keysets")));
    ASSERT_EQ(Batch("VX_ROOT", "face.gltf", {}, {{"VX_VERBOSE", ""}}).status, 0);
    EXPECT_THAT(Log(), HasSubstr("Verifying keysets ...\n")) << "set but empty still counts";
}

struct ArgsCase {
    const char* label;
    std::vector<std::string> args;
    int status;
    const char* err;
    friend void PrintTo(const ArgsCase& c, std::ostream* os) { *os << c.label; }
};
class ProgramArgs : public ProgramTest, public ::testing::WithParamInterface<ArgsCase> {};

TEST_P(ProgramArgs, ToldExactlyAndEndWithTheirStatus) {
    const RunResult r = Run(GetParam().args);
    EXPECT_EQ(r.status, GetParam().status);
    EXPECT_EQ(r.err, GetParam().err);
    EXPECT_EQ(r.out, "");
}

// clang-format off
INSTANTIATE_TEST_SUITE_P(Missing, ProgramArgs, ::testing::Values(
    ArgsCase{"BatchWithoutInfile", {"-B", "t", "a", "d", "12", "o"}, 0, ""},
    ArgsCase{"FpsLast", {"-B", "t", "a", "d", "0", "o", "-fps"}, 0, ""},
    ArgsCase{"TessOneNumber", {"-B", "t", "a", "d", "0", "o", "-tess", "3"}, 0,
             "-tess needs two numbers; the tesselation levels stay at 1 1.\n"},
    ArgsCase{"LogWithoutName", {"-B", "t", "a", "d", "0", "o", "-e"}, 0,
             "-e needs a file name; the error log keeps its usual name.\n"},
    ArgsCase{"BatchShort", {"-B", "t", "a"}, 1,
             "-B needs five arguments: track apply dag off out\n"},
    ArgsCase{"NoWindowYet", {"-nogeom", "-a", "x.kset"}, 1,
             "chirrup: the main window is not built into this program yet; use -B for batch "
             "mode.\n"}),
    ByLabel());
// clang-format on

struct FpsCase {
    const char* label;
    std::optional<std::string> env;
    std::vector<std::string> args;
    int fps;
    friend void PrintTo(const FpsCase& c, std::ostream* os) { *os << c.label; }
};
class FrameRate : public ProgramTest, public ::testing::WithParamInterface<FpsCase> {};

// The track's key at frame 30 lands at 30 / fps seconds in the stored scene. The key shapes
// are scene frames at the same rate: "wide" (frame 20) holds jaw TY = 3 * 20 / fps, at most 2.
// From the rest key at 0 the curve eases in and out, so it is at half the value halfway.
TEST_P(FrameRate, DecidesWhereTheKeysLand) {
    const FpsCase& c = GetParam();
    Data("x.track", "begin keytrack mouth\n event 0 rest\n event 30 wide\nend\n");
    std::vector<std::string> args = c.args;
    for (const char* a : {"-B", "x.track", "face.gltf", "VX_ROOT", "0", "out.gltf", "x.kset"})
        args.push_back(a);
    ASSERT_EQ(Run(args, {{"VX_FPS", c.env}}).status, 0);
    const double keyFrame = 30.0 * 30.0 / c.fps;  // where the key stands, in 30 fps frames
    const double wide = std::min(2.0, 60.0 / c.fps);
    const auto atKey = EvalChannel(Out(), "jaw", 1, keyFrame);
    const auto halfway = EvalChannel(Out(), "jaw", 1, keyFrame / 2);
    ASSERT_TRUE(atKey.has_value() && halfway.has_value());
    EXPECT_NEAR(*atKey, wide, 1e-4);
    EXPECT_NEAR(*halfway, wide / 2, 1e-3);
}

// clang-format off
INSTANTIATE_TEST_SUITE_P(Rules, FrameRate, ::testing::Values(
    FpsCase{"Default", std::nullopt, {}, 30},
    FpsCase{"Environment", "15", {}, 15},
    FpsCase{"OptionWinsOverEnvironment", "15", {"-fps", "60"}, 60},
    FpsCase{"NegativeOptionIgnored", "15", {"-fps", "-5"}, 15},
    FpsCase{"ZeroOptionIsThirty", "15", {"-fps", "0"}, 30},
    FpsCase{"LaterOptionWins", std::nullopt, {"-fps", "60", "-fps", "15"}, 15},
    FpsCase{"NonNumericEnvironmentIsThirty", "fast", {}, 30},
    FpsCase{"NegativeEnvironmentIgnored", "-4", {}, 30}),
    ByLabel());
// clang-format on

TEST_F(ProgramTest, TheLogGoesToTheOptionTheProjectOrTheWorkingDirectory) {
    const std::vector<std::string> args{"-B", "t", "a", "d", "0", "o"};
    WriteFile(dir / "work/errlog.vx", "old text that must go\n");
    ASSERT_EQ(RunChirrup(args, dir / "work").status, 0);
    EXPECT_TRUE(std::regex_match(ReadFile(dir / "work/errlog.vx"), kLogHeader))
        << ReadFile(dir / "work/errlog.vx");
    ASSERT_EQ(Run(args).status, 0);
    EXPECT_TRUE(std::regex_match(Log(), kLogHeader));
    std::filesystem::remove(dir / "errlog.vx");
    std::vector<std::string> named{"-e", "my.log"};
    named.insert(named.end(), args.begin(), args.end());
    ASSERT_EQ(Run(named).status, 0);
    EXPECT_TRUE(std::regex_match(ReadFile(dir / "work/my.log"), kLogHeader));
    EXPECT_FALSE(FileExists(dir / "errlog.vx"));
}

// --- batch runs

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
        {"jaw", 1, 12, 0}, {"jaw", 1, 27, 1}, {"jaw", 1, 42, 1},   {"jaw", 1, 57, 2},
        {"lip", 0, 12, 0}, {"lip", 0, 27, 0}, {"lip", 0, 42, 2.5}, {"lip", 0, 57, 0},
        {"lip", 2, 12, 0}, {"lip", 2, 27, 3}, {"lip", 2, 42, 1.5}, {"lip", 2, 57, 6},
        {"jaw", 5, 18, 20}, {"jaw", 5, 48, -10},
        {"lip", 0, 34.5, 1.25},  // linear from 27 to 42 (0 to 2.5): halfway
    };
    // clang-format on
    for (const Expect& k : keys) {
        const auto v = EvalChannel(Out(), k.node, k.channel, k.frame);
        ASSERT_TRUE(v.has_value()) << k.node << " " << k.channel;
        EXPECT_NEAR(*v, k.value, 1e-3)
            << k.node << " channel " << k.channel << " frame " << k.frame;
    }
    EXPECT_EQ(ReadFile(dir / "wire/face.gltf"), FaceSceneJson()) << "the apply file is unchanged";

    const std::string validator = CHIRRUP_SOURCE_DIR "/tools/validate-gltf.mjs";
    if (FileExists(validator)) {
        const std::string command =
            "node " + validator + " " + Out() + " > " + (dir / "validator.txt") + " 2>&1";
        EXPECT_EQ(std::system(command.c_str()), 0) << ReadFile(dir / "validator.txt");
    }
}

// A batch run whose inputs differ from the good ones: what it says after the header, and
// what it stores (node/channel/frame/value of the stored scene, or nothing).
struct BatchCase {
    const char* label;
    const char* dag;
    const char* keysets;  // the keyset file; null: missing
    const char* track;    // the track file; null: missing
    const char* says;     // %W, %M: wire and data directories
    const char* node;     // null: nothing is stored
    int channel = 0;
    double frame = 0, value = 0;
    const char* logged = "";
    friend void PrintTo(const BatchCase& c, std::ostream* os) { *os << c.label; }
};
class BatchRun : public ProgramTest, public ::testing::WithParamInterface<BatchCase> {};

TEST_P(BatchRun, SaysWhatHappenedAndStoresWhatItCan) {
    const BatchCase& c = GetParam();
    std::filesystem::remove(dir / "misc_data/x.kset");
    std::filesystem::remove(dir / "misc_data/x.track");
    if (c.keysets)
        Data("x.kset", c.keysets);
    if (c.track)
        Data("x.track", c.track);
    WriteAiff(dir / "misc_data/d.aiff", 32000, 8000);
    WriteFile(dir / "wire/notes.gltf", "{ not a scene");
    const RunResult r = Batch(c.dag);
    EXPECT_EQ(r.status, 0);
    EXPECT_EQ(r.err, Header(c.dag) + Fill(c.says));
    EXPECT_THAT(Log(), HasSubstr(Fill(c.logged)));
    if (!c.node) {
        EXPECT_FALSE(FileExists(Out()));
        return;
    }
    const auto v = EvalChannel(Out(), c.node, c.channel, c.frame);
    ASSERT_TRUE(v.has_value());
    EXPECT_NEAR(*v, c.value, 1e-4);
}

const std::string kSoundGone = std::string("sound gone.aiff\n") + kTrack;
const std::string kSound = std::string("sound d.aiff\n") + kTrack;
const std::string kUnknown = std::string("begin keytrack lips\n    event 3 rest\nend\n") + kTrack;
const char* const kNothing =
    "Failed to find keyset [mouth].\nFailed to find keyset [turn].\n"
    "You must select one or more keysets to apply.\n";
const std::string kNoKeysetFile =
    std::string("Failed to open keyset file [%M/x.kset].\n") + kNothing;

// clang-format off
INSTANTIATE_TEST_SUITE_P(Inputs, BatchRun, ::testing::Values(
    BatchCase{"NamedDag", "head", kKeysets, kTrack, kApplied, "jaw", 1, 57, 2},
    // The first keyset's failure ends the applying; the scene is stored as it was read.
    BatchCase{"MissingDag", "nothere", kKeysets, kTrack,
              "Applying mouth\nCannot find base dag [nothere] for apply ...\n"
              "There was an error\n  Storing to %W/out.gltf\n", "jaw", 1, 10, 1},
    BatchCase{"MissingSound", "VX_ROOT", kKeysets, kSoundGone.c_str(), kApplied, "jaw", 1, 57, 2,
              "\n\nAudio file [%M/gone.aiff] does not exist.\n"},
    BatchCase{"WithSound", "VX_ROOT", kKeysets, kSound.c_str(), kApplied, "lip", 2, 57, 6},
    BatchCase{"UnknownKeysetInTrack", "VX_ROOT", kKeysets, kUnknown.c_str(),
              "Failed to find keyset [lips].\nApplying mouth\nApplying turn\n"
              "  Storing to %W/out.gltf\n", "lip", 2, 57, 6},
    BatchCase{"MissingTrack", "VX_ROOT", kKeysets, nullptr,
              "Failed to open track file [%M/x.track].\nApplying mouth\nApplying turn\n"
              "  Storing to %W/out.gltf\n", "jaw", 1, 20, 2},
    BatchCase{"NoKeysets", "VX_ROOT", "wire face.gltf\n", kTrack, kNothing, nullptr},
    BatchCase{"NoWireStatement", "VX_ROOT", kMouth, kTrack, "No wire file!\n", nullptr},
    BatchCase{"WireMissing", "VX_ROOT", "wire gone.gltf\n", kTrack,
              "Could not read wire file %W/gone.gltf, cannot load keyset\n", nullptr},
    BatchCase{"WireNotAScene", "VX_ROOT", "wire notes.gltf 0\n", kTrack,
              "Could not read wire file %W/notes.gltf, cannot load keyset\n", nullptr},
    BatchCase{"KeysetFileMissing", "VX_ROOT", nullptr, kTrack, kNoKeysetFile.c_str(), nullptr}),
    ByLabel());
// clang-format on

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

TEST_F(ProgramTest, NamesAreTakenAsTheyStandOrFromTheWorkingDirectory) {
    TempDir elsewhere;
    WriteFile(elsewhere / "k.kset", "wire " + (dir / "wire/face.gltf") + "\n" + kMouth);
    WriteFile(elsewhere / "t.track", kTrack);
    const std::string out = elsewhere / "o.glb";
    RunResult r = Run({"-B", elsewhere / "t.track", dir / "wire/face.gltf", "VX_ROOT", "0", out,
                       elsewhere / "k.kset"});
    EXPECT_THAT(r.err, HasSubstr("  Reading keyset " + (elsewhere / "k.kset") + "\n"));
    EXPECT_THAT(r.err, HasSubstr("  Storing to " + out + "\n"));
    EXPECT_NEAR(*EvalChannel(out, "jaw", 1, 30), 1.0, 1e-4) << "event 30 wide 0.5, offset 0";

    for (const char* f : {"misc_data/x.kset", "misc_data/x.track", "wire/face.gltf"})
        std::filesystem::copy_file(dir / f,
                                   dir / ("work/" + std::filesystem::path(f).filename().string()));
    r = RunChirrup({"-B", "x.track", "face.gltf", "VX_ROOT", "0", "o.gltf", "x.kset"},
                   dir / "work");
    EXPECT_EQ(r.err,
              "Batch mode.\n  Reading keyset x.kset\n  Reading track x.track\n"
              "  Reading apply file face.gltf\n  Applying to dag VX_ROOT with offset 0\n"
              "Applying mouth\nApplying turn\n  Storing to o.gltf\n");
    EXPECT_TRUE(FileExists(dir / "work/o.gltf"));
    EXPECT_TRUE(FileExists(dir / "work/errlog.vx"));
}

}  // namespace
