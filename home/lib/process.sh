# shellcheck shell=sh
# Starting, finding and stopping the process of an agent's instance. Read after common.sh.
#
# run/<product>[_<instance>].pid holds one line: process id, start time in clock ticks since boot,
# boot id, platform. The start time and the boot id distinguish an agent from an unrelated process that
# got the same process id later. Each agent leads its own session, so its process id is also its process
# group id.
# shellcheck disable=SC2154

# process_start_time PID: sets start_time; fails when the process does not exist or is a zombie.
process_start_time() {
    { IFS= read -r stat_line <"/proc/$1/stat"; } 2>/dev/null || return 1
    # The second field is the program's name, which may contain blanks and parentheses.
    # shellcheck disable=SC2086
    set -- ${stat_line##*) }
    case ${1-Z} in
    Z | X | x) return 1 ;;
    esac
    [ $# -ge 20 ] || return 1
    shift 19
    start_time=$1
}

boot_id() {
    IFS= read -r this_boot </proc/sys/kernel/random/boot_id
}

# agent_lives: succeeds while the process found by find_agent or launch_agent exists.
agent_lives() {
    process_start_time "$agent_pid" && [ "$start_time" = "$agent_start" ]
}

# find_agent PID_FILE: sets agent_pid, agent_start and agent_arch and succeeds when that agent runs.
find_agent() {
    pid_file=$1
    agent_pid='' agent_start='' agent_arch=''
    [ -f "$pid_file" ] || return 1
    read -r agent_pid agent_start agent_boot agent_arch <"$pid_file" || return 1
    case $agent_pid:$agent_start in
    :* | *: | *[!0-9:]*) return 1 ;;
    esac
    boot_id
    [ "$agent_boot" = "$this_boot" ] && agent_lives || return 1
    # Someone who may write to run/ must not be able to have root stop another user's process.
    pid_owner=$(stat -c %u -- "$pid_file") || return 1
    [ "$pid_owner" -eq 0 ] || [ "$pid_owner" = "$(stat -c %u "/proc/$agent_pid" 2>/dev/null)" ]
}

# with_lock PRODUCT COMMAND...: runs the command while no other program of this home starts, stops,
# installs or removes that product; returns the command's status, or EXIT_WRITE without a lock.
with_lock() {
    lock_file=$home/run/.$1.lock
    shift
    while :; do
        if ! { true >>"$lock_file"; } 2>/dev/null && [ ! -r "$lock_file" ]; then
            say "cannot write to $home/run"
            return "$EXIT_WRITE"
        fi
        lock_replaced=no
        { locked "$@"; lock_status=$?; } 9<"$lock_file" || return "$EXIT_WRITE"
        [ "$lock_replaced" = yes ] || return "$lock_status"
    done
}

# An uninstall removes the lock file while others may be waiting for it.
locked() {
    if ! flock -w 60 9; then
        say "another program is busy with this product"
        return "$EXIT_WRITE"
    fi
    if [ "$(stat -L -c %d:%i /proc/self/fd/9)" != \
        "$(stat -c %d:%i -- "$lock_file" 2>/dev/null)" ]; then
        lock_replaced=yes
        return 0
    fi
    "$@"
}

# tenths_while TENTHS COMMAND...: waits while the command succeeds, for at most so many tenths of a
# second; fails when it still succeeds after that.
tenths_while() {
    tenths=$1
    shift
    while "$@"; do
        [ "$tenths" -gt 0 ] || return 1
        tenths=$((tenths - 1))
        sleep 0.1
    done
}

# launch_agent: runs the agent in its own session and without this program's descriptors, because the
# caller of this program reads its output to the end. Sets agent_pid.
launch_agent() {
    (
        cd -- "$home" || exit 1
        export TOVRINHOME="$home" AGENT_PRODUCT="$1" AGENT_INSTANCE="$2" AGENT_ARCH="$product_arch" \
            AGENT_CONFIG="$config" AGENT_DEFAULTS="$product_dir/agent.cfg" AGENT_DATA="$data_dir"
        exec setsid "$product_dir/bin/agent"
    ) </dev/null >>"$log" 2>&1 3>&- 4>&- 5>&- 6>&- 7>&- 8>&- 9>&- &
    agent_pid=$!
}

# start_instance PRODUCT INSTANCE, inside with_lock.
start_instance() {
    find_product "$1" || {
        say "product $1 is not installed"
        return "$EXIT_ABSENT"
    }
    config_file "$1" "$2"
    log=$home/logs/$key.log data_dir=$home/data/$key
    if find_agent "$home/run/$key.pid"; then
        say "$key runs already, process $agent_pid"
        return "$EXIT_RUNNING"
    fi
    if ! mkdir -p -- "$data_dir" 2>/dev/null || ! keep_below "$log" 1024 2>/dev/null ||
        ! { true >>"$log"; } 2>/dev/null || [ ! -w "$home/run" ]; then
        say "cannot write to $data_dir, $log or $home/run"
        return "$EXIT_WRITE"
    fi
    boot_id
    launch_agent "$1" "$2"
    if ! process_start_time "$agent_pid"; then
        report_death
        return "$EXIT_DIED"
    fi
    agent_start=$start_time
    if ! printf '%s %s %s %s\n' "$agent_pid" "$agent_start" "$this_boot" "$product_arch" |
        replace_file "$home/run/$key.pid"; then
        say "cannot write $home/run/$key.pid"
        kill -KILL "-$agent_pid" "$agent_pid" 2>/dev/null
        return "$EXIT_WRITE"
    fi
    stay=$(config_number START_SECONDS 1 0 300 "$config" "$product_dir/agent.cfg")
    if tenths_while $((stay * 10)) agent_lives; then
        report_death
        rm -f -- "$home/run/$key.pid"
        return "$EXIT_DIED"
    fi
    say "$key started, process $agent_pid"
}

# The pid file goes before the agent's process id can be reused.
report_death() {
    kill -KILL "-$agent_pid" 2>/dev/null
    wait "$agent_pid"
    say "$key ended right after its start with status $?; the end of $log:"
    tail -n 5 -- "$log" >&2
}

# stop_instance PRODUCT INSTANCE, inside with_lock: sends SIGTERM, then SIGKILL.
stop_instance() {
    config_file "$1" "$2"
    if ! find_agent "$home/run/$key.pid"; then
        rm -f -- "$home/run/$key.pid"
        say "$key does not run"
        return "$EXIT_NOT_RUNNING"
    fi
    grace=$(config_number STOP_SECONDS 5 0 200 "$config" "$home/agtqvs6/$agent_arch/$1/agent.cfg")
    if ! kill -TERM "-$agent_pid" 2>/dev/null && ! kill -TERM "$agent_pid" 2>/dev/null &&
        agent_lives; then
        say "$key, process $agent_pid, cannot be stopped by this user"
        return "$EXIT_NOT_STOPPED"
    fi
    how=stopped
    if ! tenths_while $((grace * 10)) agent_lives; then
        how="killed after $grace s"
        kill -KILL "$agent_pid" "-$agent_pid" 2>/dev/null
        if ! tenths_while 50 agent_lives; then
            say "$key, process $agent_pid, does not end"
            return "$EXIT_NOT_STOPPED"
        fi
    fi
    # Children that outlived it were sent SIGTERM as well.
    kill -KILL "-$agent_pid" 2>/dev/null
    rm -f -- "$home/run/$key.pid"
    say "$key $how"
}

# stop_all PRODUCT ARCH, inside with_lock: stops the instances that run from that platform's folder.
stop_all() {
    for each_pid_file in "$home/run/$1.pid" "$home/run/$1"_*.pid; do
        find_agent "$each_pid_file" && [ "$agent_arch" = "$2" ] || continue
        each_instance=${each_pid_file##*/"$1"}
        each_instance=${each_instance%.pid}
        stop_instance "$1" "${each_instance#_}"
        case $? in
        0 | "$EXIT_NOT_RUNNING") ;;
        *) return "$EXIT_NOT_STOPPED" ;;
        esac
    done
}
