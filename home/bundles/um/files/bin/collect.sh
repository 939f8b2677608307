# shellcheck shell=sh
# The universal agent's collectors. The agent sets work, notes, scripts, providers, max_kb and
# script_seconds. child is the process to stop together with the agent.
# shellcheck disable=SC2154

# provider_started TYPE: the type ASFS stands for all four types.
provider_started() {
    case ,$providers, in
    *",$1,"* | *,ASFS,*) return 0 ;;
    esac
    return 1
}

collect_all() {
    for import in "$work"/imported/*; do
        [ -f "$import" ] || continue
        application=$(config_value APPL "$import")
        provider_type=$(config_value DPTYPE "$import" | tr '[:lower:]' '[:upper:]')
        data_source=$(config_value SOURCE "$import")
        rows=$AGENT_DATA/$application.csv
        if ! provider_started "$provider_type"; then
            say_once "$application: data provider $provider_type is not started"
            continue
        fi
        keep_below "$rows" "$max_kb"
        case $provider_type in
        SCRP) collect_script ;;
        FILE) collect_file ;;
        *) say_once "$application: no collector for $provider_type" ;;
        esac
    done
}

# Messages that hold for every round are written in the first one only.
said=''
say_once() {
    case $said in
    *"<$1>"*) ;;
    *)
        said="$said<$1>"
        say "$1"
        ;;
    esac
}

# store_rows: stores each line of standard input as a row that begins with the time.
store_rows() {
    [ -s "$rows" ] || echo "time,${fields:-value}" >>"$rows"
    NOW=$(date -u +%Y-%m-%dT%H:%M:%SZ) awk '{ sub(/\r$/, ""); print ENVIRON["NOW"] "," $0 }' \
        >>"$rows"
}

collect_script() {
    fields=$(config_value FIELDS "$import")
    # Scripts run from the directory they are imported into, and from nowhere else.
    script=$scripts/${data_source##*/}
    [ -x "$script" ] || {
        say_once "$application: no script $script"
        return
    }
    output=$notes/.output
    timeout --foreground -k 5 "$script_seconds" "$script" >"$output" </dev/null &
    child=$!
    wait "$child"
    status=$?
    child=''
    [ "$status" -eq 0 ] || say "$application: $script ended with status $status"
    head -c 65536 "$output" | store_rows
    rm -f -- "$output"
}

# collect_file: stores the complete lines added to the file since the last round. offsets/ keeps how far
# it was read. A file that has become shorter was replaced and is read from the start.
collect_file() {
    fields=$(config_value FIELDS "$import")
    [ -f "$data_source" ] || {
        say_once "$application: no file $data_source"
        return
    }
    offset_file=$notes/offsets/${import##*/}
    offset=0
    [ ! -f "$offset_file" ] || read -r offset <"$offset_file"
    case $offset in
    '' | *[!0-9]*) offset=0 ;;
    esac
    size=$(stat -L -c %s -- "$data_source") || return 0
    [ "$offset" -le "$size" ] || offset=0
    [ "$offset" -lt "$size" ] || return 0
    chunk=$notes/.chunk
    # The file is somebody else's, who could put a FIFO or a device in its place.
    dd if="$data_source" bs=65536 iflag=nonblock,skip_bytes skip="$offset" count=1 status=none >"$chunk"
    complete=$(wc -l <"$chunk")
    if [ "$complete" -eq 0 ]; then
        # A line longer than the chunk would block everything after it.
        [ "$(wc -c <"$chunk")" -ge 65536 ] || return 0
        taken=65536
    else
        taken=$(head -n "$complete" "$chunk" | wc -c)
    fi
    # Between the rows and the note that they are stored the agent would, once started again, store
    # them a second time.
    hold_end
    (
        trap '' TERM INT # those who stop the agent tell its whole process group
        head -c "$taken" "$chunk" | store_rows &&
            echo "$((offset + taken))" | replace_file "$offset_file"
    )
    release_end
    rm -f -- "$chunk"
}

# From hold_end to release_end the agent does not end; it does so then if it was told to meanwhile.
hold_end() {
    end_is_due=''
    trap 'end_is_due=1' TERM INT
}

release_end() {
    trap end_agent TERM INT
    [ -z "$end_is_due" ] || end_agent
}
