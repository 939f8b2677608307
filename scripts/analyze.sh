#!/bin/sh
# Analyses the sources and scripts and prints what is found. The status is 1 if that is anything.
#
#   scripts/analyze.sh [TOOL ...] [-- FILE ...]
#
#   tidy      clang-tidy, with the checks in .clang-tidy
#   cppcheck  cppcheck, without the headers of other libraries
#   gcc       GCC's analyzer, on units that work with plain memory and descriptors
#   shell     shellcheck with its optional checks
#
# All tools look at all of their files unless some are named. That takes about an hour on two cores,
# nearly all of it in clang-tidy, and so it is no part of scripts/test.sh.
set -eu
cd "$(dirname "$0")/.."
build=build/analyze
jobs=$(nproc)
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT

usage() {
    sed -n '4,9s/^# \{0,1\}//p' "$0" >&2
    exit 2
}

tools=
while [ $# -gt 0 ]; do
    case $1 in
    tidy | cppcheck | gcc | shell) tools="$tools $1" ;;
    --)
        shift
        break
        ;;
    *) usage ;;
    esac
    shift
done
[ -n "$tools" ] || tools='tidy cppcheck gcc shell'
if [ $# -gt 0 ]; then
    printf '%s\n' "$@" >"$scratch/named"
else
    git ls-files >"$scratch/named"
fi

# The files of the product that are named, whose names match the expression.
product() {
    grep -E '^(plugin|platform|host|ctl|fleet|http|metrics|routes|secrets|sqlite|system|text|tools)/' "$scratch/named" | grep -E "$1" || :
}

# Clang understands none of GCC's precompiled headers, so the files are listed for a build without any.
configure() {
    [ -f "$build/compile_commands.json" ] || cmake -S . -B "$build" -G Ninja \
        -DCMAKE_BUILD_TYPE=RelWithDebInfo -DCMAKE_CXX_COMPILER=clang++ -DCMAKE_C_COMPILER=clang \
        -DCMAKE_DISABLE_PRECOMPILE_HEADERS=ON -DZAV_BUILD_TESTS=OFF >"$scratch/configure" 2>&1 || {
        cat "$scratch/configure" >&2
        return 1
    }
}

run_tidy() {
    configure || return 1
    product '\.cpp$' | xargs -r -P "$jobs" -n 1 \
        clang-tidy -p "$build" --quiet --warnings-as-errors='*' 2>"$scratch/counts"
}

run_cppcheck() {
    product '\.cpp$' >"$scratch/sources"
    [ -s "$scratch/sources" ] || return 0
    cppcheck --quiet -j "$jobs" --std=c++17 --language=c++ --library=posix \
        --enable=warning,performance,portability --error-exitcode=1 \
        --suppressions-list=scripts/cppcheck.suppressions -D__linux__ -DZAV_VERSION='"0"' \
        -I . -I plugin -I platform/include -I platform/embedded -I platform \
        --file-list="$scratch/sources"
}

# GCC's analyzer follows memory and descriptors but not exceptions, nor what classes own. So it gets the
# units that use none of those classes. It also takes an object that a function makes in its caller's
# place for uninitialised, and "new" for something that may be null: both kinds are left to clang-tidy.
run_gcc() {
    owners='std::(string|vector|map|set|deque|list|optional|function|variant|filesystem)|_ptr<'
    others='String|Array<|MallocedText|nlohmann|boost'
    product '\.cpp$' | xargs -r grep -LE "$owners|$others" |
        xargs -r -P "$jobs" -n 1 g++ -std=c++17 -O1 -fanalyzer -Werror \
            -Wno-analyzer-use-of-uninitialized-value -Wno-analyzer-possible-null-dereference \
            -D_FILE_OFFSET_BITS=64 -DZAV_VERSION='"0"' -I . -I plugin -I platform/include \
            -I platform/embedded -I platform -c -o /dev/null
}

# Left out of the optional checks:
#   SC2249              a default in every "case": where only some words matter, there is none
#   SC2250              braces around every variable
#   SC2310, 2311, 2312  functions and commands whose failure "set -e" does not see: that is meant,
#                       wherever a condition or a pipe stands
#   SC2292              "[[ ]]" in the scripts of bash: they test as those of sh do
#
# A file that others read has no "#!" but says what it is written in.
run_shell() {
    while read -r file; do
        if [ -f "$file" ] && head -n 1 "$file" |
            grep -qE '^#!.*\b(ba|mk|k)?sh\b|^# shellcheck shell='; then
            echo "$file"
        fi
    done <"$scratch/named" >"$scratch/scripts"
    xargs -r shellcheck --external-sources --enable=all --severity=style \
        --exclude=SC2249,SC2250,SC2292,SC2310,SC2311,SC2312 <"$scratch/scripts"
}

scripts/bootstrap.sh --analyze
status=0
for tool in $tools; do
    echo "== $tool"
    case $tool in
    tidy) run_tidy ;;
    cppcheck) run_cppcheck ;;
    gcc) run_gcc ;;
    *) run_shell ;;
    esac || status=1
done
exit "$status"
