#!/bin/sh
# Soaks a host: hundreds of clients ask, command, subscribe, push, send garbage and vanish, while its
# children are killed and hang and it is stopped and continued. At the end every accepted command
# must have its outcomes, in order, and the host must hold no more than after the warm-up.
#
#   scripts/soak.sh [--preset NAME] [OPTION ...] [MINUTES]     native, 10 minutes by default
#
# Options are those of tests/soak: --seed N repeats the choices of a run, --clients N, --real-pace
# for a plug-in that waits as long as the shipped one, --keep. When something is found, what the
# host left behind is kept and named.
set -eu
cd "$(dirname "$0")/.."

preset=native
if [ "${1:-}" = --preset ]; then
    preset=$2
    shift 2
fi
case "$*" in
*[!\ ]*) ;;
*) set -- 10 ;;
esac

scripts/bootstrap.sh
scripts/build.sh "$preset" --target zavsoak
exec "build/$preset/bin/zavsoak" "$@"
