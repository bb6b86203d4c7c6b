// Recognizer settings blocks, the plug-in catalogue with real shared objects, the shipped
// Loudness plug-in, settings files read by the workspace, and plug-ins found by batch runs.
#include <gtest/gtest.h>

#include <filesystem>
#include <memory>
#include <sstream>

#include "WorkspaceTestUtil.h"
#include "toolkit/CuePrefs.h"
#include "toolkit/CueRecognizerCatalog.h"
#include "toolkit/CueSound.h"
#include "workspace/Imp.h"

using namespace wstest;

namespace {

const std::string kGoodPlugins = CHIRRUP_BINARY_DIR "/tests/plugins/good";
const std::string kBadPlugins = CHIRRUP_BINARY_DIR "/tests/plugins/bad";

// One channel at 1000 frames per second: 100 frames of a square wave of each amplitude.
std::unique_ptr<CueSound> steps_of(std::initializer_list<float> amplitudes) {
    std::vector<float> samples;
    for (float a : amplitudes)
        for (int i = 0; i < 100; ++i)
            samples.push_back(i % 2 ? a : -a);
    return CueSound::FromSamples({samples}, 1000.0);
}
std::vector<int> target_indices(const CueRecognizer& r) {
    std::vector<int> out;
    for (const auto& result : r.results)
        out.push_back(result.targetIndex);
    return out;
}

TEST(RecognizerSettings, ReadStopsAfterEndAndSkipsWhatItDoesNotKnow) {
    std::istringstream in(
        "# a comment\n\ncolour blue\n"
        "begin extra\n  gain 9\n  begin deeper\n  end\nend\n"
        "target nobody picture x.sgi\ntarget a picture a.sgi sound\n"
        "step 0\nstep soon\ngain 2\nend\ngain 7\n");
    VowelRecognizer r;
    const CueTime before = r.step;
    ASSERT_TRUE(r.ReadSettings(in));
    EXPECT_EQ(r.gain, 2.0f);  // the nested block's "gain 9" was skipped, "gain 7" not read
    EXPECT_EQ(r.step, before);
    EXPECT_EQ(r.FindTarget("a")->pictureFile, "a.sgi");
    EXPECT_EQ(r.targets.size(), 2u);
    std::string rest;
    std::getline(in, rest);
    EXPECT_EQ(rest, "gain 7");
    std::istringstream unended("gain 4\nstep 3\n");
    EXPECT_FALSE(r.ReadSettings(unended));
    EXPECT_EQ(r.gain, 4.0f);
}

class PluginCatalog : public ::testing::Test {
  protected:
    TempDir dir;
    Reports reports{0};
    CueRecognizerCatalog catalog;
};

TEST_F(PluginCatalog, SearchPathPrefersTesselThenKlThenDefaultAndIsScannedOnFirstFetch) {
    ScopedEnv tessel("TESSEL_PLUGIN_PATH", nullptr);
    ScopedEnv kl("KL_PLUGIN_PATH", nullptr);
    ASSERT_TRUE(CuePrefs::Location());
    EXPECT_EQ(CueRecognizerCatalog::SearchPath(),
              "./plugins:/usr/tesselbeta/plugins:/usr/tessel/plugins:" +
                  std::string(CuePrefs::Location()) + "/lib/chirrup/plugins");
    ScopedEnv kl2("KL_PLUGIN_PATH", "/kl");
    EXPECT_EQ(CueRecognizerCatalog::SearchPath(), "/kl");
    ScopedEnv tessel2("TESSEL_PLUGIN_PATH", (dir.path() + ":" + kGoodPlugins).c_str());
    EXPECT_EQ(CueRecognizerCatalog::SearchPath(), dir.path() + ":" + kGoodPlugins);

    std::unique_ptr<CueRecognizer> a(catalog.FetchRecognizer("Level"));
    std::unique_ptr<CueRecognizer> b(catalog.FetchRecognizer("Level"));
    ASSERT_TRUE(a && b);
    EXPECT_NE(a.get(), b.get());
    EXPECT_EQ(a->targets[2].name, "loud");
    EXPECT_EQ(catalog.FetchRecognizer("level"), nullptr);

    CueRecognizerCatalog scanned;
    EXPECT_EQ(scanned.ScanDirectory(dir.path().c_str()), 0);
    EXPECT_EQ(scanned.FetchRecognizer("Level"), nullptr) << "a scanned catalogue is not rescanned";
}

TEST_F(PluginCatalog, RefusesAndReportsFilesThatAreNotPluginsOfThisInterface) {
    WriteFile(dir / "junk.so", "not a shared object\n");
    WriteFile(dir / "notes.txt", "plug-ins go here\n");
    std::filesystem::create_directory(dir / "folder.so");
    EXPECT_EQ(catalog.ScanDirectory(("::/no/such:" + dir.path() + ":" + kBadPlugins).c_str()), 0);
    EXPECT_EQ(catalog.HeadKey(), nullptr);
    EXPECT_THAT(reports.text,
                HasSubstr("[" + kBadPlugins + "/NotAPlugin.so] is not a chirrup plug-in"));
    EXPECT_THAT(reports.text,
                HasSubstr("[" + kBadPlugins +
                          "/WrongAbi.so] was built for plug-in interface 42, this program uses 1"));
    EXPECT_THAT(reports.text, HasSubstr("[" + (dir / "junk.so") + "] could not be loaded: "));
    EXPECT_THAT(reports.text, Not(HasSubstr("notes.txt")));
    EXPECT_FALSE(catalog.LoadPlugin((dir / "missing.so").c_str()));
}

// The plug-in's own settings, its recognition, and that its exceptions never leave a call.
TEST_F(PluginCatalog, PluginSettingsAndRecognitionWorkAndItsExceptionsStayInside) {
    ASSERT_EQ(catalog.ScanDirectory(kGoodPlugins.c_str()), 1);
    std::unique_ptr<CueRecognizer> r(catalog.FetchRecognizer("Level"));
    ASSERT_TRUE(ReadSettingsText(*r,
                                 "threshold 0.25 0.75\nstep 4\ntarget loud picture \"loud "
                                 "face.sgi\" sound shout.aiff\nend\n"));
    EXPECT_EQ(
        SettingsText(*r),
        "    step 4\n    target silent\n    target quiet\n"
        "    target loud picture \"loud face.sgi\" sound shout.aiff\n    threshold 0.25 0.75\n");
    ASSERT_TRUE(r->GuardedResetSettings());
    EXPECT_EQ(SettingsText(*r),
              "    step 3\n    target silent\n    target quiet\n    target loud\n"
              "    threshold 0.01 0.5\n");  // 0.1 s at 30 frames per second

    r->FindTarget("silent")->keyShapeIndex = 7;
    ASSERT_TRUE(r->GuardedRecognize(*steps_of({0.0f, 0.1f, 0.9f, 0.0f})));
    EXPECT_THAT(target_indices(*r), ElementsAre(0, 1, 2, 0));
    EXPECT_TRUE(r->results[0].shapeIndex == 7 && r->results[1].shapeIndex == -1);

    EXPECT_FALSE(ReadSettingsText(*r, "throw\nend\n"));
    EXPECT_THAT(reports.text, HasSubstr("Recognizer [Level] failed: told to throw"));
    EXPECT_FALSE(r->GuardedRecognize(*CueSound::FromSamples({{2.0f}}, 1000.0)));
    EXPECT_THAT(r->results, IsEmpty());
    EXPECT_THAT(reports.text, HasSubstr("Recognizer [Level] failed: sample out of range"));
}

TEST(PluginLifetime, RecognizersOutliveTheirCatalogue) {
    std::unique_ptr<CueRecognizer> r;
    {
        CueRecognizerCatalog catalog;
        ASSERT_EQ(catalog.ScanDirectory(kGoodPlugins.c_str()), 1);
        r = catalog.FetchRecognizer("Level");
    }
    ASSERT_TRUE(r->GuardedRecognize(*steps_of({0.9f})));
    EXPECT_THAT(target_indices(*r), ElementsAre(2));
    r.reset();  // runs the plug-in's destructor
}

TEST_F(PluginCatalog, LoudnessMapsRmsLevelToClosedHalfOpen) {
    ASSERT_TRUE(catalog.LoadPlugin((kShippedPlugins + "/Loudness.so").c_str())) << reports.text;
    std::unique_ptr<CueRecognizer> r(catalog.FetchRecognizer("Loudness"));
    ASSERT_TRUE(r);
    // Square waves: the RMS equals the amplitude. -40 dB, -30 dB, -20 dB, 0 dB and silence
    // against the default levels -36 and -24, one 0.1 s step (100 samples) each.
    r->step = CueTime::FromSeconds(0.1);
    ASSERT_TRUE(r->GuardedRecognize(*steps_of({0.01f, 0.0316f, 0.1f, 1.0f, 0.0f})));
    EXPECT_THAT(target_indices(*r), ElementsAre(0, 1, 2, 2, 0));

    ASSERT_TRUE(ReadSettingsText(*r, "levels -50 -10\nend\n"));
    ASSERT_TRUE(ReadSettingsText(*r, "levels -5 -10\nend\n"));  // inverted: refused
    EXPECT_THAT(SettingsText(*r), HasSubstr("    levels -50 -10\n"));
    ASSERT_TRUE(r->GuardedRecognize(*steps_of({0.01f})));  // -40 dB is now "half"
    EXPECT_THAT(target_indices(*r), ElementsAre(1));

    r->step = CueTime::FromSeconds(0.03);  // 30 samples: 100 samples give 4 results
    ASSERT_TRUE(r->GuardedRecognize(*steps_of({1.0f})));
    EXPECT_EQ(r->results.size(), 4u) << "the last short step gets a result";
}

// Configuring resets the settings (not the links) and reads only the recognizer's own block.
TEST_F(PluginCatalog, SettingsFileGivesOnlyItsOwnBlockAfterAReset) {
    RecordingGhost ghost;
    GhostScope scope{&ghost};
    VowelRecognizer r;
    const std::string file = dir / "Vowel.config";
    r.step = CueTime::FromFrames(9);
    r.gain = 5.0f;
    r.FindTarget("a")->keyShapeIndex = 3;
    r.FindTarget("a")->pictureFile = "a.sgi";
    WriteFile(file,
              "gain 11\nbegin recognizer Other\n    gain 12\nend\n"
              "begin recognizer Vowel extra\n    gain 13\nend\n"
              "begin recognizer Vowel\n    target e picture e.sgi\n    gain 0.25\nend\ngain 14\n");
    EXPECT_EQ(theImp.ConfigureRecognizer(&r, file.c_str()), 1);
    EXPECT_EQ(r.gain, 0.25f);
    EXPECT_EQ(r.step, r.defaultStep);
    EXPECT_EQ(r.FindTarget("e")->pictureFile, "e.sgi");
    EXPECT_EQ(r.FindTarget("a")->pictureFile, "");
    EXPECT_EQ(r.FindTarget("a")->keyShapeIndex, 3);
    EXPECT_THAT(ghost.calls, ElementsAre("ShowRecognizerGui()"));

    r.gain = 5.0f;
    WriteFile(file, "begin recognizer Other\nend\n");
    EXPECT_EQ(theImp.ConfigureRecognizer(&r, file.c_str()), 1);
    EXPECT_EQ(r.gain, 5.0f) << "without its block the settings stay";

    ghost.calls.clear();
    EXPECT_EQ(theImp.ConfigureRecognizer(&r, (dir / "missing.config").c_str()), 0);
    EXPECT_EQ(theImp.ConfigureRecognizer(&r, nullptr), 0);
    EXPECT_EQ(theImp.ConfigureRecognizer(nullptr, file.c_str()), 0);
    EXPECT_THAT(ghost.calls, IsEmpty()) << "an unreadable file is refused silently";

    ScopedEnv project("TESSEL_PROJECT", dir.path().c_str()), misc("TESSEL_MISC_DIR", nullptr);
    EXPECT_EQ(r.ConfigFileName(), dir / "misc_data/Vowel.config");
    ScopedEnv none("TESSEL_PROJECT", nullptr);
    EXPECT_EQ(r.ConfigFileName(), "./Vowel.config");
}

// The program exports its symbols to plug-ins and scans the catalogue when a keyset file
// first asks for a recognizer.
TEST(ProgramPlugins, BatchRunFindsTheShippedLoudnessPlugin) {
    TempDir dir;
    WriteFile(dir / "face.gltf", FaceSceneJson());
    WriteFile(dir / "t.track", "begin keytrack mouth\n    event 0 rest\nend\n");
    WriteFile(dir / "k.kset",
              std::string("wire face.gltf\n") + kMouth +
                  "begin recognizer Loudness mouth\n    levels -40 -20\nend\n"
                  "begin recognizer-links Loudness mouth\n link closed to rest\nend\n");
    const std::vector<std::string> args{"-B", "t.track", "face.gltf", "VX_ROOT",
                                        "0",  "o.gltf",  "k.kset"};
    const RunResult found = RunChirrup(args, dir.path(), {{"TESSEL_PLUGIN_PATH", kShippedPlugins}});
    EXPECT_THAT(found.err, HasSubstr("Storing to o.gltf"));
    EXPECT_THAT(found.err, Not(HasSubstr("Loudness")));
}

}  // namespace
