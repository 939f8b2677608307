#!/bin/sh
# Builds and runs every test: on this machine's width, on 32-bit, and under the address and
# undefined-behaviour sanitizers. Before them every header is compiled on its own and every source
# without precompiled headers, every fuzz target runs for a short time, and a host is soaked for two
# minutes.
#
#   scripts/test.sh [PRESET ...]     only build and test these presets
#   scripts/test.sh tsan             what starts threads, under the thread sanitizer
set -eu
cd "$(dirname "$0")/.."

scripts/bootstrap.sh
echo "== shellcheck"
shellcheck scripts/*.sh cmake/*.sh .ci/run bench/*.sh tests/*/*.sh
all=
[ $# -gt 0 ] || all=1
[ $# -gt 0 ] || set -- native i686 asan

for preset in "$@"; do
    echo "== $preset: build"
    scripts/build.sh "$preset"
done
if [ -n "$all" ]; then
    echo "== native: headers on their own, sources without precompiled headers"
    cmake --build --preset native --target verify -- --quiet
    echo "== fuzz: build and 20 seconds per target; native: soak for two minutes meanwhile"
    scripts/soak.sh 2 >build/soak.log 2>&1 &
    soak=$!
    trap 'kill "$soak" 2>/dev/null' EXIT
    trap 'exit 130' HUP INT TERM
    scripts/fuzz.sh --short
    wait "$soak" || {
        cat build/soak.log
        exit 1
    }
    trap - EXIT
    tail -n 25 build/soak.log
fi
for preset in "$@"; do
    echo "== $preset: test"
    ctest --preset "$preset" --progress
done
