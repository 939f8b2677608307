# shellcheck shell=sh
# Installing a product's files into a home, all or nothing. Read after common.sh and process.sh.
# shellcheck disable=SC2034,SC2154

# read_description FILE: sets described_code, described_text, described_version, described_release
# and described_platform ("any": runs on every platform); fails when one is missing.
read_description() {
    described_code=$(config_value ProdCode "$1") &&
        described_text=$(config_value Description "$1") &&
        described_platform=$(config_value Platform "$1") &&
        described_version=$(config_value Version "$1") &&
        described_release=$(config_value Release "$1") &&
        valid_product "$described_code"
}

# write_entry ARCH ENTRY: writes the described product's inventory entry.
write_entry() {
    printf 'ProdCode=%s\nDescription=%s\nPlatform=%s\nVersion=%s\nRelease=%s\n' "$described_code" \
        "$described_text" "$1" "$described_version" "$described_release" | replace_file "$2"
}

# set_modes DIR: transfers do not preserve modes. Files in a folder named bin become executable.
set_modes() (
    cd -- "$1" && find . -type d -exec chmod 755 {} + &&
        find . -type f ! -path '*/bin/*' -exec chmod 644 {} + &&
        find . -type f -path '*/bin/*' -exec chmod 755 {} +
)

# clear_leftovers: cleans up after an installation that was killed. One that was killed between its two
# renames has left the product missing; this brings it back.
clear_leftovers() {
    [ -d "$target" ] || [ ! -d "$old" ] || mv -- "$old" "$target" 2>/dev/null
    rm -rf -- "$staged" "$old" 2>/dev/null
}

# install_product ARCH FILES, after read_description and inside with_lock: FILES becomes the
# described product's folder. A running agent keeps the files it has open and uses the new ones from
# its next start. On failure the home is unchanged.
install_product() {
    arch_dir=$home/agtqvs6/$1
    folder=$described_code
    target=$arch_dir/$folder staged=$arch_dir/.$folder.new old=$arch_dir/.$folder.old
    complete=$staged swapped=no
    # The shared component lives in the platform's own bin folder.
    [ "$folder" != ax ] || target=$arch_dir/bin complete=$staged/bin
    mkdir -p -- "$arch_dir" 2>/dev/null && [ -w "$arch_dir" ] && [ -w "$home/registry" ] || {
        say "cannot write to $arch_dir or $home/registry"
        return "$EXIT_WRITE"
    }
    clear_leftovers
    trap 'undo_install; exit "$EXIT_WRITE"' HUP INT TERM
    if mkdir -- "$staged" && cp -R -- "$2/." "$staged/" && set_modes "$staged" && swap_in &&
        write_entry "$1" "$home/registry/$described_code$1.ver"; then
        trap - HUP INT TERM
        rm -rf -- "$old" "$staged"
        return 0
    fi
    undo_install
    trap - HUP INT TERM
    say "could not write the files of $described_code below $arch_dir"
    return "$EXIT_WRITE"
}

swap_in() {
    if [ -e "$target" ]; then mv -- "$target" "$old" || return 1; fi
    mv -- "$complete" "$target" && swapped=yes
}

undo_install() {
    [ "$swapped" = no ] || rm -rf -- "$target"
    swapped=no
    clear_leftovers
}
