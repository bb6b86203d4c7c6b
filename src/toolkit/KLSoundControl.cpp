#include "toolkit/KLSoundControl.h"

#include <SDL2/SDL.h>
#include <dlfcn.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cmath>
#include <cstdlib>
#include <limits>
#include <memory>
#include <string>

#include "toolkit/CueSound.h"
#include "toolkit/DeviceClock.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLTimer.h"
#include "toolkit/SoundVoice.h"
#include "toolkit/TimerClock.h"

// The device is fed by SDL's audio thread through `feed`. What it plays is described by
// `Pass`, which the event-loop thread changes only while holding SDL's device lock (so the
// callback never sees half a change); the callback itself never allocates, never waits on
// the event loop and reads the timer only through its shared atomic clock.

namespace {

constexpr double kDriftLimit = 0.005;  // seconds of timer time before the position is cut
// Below the limit the speed is trimmed in proportion to the difference (per second of
// difference), within a few percent, so that a device whose clock runs a little fast or
// slow is followed smoothly instead of by repeated cuts.
constexpr double kTrimGain = 20.0;
constexpr double kTrimLimit = 0.05;
constexpr int kGrainFade = 64;  // device frames faded at each end of a scrub grain
const double kSilent = std::numeric_limits<double>::quiet_NaN();

enum class Mode { Idle, Play, Drag };

struct Pass {
    Mode mode = Mode::Idle;
    const CueSound* sound = nullptr;
    std::shared_ptr<const TimerClock> clock;  // released on the event-loop thread only
    double speed = 1.0;
    double offset = 0.0;  // seconds added to the timer's position
    bool placed = false;  // the voice has been put at the timer's position
    const float* dragAt = nullptr;
    float dragLast = -1.0f;
    long grainLeft = 0;  // device frames of the current grain still to play
    long grainFrames = 0;
};

struct Output {
    SDL_AudioDeviceID device = 0;
    int rate = 0, channels = 0, samples = 0;
    std::string driver;
    std::unique_ptr<SoundVoice> voice;
    Pass pass;
    std::atomic<uint64_t> handed{0};
    // The last buffer, under a sequence count (odd while being written).
    std::atomic<unsigned> seq{0};
    std::atomic<double> handedClock{0.0}, handedPosition{kSilent};
    std::atomic<long> buffers{0};
    std::atomic<long> sounding{0};
    std::atomic<long> cuts{0};
    std::atomic<double> handedWoke{0.0};
    DeviceClock deviceClock;  // sound thread only
};

// Never destroyed: the program's statics (the workspace's sound, an audition's sample and
// timer) may be destroyed after this file's, and a sound being destroyed still asks the
// output to let go of it. The device itself is closed at exit, before any static is
// destroyed (see Open), so the sound thread never outlives what it reads.
Output& out = *new Output;
float speed = 1.0f;

void publish(double clock, double woke, double position) {
    out.seq.fetch_add(1, std::memory_order_acq_rel);
    out.handedClock.store(clock, std::memory_order_relaxed);
    out.handedWoke.store(woke, std::memory_order_relaxed);
    out.handedPosition.store(position, std::memory_order_relaxed);
    out.buffers.fetch_add(1, std::memory_order_relaxed);
    if (!std::isnan(position))
        out.sounding.fetch_add(1, std::memory_order_relaxed);
    out.seq.fetch_add(1, std::memory_order_acq_rel);
}

// A pass: the voice follows the timer. The sound position for timer time t is
// from + (t - from) * speed + offset, in the timer's direction; the samples handed now are
// heard one latency later, so they are taken at the timer's time then.
double render_pass(Pass& p, float* buffer, long frames, double now) {
    const TimerClock& clock = *p.clock;
    if (!clock.Running())
        return kSilent;
    SoundVoice& voice = *out.voice;
    const double rate = p.sound->Rate();
    const double t = clock.At(now + double(out.samples) / out.rate);
    const double expected = (clock.From() + (t - clock.From()) * p.speed + p.offset) * rate;
    const double end = (clock.From() + (clock.To() - clock.From()) * p.speed + p.offset) * rate;
    if (!p.placed || std::fabs(voice.Position() - expected) > kDriftLimit * p.speed * rate) {
        if (p.placed)
            out.cuts.fetch_add(1, std::memory_order_relaxed);
        voice.Jump(expected);
        p.placed = true;
    }
    // Seconds of timer time the voice is behind (positive) or ahead, in its direction.
    const double behind =
        (expected - voice.Position()) / (voice.Step() > 0 ? 1.0 : -1.0) / (p.speed * rate);
    voice.SetTrim(1.0 + std::clamp(kTrimGain * behind, -kTrimLimit, kTrimLimit));
    const double start = voice.Position();
    const double left = (end - start) / voice.Step();
    const long count = std::clamp(long(std::ceil(left - 1e-9)), 0L, frames);
    if (count == 0)
        return kSilent;
    voice.Render(buffer, count);
    return start / rate;
}

// Scrubbing: a new grain whenever the pointer has moved since the last buffer.
double render_drag(Pass& p, float* buffer, long frames) {
    if (p.clock && p.clock->Started() && !p.clock->Running())
        return kSilent;
    float at = 0.0f;
    __atomic_load(p.dragAt, &at, __ATOMIC_RELAXED);
    SoundVoice& voice = *out.voice;
    if (std::isfinite(at) && at != p.dragLast) {
        p.dragLast = at;
        voice.Jump(double(std::clamp(at, 0.0f, 1.0f)) * double(p.sound->FrameCount()));
        p.grainLeft = p.grainFrames;
    }
    if (p.grainLeft <= 0)
        return kSilent;
    const double start = voice.Position();
    const long count = std::min(frames, p.grainLeft);
    voice.Render(buffer, count);
    for (long i = 0; i < count; i++) {
        long from = p.grainFrames - p.grainLeft + i;  // frames into the grain
        long fade = std::min({from, p.grainFrames - 1 - from, long(kGrainFade)});
        if (fade < kGrainFade)
            for (int c = 0; c < out.channels; c++)
                buffer[i * out.channels + c] *= float(fade) / kGrainFade;
    }
    p.grainLeft -= count;
    return start / p.sound->Rate();
}

void feed(void*, Uint8* stream, int bytes) {
    auto* buffer = reinterpret_cast<float*>(stream);
    const long frames = bytes / long(sizeof(float) * out.channels);
    std::fill(buffer, buffer + frames * out.channels, 0.0f);
    const double woke = TimerClock::Now();
    // The device's steady clock, not the jittery moment this thread woke up.
    const double now = out.deviceClock.Update(woke, double(frames) / out.rate);
    double position = kSilent;
    Pass& p = out.pass;
    if (p.mode == Mode::Play && p.clock)
        position = render_pass(p, buffer, frames, now);
    else if (p.mode == Mode::Drag && p.dragAt)
        position = render_drag(p, buffer, frames);
    out.handed.fetch_add(uint64_t(frames), std::memory_order_relaxed);
    publish(now, woke, position);
}

// Swaps in a new pass; the old one's timer clock is released here, off the sound thread.
void install(Pass next) {
    SDL_LockAudioDevice(out.device);
    std::swap(out.pass, next);
    SDL_UnlockAudioDevice(out.device);
}

// Set by DisableAudioLibraryErrors: the ALSA library that SDL loads prints its own failures
// ("ALSA lib pcm.c:... Unknown PCM default") straight onto the error stream.
bool quietAudioLibrary = false;

// ALSA's error handler type; its header is not needed for this one call.
using AlsaErrorHandler = void (*)(const char*, int, const char*, int, const char*, ...);
void ignore_alsa_error(const char*, int, const char*, int, const char*, ...) {}

// Gives the ALSA library a handler that says nothing, before SDL loads it. The library is kept
// loaded, so that SDL's own load of it finds the same instance with the handler set. What
// went wrong still reaches the user through SDL's error text.
void silence_alsa() {
    static bool done = false;
    if (done)
        return;
    done = true;
    void* alsa = dlopen("libasound.so.2", RTLD_NOW | RTLD_LOCAL);
    if (!alsa)
        return;
    using SetHandler = int (*)(AlsaErrorHandler);
    auto set = reinterpret_cast<SetHandler>(dlsym(alsa, "snd_lib_error_set_handler"));
    if (set)
        set(ignore_alsa_error);
}

bool open_device(const char* driver) {
    // A driver named here wins over the SDL_AUDIODRIVER variable; none leaves SDL's choice.
    if (driver)
        SDL_SetHintWithPriority(SDL_HINT_AUDIODRIVER, driver, SDL_HINT_OVERRIDE);
    else
        SDL_ResetHint(SDL_HINT_AUDIODRIVER);
    if (SDL_InitSubSystem(SDL_INIT_AUDIO) != 0)
        return false;
    SDL_AudioSpec want{}, have{};
    want.freq = 48000;
    want.format = AUDIO_F32SYS;
    want.channels = 2;
    want.samples = 512;
    want.callback = feed;
    // The buffer size is never left to the driver: SDL 2.26's silent driver rounds it up to a
    // power of two without growing the buffer it hands to `feed`, which then writes past its
    // end on every call (480 frames: 4096 bytes into 3840). Held at the size asked for, SDL
    // rebuffers for a driver that wants another size, and the buffer always fits.
    out.device =
        SDL_OpenAudioDevice(nullptr, 0, &want, &have,
                            SDL_AUDIO_ALLOW_FREQUENCY_CHANGE | SDL_AUDIO_ALLOW_CHANNELS_CHANGE);
    if (out.device == 0) {
        SDL_QuitSubSystem(SDL_INIT_AUDIO);
        return false;
    }
    out.rate = have.freq;
    out.channels = have.channels;
    out.samples = have.samples;
    const char* name = SDL_GetCurrentAudioDriver();
    out.driver = name ? name : "";
    return true;
}

// The process that opened the device: a child forked from it has no sound thread to stop.
pid_t openedBy = 0;

// Closes the device when the program ends: registered after every static that exists
// before the first Open is made, so it runs before their destructors free anything the
// sound thread reads.
void close_at_exit() {
    if (getpid() == openedBy)
        KLSoundControl::Close();
}

}  // namespace

bool KLSoundControl::Open() {
    if (out.device)
        return true;
    static const bool closesAtExit = std::atexit(close_at_exit) == 0;
    if (!closesAtExit)
        KLWarning("The audio output cannot be closed when the program ends.\n");
    openedBy = getpid();
    SDL_SetHint(SDL_HINT_NO_SIGNAL_HANDLERS, "1");
    if (quietAudioLibrary)
        silence_alsa();
    if (!open_device(nullptr)) {
        KLWarning("No audio output could be opened (%s); sound is not heard.\n", SDL_GetError());
        if (!open_device("dummy")) {
            KLError("The silent audio output could not be opened either: %s\n", SDL_GetError());
            return false;
        }
    }
    out.voice = std::make_unique<SoundVoice>(out.rate, out.channels);
    out.handed = 0;
    out.buffers = 0;
    out.sounding = 0;
    out.cuts = 0;
    out.deviceClock.Reset();
    out.pass = Pass{};
    SDL_PauseAudioDevice(out.device, 0);
    return true;
}

void KLSoundControl::Close() {
    if (!out.device)
        return;
    SDL_CloseAudioDevice(out.device);  // waits for the sound thread to finish
    SDL_QuitSubSystem(SDL_INIT_AUDIO);
    out.device = 0;
    out.pass = Pass{};
    out.voice.reset();
    out.driver.clear();
}

void KLSoundControl::PlaySpeed(float s) {
    speed = s;
}
float KLSoundControl::Speed() {
    return speed;
}

int KLSoundControl::Play(CueSound* sound, KLTimer* timer, CueTime offset) {
    if (!sound || !sound->Valid() || sound->FrameCount() == 0 || !timer || !Open()) {
        Stop();
        return 0;
    }
    // The speed the transport offers; anything not a positive number plays at 1.
    double v = std::isfinite(speed) && speed > 0 ? std::clamp(double(speed), 0.05, 4.0) : 1.0;
    Pass next;
    next.mode = Mode::Play;
    next.sound = sound;
    next.clock = timer->Clock();
    next.speed = v;
    next.offset = offset.Seconds();
    SDL_LockAudioDevice(out.device);
    out.voice->Set(sound, timer->Reverse() ? -1 : 1, v);
    std::swap(out.pass, next);
    SDL_UnlockAudioDevice(out.device);
    return 1;
}

int KLSoundControl::PlayDrag(CueSound* sound, KLTimer* timer, int grainMs, const float* position) {
    if (!sound || !sound->Valid() || sound->FrameCount() == 0 || !position || !Open()) {
        Stop();
        return 0;
    }
    Pass next;
    next.mode = Mode::Drag;
    next.sound = sound;
    if (timer)
        next.clock = timer->Clock();
    next.dragAt = position;
    next.grainFrames = std::max(1L, long(std::clamp(grainMs, 1, 10000)) * out.rate / 1000);
    SDL_LockAudioDevice(out.device);
    out.voice->Set(sound, 1, 1.0);
    std::swap(out.pass, next);
    SDL_UnlockAudioDevice(out.device);
    return 1;
}

void KLSoundControl::Stop() {
    if (out.device)
        install(Pass{});
}

void KLSoundControl::Forget(const CueSound* sound) {
    if (out.device && out.pass.sound == sound)  // only this thread changes the pass
        install(Pass{});
}

namespace {
void log_to_reports(void*, int, SDL_LogPriority priority, const char* message) {
    int level = priority >= SDL_LOG_PRIORITY_ERROR  ? KLErr::kError
                : priority >= SDL_LOG_PRIORITY_WARN ? KLErr::kWarning
                : priority >= SDL_LOG_PRIORITY_INFO ? KLErr::kInformation
                                                    : KLErr::kStatus;
    KLErrHandler::Report(level, std::string("Audio: ") + message + "\n");
}
}  // namespace

void KLSoundControl::DisableAudioLibraryErrors() {
    quietAudioLibrary = true;  // the device is opened on first use, so this costs no start-up
    SDL_LogSetOutputFunction(log_to_reports, nullptr);
    SDL_LogSetAllPriority(SDL_LOG_PRIORITY_WARN);
}

const char* KLSoundControl::DriverName() {
    return out.driver.c_str();
}
int KLSoundControl::DeviceRate() {
    return out.rate;
}
int KLSoundControl::DeviceChannels() {
    return out.channels;
}

double KLSoundControl::Latency() {
    return out.rate ? double(out.samples) / out.rate : 0.0;
}

double KLSoundControl::DeviceSeconds() {
    return out.rate ? double(out.handed.load(std::memory_order_relaxed)) / out.rate : 0.0;
}

KLSoundControl::Handed KLSoundControl::LastHanded() {
    Handed h{};
    unsigned before, after;
    do {
        before = out.seq.load(std::memory_order_acquire);
        h.clock = out.handedClock.load(std::memory_order_relaxed);
        h.woke = out.handedWoke.load(std::memory_order_relaxed);
        h.position = out.handedPosition.load(std::memory_order_relaxed);
        h.buffers = out.buffers.load(std::memory_order_relaxed);
        h.sounding = out.sounding.load(std::memory_order_relaxed);
        h.cuts = out.cuts.load(std::memory_order_relaxed);
        after = out.seq.load(std::memory_order_acquire);
    } while ((before & 1) || before != after);
    return h;
}
