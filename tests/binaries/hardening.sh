#!/bin/sh
# Checks that a library or a program is hardened: hardening.sh FILE OBJECTS, which is a file that lists
# the objects it is made of.
#
# The file tells what the linker did. What the compiler did is looked for in our own objects,
# because a linked file holds parts of the distribution's static libraries as well.
set -eu
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
status=0

fail() {
    echo "$*"
    status=1
}

# Fails unless a line of the file matches the expression.
wants() { # FILE EXPRESSION WORDS
    grep -qE -- "$2" "$1" || fail "$3"
}

linked() { # FILE
    readelf -hldW "$1" >"$scratch/elf"
    wants "$scratch/elf" '^ *Type: +DYN' "$1: is not position independent"
    wants "$scratch/elf" 'GNU_RELRO' "$1: relocations stay writable"
    wants "$scratch/elf" '\(FLAGS\).*BIND_NOW|\(FLAGS_1\).*NOW' "$1: functions are bound late"
    wants "$scratch/elf" 'GNU_STACK.* RW +0x' "$1: the stack is executable"
}

objects() { # NAME LIST
    name=$1
    # The build tool lists precompiled headers, too.
    grep '\.o$' "$2" >"$scratch/objects" || true
    count=$(grep -c . "$scratch/objects" || true)
    [ "$count" -gt 0 ] || fail "$name: there are no objects in $2"
    xargs -r readelf -nW <"$scratch/objects" >"$scratch/notes" 2>&1
    marked=$(grep -cE 'x86 feature: IBT, SHSTK' "$scratch/notes" || true)
    [ "$marked" -eq "$count" ] ||
        fail "$name: $marked of $count objects are marked for control-flow protection"
    xargs -r nm -u <"$scratch/objects" >"$scratch/symbols"
    wants "$scratch/symbols" '__stack_chk_fail' "$name: no stack protector"
    wants "$scratch/symbols" '__[a-z]+_chk$' "$name: no checked function of the C library"
    wants "$scratch/symbols" '__glibcxx_assert_fail' "$name: no assertions of the C++ library"
}

linked "$1"
objects "$1" "$2"
exit "$status"
