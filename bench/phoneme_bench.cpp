// The Phoneme recognizer plug-in: speed on ten minutes of speech (the demo dialogue said over
// and over), on every core and on one, with the process's peak memory; and its accuracy on
// the demo dialogue against the phoneme times the dialogue was made with, both mapped to the
// demo's mouth shapes through the demo keyset's links.
//
//   build/bench/phoneme_bench --benchmark_repetitions=5
//
// Counters: "x_realtime" is seconds of sound per second of wall time, "x_realtime_per_core"
// per CPU second of all the process's threads; "peak_MB" the
// process's resident high-water mark; "accuracy" the share of frames whose mouth shape
// agrees with the reference.
#include <benchmark/benchmark.h>
#include <sys/resource.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <map>
#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include "toolkit/CueRecognizer.h"
#include "toolkit/CueRecognizerCatalog.h"
#include "toolkit/CueSound.h"
#include "toolkit/CueStatement.h"

namespace {

const std::string kDemo = CHIRRUP_SOURCE_DIR "/resources/demo";
const std::string kPlugin = CHIRRUP_BINARY_DIR "/lib/chirrup/plugins/Phoneme.so";

CueRecognizerCatalog& catalog() {
    static CueRecognizerCatalog* c = [] {
        auto* made = new CueRecognizerCatalog;
        made->LoadPlugin(kPlugin.c_str());
        return made;
    }();
    return *c;
}

std::unique_ptr<CueRecognizer> phoneme(const std::string& settings) {
    std::unique_ptr<CueRecognizer> r(catalog().FetchRecognizer("Phoneme"));
    if (r) {
        std::istringstream in(settings + "\nend\n");
        r->ReadSettings(in);
    }
    return r;
}

const CueSound& dialogue() {
    static CueSound sound((kDemo + "/dialogue.aiff").c_str());
    return sound;
}

// The dialogue repeated to ten minutes.
const CueSound& ten_minutes() {
    static std::unique_ptr<CueSound> sound = [] {
        const std::vector<float>& one = dialogue().Channel(0);
        std::vector<float> all;
        const size_t want = size_t(600.0 * dialogue().Rate());
        all.reserve(want + one.size());
        while (all.size() < want)
            all.insert(all.end(), one.begin(), one.end());
        all.resize(want);
        return CueSound::FromSamples({all}, dialogue().Rate());
    }();
    return *sound;
}

double peak_megabytes() {
    std::ifstream status("/proc/self/status");
    std::string line;
    while (std::getline(status, line))
        if (line.rfind("VmHWM:", 0) == 0)
            return std::stod(line.substr(6)) / 1024.0;
    return 0.0;
}

// CPU seconds of the whole process (all threads) so far.
double process_cpu_seconds() {
    rusage usage{};
    getrusage(RUSAGE_SELF, &usage);
    return usage.ru_utime.tv_sec + usage.ru_stime.tv_sec +
           (usage.ru_utime.tv_usec + usage.ru_stime.tv_usec) / 1e6;
}

void BM_TenMinutes(benchmark::State& state) {
    const CueSound& sound = ten_minutes();
    auto r = phoneme("threads " + std::to_string(state.range(0)) + "\nspeed " +
                     (state.range(1) == 0   ? "fast"
                      : state.range(1) == 1 ? "balanced"
                                            : "accurate"));
    if (!r) {
        state.SkipWithError("the Phoneme plug-in is not built");
        return;
    }
    const double cpuBefore = process_cpu_seconds();
    for (auto _ : state)
        if (!r->Recognize(sound))
            state.SkipWithError("recognition failed");
    // Seconds of sound per CPU second of all threads: what one free core would manage.
    state.counters["x_realtime_per_core"] =
        sound.Length() * double(state.iterations()) / (process_cpu_seconds() - cpuBefore);
    state.counters["x_realtime"] = benchmark::Counter(sound.Length() * double(state.iterations()),
                                                      benchmark::Counter::kIsRate);
    state.counters["peak_MB"] = peak_megabytes();
}
// Two hours of speech at 22050 Hz, fast, on every core: whether time and memory stay in
// proportion. "sound_MB" is what the sound itself holds (its float samples);
// "peak_MB" the process's high-water mark, so that the plug-in's own share is the difference
// less what the process held before (about 40 MB). Run it by itself, as the high-water mark
// is the process's: --benchmark_filter=BM_TwoHours.
void BM_TwoHours(benchmark::State& state) {
    std::unique_ptr<CueSound> sound;
    {
        const std::vector<float>& one = dialogue().Channel(0);
        std::vector<float> all;
        const size_t want = size_t(7200.0 * dialogue().Rate());
        all.reserve(want);
        while (all.size() < want)
            all.insert(all.end(), one.begin(),
                       one.begin() + long(std::min(one.size(), want - all.size())));
        std::vector<std::vector<float>> channels;
        channels.push_back(std::move(all));  // moved, not copied as a braced list would be
        sound = CueSound::FromSamples(std::move(channels), dialogue().Rate());
    }
    auto r = phoneme("speed fast");
    if (!r) {
        state.SkipWithError("the Phoneme plug-in is not built");
        return;
    }
    const double before = peak_megabytes();
    for (auto _ : state)
        if (!r->Recognize(*sound))
            state.SkipWithError("recognition failed");
    state.counters["x_realtime"] = benchmark::Counter(sound->Length() * double(state.iterations()),
                                                      benchmark::Counter::kIsRate);
    state.counters["sound_MB"] = double(sound->FrameCount()) * sizeof(float) / 1048576.0;
    state.counters["peak_before_MB"] = before;
    state.counters["peak_MB"] = peak_megabytes();
    state.counters["results"] = double(r->results.size());
}
BENCHMARK(BM_TwoHours)->Unit(benchmark::kSecond)->Iterations(1)->UseRealTime();

// Threads (0: one per core), speed (0 fast, 1 balanced, 2 accurate).
BENCHMARK(BM_TenMinutes)
    ->ArgsProduct({{0, 1}, {0, 1}})
    ->Unit(benchmark::kSecond)
    ->Iterations(1)
    ->UseRealTime();

// espeak-ng's English phoneme names (voice en-us), as the recognizer's phones. A vowel with
// an r after it in one name ("e@" in "there", "A@" in "car") is two phones, as the speech
// model's dictionary writes those words ("DH EH R", "K AA R"): the vowel for the first half
// of its time, "R" (or "ER") for the second. ";" is the glide espeak-ng puts between a vowel
// ending in "i" and the next one ("the old"), "r-" a linking r. Pauses are silence.
const std::map<std::string, std::vector<std::string>> kEspeakToPhones = {
    {"@", {"AH"}},       {"@2", {"AH"}},        {"a#", {"AH"}},        {"V", {"AH"}},
    {"3", {"ER"}},       {"3:", {"ER"}},        {"@L", {"L"}},         {"D", {"DH"}},
    {"T", {"TH"}},       {"E", {"EH"}},         {"S", {"SH"}},         {"Z", {"ZH"}},
    {"U", {"UH"}},       {"N", {"NG"}},         {"_", {"SIL"}},        {"_:", {"SIL"}},
    {"aI", {"AY"}},      {"aU", {"AW"}},        {"eI", {"EY"}},        {"oU", {"OW"}},
    {"OI", {"OY"}},      {"I", {"IH"}},         {"I2", {"IH"}},        {"I#", {"IH"}},
    {"i", {"IY"}},       {"i:", {"IY"}},        {"a", {"AE"}},         {"aa", {"AE"}},
    {"0", {"AA"}},       {"O2", {"AA"}},        {"A:", {"AA"}},        {"O:", {"AO"}},
    {"O", {"AO"}},       {"u:", {"UW"}},        {"e@", {"EH", "R"}},   {"A@", {"AA", "R"}},
    {"O@", {"AO", "R"}}, {"o@", {"AO", "R"}},   {"i@", {"IY", "R"}},   {"i@3", {"IY", "R"}},
    {"U@", {"UH", "R"}}, {"aI@", {"AY", "ER"}}, {"aU@", {"AW", "ER"}}, {"b", {"B"}},
    {"d", {"D"}},        {"f", {"F"}},          {"g", {"G"}},          {"h", {"HH"}},
    {"j", {"Y"}},        {";", {"Y"}},          {"k", {"K"}},          {"l", {"L"}},
    {"m", {"M"}},        {"n", {"N"}},          {"p", {"P"}},          {"r", {"R"}},
    {"r-", {"R"}},       {"s", {"S"}},          {"t", {"T"}},          {"t#", {"T"}},
    {"t2", {"T"}},       {"d#", {"D"}},         {"v", {"V"}},          {"w", {"W"}},
    {"z", {"Z"}},        {"tS", {"CH"}},        {"dZ", {"JH"}}};

// The demo keyset's links from phones to mouth shapes.
std::map<std::string, std::string> demo_links() {
    std::map<std::string, std::string> links;
    std::ifstream in(kDemo + "/demo.kset");
    CueStatement s;
    bool inside = false;
    while (s.Read(in)) {
        if (s.Matches("begin") && s.Matches("recognizer-links", 1) && s.Matches("Phoneme", 2))
            inside = true;
        else if (inside && s.Matches("end"))
            break;
        else if (inside && s.Matches("link") && s.Count() == 4)
            links[s.ArgText(1)] = s.ArgText(3);
    }
    return links;
}

// When each phone starts, from an espeak-ng phoneme time list (tools/phoneme-times.sh).
// A name missing from the table is reported and counted as silence.
std::vector<std::pair<double, std::string>> phone_starts(const std::string& path) {
    std::vector<std::pair<double, std::string>> starts;  // time, phone
    std::vector<size_t> secondHalves;                    // entries timed from their neighbours
    std::ifstream in(path);
    std::string line;
    while (std::getline(in, line)) {
        std::istringstream words(line);
        double t;
        std::string kind, name;
        if (!(words >> t >> kind))
            continue;
        if (kind == "phoneme" && words >> name) {
            auto phones = kEspeakToPhones.find(name);
            if (phones == kEspeakToPhones.end()) {
                std::fprintf(stderr, "%s: espeak-ng phoneme [%s] is not in the table\n",
                             path.c_str(), name.c_str());
                starts.push_back({t, "SIL"});
                continue;
            }
            starts.push_back({t, phones->second[0]});
            for (size_t i = 1; i < phones->second.size(); ++i) {
                secondHalves.push_back(starts.size());
                starts.push_back({t, phones->second[i]});
            }
        } else if (kind == "end") {
            starts.push_back({t, "SIL"});
        }
    }
    for (size_t i : secondHalves) {
        const double next = i + 1 < starts.size() ? starts[i + 1].first : starts[i].first;
        starts[i].first = (starts[i - 1].first + next) / 2.0;
    }
    return starts;
}

// The reference mouth shape of each frame (30 per second): the phone sounding at the middle
// of the frame; silence before the first phoneme and after the end.
std::vector<std::string> reference_shapes(const std::string& phonemes, long frames,
                                          const std::map<std::string, std::string>& links) {
    const auto starts = phone_starts(phonemes);
    std::vector<std::string> shapes;
    for (long f = 0; f < frames; ++f) {
        const double middle = (f + 0.5) / 30.0;
        std::string phone = "SIL";
        for (const auto& [t, p] : starts)
            if (t <= middle)
                phone = p;
        shapes.push_back(links.count(phone) ? links.at(phone) : "?");
    }
    return shapes;
}

// Frames that agree, frames in all, and how often each reference shape was taken for each
// other shape, over the recordings measured.
struct Tally {
    long agree = 0;
    long frames = 0;
    std::map<std::pair<std::string, std::string>, long> confused;  // (reference, recognized)
    std::map<std::string, long> reference;

    void Add(const CueRecognizer& r, const std::vector<std::string>& shapes,
             const std::map<std::string, std::string>& links) {
        for (size_t i = 0; i < r.results.size(); ++i) {
            const std::string& phone = r.targets[size_t(r.results[i].targetIndex)].name;
            const std::string got = links.count(phone) ? links.at(phone) : "?";
            ++frames;
            ++reference[shapes[i]];
            if (got == shapes[i])
                ++agree;
            else
                ++confused[{shapes[i], got}];
        }
    }
    // The commonest confusions, to stderr, when PHONEME_BENCH_CONFUSIONS is set.
    void Print(const char* title) const {
        if (!std::getenv("PHONEME_BENCH_CONFUSIONS"))
            return;
        std::vector<std::pair<long, std::pair<std::string, std::string>>> sorted;
        for (const auto& [shapes, n] : confused)
            sorted.push_back({n, shapes});
        std::sort(sorted.rbegin(), sorted.rend());
        std::fprintf(stderr, "%s: %ld of %ld frames agree; commonest confusions:\n", title, agree,
                     frames);
        for (size_t i = 0; i < sorted.size() && i < 12; ++i)
            std::fprintf(stderr, "  %-12s taken for %-12s %4ld frames (%.0f%% of its %ld)\n",
                         sorted[i].second.first.c_str(), sorted[i].second.second.c_str(),
                         sorted[i].first,
                         100.0 * sorted[i].first / reference.at(sorted[i].second.first),
                         reference.at(sorted[i].second.first));
    }
};

const char* const kSpeeds[] = {"fast", "balanced", "accurate"};

// Speed and minimum phone length, as the arguments of the accuracy benchmarks give them.
std::unique_ptr<CueRecognizer> measured_recognizer(benchmark::State& state) {
    return phoneme(std::string("speed ") + kSpeeds[state.range(0)] + "\nminimum " +
                   std::to_string(state.range(1)));
}

// The tally's confusions under `what` and the run's settings, and its agreement as counters.
void report_accuracy(benchmark::State& state, const Tally& tally, const char* what) {
    tally.Print((std::string(what) + ", " + kSpeeds[state.range(0)] + ", minimum " +
                 std::to_string(state.range(1)))
                    .c_str());
    state.counters["accuracy"] = double(tally.agree) / double(tally.frames);
    state.counters["frames"] = double(tally.frames);
}

void BM_DemoAccuracy(benchmark::State& state) {
    auto r = measured_recognizer(state);
    if (!r) {
        state.SkipWithError("the Phoneme plug-in is not built");
        return;
    }
    const auto links = demo_links();
    for (auto _ : state)
        r->Recognize(dialogue());
    Tally tally;
    tally.Add(*r,
              reference_shapes(kDemo + "/dialogue-phonemes.txt", long(r->results.size()), links),
              links);
    report_accuracy(state, tally, "demo");
}
// Speed (0 fast, 1 balanced, 2 accurate), minimum phone length in frames; one pass each.
void accuracy_runs(benchmark::internal::Benchmark* b) {
    b->ArgsProduct({{0, 1, 2}, {1, 2, 3}})->Unit(benchmark::kMillisecond)->Iterations(1);
}
BENCHMARK(BM_DemoAccuracy)->Apply(accuracy_runs);

// The same measure over other recordings: every NAME.aiff with a NAME-phonemes.txt in the
// folder named by PHONEME_BENCH_PASSAGES (bench/phoneme-passages.sh makes such a folder with
// espeak-ng), so that settings chosen on the demo can be checked on speech they were not
// chosen on. Skipped without the folder.
void BM_PassageAccuracy(benchmark::State& state) {
    const char* folder = std::getenv("PHONEME_BENCH_PASSAGES");
    if (!folder) {
        state.SkipWithError("PHONEME_BENCH_PASSAGES names no folder");
        return;
    }
    auto r = measured_recognizer(state);
    if (!r) {
        state.SkipWithError("the Phoneme plug-in is not built");
        return;
    }
    std::vector<std::string> names;
    std::error_code error;
    for (const auto& entry : std::filesystem::directory_iterator(folder, error))
        if (entry.path().extension() == ".aiff")
            names.push_back(entry.path().string());
    std::sort(names.begin(), names.end());
    const auto links = demo_links();
    Tally tally;
    for (auto _ : state) {
        for (const std::string& name : names) {
            const std::string phonemes = name.substr(0, name.size() - 5) + "-phonemes.txt";
            CueSound sound(name.c_str());
            if (!sound.Valid() || !std::filesystem::exists(phonemes) || !r->Recognize(sound))
                continue;
            tally.Add(*r, reference_shapes(phonemes, long(r->results.size()), links), links);
        }
    }
    if (tally.frames == 0) {
        state.SkipWithError("no recording with its phoneme times in PHONEME_BENCH_PASSAGES");
        return;
    }
    report_accuracy(state, tally, "passages");
}
BENCHMARK(BM_PassageAccuracy)->Apply(accuracy_runs);

}  // namespace

BENCHMARK_MAIN();
