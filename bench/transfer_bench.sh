#!/bin/bash
# Measures file transfer into the depot beside programs that do a like job, all on one tmpfs:
# one large file, and a folder of 10,000 files of 4 KiB.
#
#   bench/transfer_bench.sh [--mib N] [--files N] [--rounds N] [--build DIR]
#
# Peers: cp, rsync with a daemon on loopback, scp and scp -r with a server on loopback that has
# throw-away keys. What is missing of them is installed; what cannot be had is left out. Each
# program runs --rounds times, in turn, and its best time counts. Ends with status 1 when what
# arrived is not what was sent or the host's memory grew by 32 MiB.
set -eu
cd "$(dirname "$0")/.."

mib=1024 files=10000 rounds=3 build=build/native
while [ $# -gt 0 ]; do
    case $1 in
    --mib) mib=$2 ;;
    --files) files=$2 ;;
    --rounds) rounds=$2 ;;
    --build) build=$2 ;;
    *)
        sed -n '2,10s/^# \{0,1\}//p' "$0" >&2
        exit 2
        ;;
    esac
    shift 2
done

scratch=$(mktemp -d /dev/shm/transfer_bench.XXXXXX)
started=() made_run_sshd=
finish() {
    for pid in "${started[@]}"; do kill "$pid" 2>/dev/null && wait "$pid" 2>/dev/null; done
    rm -rf "$scratch"
    [ -z "$made_run_sshd" ] || rmdir /run/sshd 2>/dev/null
} >/dev/null 2>&1
trap finish EXIT
trap 'exit 130' INT TERM

as_root() { if [ "$(id -u)" -eq 0 ]; then "$@"; else sudo -n "$@"; fi; }

have() { # PROGRAM PACKAGE
    PATH=$PATH:/usr/sbin command -v "$1" >/dev/null && return
    echo "installing $2" >&2
    { DEBIAN_FRONTEND=noninteractive as_root apt-get install -y -qq --no-install-recommends "$2" ||
        { as_root apt-get update -qq; DEBIAN_FRONTEND=noninteractive as_root \
            apt-get install -y -qq --no-install-recommends "$2"; }; } >/dev/null 2>&1 ||
        { echo "left out: $1 cannot be installed" >&2; return 1; }
}

free_port() {
    local port
    while :; do
        port=$((20000 + RANDOM % 12000))
        (exec 3<>/dev/tcp/127.0.0.1/$port) 2>/dev/null || { echo $port; return; }
    done
}

await() { # COMMAND... : until it succeeds, 10 s at most
    local i
    for ((i = 0; i < 200; ++i)); do "$@" >/dev/null 2>&1 && return; sleep 0.05; done
    echo "not ready: $*" >&2
    return 1
}

answers() { (exec 3<>"/dev/tcp/127.0.0.1/$1"); }

# --- what is sent -------------------------------------------------------------------------------
mkdir -p "$scratch"/{source/many,depot,target,home/{bin,config,logs,tmp}}
head -c $((mib << 20)) /dev/urandom >"$scratch/source/large"
for ((folder = 0; folder * 1000 < files; ++folder)); do
    mkdir "$scratch/source/many/$folder"
    count=$((files - folder * 1000 < 1000 ? files - folder * 1000 : 1000))
    head -c $((count * 4096)) /dev/urandom |
        split -b 4096 -d -a 4 - "$scratch/source/many/$folder/file"
done

# --- who takes it -------------------------------------------------------------------------------
printf '#!/bin/sh\nexit 0\n' >"$scratch/home/bin/TovrinAgent"
chmod +x "$scratch/home/bin/TovrinAgent"
QVSDEPLOY_AGENTDEPOT=$scratch/depot "$build/bin/zavhost" --home "$scratch/home" \
    --socket "$scratch/host.sock" >"$scratch/host.log" 2>&1 &
host=$!
started+=("$host")
await grep -q ready: "$scratch/host.log"

rsync_port='' ssh_port=''
if have rsync rsync; then
    rsync_port=$(free_port)
    printf '%s\n' 'use chroot = no' "uid = $(id -u)" "gid = $(id -g)" '[target]' \
        "path = $scratch/target" 'read only = no' >"$scratch/rsyncd.conf"
    rsync --daemon --no-detach --address=127.0.0.1 --port="$rsync_port" \
        --config="$scratch/rsyncd.conf" >/dev/null 2>&1 &
    started+=($!)
    await answers "$rsync_port"
fi
if have sshd openssh-server && have scp openssh-client; then
    ssh_port=$(free_port)
    if [ "$(id -u)" -eq 0 ] && [ ! -d /run/sshd ]; then
        mkdir -p /run/sshd
        made_run_sshd=1
    fi
    ssh-keygen -q -t ed25519 -N '' -f "$scratch/hostkey"
    ssh-keygen -q -t ed25519 -N '' -f "$scratch/key"
    "$(PATH=$PATH:/usr/sbin command -v sshd)" -D -f /dev/null -p "$ssh_port" \
        -o ListenAddress=127.0.0.1 -h "$scratch/hostkey" -o PidFile=none -o StrictModes=no \
        -o AuthorizedKeysFile="$scratch/key.pub" -o PermitRootLogin=yes -o UsePAM=no \
        -o Subsystem="sftp internal-sftp" >/dev/null 2>&1 &
    started+=($!)
    await answers "$ssh_port"
fi

# --- how ----------------------------------------------------------------------------------------
push() { "$build/bin/zavctl" --socket "$scratch/host.sock" push "$1"; }
copy() { cp -r "$1" "$scratch/target/"; }
sync() { rsync -r "$1" "rsync://127.0.0.1:$rsync_port/target/"; }
secure() {
    scp -q -r -P "$ssh_port" -i "$scratch/key" -o StrictHostKeyChecking=no \
        -o UserKnownHostsFile=/dev/null -o LogLevel=ERROR "$1" "$(id -un)@127.0.0.1:$scratch/target/"
}

memory() { awk '/^VmHWM:/ {print $2}' "/proc/$host/status"; }

declare -A best # "WHAT WAY": nanoseconds
run() {         # WHAT WAY
    local from to where=target
    [ "$2" != push ] || where=depot
    rm -rf "$scratch/target/$1" "$scratch/depot/$1"
    from=$(date +%s%N)
    "$2" "$scratch/source/$1" >"$scratch/out" 2>&1 || { cat "$scratch/out" >&2; exit 1; }
    to=$(date +%s%N)
    diff -rq "$scratch/source/$1" "$scratch/$where/$1" >&2 || exit 1
    if [ "$1 $2" = "large push" ]; then
        [ "$(sha256sum <"$scratch/source/large")" = "$(sha256sum <"$scratch/depot/large")" ] ||
            { echo "the file's checksum changed on its way" >&2; exit 1; }
    fi
    rm -rf "$scratch/target/$1" "$scratch/depot/$1"
    if [ $((to - from)) -lt "${best[$1 $2]:-9223372036854775807}" ]; then
        best[$1 $2]=$((to - from))
    fi
}

ways='push copy'
[ -z "$rsync_port" ] || ways="$ways sync"
[ -z "$ssh_port" ] || ways="$ways secure"
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
report() { # WHAT AMOUNT UNIT TITLE
    echo "$4"
    for way in $ways; do
        awk -v name="${names[$way]}" -v amount="$2" -v unit="$3" -v time="${best[$1 $way]}" \
            -v own="${best[$1 push]}" 'BEGIN { printf "  %-16s %10.0f %-8s push is %6.2f times as fast\n",
                name, amount * 1e9 / time, unit, time / own }'
    done
}
report large $((mib << 20)).0e-6 MB/s "one file of $mib MiB; the host grew by $growth MiB"
report many "$files" files/s "a folder of $files files of 4 KiB"
[ "$growth" -lt 32 ] || { echo "the host grew by 32 MiB or more" >&2; exit 1; }
