#!/usr/bin/env bash
# Measures the Phoneme recognizer's accuracy on eight passages it was not tuned on: other
# lines than the demo's, in six espeak-ng voices at 130 to 170 words per minute, each made
# with its phoneme times by tools/phoneme-times.sh, then scored by phoneme_bench's
# BM_PassageAccuracy against the demo's links (about 60 s of speech, 1900 frames).
# Needs espeak-ng, sox, libespeak-ng-dev and a built build/bench/phoneme_bench.
#   bench/phoneme-passages.sh [extra phoneme_bench arguments]
# With PHONEME_BENCH_CONFUSIONS=1 it also prints which mouth shapes are taken for which.
set -euo pipefail
here=$(cd "$(dirname "$0")/.." && pwd)
bench=${PHONEME_BENCH:-$here/build/bench/phoneme_bench}
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

make() { "$here/tools/phoneme-times.sh" "$work" "$@" >/dev/null; }
make p1 en-us 150 "The old clock on the kitchen wall stopped at seven. Nobody noticed until the bread was burned and the children were late for school."
make p2 en-us+f2 140 "Could you bring the blue jacket from the car? It is cold outside, and the wind is picking up over the hills."
make p3 en-us+m3 160 "She laughed, shook her head, and told him that the map was upside down the whole time. They had walked in a circle."
make p4 en-us 130 "Five big boxes of fresh peaches arrived this morning. We will need a bigger fridge, or a very hungry neighbour."
make p5 en-us+f4 150 "Why does the river sound louder at night? Maybe it is just that everything else has gone quiet."
make p6 en-us+m1 170 "Turn left at the bakery, then walk past the church until you see a yellow door with a brass knocker shaped like a fish."
make p7 en-us+f1 145 "My brother thinks that pirates still hide treasure on every small island. I think he just wants a boat."
make p8 en-us 155 "Please check the oven, wash the dishes, and feed the cat before the guests arrive at half past eight."

PHONEME_BENCH_PASSAGES=$work "$bench" --benchmark_filter=BM_PassageAccuracy "$@"
