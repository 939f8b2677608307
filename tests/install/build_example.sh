#!/bin/sh
# Builds the vendor's example against an installed prefix and nothing else.
#
#   build_example.sh SOURCE PREFIX BUILD CMAKE-ARGUMENT...
set -eu
source=$1 prefix=$2 build=$3
shift 3

# A copy shows that the example needs nothing of the tree around it.
rm -rf "$build" "$build.source"
cp -R "$source" "$build.source"
cmake -S "$build.source" -B "$build" -DCMAKE_PREFIX_PATH="$prefix" "$@"
cmake --build "$build"
