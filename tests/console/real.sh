#!/bin/sh
# The console's page in a real browser, served by zavctl console, before a real host on a home of its
# own: an agent is started and stopped, a file pushed, a configuration changed. Status 77 without a
# Chromium.
#
#   real.sh BIN NODE SCRIPT   the built programs, node, and what drives the browser
set -eu
bin=$1
node=$2
script=$3

scratch=$(mktemp -d)
host=
console=
cleanup() {
    status=$?
    trap - EXIT
    [ -z "$console" ] || kill "$console" 2>/dev/null || true
    if [ -n "$host" ]; then
        "$bin/zavctl" stop ux >/dev/null 2>&1 || true
        kill "$host" 2>/dev/null || true
    fi
    for process in $console $host; do wait "$process" 2>/dev/null || true; done
    rm -rf "$scratch"
    exit "$status"
}
trap cleanup EXIT
trap 'exit 130' INT TERM

# begin NAME WORDS COMMAND...: starts it, its output going to a file of that name, and waits until it
# has said the words; sets process.
begin() {
    output=$scratch/$1
    words=$2
    shift 2
    "$@" >"$output" 2>&1 &
    process=$!
    tries=0
    until grep -qs "$words" "$output"; do
        tries=$((tries + 1))
        if [ "$tries" -gt 600 ] || ! kill -0 "$process" 2>/dev/null; then
            cat "$output"
            exit 1
        fi
        sleep 0.1
    done
}

"$(dirname "$0")/../../home/bin/prepare-home" "$scratch/home" >"$scratch/prepared"
export ZAV_SOCKET="$scratch/host.sock"
begin host '^ready:' "$bin/zavhost" --home "$scratch/home" --socket "$ZAV_SOCKET"
host=$process
begin console '^console: ' "$bin/zavctl" console
console=$process
CONSOLE_LINK=$(sed -n 's/^console: //p' "$output") "$node" "$script"
