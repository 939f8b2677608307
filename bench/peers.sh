#!/bin/bash
# shellcheck disable=SC2034 # what is set here is used by those that source it
#
# Functions for scripts that measure this system beside others on the loopback interface; to be
# sourced by a script that calls make_scratch first. What is started by them is ended, and the
# scratch folder removed, when the script exits.

# shellcheck source=bench/measure.sh
. bench/measure.sh

# make_scratch NAME: sets `scratch` to a new folder in memory, which other users may pass through.
make_scratch() {
    scratch=$(mktemp -d "/dev/shm/$1.XXXXXX")
    chmod 711 "$scratch"
    started=()
    made_run_sshd=
    trap end_all EXIT
    trap 'exit 130' INT TERM HUP
}

end_all() {
    local pid
    for pid in "${started[@]}"; do kill "$pid" && wait "$pid"; done
    rm -rf "$scratch"
    [ -z "$made_run_sshd" ] || rmdir /run/sshd
} >/dev/null 2>&1

# start COMMAND...: runs it in the background until the script ends; its messages go to the log.
start() {
    "$@" >>"$scratch/log" 2>&1 &
    started+=($!)
}

# path_of PROGRAM: where it is, also when that is not a user's directory for programs.
path_of() {
    PATH=$PATH:/usr/sbin:/usr/lib/nagios/plugins:$PWD/build/peers/usr/bin command -v "$1"
}

free_port() {
    local port
    while :; do
        port=$((20000 + RANDOM % 12000))
        (exec 3<>"/dev/tcp/127.0.0.1/$port") 2>/dev/null || { echo "$port"; return; }
    done
}

# await COMMAND...: runs it until it succeeds, for 10 s at most.
await() {
    local i
    for ((i = 0; i < 200; ++i)); do "$@" >/dev/null 2>&1 && return; sleep 0.05; done
    echo "not ready: $*" >&2
    return 1
}

answers() { (exec 3<>"/dev/tcp/127.0.0.1/$1"); }

# start_unguarded_host BUILD: starts a second host without guards beside that of start_host, on the same
# home; sets `unguarded_socket`. It has a journal of its own, which it would keep in memory otherwise.
start_unguarded_host() {
    unguarded_socket=$scratch/unguarded.sock
    QVSDEPLOY_AGENTDEPOT=$scratch/depot start "$1/bin/zavhost" --home "$scratch/home" \
        --socket "$unguarded_socket" --state "$scratch/unguarded.state" --unguarded
    await grep -q "ready: $unguarded_socket" "$scratch/log"
}

# start_host BUILD: starts a host with the home and depot in the scratch folder; sets `host` to its
# process and `host_socket`.
start_host() {
    mkdir -p "$scratch"/{depot,home/{bin,config,logs,tmp}}
    for program in TovrinAgent cinfo uninstall.sh; do
        [ ! -e "$scratch/home/bin/$program" ] || continue
        printf '#!/bin/sh\nexit 0\n' >"$scratch/home/bin/$program"
        chmod +x "$scratch/home/bin/$program"
    done
    host_socket=$scratch/host.sock
    QVSDEPLOY_AGENTDEPOT=$scratch/depot start "$1/bin/zavhost" --home "$scratch/home" \
        --socket "$host_socket"
    host=${started[-1]}
    await grep -q ready: "$scratch/log"
}

# start_sshd: starts a server with throw-away keys; sets `ssh_port` and `ssh_options` for its
# clients. Fails when there is no server. Its shells believe that they are nested, so that the
# user's own start-up file is not run and does not count against ssh.
start_sshd() {
    local sshd
    sshd=$(path_of sshd) && path_of ssh >/dev/null || return
    ssh_port=$(free_port)
    if [ "$(id -u)" -eq 0 ] && [ ! -d /run/sshd ]; then
        mkdir -p /run/sshd
        made_run_sshd=1
    fi
    ssh-keygen -q -t ed25519 -N '' -f "$scratch/hostkey"
    ssh-keygen -q -t ed25519 -N '' -f "$scratch/key"
    start "$sshd" -D -f /dev/null -p "$ssh_port" \
        -o ListenAddress=127.0.0.1 -h "$scratch/hostkey" -o PidFile=none -o StrictModes=no \
        -o AuthorizedKeysFile="$scratch/key.pub" -o PermitRootLogin=yes -o UsePAM=no \
        -o SetEnv=SHLVL=2 -o Subsystem="sftp internal-sftp"
    await answers "$ssh_port" || return
    ssh_options=(-F none -i "$scratch/key" -o StrictHostKeyChecking=no
        -o UserKnownHostsFile=/dev/null -o LogLevel=ERROR -o BatchMode=yes)
}

# start_rsync: starts a daemon whose module "target" is $scratch/target; sets `rsync_port`. Fails
# when there is no rsync.
start_rsync() {
    path_of rsync >/dev/null || return
    rsync_port=$(free_port)
    mkdir -p "$scratch/target"
    printf '%s\n' 'use chroot = no' "uid = $(id -u)" "gid = $(id -g)" '[target]' \
        "path = $scratch/target" 'read only = no' >"$scratch/rsyncd.conf"
    start rsync --daemon --no-detach --address=127.0.0.1 --port="$rsync_port" \
        --config="$scratch/rsyncd.conf"
    await answers "$rsync_port"
}

# start_nrpe PORT SCRIPT OPTION...: starts an NRPE server whose command "script" runs SCRIPT. It refuses
# to run as root.
start_nrpe() {
    local port=$1 script=$2 user group
    shift 2
    user=$(id -un) group=$(id -gn)
    [ "$(id -u)" -ne 0 ] || user=nobody group=nogroup
    printf '%s\n' server_address=127.0.0.1 "server_port=$port" "nrpe_user=$user" \
        "nrpe_group=$group" allowed_hosts=127.0.0.1 dont_blame_nrpe=0 disable_syslog=1 \
        "log_file=$scratch/nrpe.$port.log" "pid_file=$scratch/nrpe.$port.pid" \
        "command[script]=$script" >"$scratch/nrpe.$port.cfg"
    start "$(path_of nrpe)" -f -c "$scratch/nrpe.$port.cfg" "$@"
    await answers "$port"
}

# start_zabbix: starts a Zabbix agent that may run any command; sets `zabbix_port`. Fails when there
# is none.
start_zabbix() {
    path_of zabbix_agentd >/dev/null || return
    zabbix_port=$(free_port)
    printf '%s\n' LogType=file "LogFile=$scratch/zabbix.log" "PidFile=$scratch/zabbix.pid" \
        Server=127.0.0.1 ListenIP=127.0.0.1 "ListenPort=$zabbix_port" AllowRoot=1 \
        'AllowKey=system.run[*]' >"$scratch/zabbix.conf"
    start "$(path_of zabbix_agentd)" -f -c "$scratch/zabbix.conf"
    await answers "$zabbix_port"
}
