#!/bin/sh
# Builds and runs a program against an installed prefix, by way of the CMake package and by way of
# pkg-config.
#
#   use_package.sh SOURCE PREFIX LIBDIR SCRATCH COMPILER FLAGS CMAKE-ARGUMENT...
set -eu
source=$1 prefix=$2 lib=$2/$3 scratch=$4 compiler=$5 flags=$6
shift 6

expected='KAGREQT
KINAGT
KAGDYST'
check() {
    [ "$2" = "$expected" ] || {
        echo "use_package: by $1 the program says: $2" >&2
        exit 1
    }
}

rm -rf "$scratch"
mkdir -p "$scratch/home"
cmake -S "$source" -B "$scratch/build" -DCMAKE_PREFIX_PATH="$prefix" "$@"
cmake --build "$scratch/build"
check CMake "$("$scratch/build/consumer" "$scratch/home")"

PKG_CONFIG_PATH=$lib/pkgconfig
export PKG_CONFIG_PATH
[ "$(pkg-config --modversion zavmgmt)" = "$(
    sed -n 's/^set(PACKAGE_VERSION "\(.*\)")$/\1/p' "$lib/cmake/zavmgmt/zavmgmtConfigVersion.cmake"
)" ]
# shellcheck disable=SC2046,SC2086
"$compiler" -std=c++17 $flags "$source/consumer.cpp" -o "$scratch/by-pkg-config" \
    $(pkg-config --cflags --libs zavmgmt)
check pkg-config "$(LD_LIBRARY_PATH=$lib "$scratch/by-pkg-config" "$scratch/home")"
