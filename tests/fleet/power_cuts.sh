#!/bin/sh
# Cuts the power of the bus of a small fleet while roll-outs run: older messages of the server's are
# put back, and the newer files of its consumers stay.
#
#   tests/fleet/power_cuts.sh [TIMES [PRESET]]
#
# 20 times unless told otherwise, with the build of that preset, which is native if not given. The
# seed is printed; ZAV_FLEET_SEED chooses another one.
set -eu

root=$(cd "$(dirname "$0")/../.." && pwd)
times=${1:-${ZAV_FLEET_CUTS:-20}}
preset=${2:-native}

cmake --build "$root/build/$preset" --target fleet_kills_tests
ZAV_FLEET_CUTS=$times "$root/build/$preset/bin/fleet_kills_tests" --gtest_filter='PowerCuts.*'
