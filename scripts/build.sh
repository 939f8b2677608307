#!/bin/sh
# Configures and builds one preset in build/PRESET. What configuring says is shown only if it fails.
#
#   scripts/build.sh PRESET [CMAKE_BUILD_OPTION ...]
set -eu
cd "$(dirname "$0")/.."

preset=${1:?usage: scripts/build.sh PRESET [CMAKE_BUILD_OPTION ...]}
shift
mkdir -p build
cmake --preset "$preset" >"build/$preset.configure.log" 2>&1 || {
    cat "build/$preset.configure.log" >&2
    exit 1
}
exec cmake --build --preset "$preset" "$@" -- --quiet
