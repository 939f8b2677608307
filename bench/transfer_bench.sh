#!/bin/bash
# Measures file transfer into the depot beside programs that do a like job, all on one tmpfs:
# one large file, and a folder of 10,000 files of 4 KiB.
#
#   bench/transfer_bench.sh [--mib N] [--files N] [--rounds N] [--build DIR] [--out FILE]
#
# The push is measured without the check of the sums afterwards, which the peers leave out as well,
# and with it as `verified`. Peers: cp, rsync with a daemon on loopback, scp and scp -r with a server
# on loopback that has throw-away keys; what is not installed is left out. In each of --rounds rounds
# every program runs once, each time another one first, on a quiet machine with free memory at hand;
# its time is compared with that of the push in the same round, and the median of these ratios counts.
# Ends with status 1 when what arrived is not what was sent or the host's memory grew by 32 MiB.
# --out FILE appends the figures: seconds, ratios, and MiB for the growth.
set -eu
cd "$(dirname "$0")/.."
# shellcheck source=bench/peers.sh
. bench/peers.sh

mib=1024 files=10000 rounds=7 build=build/native out=
while [ $# -gt 0 ]; do
    case $1 in
    --mib) mib=$2 ;;
    --files) files=$2 ;;
    --rounds) rounds=$2 ;;
    --build) build=$2 ;;
    --out) out=$2 ;;
    *)
        sed -n '2,14s/^# \{0,1\}//p' "$0" >&2
        exit 2
        ;;
    esac
    shift 2
done
make_scratch transfer_bench

# --- what is sent -------------------------------------------------------------------------------
mkdir -p "$scratch"/{source/many,target}
head -c $((mib << 20)) /dev/urandom >"$scratch/source/large"
for ((folder = 0; folder * 1000 < files; ++folder)); do
    mkdir "$scratch/source/many/$folder"
    count=$((files - folder * 1000 < 1000 ? files - folder * 1000 : 1000))
    head -c $((count * 4096)) /dev/urandom |
        split -b 4096 -d -a 4 - "$scratch/source/many/$folder/file"
done

# --- who takes it -------------------------------------------------------------------------------
start_host "$build"
ways='push verified copy'
if start_rsync; then ways="$ways sync"; fi
if start_sshd; then ways="$ways secure"; fi

# --- how ----------------------------------------------------------------------------------------
push() { "$build/bin/zavctl" --socket "$host_socket" push --no-verify "$1"; }
verified() { "$build/bin/zavctl" --socket "$host_socket" push "$1"; }
copy() { cp -r "$1" "$scratch/target/"; }
sync() { rsync -r "$1" "rsync://127.0.0.1:$rsync_port/target/"; }
secure() {
    scp -q -r -P "$ssh_port" "${ssh_options[@]}" "$1" "$(id -un)@127.0.0.1:$scratch/target/"
}

memory() { awk '/^VmHWM:/ {print $2}' "/proc/$host/status"; }

declare -A times # "WHAT WAY": nanoseconds, one line per round
run() {          # WHAT WAY
    local from to where=target
    case $2 in push | verified) where=depot ;; esac
    rm -rf "$scratch/target/$1" "$scratch/depot/$1"
    await_quiet
    have_pages "$mib"
    from=$(now)
    "$2" "$scratch/source/$1" >"$scratch/out" 2>&1 || { cat "$scratch/out" >&2; exit 1; }
    to=$(now)
    diff -rq "$scratch/source/$1" "$scratch/$where/$1" >&2 ||
        { echo "$2 changed what it sent" >&2; exit 1; }
    rm -rf "$scratch/target/$1" "$scratch/depot/$1"
    times[$1 $2]+=$((to - from))$'\n'
}
run_rounds() { # WHAT
    local round way order
    read -ra order <<<"$ways"
    for ((round = 0; round < rounds; ++round)); do
        for way in "${order[@]}"; do run "$1" "$way"; done
        order=("${order[@]:1}" "${order[0]}")
    done
}
median() { sort -g | awk '{ at[NR] = $1 } END { print at[int((NR + 1) / 2)] }'; }
median_time() { printf %s "${times[$1 $2]}" | median; } # WHAT WAY
median_ratio() { # WHAT WAY: the push's time by that of WAY
    paste <(printf %s "${times[$1 push]}") <(printf %s "${times[$1 $2]}") |
        awk '{ print $1 / $2 }' | median
}

before=$(memory)
run_rounds large
growth=$((($(memory) - before) / 1024))
run_rounds many

# --- what came out ------------------------------------------------------------------------------
declare -A names=([push]='zavctl push' [verified]='push, verified' [copy]=cp [sync]='rsync --daemon' [secure]=scp)
report() { # WHAT TITLE
    local way ratio
    echo "$2"
    for way in $ways; do
        ratio=$(median_ratio "$1" "$way")
        printf '  %-16s %8.3f s; a push takes %5.2f times as long; by round:%s\n' "${names[$way]}" \
            "$(median_time "$1" "$way")e-9" "$ratio" \
            "$(printf %s "${times[$1 $way]}" | awk '{ printf " %.3f", $1 / 1e9 }')"
        write_result "transfer/$1/$way" "$(median_time "$1" "$way")e-9"
        write_result "transfer/$1/ratio/$way" "$ratio"
    done
}
report large "one file of $mib MiB; the host grew by $growth MiB"
report many "a folder of $files files of 4 KiB"
write_quiet transfer_bench
write_result transfer/growth "$growth"
[ "$growth" -lt 32 ] || { echo "the host grew by 32 MiB or more" >&2; exit 1; }
