// Batch mode end to end through the chirrup program: the progress lines, every failure, and
// the stored scene checked value by value against the track and the keysets.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>

#include "WorkspaceTestUtil.h"

using namespace wstest;
using ::testing::HasSubstr;
using ::testing::Not;

namespace {

const char* const kKeysets =
    "wire face.gltf\n"
    "begin keyset mouth\n    key rest 0\n    key open 10\n    key wide 20\nend\n"
    "begin shapeset turn jaw 5 0 1\n    key left 0\n    key right 1\nend\n";

// Events in frames; 12 frames of offset are added on apply.
const char* const kTrack =
    "begin keytrack mouth\n"
    "    event 0 rest\n"
    "    event 15 open Linear\n"
    "    event 30 wide Smooth 0.5\n"
    "    event 45 open Ease 2\n"
    "end\n"
    "begin keytrack turn\n"
    "    event 6 right Ease 20\n"
    "    event 36 left Linear -10\n"
    "end\n";

// A project: the face scene in wire/, the descriptions in misc_data/; runs start in a
// separate working directory.
class BatchTest : public ::testing::Test {
  protected:
    void SetUp() override {
        for (const char* sub : {"misc_data", "wire", "work"})
            std::filesystem::create_directory(dir / sub);
        WriteFile(dir / "wire/face.gltf", FaceSceneJson("faceScene"));
        WriteFile(dir / "misc_data/face.kset", kKeysets);
        WriteFile(dir / "misc_data/t.track", kTrack);
    }
    RunResult Batch(const std::string& dag, const std::string& keysets = "face.kset",
                    const std::string& track = "t.track", const std::string& apply = "face.gltf",
                    std::vector<std::string> extra = {}) {
        std::vector<std::string> args = extra;
        for (const std::string& a : {std::string("-B"), track, apply, dag, std::string("12"),
                                     std::string("out.gltf"), keysets})
            args.push_back(a);
        return RunChirrup(args, dir / "work", {{"TESSEL_PROJECT", dir.path()}});
    }
    std::string Header(const std::string& dag, const std::string& keysets = "face.kset",
                       const std::string& track = "t.track") {
        return "Batch mode.\n"
               "  Reading keyset " +
               (dir / "misc_data/") + keysets + "\n" + "  Reading track " + (dir / "misc_data/") +
               track + "\n" + "  Reading apply file " + (dir / "wire/face.gltf") + "\n" +
               "  Applying to dag " + dag + " with offset 12\n";
    }
    std::string Out() const { return dir / "wire/out.gltf"; }
    std::string Log() { return ReadFile(dir / "errlog.vx"); }

    TempDir dir;
};

TEST_F(BatchTest, AppliesEveryKeysetAndStoresTheScene) {
    const RunResult r = Batch("VX_ROOT");
    EXPECT_EQ(r.status, 0);
    EXPECT_EQ(r.err,
              Header("VX_ROOT") + "Applying mouth\nApplying turn\n  Storing to " + Out() + "\n");
    ASSERT_TRUE(FileExists(Out()));

    // Kind 1: rest pose 0; value v of key shape s gives v * s per channel. Keys land 12
    // frames later than their events.
    struct Expect {
        const char* node;
        int channel;
        double frame;
        double value;
    };
    const Expect keys[] = {
        {"jaw", 1, 12, 0},
        {"jaw", 1, 27, 1},
        {"jaw", 1, 42, 1},
        {"jaw", 1, 57, 2},
        {"lip", 0, 12, 0},
        {"lip", 0, 27, 0},
        {"lip", 0, 42, 2.5},
        {"lip", 0, 57, 0},
        {"lip", 2, 12, 0},
        {"lip", 2, 27, 3},
        {"lip", 2, 42, 1.5},
        {"lip", 2, 57, 6},
        // Kind 2: the value itself on the driven channel (jaw RZ).
        {"jaw", 5, 18, 20},
        {"jaw", 5, 48, -10},
    };
    for (const Expect& k : keys) {
        const auto v = EvalChannel(Out(), k.node, k.channel, k.frame);
        ASSERT_TRUE(v.has_value()) << k.node << " " << k.channel;
        EXPECT_NEAR(*v, k.value, 1e-4)
            << k.node << " channel " << k.channel << " frame " << k.frame;
    }
    // Linear from 27 to 42 on lip TX (0 to 2.5): halfway is 1.25.
    EXPECT_NEAR(*EvalChannel(Out(), "lip", 0, 34.5), 1.25, 1e-3);
    // The apply file itself is not changed.
    EXPECT_NEAR(*EvalChannel(dir / "wire/face.gltf", "jaw", 1, 20), 2.0, 1e-6);
    EXPECT_EQ(ReadFile(dir / "wire/face.gltf"), FaceSceneJson("faceScene"));
}

TEST_F(BatchTest, TheOutputPassesTheValidator) {
    ASSERT_EQ(Batch("VX_ROOT").status, 0);
    const std::string command = "node " CHIRRUP_SOURCE_DIR "/tools/validate-gltf.mjs " + Out() +
                                " > " + (dir / "validator.txt") + " 2>&1";
    if (!FileExists(CHIRRUP_SOURCE_DIR "/tools/validate-gltf.mjs"))
        GTEST_SKIP();
    EXPECT_EQ(std::system(command.c_str()), 0) << ReadFile(dir / "validator.txt");
}

TEST_F(BatchTest, ANamedDagAppliesBelowThatNode) {
    const RunResult r = Batch("head");
    EXPECT_EQ(r.err,
              Header("head") + "Applying mouth\nApplying turn\n  Storing to " + Out() + "\n");
    EXPECT_NEAR(*EvalChannel(Out(), "jaw", 1, 57), 2.0, 1e-4);
}

TEST_F(BatchTest, AFailingFirstKeysetStopsTheRestButStillStores) {
    const RunResult r = Batch("nothere");
    EXPECT_EQ(r.status, 0);
    EXPECT_EQ(r.err, Header("nothere") +
                         "Applying mouth\n"
                         "Cannot find base dag [nothere] for apply ...\n"
                         "There was an error\n"
                         "  Storing to " +
                         Out() + "\n");
    ASSERT_TRUE(FileExists(Out()));
    EXPECT_NEAR(*EvalChannel(Out(), "jaw", 1, 10), 1.0, 1e-4) << "the scene as it was read";
}

TEST_F(BatchTest, AKeysetFileWithoutKeysetsStoresNothing) {
    WriteFile(dir / "misc_data/empty.kset", "wire face.gltf\n");
    const RunResult r = Batch("VX_ROOT", "empty.kset");
    EXPECT_EQ(r.status, 0);
    EXPECT_EQ(r.err, Header("VX_ROOT", "empty.kset") +
                         "Failed to find keyset [mouth].\nFailed to find keyset [turn].\n"
                         "You must select one or more keysets to apply.\n");
    EXPECT_FALSE(FileExists(Out()));
}

TEST_F(BatchTest, AMissingSoundIsLoggedAndTheApplyGoesOn) {
    WriteFile(dir / "misc_data/s.track", std::string("sound gone.aiff\n") + kTrack);
    const RunResult r = Batch("VX_ROOT", "face.kset", "s.track");
    EXPECT_EQ(r.err, Header("VX_ROOT", "face.kset", "s.track") +
                         "Applying mouth\nApplying turn\n  Storing to " + Out() + "\n");
    EXPECT_THAT(Log(), HasSubstr("\n\nAudio file [" + (dir / "misc_data/gone.aiff") +
                                 "] does not exist.\n"));
    EXPECT_TRUE(FileExists(Out()));
}

TEST_F(BatchTest, ASoundThatExistsLengthensTheAppliedRange) {
    // Keys at 45 frames only make it in when the workspace lasts that long; a 4 s sound
    // (120 frames) does, and so does the track itself.
    WriteAiff(dir / "misc_data/d.aiff", 32000, 8000);
    WriteFile(dir / "misc_data/s.track", std::string("sound d.aiff\n") + kTrack);
    const RunResult r = Batch("VX_ROOT", "face.kset", "s.track");
    EXPECT_EQ(r.status, 0);
    EXPECT_THAT(Log(), Not(HasSubstr("Audio file")));
    EXPECT_NEAR(*EvalChannel(Out(), "jaw", 1, 57), 2.0, 1e-4);
}

TEST_F(BatchTest, AnUnknownKeysetInTheTrackIsOneLineAndTheOthersApply) {
    WriteFile(dir / "misc_data/u.track",
              std::string("begin keytrack lips\n    event 3 rest\nend\n") + kTrack);
    const RunResult r = Batch("VX_ROOT", "face.kset", "u.track");
    EXPECT_EQ(r.err, Header("VX_ROOT", "face.kset", "u.track") +
                         "Failed to find keyset [lips].\n"
                         "Applying mouth\nApplying turn\n  Storing to " +
                         Out() + "\n");
    EXPECT_NEAR(*EvalChannel(Out(), "lip", 2, 57), 6.0, 1e-4);
}

TEST_F(BatchTest, AMissingTrackStoresTheSceneWithoutNewKeys) {
    const RunResult r = Batch("VX_ROOT", "face.kset", "none.track");
    EXPECT_EQ(r.err, Header("VX_ROOT", "face.kset", "none.track") + "Failed to open track file [" +
                         (dir / "misc_data/none.track") + "].\n" +
                         "Applying mouth\nApplying turn\n  Storing to " + Out() + "\n");
    EXPECT_NEAR(*EvalChannel(Out(), "jaw", 1, 20), 2.0, 1e-4);
}

struct EndsEarly {
    const char* label;
    const char* keysets;  // null: the keyset file is missing
    const char* message;  // after the header; %W is the wire directory
};

class BatchEndsEarly : public BatchTest, public ::testing::WithParamInterface<EndsEarly> {};

TEST_P(BatchEndsEarly, TellsWhyAndWritesNothing) {
    const EndsEarly& e = GetParam();
    if (e.keysets)
        WriteFile(dir / "misc_data/x.kset", e.keysets);
    WriteFile(dir / "wire/notes.gltf", "{ not a scene");
    std::string message = e.message;
    if (message.find("%W") != std::string::npos)
        message.replace(message.find("%W"), 2, dir / "wire");
    if (message.find("%M") != std::string::npos)
        message.replace(message.find("%M"), 2, dir / "misc_data");
    const RunResult r = Batch("VX_ROOT", "x.kset");
    EXPECT_EQ(r.status, 0);
    EXPECT_EQ(r.err, Header("VX_ROOT", "x.kset") + message);
    EXPECT_FALSE(FileExists(Out()));
}

INSTANTIATE_TEST_SUITE_P(
    Messages, BatchEndsEarly,
    ::testing::Values(EndsEarly{"NoWireStatement", "begin keyset mouth\n key rest 0\nend\n",
                                "No wire file!\n"},
                      EndsEarly{"WireMissing", "wire gone.gltf\n",
                                "Could not read wire file %W/gone.gltf, cannot load keyset\n"},
                      EndsEarly{"WireNotAScene", "wire notes.gltf 0\n",
                                "Could not read wire file %W/notes.gltf, cannot load keyset\n"},
                      // Without keysets the run goes on to say there is nothing to apply.
                      EndsEarly{"KeysetFileMissing", nullptr,
                                "Failed to open keyset file [%M/x.kset].\n"
                                "Failed to find keyset [mouth].\nFailed to find keyset [turn].\n"
                                "You must select one or more keysets to apply.\n"}),
    [](const auto& info) { return std::string(info.param.label); });

TEST_F(BatchTest, AMissingApplyFileIsToldAndNothingIsStored) {
    const RunResult r = Batch("VX_ROOT", "face.kset", "t.track", "gone.gltf");
    EXPECT_EQ(r.status, 0);
    EXPECT_THAT(r.err, HasSubstr("Could not read apply file " + (dir / "wire/gone.gltf")));
    EXPECT_FALSE(FileExists(Out()));
}

TEST_F(BatchTest, AbsoluteNamesAreUsedAsTheyStand) {
    TempDir elsewhere;
    WriteFile(elsewhere / "k.kset",
              "wire " + (dir / "wire/face.gltf") + "\n" + std::string(kKeysets).substr(15));
    WriteFile(elsewhere / "t.track", kTrack);
    const std::string out = elsewhere / "o.glb";
    const RunResult r = RunChirrup({"-B", elsewhere / "t.track", dir / "wire/face.gltf", "VX_ROOT",
                                    "0", out, elsewhere / "k.kset"},
                                   dir / "work", {{"TESSEL_PROJECT", dir.path()}});
    EXPECT_THAT(r.err, HasSubstr("  Reading keyset " + (elsewhere / "k.kset") + "\n"));
    EXPECT_THAT(r.err, HasSubstr("  Storing to " + out + "\n"));
    EXPECT_NEAR(*EvalChannel(out, "jaw", 1, 30), 1.0, 1e-4) << "event 30 wide 0.5, offset 0";
}

TEST_F(BatchTest, WithoutAProjectNamesAreTakenFromTheWorkingDirectory) {
    for (const char* f : {"misc_data/face.kset", "misc_data/t.track"})
        std::filesystem::copy_file(dir / f,
                                   dir / ("work/" + std::filesystem::path(f).filename().string()));
    std::filesystem::copy_file(dir / "wire/face.gltf", dir / "work/face.gltf");
    const RunResult r = RunChirrup(
        {"-B", "t.track", "face.gltf", "VX_ROOT", "0", "o.gltf", "face.kset"}, dir / "work");
    EXPECT_EQ(r.err,
              "Batch mode.\n  Reading keyset face.kset\n  Reading track t.track\n"
              "  Reading apply file face.gltf\n  Applying to dag VX_ROOT with offset 0\n"
              "Applying mouth\nApplying turn\n  Storing to o.gltf\n");
    EXPECT_TRUE(FileExists(dir / "work/o.gltf"));
    EXPECT_TRUE(FileExists(dir / "work/errlog.vx"));
}

TEST_F(BatchTest, AnOutputThatCannotBeWrittenIsToldAndTheRunStillEnds) {
    const RunResult r =
        RunChirrup({"-B", "t.track", "face.gltf", "VX_ROOT", "0", "no-dir/o.gltf", "face.kset"},
                   dir / "work", {{"TESSEL_PROJECT", dir.path()}});
    EXPECT_EQ(r.status, 0);
    EXPECT_THAT(r.err, HasSubstr("  Storing to " + (dir / "wire/no-dir/o.gltf") + "\n"));
    EXPECT_THAT(r.err, HasSubstr("no-dir/o.gltf"));
    EXPECT_GT(r.err.size(), Header("VX_ROOT").size() + 60) << "a message after the storing line";
}

}  // namespace
