#!/bin/sh
# Runs all tests of a preset several times in a row and counts the failures of each test.
#
#   scripts/repeat.sh [--busy] N [PRESET]     the preset is native if none is given
#
# With --busy two endless loops compete with the tests for the processors. The output of each run is
# kept in build/repeat. Ends with status 1 if any test has failed.
set -eu
cd "$(dirname "$0")/.."

usage() {
    sed -n '2,7s/^# \{0,1\}//p' "$0" >&2
    exit 2
}

busy=
if [ "${1-}" = --busy ]; then
    busy=1
    shift
fi
[ $# -eq 1 ] || [ $# -eq 2 ] || usage
runs=$1
preset=${2-native}
case $runs in '' | 0 | *[!0-9]*) usage ;; esac

scripts/bootstrap.sh
scripts/build.sh "$preset"

if [ -n "$busy" ]; then
    (while :; do :; done) &
    first=$!
    (while :; do :; done) &
    second=$!
    trap 'kill "$first" "$second"' EXIT
    trap 'exit 130' HUP INT TERM
fi

logs=build/repeat
failures=$logs/failures
mkdir -p "$logs"
rm -f "$logs"/*
: >"$failures"

run=1
while [ "$run" -le "$runs" ]; do
    log=$logs/run-$run.log
    if ctest --preset "$preset" >"$log" 2>&1; then
        result=passed
    else
        result=failed
        # The list at the end of ctest's output: "<tab> 12 - name (Failed) <labels>". Before it
        # stands one of the same form with the tests that were skipped.
        sed -n '/tests FAILED:/,$s/^[[:space:]]*[0-9]* - \([^ ]*\) (.*).*/\1/p' "$log" >"$logs/list"
        [ -s "$logs/list" ] || echo "ctest itself" >"$logs/list"
        cat "$logs/list" >>"$failures"
    fi
    echo "run $run of $runs: $result, $(sed -n 's/^Total Test time (real) = *//p' "$log")"
    [ "$result" = passed ] || sed 's/^/    /' "$logs/list"
    run=$((run + 1))
done

[ -s "$failures" ] || exit 0
echo "failures of each test in $runs runs:"
sort "$failures" | uniq -c | sort -rn
exit 1
