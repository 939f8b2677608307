# shellcheck shell=sh disable=SC2154 # `out` is set by those that source it
#
# Functions for scripts that measure; to be sourced. `out` names the file that takes the figures, or
# is empty.

# now: nanoseconds since 1970.
now() { date +%s%N; }

# write_result KEY VALUE: appends a figure to the file that the variable `out` names, if any.
write_result() { [ -z "$out" ] || printf '%s\t%s\n' "$1" "$2" >>"$out"; }

# have_pages MIB: lets the kernel have that much free memory at hand, by way of a file in $scratch. A
# virtual machine may have given it back to the machine below, and the first to write to it again
# would pay for that.
have_pages() {
    head -c "$1M" /dev/zero >"$scratch/pages"
    rm "$scratch/pages"
}

# --- a quiet machine ----------------------------------------------------------------------------
# Figures taken while other programs run say little, not even as ratios: a program that consists of
# two processes suffers more than one that is alone. So a measurement begins once the processors have
# been idle for 95 % of half a second. If they never are, a script waits for two minutes in all; after
# that it measures anyway, and the page says how often.

quiet_starts=0
disturbed_starts=0
patience=${patience:-240} # waits of half a second that are left

# Prints the time of all processors since the system's start: idle, and in all. Time that the machine
# below gave to somebody else counts as not idle.
processor_times() {
    awk '/^cpu / { print $5 + $6, $2 + $3 + $4 + $5 + $6 + $7 + $8 + $9; exit }' /proc/stat
}

is_quiet() {
    times=$(processor_times)
    sleep 0.5
    echo "$times $(processor_times)" | awk '{ exit !(($3 - $1) >= 0.95 * ($4 - $2)) }'
}

await_quiet() {
    quiet_starts=$((quiet_starts + 1))
    until is_quiet; do
        if [ "$patience" -le 0 ]; then
            disturbed_starts=$((disturbed_starts + 1))
            return 0
        fi
        patience=$((patience - 1))
    done
}

# write_quiet NAME: how many measurements of the script NAME have begun, and how many of them on a
# machine that was not quiet.
write_quiet() {
    write_result "quiet/$1/starts" "$quiet_starts"
    write_result "quiet/$1/disturbed" "$disturbed_starts"
    [ "$disturbed_starts" -eq 0 ] ||
        echo "other programs ran when $disturbed_starts of $quiet_starts measurements began" >&2
}
