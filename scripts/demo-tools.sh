# What the demonstrations share. To be sourced.
# shellcheck shell=sh

say() { printf '\n\033[1m== %s\033[0m\n' "$*"; }
run() { printf '$ %s\n' "$*"; "$@"; }

# A port that nothing listens on, from $1 on.
free_port() {
    port=$1
    while grep -qi ":$(printf '%04X' "$port") 0*:0000 0A" /proc/net/tcp /proc/net/tcp6; do
        port=$((port + 1))
    done
    echo "$port"
}
