#!/bin/sh
# Installs what building and testing needs and this machine lacks, with the distribution's package
# manager. Safe to run again: it says nothing and changes nothing when all is there.
#
#   scripts/bootstrap.sh            installs
#   scripts/bootstrap.sh --list     prints the names of the packages, one a line, and installs nothing
#   scripts/bootstrap.sh --analyze  installs what scripts/analyze.sh needs as well
set -eu
cd "$(dirname "$0")/.."

packages='g++ g++-multilib cmake ninja-build ccache googletest libbenchmark-dev libexpat1-dev
libsqlite3-dev libssl-dev libnats-dev libsodium-dev libboost-dev nlohmann-json3-dev libcli11-dev libtomlplusplus-dev mksh curl pkgconf procps
shellcheck nats-server openssl clang libclang-rt-dev python3 python3-jsonschema mandoc'
# Programs that only judge the product from outside; their tests are skipped without them.
judges='python3-impacket tshark zsh fish tmux chromium prometheus'
# What makes the console's page. Where npm comes from elsewhere, it is left alone.
command -v npm >/dev/null || packages="$packages nodejs npm"

# shellcheck disable=SC2086
case $#/${1-} in
0/) ;;
1/--list)
    case $packages in *npm) ;; *) packages="$packages nodejs npm" ;; esac
    printf '%s\n' $packages $judges
    exit
    ;;
1/--analyze) packages="$packages clang-tidy cppcheck" ;;
*)
    sed -n '5,7s/^# \{0,1\}//p' "$0" >&2
    exit 2
    ;;
esac

as_root() {
    if [ "$(id -u)" -eq 0 ]; then "$@"; else sudo "$@"; fi
}

# A mirror that is being updated makes one list fail; the others still serve, and what is really
# missing shows when it is installed.
refresh_lists() {
    as_root apt-get update -qq 2>/dev/null ||
        echo "bootstrap: some package lists could not be refreshed; going on with what is there" >&2
}

is_installed() {
    dpkg-query -W -f '${db:Status-Status}' "$1" 2>/dev/null | grep -qx installed
}

missing_of() {
    for package in "$@"; do
        is_installed "$package" || echo "$package"
    done
}

install() {
    DEBIAN_FRONTEND=noninteractive as_root \
        apt-get install -y -qq --no-install-recommends "$@" >/dev/null
}

# shellcheck disable=SC2086
missing=$(missing_of $packages)
# shellcheck disable=SC2086
missing_judges=$(missing_of $judges)
if [ -n "$missing$missing_judges" ]; then
    # shellcheck disable=SC2086
    echo bootstrap: installing $missing $missing_judges
    refresh_lists
fi
# The tests start servers of their own. The packages would run them as services that listen to everybody,
# now and after each boot.
services='nats-server prometheus'
policy=/usr/sbin/policy-rc.d
held='' made_policy=''
has_service_manager() { [ -d /run/systemd/system ]; }
hold_services_back() {
    for service in $services; do
        case " $missing $missing_judges " in *[[:space:]]"$service"[[:space:]]*) held="$held $service.service" ;; esac
    done
    [ -n "$held" ] || return 0
    # shellcheck disable=SC2086
    if has_service_manager; then
        as_root systemctl mask --runtime --quiet $held
    elif [ ! -e "$policy" ]; then
        # What the scripts of packages ask before they start something.
        made_policy=yes
        printf '#!/bin/sh\nexit 101\n' | as_root tee "$policy" >/dev/null
        as_root chmod 0755 "$policy"
    fi
}
leave_services_off() {
    [ -z "$made_policy" ] || as_root rm -f "$policy"
    made_policy=''
    [ -n "$held" ] && has_service_manager || return 0
    # shellcheck disable=SC2086
    as_root systemctl unmask --runtime --quiet $held
    # What is masked cannot be disabled, and would start with the machine. One whose package could
    # not be installed is not known.
    # shellcheck disable=SC2086
    as_root systemctl --quiet disable $held 2>/dev/null || true
    held=''
}
trap leave_services_off EXIT
# Without this a shell that is interrupted skips the trap above.
trap 'exit 130' HUP INT TERM
hold_services_back
# shellcheck disable=SC2086
[ -z "$missing" ] || install $missing
# shellcheck disable=SC2086
[ -z "$missing_judges" ] || install $missing_judges ||
    echo "bootstrap: could not install" $missing_judges "- their tests will be skipped" >&2
leave_services_off
trap - EXIT HUP INT TERM

# The 32-bit libraries cannot be installed beside the 64-bit ones: they are unpacked below build/
# instead. `package` holds the static library `file`.
i386_root=build/third_party/i386
unpack_i386() {
    package=$1 file=$2
    [ ! -f "$i386_root/usr/lib/i386-linux-gnu/$file" ] || return 0
    echo "bootstrap: unpacking the 32-bit $package into $i386_root"
    if ! dpkg --print-foreign-architectures | grep -qx i386; then
        as_root dpkg --add-architecture i386
        refresh_lists
    elif ! apt-cache show "$package:i386" >/dev/null 2>&1; then
        refresh_lists
    fi
    mkdir -p "$i386_root"
    scratch=$(mktemp -d)
    trap 'rm -rf "$scratch"' EXIT
    (cd "$scratch" && apt-get -qq -o APT::Sandbox::User=root download "$package:i386")
    dpkg -x "$scratch/$package"_*_i386.deb "$i386_root"
    rm -rf "$scratch"
    trap - EXIT
}
unpack_i386 libexpat1-dev libexpat.a
unpack_i386 libssl-dev libcrypto.a
unpack_i386 libsqlite3-dev libsqlite3.a
