#include "phoneme/PhoneDecoder.h"

#include <pocketsphinx.h>
#include <sphinxbase/err.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <mutex>

#include "phoneme/PhoneSet.h"

namespace {
// Frames per second of the model's front end, and the length of the window each frame
// analyses (410 samples at 16 kHz): frame n hears [n / 100, n / 100 + kWindow) seconds.
constexpr double kFrameRate = 100.0;
constexpr double kWindow = 0.025625;
constexpr double kSampleRate = 16000.0;
// A run of frames first .. last is placed between the midpoints of its outer frames'
// windows and their neighbours', so that a phone's span is centred on what its frames heard
// rather than on where their windows begin.
constexpr double kFrameCentre = (kWindow - 1.0 / kFrameRate) / 2.0;

// The decoder's log lines would flood the error stream; they are switched off once.
std::once_flag quietLog;

bool is_file(const std::string& path) {
    struct stat st;
    return stat(path.c_str(), &st) == 0 && S_ISREG(st.st_mode);
}
}  // namespace

const std::vector<std::string>& PhoneDecoder::ModelFiles() {
    static const std::vector<std::string> files = {
        "en-us/mdef",    "en-us/feat.params",         "en-us/means",     "en-us/variances",
        "en-us/sendump", "en-us/transition_matrices", "en-us/noisedict", "en-us-phone.lm.bin"};
    return files;
}

std::string PhoneDecoder::MissingFile(const std::string& modelDir) {
    for (const std::string& f : ModelFiles())
        if (!is_file(modelDir + "/" + f))
            return modelDir + "/" + f;
    return std::string();
}

bool PhoneDecoder::ModelLoads(const std::string& modelDir) {
    static std::mutex mutex;
    static std::map<std::string, bool> known;
    std::lock_guard<std::mutex> lock(mutex);
    const auto found = known.find(modelDir);
    if (found != known.end())
        return found->second;
    std::fflush(nullptr);  // the child must not write this process's buffered output again
    const pid_t child = fork();
    if (child == 0) {
        // The library's fatal errors call exit(): the handler registered last runs first and
        // leaves at once, before the inherited exit handlers (which may wait on threads that
        // do not exist in the child).
        std::atexit([] { _exit(1); });
        PhoneDecoder decoder(modelDir, kFast);
        _exit(decoder.Ready() ? 0 : 1);
    }
    bool loads = false;
    if (child > 0) {
        int status = 0;
        pid_t done;
        while ((done = waitpid(child, &status, 0)) < 0 && errno == EINTR) {
        }
        loads = done == child && WIFEXITED(status) && WEXITSTATUS(status) == 0;
    }
    known[modelDir] = loads;
    return loads;
}

PhoneDecoder::PhoneDecoder(const std::string& modelDir, Effort effort) {
    std::call_once(quietLog, [] { err_set_logfp(nullptr); });
    const std::string hmm = modelDir + "/en-us";
    const std::string lm = modelDir + "/en-us-phone.lm.bin";
    // Narrower beams prune more hypotheses: faster, and a little less accurate. The phone
    // language model's weight is lower with the narrowest beam, where a heavier one prunes
    // away the right phones. The noise and silence trackers are off because they carry over
    // from one piece to the next, which would make the results depend on which decoder got
    // which piece before.
    const char* beam = effort == kFast ? "1e-10" : effort == kBalanced ? "1e-15" : "1e-40";
    const char* weight = effort == kFast ? "2.0" : "2.5";
    config_ = cmd_ln_init(nullptr, ps_args(), TRUE, "-hmm", hmm.c_str(), "-allphone", lm.c_str(),
                          "-allphone_ci", "yes", "-backtrace", "no", "-beam", beam, "-pbeam", beam,
                          "-lw", weight, "-samprate", "16000", "-remove_noise", "no",
                          "-remove_silence", "no", nullptr);
    if (config_)
        decoder_ = ps_init(config_);
}

PhoneDecoder::~PhoneDecoder() {
    if (decoder_)
        ps_free(decoder_);
    if (config_)
        cmd_ln_free_r(config_);
}

bool PhoneDecoder::Decode(const std::vector<int16_t>& samples, long begin, long end,
                          std::vector<PhoneTimeline::Segment>& out) {
    if (!decoder_ || begin < 0 || end > long(samples.size()) || end < begin)
        return false;
    if (end == begin)
        return true;
    if (ps_start_utt(decoder_) < 0)
        return false;
    // A least-significant-bit dither keeps runs of digital silence, as in synthetic speech or
    // gated recordings, from giving the front end the logarithm of nothing. Its pattern
    // depends only on where the piece starts, so that results repeat whichever decoder
    // takes the piece (the library's own dither shares one generator between threads).
    piece_.assign(samples.begin() + begin, samples.begin() + end);
    uint32_t state = uint32_t(begin) * 2654435761u + 1u;
    for (int16_t& x : piece_) {
        state = state * 1664525u + 1013904223u;
        const uint32_t d = state >> 30;  // 0 to 3: a quarter of the samples go down, a quarter up
        if (d == 0 && x > -32768)
            --x;
        else if (d == 3 && x < 32767)
            ++x;
    }
    if (ps_process_raw(decoder_, piece_.data(), piece_.size(), FALSE, TRUE) < 0) {
        ps_end_utt(decoder_);
        return false;
    }
    if (ps_end_utt(decoder_) < 0)
        return false;
    const double offset = begin / kSampleRate + kFrameCentre;
    for (ps_seg_t* seg = ps_seg_iter(decoder_); seg; seg = ps_seg_next(seg)) {
        int first = 0, last = 0;
        ps_seg_frames(seg, &first, &last);
        out.push_back({PhoneSet::IndexOf(ps_seg_word(seg)), offset + first / kFrameRate,
                       offset + (last + 1) / kFrameRate});
    }
    return true;
}
