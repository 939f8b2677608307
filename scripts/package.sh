#!/bin/sh
# Builds the Debian packages of HEAD, from a clean checkout of it, and has lintian look at them. What is not
# committed is left out. docs/packaging.md says what the packages are.
#
#   scripts/package.sh [--twice] [--output DIR] [ARCHITECTURE ...]
#
#   ARCHITECTURE  amd64 or i386; both if none is named. This machine's own is built on it, the other one,
#                 which has the libraries only, in a minimal root file system. That needs root.
#   --twice       builds everything once more, in other folders, and fails if a package differs
#   --output DIR  where the packages go; build/packages if not given. Older ones there are removed
set -eu
cd "$(dirname "$0")/.."
program=package
# shellcheck source=scripts/root.sh
. scripts/root.sh

fail() {
    echo "package: $*" >&2
    exit 1
}
usage() {
    sed -n '2,10s/^# \{0,1\}//p' "$0" >&2
    exit 2
}

twice='' output=build/packages architectures=''
while [ $# -gt 0 ]; do
    case $1 in
    --twice) twice=yes ;;
    --output)
        [ $# -ge 2 ] || usage
        output=$2
        shift
        ;;
    amd64 | i386) architectures="$architectures $1" ;;
    *) usage ;;
    esac
    shift
done
[ -n "$architectures" ] || architectures='amd64 i386'
own=$(dpkg --print-architecture)
commit=$(git rev-parse --verify HEAD) || fail "this is no checkout"
[ -z "$(git status --porcelain)" ] || echo "package: what is not committed is left out" >&2

umask 022
make_scratch ''
chmod 755 "$scratch"

# ---- The source ----------------------------------------------------------------------------------

# The time of the commit is in the version and in every file of the packages.
version() {
    sed -n 's/^project(zavmgmt VERSION \([0-9.]*\) .*/\1/p' CMakeLists.txt
    TZ=UTC git log -1 --date=format-local:+%Y%m%d%H%M%S --format=%cd
}
changelog() {
    printf 'zavmgmt (%s) %s; urgency=medium\n\n' "$(version | tr -d '\n')" bookworm
    printf '  * Built from commit %s.\n\n' "$commit"
    printf ' -- %s  %s\n' "$(sed -n 's/^Maintainer: //p' packaging/debian/control)" \
        "$(TZ=UTC git log -1 --date=rfc-local --format=%cd)"
}

# check_out FOLDER
check_out() {
    mkdir -p "$1"
    git archive HEAD | tar -x -C "$1"
    cp -R "$1/packaging/debian" "$1/debian"
    changelog >"$1/debian/changelog"
}

# ---- The build -----------------------------------------------------------------------------------

# build ARCHITECTURE FOLDER: leaves the packages in FOLDER, which is a path in the root file system, too.
build() {
    echo "== $1: packages of $(version | tr -d '\n')"
    mkdir -p "$2"
    built=0
    if [ "$1" = "$own" ]; then
        check_out "$2/source"
        (cd "$2/source" && dpkg-buildpackage -b -us -uc) >"$2.log" 2>&1 || built=$?
    else
        check_out "$root$2/source"
        inside "$root" "$2/source" dpkg-buildpackage -B -us -uc >"$2.log" 2>&1 || built=$?
    fi
    [ "$built" -eq 0 ] || {
        tail -n 60 "$2.log"
        fail "the packages for $1 could not be built"
    }
    if [ "$1" != "$own" ]; then
        mv "$root$2"/*.deb "$2/"
        rm -rf "${root:?}$2"
    fi
    rm -rf "$2/source"
}

# What the build of an architecture needs, by the package names of debian/control.
needed_for() {
    perl -MDpkg::Control::Info -MDpkg::Deps -e '
        my ($file, $architecture) = @ARGV;
        my $needed = Dpkg::Control::Info->new($file)->get_source()->{"Build-Depends"};
        my $parsed = deps_parse($needed, build_dep => 1, reduce_arch => 1,
                                host_arch => $architecture, build_arch => $architecture);
        print join(",", map { $_->{package} } $parsed->get_deps()), "\n";
    ' packaging/debian/control "$1"
}

root=''
need_foreign_root() {
    need_root
    need_packages mmdebstrap arch-test
    root=$scratch/root
    mkdir "$root"
    echo "== $1: a root file system to build in"
    make_root "$root" "$1" --include="build-essential,$(needed_for "$1")"
}

scripts/bootstrap.sh
need_packages dpkg-dev debhelper lintian
for architecture in $architectures; do
    [ "$architecture" = "$own" ] || need_foreign_root "$architecture"
    build "$architecture" "$scratch/$architecture"
    [ -n "$twice" ] || continue
    build "$architecture" "$scratch/once-more/$architecture"
    for package in "$scratch/$architecture"/*.deb; do
        cmp "$package" "$scratch/once-more/$architecture/${package##*/}" ||
            fail "${package##*/} is another one when it is built elsewhere"
    done
    echo "Built twice, the packages for $architecture are the same."
done

mkdir -p "$output"
rm -f "$output"/*.deb
mv "$scratch"/*/*.deb "$output/"
echo "== lintian"
lintian --allow-root --fail-on error,warning "$output"/*.deb
echo "== packages in $output"
ls "$output"
