#!/bin/sh
# Measures this system beside others and writes what came out to docs/performance.md, with pictures
# in docs/performance/; prints the table of ratios. Takes about ten minutes on a machine that
# should do nothing else meanwhile.
#
#   scripts/bench.sh [--results DIR]
#
# What building, comparing and drawing need is installed first, without starting any service.
# --results keeps the figures in DIR, an empty folder; bench/report/report.py DIR docs writes the
# page from them again.
set -eu
cd "$(dirname "$0")/.."

build=build/bench
results=''
case $#/${1-} in
0/) ;;
2/--results) mkdir -p "$2" && results=$(CDPATH='' cd -- "$2" && pwd) ;;
*)
    sed -n '2,10s/^# \{0,1\}//p' "$0" >&2
    exit 2
    ;;
esac
if [ -z "$results" ]; then
    results=$(mktemp -d)
    trap 'rm -rf "$results"' EXIT
    trap 'exit 130' HUP INT TERM
fi

step() { echo "== $*"; }

printf 'machine/load\t%s\n' "$(cut -d' ' -f1 /proc/loadavg)" >"$results/shell.tsv"
step what is needed
scripts/bootstrap.sh
bench/install_peers.sh

step building
cmake --preset native -B "$build" -DZAV_BUILD_BENCH=ON -DZAV_BUILD_TESTS=OFF >/dev/null
cmake --build "$build" >/dev/null

# measure NAME OPTION...: runs NAME_bench, repetitions of its parts in turns; their medians go to the
# results.
measure() {
    name=$1
    shift
    step "$name"
    "$build/bin/${name}_bench" --benchmark_report_aggregates_only=true \
        --benchmark_enable_random_interleaving=true --benchmark_out="$results/$name.json" "$@" >/dev/null 2>"$results/messages" || {
        cat "$results/messages" >&2
        exit 1
    }
}

# measure_inside NAME: one that stays within its process. What the kernel does for an allocator that
# gives memory back and takes it again is none of the work that is measured.
measure_inside() {
    GLIBC_TUNABLES=glibc.malloc.trim_threshold=4000000000:glibc.malloc.mmap_threshold=33554432 \
        measure "$1" --benchmark_repetitions=7 --benchmark_min_time=0.05
}

# Whether an allocator has the memory at hand that a long output needs depends on what was there
# before; here it comes from the kernel each time.
measure_output() {
    GLIBC_TUNABLES=glibc.malloc.trim_threshold=131072:glibc.malloc.mmap_threshold=131072 \
        measure output --benchmark_repetitions=7
}

step rest
bench/rest_bench.sh --build "$build" --out "$results/shell.tsv"
measure command --benchmark_repetitions=5
measure_output
for name in conversions strings runas property inventory map queue subscription; do
    measure_inside "$name"
done
step requests
bench/request_bench.sh --build "$build" --out "$results/shell.tsv"
step transfers
bench/transfer_bench.sh --build "$build" --out "$results/shell.tsv" ||
    echo "a transfer failed, see above; its rows are left out or not met" >&2
bench/push_growth.sh --build "$build" --out "$results/shell.tsv"

step report
bench/report/report.py "$results" docs
