# shellcheck shell=sh
# The universal agent's start-up list of data providers. config/.ConfigData/kumenv has a line
# INSTANCE|DATAPROVIDER|LIST| per instance. Changes arrive there and are read from the instance's
# configuration file the next time, so the list is copied to that file. Read after common.sh and
# use_home.
# shellcheck disable=SC2154

# listed_providers INSTANCE: prints the list in kumenv; nothing when there is none.
listed_providers() {
    [ -f "$home/config/.ConfigData/kumenv" ] || return 0
    LINE_START="$1|DATAPROVIDER|" awk '
        index($0, ENVIRON["LINE_START"]) == 1 {
            rest = substr($0, length(ENVIRON["LINE_START"]) + 1)
            sub(/\|.*/, "", rest)
            gsub(/[\r\047]/, "", rest)
            if (rest != "") { print rest; exit }
        }' "$home/config/.ConfigData/kumenv" 2>/dev/null
}

# note_providers CONFIG LIST: writes the list to the configuration file, if it has another one.
note_providers() {
    [ "$(config_value KUMA_STARTUP_DP "$1")" != "$2" ] || return 0
    with_list=$(LIST=$2 awk '
        !/^[ \t]*KUMA_STARTUP_DP=/ { print; next }
        !written++ { print "KUMA_STARTUP_DP=\047" ENVIRON["LIST"] "\047" }
        END { if (!written) print "KUMA_STARTUP_DP=\047" ENVIRON["LIST"] "\047" }
    ' <"$1") && printf '%s\n' "$with_list" | replace_file "$1"
}

# note_all_providers: the same for all instances, on behalf of agents whose users may not write the
# configuration.
note_all_providers() {
    [ "$is_owner" = yes ] || return 0
    for noted in "$home/config/um.config" "$home/config"/um_*.config; do
        [ -f "$noted" ] || continue
        noted_instance=${noted##*/um}
        noted_instance=${noted_instance%.config}
        noted_list=$(listed_providers "${noted_instance#_}")
        [ -z "$noted_list" ] || note_providers "$noted" "$noted_list" ||
            say "note: could not write the list of data providers to $noted"
    done
}
