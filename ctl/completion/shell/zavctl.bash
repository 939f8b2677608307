# shellcheck shell=bash
# Completion of zavctl for bash. The program itself says what may stand at the cursor.

_zavctl() {
    local line=${COMP_LINE:0:COMP_POINT} words kind value
    # Bash has split words at colons and equals signs, too, which belong to names here. A backslash
    # keeps a blank in its word.
    # shellcheck disable=SC2162
    read -a words <<<"$line"
    [[ $line != *[[:blank:]] ]] || words+=("")
    # Readline replaces what stands behind the last of its own breaks.
    local typed=${words[${#words[@]} - 1]} rest
    rest=$typed
    [[ $COMP_WORDBREAKS != *=* ]] || rest=${rest##*=}
    [[ $COMP_WORDBREAKS != *:* ]] || rest=${rest##*:}
    local lead=${typed%"$rest"}
    COMPREPLY=()
    {
        read -r kind
        while IFS=$'\t' read -r value _; do
            COMPREPLY+=("$(printf %q "${value#"$lead"}")")
        done
    } < <("${words[0]}" __complete "${words[@]:1}" 2>/dev/null)
    if [[ $kind == files ]]; then
        compopt -o default
    elif [[ ${#COMPREPLY[@]} -eq 1 && ${COMPREPLY[0]} == */ ]]; then
        compopt -o nospace
    fi
}
complete -F _zavctl zavctl
