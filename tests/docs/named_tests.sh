#!/bin/sh
# Checks that the tests that the documents name exist: each `Suite.Case` in backquotes in a table, and
# `Suite.*`.
set -eu
cd "$(dirname "$0")/../.."
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT

# A declaration may go on in the next line.
find tests platform/conformance -name '*.cpp' -exec cat {} + | tr '\n' ' ' |
    grep -oE 'TEST(_F|_P)?\( *[A-Za-z0-9_]+, *[A-Za-z0-9_]+\)' |
    sed -E 's/TEST(_F|_P)?\( *([A-Za-z0-9_]+), *([A-Za-z0-9_]+)\)/\2.\3/' >"$scratch/cases"
sed 's/\..*/.*/' "$scratch/cases" | sort -u | cat - "$scratch/cases" >"$scratch/there"

status=0
for document in docs/guards.md docs/security.md docs/fleet-security.md; do
    # shellcheck disable=SC2016
    grep '^|' "$document" | grep -oE '`[A-Z][A-Za-z0-9_]*\.([A-Z][A-Za-z0-9_]*|\*)`' |
        tr -d '`' | sort -u >"$scratch/named"
    while read -r name; do
        grep -qxF "$name" "$scratch/there" || {
            echo "$document names the test $name, which does not exist"
            status=1
        }
    done <"$scratch/named"
    cat "$scratch/named" >>"$scratch/all"
done
[ "$(wc -l <"$scratch/all")" -gt 100 ] || {
    echo "hardly any test is named in the documents"
    status=1
}
exit "$status"
