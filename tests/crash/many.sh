#!/bin/sh
# Kills the host, stops it, fills its disk and cancels tasks at many random moments:
#
#   tests/crash/many.sh [TIMES [PRESET]]
#
# 1000 times each unless told otherwise, with the build of that preset, which is native if not given.
# The seeds are printed; ZAV_CRASH_SEED, ZAV_FULL_DISK_SEED and ZAV_CANCEL_SEED choose others.
set -eu

root=$(cd "$(dirname "$0")/../.." && pwd)
times=${1:-1000}
preset=${2:-native}

cmake --build "$root/build/$preset" --target crash_threaded_tests
ZAV_CRASH_KILLS=$times ZAV_FULL_DISKS=$times ZAV_CANCELS=$times \
    "$root/build/$preset/bin/crash_threaded_tests"
