#!/usr/bin/env bash
# The built program in its window, driven as a person would with xdotool on the test display:
# it opens the demo keyset named on the command line, opens the demo track through the File
# menu's accelerator and browser, saves it under a new name the same way, and quits.
# Screenshots of each state go to build/test-screens/.
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
    echo "e2e: $*" >&2
    echo "e2e: the program said:" >&2
    cat "$work/out.txt" >&2 || true
    import -window root "$shots/e2e-failure.png" || true
    exit 1
}
# A screenshot once the screen has stopped changing (two grabs in a row the same).
shot() {
    import -window root "$work/a.png"
    for _ in $(seq 50); do
        import -window root "$work/b.png"
        cmp -s "$work/a.png" "$work/b.png" && break
        mv "$work/b.png" "$work/a.png"
    done
    cp "$work/a.png" "$shots/$1.png"
}
# Waits (up to 20 s) until a visible window of that title exists; prints its id.
wait_window() {
    timeout 20 xdotool search --sync --onlyvisible --name "^$1\$" | head -1 ||
        fail "no window \"$1\""
}
# Waits (up to 20 s) until `test` (a command) fails: a window gone, the program ended.
wait_until_not() {
    for _ in $(seq 200); do
        "$@" >/dev/null 2>&1 || return 0
        timeout 0.1 tail -f /dev/null || true
    done
    return 1
}
# In the browser of that title, replaces the path typed and presses Return; waits until it goes.
choose() {
    local browser
    browser=$(wait_window "$1")
    [ -z "${2:-}" ] || shot "$2"
    xdotool mousemove --window "$browser" 200 40 key End key --delay 0 --repeat 300 BackSpace
    xdotool type --delay 5 "$3"
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
shot e2e-1-demo-keyset

# Ctrl+O: the track browser; choose the demo track.
xdotool key ctrl+o
choose "Open Track" e2e-2-open-track-browser "$work/project/misc_data/demo.track"
kill -0 "$pid" 2>/dev/null || fail "the program ended while opening the track"
xdotool mousemove --window "$main" 600 600
shot e2e-3-track-opened

# Ctrl+S: save the track under a new name.
xdotool key ctrl+s
choose "Save Track As" "" "$work/project/misc_data/saved.track"
[ -s "$work/project/misc_data/saved.track" ] || fail "the track was not saved"
grep -q "keytrack" "$work/project/misc_data/saved.track" || fail "the saved track has no key tracks"

# Ctrl+Q: nothing is modified, so the program ends at once with status 0.
xdotool mousemove --window "$main" 600 600
xdotool key ctrl+q
if ! wait_until_not kill -0 "$pid"; then
    shot e2e-4-still-running
    fail "the program did not quit"
fi
status=0
wait "$pid" || status=$?
pid=
[ "$status" -eq 0 ] || fail "quit ended with status $status"
echo "e2e: demo keyset shown, track opened and saved through the browser, quit with 0"
