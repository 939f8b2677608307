#!/bin/sh
# Runs every fuzz target, two at a time, and fails when one finds something.
#
#   scripts/fuzz.sh [SECONDS_PER_TARGET [TARGET ...]]     600 seconds and all targets by default
#   scripts/fuzz.sh --short                               20 seconds each, always the same way
#
# Inputs that reach new code are kept in build/fuzz/corpus/TARGET and are where the next long run
# goes on; what goes wrong is kept in build/fuzz/findings. A finding is looked at with
# build/fuzz/bin/TARGET FILE. The short way begins with the committed inputs alone, with one seed.
set -eu
cd "$(dirname "$0")/.."
root=$PWD

short=
seconds=600
only=
case ${1:-} in
--run) # one target's run, see below
    seconds=$2 short=$3 only=$4
    ;;
--short)
    short=1
    seconds=20
    shift
    ;;
?*)
    seconds=$1
    shift
    ;;
esac

run_target() {
    target=$1
    seen=build/fuzz/corpus/$target
    [ -z "$short" ] || seen=build/fuzz/short/$target
    [ -z "$short" ] || rm -rf "$seen"
    mkdir -p "$seen"
    set -- -max_total_time="$seconds" -timeout=10 -rss_limit_mb=2048 -print_final_stats=1 \
        -artifact_prefix="build/fuzz/findings/$target-"
    [ -z "$short" ] || set -- "$@" -seed=1
    words=tests/fuzz/dictionaries/$target.dict
    [ ! -f "$words" ] || set -- "$@" -dict="$words"
    options=$(sed -n 's|^// fuzz-options: ||p' "tests/fuzz/${target}.cpp")
    log=build/fuzz/log/$target
    # shellcheck disable=SC2086
    if "build/fuzz/bin/$target" "$@" $options "$seen" "tests/fuzz/corpus/$target" >"$log" 2>&1; then
        awk -v target="$target" '
            /^stat::number_of_executed_units:/ { runs = $2 }
            /^stat::average_exec_per_sec:/ { rate = $2 }
            / cov: / { for (i = 1; i < NF; ++i) if ($i == "cov:") reached = $(i + 1) }
            END { printf "%-20s %10d runs, %7d per second, %6d edges\n", target, runs, rate, reached }
        ' "$log"
    else
        echo "$target: FAILED, the end of $root/$log:"
        tail -n 40 "$log"
        return 1
    fi
}

if [ -n "$only" ]; then
    run_target "$only"
    exit
fi

scripts/bootstrap.sh
mkdir -p build/fuzz/log build/fuzz/findings
scripts/build.sh fuzz

if [ $# -eq 0 ]; then
    for source in tests/fuzz/*_fuzz.cpp; do
        set -- "$@" "$(basename "$source" .cpp)"
    done
fi
printf '%s\n' "$@" | xargs -P 2 -I {} scripts/fuzz.sh --run "$seconds" "$short" {}
