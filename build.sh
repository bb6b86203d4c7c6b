#!/usr/bin/env bash
# chirrup's two entry points on a fresh Debian 12 machine:
#   ./build.sh demo   install what is missing, build Release into build/, run the bundled demo
#   ./build.sh test   install what is missing, build, run the whole test suite
#   ./build.sh fuzz   build the libFuzzer targets with clang into build-fuzz/ (not part of test)
#   ./build.sh bench  build the benchmarks and run them
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
cd "$here"
jobs=$(nproc 2>/dev/null || echo 2)

configure_release() {
    cmake -S . -B build -G Ninja -DCMAKE_BUILD_TYPE=Release >/dev/null
}

case "${1:-}" in
demo)
    scripts/install-deps
    configure_release
    cmake --build build -j "$jobs"
    exec scripts/run-demo
    ;;
test)
    scripts/install-deps
    configure_release
    cmake --build build -j "$jobs"
    cd build
    ctest --output-on-failure -j "$jobs" --timeout 600
    ;;
fuzz)
    scripts/install-deps
    CC=clang CXX=clang++ cmake -S . -B build-fuzz -G Ninja -DCMAKE_BUILD_TYPE=RelWithDebInfo \
        -DCHIRRUP_FUZZ=ON >/dev/null
    cmake --build build-fuzz -j "$jobs" --target fuzzers
    echo "fuzzers are in build-fuzz/fuzz/; seed corpora in fuzz/corpus/"
    ;;
bench)
    scripts/install-deps
    configure_release
    cmake --build build -j "$jobs"
    for b in build/bench/*_bench; do
        name=$(basename "$b")
        if [[ "$name" == views_bench || "$name" == chart_bench || "$name" == *_window_bench ]] &&
            [ -z "${DISPLAY:-}" ]; then
            # The views', the chart's and the window's benchmarks draw: on a display of their
            # own when there is none.
            scripts/xvfb-fixture start build/bench-xvfb.display >/dev/null
            DISPLAY=$(cut -d' ' -f1 build/bench-xvfb.display) "$b" || status=$?
            scripts/xvfb-fixture stop build/bench-xvfb.display
            [ "${status:-0}" = 0 ] || exit "$status"
        else
            "$b"
        fi
    done
    bench/startup.sh build
    bench/batch-memory.sh build
    ;;
*)
    echo "usage: ./build.sh demo|test|fuzz|bench" >&2
    exit 2
    ;;
esac
