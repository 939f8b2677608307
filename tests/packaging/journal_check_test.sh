#!/bin/sh
# A package looks into the journal before it is installed, and refuses one that its host could not read:
# wherever the journal is, and whether the host that wrote it runs or has ended.
#
#   journal_check_test.sh SCRIPT      SCRIPT is the template of the packages' preinst
set -eu
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
state=$scratch/state
mkdir "$state"
sed -e 's/@JOURNAL_SCHEMA@/2/' -e "s|/etc/zavmgmt/zavhost.conf|$scratch/zavhost.conf|" "$1" >"$scratch/preinst"
printf '# state = "/nowhere"\nstate = "%s"  # here\n' "$state" >"$scratch/zavhost.conf"

# first_page VERSION SIZE: a database's first page as far as it matters: its mark, and the version at 60.
first_page() {
    {
        printf 'SQLite format 3\000'
        head -c 44 /dev/zero
        printf '\000\000\000'
        # shellcheck disable=SC2059
        printf "\\00$1"
        head -c 4096 /dev/zero
    } | head -c "$2"
}
database() { first_page "$1" 4096 >"$state/journal.db"; }

# frame PAGE VERSION: what the log of changes has of a page of 512 bytes.
frame() {
    printf '\000\000\000'
    # shellcheck disable=SC2059
    printf "\\00$1"
    head -c 20 /dev/zero
    first_page "$2" 512
}
# changes FRAME...: the log, each frame as page:version.
changes() {
    {
        printf 'xxxxxxxx\000\000\002\000'
        head -c 20 /dev/zero
        for change in "$@"; do frame "${change%:*}" "${change#*:}"; done
    } >"$state/journal.db-wal"
}

# expect STATUS WHAT [ACTION]
expect() {
    status=0
    DPKG_MAINTSCRIPT_PACKAGE=zavhost sh "$scratch/preinst" "${3:-upgrade}" 0.9 >"$scratch/said" 2>&1 || status=$?
    [ "$status" -eq "$1" ] || {
        cat "$scratch/said" >&2
        echo "FAIL: $2: status $status, not $1" >&2
        exit 1
    }
}

expect 0 "no journal"
database 2
expect 0 "a journal that this host writes"
database 3
expect 1 "a journal of a newer host"
grep -qF "journal $state/journal.db has version 3" "$scratch/said"
expect 1 "a journal of a newer host that was removed" install
expect 0 "another step of the package manager" abort-upgrade
database 2
changes 1:2 4:7
expect 0 "a host that runs and has the same tables"
changes 4:1 1:3 5:1
expect 1 "a host that runs and has just made newer tables"
printf 'no database' >"$state/journal.db"
rm "$state/journal.db-wal"
expect 0 "a file that is no journal"
