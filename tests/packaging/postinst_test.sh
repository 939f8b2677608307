#!/bin/sh
# What the package makes of the home when it is configured: a new one, or what an older one lacks, and nothing
# that its owner has changed.
#
#   postinst_test.sh SCRIPT HOME      SCRIPT is the package's postinst, HOME the starter home
set -eu
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
home=$scratch/zavmgmt
sed -e "s|/var/lib|$scratch|g" -e "s|/usr/share/zavmgmt/home|$2|g" "$1" >"$scratch/postinst"
# The group is there.
mkdir "$scratch/bin"
printf '#!/bin/sh\nexit 0\n' >"$scratch/bin/getent"
chmod 755 "$scratch/bin/getent"

fail() {
    echo "FAIL: $*" >&2
    exit 1
}
configure() {
    PATH=$scratch/bin:$PATH sh "$scratch/postinst" configure "$@" 2>"$scratch/err" || fail "postinst: $(cat "$scratch/err")"
}
list() { "$home/bin/instances" list >"$scratch/list" || fail "the home cannot list its instances"; }

configure
cmp "$home/bin/instances" "$2/bin/instances" || fail "a new home is not a copy"
list

rm "$home/bin/instances"
echo '# changed' >>"$home/bin/cinfo"
find "$home" ! -path "$home/bin/instances" -type f -exec cksum {} + | sort >"$scratch/before"
configure 0.9
list
find "$home" ! -path "$home/bin/instances" -type f -exec cksum {} + | sort | diff "$scratch/before" - ||
    fail "an upgrade changed something in the home"

echo '# changed' >>"$home/bin/instances"
cp "$home/bin/instances" "$scratch/changed"
configure 0.9
cmp "$home/bin/instances" "$scratch/changed" || fail "an upgrade changed what it had brought"

rm -r "$home/registry" "$home/bin/instances"
configure 0.9
[ ! -e "$home/bin/instances" ] || fail "a folder that is no home was completed"
grep -q 'is not a home' "$scratch/err" || fail "nobody is told: $(cat "$scratch/err")"
