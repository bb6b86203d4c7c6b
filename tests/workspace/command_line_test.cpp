// The command-line parser on its own: what each command line asks for and what it says, with
// the environment given by the test. The program's own runs are in program_test.cpp.
#include <gtest/gtest.h>

#include <map>
#include <sstream>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "workspace/CommandLine.h"

namespace {

using ::testing::HasSubstr;
using ::testing::Not;

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
    struct Row {
        std::vector<const char*> args;
        const char* env;  // VX_FPS, or null
        std::optional<int> fps;
    };
    for (const Row& row : std::vector<Row>{{{}, nullptr, std::nullopt},
                                           {{}, "25", 25},
                                           {{}, "-4", std::nullopt},
                                           {{}, "many", 0},
                                           {{"-fps", "24"}, "25", 24},
                                           {{"-fps", "-3"}, "25", 25},
                                           {{"-fps", "60", "-fps", "15"}, nullptr, 15},
                                           {{"-fps"}, "25", 0}}) {
        std::map<std::string, std::string> env;
        if (row.env)
            env["VX_FPS"] = row.env;
        EXPECT_EQ(ParseLine(row.args, env).line.fps, row.fps)
            << (row.args.empty() ? "" : row.args.back()) << " with " << (row.env ? row.env : "-");
    }
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
