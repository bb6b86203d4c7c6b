#!/usr/bin/env bash
# Start-up cost of the program: wall time of `chirrup -i` and of the demo's batch run, RUNS
# times each (default 20), as minimum, median and maximum in milliseconds; then the same with
# the window's libraries (Motif, Xt, Xft, X11, GL) preloaded, as the program will load them once
# the window is linked in. Usage: bench/startup.sh [build-dir] [runs]
set -euo pipefail
here=$(cd "$(dirname "$0")/.." && pwd)
build=$(cd "${1:-$here/build}" && pwd)
runs=${2:-20}
program="$build/bin/chirrup"
demo="$here/resources/demo"
out=$(mktemp -d /tmp/chirrup-startup-XXXXXX)
trap 'rm -rf "$out"' EXIT

# Prints "label: min / median / max ms" of `runs` runs of the command.
measure() {
    local label=$1
    shift
    local times=()
    for ((r = 0; r < runs; r++)); do
        local start end
        start=$(date +%s%N)
        "$@" >/dev/null 2>&1
        end=$(date +%s%N)
        times+=($(((end - start) / 1000)))
    done
    printf "%s\n" "${times[@]}" | sort -n | awk -v label="$label" '
        { t[NR] = $1 }
        END { printf "%-40s min %6.1f  median %6.1f  max %6.1f ms (%d runs)\n", label,
              t[1] / 1000, t[int((NR + 1) / 2)] / 1000, t[NR] / 1000, NR }'
}

demo_run() {
    (cd "$demo" && env -u TESSEL_PROJECT -u TESSEL_MISC_DIR -u VX_FPS \
        "$program" -e "$out/errlog.vx" -B demo.track face.glb VX_ROOT 0 "$out/face-animated.glb" \
            demo.kset)
}

window_libs=""
for lib in libXm.so.4 libXt.so.6 libXft.so.2 libX11.so.6 libXext.so.6 libGL.so.1 libGLU.so.1; do
    path=$(ldconfig -p | awk -v l="$lib" '$1 == l && !found { print $NF; found = 1 }')
    [ -n "$path" ] && window_libs="$window_libs${window_libs:+:}$path"
done

measure "chirrup -i" "$program" -i
measure "demo batch run" demo_run
if [ -n "$window_libs" ]; then
    export LD_PRELOAD="${window_libs//:/ }"
    measure "chirrup -i, window libraries loaded" "$program" -i
    measure "demo batch run, window libraries loaded" demo_run
fi
