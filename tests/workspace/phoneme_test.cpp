// The shipped Phoneme recognizer plug-in: recognition of the demo dialogue, its settings, its
// report when the speech model is missing, awkward sounds; and the pure parts it is built from
// (the step timeline and the pause splitter), compiled in here.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <memory>
#include <random>

#include "WorkspaceTestUtil.h"
#include "phoneme/PauseSplitter.h"
#include "phoneme/PhoneTimeline.h"
#include "toolkit/CueRecognizerCatalog.h"
#include "toolkit/CueSound.h"

using namespace wstest;

namespace {

// The recognised targets' names with repeats collapsed: "SIL L OW SIL ...".
std::vector<std::string> phones(const CueRecognizer& r) {
    std::vector<std::string> out;
    for (const auto& result : r.results) {
        const std::string& name = r.targets[size_t(result.targetIndex)].name;
        if (out.empty() || out.back() != name)
            out.push_back(name);
    }
    return out;
}
std::string name_at(const CueRecognizer& r, size_t i) {
    return r.targets[size_t(r.results.at(i).targetIndex)].name;
}
// True when `wanted` occurs in `seen` in order, other phones between them allowed.
bool in_order(const std::vector<std::string>& seen, const std::vector<std::string>& wanted) {
    auto at = seen.begin();
    for (const std::string& w : wanted) {
        at = std::find(at, seen.end(), w);
        if (at == seen.end())
            return false;
        ++at;
    }
    return true;
}
// Steps of one frame at 30 frames per second that cover `sound`.
long frames_of(const CueSound& sound) {
    return PhoneTimeline::StepCount(sound.FrameCount() / sound.Rate(), 1.0 / 30);
}
// `copies` times the samples of `sound`'s first channel, with `silence` zeros before them.
std::unique_ptr<CueSound> repeated(const CueSound& sound, int copies, size_t silence = 0) {
    std::vector<float> out(silence, 0.0f);
    for (int i = 0; i < copies; ++i)
        out.insert(out.end(), sound.Channel(0).begin(), sound.Channel(0).end());
    return CueSound::FromSamples({out}, sound.Rate());
}

class PhonemePlugin : public ::testing::Test {
  protected:
    static void SetUpTestSuite() {
        catalog_ = std::make_unique<CueRecognizerCatalog>();
        ASSERT_TRUE(catalog_->LoadPlugin((kShippedPlugins + "/Phoneme.so").c_str()));
        dialogue_ = std::make_unique<CueSound>(CHIRRUP_SOURCE_DIR "/resources/demo/dialogue.aiff");
        ASSERT_TRUE(dialogue_->Valid()) << dialogue_->ErrorText();
    }
    static void TearDownTestSuite() { dialogue_.reset(), catalog_.reset(); }
    void SetUp() override { ASSERT_TRUE(r = catalog_->FetchRecognizer("Phoneme")); }
    static inline std::unique_ptr<CueRecognizerCatalog> catalog_;
    static inline std::unique_ptr<CueSound> dialogue_;
    Reports reports;
    std::unique_ptr<CueRecognizer> r;
};

// Phones of "Hello there. Would you like some fresh mushroom soup?" that the recognizer
// finds, in order, where the synthetic voice makes them plain; "SIL" is the pause between
// the sentences (0.833 s to 1.222 s) and the silence after the last word.
const std::vector<std::string> kDialoguePhones = {"L", "OW", "SIL", "W",  "S",  "M",
                                                  "S", "UW", "S",   "UW", "SIL"};

// One result per frame, each carrying its target's key-shape link.
TEST_F(PhonemePlugin, FindsTheDemoDialoguesPhonesInOrderOneResultPerFrame) {
    r->FindTarget("SIL")->keyShapeIndex = 0;
    r->FindTarget("OW")->keyShapeIndex = 3;
    ASSERT_TRUE(r->GuardedRecognize(*dialogue_)) << reports.text;
    ASSERT_EQ(long(r->results.size()), frames_of(*dialogue_));
    EXPECT_EQ(name_at(*r, 30), "SIL") << "1.0 s lies in the pause";
    EXPECT_TRUE(in_order(phones(*r), kDialoguePhones)) << ::testing::PrintToString(phones(*r));
    for (const auto& result : r->results)
        EXPECT_EQ(result.shapeIndex, r->targets[size_t(result.targetIndex)].keyShapeIndex);
    EXPECT_FALSE(r->Configured()) << "38 phones are not linked";

    // The dialogue's first word starts after 12 ms; with half a second of silence before it
    // the first results are silence too, and everything else moves by 15 frames.
    ASSERT_TRUE(r->GuardedRecognize(*repeated(*dialogue_, 1, 11025)));
    EXPECT_EQ(r->results.size(), 130u);
    for (size_t i = 0; i < 12; ++i)
        EXPECT_EQ(name_at(*r, i), "SIL") << i;
    EXPECT_EQ(name_at(*r, 45), "SIL") << "1.0 s into the dialogue";
    EXPECT_TRUE(in_order(phones(*r), kDialoguePhones)) << ::testing::PrintToString(phones(*r));
}

TEST_F(PhonemePlugin, StepMinimumAndThreadsShapeTheResults) {
    ASSERT_TRUE(ReadSettingsText(*r, "step 2\nminimum 1\nend\n"));
    ASSERT_TRUE(r->GuardedRecognize(*dialogue_));
    EXPECT_EQ(r->results.size(), 58u) << "ceil(114.46 / 2)";

    ASSERT_TRUE(ReadSettingsText(*r, "step 1\nminimum 3\nend\n"));
    ASSERT_TRUE(r->GuardedRecognize(*dialogue_));
    ASSERT_EQ(r->results.size(), 115u);
    for (size_t i = 0, run = 1; i < r->results.size(); ++i, ++run) {
        if (i + 1 < r->results.size() && r->results[i + 1].targetIndex == r->results[i].targetIndex)
            continue;
        EXPECT_GE(run, 3u) << "run ending at " << i;
        run = 0;
    }

    // Four copies of the dialogue (15 s), cut at a pause: one decoder or two, the same results.
    const auto four = repeated(*dialogue_, 4);
    ASSERT_TRUE(ReadSettingsText(*r, "threads 1\nend\n"));
    ASSERT_TRUE(r->GuardedRecognize(*four));
    const std::vector<std::string> alone = phones(*r);
    ASSERT_TRUE(ReadSettingsText(*r, "threads 2\nend\n"));
    ASSERT_TRUE(r->GuardedRecognize(*four));
    EXPECT_EQ(phones(*r), alone);
}

// A phone target per model phone, each with a sample to audition; settings written, read back,
// out-of-range or damaged ones refused without harm, and the defaults restored.
TEST_F(PhonemePlugin, SettingsRoundTripAndRefuseNonsense) {
    ASSERT_EQ(r->targets.size(), 40u);
    EXPECT_TRUE(r->targets.front().name == "AA" && r->targets.back().name == "SIL");
    for (const auto& t : r->targets)
        EXPECT_GT(CueSound(t.soundFile.c_str()).Length(), 0.1f) << t.soundFile;
    const std::string defaults = SettingsText(*r);
    EXPECT_THAT(defaults, HasSubstr("/Phoneme-samples/SIL.wav\n"
                                    "    minimum 2\n    speed fast\n    threads 0\n"
                                    "    models \"/usr/share/pocketsphinx/model/en-us\"\n"));
    const std::string common = "    step 2\n    target AA picture aa.sgi sound aa.wav\n",
                      own =
                          "    minimum 4\n    speed accurate\n    threads 1\n"
                          "    models \"/opt/my models\"\n";
    ASSERT_TRUE(ReadSettingsText(*r, common + own + "end\n"));
    const std::string written = SettingsText(*r);
    EXPECT_THAT(written, HasSubstr(common));
    EXPECT_THAT(written, HasSubstr(own));
    std::unique_ptr<CueRecognizer> copy(r->GuardedClone());
    ASSERT_TRUE(ReadSettingsText(*copy, written + "end\n"));
    EXPECT_EQ(SettingsText(*copy), written);

    ASSERT_TRUE(ReadSettingsText(*r,
                                 "minimum 0\nminimum 11\nminimum\nspeed warp\nthreads -1\n"
                                 "threads 99\nmodels \"\"\nspeed fast slow\nend\n"));
    EXPECT_EQ(SettingsText(*r), written) << "out-of-range values leave the settings as they were";

    // A damaged file: unbalanced quotes, no "end".
    EXPECT_FALSE(ReadSettingsText(*r, "minimum 3\nspeed \"fast\nmodels \"unclosed"));
    EXPECT_EQ(r->targets.size(), 40u);
    ASSERT_TRUE(r->GuardedResetSettings());
    EXPECT_EQ(SettingsText(*r), defaults);
}

// Without its model, or with a step of nothing, or on a sound of nothing, it refuses and
// gives no results; a missing model and one that cannot start are each told.
TEST_F(PhonemePlugin, RefusesWhatItCannotAnalyseAndTellsAMissingModel) {
    EXPECT_FALSE(r->GuardedRecognize(CueSound()));
    TempDir dir;
    ASSERT_TRUE(ReadSettingsText(*r, "models " + dir.path() + "\nend\n"));
    EXPECT_FALSE(r->GuardedRecognize(*dialogue_));
    EXPECT_THAT(r->results, IsEmpty());
    EXPECT_THAT(reports.text,
                HasSubstr("Recognizer [Phoneme] cannot run: its speech model file [" + dir.path() +
                          "/en-us/mdef] is missing (install pocketsphinx-en-us"));
    // A model folder with every file present but unreadable ones: the decoder cannot start.
    std::filesystem::create_directory(dir / "en-us");
    for (const char* f :
         {"en-us/mdef", "en-us/feat.params", "en-us/means", "en-us/variances", "en-us/sendump",
          "en-us/transition_matrices", "en-us/noisedict", "en-us-phone.lm.bin"})
        WriteFile(dir / f, "not a model\n");
    reports.text.clear();
    EXPECT_FALSE(r->GuardedRecognize(*dialogue_));
    EXPECT_THAT(
        reports.text,
        HasSubstr("Recognizer [Phoneme] could not start its speech decoder with the model in [" +
                  dir.path() + "]."));
    ASSERT_TRUE(r->GuardedResetSettings());
    r->step = CueTime();
    EXPECT_FALSE(r->GuardedRecognize(*dialogue_));
    EXPECT_THAT(r->results, IsEmpty());
}

std::vector<float> noise(size_t count, float level) {
    std::mt19937 random(7);
    std::uniform_real_distribution<float> uniform(-level, level);
    std::vector<float> out(count);
    for (float& x : out)
        x = uniform(random);
    return out;
}

// Sounds that are not speech, or not as the model expects it: one result per step, and the
// phones that are there in order (none for noise or nothing: no phone to place a key from).
TEST_F(PhonemePlugin, OddSoundsGiveOneResultPerStepAndFindWhatIsThere) {
    const auto finds = [this](const char* name, std::unique_ptr<CueSound> sound,
                              const std::vector<std::string>& wanted) {
        SCOPED_TRACE(name);
        ASSERT_TRUE(sound && sound->Valid());
        ASSERT_TRUE(r->GuardedRecognize(*sound)) << reports.text;
        EXPECT_EQ(long(r->results.size()), frames_of(*sound));
        const std::vector<std::string> heard = phones(*r);
        if (wanted.empty())
            EXPECT_THAT(heard, ::testing::AnyOf(IsEmpty(), ElementsAre("SIL")));
        else
            EXPECT_TRUE(in_order(heard, wanted)) << ::testing::PrintToString(heard);
        EXPECT_THAT(reports.text, IsEmpty());
    };
    finds("white noise", CueSound::FromSamples({noise(44100, 0.5f)}, 22050), {});
    finds("no samples", CueSound::FromSamples({std::vector<float>()}, 16000), {});
    // Telephone bandwidth loses the hiss of the fricatives, not the words' vowels.
    finds("8 kHz", CueSound::FromSamples({dialogue_->Resampled(8000)}, 8000),
          {"L", "OW", "SIL", "M", "UW", "SIL"});
    const std::vector<float>& mono = dialogue_->Channel(0);
    finds("stereo, one side silent",
          CueSound::FromSamples({mono, std::vector<float>(mono.size(), 0.0f)}, dialogue_->Rate()),
          kDialoguePhones);
}

// The pure parts.

TEST(PhoneTimeline, StepsTakeTheSegmentCoveringMostOfThemAndSpeechStandsOut) {
    EXPECT_EQ(PhoneTimeline::StepCount(1.0, 0.25), 4);
    EXPECT_EQ(PhoneTimeline::StepCount(1.01, 0.25), 5);
    EXPECT_EQ(PhoneTimeline::StepCount(1.0, 0.0), 0);
    // Steps of 0.25 s: [0, .25) all 1; [.25, .5) 1 for .05, 2 for .15; [.5, .75) 3 for .15;
    // [.75, 1) 3; beyond the segments' end the count still holds.
    EXPECT_THAT(
        PhoneTimeline::StepTargets({{1, 0.0, 0.3}, {2, 0.3, 0.45}, {3, 0.6, 5.0}}, 0.25, 4, 9),
        ElementsAre(1, 2, 3, 3));
    EXPECT_THAT(PhoneTimeline::StepTargets({{1, 0.0, 0.1}}, 0.25, 3, 9), ElementsAre(1, 9, 9));

    // Ten steps: a background of -60 dB under speech peaking at -10 dB; in a noisy room
    // (background -30 dB) speech must stand 20 dB above the background.
    EXPECT_DOUBLE_EQ(
        PhoneTimeline::SpeechLevel({-60, -60, -58, -20, -10, -15, -30, -60, -59, -25}, 25, 20),
        -35.0);
    EXPECT_DOUBLE_EQ(
        PhoneTimeline::SpeechLevel({-30, -30, -29, -20, -10, -15, -12, -30, -29, -25}, 25, 20),
        -10.0);
}

// The rules that rewrite the step targets (9 is silence): quiet steps become silence, loud
// silence takes the nearest phone, short runs join a neighbour.
TEST(PhoneTimeline, StepRules) {
    std::vector<int> quiet = {1, 2, 3, 4};
    PhoneTimeline::SilenceQuietSteps(quiet, {-20, -70, -60, -180}, -60.0, 9);
    EXPECT_THAT(quiet, ElementsAre(1, 9, 3, 9));
    const auto filled = [](std::vector<int> t, const std::vector<double>& levels, long reach) {
        PhoneTimeline::FillLoudSilence(t, levels, -30.0, reach, 9);
        return t;
    };
    // Quiet silence stays; loud silence takes the nearer phone, the earlier on a tie.
    EXPECT_THAT(filled({1, 9, 9, 9, 2}, {-20, -50, -20, -20, -20}, 5), ElementsAre(1, 9, 1, 2, 2));
    // Filled steps do not spread further: only phones the decoder heard count.
    EXPECT_THAT(filled({1, 9, 9, 9, 9, 9, 9}, std::vector<double>(7, -20), 2),
                ElementsAre(1, 1, 1, 9, 9, 9, 9));
    // Fewer levels than steps: the steps without one are left alone.
    EXPECT_THAT(filled({1, 9, 9}, {-20, -20}, 5), ElementsAre(1, 1, 9));
    const auto absorbed = [](std::vector<int> t, int minimum) {
        PhoneTimeline::AbsorbShortRuns(t, minimum);
        return t;
    };
    // The longer neighbour wins, the earlier one on a tie; runs at the ends join their only
    // neighbour; one-step runs go first, then two-step ones.
    EXPECT_THAT(absorbed({1, 1, 2, 3, 3, 3}, 2), ElementsAre(1, 1, 3, 3, 3, 3));
    EXPECT_THAT(absorbed({2, 1, 1, 1, 3}, 2), ElementsAre(1, 1, 1, 1, 1));
    EXPECT_THAT(absorbed({1, 1, 1, 2, 2, 3, 3, 3}, 3), ElementsAre(1, 1, 1, 1, 1, 3, 3, 3));
}

std::vector<int16_t> tone(long samples, int16_t level) {
    std::vector<int16_t> out(static_cast<size_t>(samples));
    for (long i = 0; i < samples; ++i)
        out[size_t(i)] = i % 2 ? level : int16_t(-level);
    return out;
}
std::vector<int16_t> operator+(std::vector<int16_t> a, const std::vector<int16_t>& b) {
    a.insert(a.end(), b.begin(), b.end());
    return a;
}

TEST(PauseSplitter, CutsInTheMiddleOfPausesOrEveryThirtySecondsCoveringEverySample) {
    // 0.5 s quiet, 1 s loud, 0.4 s quiet, 1 s loud, 0.1 s quiet (too short), 1 s loud, 1 s
    // quiet: one cut, in the middle of the 0.4 s pause.
    const auto samples = tone(8000, 0) + tone(16000, 8000) + tone(6400, 10) + tone(16000, 8000) +
                         tone(1600, 0) + tone(16000, 8000) + tone(16000, 0);
    EXPECT_EQ(PauseSplitter().Split(samples).size(), 1u) << "shorter than a piece";
    PauseSplitter splitter;
    splitter.shortestPiece = 0;
    const auto pieces = splitter.Split(samples);
    ASSERT_EQ(pieces.size(), 2u);
    EXPECT_EQ(pieces[0].end, 24000 + 3200);
    EXPECT_TRUE(pieces[0].begin == 0 && pieces[1].begin == pieces[0].end &&
                pieces[1].end == long(samples.size()));

    // Long stretches without pauses are cut too; the pieces cover every sample.
    std::mt19937 random(3);
    std::uniform_int_distribution<int> uniform(-8000, 8000);
    std::vector<int16_t> loud(16000 * 70 + 123);
    for (auto& x : loud)
        x = int16_t(uniform(random));
    for (const auto& s : {loud, std::vector<int16_t>(loud.size(), 0)}) {
        const auto pieces = PauseSplitter().Split(s);
        ASSERT_GE(pieces.size(), 3u);
        long at = 0;
        for (const auto& p : pieces) {
            EXPECT_EQ(p.begin, at);
            EXPECT_GT(p.end, p.begin);
            EXPECT_LE(p.end - p.begin, 30 * 16000);
            at = p.end;
        }
        EXPECT_EQ(at, long(s.size()));
    }
    EXPECT_THAT(PauseSplitter().Split({}), IsEmpty());
    EXPECT_EQ(PauseSplitter().Split(tone(5, 100)).size(), 1u);
}

}  // namespace
