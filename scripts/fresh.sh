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
[ "$(id -u)" -eq 0 ] || fail "this needs root, to mount and to change the root directory"
commit=$(git rev-parse --verify --short HEAD) || fail "this is no checkout"

scripts/bootstrap.sh
if ! command -v mmdebstrap >/dev/null; then
    echo "fresh: installing mmdebstrap"
    apt-get update -qq
    DEBIAN_FRONTEND=noninteractive apt-get install -y -qq --no-install-recommends mmdebstrap >/dev/null
fi

root=$(mktemp -d -p "${TMPDIR:-/var/tmp}" fresh.XXXXXX)
cleanup() {
    status=$?
    trap - EXIT
    rm -f "$root.apt.conf"
    if [ -n "$keep" ]; then
        echo "fresh: the root file system is in $root"
    else
        rm -rf --one-file-system "$root"
    fi
    exit "$status"
}
trap cleanup EXIT
trap 'exit 130' HUP INT TERM

# ---- The root file system ------------------------------------------------------------------------

# Where and how this machine fetches packages: its sources, and its options for fetching, such as
# proxies.
set --
for sources in /etc/apt/sources.list /etc/apt/sources.list.d/*.list /etc/apt/sources.list.d/*.sources; do
    [ ! -s "$sources" ] || set -- "$@" "$sources"
done
[ $# -gt 0 ] || fail "apt has no sources on this machine"
apt-config dump | grep -E '^Acquire::(https?|Retries|Check-Valid-Until|Check-Date|ForceIPv)' \
    >"$root.apt.conf" || true

echo "== a root file system with nothing but what bootstrap lists"
# shellcheck source=/dev/null disable=SC2154
suite=$(. /etc/os-release && echo "$VERSION_CODENAME")
unshare --mount --pid --fork --kill-child --mount-proc \
    mmdebstrap --quiet --variant=minbase --aptopt="$root.apt.conf" \
    --include="$(scripts/bootstrap.sh --list | paste -sd, -)" "$suite" "$root" "$@"

# ---- The checkout --------------------------------------------------------------------------------

echo "== a clean checkout of $commit"
mkdir -p "$root/src/build"
git archive HEAD | tar -x -C "$root/src"
# What bootstrap downloads besides packages; the root may have no mirror within reach.
cp -R build/third_party "$root/src/build/"

# ---- The work ------------------------------------------------------------------------------------

# inside COMMAND...: runs it in the checkout, in the root file system. The environment is empty but
# for what a login would set.
inside() {
    # shellcheck disable=SC2016
    unshare --mount --pid --fork --kill-child -- sh -euc '
        root=$1
        shift
        mount -t proc proc "$root/proc"
        mount --rbind /dev "$root/dev"
        mount -t tmpfs tmpfs "$root/run"
        cd "$root/src"
        exec chroot "$root" /usr/bin/env -i HOME=/root LANG=C.UTF-8 \
            PATH=/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin \
            /bin/sh -euc '\''cd /src; exec "$@"'\'' sh "$@"' sh "$root" "$@"
}

echo "== what bootstrap still finds missing there"
inside scripts/bootstrap.sh >"$root/bootstrap.log" 2>&1 || {
    cat "$root/bootstrap.log"
    fail "bootstrap failed"
}
if [ -s "$root/bootstrap.log" ]; then
    cat "$root/bootstrap.log"
    fail "bootstrap had something to do although all that it lists is there"
fi
echo "nothing"
echo "== the demo"
inside scripts/demo.sh
echo "== the tests"
inside scripts/test.sh native
