#!/bin/sh
# Removes a product of one platform from the home that contains this program.
set -u
program=uninstall.sh
CDPATH='' own_dir=$(cd -- "$(dirname -- "$0")" && pwd) || exit 2
# shellcheck source=home/lib/common.sh
. "$own_dir/../lib/common.sh"
# shellcheck source=home/lib/process.sh
. "$own_dir/../lib/process.sh"

usage() {
    cat >&2 <<'TEXT'
usage: uninstall.sh -i PRODUCT PLATFORM
Stops the product's instances and removes its files and its inventory entry; with its last platform
also its configuration, data and logs.
exit status: 0 done, 1 wrong usage, 2 no usable home, 3 not installed for that platform,
  7 an instance could not be stopped (nothing is removed), 8 the home cannot be written or is busy,
  20 other products of the platform still need it
TEXT
    exit "$EXIT_USAGE"
}

# needed_by_others: succeeds when another product of the platform needs the shared component.
needed_by_others() {
    for other in "$home/registry"/*"$arch.ver"; do
        [ "$other" = "$entry" ] || [ ! -e "$other" ] || return 0
    done
    return 1
}

# Removes the product's files outside its folder, for all its instances.
remove_traces() {
    for kind in config/%.cfg config/%_*.cfg config/%.config config/%_*.config run/%.pid run/%_*.pid \
        logs/%.log logs/%_*.log logs/%.log.1 logs/%_*.log.1 data/% data/%_*; do
        # Only the stars of the kind are patterns; the home's path is literal.
        (
            cd -- "$home/${kind%/*}" 2>/dev/null || exit 0
            pattern=${kind##*/}
            # shellcheck disable=SC2086
            rm -rf -- ${pattern%%\%*}$product${pattern#*%}
        )
    done
}

uninstall_product() {
    if [ ! -e "$entry" ] && [ ! -d "$folder" ]; then
        say "product $product is not installed for $arch"
        return "$EXIT_ABSENT"
    fi
    stop_all "$product" "$arch" || return
    # The folder is removed in one step: half a product could still be started.
    gone=${folder%/*}/.${folder##*/}.gone
    rm -rf -- "$gone" 2>/dev/null
    if [ -d "$folder" ] && ! mv -- "$folder" "$gone" 2>/dev/null; then
        say "cannot remove $folder"
        return "$EXIT_WRITE"
    fi
    if ! rm -f -- "$entry" 2>/dev/null; then
        [ ! -d "$gone" ] || mv -- "$gone" "$folder"
        say "cannot remove $entry"
        return "$EXIT_WRITE"
    fi
    rm -rf -- "$gone"
    rmdir -- "$home/agtqvs6/$arch" 2>/dev/null
    for other in "$home"/agtqvs6/*/"$product"; do
        [ ! -d "$other" ] || return 0
    done
    remove_traces
    rm -f -- "$lock_file"
}

[ $# -eq 3 ] && [ "$1" = -i ] && valid_product "$2" && valid_arch "$3" || usage
product=$2 arch=$3
use_home "$own_dir/.."
entry=$home/registry/$product$arch.ver
folder=$home/agtqvs6/$arch/$product
[ "$product" != ax ] || folder=$home/agtqvs6/$arch/bin
if [ ! -e "$entry" ] && [ ! -d "$folder" ]; then
    fail "$EXIT_ABSENT" "product $product is not installed for $arch"
fi
if [ "$product" = ax ] && needed_by_others; then
    fail "$EXIT_NEEDED" "other products of $arch need the shared component"
fi
with_lock "$product" uninstall_product
