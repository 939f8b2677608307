#!/bin/sh
# Soaks a host: hundreds of clients ask, command, subscribe, push, send garbage and vanish, while its
# children are killed and hang and it is stopped and continued. In the last quarter of the time the
# host itself is killed at random moments, with SIGKILL, and started again. At the end every command
# that was accepted must be over in exactly one state, with its outcomes, in order, none may have run
# twice, and before the kills the host must hold no more than after the warm-up.
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
