#include "phoneme/PhonemeRecognizer.h"

#include <dlfcn.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cmath>
#include <condition_variable>
#include <cstring>
#include <exception>
#include <mutex>
#include <ostream>
#include <thread>

#include "phoneme/PauseSplitter.h"
#include "phoneme/PhoneSet.h"
#include "phoneme/PhoneTimeline.h"
#include "phoneme/Resample16k.h"
#include "phoneme/SoundLevels.h"
#include "toolkit/CueChirrup.h"
#include "toolkit/CuePlugin.h"
#include "toolkit/CueSound.h"
#include "toolkit/CueTokenList.h"
#include "toolkit/KLErrHandler.h"

CHIRRUP_PLUGIN(PhonemeRecognizer)

const char* const PhonemeRecognizer::kSpeedNames[3] = {"fast", "balanced", "accurate"};

PhonemeRecognizer::PhonemeRecognizer() : CueRecognizer("Phoneme") {
    for (int i = 0; i < PhoneSet::kCount; ++i)
        AddTarget(PhoneSet::Name(i));
    set_sample_sounds();
}

PhonemeRecognizer::~PhonemeRecognizer() = default;

std::string PhonemeRecognizer::SampleFolder() {
    Dl_info info{};
    if (dladdr(reinterpret_cast<void*>(&chirrup_plugin_create), &info) == 0 || !info.dli_fname)
        return "Phoneme-samples";
    std::string file = info.dli_fname;
    const size_t slash = file.rfind('/');
    return (slash == std::string::npos ? std::string(".") : file.substr(0, slash)) +
           "/Phoneme-samples";
}

void PhonemeRecognizer::set_sample_sounds() {
    const std::string folder = SampleFolder();
    for (Target& t : targets)
        t.soundFile = folder + "/" + t.name + ".wav";
}

void PhonemeRecognizer::ResetSettings() {
    CueRecognizer::ResetSettings();
    set_sample_sounds();
    minimum = kDefaultMinimum;
    speed = PhoneDecoder::kFast;
    threads = 0;
    models = kDefaultModels;
}

CueRecognizer* PhonemeRecognizer::Clone() const {
    return new PhonemeRecognizer();
}

void PhonemeRecognizer::ReadParameter(const CueTokenList& s) {
    if (s.Count() != 2)
        return;
    if (s.Matches("minimum")) {
        const int n = s.ArgInt(1);
        if (n >= 1 && n <= kMaximumMinimum)
            minimum = n;
    } else if (s.Matches("speed")) {
        for (int i = 0; i < 3; ++i)
            if (s.Matches(kSpeedNames[i], 1))
                speed = PhoneDecoder::Effort(i);
    } else if (s.Matches("threads")) {
        const int n = s.ArgInt(1);
        if (n >= 0 && n <= kMaximumThreads)
            threads = n;
    } else if (s.Matches("models") && s.ArgText(1)[0] != '\0') {
        models = s.ArgText(1);
    }
}

void PhonemeRecognizer::WriteParameters(std::ostream& out) const {
    out << "    minimum " << minimum << "\n";
    out << "    speed " << kSpeedNames[speed] << "\n";
    out << "    threads " << threads << "\n";
    // The folder is quoted, so that one with blanks reads back whole.
    out << "    models \"" << models << "\"\n";
}

namespace {
void step_changed(void* r, int frames) {
    static_cast<CueRecognizer*>(r)->step = CueTime::FromFrames(frames);
}
void minimum_changed(void* r, int steps) {
    static_cast<PhonemeRecognizer*>(r)->minimum = std::clamp(steps, 1, 10);
}
void speed_changed(void* r, int index) {
    static_cast<PhonemeRecognizer*>(r)->speed = PhoneDecoder::Effort(std::clamp(index, 0, 2));
}
}  // namespace

void PhonemeRecognizer::UpdatePanel() {
    CueChirrup::CreateIntSlider(this, "step", 1, 10, std::max(1, int(step.Frames() + 0.5)),
                                step_changed);
    CueChirrup::CreateIntSlider(this, "minimum", 1, kMaximumMinimum, minimum, minimum_changed);
    CueChirrup::CreateOption(this, "speed", 3, kSpeedNames, int(speed), speed_changed);
}

int PhonemeRecognizer::thread_count() const {
    if (threads > 0)
        return threads;
    const unsigned cores = std::thread::hardware_concurrency();
    return int(std::clamp(cores, 1u, unsigned(kMaximumThreads)));
}

bool PhonemeRecognizer::ready_decoders(size_t count) {
    if (decoderModels_ != models || decoderSpeed_ != speed) {
        decoders_.clear();
        decoderModels_ = models;
        decoderSpeed_ = speed;
    }
    if (decoders_.empty() && !PhoneDecoder::ModelLoads(models))
        return false;
    while (decoders_.size() < count) {
        auto decoder = std::make_unique<PhoneDecoder>(models, speed);
        if (!decoder->Ready())
            return false;
        decoders_.push_back(std::move(decoder));
    }
    return true;
}

bool PhonemeRecognizer::Recognize(const CueSound& sound) {
    results.clear();
    // Nothing may leave the plug-in: a failure of any kind is reported here.
    try {
        return recognize(sound);
    } catch (const std::exception& e) {
        KLWarning("Recognizer [%s] failed: %s\n", Name(), e.what());
    } catch (...) {
        KLWarning("Recognizer [%s] failed.\n", Name());
    }
    results.clear();
    return false;
}

bool PhonemeRecognizer::recognize(const CueSound& sound) {
    if (!sound.Valid() || step <= CueTime())
        return false;
    const std::string missing = PhoneDecoder::MissingFile(models);
    if (!missing.empty()) {
        KLWarning(
            "Recognizer [%s] cannot run: its speech model file [%s] is missing (install "
            "pocketsphinx-en-us, or name the model folder with \"models DIR\" in its "
            "settings).\n",
            Name(), missing.c_str());
        return false;
    }
    if (!CanResample16k(sound.Rate())) {
        KLWarning("Recognizer [%s] cannot convert the sound's rate of %g Hz.\n", Name(),
                  sound.Rate());
        return false;
    }
    // The pieces are found from the loudness at the sound's own rate, and each worker
    // converts only the piece it decodes: no copy of the whole sound is made.
    const double rate = sound.Rate();
    const long frames = sound.FrameCount();
    const double block = double(PauseSplitter::kBlock) / 16000.0;
    std::vector<PauseSplitter::Piece> pieces = PauseSplitter().SplitLevels(
        SoundLevels::Measure(sound, block, SoundLevels::SpanCount(sound, block)));
    for (PauseSplitter::Piece& p : pieces) {
        p.begin = std::min(frames, std::lround(double(p.begin) * block * rate));
        p.end = std::min(frames, std::lround(double(p.end) * block * rate));
    }
    if (!pieces.empty())
        pieces.back().end = frames;
    const size_t workers = std::min(pieces.size(), size_t(thread_count()));
    if (!ready_decoders(std::max<size_t>(workers, 1))) {
        KLWarning("Recognizer [%s] could not start its speech decoder with the model in [%s].\n",
                  Name(), models.c_str());
        return false;
    }

    // Workers take pieces in order; this thread reports progress until all are done.
    std::vector<std::vector<PhoneTimeline::Segment>> found(pieces.size());
    std::atomic<size_t> next{0};
    std::atomic<long> framesDone{0};
    std::atomic<bool> failed{false};
    std::mutex mutex;
    std::condition_variable finished;
    size_t running = 0;
    auto work = [&](PhoneDecoder* decoder) {
        std::vector<int16_t> samples;
        for (size_t i; (i = next++) < pieces.size() && !failed;) {
            if (!Resample16k(sound, pieces[i].begin, pieces[i].end, samples) ||
                !decoder->Decode(samples, 0, long(samples.size()), found[i])) {
                failed = true;
                break;
            }
            const double start = double(pieces[i].begin) / rate;
            for (PhoneTimeline::Segment& s : found[i]) {
                s.start += start;
                s.end += start;
            }
            framesDone += pieces[i].end - pieces[i].begin;
        }
        std::lock_guard<std::mutex> lock(mutex);
        --running;
        finished.notify_all();
    };
    // `running` counts the workers started, before each starts: one may finish before the
    // next is started.
    std::vector<std::thread> pool;
    try {
        for (size_t w = 0; w < workers; ++w) {
            {
                std::lock_guard<std::mutex> lock(mutex);
                ++running;
            }
            pool.emplace_back(work, decoders_[w].get());
        }
    } catch (...) {
        // No thread may be left running when the pool goes.
        failed = true;
        for (std::thread& t : pool)
            t.join();
        throw;
    }
    {
        std::unique_lock<std::mutex> lock(mutex);
        while (!finished.wait_for(lock, std::chrono::milliseconds(100),
                                  [&] { return running == 0; })) {
            lock.unlock();
            CueChirrup::Progress(this, float(framesDone) / float(frames));
            lock.lock();
        }
    }
    for (std::thread& t : pool)
        t.join();
    if (failed) {
        KLWarning("Recognizer [%s]: the speech decoder failed.\n", Name());
        return false;
    }

    std::vector<PhoneTimeline::Segment> segments;
    for (const auto& piece : found)
        segments.insert(segments.end(), piece.begin(), piece.end());
    const double stepSeconds = step.Seconds();
    const long count = PhoneTimeline::StepCount(double(frames) / rate, stepSeconds);
    std::vector<int> perStep =
        PhoneTimeline::StepTargets(segments, stepSeconds, count, PhoneSet::kSilence);
    const std::vector<double> levels = SoundLevels::Measure(sound, stepSeconds, count);
    PhoneTimeline::SilenceQuietSteps(perStep, levels, kQuietLevel, PhoneSet::kSilence);
    PhoneTimeline::FillLoudSilence(
        perStep, levels, PhoneTimeline::SpeechLevel(levels, kSpeechBelowPeak, kSpeechAboveFloor),
        std::max(1L, std::lround(kSpeechReach / stepSeconds)), PhoneSet::kSilence);
    PhoneTimeline::AbsorbShortRuns(perStep, minimum);
    results.reserve(perStep.size());
    for (int t : perStep)
        results.push_back({targets[size_t(t)].keyShapeIndex, t});
    return true;
}
