#!/usr/bin/env bash
# Start-up of the window: the time from starting build/bin/chirrup on the demo keyset until
# its main window is mapped with the keyset loaded (the title names the active keyset), ten
# runs on a private Xvfb; then the resident memory of one run with the demo keyset and the
# demo track loaded (the track opened through Ctrl+O and the browser).
# Prints the median, minimum and maximum wall time, and the mean CPU time of the runs.
set -euo pipefail
here=$(cd "$(dirname "$0")/.." && pwd)
program="${CHIRRUP_PROGRAM:-$here/build/bin/chirrup}"
runs=${RUNS:-10}
[ -x "$program" ] || { echo "window-startup: build $program first" >&2; exit 1; }
work=$(mktemp -d)
xvfb_pid=
cleanup() {
    [ -n "$xvfb_pid" ] && kill "$xvfb_pid" 2>/dev/null || true
    rm -rf "$work"
}
trap cleanup EXIT
"$here/scripts/xvfb-fixture" start "$work/display" >/dev/null
read -r DISPLAY xvfb_pid <"$work/display"
export DISPLAY
for sub in misc_data wire pix; do
    mkdir -p "$work/project/$sub"
    cp "$here"/resources/demo/* "$work/project/$sub/"
done
export TESSEL_PROJECT="$work/project"
unset TESSEL_MISC_DIR
# The demo keyset names the Phoneme recognizer: the build's plug-ins are on the path.
export TESSEL_PLUGIN_PATH="${TESSEL_PLUGIN_PATH:-$(dirname "$program")/../lib/chirrup/plugins}"
cd "$work"

times=()
cpu=()
for i in $(seq "$runs"); do
    start=$(date +%s.%N)
    "$program" -e "$work/errlog.vx" demo.kset >"$work/run.txt" 2>&1 &
    pid=$!
    # Polled every few milliseconds (xdotool's own --sync waits half a second between looks).
    until xdotool search --onlyvisible --name '^Chirrup: ' >/dev/null 2>&1; do
        kill -0 "$pid" 2>/dev/null || {
            echo "window-startup: the program ended before its window was mapped:" >&2
            cat "$work/run.txt" >&2
            exit 1
        }
        sleep 0.01
    done
    end=$(date +%s.%N)
    times+=("$(echo "$end - $start" | bc -l)")
    # CPU time (user + system) of the process so far, in clock ticks.
    ticks=$(awk '{ print $14 + $15 }' "/proc/$pid/stat")
    cpu+=("$(echo "$ticks / $(getconf CLK_TCK)" | bc -l)")
    if [ "$i" -eq "$runs" ]; then
        # The last run also opens the demo track, then its memory is read.
        # Ctrl+O goes to the window under the pointer; a press made while the window is still
        # settling after the map can be lost, so it is made again until the browser shows.
        browser=
        for _ in $(seq 20); do
            xdotool mousemove 600 600 key ctrl+o
            browser=$(timeout 1 xdotool search --sync --onlyvisible --name '^Open Track$' |
                head -1) || true
            [ -n "$browser" ] && break
        done
        [ -n "$browser" ] || { echo "window-startup: the track browser never opened" >&2; exit 1; }
        xdotool mousemove --window "$browser" 200 40 key End
        xdotool key --delay 0 --repeat 300 BackSpace
        xdotool type --delay 2 "$work/project/misc_data/demo.track"
        xdotool key Return
        for _ in $(seq 100); do
            xdotool search --onlyvisible --name '^Open Track$' >/dev/null 2>&1 || break
            timeout 0.1 tail -f /dev/null || true
        done
        rss=$(awk '/^VmRSS/ { print $2 }' "/proc/$pid/status")
        hwm=$(awk '/^VmHWM/ { print $2 }' "/proc/$pid/status")
    fi
    # SIGKILL: a run killed otherwise makes its emergency save, which is not measured here.
    kill -KILL "$pid"
    wait "$pid" 2>/dev/null || true
done

printf '%s\n' "${times[@]}" | sort -n > "$work/times"
median=$(awk '{ a[NR] = $1 } END { if (NR % 2) print a[(NR + 1) / 2]; else print (a[NR / 2] + a[NR / 2 + 1]) / 2 }' "$work/times")
min=$(head -1 "$work/times")
max=$(tail -1 "$work/times")
cpu_mean=$(printf '%s\n' "${cpu[@]}" | awk '{ s += $1 } END { print s / NR }')
printf 'start to mapped window with the demo keyset loaded (%d runs, Xvfb):\n' "$runs"
printf '  wall median %.3f s, min %.3f s, max %.3f s; CPU (user+system) mean %.3f s\n' \
    "$median" "$min" "$max" "$cpu_mean"
printf 'resident memory with the demo keyset and track loaded: %d KiB (peak %d KiB)\n' \
    "$rss" "$hwm"
