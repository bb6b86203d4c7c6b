#pragma once

#include "toolkit/CueTime.h"

class CueSound;
class KLTimer;

// Sound output: plays a sound in step with a KLTimer, at a speed, forwards or backwards, and
// scrubs. All static; one output stream per process. No X, no event loop: the device is fed
// from its own thread.
class KLSoundControl {
  public:
    // Speed of the next Play, 0.25 to 1.25 as the transport offers; pitch moves with speed.
    static void PlaySpeed(float speed);
    static float Speed();
    // Plays `sound` from the timer's position (plus `offset`) for as long as the timer runs,
    // forwards or backwards as the timer runs. Returns 1 when playing started, 0 when there
    // is nothing to play or no output.
    static int Play(CueSound* sound, KLTimer* timer, CueTime offset);
    // Scrubbing: plays grains of `grainMs` milliseconds of `sound` at `*position` (a fraction
    // 0..1 of the sound's length) whenever it moves, silent while it rests, until Stop or the
    // timer stops. The sound thread reads `*position` as it plays: the caller stores it
    // atomically (__atomic_store, relaxed) and keeps it until Stop.
    static int PlayDrag(CueSound* sound, KLTimer* timer, int grainMs, const float* position);
    // Stops whatever is playing.
    static void Stop();
    // Stops when `sound` is what is playing (a sound being destroyed calls this).
    static void Forget(const CueSound* sound);
    // Routes SDL's messages into the program's reports and silences the ALSA library's own
    // printing on the error stream (the reason a device failed reaches the reports anyway).
    static void DisableAudioLibraryErrors();

    // Opens the output device (Play and PlayDrag do so when needed); without a usable device
    // the silent "dummy" driver is used, so playback behaves the same. False only when even
    // that fails. Close releases the device (tests reopen it with other settings).
    static bool Open();
    static void Close();
    // The driver in use ("pulseaudio", "disk", "dummy"...), empty while closed.
    static const char* DriverName();
    static int DeviceRate();
    static int DeviceChannels();
    // Seconds of sound the device buffers ahead: the samples handed now are heard this late.
    static double Latency();
    // Device frames handed to the device since Open, over its rate: the device's own clock.
    static double DeviceSeconds();

    // The last buffer handed to the device: the device clock's time (TimerClock::Now
    // seconds, filtered of the sound thread's wake-up jitter) at which it was handed, the
    // moment the thread actually woke, and the sound position, in seconds, of its first
    // sample (NaN when it was silent). For measuring how closely sound follows the timer.
    struct Handed {
        double clock;
        double woke;
        double position;
        long buffers;   // buffers handed since Open
        long sounding;  // of them, those with sound in them
        long cuts;      // times the position was cut back into step with the timer since Open
    };
    static Handed LastHanded();
};
