#!/bin/sh
# Measures fleets of several sizes on this machine, with a real bus, a real centre, a real operator's
# command and simulated hosts, whose links are real, in one process. Prints a table for
# docs/fleet-performance.md.
#
#   tests/fleet/scale.sh [--preset NAME] [OPTION ...]
#
#   --hosts N,N...      the sizes; 1000,2500,5000,10000 if not given
#   --real M            so many real hosts with real links besides
#   --task MILLISECONDS what a task takes on a simulated host; 1000 if not given
#
# Ten thousand hosts want 4 GiB of memory, 20,000 threads and an open-file limit of 10,100.
set -eu
cd "$(dirname "$0")/../.."

preset=native
if [ "${1:-}" = --preset ]; then
    preset=$2
    shift 2
fi
cmake --build "build/$preset" --target fleet_scale >/dev/null
echo "Measured on $(date +%F), $(nproc) processors, load average $(cut -d' ' -f1 /proc/loadavg) before the run."
exec "build/$preset/bin/fleet_scale" "$@"
