#!/bin/sh
# The fleet's demonstration with its console: the link that it prints opens the page before the live
# fleet, and after the signal nothing is left.
#
#   demo_console.sh BIN      where the programs are
set -eu
cd "$(dirname "$0")/../../.."
scratch=$(mktemp -d)
demo=
cleanup() {
    status=$?
    trap - EXIT
    [ -z "$demo" ] || kill "$demo" 2>/dev/null || true
    [ -z "$demo" ] || wait "$demo" 2>/dev/null || true
    [ "$status" -eq 0 ] || cat "$scratch/out"
    rm -rf "$scratch"
    exit "$status"
}
trap cleanup EXIT
trap 'exit 130' INT TERM

scripts/demo-fleet.sh --built "$1" --console >"$scratch/out" 2>&1 &
demo=$!
tries=0
until grep -qs '^console: ' "$scratch/out"; do
    tries=$((tries + 1))
    [ "$tries" -le 3000 ]
    kill -0 "$demo"
    sleep 0.1
done
link=$(sed -n 's/^console: //p' "$scratch/out")
origin=${link%/open*}
curl -fsS --max-time 30 -c "$scratch/cookies" -o "$scratch/opened" "$link"
curl -fsS --max-time 60 -b "$scratch/cookies" "$origin/console/session" | grep -q '"mode":"fleet"'
curl -fsS --max-time 60 -b "$scratch/cookies" "$origin/v1/hosts" | grep -q '"web-1"'
curl -fsS --max-time 60 -b "$scratch/cookies" -H 'X-Zav-Console: 1' "$origin/console/run" \
    --data '{"verb": "start", "arguments": ["ux"], "options": {"on": "role=db", "dry-run": true}}' |
    grep -q '"exit":0'
kill -TERM "$demo"
wait "$demo"
demo=
grep -q '^Nothing is left running\.$' "$scratch/out"
