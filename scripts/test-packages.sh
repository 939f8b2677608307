#!/bin/sh
# Installs the packages in a minimal root file system, uses, upgrades, removes and purges them there:
# tests/packaging/packages_life.sh says what is looked at. No systemd can run there; a small program stands
# in for it. Afterwards a container with them lives there: tests/packaging/container_life.sh.
#
#   scripts/test-packages.sh [--packages DIR]
#
#   --packages DIR  the packages that scripts/package.sh has made; they are built first if not given
#
# Needs root, and 1 GB below $TMPDIR or /var/tmp.
set -eu
cd "$(dirname "$0")/.."
program=test-packages
# shellcheck source=scripts/root.sh
. scripts/root.sh

packages=''
case $#/${1-} in
0/) ;;
2/--packages) packages=$2 ;;
*)
    sed -n '2,10s/^# \{0,1\}//p' "$0" >&2
    exit 2
    ;;
esac
need_root
if [ -z "$packages" ]; then
    packages=build/packages
    scripts/package.sh --output "$packages"
fi
need_packages mmdebstrap

make_scratch ''
root=$scratch

# ---- The root file system ------------------------------------------------------------------------

# needed_by FILE...: the packages that these depend on, without each other.
needed_by() {
    for file in "$@"; do
        architecture=$(dpkg-deb -f "$file" Architecture)
        dpkg-deb -f "$file" Pre-Depends Depends | sed 's/^[A-Za-z-]*: //' | tr ',' '\n' |
            sed -n "s/^ *\([a-z0-9.+-]*\).*/\1:$architecture/p"
    done | grep -v -e '^libzav' -e '^zav' -e '^:' | sed 's/:all$//' | sort -u
}

set -- "$packages"/lib*_amd64.deb "$packages"/zav*_amd64.deb "$packages"/lib*_i386.deb \
    "$packages"/zavmgmt-dev_*_i386.deb
# What they suggest for reading their manual pages and completing their command lines.
suggested=man-db,bash-completion
echo "== a root file system with what the packages depend on, and $suggested"
make_root "$root" amd64,i386 --include="$(needed_by "$@" | paste -sd, -),$suggested"

# ---- The packages --------------------------------------------------------------------------------

# as_version VERSION FOLDER FILE...: the packages as they would be with that version.
as_version() {
    lower=$1 folder=$2
    shift 2
    mkdir -p "$folder"
    for file in "$@"; do
        tree=$root/tmp/tree
        dpkg-deb -R "$file" "$tree"
        old=$(dpkg-deb -f "$file" Version)
        sed -i -e "s/^Version: .*/Version: $lower/" -e "s/(= $old)/(= $lower)/g" "$tree/DEBIAN/control"
        [ -z "$known" ] || [ ! -e "$tree/DEBIAN/preinst" ] ||
            sed -i "s/^known=.*/known=$known/" "$tree/DEBIAN/preinst"
        dpkg-deb -Znone -b "$tree" "$folder" >/dev/null
        rm -rf "$tree"
    done
}

rooms=$root/packages
mkdir -p "$rooms/new" "$rooms/foreign"
for file in "$packages"/*.deb; do
    case $file in
    *-dbgsym_*) ;;
    *_i386.deb) cp "$file" "$rooms/foreign/" ;;
    *) cp "$file" "$rooms/new/" ;;
    esac
done
known='' as_version 0.9 "$rooms/before" "$rooms/new"/*.deb
known=1 as_version 0.8 "$rooms/older" "$rooms/new"/*.deb
cp tests/packaging/systemctl_stand_in.sh "$rooms/systemctl"
cp tests/packaging/packages_life.sh "$rooms/"

echo "== the life of the packages"
inside "$root" /packages ./packages_life.sh /packages

# ---- The container -------------------------------------------------------------------------------

# As packaging/container/Containerfile does it.
echo "== the life of a container"
rm -f "$root/usr/bin/systemctl"
inside "$root" /packages/new sh -c 'dpkg -i libzav*1_*_amd64.deb zavhost_*_amd64.deb zavctl_*_amd64.deb >/dev/null
    rm -rf /var/lib/zavmgmt/*'
install -D -m 0755 packaging/container/container-entry "$root/usr/lib/zavhost/container-entry"
tests/packaging/container_life.sh "$root"
