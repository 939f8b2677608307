#!/bin/sh
# Builds and runs every test: on this machine's width, on 32-bit, and under the address and
# undefined-behaviour sanitizers. Besides, every header is compiled on its own and every source without
# precompiled headers, every fuzz target runs for a short time, and a host is soaked for two minutes.
#
#   scripts/test.sh [PRESET ...]     only build and test these presets
#   scripts/test.sh tsan             what starts threads, under the thread sanitizer
set -eu
cd "$(dirname "$0")/.."

scripts/bootstrap.sh
echo "== shellcheck"
shellcheck scripts/*.sh cmake/*.sh .ci/run bench/*.sh tests/*/*.sh ctl/completion/shell/zavctl.bash

# beside NAME COMMAND...: runs a command while tests run, which mostly wait; `settle` waits for its end.
beside() {
    name=$1
    shift
    echo "== meanwhile: $name"
    "$@" >build/beside.log 2>&1 &
    beside=$!
    trap 'kill "$beside" 2>/dev/null' EXIT
    trap 'exit 130' HUP INT TERM
}
settle() {
    wait "$beside" || {
        cat build/beside.log
        echo "failed: $name" >&2
        exit 1
    }
    trap - EXIT
}

build() {
    echo "== $1: build"
    scripts/build.sh "$1"
}
check() {
    echo "== $1: test"
    ctest --preset "$1" --progress
}

if [ $# -gt 0 ]; then
    for preset in "$@"; do build "$preset"; done
    for preset in "$@"; do check "$preset"; done
    exit
fi

# Builds keep both processors of a small machine busy, tests do not.
verify_and_build_i686() {
    cmake --build --preset native --target verify -- --quiet
    scripts/build.sh i686
}
build_asan_and_fuzzers() {
    scripts/build.sh asan
    scripts/build.sh fuzz
}
build native
beside "native: headers on their own, sources without precompiled headers; i686: build" \
    verify_and_build_i686
check native
settle
beside "asan: build; fuzz: build" build_asan_and_fuzzers
check i686
settle
beside "native: soak for two minutes" scripts/soak.sh 2
echo "== fuzz: 20 seconds per target"
scripts/fuzz.sh --short
settle
tail -n 25 build/beside.log
check asan
