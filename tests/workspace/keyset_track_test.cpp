// Keyset description files and track files: loading with its messages, recognizer blocks,
// verification, saving back byte for byte, the sound and the duration.
#include <gtest/gtest.h>

#include <cmath>
#include <filesystem>

#include "WorkspaceTestUtil.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "model/KLMarkTrack.h"
#include "scene/KLKeyFrameList.h"
#include "toolkit/CueSound.h"
#include "workspace/Imp.h"

using namespace wstest;

namespace {

class KeysetTest : public ProjectTest {
  protected:
    static void SetUpTestSuite() {
        theImp.recognizers.Register(std::make_unique<VowelRecognizer>());
    }
    std::string Describe(const std::string& body, const std::string& name = "face.kset") {
        return Data(name, "wire face.gltf 0\n\n" + body);
    }
    std::string Saved(const std::string& name) {
        const std::string path = dir / ("misc_data/" + name);
        EXPECT_EQ(theImp.SaveKeyset(path.c_str()), 1);
        return ReadFile(path);
    }
};

TEST_F(KeysetTest, LoadExtractsTheChangingChannelsAndABatchLoadOnlyClears) {
    ASSERT_EQ(theImp.LoadKeyset(Describe(kMouth).c_str()), 1);
    ASSERT_EQ(theImp.keysetCount, 1);
    KLKeySet* mouth = theImp.GetKeySet(0);
    EXPECT_EQ(mouth->keyShapeCount, 3);
    std::vector<std::string> channels;
    for (const auto& c : mouth->keyChannels)
        channels.push_back(std::string(c->Name()) + "." + c->GetChannelName());
    std::sort(channels.begin(), channels.end());
    EXPECT_THAT(channels, ElementsAre("jaw.TY", "lip.TX", "lip.TZ"));
    EXPECT_FLOAT_EQ(mouth->GetKeyChannel("jaw", 1)->Get(2), 2.0f);
    EXPECT_THAT(ghost.Calls("SetActiveKeyset"), ElementsAre("SetActiveKeyset(0)"));
    ghost.calls.clear();
    theImp.batchMode = 1;
    ASSERT_EQ(theImp.LoadKeyset(Describe("begin keyset other\n key a 0\nend\n").c_str()), 1);
    EXPECT_EQ(theImp.keysetCount, 1);
    EXPECT_STREQ(theImp.GetKeySet(0)->Name(), "other");
    EXPECT_THAT(ghost.calls, ElementsAre("ClearKeysetMenu()", "ClearViews()", "ClearKeyTracks()",
                                         "ClearKeysets(0)"));
}

// A file that cannot be opened leaves the previous workspace; any later failure empties it.
TEST_F(KeysetTest, LoadFailuresAreToldAndLeaveTheWorkspaceAsDefined) {
    const std::string path = dir / "misc_data/bad.kset";
    WriteFile(dir / "wire/text.gltf", "this is not a scene\n");
    const char* const noWire = "Could not read wire file, cannot load keyset";
    // The description written, null: no such file.
    for (const auto& [description, message] : std::vector<std::pair<const char*, std::string>>{
             {nullptr, Fill("Failed to open keyset file [%M/bad.kset].")},
             {kMouth, noWire},
             {"wire text.gltf 3\n", noWire}}) {
        ASSERT_EQ(theImp.LoadKeyset(Describe(kMouth, "good.kset").c_str()), 1);
        std::filesystem::remove(path);
        if (description)
            WriteFile(path, description);
        ghost.calls.clear();
        EXPECT_EQ(StdErr([&] { EXPECT_EQ(theImp.LoadKeyset(path.c_str()), 0); }), "");
        EXPECT_THAT(ghost.Calls("Inform"), ElementsAre("Inform(" + message + "|Dismiss)"));
        EXPECT_EQ(theImp.keysetCount, description ? 0 : 1);
    }
}

// The first keyset samples a node the scene lacks: told once all are read, no channels.
TEST_F(KeysetTest, AnEleventhKeysetIsRefusedAndItsBlockSkipped) {
    std::string body = "begin keyset lips nosuch\n key a 0\n key b 10\nend\n";
    for (int i = 1; i < 10; ++i)
        body += "begin keyset k" + std::to_string(i) + "\n key a 0\nend\n";
    // If the refused block were not skipped, its wire line would point at a missing scene.
    body += "begin keyset eleven\n wire missing.gltf\n key a 0\nend\n";
    body += "begin shapeset twelve head 1\nend\n";
    Reports reports;
    ASSERT_EQ(theImp.LoadKeyset(Describe(body).c_str()), 1);
    EXPECT_EQ(theImp.keysetCount, 10);
    EXPECT_EQ(theImp.wireFile, "face.gltf");
    EXPECT_EQ(reports.text,
              "Maximum keysets [10] reached.Maximum keysets [10] reached."
              "Keyset [lips]: no node [nosuch] in the wire file, no key channels.\n");
    EXPECT_TRUE(theImp.GetKeySet(0)->keyChannels.empty());
}

// Every failure is told, and the statements after the bad block are still read.
TEST_F(KeysetTest, RecognizerBlockFailuresAreToldAndLoadingGoesOn) {
    const std::vector<std::pair<const char*, const char*>> rows = {
        {"begin recognizer Vowel lips\nend\n", "Failed to find key set [lips]."},
        {"begin recognizer Nope mouth\n step 3\nend\n", "Failed to find recognizer plugin [Nope]."},
        // Not consumed: its link lines and its end are skipped at the top level.
        {"begin recognizer-links Other mouth\n link a to rest\nend\n",
         "Failed to find recognizer [Other]."},
        {"begin recognizer-links Vowel mouth\n link zz to rest\nend\n",
         "Failed to find target [zz] for recognizer [Vowel]."}};
    for (const auto& [blocks, message] : rows) {
        ghost.calls.clear();
        ASSERT_EQ(
            theImp.LoadKeyset(Describe(std::string(kMouth) + "begin recognizer Vowel mouth\nend\n" +
                                       blocks + "begin keyset after\n key x 0\nend\n")
                                  .c_str()),
            1);
        EXPECT_THAT(ghost.Calls("Inform"),
                    ElementsAre(std::string("Inform(") + message + "|Dismiss)"));
        EXPECT_EQ(theImp.GetKeySetId("after"), 1) << blocks;
    }
}

// "lips" samples lip only; between its frames 10 and 20 only lip TX changes, as in "mouth".
TEST_F(KeysetTest, KeysetsDrivingOneChannelAreReported) {
    const std::string path =
        Describe(std::string(kMouth) + "begin keyset lips lip\n key half 10\n key full 20\nend\n");
    const std::string failed = "Keyset verification revealed some problems.";
    ghost.confirmAnswer = 0;
    Reports reports;
    ASSERT_EQ(theImp.LoadKeyset(path.c_str()), 1) << "the load still succeeds";
    EXPECT_EQ(reports.text,
              "Dag [lip] channel [TX] is found in keysets [mouth] and [lips]\n"
              "Dag [lip] channel [TX] is found in keysets [lips] and [mouth]\n" +
                  failed + "\n");
    EXPECT_THAT(ghost.Calls("Confirm"),
                ElementsAre("Confirm(" + failed + "|View Error Log|Dismiss)"));
    EXPECT_THAT(ghost.Calls("ClearErrorFlag"), IsEmpty()) << "Dismiss does not open the log";
}

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

// A scene name with a blank, names with tabs, numbers whose six-digit form reads back as
// another float: saved, loaded and saved again, the file is the same and so is every value.
TEST_F(KeysetTest, SaveLoadSaveIsByteIdenticalAndAFailedSaveKeepsTheChanges) {
    std::filesystem::copy_file(dir / "wire/face.gltf", dir / "wire/my face.gltf");
    ASSERT_EQ(
        BatchLoadKeyset(Data("face.kset",
                             "wire \"my face.gltf\" 0.1234567\n" + std::string(kMouth) +
                                 "begin keyset \"tab\tname\" lip\n key \"a b\" 10\n key c 20\nend\n"
                                 "begin shapeset lid lip 8 1e-7 123456.7\n key shut -0.0\n"
                                 " key half 0.1234567\n key far 123456.7\n key tiny 1e-7\nend\n"
                                 "begin recognizer Vowel mouth\n step 4\nend\n"
                                 "begin recognizer-links Vowel mouth\n link a to open\n"
                                 " link e to wide\nend\n")),
        1);
    const std::string first = Saved("first.kset");
    ASSERT_EQ(BatchLoadKeyset(dir / "misc_data/first.kset"), 1) << first;
    EXPECT_EQ(theImp.keysetCount, 3);
    EXPECT_EQ(theImp.wireFile, "my face.gltf");
    EXPECT_EQ(theImp.wireFrame, 0.1234567f);
    const KLKeySet* lid = theImp.GetKeySet("lid");
    ASSERT_NE(lid, nullptr);
    EXPECT_TRUE(lid->lowValue == 1e-7f && lid->highValue == 123456.7f);
    std::vector<float> frames;
    for (const auto& key : lid->keyShapes)
        frames.push_back(key->frame);
    EXPECT_THAT(frames, ElementsAre(0.0f, 0.1234567f, 123456.7f, 1e-7f));
    EXPECT_TRUE(std::signbit(frames[0])) << "-0 stays negative zero";
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
    const std::vector<std::pair<std::string, int>> cases = {
        {"begin keyset unterminated\n key a 0\n key b 10\n", 1},
        {"begin keyset \"open quote\n key a 0\nend\n", 1},
        {"begin shapeset s jaw\nend\n", 0},  // too few tokens
        {std::string(binary, sizeof binary - 1) + std::string(300000, 'k') +
             "\nbegin keyset late\nend\n",
         1},
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

// --- track files

// Keysets "mouth" and "big mouth" over the face scene; a two-second sound "dialogue.aiff" in
// the data directory; the error log in the project.
class TrackTest : public ProjectTest {
  protected:
    void SetUp() override {
        ProjectTest::SetUp();
        WriteAiff(dir / "misc_data/dialogue.aiff", 16000);
        ASSERT_EQ(BatchLoadKeyset(Data("face.kset", std::string("wire face.gltf\n") + kMouth +
                                                        "begin shapeset \"big mouth\" jaw 1\n"
                                                        " key rest 0\n key wide 1\nend\n")),
                  1);
        theImp.SetErrorFilename(log.c_str());
        ghost.calls.clear();
    }
    int Load(const std::string& text) { return theImp.LoadTrack(Data("t.track", text).c_str()); }
    std::string SavedText() {
        EXPECT_EQ(theImp.SaveTrack((dir / "saved.track").c_str()), 1);
        return ReadFile(dir / "saved.track");
    }

    std::string log = dir / "errlog.vx";
};

const char* const kFullTrack =
    "sound dialogue.aiff\n\n"
    "fps 24\n\n"
    "begin marktrack\n    mark 3\t\"a\"\n    mark 40.5\t\"b\"\nend\n\n"
    "begin keytrack\tmouth\n"
    "    event 0 rest Ease 1\n    event 12.5 open Linear 0.75\n    event 30 wide Smooth 2\n"
    "end\n\n"
    "begin keytrack\t\"big mouth\"\n    event 5 wide Ease -0.5\nend\n\n"
    "active_keyset \"big mouth\"\n\n";

TEST_F(TrackTest, LoadTellsTheWindowInOrderSavesBackByteForByteAndReportsBadNames) {
    ASSERT_EQ(Load(kFullTrack), 1);
    EXPECT_EQ(theImp.fps, 24);
    EXPECT_EQ(theImp.soundFile, dir / "misc_data/dialogue.aiff");
    // 30 frames at 24 per second is the last key: 1.25 s; the sound lasts 2 s.
    EXPECT_THAT(ghost.calls,
                ElementsAre("InitSound(sound)", "InitMarkTrack(track)", "SetActiveKeyset(1)",
                            "SetMenuStatus()", "SetViewStatus()", "DisplayDuration(12000)"));
    theImp.trackModified = 1;
    EXPECT_EQ(SavedText(), kFullTrack);
    ghost.activeKeyset = -1;  // the active keyset written is the one the window reports
    EXPECT_EQ(SavedText() + "active_keyset \"big mouth\"\n\n", kFullTrack);

    // Files that cannot be opened are told and change nothing.
    const std::string missing = dir / "misc_data/none.track", bad = dir / "no-dir/x.track";
    ghost.calls.clear();
    EXPECT_EQ(theImp.LoadTrack(missing.c_str()), 0);
    EXPECT_EQ(theImp.SaveTrack(bad.c_str()), 0);
    EXPECT_THAT(ghost.calls,
                ElementsAre("Inform(Failed to open track file [" + missing + "].|Dismiss)",
                            "Inform(Failed to open track file [" + bad + "].|Dismiss)"));

    // Loading again in batch mode replaces the tracks and marks and tells the window nothing.
    theImp.GetKeyTrack(0)->InsertKey(0, CueTime::FromFrames(99), nullptr, 1, 1.0f);
    theImp.batchMode = 1;
    ghost.calls.clear();
    ASSERT_EQ(theImp.LoadTrack((dir / "saved.track").c_str()), 1);
    EXPECT_THAT(ghost.calls, IsEmpty());
    EXPECT_EQ(theImp.GetKeyTrack(0)->events.Count(), 3);
    EXPECT_EQ(theImp.markTrack->marks.Count(), 2);
}

TEST_F(TrackTest, EachBlockOfAnUnknownKeysetIsToldAndSkipped) {
    ASSERT_EQ(Load("begin keytrack lips\n event 1 rest\nend\n"
                   "begin keytrack mouth\n event 2 open\nend\n"
                   "begin keytrack\tlips\n event 3 rest\nend\n"
                   "active_keyset lips\n"),
              1);
    EXPECT_THAT(ghost.Calls("Inform"),
                ElementsAre("Inform(Failed to find keyset [lips].|Dismiss)",
                            "Inform(Failed to find keyset [lips].|Dismiss)"));
    EXPECT_EQ(theImp.GetKeyTrack(0)->Duration(), CueTime::FromFrames(2));
    EXPECT_EQ(theImp.GetKeyTrack(1)->events.Count(), 0);
    EXPECT_EQ(theImp.activeKeyset, -1) << "an active keyset not loaded is ignored";
}

TEST_F(TrackTest, ASoundThatCannotBeReadIsLoggedAndTheTrackLoadsWithout) {
    WriteFile(dir / "misc_data/notes.aiff", "not a sound at all");
    for (const auto& [file, logged] : std::vector<std::pair<std::string, std::string>>{
             {"gone.aiff", "Audio file [%M/gone.aiff] does not exist.\n"},
             {"notes.aiff", "Audio file [%M/notes.aiff] could not be read"}}) {
        theImp.SetErrorFilename(log.c_str());
        ghost.calls.clear();
        ASSERT_EQ(Load("sound " + file + "\nbegin keytrack mouth\n event 2 open\nend\n"), 1);
        EXPECT_THAT(ReadFile(log), HasSubstr(Fill(logged)));
        EXPECT_EQ(theImp.sound, nullptr);
        EXPECT_THAT(ghost.calls, ::testing::Contains("ShowErrorFlag()"));
        EXPECT_EQ(theImp.GetKeyTrack(0)->events.Count(), 1);
    }
    EXPECT_EQ(SavedText().rfind("fps 30\n\n", 0), 0u) << "no sound line without a sound";
}

TEST_F(TrackTest, FpsStatementSetsOrKeepsTheRate) {
    for (const auto& [text, expected] :
         std::vector<std::pair<const char*, int>>{{"begin marktrack\nend\n", 24},
                                                  {"fps 0\n", 30},
                                                  {"fps 25\n", 25},
                                                  {"fps 25 extra\n", 24}}) {
        theImp.SetFps(24);
        ASSERT_EQ(Load(text), 1);
        EXPECT_EQ(theImp.fps, expected) << text;
        EXPECT_EQ(CueTime::default_fps, expected) << text;
    }
}

TEST_F(TrackTest, DurationIsTheLongestOfItsCandidatesAndNeverBelowOneSecond) {
    EXPECT_EQ(theImp.compute_duration(CueTime()).Ticks(), 6000);
    EXPECT_EQ(theImp.compute_duration(CueTime::FromTicks(9000)).Ticks(), 9000);
    theImp.GetKeyTrack(1)->InsertKey(0, CueTime::FromTicks(15000), nullptr, 1, 1.0f);
    EXPECT_EQ(theImp.compute_duration(CueTime::FromTicks(9000)).Ticks(), 15000);
    theImp.sound = CueSound::FromSamples({std::vector<float>(24000, 0.0f)}, 8000.0);
    EXPECT_EQ(theImp.compute_duration(CueTime()).Ticks(), 18000) << "3 s of sound";
    ghost.calls.clear();
    theImp.SetDuration(CueTime::FromTicks(100));
    EXPECT_EQ(theImp.duration.Ticks(), 18000);
    EXPECT_EQ(theImp.requestedDuration.Ticks(), 100);
    EXPECT_THAT(ghost.calls, ElementsAre("DisplayDuration(18000)"));
}

TEST_F(TrackTest, DamagedTracksLoadWhatTheyCan) {
    static const char binary[] = "sound \"unterminated\nfps 99999999999\n\0\xff";
    theImp.batchMode = 1;
    for (const std::string& text : {
             std::string("begin keytrack mouth\n event 3 open\n"),  // no end
             std::string("begin keytrack mouth\n event\n event x\n event 1e30 open\n"
                         " event -4 open Ease nan\nend\n"),
             std::string(binary, sizeof binary - 1),
             std::string("active_keyset\nactive_keyset a b\nbegin\nbegin keytrack\n"),
         }) {
        StdErr([&] { EXPECT_EQ(Load(text), 1) << text; });
        EXPECT_GE(theImp.fps, 1);
        EXPECT_GE(theImp.duration.Ticks(), 6000);
        EXPECT_EQ(theImp.SaveTrack((dir / "after.track").c_str()), 1);
        EXPECT_EQ(theImp.LoadTrack((dir / "after.track").c_str()), 1) << "what was saved reads";
    }
}

}  // namespace
