# shellcheck shell=sh
# What the programs of a home share: exit codes, checks of names, file names, configuration values.
# A program sets `program` (its name in messages) before it sources this file, and calls use_home, which
# sets `home`, before anything else. Functions set global variables, because sh has no others.

# shellcheck disable=SC2154

# Nothing that a program of a home makes may be written by others, whatever umask it was started with.
# It must not be stricter for everything: a user who runs agents has to read the programs.
umask go-w

# Exit codes, the same in every program of a home.
# shellcheck disable=SC2034
{
    EXIT_USAGE=1        # wrong usage
    EXIT_HOME=2         # no usable home
    EXIT_ABSENT=3       # the product is not installed
    EXIT_RUNNING=4      # it runs already
    EXIT_NOT_RUNNING=5  # it does not run
    EXIT_DIED=6         # it ended right after its start
    EXIT_NOT_STOPPED=7  # it could not be stopped
    EXIT_WRITE=8        # a file of the home could not be written, or its lock not be had
    EXIT_NEEDED=20      # other products still need it
    EXIT_NAME=21        # the managed system name is not understood
    EXIT_NO_INSTANCE=22 # there is no such instance
    EXIT_INVALID=23     # the text or file is not valid
    EXIT_NO_SERVER=24   # no central server is known
    EXIT_NO_FILE=25     # there is no such file
    EXIT_NOT_IMPORTED=26 # the metafile is not imported
    EXIT_NOT_CONFIRMED=27 # the question was not answered with yes
    EXIT_DAMAGED=28     # the bundle or a product's manifest is damaged
    EXIT_PLATFORM=29    # the bundle is for another platform
    EXIT_UNREACHABLE=30 # the distribution could not be reached
}

say() {
    printf '%s: %s\n' "$program" "$*" >&2
}

# fail CODE TEXT...
fail() {
    fail_code=$1
    shift
    say "$@"
    exit "$fail_code"
}

# use_home DIR: sets home to its absolute path, or exits.
use_home() {
    home=$(CDPATH='' cd -- "$1" 2>/dev/null && pwd) || fail "$EXIT_HOME" "no home directory $1"
    [ -d "$home/agtqvs6" ] && [ -d "$home/registry" ] ||
        fail "$EXIT_HOME" "$home is not a home: it lacks agtqvs6 or registry"
}

# A product code is part of file names. "bin" is taken: it is the folder of the shared component.
valid_product() {
    case $1 in
    '' | bin | *[!A-Za-z0-9]*) return 1 ;;
    esac
}

valid_arch() {
    case $1 in
    '' | *[!A-Za-z0-9_]*) return 1 ;;
    esac
}

# An instance's name is part of file names; the default instance has the empty name.
valid_instance() {
    case $1 in
    [.-]* | *[!A-Za-z0-9_.-]*) return 1 ;;
    esac
}

# instance_key PRODUCT INSTANCE: sets key, the stem of the instance's file names.
instance_key() {
    key=$1${2:+_$2}
}

# split_key FILE: sets product and instance to what the name of an instance's file stands for; fails when
# it is none.
# shellcheck disable=SC2034
split_key() {
    instance=${1%.*}
    product=${instance%%_*}
    instance=${instance#"$product"}
    [ "$instance" != _ ] || return 1
    instance=${instance#_}
    valid_product "$product" && valid_instance "$instance"
}

# config_file PRODUCT INSTANCE: sets config to the instance's configuration file. The universal agent's
# files are named differently because the management library reads them too.
# shellcheck disable=SC2034
config_file() {
    instance_key "$1" "$2"
    case $1 in
    um) config=$home/config/$key.config ;;
    *) config=$home/config/$key.cfg ;;
    esac
}

# config_value NAME FILE...: prints the value of NAME from the first file that sets it. Within a file
# the last line counts. Single quotes around a value are removed.
config_value() {
    config_name=$1
    shift
    for config_source in "$@"; do
        [ -f "$config_source" ] || continue
        CONFIG_NAME=$config_name awk '
            { sub(/\r$/, ""); sub(/^[ \t]+/, "") }
            /^[#*]/ { next }
            { at = index($0, "=") }
            at > 1 && substr($0, 1, at - 1) == ENVIRON["CONFIG_NAME"] {
                value = substr($0, at + 1); found = 1
            }
            END { gsub("\047", "", value); if (found) print value; exit !found }
        ' <"$config_source" && return 0
    done
    return 1
}

# config_number NAME DEFAULT MIN MAX FILE...: prints the value, or DEFAULT when it is missing or is not
# a number in that range.
config_number() {
    number_name=$1 number_default=$2 number_min=$3 number_max=$4
    shift 4
    if number=$(config_value "$number_name" "$@"); then
        case $number in
        '' | *[!0-9]* | ??????????*) ;;
        *)
            # The shell would read a number with a leading 0 as octal.
            while [ "$number" != "${number#0?}" ]; do number=${number#0}; done
            if [ "$number" -ge "$number_min" ] && [ "$number" -le "$number_max" ]; then
                printf '%s\n' "$number"
                return 0
            fi
            ;;
        esac
        say "$number_name is not a number from $number_min to $number_max; $number_default is used"
    fi
    printf '%s\n' "$number_default"
}

# host_arch: prints this machine's platform code, or nothing when it is not in the table.
host_arch() (
    set -- "$home/registry/archdsc.tbl"
    [ -r "$home/bin/dynarch.shl" ] || return 1
    # shellcheck source=home/bin/dynarch.shl
    . "$home/bin/dynarch.shl" >/dev/null 2>&1
    # shellcheck disable=SC2154
    [ -n "$cArch" ] && printf '%s\n' "$cArch"
)

# find_product PRODUCT: sets product_arch and product_dir. The machine's own platform comes first;
# a machine may also run the agents of another one.
find_product() {
    for product_dir in "$home/agtqvs6/$(host_arch)/$1" "$home"/agtqvs6/*/"$1"; do
        if [ -f "$product_dir/bin/agent" ] && [ -x "$product_dir/bin/agent" ]; then
            product_arch=${product_dir%/*}
            product_arch=${product_arch##*/}
            return 0
        fi
    done
    return 1
}

# plain FILE: succeeds when FILE is a file, or when there is nothing of that name. What is written to
# is never a link, a FIFO or a device.
plain() {
    [ ! -L "$1" ] && { [ -f "$1" ] || [ ! -e "$1" ]; }
}

# mode_for FILE: prints the mode of a new file there: who may enter the folder may read the file.
mode_for() {
    folder_mode=$(stat -L -c %a -- "$(dirname -- "$1")") && printf '%o\n' $((0$folder_mode & 0644))
}

# rewrite_file FILE COMMAND...: FILE becomes what the command prints. After a crash at any moment it is
# the old file or the new one, and it is the old one when the command fails. It keeps its mode and,
# where the caller may give files away, its owner.
rewrite_file() {
    rewritten=$1
    shift
    [ ! -e "$rewritten" ] || [ -f "$rewritten" ] || return 1
    remove_abandoned "$rewritten"
    replacement=$(mktemp -- "$(dirname -- "$rewritten")/.${rewritten##*/}.$$.XXXXXX" 2>/dev/null) ||
        return 1
    if { "$@" >"$replacement"; } 2>/dev/null && like_the_old_one && sync -- "$replacement" &&
        mv -fT -- "$replacement" "$rewritten" 2>/dev/null; then
        # Some filesystems cannot sync a folder. The file is whole in any case.
        sync -- "$(dirname -- "$rewritten")" 2>/dev/null
        return 0
    fi
    rm -f -- "$replacement"
    return 1
}

like_the_old_one() {
    if [ -e "$rewritten" ]; then
        chown --reference="$rewritten" -- "$replacement" 2>/dev/null
        chmod --reference="$rewritten" -- "$replacement" 2>/dev/null
    else
        chmod "$(mode_for "$rewritten")" -- "$replacement" 2>/dev/null
    fi
}

# remove_abandoned FILE: removes the unfinished replacements of programs that were killed.
remove_abandoned() {
    for abandoned in "$(dirname -- "$1")/.${1##*/}".[0-9]*.??????; do
        abandoned_by=${abandoned%.*}
        [ ! -f "$abandoned" ] || [ -d "/proc/${abandoned_by##*.}" ] || rm -f -- "$abandoned"
    done
}

# replace_file FILE: writes standard input to FILE like rewrite_file, for input that cannot be cut.
replace_file() {
    rewrite_file "$1" cat
}

# keep_below FILE KILOBYTES: rotates a file larger than that to FILE.1.
keep_below() {
    [ -f "$1" ] || return 0
    kept_size=$(wc -c <"$1")
    [ "$kept_size" -le $(($2 * 1024)) ] || mv -f -- "$1" "$1.1"
}
