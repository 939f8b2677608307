#!/bin/sh
# Shows a fleet on this machine: builds the programs, makes a fleet's keys, starts the bus and the
# centre, has five hosts and an operator join, deploys a real agent to all hosts in waves, kills one
# host half-way and shows it coming back, and removes everything. Asks nothing, leaves no process
# behind, and ends with status 0 when all of it worked.
#
#   scripts/demo-fleet.sh [--built DIR] [--console]
#
#   --built DIR  uses the programs there, and a made-up agent: nothing is built, nothing fetched
#   --console    after the first roll-outs, prints the link that opens the fleet in a browser, how to get
#                one to the centre's own console, and goes on until Ctrl-C
set -eu
cd "$(dirname "$0")/.."
built=
console=
while [ $# -gt 0 ]; do
    case $1 in
    --built)
        [ $# -ge 2 ] || break
        built=$2
        shift
        ;;
    --console) console=yes ;;
    *) break ;;
    esac
    shift
done
if [ $# -gt 0 ]; then
    sed -n '7,11s/^# \{0,1\}//p' "$0" >&2
    exit 2
fi

hosts="web-1 web-2 web-3 db-1 db-2"

# shellcheck source=scripts/demo-tools.sh
. scripts/demo-tools.sh

# ---- Build ---------------------------------------------------------------------------------------

if [ -z "$built" ]; then
    scripts/bootstrap.sh
    say "Build"
    scripts/build.sh native --target zavmgmt zavhost zavctl zavctl-fleet zavlink zavfleetd
    built=$PWD/build/native/bin
    fetches=yes
fi
PATH=$built:$PATH

# ---- What is started and what is left ------------------------------------------------------------

scratch=$(mktemp -d)
running=  # the processes, the newest first
# Also those that somebody has stopped.
end_running() {
    for process in $running; do
        kill "$process" 2>/dev/null || true
        kill -CONT "$process" 2>/dev/null || true
    done
    for process in $running; do wait "$process" 2>/dev/null || true; done
}
cleanup() {
    status=$?
    trap - EXIT
    for name in $hosts; do
        ZAV_SOCKET=$scratch/$name/host.sock zavctl stop ne >/dev/null 2>&1 || true
    done
    end_running
    rm -rf "$scratch"
    [ "$status" -eq 0 ] || echo "demo-fleet: failed"
    exit "$status"
}
trap cleanup EXIT
trap 'exit 130' INT TERM

# begin NAME COMMAND...: starts a process whose output goes to a file of that name; sets process.
begin() {
    output=$scratch/$1.out
    rm -f "$output"
    shift
    "$@" >"$output" 2>&1 &
    process=$!
    running="$process $running"
}
# await WORDS: until the process that was started last has said so.
await() {
    tries=0
    until grep -qs "$1" "$output"; do
        tries=$((tries + 1))
        if [ "$tries" -gt 1200 ] || ! kill -0 "$process" 2>/dev/null; then
            cat "$output"
            exit 1
        fi
        sleep 0.1
    done
}

# end_everything: ends what was started, and fails if any of it is left.
end_everything() {
    say "End everything"
    end_running
    running=
    [ -z "$console" ] || end_agents
    if pgrep -f "$scratch" >/dev/null; then
        echo "A process was left behind:"
        pgrep -af "$scratch"
        exit 1
    fi
    echo "Nothing is left running."
}
# end_agents: ends what somebody has started in the browser. Its files are below the scratch directory.
end_agents() {
    tries=0
    while pgrep -f "$scratch" >"$scratch/left" && [ "$tries" -lt 50 ]; do
        while read -r process; do kill "$process" 2>/dev/null || true; done <"$scratch/left"
        tries=$((tries + 1))
        sleep 0.2
    done
}

# ---- The fleet's keys, its bus and its centre ----------------------------------------------------

# Others may look for ports at the same time.
first_port=$((20000 + $$ % 10000))
bus_port=$(free_port "$first_port")
ZAV_FLEET=https://localhost:$(free_port $((bus_port + 1)))
XDG_CONFIG_HOME=$scratch/operator
export ZAV_FLEET XDG_CONFIG_HOME
centre="zavfleetd --directory $scratch/keys"
root=$scratch/usb-stick/root.key
mkdir "$scratch/usb-stick"

say "Make the fleet's keys; the root goes elsewhere"
# shellcheck disable=SC2086
run $centre keys init --fleet demo --root "$root" --name localhost,127.0.0.1 \
    --bus "nats://localhost:$bus_port" --url "$ZAV_FLEET" --store-bytes 1073741824
say "Start the bus and the centre"
begin bus nats-server -c "$scratch/keys/bus/nats-server.conf"
await 'Server is ready'
# shellcheck disable=SC2086
begin centre $centre serve ${console:+--console}
await 'the centre works'
cat "$output"

# ---- Hosts and an operator join ------------------------------------------------------------------

# start_host NAME: the host and then its link.
start_host() {
    begin "$1.host" env ZAV_SOCKET="$scratch/$1/host.sock" \
        QVSDEPLOY_AGENTDEPOT="$scratch/$1/home/depot" KBB_RAS1_LOG="$scratch/$1/trace.log" \
        zavhost --home "$scratch/$1/home" --origin-node "$1:DEMO" --socket "$scratch/$1/host.sock"
    await '^ready:'
    host_process=$process
}

say "Five hosts join: each with the one line that the centre prints for it"
for name in $hosts; do
    mkdir -p "$scratch/$name/link"
    home/bin/prepare-home "$scratch/$name/home" >/dev/null
    start_host "$name"
    case $name in web-*) role=web ;; *) role=db ;; esac
    # shellcheck disable=SC2086
    $centre enrol "$name" --labels "role=$role" 2>/dev/null |
        zavlink enrol --directory "$scratch/$name/link" --config "$scratch/$name/zavlink.toml" \
            --host-socket "$scratch/$name/host.sock" --label "role=$role" -
    begin "$name.link" zavlink --config "$scratch/$name/zavlink.toml"
    await 'connected to the bus'
    link_process=$process
    [ "$name" != db-1 ] || killed_host=$host_process
done

say "An operator joins: the key is made here, and the root certifies it"
# shellcheck disable=SC2086
invitation=$($centre operator add anna --role admin 2>/dev/null)
begin login zavctl login "$invitation"
await 'U[A-Z0-9]\{55\}'
# shellcheck disable=SC2086
run $centre operator certify --root "$root" --all
await 'You are'
cat "$output"
run zavctl --fleet "$ZAV_FLEET" whoami
tries=0
until [ "$(zavctl hosts | grep -c ' here ')" -eq 5 ]; do
    tries=$((tries + 1))
    [ "$tries" -le 600 ]
    sleep 0.5
done
run zavctl hosts

# ---- A real agent, in waves ----------------------------------------------------------------------

product=ne
if [ -n "${fetches-}" ] &&
    version=$(home/bundles/make-bundle ne "$scratch/bundle" 2>"$scratch/bundle.err"); then
    say "Deploy the distribution's node exporter"
else
    [ -z "${fetches-}" ] || sed 's/^/  /' "$scratch/bundle.err"
    say "Deploy a made-up agent: the distribution's cannot be had"
    product=w1
    version=1.0
    mkdir -p "$scratch/bundle"
    printf '#!/bin/sh\necho "installed"\n' >"$scratch/bundle/install.sh"
fi
fleet() { run zavctl --fleet "$ZAV_FLEET" "$@"; }
fleet push "$scratch/bundle" "$product/$version" --on '*'
fleet install "$product" "$version" --on 'role=web' --waves 1,100% --dry-run -- \
    /bin/sh '|DEPLOYDIR|/install.sh' -h '|TOVRINHOME|'
fleet install "$product" "$version" --on 'role=web' --waves 1,100% -- \
    /bin/sh '|DEPLOYDIR|/install.sh' -h '|TOVRINHOME|'

if [ -n "$console" ]; then
    say "The fleet in a browser, until Ctrl-C"
    # Shells have what they start in the background ignore Ctrl-C.
    trap 'end_everything; exit 0' INT TERM
    begin console zavctl --fleet "$ZAV_FLEET" console
    await '^console: '
    cat <<EOF
The centre's own console only looks; a browser has to know $scratch/keys/ca.pem. For a link:
  XDG_CONFIG_HOME=$XDG_CONFIG_HOME $built/zavctl --fleet $ZAV_FLEET console --at-centre
To see $name go away within two minutes: kill -STOP $link_process, and -CONT brings it back.
EOF
    cat "$output"
    wait "$process" || true
    echo "The console has ended."
    exit 1
fi

say "The others: and one of these hosts is killed with -9"
kill -9 "$killed_host"
wait "$killed_host" 2>/dev/null || true
fleet install "$product" "$version" --on 'role=db' --no-wait -- \
    /bin/sh '|DEPLOYDIR|/install.sh' -h '|TOVRINHOME|'
sleep 3
run zavctl rollout ls
say "It comes back, and gets what it has missed"
start_host db-1
rollout=$(zavctl --json rollout ls | sed -n 's/.*"id": *"\([0-9a-f]*\)".*/\1/p' | head -n 1)
run zavctl rollout watch "$rollout"
run zavctl rollout show "$rollout"

if [ "$product" = ne ]; then
    say "Configure each host's agent, and start all of them"
    port=$((bus_port + 100))
    for name in $hosts; do
        port=$(free_port $((port + 1)))
        printf 'INSTANCE=\nPORT=%s\n' "$port" >"$scratch/$name.conf"
        # A name without * is a label's: hosts are named one on a line.
        echo "$name" >"$scratch/this-host"
        fleet config set ne --on "@$scratch/this-host" --file "$scratch/$name.conf"
    done
    fleet start ne --on '*'
    echo "The figures of db-1:"
    db_port=$(sed -n 's/^PORT=//p' "$scratch/db-1.conf")
    curl -s --max-time 5 --retry 20 --retry-delay 1 --retry-connrefused \
        "http://127.0.0.1:$db_port/metrics" | grep -E '^node_(load1|boot_time_seconds) '
    fleet stop ne --on '*'
    fleet uninstall ne --on '*'
fi
run zavctl hosts show db-1

end_everything
