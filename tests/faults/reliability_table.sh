#!/bin/sh
# Checks docs/reliability.md against the tests: every test that its tables name exists, and every
# test below tests/faults is named there.
set -eu
cd "$(dirname "$0")/../.."
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT

# "TEST_F(Suite, Case)", which the formatter may have broken after the comma, as Suite.Case. A suite
# that is another name for a fixture is used like any other.
cases_in() {
    find "$@" -name '*_test.cpp' -exec cat {} + | tr '\n' ' ' |
        grep -oE 'TEST(_F|_P)?\( *[A-Za-z0-9]+, *[A-Za-z0-9]+\)' |
        sed -E 's/^TEST(_F|_P)?\( *([A-Za-z0-9]+), *([A-Za-z0-9]+)\)/\2.\3/' | sort -u
}

# Tests stand in backquotes in the last column.
# shellcheck disable=SC2016
sed -n 's/^|.*|\([^|]*\)| *$/\1/p' docs/reliability.md | grep -oE '`[A-Za-z0-9]+\.[A-Za-z0-9]+`' |
    tr -d '`' | sort -u >"$scratch/named"
cases_in tests >"$scratch/all"
cases_in tests/faults >"$scratch/faults"

status=0
missing=$(comm -23 "$scratch/named" "$scratch/all")
if [ -n "$missing" ]; then
    echo "named in docs/reliability.md, but there is no such test:"
    echo "$missing"
    status=1
fi
unnamed=$(comm -13 "$scratch/named" "$scratch/faults")
if [ -n "$unnamed" ]; then
    echo "below tests/faults, but not named in docs/reliability.md:"
    echo "$unnamed"
    status=1
fi
[ "$(wc -l <"$scratch/named")" -gt 50 ] || {
    echo "hardly any test is named in docs/reliability.md"
    status=1
}
exit "$status"
