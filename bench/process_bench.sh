#!/bin/bash
# Measures `zavctl status` as a process, from its start to its end, beside programs that put as small
# a question to a server on the same machine, and beside /bin/true, which does nothing.
#
#   bench/process_bench.sh [--rounds N] [--build DIR] [--out FILE]
#
# zavctl is stripped first, as the others are. What is not installed of the others is left
# out. The build has the benchmarks in it. --out FILE appends the medians in seconds.
set -eu
cd "$(dirname "$0")/.."
# shellcheck source=bench/peers.sh
. bench/peers.sh

rounds=300 build=build/bench out=
while [ $# -gt 0 ]; do
    case $1 in
    --rounds) rounds=$2 ;;
    --build) build=$2 ;;
    --out) out=$2 ;;
    *)
        sed -n '2,8s/^# \{0,1\}//p' "$0" >&2
        exit 2
        ;;
    esac
    shift 2
done
make_scratch process_bench

install -s "$build/bin/zavctl" "$scratch/zavctl"
start_host "$build"
ways=("true=/bin/true" "zavctl=$scratch/zavctl --socket $host_socket status")

if path_of curl >/dev/null; then
    ways+=("curl=$(path_of curl) -s --unix-socket $host_socket http://localhost/v1/health")
fi

if start_zabbix && path_of zabbix_get >/dev/null; then
    ways+=("zabbix_get=$(path_of zabbix_get) -s 127.0.0.1 -p $zabbix_port -k agent.ping")
fi

# Without a command NRPE answers with its version.
if path_of nrpe >/dev/null && path_of check_nrpe >/dev/null; then
    port=$(free_port)
    if start_nrpe "$port" /bin/true -n; then
        ways+=("check_nrpe_plain=$(path_of check_nrpe) -n -H 127.0.0.1 -p $port")
    fi
    port=$(free_port)
    if start_nrpe "$port" /bin/true; then
        ways+=("check_nrpe=$(path_of check_nrpe) -H 127.0.0.1 -p $port")
    fi
fi

await_quiet
"$build/bin/process_bench" --rounds "$rounds" ${out:+--out "$out"} "${ways[@]}"
write_quiet process_bench
