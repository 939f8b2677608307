#!/bin/bash
# Measures requests over the host's socket beside NRPE, the Zabbix agent's system.run and ssh, each
# of which runs the same script of one line; all on loopback, with configurations and keys of their
# own.
#
#   bench/request_bench.sh [--rounds N] [--build DIR] [--out FILE]
#
# What is not installed of the others is left out. The build has the benchmarks in it. --out FILE
# appends the medians in seconds and the number of child processes that a GETCONFIG runs.
set -eu
cd "$(dirname "$0")/.."
# shellcheck source=bench/peers.sh
. bench/peers.sh

rounds=100 build=build/bench out=
while [ $# -gt 0 ]; do
    case $1 in
    --rounds) rounds=$2 ;;
    --build) build=$2 ;;
    --out) out=$2 ;;
    *)
        sed -n '2,9s/^# \{0,1\}//p' "$0" >&2
        exit 2
        ;;
    esac
    shift 2
done
make_scratch request_bench

# --- the script ---------------------------------------------------------------------------------
# Its one line serves as the inventory of a product "ax" and as the configuration that a GETCONFIG
# answers with, so that every child of every way is this same script.
text='"ProdCode","Description","Platform","Version","Release"\n'
text+='"ax","INSTANCE=bench","lx8266","010000000","100"\n'
script=$scratch/script
printf "#!/bin/sh\nprintf '%s'\n" "$text" >"$script"
chmod 755 "$script"

home=$scratch/home
mkdir -p "$home/bin" "$home/agtqvs6/lx8266/bin"
children="$home/bin/cinfo $home/agtqvs6/lx8266/bin/zav_xa"
printf 'os=Linux cArch=lx8266\n' >"$home/bin/dynarch.shl"

# --- the servers --------------------------------------------------------------------------------
start_host "$build"
start_unguarded_host "$build"

count_children() { # prints how many a GETCONFIG runs
    local child
    for child in $children; do
        printf "#!/bin/sh\necho >>'%s'\nprintf '%s'\n" "$scratch/count" "$text" >"$child"
        chmod 755 "$child"
    done
    "$build/bin/zavctl" --socket "$host_socket" config get ax >>"$scratch/log" 2>&1
    for child in $children; do cp "$script" "$child"; done
    wc -l <"$scratch/count"
}
count=$(count_children)
echo "a GETCONFIG runs $count child processes"
write_result request/children "$count"

ways=()

if path_of nrpe >/dev/null; then
    port=$(free_port)
    if start_nrpe "$port" "$script" -n; then ways+=(--nrpe "$port"); fi
    if path_of check_nrpe >/dev/null; then
        port=$(free_port)
        if start_nrpe "$port" "$script"; then
            ways+=(--program "check_nrpe=$(path_of check_nrpe) -H 127.0.0.1 -p $port -c script")
        fi
    fi
fi

if start_zabbix; then ways+=(--zabbix "$zabbix_port"); fi

if start_sshd; then
    ssh="$(path_of ssh) -p $ssh_port ${ssh_options[*]}"
    ways+=(--program "ssh=$ssh -o ControlPath=none 127.0.0.1 $script")
    # shellcheck disable=SC2086
    start $ssh -N -M -o ControlPath="$scratch/master" 127.0.0.1
    if await test -S "$scratch/master"; then
        ways+=(--program "ssh_master=$ssh -o ControlPath=$scratch/master 127.0.0.1 $script")
    fi
fi

await_quiet
"$build/bin/request_bench" --host "$host_socket" --unguarded "$unguarded_socket" \
    --script "$script" --expect INSTANCE=bench \
    --rounds "$rounds" ${out:+--out "$out"} "${ways[@]}"
write_quiet request_bench
