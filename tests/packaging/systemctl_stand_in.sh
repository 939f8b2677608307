#!/bin/sh
# What the maintainer scripts of the packages ask of systemctl, for a root file system in which no systemd
# can run: it starts and ends zavhost as the installed unit says, and notes each request in
# /run/systemctl.log. The host makes its sockets itself then.
set -eu
unit=/lib/systemd/system/zavhost.service
pid_file=/run/zavhost.pid

action='' units=''
for argument in "$@"; do
    case $argument in
    -*) ;;
    *) if [ -z "$action" ]; then action=$argument; else units="$units $argument"; fi ;;
    esac
done

process() {
    cat "$pid_file" 2>/dev/null || echo none
}
lives() {
    grep -q '^State:[[:blank:]]*[^Z[:blank:]]' "/proc/$(process)/status" 2>/dev/null
}
start() {
    ! lives || return 0
    mkdir -p /run/zavhost
    command=$(sed -n 's/^ExecStart=//p' "$unit")
    # shellcheck disable=SC2086
    STATE_DIRECTORY=/var/lib/zavhost setsid $command </dev/null >>/run/zavhost.log 2>&1 &
    echo $! >"$pid_file"
    until grep -q '^ready:' /run/zavhost.log; do
        lives || {
            cat /run/zavhost.log >&2
            exit 1
        }
        sleep 0.1
    done
}
stop() {
    lives || return 0
    kill -TERM "$(process)"
    while lives; do sleep 0.1; done
    : >/run/zavhost.log
}

# link_unit UNIT: makes the link that its section [Install] asks for.
link_unit() {
    target=$(sed -n 's/^WantedBy=//p' "/lib/systemd/system/$1")
    mkdir -p "/etc/systemd/system/$target.wants"
    ln -sf "/lib/systemd/system/$1" "/etc/systemd/system/$target.wants/$1"
}

case $action in
start | stop | restart) echo "$action$units" >>/run/systemctl.log ;;
esac
case $action$units in
"start zavhost.service") start ;;
"stop zavhost.service") stop ;;
"restart zavhost.service")
    stop
    start
    ;;
"start zavhost.socket" | "stop zavhost.socket" | "stop zavmgmt-agents.service" | daemon-reload) ;;
"preset "*) link_unit "${units# }" ;;
"is-active zavhost.service") lives ;;
"is-active zavhost.socket") ;;
# Their conditions do not hold: this machine has no part in a fleet.
"start zavlink.service" | "stop zavlink.service" | "restart zavlink.service") ;;
"start zavfleetd.service" | "stop zavfleetd.service" | "restart zavfleetd.service") ;;
"is-active zavlink.service" | "is-active zavfleetd.service") exit 3 ;;
"is-enabled "*)
    find /etc/systemd/system -name "${units# }" | grep -q . && echo enabled
    ;;
*)
    echo "systemctl: the stand-in does not know: $action$units" >&2
    exit 1
    ;;
esac
