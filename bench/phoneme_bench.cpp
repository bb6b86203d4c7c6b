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
// Threads (0: one per core), speed (0 fast, 1 balanced, 2 accurate).
BENCHMARK(BM_TenMinutes)
    ->Args({0, 0})
    ->Args({1, 0})
    ->Args({0, 1})
    ->Args({1, 1})
    ->Unit(benchmark::kSecond)
    ->Iterations(1)
    ->UseRealTime();

// espeak-ng's phoneme names in the reference, as the recognizer's phones.
const std::map<std::string, std::string> kEspeakToPhone = {
    {"@", "AH"},  {"D", "DH"},   {"E", "EH"},  {"S", "SH"},  {"U", "UH"},  {"V", "AH"},
    {"_", "SIL"}, {"_:", "SIL"}, {"aI", "AY"}, {"d", "D"},   {"e@", "EH"}, {"f", "F"},
    {"h", "HH"},  {"j", "Y"},    {"k", "K"},   {"l", "L"},   {"m", "M"},   {"oU", "OW"},
    {"p", "P"},   {"r", "R"},    {"s", "S"},   {"u:", "UW"}, {"w", "W"}};

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

// The reference mouth shape of each frame (30 per second): the phoneme sounding at the
// middle of the frame; silence before the first phoneme and after the end.
std::vector<std::string> reference_shapes(long frames,
                                          const std::map<std::string, std::string>& links) {
    std::vector<std::pair<double, std::string>> starts;  // time, phone
    std::ifstream in(kDemo + "/dialogue-phonemes.txt");
    std::string line;
    while (std::getline(in, line)) {
        std::istringstream words(line);
        double t;
        std::string kind, name;
        if (!(words >> t >> kind))
            continue;
        if (kind == "phoneme" && words >> name) {
            auto phone = kEspeakToPhone.find(name);
            starts.push_back({t, phone == kEspeakToPhone.end() ? "SIL" : phone->second});
        } else if (kind == "end") {
            starts.push_back({t, "SIL"});
        }
    }
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

void BM_DemoAccuracy(benchmark::State& state) {
    static const char* const kSpeeds[] = {"fast", "balanced", "accurate"};
    auto r = phoneme(std::string("speed ") + kSpeeds[state.range(0)] + "\nminimum " +
                     std::to_string(state.range(1)));
    if (!r) {
        state.SkipWithError("the Phoneme plug-in is not built");
        return;
    }
    const auto links = demo_links();
    for (auto _ : state)
        r->Recognize(dialogue());
    const auto reference = reference_shapes(long(r->results.size()), links);
    long agree = 0;
    for (size_t i = 0; i < r->results.size(); ++i) {
        const std::string& phone = r->targets[size_t(r->results[i].targetIndex)].name;
        agree += links.count(phone) && links.at(phone) == reference[i];
    }
    state.counters["accuracy"] = double(agree) / double(r->results.size());
    state.counters["frames"] = double(r->results.size());
}
// Speed (0 fast, 1 balanced, 2 accurate), minimum phone length in frames.
BENCHMARK(BM_DemoAccuracy)
    ->ArgsProduct({{0, 1, 2}, {1, 2, 3}})
    ->Unit(benchmark::kMillisecond)
    ->Iterations(1);

}  // namespace

BENCHMARK_MAIN();
