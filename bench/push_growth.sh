#!/bin/bash
# Measures how the time of a push grows with the size of the file, from 1 MiB on in steps of two.
#
#   bench/push_growth.sh [--mib LARGEST] [--rounds N] [--build DIR] [--out FILE]
#
# Each size is sent --rounds times, one below 128 MiB four times as often, and its median counts.
# --out FILE appends the figures in seconds.
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
        sed -n '2,7s/^# \{0,1\}//p' "$0" >&2
        exit 2
        ;;
    esac
    shift 2
done
make_scratch push_growth
# What there is of memory must hold the file twice.
free=$(df --output=avail -BM "$scratch" | tail -1)
while [ $((mib * 5 / 2)) -gt "${free%M}" ]; do mib=$((mib / 2)); done
head -c $((mib << 20)) /dev/urandom >"$scratch/file"
start_host "$build"

push() { # prints nanoseconds
    local from
    rm -f "$scratch/depot/file"
    have_pages "$size"
    from=$(now)
    "$build/bin/zavctl" --socket "$host_socket" push "$scratch/file" >>"$scratch/log" 2>&1
    echo $(($(now) - from))
}

for ((size = mib; size >= 1; size /= 2)); do
    truncate -s "${size}M" "$scratch/file"
    times=$((size < 128 ? 4 * rounds : rounds))
    for ((i = 0; i < times; ++i)); do push; done | sort -n |
        awk -v middle=$(((times + 1) / 2)) 'NR == middle' >"$scratch/median"
    echo "$size MiB: $(awk -v mib="$size" '{ printf "%.2f ms per MiB", $1 / mib / 1e6 }' "$scratch/median")"
    write_result "push/$((size << 20))" "$(cat "$scratch/median")e-9"
done
