// Keyset description files: loading (interactively and in batch mode), every message, the
// recognizer blocks, verification, and saving back byte for byte.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>

#include "WorkspaceTestUtil.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "scene/KLKeyFrameList.h"
#include "toolkit/CuePrefs.h"
#include "toolkit/CueRecognizer.h"
#include "toolkit/CueTokenList.h"
#include "toolkit/KLErrHandler.h"
#include "workspace/Imp.h"

using namespace wstest;
using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

namespace {

// A recognizer compiled into the test, with targets "a" and "e" and a setting "gain".
class VowelRecognizer : public CueRecognizer {
  public:
    VowelRecognizer() : CueRecognizer("Vowel") {
        AddTarget("a");
        AddTarget("e");
    }
    float gain = 1.0f;
    bool Recognize(const CueSound&) override { return true; }
    CueRecognizer* Clone() const override { return new VowelRecognizer(); }

  protected:
    void ReadParameter(const CueTokenList& s) override {
        if (s.Matches("gain") && s.Count() == 2)
            gain = s.ArgFloat(1);
    }
    void WriteParameters(std::ostream& out) const override { out << "    gain " << gain << "\n"; }
};

// Collects the toolkit's reports while installed.
class Reports : public KLErrHandler {
  public:
    void Handle(KLErr* e) override {
        if (e->Level() >= KLErr::kWarning)
            text += e->Message();
    }
    std::string text;
};

const char* const kMouth =
    "begin keyset mouth\n"
    "    key rest 0\n"
    "    key open 10\n"
    "    key wide 20\n"
    "end\n";

// A project directory with the face scene in its wire directory; descriptions are written
// into its data directory, so that no project question is asked.
class KeysetTest : public ::testing::Test {
  protected:
    static void SetUpTestSuite() {
        theImp.recognizers.Register(std::make_unique<VowelRecognizer>());
    }
    void SetUp() override {
        for (const char* sub : {"misc_data", "wire", "pix"})
            std::filesystem::create_directory(dir / sub);
        WriteFile(dir / "wire/face.gltf", FaceSceneJson());
        ResetWorkspace();
        ghost.calls.clear();
    }
    void TearDown() override { ResetWorkspace(); }
    // Writes a description "wire face.gltf 0" + body into the data directory.
    std::string Describe(const std::string& body, const std::string& name = "face.kset") {
        const std::string path = dir / ("misc_data/" + name);
        WriteFile(path, "wire face.gltf 0\n\n" + body);
        return path;
    }
    std::string Saved(const std::string& name = "saved.kset") {
        const std::string path = dir / ("misc_data/" + name);
        EXPECT_EQ(theImp.SaveKeyset(path.c_str()), 1);
        return ReadFile(path);
    }

    TempDir dir;
    ScopedEnv project{"TESSEL_PROJECT", dir.path().c_str()};
    ScopedEnv misc{"TESSEL_MISC_DIR", nullptr};
    ScopedEnv pix{"TESSEL_USER_ERROR_READER", "true"};
    RecordingGhost ghost;
    GhostScope scope{&ghost};
};

TEST_F(KeysetTest, LoadReadsTheSceneAndExtractsTheChangingChannels) {
    ASSERT_EQ(theImp.LoadKeyset(Describe(kMouth).c_str()), 1);
    ASSERT_EQ(theImp.keysetCount, 1);
    KLKeySet* mouth = theImp.GetKeySet(0);
    EXPECT_STREQ(mouth->Name(), "mouth");
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
    EXPECT_EQ(mouth->keyShapes[2]->shapeValue, 2);
    EXPECT_NE(theImp.GetKeyTrack(0), nullptr);
    EXPECT_EQ(theImp.activeKeyset, 0);
    EXPECT_EQ(theImp.wireFile, "face.gltf");
    EXPECT_THAT(ghost.calls, ElementsAre("ClearKeysetMenu()", "ClearViews()", "ClearKeyTracks()",
                                         "InitKeyset(0)", "DressKeysetMenu()", "InitSound(null)",
                                         "InitMarkTrack(track)", "SetActiveKeyset(0)",
                                         "CenterKeyView()", "CenterMixView()", "MakeKeysetImages()",
                                         "SetMenuStatus()", "SetViewStatus()"));
}

TEST_F(KeysetTest, BatchLoadTouchesNoWindowAndLoadsNoGeometry) {
    theImp.batchMode = 1;
    ASSERT_EQ(theImp.LoadKeyset(Describe(kMouth).c_str()), 1);
    EXPECT_EQ(theImp.keysetCount, 1);
    for (const std::string& call : ghost.calls)
        EXPECT_THAT(call, ::testing::StartsWith("Clear")) << "only the workspace clear may call";
    EXPECT_EQ(theImp.batchStop, 0);
}

TEST_F(KeysetTest, ASecondLoadReplacesTheFirst) {
    ASSERT_EQ(theImp.LoadKeyset(Describe(kMouth).c_str()), 1);
    ASSERT_EQ(theImp.LoadKeyset(Describe("begin keyset other\n key a 0\n key b 10\nend\n").c_str()),
              1);
    EXPECT_EQ(theImp.keysetCount, 1);
    EXPECT_STREQ(theImp.GetKeySet(0)->Name(), "other");
    EXPECT_THAT(ghost.calls, Contains("ClearKeysets(0)"));
}

// --- failures: the message, the result, and what is left in the workspace

struct LoadFailure {
    const char* label;
    const char* description;  // null: the file does not exist
    int batch;
    const char* message;  // the Inform text, or the error-stream line in batch mode
    int batchStop;
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
        std::filesystem::create_directory(path);  // "": a directory of that name
    WriteFile(dir / "wire/text.gltf", "this is not a scene\n");
    std::string message = f.message;
    const std::string wires = dir / "wire";
    if (message.find("%W") != std::string::npos)
        message.replace(message.find("%W"), 2, wires);
    if (message.find("%P") != std::string::npos)
        message.replace(message.find("%P"), 2, path);

    theImp.batchMode = f.batch;
    testing::internal::CaptureStderr();
    EXPECT_EQ(theImp.LoadKeyset(path.c_str()), 0);
    const std::string err = testing::internal::GetCapturedStderr();
    if (f.batch) {
        EXPECT_EQ(err, message + "\n");
        EXPECT_THAT(ghost.Calls("Inform"), IsEmpty());
    } else {
        EXPECT_THAT(ghost.Calls("Inform"), ElementsAre("Inform(" + message + "|Dismiss)"));
    }
    EXPECT_EQ(theImp.batchStop, f.batchStop);
    // A file that cannot be opened leaves the previous workspace; any later failure empties it.
    const bool opened = f.description && *f.description;
    EXPECT_EQ(theImp.keysetCount, opened ? 0 : 1);
}

INSTANTIATE_TEST_SUITE_P(
    Messages, KeysetLoadFailure,
    ::testing::Values(
        LoadFailure{"Missing", nullptr, 0, "Failed to open keyset file [%P].", 0},
        LoadFailure{"MissingBatch", nullptr, 1, "Failed to open keyset file [%P].", 0},
        LoadFailure{"Directory", "", 0, "Failed to open keyset file [%P].", 0},
        LoadFailure{"NoWire", kMouth, 0, "Could not read wire file, cannot load keyset", 0},
        LoadFailure{"NoWireBatch", kMouth, 1, "No wire file!", 1},
        LoadFailure{"WireMissing", "wire gone.gltf\nbegin keyset m\nend\n", 0,
                    "Could not read wire file, cannot load keyset", 0},
        LoadFailure{"WireMissingBatch", "wire gone.gltf\n", 1,
                    "Could not read wire file %W/gone.gltf, cannot load keyset", 1},
        LoadFailure{"WireNotAScene", "wire text.gltf 3\n", 0,
                    "Could not read wire file, cannot load keyset", 0},
        LoadFailure{"WireNotASceneBatch", "wire text.gltf 3\n", 1,
                    "Could not read wire file %W/text.gltf, cannot load keyset", 1}),
    [](const auto& info) { return std::string(info.param.label); });

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

TEST_F(KeysetTest, ShapeSetsTakeTheirRangeOrZeroToOne) {
    ASSERT_EQ(theImp.LoadKeyset(Describe("begin shapeset brow jaw 4\n key up 0.5\nend\n"
                                         "begin shapeset \"lip roll\" lip 2 -1.5 2.5\nend\n")
                                    .c_str()),
              1);
    ASSERT_EQ(theImp.keysetCount, 2);
    KLKeySet* brow = theImp.GetKeySet(0);
    EXPECT_EQ(brow->kind, 2);
    EXPECT_EQ(*brow->nodeName, "jaw");
    EXPECT_EQ(brow->channelIndex, 4);
    EXPECT_EQ(brow->lowValue, 0.0f);
    EXPECT_EQ(brow->highValue, 1.0f);
    EXPECT_FLOAT_EQ(brow->keyShapes[0]->frame, 0.5f);
    KLKeySet* roll = theImp.GetKeySet(1);
    EXPECT_STREQ(roll->Name(), "lip roll");
    EXPECT_EQ(roll->lowValue, -1.5f);
    EXPECT_EQ(roll->highValue, 2.5f);
    EXPECT_THAT(theImp.keyFrames->Frames(), IsEmpty()) << "shape sets hold no scene frames";
}

TEST_F(KeysetTest, RecognizerBlocksAttachSettingsAndLinks) {
    ASSERT_EQ(
        theImp.LoadKeyset(Describe(std::string(kMouth) +
                                   "begin recognizer Vowel mouth\n    step 2\n    gain 0.5\nend\n"
                                   "begin recognizer-links Vowel mouth\n    link e to wide\nend\n")
                              .c_str()),
        1);
    auto* vowel = dynamic_cast<VowelRecognizer*>(theImp.GetKeySet(0)->GetRecognizer("Vowel"));
    ASSERT_NE(vowel, nullptr);
    EXPECT_EQ(vowel->gain, 0.5f);
    EXPECT_EQ(vowel->step, CueTime::FromFrames(2));
    EXPECT_EQ(vowel->FindTarget("a")->keyShapeIndex, -1);
    EXPECT_EQ(vowel->FindTarget("e")->keyShapeIndex, 2);
    EXPECT_THAT(ghost.Calls("Inform"), IsEmpty());
}

struct RecognizerFailure {
    const char* label;
    const char* blocks;
    const char* message;
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

INSTANTIATE_TEST_SUITE_P(
    Messages, KeysetRecognizerFailure,
    ::testing::Values(
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
    [](const auto& info) { return std::string(info.param.label); });

TEST_F(KeysetTest, InBatchModeTheMessagesGoToTheErrorStream) {
    theImp.batchMode = 1;
    testing::internal::CaptureStderr();
    ASSERT_EQ(theImp.LoadKeyset(
                  Describe(std::string(kMouth) + "begin recognizer Nope mouth\nend\n").c_str()),
              1);
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "Failed to find recognizer plugin [Nope].\n");
    EXPECT_THAT(ghost.Calls("Inform"), IsEmpty());
}

// --- verification

TEST_F(KeysetTest, KeysetsDrivingOneChannelAreReportedFromBothSides) {
    // "lips" samples lip only; between its frames 10 and 20 only lip TX changes.
    const std::string body =
        std::string(kMouth) + "begin keyset lips lip\n key half 10\n key full 20\nend\n";
    ghost.confirmAnswer = 0;
    Reports reports;
    ASSERT_EQ(theImp.LoadKeyset(Describe(body).c_str()), 1) << "the load still succeeds";
    EXPECT_EQ(reports.text,
              "Dag [lip] channel [TX] is found in keysets [mouth] and [lips]\n"
              "Dag [lip] channel [TX] is found in keysets [lips] and [mouth]\n"
              "Keyset verification revealed some problems.\n");
    EXPECT_THAT(ghost.Calls("Confirm"),
                ElementsAre("Confirm(Keyset verification revealed some problems.|View Error "
                            "Log|Dismiss)"));
    EXPECT_THAT(ghost.Calls("ClearErrorFlag"), IsEmpty()) << "Dismiss does not open the log";
    EXPECT_EQ(theImp.VerifyKeysets(), 0);
}

TEST_F(KeysetTest, ViewErrorLogIsOfferedAfterAFailedVerification) {
    theImp.SetErrorFilename((dir / "errlog.vx").c_str());
    ghost.confirmAnswer = 1;
    const std::string body = std::string(kMouth) + "begin keyset again\n key a 0\n key b 20\nend\n";
    ASSERT_EQ(theImp.LoadKeyset(Describe(body).c_str()), 1);
    EXPECT_THAT(ghost.Calls("ClearErrorFlag"), ElementsAre("ClearErrorFlag()"));
    EXPECT_THAT(ReadFile(dir / "errlog.vx"),
                HasSubstr("Keyset verification revealed some problems.\n\n-----"));
}

TEST_F(KeysetTest, BatchVerificationFailureIsOneLine) {
    theImp.batchMode = 1;
    const std::string body = std::string(kMouth) + "begin keyset again\n key a 0\n key b 20\nend\n";
    testing::internal::CaptureStderr();
    ASSERT_EQ(theImp.LoadKeyset(Describe(body).c_str()), 1);
    EXPECT_THAT(testing::internal::GetCapturedStderr(),
                HasSubstr("Keyset verification revealed some problems.\n"));
    EXPECT_THAT(ghost.Calls("Confirm"), IsEmpty());
}

TEST_F(KeysetTest, NoKeysetsVerifyClean) {
    KLErrHandler::outputLevel = KLErr::kStatus;
    struct All : KLErrHandler {
        void Handle(KLErr* e) override { text += e->Message(); }
        std::string text;
    } all;
    EXPECT_EQ(theImp.VerifyKeysets(), 1);
    KLErrHandler::outputLevel = KLErrHandler::kDefaultOutputLevel;
    EXPECT_EQ(all.text, "Verifying keysets ...\nKeysets are OK.\n");
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
}

TEST_F(KeysetTest, ADescriptionOutsideAnyDataDirectoryLeavesTheProject) {
    WriteFile(dir / "loose.kset", "wire face.gltf\n" + std::string(kMouth));
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
                                         "begin recognizer Vowel \"big mouth\"\n gain 3\nend\n"
                                         "begin recognizer-links Vowel \"big mouth\"\n"
                                         " link a to rest\nend\n")
                                    .c_str()),
              1);
    EXPECT_EQ(theImp.GetKeySet(0)->defaultIndex, 1) << "the rest pose is at the wire frame";
    EXPECT_EQ(Saved(),
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
}

TEST_F(KeysetTest, AFileThatCannotBeCreatedIsRefusedSilently) {
    ASSERT_EQ(theImp.LoadKeyset(Describe(kMouth).c_str()), 1);
    ghost.calls.clear();
    theImp.keysetModified = 1;
    EXPECT_EQ(theImp.SaveKeyset((dir / "no-such-dir/x.kset").c_str()), 0);
    EXPECT_EQ(theImp.keysetModified, 1);
    EXPECT_THAT(ghost.calls, IsEmpty());
}

}  // namespace

namespace {

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
        theImp.batchMode = 1;
        testing::internal::CaptureStderr();
        EXPECT_EQ(theImp.LoadKeyset(Describe(body).c_str()), 1) << body.substr(0, 40);
        testing::internal::GetCapturedStderr();
        EXPECT_EQ(theImp.keysetCount, keysets) << body.substr(0, 40);
        for (int i = 0; i < theImp.keysetCount; ++i)
            EXPECT_NE(theImp.GetKeyTrack(i), nullptr);
        EXPECT_EQ(theImp.SaveKeyset((dir / "misc_data/after.kset").c_str()), 1);
    }
}

}  // namespace
