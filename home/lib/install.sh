# shellcheck shell=sh
# Installing a product's files into a home, all or nothing. Read after common.sh, users.sh and process.sh.
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

# print_entry ARCH: prints the described product's inventory entry.
print_entry() {
    printf 'ProdCode=%s\nDescription=%s\nPlatform=%s\nVersion=%s\nRelease=%s\n' "$described_code" \
        "$described_text" "$1" "$described_version" "$described_release"
}

# set_modes DIR: transfers do not preserve modes. Files in a folder named bin become executable.
set_modes() (
    cd -- "$1" && find . -type d -exec chmod 755 {} + &&
        find . -type f ! -path '*/bin/*' -exec chmod 644 {} + &&
        find . -type f -path '*/bin/*' -exec chmod 755 {} +
)

# seal: copies standard input and adds a line with its checksum.
seal() {
    sealed_text=$(cat) && printf '%s\n' "$sealed_text" &&
        printf '# sha256 %s\n' "$(printf '%s\n' "$sealed_text" | sha256sum | cut -d ' ' -f 1)"
}

# sealed FILE: succeeds when the file ends with the checksum of all that stands before.
sealed() {
    [ -f "$1" ] && [ "$(tail -n 1 -- "$1")" = "$(sed '$d' <"$1" | seal | tail -n 1)" ]
}

# write_manifest DIR: adds the file .manifest, the checksums of all other files.
write_manifest() (
    cd -- "$1" && sums=$(find . -type f ! -path ./.manifest -exec sha256sum {} +) &&
        printf '%s\n' "$sums" | LC_ALL=C sort -k 2 | seal >.manifest && chmod 644 .manifest && sealed .manifest
)

# clear_leftovers: cleans up after an installation or removal that was killed. One that was killed
# between its two renames has left the product missing; this brings it back.
clear_leftovers() {
    [ -d "$target" ] || [ ! -d "$old" ] || mv -T -- "$old" "$target" 2>/dev/null
    rm -rf -- "$staged" "$old" "$arch_dir/.$folder.gone" "$arch_dir/.${target##*/}.gone" 2>/dev/null
}

# install_product ARCH FILES, after read_description and inside with_lock: FILES becomes the
# described product's folder. A running agent keeps the files it has open and uses the new ones from
# its next start. On failure the home is unchanged.
install_product() {
    arch_dir=$home/agtqvs6/$1
    folder=$described_code
    target=$arch_dir/$folder staged=$arch_dir/.$folder.new old=$arch_dir/.$folder.old
    complete=$staged swapped=no seeded=''
    # The shared component lives in the platform's own bin folder.
    [ "$folder" != ax ] || target=$arch_dir/bin complete=$staged/bin
    mkdir -p -- "$arch_dir" 2>/dev/null && [ -w "$arch_dir" ] && [ -w "$home/registry" ] || {
        say "cannot write to $arch_dir or $home/registry"
        return "$EXIT_WRITE"
    }
    clear_leftovers
    trap 'undo_install; exit "$EXIT_WRITE"' HUP INT TERM
    if stage "$2" && swap_in && plant_seeds "${2%/files}/seed" &&
        rewrite_file "$home/registry/$described_code$1.ver" print_entry "$1"; then
        trap - HUP INT TERM
        rm -rf -- "$old" "$staged"
        return 0
    fi
    undo_install
    trap - HUP INT TERM
    say "could not write the files of $described_code below $arch_dir"
    return "$EXIT_WRITE"
}

# stage FILES: copies them next to their final place, down to the disk.
stage() {
    mkdir -- "$staged" && cp -R -- "$1/." "$staged/" && set_modes "$staged" &&
        write_manifest "$complete" && find "$staged" -exec sync -- {} +
}

swap_in() {
    if [ -e "$target" ]; then mv -T -- "$target" "$old" || return 1; fi
    mv -T -- "$complete" "$target" && swapped=yes && sync -- "$arch_dir"
}

# plant_seeds DIR: what a product needs elsewhere in the home, a first configuration, say. What is there
# already stays.
plant_seeds() {
    [ -d "$1" ] || return 0
    for seed in $(cd -- "$1" && find . -type f); do
        seed=${seed#./}
        if [ ! -e "$home/$seed" ]; then
            seeded="$seeded $seed"
            rewrite_file "$home/$seed" expand "$1/$seed" || return
        fi
        case $seed in
        bin/*) [ -x "$home/$seed" ] || chmod 755 -- "$home/$seed" || return ;;
        esac
    done
}

# expand FILE: prints it with the home's path filled in.
expand() {
    HOME_PATH=$home awk '
        BEGIN { token = "|TOVRINHOME|" }
        {
            out = ""
            while ((at = index($0, token)) > 0) {
                out = out substr($0, 1, at - 1) ENVIRON["HOME_PATH"]
                $0 = substr($0, at + length(token))
            }
            print out $0
        }
    ' <"$1"
}

undo_install() {
    [ "$swapped" = no ] || rm -rf -- "$target"
    swapped=no
    for seed in $seeded; do rm -f -- "$home/$seed"; done
    seeded=''
    clear_leftovers
}
