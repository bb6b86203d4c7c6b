// The command line and environment of the chirrup program, run as a program.
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

class CommandLine : public ::testing::Test {
  protected:
    RunResult Run(const std::vector<std::string>& args, const std::vector<EnvChange>& env = {}) {
        return RunChirrup(args, dir.path(), env);
    }
    // Files for a batch run in the working directory: the face, its "mouth" keyset and a
    // track whose one key (wide) stands at frame 30 of the workspace frame rate.
    void WriteBatchFiles() {
        WriteFile(dir / "face.gltf", FaceSceneJson());
        WriteFile(dir / "face.kset",
                  "wire face.gltf\nbegin keyset mouth\n key rest 0\n key open 10\n"
                  " key wide 20\nend\n");
        WriteFile(dir / "t.track", "begin keytrack mouth\n event 0 rest\n event 30 wide\nend\n");
    }
    std::vector<std::string> BatchArgs() {
        return {"-B", "t.track", "face.gltf", "VX_ROOT", "0", "out.gltf", "face.kset"};
    }
    TempDir dir;
};

TEST_F(CommandLine, InformationPrintsTheBanner) {
    const RunResult r = Run({"-i", "-h"});
    EXPECT_EQ(r.status, 0);
    EXPECT_EQ(r.err, kBanner) << "-i ends the program before -h is seen";
    EXPECT_EQ(r.out, "");
    EXPECT_FALSE(FileExists(dir / "errlog.vx")) << "the log is named after the options";
}

TEST_F(CommandLine, HelpPrintsBannerAndUsageExactly) {
    for (const char* opt : {"-h", "-H"}) {
        const RunResult r = Run({"-v", opt, "file"});
        EXPECT_EQ(r.status, 0) << opt;
        EXPECT_EQ(r.err, kBanner + kUsage) << opt;
    }
}

TEST_F(CommandLine, AnUnknownSwitchIsToldAndSkipped) {
    WriteBatchFiles();
    std::vector<std::string> args{"-x", "-v"};
    for (const std::string& a : BatchArgs())
        args.push_back(a);
    const RunResult r = Run(args);
    EXPECT_EQ(r.status, 0);
    EXPECT_THAT(r.err, StartsWith("Unknown switch [-x]\nBatch mode.\n"));
    EXPECT_THAT(ReadFile(dir / "errlog.vx"), HasSubstr("Verifying keysets ...\n"))
        << "-v after the unknown switch still turns on every message";
}

TEST_F(CommandLine, BatchWithoutAnInfileDoesNothing) {
    const RunResult r = Run({"-B", "t", "a", "d", "12", "o"});
    EXPECT_EQ(r.status, 0);
    EXPECT_EQ(r.err, "");
    EXPECT_EQ(r.out, "");
}

TEST_F(CommandLine, VerboseOutputFromTheEnvironmentOrTheOption) {
    WriteBatchFiles();
    ASSERT_EQ(Run(BatchArgs()).status, 0);
    EXPECT_THAT(ReadFile(dir / "errlog.vx"), Not(HasSubstr("Verifying keysets")));
    ASSERT_EQ(Run(BatchArgs(), {{"VX_VERBOSE", ""}}).status, 0);
    EXPECT_THAT(ReadFile(dir / "errlog.vx"), HasSubstr("Verifying keysets ...\nKeysets are OK.\n"))
        << "set but empty still counts";
}

struct FpsCase {
    const char* label;
    std::optional<std::string> env;
    std::vector<std::string> args;
    int fps;
};

class FrameRate : public CommandLine, public ::testing::WithParamInterface<FpsCase> {};

// The track's key at frame 30 lands at 30 / fps seconds in the stored scene. The key shapes
// are scene frames at the same rate: "wide" (frame 20) holds jaw TY = 3 * 20 / fps, at most 2.
// From the rest key at 0 the curve eases in and out, so it is at half the value halfway.
TEST_P(FrameRate, DecidesWhereTheKeysLand) {
    const FpsCase& c = GetParam();
    WriteBatchFiles();
    std::vector<std::string> args = c.args;
    for (const std::string& a : BatchArgs())
        args.push_back(a);
    ASSERT_EQ(Run(args, {{"VX_FPS", c.env}}).status, 0);
    const double keyFrame = 30.0 * 30.0 / c.fps;  // where the key stands, in 30 fps frames
    const double wide = std::min(2.0, 60.0 / c.fps);
    const auto atKey = EvalChannel(dir / "out.gltf", "jaw", 1, keyFrame);
    const auto halfway = EvalChannel(dir / "out.gltf", "jaw", 1, keyFrame / 2);
    ASSERT_TRUE(atKey.has_value() && halfway.has_value());
    EXPECT_NEAR(*atKey, wide, 1e-4);
    EXPECT_NEAR(*halfway, wide / 2, 1e-3);
}

INSTANTIATE_TEST_SUITE_P(
    Rules, FrameRate,
    ::testing::Values(FpsCase{"Default", std::nullopt, {}, 30},
                      FpsCase{"Environment", "15", {}, 15},
                      FpsCase{"OptionWinsOverEnvironment", "15", {"-fps", "60"}, 60},
                      FpsCase{"NegativeOptionIgnored", "15", {"-fps", "-5"}, 15},
                      FpsCase{"ZeroOptionIsThirty", "15", {"-fps", "0"}, 30},
                      FpsCase{"LaterOptionWins", std::nullopt, {"-fps", "60", "-fps", "15"}, 15},
                      FpsCase{"NonNumericEnvironmentIsThirty", "fast", {}, 30},
                      FpsCase{"NegativeEnvironmentIgnored", "-4", {}, 30}),
    [](const auto& info) { return std::string(info.param.label); });

TEST_F(CommandLine, FpsAsTheLastArgumentDoesNotFail) {
    const RunResult r = Run({"-B", "t", "a", "d", "0", "o", "-fps"});
    EXPECT_EQ(r.status, 0);
    EXPECT_EQ(r.err, "");
}

// --- error log

TEST_F(CommandLine, TheLogIsInTheWorkingDirectoryWithoutAProject) {
    ASSERT_EQ(Run({"-B", "t", "a", "d", "0", "o"}).status, 0);
    EXPECT_TRUE(std::regex_match(ReadFile(dir / "errlog.vx"), kLogHeader))
        << ReadFile(dir / "errlog.vx");
}

TEST_F(CommandLine, TheLogIsInTheProjectDirectory) {
    TempDir project;
    ASSERT_EQ(Run({"-B", "t", "a", "d", "0", "o"}, {{"TESSEL_PROJECT", project.path()}}).status, 0);
    EXPECT_TRUE(std::regex_match(ReadFile(project / "errlog.vx"), kLogHeader));
    EXPECT_FALSE(FileExists(dir / "errlog.vx"));
}

TEST_F(CommandLine, TheLogOptionNamesTheFile) {
    TempDir project;
    ASSERT_EQ(
        Run({"-e", "my.log", "-B", "t", "a", "d", "0", "o"}, {{"TESSEL_PROJECT", project.path()}})
            .status,
        0);
    EXPECT_TRUE(std::regex_match(ReadFile(dir / "my.log"), kLogHeader));
    EXPECT_FALSE(FileExists(project / "errlog.vx"));
}

TEST_F(CommandLine, AnUnwritableLogSendsItsMessagesToTheErrorStream) {
    WriteBatchFiles();
    WriteFile(dir / "s.track", "sound gone.aiff\n");
    const std::string log = dir / "no-dir/errlog.vx";
    const RunResult r =
        Run({"-e", log, "-B", "s.track", "face.gltf", "VX_ROOT", "0", "o.gltf", "face.kset"});
    EXPECT_EQ(r.status, 0);
    EXPECT_THAT(r.err, HasSubstr("ERROR: Unable to append to error log file, " + log +
                                 ".\nAudio file [gone.aiff] does not exist.\n"));
    EXPECT_TRUE(FileExists(dir / "o.gltf"));
}

// --- arguments that are missing or wrong

TEST_F(CommandLine, MissingOptionArgumentsAreToldNotFatal) {
    const RunResult tess = Run({"-B", "t", "a", "d", "0", "o", "-tess", "3"});
    EXPECT_EQ(tess.status, 0);
    EXPECT_EQ(tess.err, "-tess needs two numbers; the tesselation levels stay at 1 1.\n");

    const RunResult log = Run({"-B", "t", "a", "d", "0", "o", "-e"});
    EXPECT_EQ(log.status, 0);
    EXPECT_EQ(log.err, "-e needs a file name; the error log keeps its usual name.\n");
    EXPECT_TRUE(FileExists(dir / "errlog.vx"));

    const RunResult batch = Run({"-B", "t", "a"});
    EXPECT_EQ(batch.status, 1);
    EXPECT_EQ(batch.err, "-B needs five arguments: track apply dag off out\n");
}

TEST_F(CommandLine, NonNumericNumbersReadAsZero) {
    WriteBatchFiles();
    std::vector<std::string> args{"-tess", "x", "y"};
    for (const std::string& a : BatchArgs())
        args.push_back(a);
    args[3 + 4] = "later";  // the frame offset
    const RunResult r = Run(args);
    EXPECT_EQ(r.status, 0);
    EXPECT_THAT(r.err, HasSubstr("  Applying to dag VX_ROOT with offset 0\n"));
    EXPECT_TRUE(FileExists(dir / "out.gltf"));
}

TEST_F(CommandLine, TheWindowIsNotBuiltYet) {
    const RunResult r = Run({"-nogeom", "-a", "face.kset"});
    EXPECT_NE(r.status, 0);
    EXPECT_THAT(r.err, HasSubstr("main window is not built"));
}

}  // namespace
