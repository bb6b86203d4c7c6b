// Recognizer settings blocks, the plug-in catalogue with real shared objects, and recognizer
// settings files read by the workspace.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <memory>
#include <sstream>

#include "WorkspaceTestUtil.h"
#include "model/KLKeySet.h"
#include "toolkit/CuePrefs.h"
#include "toolkit/CueRecognizer.h"
#include "toolkit/CueRecognizerCatalog.h"
#include "toolkit/CueSound.h"
#include "toolkit/CueTokenList.h"
#include "toolkit/KLErrHandler.h"
#include "workspace/Ghost.h"
#include "workspace/Imp.h"

namespace fs = std::filesystem;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

namespace {

const std::string kGoodPlugins = CHIRRUP_BINARY_DIR "/tests/plugins/good";
const std::string kBadPlugins = CHIRRUP_BINARY_DIR "/tests/plugins/bad";
const std::string kShippedPlugins = CHIRRUP_BINARY_DIR "/lib/chirrup/plugins";

// A recognizer compiled into the test: two targets and one setting of its own, "gain".
class VowelRecognizer : public CueRecognizer {
  public:
    VowelRecognizer() : CueRecognizer("Vowel") {
        AddTarget("a");
        AddTarget("e");
    }
    float gain = 1.0f;
    void ResetSettings() override {
        CueRecognizer::ResetSettings();
        gain = 1.0f;
    }
    bool Recognize(const CueSound&) override { return true; }
    CueRecognizer* Clone() const override { return new VowelRecognizer(); }

  protected:
    void ReadParameter(const CueTokenList& s) override {
        if (s.Matches("gain") && s.Count() == 2)
            gain = s.ArgFloat(1);
    }
    void WriteParameters(std::ostream& out) const override { out << "    gain " << gain << "\n"; }
};

// Collects the warnings and other reports while installed.
class ReportCollector : public KLErrHandler {
  public:
    void Handle(KLErr* e) override { text += e->Message(); }
    std::string text;
};

std::string written(const CueRecognizer& r) {
    std::ostringstream out;
    r.WriteSettings(out);
    return out.str();
}

// A sound of one channel at 1000 frames per second: 100 frames of each amplitude in turn.
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

}  // namespace

// --- settings blocks

TEST(RecognizerSettings, WritesStepTargetsAndOwnStatements) {
    VowelRecognizer r;
    r.step = CueTime::FromFrames(2);
    r.gain = 0.5f;
    r.FindTarget("e")->pictureFile = "pix/open mouth.sgi";
    r.FindTarget("e")->soundFile = "ee.aiff";
    EXPECT_EQ(written(r),
              "    step 2\n"
              "    target a\n"
              "    target e picture \"pix/open mouth.sgi\" sound ee.aiff\n"
              "    gain 0.5\n");
}

TEST(RecognizerSettings, RoundTripsThroughAFreshRecognizer) {
    VowelRecognizer r;
    r.step = CueTime::FromFrames(1.5);
    r.gain = 3.25f;
    r.FindTarget("a")->soundFile = "a a.aiff";
    std::istringstream in(written(r) + "end\n");
    VowelRecognizer back;
    ASSERT_TRUE(back.ReadSettings(in));
    EXPECT_EQ(back.step, r.step);
    EXPECT_EQ(back.gain, 3.25f);
    EXPECT_EQ(back.FindTarget("a")->soundFile, "a a.aiff");
    EXPECT_EQ(written(back), written(r));
}

TEST(RecognizerSettings, ReadStopsAfterEndAndSkipsWhatItDoesNotKnow) {
    std::istringstream in(
        "# a comment\n"
        "\n"
        "colour blue\n"
        "begin extra\n"
        "  gain 9\n"
        "  begin deeper\n"
        "  end\n"
        "end\n"
        "target nobody picture x.sgi\n"
        "target a picture a.sgi sound\n"
        "step 0\n"
        "step soon\n"
        "gain 2\n"
        "end\n"
        "gain 7\n");
    VowelRecognizer r;
    const CueTime before = r.step;
    ASSERT_TRUE(r.ReadSettings(in));
    EXPECT_EQ(r.gain, 2.0f);  // the nested block's "gain 9" was skipped, "gain 7" not read
    EXPECT_EQ(r.step, before);
    EXPECT_EQ(r.FindTarget("a")->pictureFile, "a.sgi");
    EXPECT_EQ(r.FindTarget("a")->soundFile, "");
    EXPECT_EQ(r.targets.size(), 2u);
    std::string rest;
    std::getline(in, rest);
    EXPECT_EQ(rest, "gain 7");
}

TEST(RecognizerSettings, ReadWithoutEndFails) {
    std::istringstream in("gain 4\nstep 3\n");
    VowelRecognizer r;
    EXPECT_FALSE(r.ReadSettings(in));
    EXPECT_EQ(r.gain, 4.0f);
}

TEST(RecognizerSettings, ResetRestoresDefaultsAndKeepsLinks) {
    VowelRecognizer r;
    r.step = CueTime::FromFrames(5);
    r.gain = 8.0f;
    r.FindTarget("a")->keyShapeIndex = 3;
    r.FindTarget("a")->pictureFile = "a.sgi";
    r.ResetSettings();
    EXPECT_EQ(r.step, r.defaultStep);
    EXPECT_EQ(r.gain, 1.0f);
    EXPECT_EQ(r.FindTarget("a")->keyShapeIndex, 3);
    EXPECT_EQ(r.FindTarget("a")->pictureFile, "");
}

TEST(RecognizerSettings, ConfigFileLiesInTheDataDirectoryOrTheCurrentOne) {
    VowelRecognizer r;
    {
        wstest::ScopedEnv project("TESSEL_PROJECT", "/projects/fox");
        wstest::ScopedEnv misc("TESSEL_MISC_DIR", nullptr);
        EXPECT_EQ(r.ConfigFileName(), "/projects/fox/misc_data/Vowel.config");
    }
    wstest::ScopedEnv project("TESSEL_PROJECT", nullptr);
    EXPECT_EQ(r.ConfigFileName(), "./Vowel.config");
}

// --- the catalogue and plug-in files

class PluginCatalog : public ::testing::Test {
  protected:
    wstest::TempDir tmp;
    const fs::path dir{tmp.path()};
    ReportCollector reports;
};

TEST_F(PluginCatalog, LoadsPluginFromTesselPluginPath) {
    wstest::ScopedEnv path("TESSEL_PLUGIN_PATH", (dir.string() + ":" + kGoodPlugins).c_str());
    CueRecognizerCatalog catalog;
    EXPECT_EQ(catalog.ScanDirectory(CueRecognizerCatalog::SearchPath().c_str()), 1);
    ASSERT_STREQ(catalog.HeadKey(), "Level");
    EXPECT_EQ(catalog.NextKey("Level"), nullptr);
    EXPECT_THAT(reports.text, IsEmpty());

    std::unique_ptr<CueRecognizer> a(catalog.FetchRecognizer("Level"));
    std::unique_ptr<CueRecognizer> b(catalog.FetchRecognizer("Level"));
    ASSERT_TRUE(a && b);
    EXPECT_NE(a.get(), b.get());
    EXPECT_STREQ(a->Name(), "Level");
    ASSERT_EQ(a->targets.size(), 3u);
    EXPECT_EQ(a->targets[2].name, "loud");
    EXPECT_EQ(catalog.FetchRecognizer("level"), nullptr);
    EXPECT_EQ(catalog.FetchRecognizer(nullptr), nullptr);
}

TEST_F(PluginCatalog, FetchScansTheSearchPathWhenNothingWasScanned) {
    wstest::ScopedEnv path("TESSEL_PLUGIN_PATH", kGoodPlugins.c_str());
    CueRecognizerCatalog lazy;
    std::unique_ptr<CueRecognizer> r(lazy.FetchRecognizer("Level"));
    EXPECT_TRUE(r);
    EXPECT_EQ(lazy.Count(), 1);

    CueRecognizerCatalog scanned;
    EXPECT_EQ(scanned.ScanDirectory(dir.c_str()), 0);
    EXPECT_EQ(scanned.FetchRecognizer("Level"), nullptr);
    EXPECT_EQ(scanned.Count(), 0);
}

TEST_F(PluginCatalog, SearchPathPrefersTesselThenKlThenDefault) {
    wstest::ScopedEnv tessel("TESSEL_PLUGIN_PATH", nullptr);
    wstest::ScopedEnv kl("KL_PLUGIN_PATH", nullptr);
    EXPECT_EQ(CueRecognizerCatalog::SearchPath(),
              "./plugins:/usr/tesselbeta/plugins:/usr/tessel/plugins");
    wstest::ScopedEnv kl2("KL_PLUGIN_PATH", "/kl");
    EXPECT_EQ(CueRecognizerCatalog::SearchPath(), "/kl");
    wstest::ScopedEnv tessel2("TESSEL_PLUGIN_PATH", "/t1:/t2");
    EXPECT_EQ(CueRecognizerCatalog::SearchPath(), "/t1:/t2");
}

TEST_F(PluginCatalog, RefusesFilesThatAreNotPluginsOfThisInterface) {
    CueRecognizerCatalog catalog;
    EXPECT_EQ(catalog.ScanDirectory(kBadPlugins.c_str()), 0);
    EXPECT_EQ(catalog.Count(), 0);
    EXPECT_EQ(catalog.HeadKey(), nullptr);
    EXPECT_THAT(reports.text,
                HasSubstr("[" + kBadPlugins + "/NotAPlugin.so] is not a chirrup plug-in"));
    EXPECT_THAT(reports.text,
                HasSubstr("[" + kBadPlugins +
                          "/WrongAbi.so] was built for plug-in interface 42, this program uses 1"));
}

TEST_F(PluginCatalog, SkipsOtherFilesAndReportsUnloadableOnes) {
    std::ofstream(dir / "junk.so") << "not a shared object\n";
    std::ofstream(dir / "notes.txt") << "plug-ins go here\n";
    fs::create_directory(dir / "folder.so");
    const std::string path = "::/does/not/exist:" + dir.string();
    CueRecognizerCatalog catalog;
    EXPECT_EQ(catalog.ScanDirectory(path.c_str()), 0);
    EXPECT_THAT(reports.text,
                HasSubstr("[" + (dir / "junk.so").string() + "] could not be loaded: "));
    EXPECT_THAT(reports.text, ::testing::Not(HasSubstr("notes.txt")));
    EXPECT_THAT(reports.text, ::testing::Not(HasSubstr("folder.so")));
    EXPECT_FALSE(catalog.LoadPlugin((dir / "missing.so").c_str()));
}

TEST_F(PluginCatalog, FirstRecognizerOfANameWins) {
    CueRecognizerCatalog catalog;
    catalog.Register(std::make_unique<VowelRecognizer>());
    const std::string path = kGoodPlugins + ":" + kGoodPlugins;
    EXPECT_EQ(catalog.ScanDirectory(path.c_str()), 1);
    catalog.Register(std::make_unique<VowelRecognizer>());
    EXPECT_EQ(catalog.Count(), 2);
    ASSERT_STREQ(catalog.HeadKey(), "Vowel");
    EXPECT_STREQ(catalog.NextKey("Vowel"), "Level");
    EXPECT_EQ(catalog.NextKey("Level"), nullptr);
    EXPECT_EQ(catalog.NextKey("Nobody"), nullptr);
}

TEST_F(PluginCatalog, PluginReadsAndWritesItsSettings) {
    CueRecognizerCatalog catalog;
    ASSERT_TRUE(catalog.LoadPlugin((kGoodPlugins + "/Level.so").c_str()));
    std::unique_ptr<CueRecognizer> r(catalog.FetchRecognizer("Level"));
    std::istringstream in("threshold 0.25 0.75\nstep 4\ntarget loud sound shout.aiff\nend\n");
    ASSERT_TRUE(r->GuardedReadSettings(in));
    EXPECT_EQ(written(*r),
              "    step 4\n"
              "    target silent\n"
              "    target quiet\n"
              "    target loud sound shout.aiff\n"
              "    threshold 0.25 0.75\n");
    ASSERT_TRUE(r->GuardedResetSettings());
    EXPECT_THAT(written(*r), HasSubstr("    threshold 0.01 0.5\n"));
    EXPECT_THAT(written(*r), HasSubstr("    step 3\n"));  // 0.1 s at 30 frames per second
}

TEST_F(PluginCatalog, PluginRecognizesAndReportsLinkedShapes) {
    CueRecognizerCatalog catalog;
    ASSERT_EQ(catalog.ScanDirectory(kGoodPlugins.c_str()), 1);
    std::unique_ptr<CueRecognizer> r(catalog.FetchRecognizer("Level"));
    r->FindTarget("silent")->keyShapeIndex = 7;
    r->FindTarget("loud")->keyShapeIndex = 2;
    ASSERT_TRUE(r->GuardedRecognize(*steps_of({0.0f, 0.1f, 0.9f, 0.0f})));
    EXPECT_THAT(target_indices(*r), ElementsAre(0, 1, 2, 0));
    EXPECT_EQ(r->results[0].shapeIndex, 7);
    EXPECT_EQ(r->results[1].shapeIndex, -1);
    EXPECT_EQ(r->results[2].shapeIndex, 2);
}

TEST_F(PluginCatalog, ExceptionsFromPluginCodeStayInside) {
    CueRecognizerCatalog catalog;
    ASSERT_EQ(catalog.ScanDirectory(kGoodPlugins.c_str()), 1);
    std::unique_ptr<CueRecognizer> r(catalog.FetchRecognizer("Level"));
    std::istringstream in("throw\nend\n");
    EXPECT_FALSE(r->GuardedReadSettings(in));
    EXPECT_THAT(reports.text, HasSubstr("Recognizer [Level] failed: told to throw"));

    ASSERT_TRUE(r->GuardedRecognize(*steps_of({0.0f})));
    EXPECT_FALSE(r->GuardedRecognize(*CueSound::FromSamples({{2.0f}}, 1000.0)));
    EXPECT_THAT(r->results, IsEmpty());
    EXPECT_THAT(reports.text, HasSubstr("Recognizer [Level] failed: sample out of range"));
}

TEST_F(PluginCatalog, RecognizersOutliveTheirCatalogue) {
    std::unique_ptr<CueRecognizer> r;
    {
        CueRecognizerCatalog catalog;
        ASSERT_EQ(catalog.ScanDirectory(kGoodPlugins.c_str()), 1);
        r.reset(catalog.FetchRecognizer("Level"));
    }
    ASSERT_TRUE(r->GuardedRecognize(*steps_of({0.9f})));
    EXPECT_THAT(target_indices(*r), ElementsAre(2));
    r.reset();  // runs the plug-in's destructor
}

// --- the shipped Loudness plug-in

class LoudnessPlugin : public PluginCatalog {
  protected:
    void SetUp() override {
        ASSERT_TRUE(catalog.LoadPlugin((kShippedPlugins + "/Loudness.so").c_str())) << reports.text;
        r.reset(catalog.FetchRecognizer("Loudness"));
        ASSERT_TRUE(r);
    }
    CueRecognizerCatalog catalog;
    std::unique_ptr<CueRecognizer> r;
};

TEST_F(LoudnessPlugin, MapsRmsLevelToClosedHalfOpen) {
    ASSERT_EQ(r->targets.size(), 3u);
    EXPECT_EQ(r->targets[0].name, "closed");
    EXPECT_EQ(r->targets[1].name, "half");
    EXPECT_EQ(r->targets[2].name, "open");
    // Square waves: the RMS equals the amplitude. -40 dB, -30 dB, -20 dB, 0 dB and silence
    // against the default levels -36 and -24, one 0.1 s step (100 samples) each.
    r->step = CueTime::FromSeconds(0.1);
    ASSERT_TRUE(r->GuardedRecognize(*steps_of({0.01f, 0.0316f, 0.1f, 1.0f, 0.0f})));
    EXPECT_THAT(target_indices(*r), ElementsAre(0, 1, 2, 2, 0));
}

TEST_F(LoudnessPlugin, LastShortStepGetsAResult) {
    r->step = CueTime::FromSeconds(0.03);  // 30 samples: 100 samples give 4 results
    ASSERT_TRUE(r->GuardedRecognize(*steps_of({1.0f})));
    EXPECT_EQ(r->results.size(), 4u);
    EXPECT_FALSE(r->GuardedRecognize(CueSound()));
}

TEST_F(LoudnessPlugin, LevelsSettingRoundTripsAndRefusesAnInvertedPair) {
    std::istringstream in("levels -50 -10\nend\n");
    ASSERT_TRUE(r->GuardedReadSettings(in));
    EXPECT_THAT(written(*r), HasSubstr("    levels -50 -10\n"));
    std::istringstream inverted("levels -5 -10\nend\n");
    ASSERT_TRUE(r->GuardedReadSettings(inverted));
    EXPECT_THAT(written(*r), HasSubstr("    levels -50 -10\n"));
    r->step = CueTime::FromSeconds(0.1);
    ASSERT_TRUE(r->GuardedRecognize(*steps_of({0.01f})));  // -40 dB is now "half"
    EXPECT_THAT(target_indices(*r), ElementsAre(1));
}

// --- recognizer settings files

class SettingsFile : public PluginCatalog {
  protected:
    std::string write(const std::string& text) {
        const fs::path file = dir / "Vowel.config";
        std::ofstream(file) << text;
        return file.string();
    }

    wstest::RecordingGhost ghost;
    wstest::GhostScope scope{&ghost};
    VowelRecognizer r;
};

TEST_F(SettingsFile, ReadsOnlyItsOwnBlockAfterAReset) {
    r.step = CueTime::FromFrames(9);
    r.gain = 5.0f;
    const std::string file = write(
        "gain 11\n"
        "begin recognizer Other\n"
        "    gain 12\n"
        "end\n"
        "begin recognizer Vowel extra\n"
        "    gain 13\n"
        "end\n"
        "begin recognizer Vowel\n"
        "    target e picture e.sgi\n"
        "    gain 0.25\n"
        "end\n"
        "gain 14\n");
    EXPECT_EQ(theImp.ConfigureRecognizer(&r, file.c_str()), 1);
    EXPECT_EQ(r.gain, 0.25f);
    EXPECT_EQ(r.step, r.defaultStep);  // reset, and not set by the file
    EXPECT_EQ(r.FindTarget("e")->pictureFile, "e.sgi");
    EXPECT_THAT(ghost.calls, ElementsAre("ShowRecognizerGui()"));
}

TEST_F(SettingsFile, WithoutItsBlockTheSettingsStayAndThePanelShows) {
    r.gain = 5.0f;
    const std::string file = write("begin recognizer Other\n    gain 12\nend\n");
    EXPECT_EQ(theImp.ConfigureRecognizer(&r, file.c_str()), 1);
    EXPECT_EQ(r.gain, 5.0f);
    EXPECT_THAT(ghost.calls, ElementsAre("ShowRecognizerGui()"));
}

TEST_F(SettingsFile, UnreadableFileReturnsZeroSilently) {
    EXPECT_EQ(theImp.ConfigureRecognizer(&r, (dir / "missing.config").c_str()), 0);
    EXPECT_EQ(theImp.ConfigureRecognizer(&r, dir.c_str()), 0);
    EXPECT_EQ(theImp.ConfigureRecognizer(&r, nullptr), 0);
    EXPECT_EQ(theImp.ConfigureRecognizer(nullptr, write("").c_str()), 0);
    EXPECT_THAT(ghost.calls, IsEmpty());
    EXPECT_THAT(reports.text, IsEmpty());
}

TEST_F(SettingsFile, PluginSettingsComeFromTheConfigFile) {
    wstest::ScopedEnv project("TESSEL_PROJECT", dir.c_str());
    fs::create_directories(dir / "misc_data");
    theImp.recognizers.ScanDirectory(kGoodPlugins.c_str());  // once per process is enough
    std::unique_ptr<CueRecognizer> level(theImp.recognizers.FetchRecognizer("Level"));
    ASSERT_TRUE(level);
    std::ofstream(level->ConfigFileName())
        << "begin recognizer Level\n    threshold 0.125 0.625\nend\n";
    EXPECT_EQ(level->ConfigFileName(), (dir / "misc_data" / "Level.config").string());
    EXPECT_EQ(theImp.ConfigureRecognizer(level.get(), level->ConfigFileName().c_str()), 1);
    EXPECT_THAT(written(*level), HasSubstr("    threshold 0.125 0.625\n"));
}

// --- recognizers in keyset files

class KeysetRecognizers : public ::testing::Test {
  protected:
    void SetUp() override {
        wstest::ResetWorkspace();
        theImp.recognizers.ScanDirectory(kGoodPlugins.c_str());  // once per process is enough
        wstest::WriteFile(dir / "face.gltf", wstest::FaceSceneJson());
        wstest::WriteFile(dir / "face.keyset", "wire " + (dir / "face.gltf") +
                                                   " 0\n"
                                                   "begin keyset mouth\n"
                                                   "key rest 0\n"
                                                   "key open 10\n"
                                                   "key wide 20\n"
                                                   "end\n"
                                                   "begin recognizer Level mouth\n"
                                                   "    threshold 0.2 0.7\n"
                                                   "    step 6\n"
                                                   "    target loud picture \"loud face.sgi\"\n"
                                                   "end\n"
                                                   "begin recognizer-links Level mouth\n"
                                                   "    link silent to rest\n"
                                                   "    link loud to wide\n"
                                                   "end\n");
    }
    void TearDown() override { wstest::ResetWorkspace(); }

    // The "Level" recognizer of keyset "mouth" after loading `file`.
    CueRecognizer* load(const std::string& file) {
        EXPECT_EQ(theImp.LoadKeyset(file.c_str()), 1);
        KLKeySet* set = theImp.GetKeySet("mouth");
        return set ? set->GetRecognizer("Level") : nullptr;
    }

    wstest::TempDir dir;
    wstest::RecordingGhost ghost;
    wstest::GhostScope scope{&ghost};
};

TEST_F(KeysetRecognizers, SettingsAndLinksRoundTripThroughKeysetFiles) {
    CueRecognizer* r = load(dir / "face.keyset");
    ASSERT_TRUE(r);
    EXPECT_EQ(r->FindTarget("silent")->keyShapeIndex, 0);
    EXPECT_EQ(r->FindTarget("quiet")->keyShapeIndex, -1);
    EXPECT_EQ(r->FindTarget("loud")->keyShapeIndex, 2);
    const std::string settings = written(*r);
    EXPECT_EQ(settings,
              "    step 6\n"
              "    target silent\n"
              "    target quiet\n"
              "    target loud picture \"loud face.sgi\"\n"
              "    threshold 0.2 0.7\n");

    ASSERT_EQ(theImp.SaveKeyset((dir / "saved.keyset").c_str()), 1);
    const std::string text = wstest::ReadFile(dir / "saved.keyset");
    EXPECT_THAT(text, HasSubstr("begin recognizer Level mouth\n" + settings + "end\n"));
    EXPECT_THAT(text, HasSubstr("begin recognizer-links Level mouth\n"
                                "    link silent to rest\n"
                                "    link loud to wide\n"
                                "end\n"));

    wstest::ResetWorkspace();
    r = load(dir / "saved.keyset");
    ASSERT_TRUE(r);
    EXPECT_EQ(written(*r), settings);
    EXPECT_EQ(r->FindTarget("silent")->keyShapeIndex, 0);
    EXPECT_EQ(r->FindTarget("quiet")->keyShapeIndex, -1);
    EXPECT_EQ(r->FindTarget("loud")->keyShapeIndex, 2);
    EXPECT_EQ(theImp.GetKeySet("mouth")->recognizers.size(), 1u);
}

// The chirrup program itself loads the shipped plug-in in a batch run (its symbols are
// exported to plug-ins, and the catalogue is scanned when the keyset file first asks).
TEST(ProgramPlugins, BatchRunFindsTheShippedLoudnessPlugin) {
    wstest::TempDir dir;
    wstest::WriteFile(dir / "face.gltf", wstest::FaceSceneJson());
    wstest::WriteFile(dir / "t.track", "begin keytrack mouth\n    event 0 rest\nend\n");
    wstest::WriteFile(dir / "k.kset",
                      "wire face.gltf\n"
                      "begin keyset mouth\n    key rest 0\n    key open 10\nend\n"
                      "begin recognizer Loudness mouth\n    levels -40 -20\nend\n"
                      "begin recognizer-links Loudness mouth\n    link closed to rest\nend\n");
    const std::vector<std::string> args{"-B", "t.track", "face.gltf", "VX_ROOT",
                                        "0",  "o.gltf",  "k.kset"};
    const wstest::RunResult found =
        wstest::RunChirrup(args, dir.path(), {{"TESSEL_PLUGIN_PATH", kShippedPlugins}});
    EXPECT_EQ(found.status, 0);
    EXPECT_THAT(found.err, HasSubstr("Storing to o.gltf"));
    EXPECT_THAT(found.err, ::testing::Not(HasSubstr("Loudness")));

    const wstest::RunResult missing =
        wstest::RunChirrup(args, dir.path(), {{"TESSEL_PLUGIN_PATH", dir.path()}});
    EXPECT_THAT(missing.err, HasSubstr("Failed to find recognizer plugin [Loudness]."));
    EXPECT_THAT(missing.err, HasSubstr("Failed to find recognizer [Loudness]."));
}
