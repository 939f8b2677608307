#!/bin/sh
# Installs the product of the bundle that contains this script.
set -u
program=install.sh
CDPATH='' bundle=$(cd -- "$(dirname -- "$0")" && pwd) || exit 28

usage() {
    cat >&2 <<'TEXT'
usage: install.sh -h HOME [-a PLATFORM]
  -h HOME       the home to install into
  -a PLATFORM   the platform code (default: that of this machine)
All or nothing: on failure the home is as before. A running agent goes on; the new files serve from
its next start.
exit status: 0 done, 1 wrong usage, 2 no usable home, 8 the home cannot be written or is busy,
  28 the bundle is not complete, 29 the bundle is for another platform
TEXT
    exit 1
}

chosen_home='' arch=''
while [ $# -gt 0 ]; do
    case $1 in
    -h | -a)
        [ $# -ge 2 ] || usage
        case $1 in -h) chosen_home=$2 ;; *) arch=$2 ;; esac
        shift
        ;;
    '') ;;
    *) usage ;;
    esac
    shift
done
[ -n "$chosen_home" ] || usage
[ -r "$chosen_home/lib/install.sh" ] || {
    echo "$program: $chosen_home is not a home: it lacks lib/install.sh" >&2
    exit 2
}
# shellcheck source=home/lib/common.sh
. "$chosen_home/lib/common.sh"
# A home older than this bundle has no such file and needs none.
# shellcheck source=home/lib/users.sh
[ ! -r "$chosen_home/lib/users.sh" ] || . "$chosen_home/lib/users.sh"
# shellcheck source=home/lib/process.sh
. "$chosen_home/lib/process.sh"
# shellcheck source=home/lib/install.sh
. "$chosen_home/lib/install.sh"
use_home "$chosen_home"
has() { command -v "$1" >/dev/null; }
! has use_state || use_state

# Whatever is no file or folder, a FIFO say, could not be read.
odd=$(find "$bundle" ! -type f ! -type d -print -quit)
[ -z "$odd" ] || fail "$EXIT_DAMAGED" "$odd is no file"
read_description "$bundle/product.dsc" ||
    fail "$EXIT_DAMAGED" "$bundle/product.dsc is missing or not complete"
# A missing or incomplete file must be noticed here, not by the running agent. A manifest that was cut
# lacks its last line.
! has sealed || sealed "$bundle/manifest" ||
    fail "$EXIT_DAMAGED" "$bundle/manifest is missing or damaged"
(cd -- "$bundle" && sha256sum --quiet --strict -c manifest) >&2 ||
    fail "$EXIT_DAMAGED" "the files in $bundle are not those of its manifest"

machine_arch=$(host_arch)
[ -n "$arch" ] || arch=$machine_arch
case $described_platform in
any | "$arch") ;;
*) fail "$EXIT_PLATFORM" "the bundle is for $described_platform, not for ${arch:-this machine}" ;;
esac
valid_arch "$arch" || fail "$EXIT_PLATFORM" "the platform of this machine is unknown"
with_lock "$described_code" install_product "$arch" "$bundle/files" || exit
echo "$described_code $described_version installed for $arch"
