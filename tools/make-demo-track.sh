#!/usr/bin/env bash
# Makes resources/demo/demo.track from resources/demo/dialogue-phonemes.txt: one mouth key per
# phoneme (vowels eased, consonants linear, pauses smooth, weights by how open the sound is),
# keys one frame ahead of the sound as lip sync wants, one mark per word (its first letter),
# and brow keys that lift on the greeting and the question and frown on "mushroom".
# Usage: tools/make-demo-track.sh [phonemes] [track]   (defaults: the files in resources/demo)
set -euo pipefail
here=$(cd "$(dirname "$0")/.." && pwd)
phonemes=${1:-$here/resources/demo/dialogue-phonemes.txt}
track=${2:-$here/resources/demo/demo.track}

awk -v fps=30 -v lead=1 '
function shape(p) {
    if (p ~ /^_/) return "rest"
    if (p == "m" || p == "b" || p == "p") return "MBP"
    if (p == "f" || p == "v") return "FV"
    if (p == "l") return "L"
    if (p == "w") return "WQ"
    if (p == "u:" || p == "U") return "U"
    if (p == "oU" || p == "O:" || p == "0") return "O"
    if (p == "aI" || p == "a" || p == "V" || p == "A:") return "AI"
    if (p == "E" || p == "e@" || p == "eI" || p == "i:" || p == "I") return "E"
    if (p == "@" || p == "h" || p == "r") return "etc"
    return "CDGKNRSThYZ"
}
function smoothing(s) {
    if (s == "rest") return "Smooth"
    if (s == "AI" || s == "E" || s == "O" || s == "U") return "Ease"
    return "Linear"
}
function weight(s, p) {
    if (s == "rest") return "1"
    if (s == "MBP" || s == "FV") return "1"
    if (p == "@" || p == "U" || p == "V") return "0.7"
    if (s == "etc" || s == "CDGKNRSThYZ") return "0.8"
    return "1"
}
function frame(t,   f) {
    f = t * fps - lead
    if (f < 0) f = 0
    return sprintf("%.1f", f) + 0
}
/^#/ { next }
$2 == "word" { marks[++nm] = sprintf("    mark %s\t\"%s\"", sprintf("%.1f", $1 * fps) + 0, tolower(substr($3, 1, 1))); words[nm] = $3; wordAt[nm] = $1; next }
$2 == "phoneme" {
    s = shape($3); f = frame($1)
    if (s == last) next
    if (f in used) next  # one key per instant
    used[f] = 1; last = s
    keys[++nk] = sprintf("    event %s %s %s %s", f, s, smoothing(s), weight(s, $3))
}
END {
    print "sound dialogue.aiff\n"
    print "fps 30\n"
    print "begin marktrack"
    for (i = 1; i <= nm; ++i) print marks[i]
    print "end\n"
    print "begin keytrack\tmouth"
    for (i = 1; i <= nk; ++i) print keys[i]
    print "end\n"
    # Brow tilt in degrees about Z (the left brow tilts the other way round from the right).
    for (side = 0; side < 2; ++side) {
        name = side ? "brow_R" : "brow_L"; sign = side ? 1 : -1
        print "begin keytrack\t" name
        print "    event 0 rest Smooth 0"
        for (i = 1; i <= nm; ++i) {
            f = sprintf("%.1f", wordAt[i] * fps) + 0
            if (words[i] == "Hello") print "    event " f + 2 " up Ease " sign * 8
            if (words[i] == "there") print "    event " f + 6 " rest Ease 0"
            if (words[i] == "like") print "    event " f " up Ease " sign * 6
            if (words[i] == "mushroom") print "    event " f - 2 " frown Linear " sign * -12
            if (words[i] == "soup") print "    event " f + 4 " up Smooth " sign * 10
        }
        print "    event " sprintf("%.1f", wordAt[nm] * fps + 30) + 0 " rest Ease 0"
        print "end\n"
    }
    print "active_keyset mouth\n"
}' "$phonemes" > "$track"
echo "wrote $track"
