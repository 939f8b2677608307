# shellcheck shell=sh
# Whose files are whose. Read after common.sh; use_state comes after use_home.
#
# What the home's owner starts has its pid files, logs and data in run/, logs/ and data/, which only the
# owner may write. Any other user who runs agents has folders of the same names in users/<user id>/,
# which is that user's alone. So nobody believes or writes to what another user could have put there.
# Root looks after another user's instances with that user's rights (lib/own-instances).
# shellcheck disable=SC2034,SC2154

# use_state: sets user_id, is_owner and state, the folder of the caller's run/, logs/ and data/; exits
# when others may write where the owner's programs do.
use_state() {
    user_id=$(id -u)
    owner_id=$(stat -L -c %u -- "$home") || fail "$EXIT_HOME" "cannot look at $home"
    # Root runs the programs of the home's owner, so the two trust each other.
    if [ "$user_id" -eq 0 ] || [ "$user_id" = "$owner_id" ]; then
        is_owner=yes state=$home
        refuse_shared_folders
    else
        is_owner=no state=$home/users/$user_id
    fi
}

refuse_shared_folders() {
    shared=$(
        cd -- "$home" && find -H . bin lib registry agtqvs6 run logs data config universal -maxdepth 0 \
            \( -perm /022 -o ! -uid 0 ! -uid "$owner_id" \) -print -quit 2>/dev/null
    )
    [ -z "$shared" ] || fail "$EXIT_HOME" "other users may write to $home/$shared;" \
        "give it to the home's owner and run: chmod go-w $home/$shared"
}

# make_state: makes the caller's folders.
make_state() {
    if [ "$is_owner" = no ]; then
        [ -d "$home/users" ] || {
            say "only its owner may run agents in $home: it was made without --run-as-group"
            return "$EXIT_WRITE"
        }
        mkdir -m 700 -- "$state" 2>/dev/null
        # Somebody else may have been there first.
        [ -n "$(find "$state" -maxdepth 0 -type d -uid "$user_id" ! -perm /077 2>/dev/null)" ] || {
            say "$state is not a folder that belongs to user $user_id alone"
            return "$EXIT_WRITE"
        }
    fi
    (umask 077 && mkdir -p -- "$state/run" "$state/logs" "$state/data") 2>/dev/null || {
        say "cannot write to $state"
        return "$EXIT_WRITE"
    }
}

# other_users: prints the ids of the users who have folders of their own in the home.
other_users() {
    [ ! -d "$home/users" ] || find "$home/users" -mindepth 1 -maxdepth 1 -type d -printf '%f %U\n' |
        awk '$1 ~ /^[1-9][0-9]*$/ && $1 == $2 && NF == 2 { print $1 }'
}

# may_run PRODUCT INSTANCE: sets key; fails when nobody has a pid file for the instance.
may_run() {
    instance_key "$1" "$2"
    for may_run_file in "$state/run/$key.pid" "$home/run/$key.pid" "$home/users"/*/run/"$key.pid"; do
        [ ! -e "$may_run_file" ] && [ ! -L "$may_run_file" ] || return 0
    done
    return 1
}

# as_user ID VERB PRODUCT ARGUMENT: has lib/own-instances do this with that user's rights, in a session
# of its own. That user could stop it or keep its descriptors, so it has a time limit and none of the
# caller's descriptors.
as_user() {
    run_as_user "$@" >/dev/null
}

# list_as_user ID: prints what own-instances list says, in a file of limited size meanwhile: a pipe could
# be kept open, and filled.
list_as_user() {
    listed=$(mktemp) || return
    (ulimit -f 128 && run_as_user "$1" list '' '') >"$listed"
    cat -- "$listed"
    rm -f -- "$listed"
}

# run_as_user ID VERB PRODUCT ARGUMENT: the same with the caller's standard output.
run_as_user() {
    as_user_id=$1 as_user_limit=280
    shift
    case $1 in find | list) as_user_limit=10 ;; esac
    timeout --foreground -k 5 "$as_user_limit" setsid -w setpriv --reuid="$as_user_id" \
        --regid="$(stat -c %g -- "$home/users")" --clear-groups --inh-caps=-all --no-new-privs \
        env -i PATH=/usr/sbin:/usr/bin:/sbin:/bin sh "$home/lib/own-instances" "$home" "$@" \
        </dev/null 2>/dev/null 3>&- 4>&- 5>&- 6>&- 7>&- 8>&- 9>&-
}

# start_as_user ID PRODUCT INSTANCE: starts the instance as the management library does for that user, in
# a login of the user's own.
start_as_user() {
    start_name=$(id -un -- "$1" 2>/dev/null) || {
        say "user $1, who ran $2${3:+_$3}, is gone"
        return 1
    }
    case $home in
    *\'*)
        say "$home cannot be named to a shell, so $2${3:+_$3} is not started as user $start_name"
        return 1
        ;;
    esac
    timeout --foreground -k 5 280 setsid -w su - "$start_name" \
        -c "'$home/bin/TovrinAgent' -h '$home' -o '$3' start $2" \
        </dev/null >/dev/null 2>&1 3>&- 4>&- 5>&- 6>&- 7>&- 8>&- 9>&-
    start_status=$?
    case $start_status in
    0) say "$2${3:+_$3} started as user $start_name" ;;
    "$EXIT_RUNNING") ;;
    *) say "$2${3:+_$3} could not be started as user $start_name, status $start_status" ;;
    esac
    return "$start_status"
}

# for_other_users VERB PRODUCT ARGUMENT: does this for each of the other users. Succeeds when all did
# it or had nothing to do; done_by then names those who did it. Where nothing is found because that
# user does not let it be found, there is nothing.
for_other_users() {
    done_by=''
    [ "$is_owner" = yes ] || return 0
    for other_user in $(other_users); do
        if [ "$user_id" -ne 0 ]; then
            say "note: only root can look at the instances of user $other_user"
            continue
        fi
        as_user "$other_user" "$@"
        case $? in
        0) done_by=$done_by${done_by:+, }$other_user ;;
        "$EXIT_NOT_RUNNING" | "$EXIT_NO_INSTANCE") ;;
        *)
            [ "$1" != find ] || continue
            say "could not $1 what user $other_user has of $2"
            return 1
            ;;
        esac
    done
}
