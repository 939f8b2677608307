#!/bin/sh
# The life of a container with the host, in a root file system in which the packages are installed as
# packaging/container/Containerfile says. No container engine is needed: it would do the same with name
# spaces.
#
#   container_life.sh ROOT       as root
set -eu
root=$1
cd "$(dirname "$0")/../.."
# What is sourced wants to be told.
# shellcheck disable=SC2034
program=container_life
# shellcheck source=scripts/root.sh
. scripts/root.sh
log=$root.container.log
container='' host=''

say() { echo "-- $*"; }
fail() {
    echo "FAIL: $*" >&2
    tail -n 20 "$log" >&2
    exit 1
}
cleanup() {
    status=$?
    trap - EXIT
    [ -z "$host" ] || kill -KILL "$host" 2>/dev/null || true
    [ -z "$container" ] || wait "$container" 2>/dev/null || true
    rm -f "$log"
    exit "$status"
}
trap cleanup EXIT
trap 'exit 130' HUP INT TERM

# until_true COMMAND...: waits for it, for a minute at most.
until_true() {
    tries=600
    until "$@"; do
        tries=$((tries - 1))
        [ "$tries" -gt 0 ] || return 1
        sleep 0.1
    done
}
says() { grep -qF -- "$1" "$log"; }

# start_container: sets container, which is what is waited for, and host, the number of its first process
# out here.
start_container() {
    : >"$log"
    inside "$root" / /usr/lib/zavhost/container-entry >"$log" 2>&1 &
    container=$!
    until_true says "ready: /run/zavhost/zavhost.sock" || fail "the host is not ready"
    for candidate in $(pgrep -x zavhost); do
        [ "$(readlink "/proc/$candidate/root")" = "$(readlink -f "$root")" ] || continue
        host=$candidate
    done
    [ -n "$host" ] || fail "there is no host"
}
# within COMMAND...: runs it in the container.
within() {
    nsenter --target "$host" --mount --pid --root --wd -- "$@"
}
stop_container() {
    kill -TERM "$host"
    stopped=0
    wait "$container" || stopped=$?
    container='' host=''
    [ "$stopped" -eq 0 ] || fail "the container ended with status $stopped"
}
no_zombie() {
    # shellcheck disable=SC2016
    ! within /bin/sh -c 'grep -l "^State:.Z" /proc/[0-9]*/status' >/dev/null 2>&1
}
agent_runs() {
    within zavctl agents >"$root/tmp/agents" && grep -q ':UX  *running' "$root/tmp/agents"
}

say "starts, with a home of its own"
start_container
[ "$(within cat /proc/1/comm)" = zavhost ] || fail "the host is not process 1"
within zavctl doctor >"$root/tmp/doctor" || {
    cat "$root/tmp/doctor" >&2
    fail "doctor has found an error"
}
# The engine runs it again and again.
health=$(sed -n 's/^HEALTHCHECK .*CMD \[\(.*\)\]$/\1/p' packaging/container/Containerfile | tr -d '",')
[ -n "$health" ] || fail "the image has no health check"
# shellcheck disable=SC2086
within $health >/dev/null || fail "the health check fails"
within zavctl start ux >/dev/null || fail "the agent does not start"
agent_runs || fail "the agent is not seen to run"

say "reaps what loses its parent"
within /bin/sh -c 'cat >/tmp/orphans.sh && chmod 755 /tmp/orphans.sh' <<'TEXT'
#!/bin/sh
for i in 1 2 3 4 5; do (setsid sleep 0.$i &); done
TEXT
within zavctl install px 1.0 --no-verify -- /tmp/orphans.sh >/dev/null || fail "the task fails"
until_true no_zombie || fail "somebody is left who has ended"

say "ends when it is told to, and goes on where it was"
stop_container
! says " processes have not ended" || fail "the agent was killed"
start_container
agent_runs || fail "the agent that ran does not run again"
within zavctl --json tasks >"$root/tmp/tasks"
grep -q '"INSTALL"' "$root/tmp/tasks" || fail "the journal is lost"
stop_container

say "adds little"
# shellcheck disable=SC2016
added=$(chroot "$root" dpkg-query -W -f '${Installed-Size}\n' libzavmgmt1 libzavplatform1 zavhost zavctl \
    adduser libexpat1 libsqlite3-0 libstdc++6 mksh | awk '{ sum += $1 } END { print int(sum / 1024) }')
[ "$added" -lt 60 ] || fail "the packages add $added MiB to the base"
say "$added MiB with what they depend on; the container is well"
