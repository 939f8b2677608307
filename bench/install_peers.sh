#!/bin/sh
# Installs what the benchmarks compare with, and what draws their pictures, as far as it is missing
# and the distribution has it.
#
#   bench/install_peers.sh
#
# No service is started or left to be started by this: the benchmarks start what they need.
set -eu
cd "$(dirname "$0")/.."

tools='gnuplot-nox python3'
peers='libicu-dev curl rsync openssh-client openssh-server nagios-nrpe-server nagios-nrpe-plugin zabbix-agent at task-spooler'

as_root() { if [ "$(id -u)" -eq 0 ]; then "$@"; else sudo "$@"; fi; }

is_installed() {
    dpkg-query -W -f '${db:Status-Status}' "$1" 2>/dev/null | grep -qx installed
}

# Packages that bring a service start it unless this program, which belongs to the administrator,
# says no.
policy=/usr/sbin/policy-rc.d
made_policy=
forbid_starting() {
    [ ! -e "$policy" ] || return 0
    made_policy=yes
    trap allow_starting EXIT
    printf '#!/bin/sh\nexit 101\n' | as_root tee "$policy" >/dev/null
    as_root chmod 755 "$policy"
}
allow_starting() { [ -z "$made_policy" ] || as_root rm -f "$policy"; }

install() {
    DEBIAN_FRONTEND=noninteractive as_root \
        apt-get install -y -qq --no-install-recommends -o DPkg::Lock::Timeout=300 "$1" \
        >/dev/null 2>&1
}

has_zabbix_get() { command -v zabbix_get >/dev/null || [ -x build/peers/usr/bin/zabbix_get ]; }

# Its package is that of a whole proxy, which need not be installed for one small client.
unpack_zabbix_get() {
    folder=$(mktemp -d)
    chmod 755 "$folder"
    (cd "$folder" && apt-get download -qq zabbix-proxy-sqlite3) >/dev/null 2>&1 &&
        mkdir -p build/peers && dpkg -x "$folder"/*.deb build/peers ||
        echo "install_peers: zabbix_get cannot be had" >&2
    rm -rf "$folder"
}

missing=''
for package in $tools $peers; do
    is_installed "$package" || missing="$missing $package"
done
if [ -z "$missing" ] && has_zabbix_get; then exit 0; fi

echo "install_peers: installing$missing zabbix_get"
forbid_starting
as_root apt-get update -qq 2>/dev/null || true
has_zabbix_get || unpack_zabbix_get
for package in $missing; do
    if ! install "$package"; then
        echo "install_peers: $package cannot be had" >&2
        continue
    fi
    case $package in
    openssh-server) service=ssh ;;
    at) service=atd ;;
    nagios-nrpe-server | zabbix-agent) service=$package ;;
    *) continue ;;
    esac
    as_root systemctl disable --quiet "$service" 2>/dev/null || true
done
