#!/usr/bin/env bash
# Peak memory and time of one batch apply on the ~20 MB benchmark scene (scene_bench's) with a
# 10-minute track of 10 keysets (a frame keyset of 10 key shapes over the scene's "face" group
# and 9 shape sets, one event every 3 frames: 6,000 events each), run RUNS times (default 5).
# Prints each run's peak resident memory, wall and CPU time, then the median and range of the
# peak against the input and output sizes. Usage: bench/batch-memory.sh [build-dir] [runs]
set -euo pipefail
build=$(cd "${1:-build}" && pwd)
runs=${2:-5}
work=$(mktemp -d /tmp/chirrup-batch-memory-XXXXXX)
[ -n "${KEEP:-}" ] || trap 'rm -rf "$work"' EXIT
mkdir -p "$work/wire" "$work/misc_data"
"$build/bench/scene_bench" --write-scene "$work/wire/big.glb"

{
    echo "wire big.glb 0"
    echo "begin keyset mouth face"
    for i in 0 1 2 3 4 5 6 7 8 9; do echo "    key k$i $((i * 20))"; done
    echo "end"
    for k in 0 1 2 3 4 5 6 7 8; do
        echo "begin shapeset set$k n$((40 + k)) $((k % 6)) 0 1"
        echo "    key rest 0"
        echo "    key on 1"
        echo "end"
    done
} >"$work/misc_data/big.kset"
awk 'BEGIN {
    print "fps 30\n"
    split("Linear Ease Smooth", smooth, " ")
    for (k = 0; k < 10; k++) {
        printf "begin keytrack\t%s\n", (k == 0 ? "mouth" : "set" (k - 1))
        for (e = 0; e < 6000; e++) {
            shape = (k == 0) ? "k" ((e * 7 + 3) % 10) : ((e % 2) ? "on" : "rest")
            printf "    event %d %s %s %g\n", e * 3, shape, smooth[e % 3 + 1], (e % 7) * 0.25
        }
        print "end\n"
    }
}' >"$work/misc_data/big.track"

peaks=()
for ((r = 0; r < runs; r++)); do
    rm -f "$work/wire/out.glb"
    (cd "$work" && TESSEL_PROJECT="$work" /usr/bin/time -f "%M %e %U %S" -o "$work/time.txt" \
        "$build/bin/chirrup" -B big.track big.glb VX_ROOT 0 out.glb big.kset 2>"$work/err.txt")
    if [ ! -s "$work/wire/out.glb" ]; then
        echo "run $r stored nothing:" >&2
        cat "$work/err.txt" >&2
        exit 1
    fi
    read -r kb wall user sys <"$work/time.txt"
    peaks+=("$kb")
    printf "run %d: peak %.1f MB, wall %.2f s, CPU %.2f s\n" "$r" "$(echo "$kb * 1024 / 1000000" | bc -l)" \
        "$wall" "$(echo "$user + $sys" | bc -l)"
done
in=$(stat -c %s "$work/wire/big.glb")
out=$(stat -c %s "$work/wire/out.glb")
sorted=$(printf "%s\n" "${peaks[@]}" | sort -n)
median=$(echo "$sorted" | sed -n "$(((runs + 1) / 2))p")
lo=$(echo "$sorted" | head -1)
hi=$(echo "$sorted" | tail -1)
printf "input %.1f MB, output %.1f MB\n" "$(echo "$in / 1000000" | bc -l)" "$(echo "$out / 1000000" | bc -l)"
printf "peak memory: median %.1f MB (%.1f to %.1f) = %.2fx input, %.2fx input + output\n" \
    "$(echo "$median * 1024 / 1000000" | bc -l)" "$(echo "$lo * 1024 / 1000000" | bc -l)" \
    "$(echo "$hi * 1024 / 1000000" | bc -l)" "$(echo "$median * 1024 / $in" | bc -l)" \
    "$(echo "$median * 1024 / ($in + $out)" | bc -l)"
