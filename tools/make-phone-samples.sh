#!/usr/bin/env bash
# Makes the Phoneme recognizer's audition samples: one short WAV file per target, spoken by
# espeak-ng (voice en-us), 16-bit mono 22050 Hz, named after the target ("AA.wav" ... "ZH.wav",
# and "SIL.wav", a quarter second of silence).
# Needs espeak-ng and sox. Usage: tools/make-phone-samples.sh [output-directory]
# (default: resources/phoneme-samples)
set -euo pipefail
here=$(cd "$(dirname "$0")/.." && pwd)
out=${1:-$here/resources/phoneme-samples}
mkdir -p "$out"
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

# Each phone (ARPAbet, as the recognizer names it) and how espeak-ng is asked to say it, in
# its phoneme mnemonics between [[ ]]: vowels and continuants alone, stops with a short
# neutral vowel after them so that they can be heard at all.
while read -r phone say; do
    espeak-ng -v en-us -s 120 -w "$work/$phone.wav" "[[$say]]"
    # Trim the leading and trailing silence, keep 50 ms of it each side.
    sox "$work/$phone.wav" -r 22050 -c 1 -b 16 -e signed-integer "$out/$phone.wav" \
        silence 1 0.01 0.5% reverse silence 1 0.01 0.5% reverse pad 0.05 0.05
done <<'PHONES'
AA  A:
AE  a
AH  V
AO  O:
AW  aU
AY  aI
B   b@
CH  tS@
D   d@
DH  D@
EH  E
ER  3:
EY  eI
F   f
G   g@
HH  h@
IH  I
IY  i:
JH  dZ@
K   k@
L   l@
M   m
N   n
NG  N
OW  oU
OY  OI
P   p@
R   r@
S   s
SH  S
T   t@
TH  T
UH  U
UW  u:
V   v@
W   w@
Y   j@
Z   z
ZH  Z
PHONES
sox -n -r 22050 -c 1 -b 16 -e signed-integer "$out/SIL.wav" trim 0 0.25
echo "wrote $(ls "$out"/*.wav | wc -l) samples to $out"
