#!/bin/bash
# Measures how the time of a push grows with the size of the file, from 1 MiB on in steps of two.
#
#   bench/push_growth.sh [--mib LARGEST] [--rounds N] [--build DIR] [--out FILE]
#
# Each size is sent --rounds times, one below 128 MiB four times as often, on a quiet machine. The
# sizes take turns, and the least time of each counts: what else a machine does only ever adds. --out
# FILE appends the figures in seconds.
set -eu
cd "$(dirname "$0")/.."
# shellcheck source=bench/peers.sh
. bench/peers.sh

mib=1024 rounds=5 build=build/native out=
while [ $# -gt 0 ]; do
    case $1 in
    --mib) mib=$2 ;;
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
make_scratch push_growth
# What there is of memory must hold files of all sizes, the largest in the depot, and as much again.
free=$(df --output=avail -BM "$scratch" | tail -1)
while [ $((mib * 9 / 2)) -gt "${free%M}" ]; do mib=$((mib / 2)); done
sizes=$(for ((size = mib; size >= 1; size /= 2)); do echo "$size"; done)
head -c $((mib << 20)) /dev/urandom >"$scratch/file.$mib"
for size in $sizes; do
    [ "$size" -eq "$mib" ] || head -c $((size << 20)) "$scratch/file.$mib" >"$scratch/file.$size"
done
start_host "$build"

push() { # SIZE: in MiB
    local from
    rm -f "$scratch/depot/"*
    have_pages "$1"
    from=$(now)
    "$build/bin/zavctl" --socket "$host_socket" push "$scratch/file.$1" >>"$scratch/log" 2>&1
    echo $(($(now) - from)) >>"$scratch/times.$1"
}

for ((round = 0; round < rounds; ++round)); do
    for size in $sizes; do
        await_quiet
        for ((i = size < 128 ? 4 : 1; i > 0; --i)); do push "$size"; done
    done
done
for size in $sizes; do
    least=$(sort -n "$scratch/times.$size" | head -1)
    echo "$size MiB: $(awk -v time="$least" -v mib="$size" 'BEGIN { printf "%.2f ms per MiB", time / mib / 1e6 }')"
    write_result "push/$((size << 20))" "${least}e-9"
done
write_quiet push_growth
