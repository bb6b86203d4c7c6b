#!/usr/bin/env bash
# Makes the demo dialogue recording and its phoneme timings:
#   resources/demo/dialogue.aiff          the line spoken by espeak-ng, AIFF 16-bit mono 22050 Hz
#   resources/demo/dialogue-phonemes.txt  when each word and phoneme starts, in seconds
# Needs espeak-ng, sox, a C compiler and libespeak-ng-dev (for the timing helper, which asks
# the same speech engine, with the same voice and speed, for its phoneme events).
# Usage: tools/phoneme-times.sh [output-directory [NAME VOICE SPEED TEXT]]
#   (default: resources/demo, and the demo's line as "dialogue", voice en-us, 150 words per
#   minute). With the four words, any other line is made the same way, as NAME.aiff and
#   NAME-phonemes.txt: bench/phoneme-passages.sh makes its test passages so.
set -euo pipefail
here=$(cd "$(dirname "$0")/.." && pwd)
out=${1:-$here/resources/demo}
name=${2:-dialogue}
voice=${3:-en-us}
speed=${4:-150}   # words per minute
text=${5:-"Hello there. Would you like some fresh mushroom soup?"}
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

# 1. The recording: espeak-ng speaks at 22050 Hz mono; sox writes it as AIFF 16-bit.
espeak-ng -v "$voice" -s "$speed" -w "$work/dialogue.wav" "$text"
sox "$work/dialogue.wav" -r 22050 -c 1 -b 16 -e signed-integer "$out/$name.aiff"

# 2. The timings: a small program that synthesises the same text through the espeak-ng library
# and prints each word and phoneme event with its position in the output.
cat > "$work/times.c" <<'C'
#include <espeak-ng/speak_lib.h>
#include <stdio.h>
#include <string.h>

static const char* text;
static long samples;  /* samples delivered so far, to check against the recording */

static int on_synth(short* wav, int count, espeak_EVENT* events) {
    (void)wav;
    samples += count;
    for (espeak_EVENT* e = events; e->type != espeakEVENT_LIST_TERMINATED; ++e) {
        double t = e->audio_position / 1000.0;
        if (e->type == espeakEVENT_WORD)
            printf("%.3f word %.*s\n", t, e->length, text + e->text_position - 1);
        else if (e->type == espeakEVENT_PHONEME)
            printf("%.3f phoneme %.8s\n", t, e->id.string);
        else if (e->type == espeakEVENT_END)
            printf("%.3f end\n", t);
    }
    return 0;
}

int main(int argc, char** argv) {
    if (argc != 4) return 2;
    text = argv[3];
    int rate = espeak_Initialize(AUDIO_OUTPUT_SYNCHRONOUS, 0, NULL,
                                 espeakINITIALIZE_PHONEME_EVENTS | espeakINITIALIZE_DONT_EXIT);
    if (rate <= 0 || espeak_SetVoiceByName(argv[1]) != EE_OK) return 1;
    int speed = 0;
    sscanf(argv[2], "%d", &speed);
    espeak_SetParameter(espeakRATE, speed, 0);
    espeak_SetSynthCallback(on_synth);
    /* The same flags as the espeak-ng command, which ends with a sentence pause. */
    espeak_Synth(text, strlen(text) + 1, 0, POS_CHARACTER, 0,
                 espeakCHARS_AUTO | espeakPHONEMES | espeakENDPAUSE, NULL, NULL);
    espeak_Synchronize();
    fprintf(stderr, "%ld samples at %d Hz\n", samples, rate);
    espeak_Terminate();
    return 0;
}
C
cc -O1 -o "$work/times" "$work/times.c" -lespeak-ng
{
    echo "# Start times in seconds of the words and phonemes of ${out#"$here"/}/$name.aiff,"
    echo "# as reported by espeak-ng $(espeak-ng --version | awk '{print $4}') (voice $voice, $speed words per minute)."
    echo "# Phonemes are espeak-ng's own names; \"_:\" and \"_\" are pauses; \"end\" is the end of speech."
    echo "# Text: $text"
    "$work/times" "$voice" "$speed" "$text" 2>"$work/count.txt"
} > "$out/$name-phonemes.txt"

# The library must have produced as many samples as the recording holds, or the times would
# not belong to it.
made=$(awk '{print $1}' "$work/count.txt")
recorded=$(soxi -s "$out/$name.aiff")
if [ "$made" != "$recorded" ]; then
    echo "phoneme-times: timing run made $made samples, the recording has $recorded" >&2
    exit 1
fi
echo "wrote $out/$name.aiff ($(soxi -d "$out/$name.aiff")) and $out/$name-phonemes.txt"
