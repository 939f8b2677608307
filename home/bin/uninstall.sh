#!/bin/sh
# Removes a product of one platform from the home that contains this program.
set -u
program=uninstall.sh
CDPATH='' own_dir=$(cd -- "$(dirname -- "$0")" && pwd) || exit 2
# shellcheck source=home/lib/common.sh
. "$own_dir/../lib/common.sh"
# shellcheck source=home/lib/users.sh
. "$own_dir/../lib/users.sh"
# shellcheck source=home/lib/process.sh
. "$own_dir/../lib/process.sh"
# shellcheck source=home/lib/install.sh
. "$own_dir/../lib/install.sh"

usage() {
    cat >&2 <<'TEXT'
usage: uninstall.sh -i PRODUCT PLATFORM
Stops the product's instances and removes its files and its inventory entry; with its last platform
also its configuration, data and logs.
exit status: 0 done, 1 wrong usage, 2 no usable home, 3 not installed for that platform,
  7 an instance could not be stopped (nothing is removed), 8 the home cannot be written or is busy,
  20 other products of the platform still need it,
  28 the product's manifest is damaged (nothing is removed)
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
    for kind in config/%.cfg config/%_*.cfg config/%.config config/%_*.config; do
        remove_kind "$home" "$product" "$kind"
    done
    remove_product_files "$product"
    for_other_users remove-all "$product" ''
}

installed() {
    [ -e "$entry" ] || [ -d "$folder" ]
}

# refuse_damaged: what is removed is known from the manifest, so it has to be whole. Products of older
# homes, and those put there by hand, have none.
refuse_damaged() {
    [ -e "$folder/.manifest" ] && ! sealed "$folder/.manifest" || return 0
    say "the manifest $folder/.manifest is damaged, so nothing is removed; it would have been" \
        "$folder, $entry and, with the product's last platform, the configuration, data and logs of" \
        "$product. Install the product again, or remove the manifest, and repeat this"
    return "$EXIT_DAMAGED"
}

# The inventory entry goes last: while it is there, a repeated call finishes what one that was killed
# has begun.
uninstall_product() {
    if ! installed; then
        say "product $product is not installed for $arch"
        return "$EXIT_ABSENT"
    fi
    refuse_damaged || return
    [ -w "$home/registry" ] || {
        say "cannot remove $entry"
        return "$EXIT_WRITE"
    }
    stop_all "$product" "$arch" || return
    # The folder is removed in one step: half a product could still be started.
    gone=${folder%/*}/.${folder##*/}.gone
    rm -rf -- "$gone" 2>/dev/null
    if [ -d "$folder" ] && ! mv -- "$folder" "$gone" 2>/dev/null; then
        say "cannot remove $folder"
        return "$EXIT_WRITE"
    fi
    rm -rf -- "$gone"
    rmdir -- "$home/agtqvs6/$arch" 2>/dev/null
    remove_last_traces
    rm -f -- "$entry" || {
        say "cannot remove $entry"
        return "$EXIT_WRITE"
    }
    [ "$lock_goes" = no ] || rm -f -- "$lock_file"
}

# remove_last_traces: sets lock_goes when this was the product's last platform.
remove_last_traces() {
    lock_goes=no
    for other in "$home"/agtqvs6/*/"$product"; do
        [ ! -d "$other" ] || return 0
    done
    remove_traces
    lock_goes=yes
}

[ $# -eq 3 ] && [ "$1" = -i ] && valid_product "$2" && valid_arch "$3" || usage
product=$2 arch=$3
use_home "$own_dir/.."
use_state
entry=$home/registry/$product$arch.ver
folder=$home/agtqvs6/$arch/$product
[ "$product" != ax ] || folder=$home/agtqvs6/$arch/bin
if ! installed; then
    fail "$EXIT_ABSENT" "product $product is not installed for $arch"
fi
if [ "$product" = ax ] && needed_by_others; then
    fail "$EXIT_NEEDED" "other products of $arch need the shared component"
fi
with_lock "$product" uninstall_product
