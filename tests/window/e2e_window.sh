#!/usr/bin/env bash
# The built program driven with xdotool on the test display: it opens the demo keyset named on
# the command line, opens the demo track and saves it under a new name through the accelerators
# and browsers, and quits. Screenshots go to build/test-screens/.
#   e2e_window.sh PROGRAM SOURCE_DIR BINARY_DIR
set -euo pipefail
program=${1:?program}
src=${2:?source dir}
bin=${3:?binary dir}
read -r display _ <"${CHIRRUP_DISPLAY_FILE:?no test display}"
export DISPLAY=$display
shots="$bin/test-screens"
mkdir -p "$shots"
work=$(mktemp -d)
pid=
cleanup() {
    if [ -n "$pid" ] && kill -0 "$pid" 2>/dev/null; then kill "$pid"; fi
    rm -rf "$work" 2>/dev/null || true
}
trap cleanup EXIT

fail() {
    echo "e2e: $*; the program said:" >&2
    cat "$work/out.txt" >&2 || true
    import -window root "$shots/e2e-failure.png" || true
    exit 1
}
shot() { import -window root "$shots/$1.png" || true; }
# Waits (up to 20 s) until a visible window of that title exists; prints its id.
wait_window() {
    timeout 20 xdotool search --sync --onlyvisible --name "^$1\$" | head -1 ||
        fail "no window \"$1\""
}
# Waits (up to 20 s) until the command fails: a window gone, the program ended.
wait_until_not() {
    for _ in $(seq 200); do
        "$@" >/dev/null 2>&1 || return 0
        timeout 0.1 tail -f /dev/null || true
    done
    return 1
}
# Presses the key until a window of that title shows (up to three times, 5 s each): a key
# pressed while the window is still being mapped can be lost.
press_for() {
    for _ in 1 2 3; do
        xdotool key "$1"
        timeout 5 xdotool search --sync --onlyvisible --name "^$2\$" >/dev/null && return 0
    done
    fail "$1 did not open \"$2\""
}
# In the browser of that title, replaces the path typed and presses Return; waits until it goes.
choose() {
    local browser
    browser=$(wait_window "$1")
    xdotool mousemove --window "$browser" 200 40 key End key --delay 0 --repeat 300 BackSpace
    xdotool type --delay 5 "$2"
    xdotool key Return
    wait_until_not xdotool search --onlyvisible --name "^$1\$" || fail "window \"$1\" stayed up"
}

# A project whose data, scene and picture folders hold the demo.
for sub in misc_data wire pix; do
    mkdir -p "$work/project/$sub"
    cp "$src"/resources/demo/* "$work/project/$sub/"
done
export TESSEL_PROJECT="$work/project"
unset TESSEL_MISC_DIR VX_NOCONFIRM
cd "$work"
"$program" -e "$work/errlog.vx" demo.kset >"$work/out.txt" 2>&1 &
pid=$!

# The keyset is loaded once the event loop runs; the title then names the active keyset.
main=$(wait_window "Chirrup: mouth")
xdotool mousemove --window "$main" 600 600

# Ctrl+O opens the demo track, Ctrl+S saves it under a new name.
press_for ctrl+o "Open Track"
choose "Open Track" "$work/project/misc_data/demo.track"
kill -0 "$pid" 2>/dev/null || fail "the program ended while opening the track"
xdotool mousemove --window "$main" 600 600
shot e2e-track-opened
press_for ctrl+s "Save Track As"
choose "Save Track As" "$work/project/misc_data/saved.track"
[ -s "$work/project/misc_data/saved.track" ] || fail "the track was not saved"
grep -q "keytrack" "$work/project/misc_data/saved.track" || fail "the saved track has no key tracks"

# Ctrl+Q: nothing is modified, so the program ends at once with status 0.
xdotool mousemove --window "$main" 600 600
xdotool key ctrl+q
wait_until_not kill -0 "$pid" || fail "the program did not quit"
status=0
wait "$pid" || status=$?
pid=
[ "$status" -eq 0 ] || fail "quit ended with status $status"
echo "e2e: demo keyset shown, track opened and saved through the browser, quit with 0"
