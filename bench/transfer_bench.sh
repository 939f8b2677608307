#!/bin/bash
# Measures file transfer into the depot beside programs that do a like job, all on one tmpfs:
# one large file, and a folder of 10,000 files of 4 KiB.
#
#   bench/transfer_bench.sh [--mib N] [--files N] [--rounds N] [--build DIR] [--out FILE]
#
# Peers: cp, rsync with a daemon on loopback, scp and scp -r with a server on loopback that has
# throw-away keys; what is not installed is left out. Each program runs --rounds times, in turn, and
# its median time counts. Ends with status 1 when what arrived is not what was sent or the host's
# memory grew by 32 MiB. --out FILE appends the figures: seconds, and MiB for the growth.
set -eu
cd "$(dirname "$0")/.."
# shellcheck source=bench/peers.sh
. bench/peers.sh

mib=1024 files=10000 rounds=3 build=build/native out=
while [ $# -gt 0 ]; do
    case $1 in
    --mib) mib=$2 ;;
    --files) files=$2 ;;
    --rounds) rounds=$2 ;;
    --build) build=$2 ;;
    --out) out=$2 ;;
    *)
        sed -n '2,11s/^# \{0,1\}//p' "$0" >&2
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
ways='push copy'
if start_rsync; then ways="$ways sync"; fi
if start_sshd; then ways="$ways secure"; fi

# --- how ----------------------------------------------------------------------------------------
push() { "$build/bin/zavctl" --socket "$host_socket" push "$1"; }
copy() { cp -r "$1" "$scratch/target/"; }
sync() { rsync -r "$1" "rsync://127.0.0.1:$rsync_port/target/"; }
secure() {
    scp -q -r -P "$ssh_port" "${ssh_options[@]}" "$1" "$(id -un)@127.0.0.1:$scratch/target/"
}

memory() { awk '/^VmHWM:/ {print $2}' "/proc/$host/status"; }

declare -A times # "WHAT WAY": nanoseconds, one line per round
run() {          # WHAT WAY
    local from to where=target
    [ "$2" != push ] || where=depot
    rm -rf "$scratch/target/$1" "$scratch/depot/$1"
    have_pages "$mib"
    from=$(now)
    "$2" "$scratch/source/$1" >"$scratch/out" 2>&1 || { cat "$scratch/out" >&2; exit 1; }
    to=$(now)
    diff -rq "$scratch/source/$1" "$scratch/$where/$1" >&2 ||
        { echo "$2 changed what it sent" >&2; exit 1; }
    rm -rf "$scratch/target/$1" "$scratch/depot/$1"
    times[$1 $2]+=$((to - from))$'\n'
}
median() { # WHAT WAY
    printf %s "${times[$1 $2]}" | sort -n | awk '{ at[NR] = $1 } END { print at[int((NR + 1) / 2)] }'
}

before=$(memory)
for ((round = 0; round < rounds; ++round)); do
    for way in $ways; do run large "$way"; done
done
growth=$((($(memory) - before) / 1024))
for ((round = 0; round < rounds; ++round)); do
    for way in $ways; do run many "$way"; done
done

# --- what came out ------------------------------------------------------------------------------
declare -A names=([push]='zavctl push' [copy]=cp [sync]='rsync --daemon' [secure]=scp)
report() { # WHAT TITLE
    echo "$2"
    for way in $ways; do
        awk -v name="${names[$way]}" -v time="$(median "$1" "$way")" -v own="$(median "$1" push)" \
            'BEGIN { printf "  %-16s push is %6.2f times as fast\n", name, time / own }'
        write_result "transfer/$1/$way" "$(median "$1" "$way")e-9"
    done
}
report large "one file of $mib MiB; the host grew by $growth MiB"
report many "a folder of $files files of 4 KiB"
write_result transfer/growth "$growth"
[ "$growth" -lt 32 ] || { echo "the host grew by 32 MiB or more" >&2; exit 1; }
