home=/var/lib/zavmgmt

# is_agent PROCESS: whether it is an agent of the home: the leader of a session, with the environment that
# the home's program gives an agent, and in the same root directory.
is_agent() {
    [ "/proc/$1/root" -ef / ] && IFS= read -r stat_line <"/proc/$1/stat" || return 1
    # The second field is the program's name, which may hold blanks and parentheses.
    # shellcheck disable=SC2086
    set -- "$1" ${stat_line##*) }
    [ "$5" = "$1" ] || return 1
    environment=$(tr '\n\0' ' \n' <"/proc/$1/environ") || return 1
    printf '%s\n' "$environment" | grep -qxF "TOVRINHOME=$home" &&
        printf '%s\n' "$environment" | grep -q '^AGENT_PRODUCT=.'
}

# of_environment NAME: a variable of the process that is_agent looked at last.
of_environment() {
    printf '%s\n' "$environment" | sed -n "s/^$1=//p"
}

# for_each_agent COMMAND: calls it with product, instance and process of each agent that runs.
for_each_agent() {
    for process in /proc/[0-9]*; do
        process=${process#/proc/}
        if is_agent "$process" 2>/dev/null; then
            "$1" "$(of_environment AGENT_PRODUCT)" "$(of_environment AGENT_INSTANCE)" "$process"
        fi
    done
}

name_agent() {
    echo "  $1${2:+, instance $2}, process $3"
}
