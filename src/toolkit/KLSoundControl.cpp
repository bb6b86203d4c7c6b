// Placeholder until sound output is built: nothing is played. Replaced by the SDL2 output.
#include "toolkit/KLSoundControl.h"

namespace {
float speed = 1.0f;
}

void KLSoundControl::PlaySpeed(float s) { speed = s; }
float KLSoundControl::Speed() { return speed; }
int KLSoundControl::Play(CueSound*, KLTimer*, CueTime) { return 0; }
int KLSoundControl::PlayDrag(CueSound*, KLTimer*, int, const float*) { return 0; }
void KLSoundControl::Stop() {}
void KLSoundControl::DisableAudioLibraryErrors() {}
