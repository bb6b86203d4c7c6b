// Keyset description files: loading (interactively and in batch mode), every message, the
// recognizer blocks, verification, the project check, and saving back byte for byte.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>

#include "WorkspaceTestUtil.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "scene/KLKeyFrameList.h"
#include "toolkit/CuePrefs.h"
#include "workspace/Imp.h"

using namespace wstest;
using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

namespace {

class KeysetTest : public ProjectTest {
  protected:
    static void SetUpTestSuite() {
        theImp.recognizers.Register(std::make_unique<VowelRecognizer>());
    }
    // Writes "wire face.gltf 0" + body into the data directory.
    std::string Describe(const std::string& body, const std::string& name = "face.kset") {
        return Data(name, "wire face.gltf 0\n\n" + body);
    }
    std::string Saved(const std::string& name) {
        const std::string path = dir / ("misc_data/" + name);
        EXPECT_EQ(theImp.SaveKeyset(path.c_str()), 1);
        return ReadFile(path);
    }
};

TEST_F(KeysetTest, LoadReadsTheSceneAndExtractsTheChangingChannels) {
    ASSERT_EQ(theImp.LoadKeyset(Describe(kMouth).c_str()), 1);
    ASSERT_EQ(theImp.keysetCount, 1);
    KLKeySet* mouth = theImp.GetKeySet(0);
    EXPECT_EQ(mouth->keyShapeCount, 3);
    std::vector<std::string> channels;
    for (KLKeyChannel* c : mouth->keyChannels)
        channels.push_back(std::string(c->Name()) + "." + c->GetChannelName());
    std::sort(channels.begin(), channels.end());
    EXPECT_THAT(channels, ElementsAre("jaw.TY", "lip.TX", "lip.TZ"));
    EXPECT_FLOAT_EQ(mouth->GetKeyChannel("jaw", 1)->Get(2), 2.0f);
    ASSERT_NE(theImp.keyFrames, nullptr);
    EXPECT_THAT(theImp.keyFrames->Frames(), ElementsAre(0, 10, 20));
    EXPECT_EQ(mouth->keyFrameList, theImp.keyFrames.get());
    EXPECT_NE(theImp.GetKeyTrack(0), nullptr);
    EXPECT_EQ(theImp.activeKeyset, 0);
    EXPECT_EQ(theImp.wireFile, "face.gltf");
    EXPECT_THAT(ghost.calls, ElementsAre("ClearKeysetMenu()", "ClearViews()", "ClearKeyTracks()",
                                         "InitKeyset(0)", "DressKeysetMenu()", "InitSound(null)",
                                         "InitMarkTrack(track)", "SetActiveKeyset(0)",
                                         "CenterKeyView()", "CenterMixView()", "MakeKeysetImages()",
                                         "SetMenuStatus()", "SetViewStatus()"));
}

TEST_F(KeysetTest, ABatchLoadReplacesTheKeysetsAndTouchesOnlyTheClearing) {
    theImp.batchMode = 1;
    ASSERT_EQ(theImp.LoadKeyset(Describe(kMouth).c_str()), 1);
    ASSERT_EQ(theImp.LoadKeyset(Describe("begin keyset other\n key a 0\n key b 10\nend\n").c_str()),
              1);
    EXPECT_EQ(theImp.keysetCount, 1);
    EXPECT_STREQ(theImp.GetKeySet(0)->Name(), "other");
    EXPECT_THAT(ghost.calls, Contains("ClearKeysets(0)"));
    for (const std::string& call : ghost.calls)
        EXPECT_THAT(call, ::testing::StartsWith("Clear")) << "only the workspace clear may call";
    EXPECT_EQ(theImp.batchStop, 0);
}

// --- failures: the message, the result, and what is left in the workspace

struct LoadFailure {
    const char* label;
    const char* description;  // null: the file does not exist; "": a directory of that name
    const char* message;      // told through the window (the program's batch runs cover the rest)
    friend void PrintTo(const LoadFailure& f, std::ostream* os) { *os << f.label; }
};
class KeysetLoadFailure : public KeysetTest, public ::testing::WithParamInterface<LoadFailure> {};

TEST_P(KeysetLoadFailure, ReportsAndLeavesTheWorkspaceAsDefined) {
    const LoadFailure& f = GetParam();
    ASSERT_EQ(theImp.LoadKeyset(Describe(kMouth, "good.kset").c_str()), 1);
    ghost.calls.clear();
    const std::string path = dir / "misc_data/bad.kset";
    if (f.description && *f.description)
        WriteFile(path, f.description);
    else if (f.description)
        std::filesystem::create_directory(path);
    WriteFile(dir / "wire/text.gltf", "this is not a scene\n");
    EXPECT_EQ(StdErr([&] { EXPECT_EQ(theImp.LoadKeyset(path.c_str()), 0); }), "");
    EXPECT_THAT(ghost.Calls("Inform"), ElementsAre("Inform(" + Fill(f.message) + "|Dismiss)"));
    EXPECT_EQ(theImp.batchStop, 0);
    // A file that cannot be opened leaves the previous workspace; any later failure empties it.
    EXPECT_EQ(theImp.keysetCount, f.description && *f.description ? 0 : 1);
}

// clang-format off
INSTANTIATE_TEST_SUITE_P(Messages, KeysetLoadFailure, ::testing::Values(
    LoadFailure{"Missing", nullptr, "Failed to open keyset file [%M/bad.kset]."},
    LoadFailure{"Directory", "", "Failed to open keyset file [%M/bad.kset]."},
    LoadFailure{"NoWire", kMouth, "Could not read wire file, cannot load keyset"},
    LoadFailure{"WireMissing", "wire gone.gltf\nbegin keyset m\nend\n",
                "Could not read wire file, cannot load keyset"},
    LoadFailure{"WireNotAScene", "wire text.gltf 3\n",
                "Could not read wire file, cannot load keyset"}),
    ByLabel());
// clang-format on

TEST_F(KeysetTest, AnEleventhKeysetIsRefusedAndItsBlockSkipped) {
    std::string body;
    for (int i = 0; i < 10; ++i)
        body += "begin keyset k" + std::to_string(i) + "\n key a 0\nend\n";
    // If the refused block were not skipped, its wire line would point at a missing scene.
    body += "begin keyset eleven\n wire missing.gltf\n key a 0\nend\n";
    body += "begin shapeset twelve head 1\nend\n";
    Reports reports;
    ASSERT_EQ(theImp.LoadKeyset(Describe(body).c_str()), 1);
    EXPECT_EQ(theImp.keysetCount, 10);
    EXPECT_EQ(theImp.GetKeySetId("eleven"), -1);
    EXPECT_EQ(theImp.wireFile, "face.gltf");
    EXPECT_EQ(reports.text, "Maximum keysets [10] reached.Maximum keysets [10] reached.");
}

TEST_F(KeysetTest, AKeysetOverANodeNotInTheSceneHasNoChannels) {
    Reports reports;
    ASSERT_EQ(BatchLoadKeyset(Describe("begin keyset lips nosuch\n key a 0\n key b 10\nend\n")), 1);
    EXPECT_THAT(reports.text,
                HasSubstr("Keyset [lips]: no node [nosuch] in the wire file, no key channels.\n"));
    EXPECT_TRUE(theImp.GetKeySet(0)->keyChannels.empty());
}

struct RecognizerFailure {
    const char* label;
    const char* blocks;
    const char* message;
    friend void PrintTo(const RecognizerFailure& f, std::ostream* os) { *os << f.label; }
};
class KeysetRecognizerFailure : public KeysetTest,
                                public ::testing::WithParamInterface<RecognizerFailure> {};

// Every failure is told, and the statements after the bad block are still read: the keyset
// "after" must load.
TEST_P(KeysetRecognizerFailure, IsToldAndLoadingGoesOn) {
    const RecognizerFailure& f = GetParam();
    ASSERT_EQ(
        theImp.LoadKeyset(Describe(std::string(kMouth) + "begin recognizer Vowel mouth\nend\n" +
                                   f.blocks + "begin keyset after\n key x 0\nend\n")
                              .c_str()),
        1);
    EXPECT_THAT(ghost.Calls("Inform"),
                ElementsAre(std::string("Inform(") + f.message + "|Dismiss)"));
    EXPECT_EQ(theImp.GetKeySetId("after"), 1);
}

// clang-format off
INSTANTIATE_TEST_SUITE_P(Messages, KeysetRecognizerFailure, ::testing::Values(
    RecognizerFailure{"SettingsForUnknownKeyset", "begin recognizer Vowel lips\nend\n",
                      "Failed to find key set [lips]."},
    RecognizerFailure{"UnknownPlugin", "begin recognizer Nope mouth\n step 3\nend\n",
                      "Failed to find recognizer plugin [Nope]."},
    RecognizerFailure{"LinksForUnknownKeyset",
                      "begin recognizer-links Vowel lips\n link a to rest\nend\n",
                      "Failed to find keyset [lips]."},
    // Not consumed: its link lines and its end are skipped at the top level.
    RecognizerFailure{"LinksForRecognizerNotOnTheKeyset",
                      "begin recognizer-links Other mouth\n link a to rest\nend\n",
                      "Failed to find recognizer [Other]."},
    RecognizerFailure{"UnknownTarget",
                      "begin recognizer-links Vowel mouth\n link zz to rest\nend\n",
                      "Failed to find target [zz] for recognizer [Vowel]."},
    RecognizerFailure{"UnknownKey",
                      "begin recognizer-links Vowel mouth\n link a to nokey\nend\n",
                      "Failed to find key [nokey] for recognizer [Vowel]."}),
    ByLabel());
// clang-format on

// --- verification: "lips" samples lip only; between its frames 10 and 20 only lip TX changes

TEST_F(KeysetTest, KeysetsDrivingOneChannelAreReportedAndTheLogOffered) {
    const std::string path =
        Describe(std::string(kMouth) + "begin keyset lips lip\n key half 10\n key full 20\nend\n");
    const char* const failed = "Keyset verification revealed some problems.";
    {
        ghost.confirmAnswer = 0;
        Reports reports;
        ASSERT_EQ(theImp.LoadKeyset(path.c_str()), 1) << "the load still succeeds";
        EXPECT_EQ(reports.text,
                  "Dag [lip] channel [TX] is found in keysets [mouth] and [lips]\n"
                  "Dag [lip] channel [TX] is found in keysets [lips] and [mouth]\n" +
                      std::string(failed) + "\n");
        EXPECT_THAT(ghost.Calls("Confirm"),
                    ElementsAre(std::string("Confirm(") + failed + "|View Error Log|Dismiss)"));
        EXPECT_THAT(ghost.Calls("ClearErrorFlag"), IsEmpty()) << "Dismiss does not open the log";
        EXPECT_EQ(theImp.VerifyKeysets(), 0);
    }
    theImp.SetErrorFilename((dir / "errlog.vx").c_str());
    ghost.confirmAnswer = 1;
    ghost.calls.clear();
    ASSERT_EQ(theImp.LoadKeyset(path.c_str()), 1);
    EXPECT_THAT(ghost.Calls("ClearErrorFlag"), ElementsAre("ClearErrorFlag()"));
    EXPECT_THAT(ReadFile(dir / "errlog.vx"), HasSubstr(std::string(failed) + "\n\n-----"));

    ghost.calls.clear();
    theImp.batchMode = 1;
    EXPECT_THAT(StdErr([&] { ASSERT_EQ(theImp.LoadKeyset(path.c_str()), 1); }),
                HasSubstr(std::string(failed) + "\n"));
    EXPECT_THAT(ghost.Calls("Confirm"), IsEmpty());
}

// --- project check

TEST_F(KeysetTest, ADescriptionInAnotherProjectsDataDirectoryOffersToSwitch) {
    TempDir other;
    std::filesystem::create_directories(other / "misc_data");
    WriteFile(other / "misc_data/x.kset", "wire " + (dir / "wire/face.gltf") + "\n" + kMouth);
    const std::string otherProject = std::filesystem::canonical(other.path()).string();
    for (int answer : {0, 1}) {
        ghost.calls.clear();
        ghost.confirmAnswer = answer;
        ASSERT_EQ(theImp.LoadKeyset((other / "misc_data/x.kset").c_str()), 1);
        EXPECT_THAT(ghost.Calls("Confirm"), ElementsAre("Confirm(Change TESSEL_PROJECT to [" +
                                                        otherProject + "]?|Change|Don't Change)"));
        EXPECT_EQ(ghost.Calls("ResetFileManagers").size(), size_t(answer));
        EXPECT_STREQ(CuePrefs::Project(), answer ? otherProject.c_str() : dir.path().c_str());
    }
    ScopedEnv back("TESSEL_PROJECT", dir.path().c_str());
    ghost.calls.clear();
    WriteFile(dir / "loose.kset", std::string("wire face.gltf\n") + kMouth);
    ASSERT_EQ(theImp.LoadKeyset((dir / "loose.kset").c_str()), 1);
    EXPECT_THAT(ghost.Calls("Inform"),
                ElementsAre("Inform(Can't determine new TESSEL_PROJECT, unchanged|OK)"));
    EXPECT_STREQ(CuePrefs::Project(), dir.path().c_str());
}

// --- saving

TEST_F(KeysetTest, SaveWritesTheDescriptionGrammar) {
    ASSERT_EQ(theImp.LoadKeyset(Describe("wire face.gltf 12\n"
                                         "begin keyset \"big mouth\"\n key \"wide open\" 20\n"
                                         " key rest 12\nend\n"
                                         "begin shapeset brow jaw 4 0.25 2\n key up 0.5\nend\n"
                                         "begin shapeset lid lip 8\nend\n"
                                         "begin recognizer Vowel \"big mouth\"\n gain 3\nend\n"
                                         "begin recognizer-links Vowel \"big mouth\"\n"
                                         " link a to rest\nend\n")
                                    .c_str()),
              1);
    EXPECT_EQ(theImp.GetKeySet(0)->defaultIndex, 1) << "the rest pose is at the wire frame";
    theImp.keysetModified = 1;
    EXPECT_EQ(Saved("saved.kset"),
              "wire face.gltf 12\n\n"
              "begin keyset \"big mouth\"\n"
              "    key \"wide open\" 20 \"big mouth.0020.sgi\"\n"
              "    key rest 12 \"big mouth.0012.sgi\"\n"
              "end\n\n"
              "begin recognizer Vowel \"big mouth\"\n"
              "    step 1\n    target a\n    target e\n    gain 3\n"
              "end\n\n"
              "begin recognizer-links Vowel \"big mouth\"\n"
              "    link a to rest\n"
              "end\n\n"
              "begin shapeset brow jaw 4 0.25 2\n"
              "    key up 0.5 brow.0000.sgi\n"
              "end\n\n"
              "begin shapeset lid lip 8 0 1\n"
              "end\n\n");
    EXPECT_EQ(theImp.keysetModified, 0);
}

TEST_F(KeysetTest, SaveLoadSaveIsByteIdentical) {
    ASSERT_EQ(theImp.LoadKeyset(
                  Describe(std::string(kMouth) +
                           "begin keyset \"tab\tname\" lip\n key \"a b\" 10\n key c 20\nend\n"
                           "begin shapeset \"lid\" lip 8\n key shut 0\n key open 1.5\nend\n"
                           "begin recognizer Vowel mouth\n step 4\nend\n"
                           "begin recognizer-links Vowel mouth\n link a to open\n"
                           " link e to wide\nend\n")
                      .c_str()),
              1);
    const std::string first = Saved("first.kset");
    ASSERT_EQ(theImp.LoadKeyset((dir / "misc_data/first.kset").c_str()), 1);
    EXPECT_EQ(theImp.keysetCount, 3);
    EXPECT_EQ(Saved("second.kset"), first);

    ghost.calls.clear();
    theImp.keysetModified = 1;
    EXPECT_EQ(theImp.SaveKeyset((dir / "no-such-dir/x.kset").c_str()), 0);
    EXPECT_EQ(theImp.keysetModified, 1);
    EXPECT_THAT(ghost.calls, IsEmpty()) << "refused silently";
}

// Damaged descriptions load what they can and never leave a keyset without its track.
TEST_F(KeysetTest, DamagedDescriptionsLoadWhatTheyCan) {
    static const char binary[] = "\0\x01\xff\"begin keyset\t\"\n";
    const std::string junk(binary, sizeof binary - 1);
    const std::vector<std::pair<std::string, int>> cases = {
        {"begin keyset unterminated\n key a 0\n key b 10\n", 1},
        {"begin keyset\n key a 0\nend\n", 0},  // no name: not a keyset statement
        {"begin keyset \"open quote\n key a 0\nend\n", 1},
        {"begin shapeset s jaw\nend\n", 0},  // too few tokens
        {"begin recognizer-links Vowel\n", 0},
        {junk + std::string(300000, 'k') + "\nbegin keyset late\nend\n", 1},
        {"end\nend\nbegin keyset m\n key a 1e40\n key b -5\n key c nan\nend\n", 1},
    };
    for (const auto& [body, keysets] : cases) {
        EXPECT_EQ(BatchLoadKeyset(Describe(body)), 1) << body.substr(0, 40);
        EXPECT_EQ(theImp.keysetCount, keysets) << body.substr(0, 40);
        for (int i = 0; i < theImp.keysetCount; ++i)
            EXPECT_NE(theImp.GetKeyTrack(i), nullptr);
        EXPECT_EQ(theImp.SaveKeyset((dir / "misc_data/after.kset").c_str()), 1);
    }
}

}  // namespace
