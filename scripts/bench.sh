#!/bin/sh
# Measures this system beside others and writes what came out to docs/performance.md, with pictures
# in docs/performance/; prints the table of ratios. Takes about twenty minutes on a machine that
# should do nothing else meanwhile: each measurement waits until it does not, for a while, and the
# page says how many of them began all the same.
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
    sed -n '2,11s/^# \{0,1\}//p' "$0" >&2
    exit 2
    ;;
esac
if [ -z "$results" ]; then
    results=$(mktemp -d)
    trap 'rm -rf "$results"' EXIT
    trap 'exit 130' HUP INT TERM
fi

out=$results/shell.tsv
: >"$out"
# shellcheck source=bench/measure.sh
. bench/measure.sh

step() { echo "== $*"; }

write_result machine/load "$(cut -d' ' -f1 /proc/loadavg)"
step what is needed
scripts/bootstrap.sh
bench/install_peers.sh

step building
cmake --preset native -B "$build" -DZAV_BUILD_BENCH=ON -DZAV_BUILD_TESTS=OFF >/dev/null
cmake --build "$build" >/dev/null

# measure NAME OPTION...: runs NAME_bench, repetitions of its parts in turns; all figures go to the
# results.
measure() {
    name=$1
    shift
    step "$name"
    await_quiet
    "$build/bin/${name}_bench" --benchmark_enable_random_interleaving=true \
        --benchmark_out="$results/$name.json" "$@" >/dev/null 2>"$results/messages" || {
        cat "$results/messages" >&2
        exit 1
    }
}

# measure_inside NAME: a benchmark that stays within its process. The cost of memory that the allocator
# returns to the kernel and requests again is not part of the measured work.
measure_inside() {
    GLIBC_TUNABLES=glibc.malloc.trim_threshold=4000000000:glibc.malloc.mmap_threshold=33554432 \
        measure "$@"
}

# For ratios of medians.
measure_ratios() { measure_inside "$1" --benchmark_repetitions=7 --benchmark_min_time=0.05; }

# For growth, where the least of many longer samples counts.
measure_growth() { measure_inside "$1" --benchmark_repetitions=15 --benchmark_min_time=0.1; }

# Whether the allocator already holds the memory for a long output depends on what ran before. Here it
# always comes from the kernel.
measure_output() {
    GLIBC_TUNABLES=glibc.malloc.trim_threshold=131072:glibc.malloc.mmap_threshold=131072 \
        measure output --benchmark_repetitions=7
}

step rest
bench/rest_bench.sh --build "$build" --out "$out"
measure command --benchmark_repetitions=5
measure heard_command --benchmark_repetitions=5
measure_output
for name in conversions strings runas; do measure_ratios "$name"; done
for name in property inventory map queue subscription text_growth; do measure_growth "$name"; done
step processes
bench/process_bench.sh --build "$build" --out "$out"
step requests
bench/request_bench.sh --build "$build" --out "$out"
step tasks
bench/journal_bench.sh --build "$build" --out "$out"
step transfers
bench/transfer_bench.sh --build "$build" --out "$out" ||
    echo "a transfer failed, see above; its rows are left out or not met" >&2
bench/push_growth.sh --build "$build" --out "$out"

write_quiet programs
step report
bench/report/report.py "$results" docs
