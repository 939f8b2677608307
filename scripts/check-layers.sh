#!/bin/sh
# Checks every #include of the tree against docs/layers.txt: an include that no arrow allows, a
# circle of units (a unit is a header with its source), a file that stands in no room, a quoted
# include that is not found, and a README whose picture is not that file word for word.
#
#   scripts/check-layers.sh [ROOT]      ROOT is this tree unless another one is given
set -eu
here=$(cd "$(dirname "$0")" && pwd)
cd "${1:-$here/..}"

{
    find . \( -name .git -o -path ./build -o -name node_modules -o -name corpus \) -prune -o \
        -type f \( -name '*.h' -o -name '*.hpp' -o -name '*.c' -o -name '*.cpp' \) -print |
        sed 's|^\./||' | LC_ALL=C sort
} | awk -f "$here/check-layers.awk"
