#!/bin/sh
# A fleet's page in a real browser, served by zavctl console and by the centre itself, before the fleet of
# the demonstration: five hosts, their links, a centre and the bus between them. One of the links is held up
# meanwhile, so that its host goes away. Status 77 without a bus or a Chromium.
#
#   real_fleet.sh BIN NODE SCRIPT   the built programs, node, and what drives the browser
set -eu
bin=$1
node=$2
script=$3
command -v nats-server >/dev/null || exit 77

scratch=$(mktemp -d)
demo=
held=
cleanup() {
    status=$?
    trap - EXIT
    [ -z "$held" ] || kill -CONT "$held" 2>/dev/null || true
    [ -z "$demo" ] || kill "$demo" 2>/dev/null || true
    [ -z "$demo" ] || wait "$demo" 2>/dev/null || true
    case $status in 0 | 77) ;; *) cat "$scratch/demo" ;; esac
    rm -rf "$scratch"
    exit "$status"
}
trap cleanup EXIT
trap 'exit 130' INT TERM

"$(dirname "$0")/../../scripts/demo-fleet.sh" --built "$bin" --console >"$scratch/demo" 2>&1 &
demo=$!
tries=0
until grep -qs '^console: ' "$scratch/demo"; do
    tries=$((tries + 1))
    [ "$tries" -le 3000 ] || exit 1
    kill -0 "$demo" 2>/dev/null || exit 1
    sleep 0.1
done
said() { sed -n "s/$1/\\1/p" "$scratch/demo"; }
held=$(said '^To see .*: kill -STOP \([0-9]*\),.*')
CONSOLE_LINK=$(said '^console: \(.*\)')
CONSOLE_AUTHORITY=$(said '.* has to know \(.*\)\. For a link:$')
CONSOLE_ZAVCTL=$(said '^  \(XDG_CONFIG_HOME=.*\) console --at-centre$')
CONSOLE_HELD_HOST=$(said '^To see \([^ ]*\) go away .*')
CONSOLE_HELD_PROCESS=$held
CONSOLE_PRODUCT=ux
CONSOLE_ON=role=web
export CONSOLE_LINK CONSOLE_AUTHORITY CONSOLE_ZAVCTL CONSOLE_HELD_HOST CONSOLE_HELD_PROCESS CONSOLE_PRODUCT CONSOLE_ON
"$node" "$script"
