#!/bin/sh
# The unit files: the service manager understands them, they say what they must, and the host
# understands the configuration that goes with them.
#
#   units_test.sh UNITS ZAVHOST      exits with 77 where there is no systemd-analyze
set -eu
units=$1 zavhost=$2
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT

fail() {
    echo "FAIL: $*" >&2
    exit 1
}

# The value of a setting in a file, the last one of several.
setting() {
    sed -n "s/^$2 *= *//p" "$1" | tail -n 1
}

expect() {
    found=$(setting "$1" "$2")
    [ "$found" = "$3" ] || fail "$1: $2 is \"$found\", not \"$3\""
}

expect "$units/zavhost.service" Type notify
expect "$units/zavhost.service" KillMode process
expect "$units/zavhost.service" Restart on-failure
[ -n "$(setting "$units/zavhost.service" WatchdogSec)" ] || fail "no watchdog"
expect "$units/zavmgmt-agents.service" Type oneshot
expect "$units/zavmgmt-agents.service" RemainAfterExit yes
expect "$units/zavmgmt-agents.service" KillMode process
home=$(sed -n 's/^home = "\(.*\)"/\1/p' "$units/zavhost.conf")
expect "$units/zavmgmt-agents.service" ExecStart "$home/bin/instances start"

# The grace lets a command run to its time-out and 30 s longer, and the manager waits longer still.
time_out=$(setting "$units/zavhost.conf" task-timeout)
grace=$(setting "$units/zavhost.conf" grace)
stop=$(setting "$units/zavhost.service" TimeoutStopSec)
[ "$grace" -eq $((time_out + 30)) ] || fail "the grace is $grace, the time-out $time_out"
[ "$stop" -gt "$grace" ] || fail "TimeoutStopSec is $stop, the grace $grace"

# The sockets of the unit are those that the host looks for.
sed -n 's/^ListenStream=//p' "$units/zavhost.socket" | sort >"$scratch/listens"
sed -n 's/^\(rpc-\)\{0,1\}socket = "\(.*\)"/\2/p' "$units/zavhost.conf" | sort >"$scratch/expects"
cmp "$scratch/listens" "$scratch/expects" || fail "the sockets differ"

# The host takes the configuration, but for the home and the group, which need not be there.
mkdir "$scratch/home"
sed -e "s|^home = .*|home = \"$scratch/home\"|" -e "s|^group = .*|group = \"$(id -gn)\"|" \
    "$units/zavhost.conf" >"$scratch/zavhost.conf"
chmod 0644 "$scratch/zavhost.conf"
"$zavhost" --config "$scratch/zavhost.conf" --print-config >"$scratch/listing"
grep -q "^grace = $grace  # $scratch/zavhost.conf:" "$scratch/listing" || fail "the grace is not taken"

command -v systemd-analyze >/dev/null || exit 77
# It looks for the program, too: the one that is built stands in for the one that is installed.
sed "s|^ExecStart=[^ ]*|ExecStart=$zavhost|" "$units/zavhost.service" >"$scratch/zavhost.service"
cp "$units/zavhost.socket" "$scratch/zavhost.socket"
sed "s|^ExecStart=[^ ]*|ExecStart=/bin/true|" "$units/zavmgmt-agents.service" \
    >"$scratch/zavmgmt-agents.service"
said=$(systemd-analyze verify --man=no "$scratch/zavhost.service" "$scratch/zavhost.socket" \
    "$scratch/zavmgmt-agents.service" 2>&1) ||
    fail "systemd-analyze: $said"
case $said in
*"$scratch"* | *zavhost*) fail "systemd-analyze: $said" ;;
esac

# The fleet's programs run as users of their own, to which hardly anything is open. They are not built
# for every width, so any program stands in for them.
for program in zavlink zavfleetd; do
    expect "$units/$program.service" User "$program"
    expect "$units/$program.service" StateDirectory "$program"
    expect "$units/$program.service" Restart on-failure
    sed "s|^ExecStart=[^ ]*|ExecStart=/bin/true|" "$units/$program.service" >"$scratch/$program.service"
    said=$(systemd-analyze verify --man=no "$scratch/$program.service" 2>&1) || fail "systemd-analyze: $said"
    case $said in
    *"$scratch"*) fail "systemd-analyze: $said" ;;
    esac
    systemd-analyze security --offline=true --no-pager --threshold=20 "$scratch/$program.service" \
        >"$scratch/security" 2>/dev/null || fail "$(tail -n 1 "$scratch/security")"
done
# The link may ask the host for anything that the members of the host's group may.
expect "$units/zavlink.service" SupplementaryGroups \
    "$(sed -n 's/^group = "\(.*\)"/\1/p' "$units/zavhost.conf")"

# What brings the metrics to the node exporter runs as that one's user, and the host lets it read only.
metrics=$units/../../contrib/prometheus
sed "s|^ExecStart=.*|ExecStart=/bin/true|" "$metrics/zavhost-metrics.service" >"$scratch/zavhost-metrics.service"
cp "$metrics/zavhost-metrics.timer" "$scratch"
said=$(systemd-analyze verify --man=no "$scratch/zavhost-metrics.service" "$scratch/zavhost-metrics.timer" 2>&1) ||
    fail "systemd-analyze: $said"
case $said in
*"$scratch"*) fail "systemd-analyze: $said" ;;
esac
grep -qF "$(sed -n 's/^socket = "\(.*\)"/\1/p' "$units/zavhost.conf")}" "$metrics/zavhost-metrics" ||
    fail "zavhost-metrics looks for another socket than the service's"

# How much of the system is open to the service is what the page says, by the count of this version.
case $(systemd-analyze --version) in
"systemd 252"*)
    exposure=$(systemd-analyze security --offline=true --no-pager "$scratch/zavhost.service" 2>/dev/null |
        sed -n 's/.*exposure level for [^ ]* \([0-9.]*\) .*/\1/p')
    grep -qF "the exposure is $exposure of 10" "$units/../../docs/service.md" ||
        fail "docs/service.md does not say that the exposure is $exposure"
    ;;
esac
