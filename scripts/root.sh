# shellcheck shell=sh
# Root file systems of Debian that are thrown away again. Read by programs that run as root; they say what
# `program` is called in messages.
#
# The packages come from where this machine's own apt gets them. All mounts and processes live in name
# spaces of their own, so they are gone when the command ends, however it ends.
# shellcheck disable=SC2154

need_root() {
    [ "$(id -u)" -eq 0 ] || {
        echo "$program: this needs root, to mount and to change the root directory" >&2
        exit 1
    }
}

# need_packages NAME...: installs what this machine lacks of them.
need_packages() {
    missing=''
    for package in "$@"; do
        dpkg-query -W -f '${db:Status-Status}' "$package" 2>/dev/null | grep -qx installed ||
            missing="$missing $package"
    done
    [ -n "$missing" ] || return 0
    echo "$program: installing$missing"
    # shellcheck disable=SC2086
    if [ "$(id -u)" -eq 0 ]; then set -- env; else set -- sudo; fi
    "$@" apt-get update -qq 2>/dev/null || true
    # shellcheck disable=SC2086
    DEBIAN_FRONTEND=noninteractive "$@" apt-get install -y -qq --no-install-recommends \
        -o DPkg::Lock::Timeout=300 $missing >/dev/null
}

# make_root ROOT ARCHITECTURE MMDEBSTRAP_OPTION...: fills the directory ROOT, which is empty.
make_root() {
    made_root=$1 made_architecture=$2
    shift 2
    # This machine's options for fetching, such as proxies, and its sources.
    apt-config dump | grep -E '^Acquire::(https?|Retries|Check-Valid-Until|Check-Date|ForceIPv)' \
        >"$made_root.apt.conf" || true
    # shellcheck source=/dev/null
    made_release=$(. /etc/os-release && echo "$VERSION_CODENAME")
    set -- --quiet --variant=minbase --architectures="$made_architecture" \
        --aptopt="$made_root.apt.conf" "$@" "$made_release" "$made_root"
    # Other people's packages are not wanted there, and their keys would be missing.
    made_lists=$(grep -lE "^(Suites:|deb .*)[[:space:]]+$made_release(-|[[:space:]]|\$)" /etc/apt/sources.list \
        /etc/apt/sources.list.d/*.list /etc/apt/sources.list.d/*.sources 2>/dev/null || true)
    made_status=0
    # shellcheck disable=SC2086
    unshare --mount --pid --fork --kill-child --mount-proc mmdebstrap "$@" $made_lists || {
        # A mirror that is being updated makes one list fail, mostly that of the latest corrections.
        echo "$program: once more, with the release as it came out" >&2
        find "$made_root" -mindepth 1 -delete
        made_mirror=$(grep -hE '^(URIs:|deb)[[:space:]]' $made_lists | grep -oE 'https?://[^[:space:]]+' | head -n 1)
        unshare --mount --pid --fork --kill-child --mount-proc mmdebstrap "$@" \
            "deb $made_mirror $made_release main" || made_status=$?
    }
    rm -f "$made_root.apt.conf"
    return "$made_status"
}

# inside ROOT DIRECTORY COMMAND...: runs it there, in that directory of the root. The environment is empty
# but for what a login would set, and the date of what is built.
inside() {
    # shellcheck disable=SC2016
    unshare --mount --pid --fork --kill-child -- sh -euc '
        root=$1
        shift
        mount -t proc proc "$root/proc"
        mount --rbind /dev "$root/dev"
        mount -t tmpfs tmpfs "$root/run"
        exec chroot "$root" /usr/bin/env -i HOME=/root LANG=C.UTF-8 \
            PATH=/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin \
            /bin/sh -euc '\''cd "$1"; shift; exec "$@"'\'' sh "$@"' sh "$@"
}

# make_scratch KEEP: makes a folder below $TMPDIR or /var/tmp, whose path `scratch` then holds. It is removed
# when the program ends, unless KEEP is any text.
make_scratch() {
    scratch_stays=$1
    scratch=$(mktemp -d -p "${TMPDIR:-/var/tmp}" "$program.XXXXXX")
    trap drop_scratch EXIT
    trap 'exit 130' HUP INT TERM
}

drop_scratch() {
    drop_status=$?
    trap - EXIT
    if [ -n "$scratch_stays" ]; then
        echo "$program: $scratch is left behind"
    else
        rm -rf --one-file-system "$scratch"
    fi
    exit "$drop_status"
}
