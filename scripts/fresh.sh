#!/bin/sh
# Runs the demo and the tests of the preset native on a fresh Debian: in a minimal root file system
# that has the packages of "scripts/bootstrap.sh --list" and nothing else, from a clean checkout of
# HEAD. What is not committed is left out.
#
#   scripts/fresh.sh [--keep]     --keep leaves the root file system behind and says where
#
# Needs root, for mounts and chroot, and about 3 GB below $TMPDIR or /var/tmp. The packages come from
# where this machine's own apt gets them. The mounts and all processes in the root live in name
# spaces of their own, so they are gone when this script ends, however it ends.
set -eu
cd "$(dirname "$0")/.."
program=fresh
# shellcheck source=scripts/root.sh
. scripts/root.sh

fail() {
    echo "fresh: $*" >&2
    exit 1
}

keep=
case $#/${1-} in
0/) ;;
1/--keep) keep=1 ;;
*)
    sed -n '2,11s/^# \{0,1\}//p' "$0" >&2
    exit 2
    ;;
esac
need_root
commit=$(git rev-parse --verify --short HEAD) || fail "this is no checkout"

scripts/bootstrap.sh
need_packages mmdebstrap

make_scratch "$keep"
root=$scratch

# ---- The root file system ------------------------------------------------------------------------

echo "== a root file system with nothing but what bootstrap lists"
make_root "$root" "$(dpkg --print-architecture)" --include="$(scripts/bootstrap.sh --list | paste -sd, -)"

# ---- The checkout --------------------------------------------------------------------------------

echo "== a clean checkout of $commit"
mkdir -p "$root/src/build"
git archive HEAD | tar -x -C "$root/src"
# What bootstrap downloads besides packages; the root may have no mirror within reach.
cp -R build/third_party "$root/src/build/"

# ---- The work ------------------------------------------------------------------------------------

# npm gets the packages of the console's page from where this machine's own does.
registry=''
! command -v npm >/dev/null || registry=$(npm config get registry)
in_checkout() {
    inside "$root" /src env ${registry:+"npm_config_registry=$registry"} "$@"
}

echo "== what bootstrap still finds missing there"
inside "$root" /src scripts/bootstrap.sh >"$root/bootstrap.log" 2>&1 || {
    cat "$root/bootstrap.log"
    fail "bootstrap failed"
}
if [ -s "$root/bootstrap.log" ]; then
    cat "$root/bootstrap.log"
    fail "bootstrap had something to do although all that it lists is there"
fi
echo "nothing"
echo "== the demo"
in_checkout scripts/demo.sh
echo "== the tests"
in_checkout scripts/test.sh native
