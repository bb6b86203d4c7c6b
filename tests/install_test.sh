#!/usr/bin/env bash
# Installs the build tree into a temporary prefix and checks the installed program: the
# layout (the image module beside the plug-ins included), the banner of `chirrup -i`, and a
# batch run on the installed demo that writes an animated face.
# Usage: install_test.sh BUILD_DIR
set -euo pipefail
build=$1
prefix=$(mktemp -d)
trap 'rm -rf "$prefix"' EXIT

cmake --install "$build" --prefix "$prefix" >/dev/null

status=0
for f in bin/chirrup bin/.nethelp lib/chirrup/chirrup_image.so share/X11/app-defaults/Chirrup \
    share/applications/chirrup.desktop share/man/man1/chirrup.1 \
    share/doc/chirrup/html/Chirrup.html share/chirrup/demo/demo.kset \
    share/chirrup/demo/face.glb; do
    if [ ! -e "$prefix/$f" ]; then
        echo "not installed: $f" >&2
        status=1
    fi
done
if ! ls "$prefix"/lib/chirrup/plugins/*.so >/dev/null 2>&1; then
    echo "no plug-in installed in lib/chirrup/plugins" >&2
    status=1
fi
[ $status -eq 0 ] || exit 1

banner=$("$prefix/bin/chirrup" -i 2>&1)
case "$banner" in
    *"Version 2.0 (9704300208)") ;;
    *) echo "unexpected banner: $banner" >&2; exit 1 ;;
esac

# The batch demo from the installed copy.
work="$prefix/run"
cp -r "$prefix/share/chirrup/demo" "$work"
(cd "$work" && env -u TESSEL_PROJECT -u TESSEL_MISC_DIR -u VX_FPS \
    "$prefix/bin/chirrup" -e "$work/errlog.vx" -B demo.track face.glb VX_ROOT 0 \
    "$work/out.glb" demo.kset) >"$work/batch.txt" 2>&1
if [ ! -s "$work/out.glb" ] || grep -q "^There was an error" "$work/batch.txt"; then
    echo "the installed batch run failed:" >&2
    cat "$work/batch.txt" >&2
    exit 1
fi
echo "installed layout, banner and batch run are good"
