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
// Frames per second of the model's front end.
constexpr double kFrameRate = 100.0;
constexpr double kSampleRate = 16000.0;

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
    // Narrower beams prune more hypotheses: faster, and a little less accurate. The noise
    // and silence trackers are off because they carry over from one piece to the next, which
    // would make the results depend on which decoder got which piece before.
    const char* beam = effort == kFast ? "1e-10" : effort == kBalanced ? "1e-20" : "1e-40";
    config_ = cmd_ln_init(nullptr, ps_args(), TRUE, "-hmm", hmm.c_str(), "-allphone", lm.c_str(),
                          "-allphone_ci", "yes", "-backtrace", "no", "-beam", beam, "-pbeam", beam,
                          "-lw", "2.0", "-samprate", "16000", "-remove_noise", "no",
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
    if (ps_process_raw(decoder_, samples.data() + begin, size_t(end - begin), FALSE, TRUE) < 0) {
        ps_end_utt(decoder_);
        return false;
    }
    if (ps_end_utt(decoder_) < 0)
        return false;
    const double offset = begin / kSampleRate;
    for (ps_seg_t* seg = ps_seg_iter(decoder_); seg; seg = ps_seg_next(seg)) {
        int first = 0, last = 0;
        ps_seg_frames(seg, &first, &last);
        out.push_back({PhoneSet::IndexOf(ps_seg_word(seg)), offset + first / kFrameRate,
                       offset + (last + 1) / kFrameRate});
    }
    return true;
}
