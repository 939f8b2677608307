#!/bin/bash
# Looks at a host at rest: how often its threads were woken, and how much memory it holds.
#
#   bench/rest_bench.sh [--seconds N] [--build DIR] [--out FILE]
#
# The host has answered a query before, so that everything it ever starts has been started, and the
# time that it leaves a client to read its last answer has passed.
set -eu
cd "$(dirname "$0")/.."
# shellcheck source=bench/peers.sh
. bench/peers.sh

seconds=10 build=build/native out=
while [ $# -gt 0 ]; do
    case $1 in
    --seconds) seconds=$2 ;;
    --build) build=$2 ;;
    --out) out=$2 ;;
    *)
        sed -n '2,7s/^# \{0,1\}//p' "$0" >&2
        exit 2
        ;;
    esac
    shift 2
done
make_scratch rest_bench
start_host "$build"
"$build/bin/zavctl" --socket "$host_socket" query KINAGT >>"$scratch/log" 2>&1 || true
sleep 5

# Voluntary and other switches of all threads: a thread that is not woken is not switched to.
switches() {
    cat /proc/"$host"/task/*/status | awk '/ctxt_switches:/ { sum += $2 } END { print sum }'
}
before=$(switches)
sleep "$seconds"
woken=$(($(switches) - before))
resident=$(awk '/^VmRSS:/ { print $2 }' "/proc/$host/status")
echo "woken $woken times in $seconds s; $((resident / 1024)) MiB resident"
write_result rest/seconds "$seconds"
write_result rest/wakeups "$woken"
write_result rest/resident_kib "$resident"
