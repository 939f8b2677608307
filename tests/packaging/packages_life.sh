#!/bin/sh
# The life of the packages on a machine, as the first process of a root file system that has their
# dependencies, man-db and bash-completion, and nothing else: installed, used, upgraded while tasks wait, not downgraded below the
# journal, removed, installed again and purged.
#
#   packages_life.sh FOLDER      FOLDER holds new, before (a lower version), older (a lower version that does
#                                not know the journal's tables), foreign (the libraries of the other width),
#                                and systemctl, which stands in for systemd
set -eu
packages=$1
agent=ux
home=/var/lib/zavmgmt
ours='libzavmgmt1 libzavplatform1 zavmgmt-dev zavhost zavctl zavctl-fleet zavlink zavfleetd zavmgmt-doc'
# Where the packages were built without npm, there is none of the console.
[ -z "$(find "$packages/new" -name 'zavctl-console_*.deb')" ] || ours="$ours zavctl-console"
foreign='libzavmgmt1:i386 libzavplatform1:i386 zavmgmt-dev:i386'

say() { echo "-- $*"; }
fail() {
    echo "FAIL: $*" >&2
    [ ! -e /run/zavhost.log ] || tail -n 20 /run/zavhost.log >&2
    exit 1
}

# expect WHAT ACTUAL EXPECTED
expect() {
    [ "$2" = "$3" ] || fail "$1: \"$2\", not \"$3\""
}
# holds FILE TEXT
holds() {
    grep -qF -- "$2" "$1" || {
        cat "$1" >&2
        fail "$1 does not say: $2"
    }
}
# until_holds FILE TEXT: waits for the event that writes it, for a minute at most.
until_holds() {
    tries=600
    until grep -qF -- "$2" "$1" 2>/dev/null; do
        tries=$((tries - 1))
        [ "$tries" -gt 0 ] || holds "$1" "$2"
        sleep 0.1
    done
}

apt() {
    DEBIAN_FRONTEND=noninteractive apt-get -y -qq --allow-downgrades \
        -o Dpkg::Use-Pty=0 -o APT::Sandbox::User=root "$@"
}
# put_in FOLDER: installs the packages there.
put_in() {
    apt install "$packages/$1"/*.deb >/tmp/apt.log 2>&1 || {
        cat /tmp/apt.log >&2
        fail "the packages in $1 could not be installed"
    }
}
versions() {
    dpkg-query -W -f '${db:Status-Status} ${Package} ${Version}\n' \
        libzavmgmt1 libzavplatform1 zavhost zavmgmt-dev
}
# What a purge has to leave as it was. The rest is the package manager's, or the former list of users.
everything() {
    find / -xdev \( -path /proc -o -path /dev -o -path /sys -o -path /run -o -path /tmp -o -path "$packages" \
        -o -path /var/lib/dpkg -o -path /var/lib/apt -o -path /var/log -o -path /var/cache \
        -o -path /etc/ld.so.cache -o -path '/etc/*-' -o -path /etc/.pwd.lock \) -prune -o -print | sort
    sort /etc/group
}

agent_process() {
    cut -d ' ' -f 1 "$home/run/$agent.pid"
}
agent_lives() {
    grep -q '^State:[[:blank:]]*[^Z[:blank:]]' "/proc/$1/status" 2>/dev/null
}

# ---- Installed -----------------------------------------------------------------------------------

install -m 0755 "$packages/systemctl" /usr/bin/systemctl
mkdir -p /run/systemd/system /etc/systemd/system
everything >/tmp/before

say "installs"
put_in before
holds /run/systemctl.log "start zavhost.service"
expect "rights of the state" "$(stat -c '%a %U' /var/lib/zavhost)" "700 root"
for program in zavlink zavfleetd; do
    expect "rights of $program" "$(stat -c '%a %U %G' "/var/lib/$program")" "700 $program $program"
done
[ -x "$home/bin/TovrinAgent" ] || fail "there is no home"
holds /etc/group "zavmgmt:"
holds /etc/zavmgmt/zavhost.conf 'home = "/var/lib/zavmgmt"'
zavctl doctor >/tmp/doctor || {
    cat /tmp/doctor >&2
    fail "doctor has found an error"
}
! grep -iw warning /tmp/doctor || fail "doctor warns"

# as GROUP: who somebody of that group alone is to the host.
as() {
    setpriv --reuid=nobody --regid=nogroup --groups="$1" zavctl --json whoami 2>&1 || true
}
as zavmgmt >/tmp/member
holds /tmp/member '"act"'
as nogroup >/tmp/stranger
! grep -qF '"access"' /tmp/stranger || fail "the host serves everybody"

say "shows its manual pages"
# page SECTION NAME: as somebody reads it, without the marks for bold letters.
page() {
    man -P cat "$1" "$2" 2>/tmp/man.err | sed 's/.\x08//g' >/tmp/page || true
    [ -s /tmp/page ] || fail "there is no manual page $2($1): $(cat /tmp/man.err)"
}
page 1 zavctl
holds /tmp/page "SYNOPSIS"
page 1 zavctl-install
page 8 zavhost
holds /tmp/page "zavhost.conf"
page 5 zavhost.conf
page 7 zavmgmt

say "completes command lines"
# typed KEYS: what a terminal shows in which they are typed into a shell that has read what bash reads.
typed() {
    printf '%s\nexit\n' "$1" | TERM=dumb HISTFILE='' script -qec "bash --noprofile --rcfile /usr/share/bash-completion/bash_completion -i" \
        /dev/null >/tmp/typed
}
tab=$(printf '\t')
# Where the host does not answer within two seconds, nothing is offered.
tries=10
until typed "zavctl agen$tab--pro${tab}u${tab}x" && grep -qF "zavctl agents --product u" /tmp/typed &&
    grep -qF "Monitoring agent" /tmp/typed; do
    tries=$((tries - 1))
    [ $tries -gt 0 ] || break
done
holds /tmp/typed "zavctl agents --product u"
holds /tmp/typed "Monitoring agent"

say "deploys an agent"
zavctl uninstall "$agent" >/dev/null
version=$(/usr/share/zavmgmt/home/bundles/make-bundle "$agent" /tmp/bundle)
zavctl push /tmp/bundle "$agent/$version" >/dev/null
zavctl install "$agent" "$version" -- /bin/sh '|DEPLOYDIR|/install.sh' -h '|TOVRINHOME|' >/dev/null
printf 'INSTANCE=\nINTERVAL=1\n' | zavctl config set "$agent" - >/dev/null
zavctl config get "$agent" >/tmp/config
holds /tmp/config "INTERVAL=1"
zavctl start "$agent" >/dev/null
process=$(agent_process)
agent_lives "$process" || fail "the agent does not run"

# ---- Upgraded ------------------------------------------------------------------------------------

say "upgrades while one task runs and two wait"
# Each says that it has run. The first one ends when it is told to.
cat >/tmp/install.sh <<'TEXT'
#!/bin/sh
echo "$1" >>/tmp/ran
while [ "$1" = w1 ] && [ ! -e /tmp/go ]; do sleep 0.1; done
TEXT
for number in 1 2 3; do
    zavctl push /tmp/install.sh "w$number/1.0/install.sh" >/dev/null
    zavctl install "w$number" 1.0 --no-wait --transid "wave-$number" -- \
        /bin/sh '|DEPLOYDIR|/install.sh' "w$number" >/dev/null
done
until_holds /tmp/ran w1
host=$(cat /run/zavhost.pid)
# As if the home were older than this program, and its owner had changed another one.
rm "$home/bin/instances"
echo "# changed" >>"$home/bin/cinfo"
cp "$home/bin/cinfo" /tmp/cinfo
put_in new &
upgrade=$!
until_holds /run/systemctl.log "restart zavhost.service"
: >/tmp/go
wait "$upgrade" || exit 1
! grep -q "restart.*zavhost.socket" /run/systemctl.log || fail "the upgrade closed the sockets"
[ "$(cat /run/zavhost.pid)" != "$host" ] || fail "the upgrade did not start the new host"
for number in 1 2 3; do
    zavctl task wait "wave-$number" >/dev/null || fail "the upgrade spoiled the task wave-$number"
done
expect "what ran" "$(paste -sd ' ' /tmp/ran)" "w1 w2 w3"
expect "the agent's process" "$(agent_process)" "$process"
agent_lives "$process" || fail "the upgrade ended the agent"
cmp "$home/bin/cinfo" /tmp/cinfo || fail "the upgrade changed a program of the home"
"$home/bin/instances" list >/tmp/instances || fail "the upgrade did not complete the home"
holds /tmp/instances "$(printf 'root\trunning\t%s' "$process")"
zavctl --json tasks >/tmp/tasks.upgraded

# ---- Not downgraded ------------------------------------------------------------------------------

say "refuses to go below the journal"
versions >/tmp/versions
! dpkg -i "$packages/older"/*.deb >/tmp/dpkg.log 2>&1 || fail "an older host took the place of a newer one"
for package in zavhost libzavmgmt1 libzavplatform1 zavmgmt-dev; do
    holds /tmp/dpkg.log "$package: not installed. The journal /var/lib/zavhost/journal.db has version"
done
versions | diff /tmp/versions - || fail "the refusal left something else"
expect "what dpkg finds wrong" "$(dpkg --audit)" ""
zavctl status >/dev/null || fail "the host does not serve after the refusal"
zavctl --json tasks | cmp - /tmp/tasks.upgraded || fail "the refusal changed the tasks"

say "carries the libraries of both widths"
dpkg -i "$packages/foreign"/*.deb >/tmp/dpkg.log 2>&1 || {
    cat /tmp/dpkg.log >&2
    fail "the libraries of the other width could not be installed"
}
for program in /usr/lib/*/zavmgmt/zavplatform-conformance; do
    "$program" >/tmp/conformance 2>&1 || {
        tail -n 20 /tmp/conformance >&2
        fail "$program has found faults"
    }
done

# ---- Removed -------------------------------------------------------------------------------------

say "removes, and leaves agents and data"
apt remove zavhost >/tmp/apt.log 2>&1 || {
    cat /tmp/apt.log >&2
    fail "cannot be removed"
}
holds /tmp/apt.log "$agent, process $process"
expect "the host's process" "$(pidof zavhost || true)" ""
agent_lives "$process" || fail "the removal ended the agent"
[ -e "$home/config/$agent.cfg" ] || fail "the removal took the configuration of the agent"
! zavctl status >/dev/null 2>&1 || fail "the host still serves"

say "is installed again, and has lost nothing"
put_in new
for number in 1 2 3; do
    zavctl task wait "wave-$number" >/dev/null || fail "the task wave-$number is lost"
done
zavctl config get "$agent" | cmp - /tmp/config || fail "the agent's configuration is lost"
zavctl restart "$agent" >/dev/null
process=$(agent_process)
zavctl stop "$agent" >/dev/null
zavctl uninstall "$agent" >/dev/null
zavctl start um >/dev/null
process=$(cut -d ' ' -f 1 "$home/run/um.pid")

say "keeps the keys of a fleet"
runuser -u zavfleetd -- zavfleetd keys init --fleet demo --root /tmp/root.key --name bus.example \
    --store-bytes 1000000 2>/tmp/keys.log
apt purge zavfleetd >/tmp/apt.log 2>&1 || {
    cat /tmp/apt.log >&2
    fail "zavfleetd cannot be purged"
}
holds /tmp/apt.log "the keys and the records of a fleet stay in /var/lib/zavfleetd"
[ -e /var/lib/zavfleetd/keys/centre.key ] || fail "the purge took the keys of a fleet"
rm -rf /var/lib/zavfleetd/keys
put_in new

say "purges everything"
# shellcheck disable=SC2086
apt purge $ours $foreign >/tmp/apt.log 2>&1 || {
    cat /tmp/apt.log >&2
    fail "cannot be purged"
}
! agent_lives "$process" || fail "the purge left an agent without its home"
everything | diff /tmp/before - || fail "the purge left something"
say "nothing left, nothing lost"
