#!/bin/bash
# Counts what the journal costs, in syncs of the disk that a host without one does not need, and times
# a task beside other programs that run a command when they are told to.
#
#   bench/journal_bench.sh [--tasks N] [--rounds N] [--build DIR] [--out FILE]
#
# The build has the benchmarks in it. What is not installed of the others, or cannot run here, is left
# out. --out FILE appends the counts per task and the medians in seconds.
set -eu
cd "$(dirname "$0")/.."
# shellcheck source=bench/peers.sh
. bench/peers.sh

tasks=40 rounds=20 build=build/bench out=
while [ $# -gt 0 ]; do
    case $1 in
    --tasks) tasks=$2 ;;
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
make_scratch journal_bench
# On a disk, where syncs take what they take.
state=$(mktemp -d /var/tmp/journal_bench.XXXXXX)
trap 'end_all; rm -rf "$state"' EXIT

# --- the hosts ----------------------------------------------------------------------------------
# make_home NAME: one whose agents do nothing, except "gate", which waits for a file.
make_home() {
    local home=$scratch/$1 list='"ProdCode","Description","Platform","Version","Release"\n'
    mkdir -p "$home"/{bin,config,logs,tmp,agtqvs6/lx8266/bin} "$scratch/depot"
    list+='"ax","INSTANCE=bench","lx8266","010000000","100"\n'
    printf 'os=Linux cArch=lx8266\n' >"$home/bin/dynarch.shl"
    printf "#!/bin/sh\nprintf '%s'\n" "$list" >"$home/bin/cinfo"
    cp "$home/bin/cinfo" "$home/agtqvs6/lx8266/bin/zav_xa"
    printf '#!/bin/sh\nexit 0\n' >"$home/bin/uninstall.sh"
    cat >"$home/bin/TovrinAgent" <<END
#!/bin/sh
for product; do :; done
[ "\$product" != gate ] || until [ -e '$scratch/gate' ]; do sleep 0.02; done
END
    chmod 755 "$home"/bin/* "$home/agtqvs6/lx8266/bin/zav_xa"
}

# start_on_home NAME OPTION...: a host on a home of its own.
start_on_home() {
    make_home "$1"
    QVSDEPLOY_AGENTDEPOT=$scratch/depot start "$build/bin/zavhost" --home "$scratch/$1" \
        --socket "$scratch/$1.sock" "${@:2}"
    await grep -q "ready: $scratch/$1.sock" "$scratch/log"
}

# start_counted NAME OPTION...: the same with its syncs counted in NAME.syncs.
start_counted() {
    ZAV_SYNC_COUNT=$scratch/$1.syncs LD_PRELOAD=$PWD/$build/lib/libcount_syncs.so \
        start_on_home "$@"
}

counts() { # counts NAME: prints them
    bench/journal/measure.py count "$scratch/$1.sock" "$scratch/$1.syncs" "$scratch/gate" "$tasks"
}

# --- syncs --------------------------------------------------------------------------------------
start_counted with --state "$state/counted"
start_counted without --no-journal
counts with >"$scratch/with.tsv"
counts without >"$scratch/without.tsv"
while read -r name with; do
    without=$(awk -v name="$name" '$1 == name { print $2 }' "$scratch/without.tsv")
    echo "syncs per task, $name: $with with the journal, $without without it"
    write_result "journal/$name" "$(awk -v a="$with" -v b="$without" 'BEGIN { print a - b }')"
done <"$scratch/with.tsv"

# --- times --------------------------------------------------------------------------------------
start_on_home timed --state "$state/timed"
ways=("zavctl=$build/bin/zavctl --socket $scratch/timed.sock start ax")

if path_of tsp >/dev/null; then
    export TS_SOCKET=$scratch/tsp.sock
    tsp -K
    trap 'tsp -K; end_all; rm -rf "$state"' EXIT
    ways+=("tsp=tsp -nf /bin/true")
fi
if path_of at >/dev/null && [ "$(id -u)" -eq 0 ]; then
    pidof atd >/dev/null || start "$(path_of atd)" -f
    cat >"$scratch/at_once" <<END
#!/bin/sh
mkfifo '$scratch/over'
echo "echo >'$scratch/over'" | at now
read -r end <'$scratch/over'
rm '$scratch/over'
END
    chmod 755 "$scratch/at_once"
    # Its daemon may be there and not do anything.
    if timeout 20 "$scratch/at_once" >>"$scratch/log" 2>&1; then ways+=("at=$scratch/at_once"); fi
    rm -f "$scratch/over"
fi
if systemd-run --wait --quiet true >>"$scratch/log" 2>&1; then
    ways+=("systemd_run=systemd-run --wait --quiet true")
fi

await_quiet
bench/journal/measure.py time "$rounds" "${ways[@]}" >"$scratch/times.tsv"
while read -r name seconds; do
    echo "a task by $name: $seconds s"
    write_result "journal/time/$name" "$seconds"
done <"$scratch/times.tsv"
write_quiet journal_bench
