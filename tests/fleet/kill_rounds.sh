#!/bin/sh
# Kills the bus, the centre, links and hosts of a small fleet at random moments while roll-outs run:
#
#   tests/fleet/kill_rounds.sh [TIMES [PRESET]]
#
# 200 times unless told otherwise, which takes about ten minutes, with the build of that preset, which
# is native if not given. The seed is printed; ZAV_FLEET_SEED chooses another one.
set -eu

root=$(cd "$(dirname "$0")/../.." && pwd)
times=${1:-200}
preset=${2:-native}

cmake --build "$root/build/$preset" --target fleet_kills_tests
ZAV_FLEET_KILLS=$times "$root/build/$preset/bin/fleet_kills_tests" --gtest_filter='KillRounds.*'
