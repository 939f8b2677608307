#!/bin/sh
# A compiler launcher that only has the compiler check a source. The object is left empty, so that
# the build tool knows that the check has been made. Precompiled headers are made as always.
set -eu
object=
previous=
for word in "$@"; do
    [ "$previous" != -x ] || [ "$word" != c++-header ] || exec "$@"
    [ "$previous" != -o ] || object=$word
    previous=$word
done
"$@" -fsyntax-only
: >"$object"
