# shellcheck shell=sh
# Starting, finding and stopping the process of an agent's instance. Read after common.sh and users.sh.
#
# run/<product>[_<instance>].pid in the caller's folder (see users.sh) holds one line: process id, start
# time in clock ticks since boot, boot id, platform, and the process id and start time of the program
# that keeps its log. The start time and the boot id distinguish an agent from an unrelated process that
# got the same process id later. Each agent leads its own session, so its process id is also its process
# group id, and its environment says which instance it is.
# shellcheck disable=SC2154

# process_start_time PID: sets start_time and session; fails when the process does not exist or is a
# zombie.
process_start_time() {
    { IFS= read -r stat_line <"/proc/$1/stat"; } 2>/dev/null || return 1
    # The second field is the program's name, which may contain blanks and parentheses.
    # shellcheck disable=SC2086
    set -- ${stat_line##*) }
    case ${1-Z} in
    Z | X | x) return 1 ;;
    esac
    [ $# -ge 20 ] || return 1
    session=$4
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

# is_agent PRODUCT INSTANCE: whether the living process agent_pid is what launch_agent starts for this
# instance. A process may keep its environment to itself; then it is enough for an ordinary user that the
# process is his.
is_agent() {
    [ "$session" = "$agent_pid" ] || return 1
    agent_environment=$({ tr '\n\0' ' \n' <"/proc/$agent_pid/environ"; } 2>/dev/null) || {
        [ "$user_id" -ne 0 ] &&
            awk -v id="$user_id" '$1 == "Uid:" { exit $2 != id }' "/proc/$agent_pid/status" 2>/dev/null
        return
    }
    printf '%s\n' "$agent_environment" | grep -qxF "AGENT_PRODUCT=$1" &&
        printf '%s\n' "$agent_environment" | grep -qxF "AGENT_INSTANCE=$2"
}

# find_agent PRODUCT INSTANCE: sets key and pid_file, and agent_pid, agent_start, agent_arch, keeper_pid
# and keeper_start; succeeds when that agent runs.
find_agent() {
    instance_key "$1" "$2"
    read_pid_file "$state/run/$key.pid" && agent_lives || return
    tenths_while 10 has_no_environment
    is_agent "$1" "$2"
}

# has_no_environment: how the process agent_pid looks while another program takes the place of its own.
has_no_environment() {
    agent_environment=$({ tr '\0' '\n' <"/proc/$agent_pid/environ"; } 2>/dev/null) &&
        [ -z "$agent_environment" ]
}

# read_pid_file FILE: sets what find_agent sets; fails when it names no process since this boot.
read_pid_file() {
    pid_file=$1
    agent_pid='' agent_start='' agent_arch='' keeper_pid='' keeper_start=''
    plain "$pid_file" && [ -f "$pid_file" ] || return 1
    read -r agent_pid agent_start agent_boot agent_arch keeper_pid keeper_start <"$pid_file" || return 1
    case $agent_pid:$agent_start in
    :* | *: | *[!0-9:]* | 0:* | 1:*) return 1 ;;
    esac
    boot_id
    [ "$agent_boot" = "$this_boot" ]
}

# with_lock PRODUCT COMMAND...: runs the command while no other program of this home starts, stops,
# installs or removes that product; returns the command's status, or EXIT_WRITE without a lock. The
# lock file is the owner's. Other users can only open it, so it has to be there for them.
with_lock() {
    lock_file=$home/run/.$1.lock
    shift
    for lock_try in 1 2 3 4 5 6 7 8 9 10 11 12 13 14 15 16 17 18 19 20; do
        [ -e "$lock_file" ] || [ -L "$lock_file" ] || (umask 027 && : >>"$lock_file") 2>/dev/null
        if ! plain "$lock_file" || [ ! -r "$lock_file" ]; then
            say "cannot write to $home/run, or $lock_file is not a file that this user may read"
            return "$EXIT_WRITE"
        fi
        lock_replaced=no
        { locked "$@"; lock_status=$?; } 9<"$lock_file" || lock_replaced=yes
        [ "$lock_replaced" = yes ] || return "$lock_status"
        [ "$lock_try" -eq 20 ] || sleep 0.1
    done
    say "$lock_file was another file each time it had been opened"
    return "$EXIT_WRITE"
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

# open_pipe: opens a pipe, its ends being the descriptors 6 and 7. It is named only until then.
open_pipe() {
    pipe=$state/run/.$key.pipe
    rm -f -- "$pipe"
    mkfifo -m 600 -- "$pipe" 2>/dev/null || return 1
    # Opened for both, a FIFO does not wait for its other end.
    # shellcheck disable=SC2094
    exec 8<>"$pipe" 7>"$pipe" 6<"$pipe" 8>&-
    rm -f -- "$pipe"
}

# launch_agent: runs the agent in its own session and without this program's descriptors, because the
# caller of this program reads its output to the end. Its output goes through a program that keeps the
# log small. Sets agent_pid and keeper_pid.
launch_agent() {
    setsid sh "$home/lib/keep-log" "$log" "$log_kb" <&6 >/dev/null 2>&1 \
        3>&- 4>&- 5>&- 6>&- 7>&- 8>&- 9>&- &
    keeper_pid=$!
    (
        cd -- "$home" || exit 1
        export TOVRINHOME="$home" AGENT_PRODUCT="$1" AGENT_INSTANCE="$2" AGENT_ARCH="$product_arch" \
            AGENT_CONFIG="$config" AGENT_DEFAULTS="$product_dir/agent.cfg" AGENT_DATA="$data_dir"
        exec setsid "$product_dir/bin/agent"
    ) </dev/null >&7 2>&1 3>&- 4>&- 5>&- 6>&- 7>&- 8>&- 9>&- &
    agent_pid=$!
    exec 6<&- 7>&-
}

# start_instance PRODUCT INSTANCE, inside with_lock.
start_instance() {
    find_product "$1" || {
        say "product $1 is not installed"
        return "$EXIT_ABSENT"
    }
    refuse_running "$1" "$2" && prepare_start "$1" "$2" || return
    was_noted=no
    [ ! -f "$state/run/$key.pid" ] || was_noted=yes
    launch_agent "$1" "$2"
    if ! process_start_time "$agent_pid"; then
        report_death
        return "$EXIT_DIED"
    fi
    agent_start=$start_time
    if ! write_pid_file; then
        say "cannot write $state/run/$key.pid"
        kill -KILL "-$agent_pid" "$agent_pid" 2>/dev/null
        return "$EXIT_WRITE"
    fi
    # Whoever looks for the agent from now on finds what launch_agent started.
    tenths_while 100 not_yet_agent "$1" "$2"
    stay=$(config_number START_SECONDS 1 0 300 "$config" "$product_dir/agent.cfg")
    if tenths_while $((stay * 10)) agent_lives; then
        report_death
        forget_pid_file
        return "$EXIT_DIED"
    fi
    say "$key started, process $agent_pid"
}

# forget_pid_file: after a start that failed. Where there was a file before, the instance should run all
# the same, and the file, which names a process that is gone, says so.
forget_pid_file() {
    [ "$was_noted" = yes ] || rm -f -- "$state/run/$key.pid"
}

# refuse_running PRODUCT INSTANCE: fails when the instance runs, no matter who started it.
refuse_running() {
    if find_agent "$1" "$2"; then
        say "$key runs already, process $agent_pid"
        return "$EXIT_RUNNING"
    fi
    if [ "$is_owner" = no ] && read_pid_file "$home/run/$key.pid" && agent_lives; then
        say "$key runs already, process $agent_pid of the home's owner"
        return "$EXIT_RUNNING"
    fi
    for_other_users find "$1" "$2"
    if [ -n "$done_by" ]; then
        say "$key runs already, started by user $done_by"
        return "$EXIT_RUNNING"
    fi
}

# prepare_start PRODUCT INSTANCE: sets config, log, log_kb and data_dir, and opens the log's pipe.
prepare_start() {
    config_file "$1" "$2"
    make_state || return
    log=$state/logs/$key.log data_dir=$state/data/$key
    if ! (umask 077 && mkdir -p -- "$data_dir" && plain "$log" && : >>"$log") 2>/dev/null ||
        [ ! -w "$state/run" ] || ! open_pipe; then
        say "cannot write to $data_dir, $log or $state/run"
        return "$EXIT_WRITE"
    fi
    log_kb=$(config_number LOG_KB 10240 1 1048576 "$config" "$product_dir/agent.cfg")
}

write_pid_file() {
    boot_id
    process_start_time "$keeper_pid" && keeper_start=$start_time || keeper_start=0
    rewrite_file "$state/run/$key.pid" printf '%s %s %s %s %s %s\n' "$agent_pid" "$agent_start" \
        "$this_boot" "$product_arch" "$keeper_pid" "$keeper_start"
}

not_yet_agent() {
    agent_lives && ! is_agent "$1" "$2"
}

keeper_lives() {
    process_start_time "${keeper_pid:-0}" && [ "$start_time" = "$keeper_start" ]
}

report_death() {
    kill -KILL "-$agent_pid" 2>/dev/null
    wait "$agent_pid"
    say "$key ended right after its start with status $?; the end of $log:"
    tenths_while 20 keeper_lives
    tail -n 5 -- "$log" >&2
}

# stop_instance PRODUCT INSTANCE, inside with_lock: stops it, whoever started it.
stop_instance() {
    stop_own_instance "$1" "$2"
    stop_status=$?
    [ "$stop_status" -eq "$EXIT_NOT_RUNNING" ] || return "$stop_status"
    instance_key "$1" "$2"
    if [ "$is_owner" = no ] && read_pid_file "$home/run/$key.pid" && agent_lives; then
        say "$key, process $agent_pid, cannot be stopped by this user"
        return "$EXIT_NOT_STOPPED"
    fi
    for_other_users stop "$1" "$2" || return "$EXIT_NOT_STOPPED"
    if [ -z "$done_by" ]; then
        say "$key does not run"
        return "$EXIT_NOT_RUNNING"
    fi
    say "$key stopped, which user $done_by had started"
}

# stop_own_instance PRODUCT INSTANCE: stops what this user has started; sends SIGTERM, then SIGKILL.
stop_own_instance() {
    config_file "$1" "$2"
    if ! find_agent "$1" "$2"; then
        rm -f -- "$state/run/$key.pid" 2>/dev/null
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
    # Its last words; a child in a session of its own may hold the log longer.
    tenths_while 20 keeper_lives
    rm -f -- "$state/run/$key.pid"
    say "$key $how"
}

# stop_all PRODUCT ARCH, inside with_lock: stops the instances that run from that platform's folder.
stop_all() {
    stop_own_instances "$1" "$2" && for_other_users stop-all "$1" "$2" || return "$EXIT_NOT_STOPPED"
}

stop_own_instances() {
    for each_pid_file in "$state/run/$1.pid" "$state/run/$1"_*.pid; do
        split_key "${each_pid_file##*/}" || continue
        each_instance=$instance
        find_agent "$1" "$each_instance" && [ "$agent_arch" = "$2" ] || continue
        stop_own_instance "$1" "$each_instance"
        case $? in
        0 | "$EXIT_NOT_RUNNING") ;;
        *) return "$EXIT_NOT_STOPPED" ;;
        esac
    done
}

# own_states: prints a line for each instance that the caller has started and not stopped: product,
# instance, the caller's id, "running" or "missing", and the process id.
own_states() {
    for each_pid_file in "$state/run"/*.pid; do
        [ -f "$each_pid_file" ] && split_key "${each_pid_file##*/}" || continue
        if find_agent "$product" "$instance"; then
            printf '%s\t%s\t%s\trunning\t%s\n' "$product" "$instance" "$user_id" "$agent_pid"
        else
            printf '%s\t%s\t%s\tmissing\t\n' "$product" "$instance" "$user_id"
        fi
    done
}

# remove_instance_files PRODUCT INSTANCE: removes what the caller's instance has written.
remove_instance_files() {
    instance_key "$1" "$2"
    set -- "$state/data/$key" "$state/logs/$key.log" "$state/logs/$key.log.1" \
        "$state/logs/$key.log.2" "$state/logs/$key.log.3" "$state/run/$key.pid"
    [ -e "$1" ] || [ -e "$2" ] || return "$EXIT_NO_INSTANCE"
    rm -rf -- "$@" 2>/dev/null || return "$EXIT_WRITE"
}

# remove_product_files PRODUCT: the same for all instances of the product.
remove_product_files() {
    for kind in run/%.pid run/%_*.pid logs/%.log logs/%_*.log logs/%.log.[123] logs/%_*.log.[123] \
        data/% data/%_*; do
        remove_kind "$state" "$1" "$kind" || return "$EXIT_WRITE"
    done
}

# remove_kind FOLDER PRODUCT KIND: removes the files below FOLDER that KIND stands for, in which % is
# the product.
remove_kind() (
    cd -- "$1/${3%/*}" 2>/dev/null || exit 0
    pattern=${3##*/}
    # Only the stars of the kind are patterns; the folder's path is literal.
    # shellcheck disable=SC2086
    rm -rf -- ${pattern%%\%*}$2${pattern#*%}
)
