#!/bin/sh
# Checks that the files and folders that the documents name exist, so that moving a file does not
# leave a reader looking for it. A name without an extension stands for the header of that name.
set -eu
cd "$(dirname "$0")/../.."
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT

# Names in backquotes that begin with a folder of the root, and the targets of relative links.
# shellcheck disable=SC2016
names_in() {
    grep -oE '`(bench|cmake|console|contrib|ctl|docs|examples|fleet|home|host|http|metrics|packaging|platform|plugin|routes|scripts|secrets|sqlite|system|tests|tools)/[A-Za-z0-9_./-]*`' "$1" |
        tr -d '`' || :
    grep -oE '\]\([A-Za-z0-9_./-]+\)' "$1" | sed "s|^](|$(dirname "$1")/|; s|)\$||" || :
}

status=0
for document in README.md CONTRIBUTING.md docs/*.md; do
    names_in "$document" | sort -u >"$scratch/names"
    cat "$scratch/names" >>"$scratch/all"
    while read -r name; do
        [ -e "$name" ] || [ -e "$name.h" ] || {
            echo "$document names $name, which does not exist"
            status=1
        }
    done <"$scratch/names"
done
[ "$(wc -l <"$scratch/all")" -gt 50 ] || {
    echo "hardly any file is named in the documents"
    status=1
}
exit "$status"
