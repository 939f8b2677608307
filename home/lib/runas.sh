# shellcheck shell=sh
# The list of users who run agents, config/<host>_zavrunas.cfg. The management library takes a list that
# it cannot read for an empty one and starts the agents with its own rights. So the home's owner starts
# nothing while there is a list that is not whole.
# shellcheck disable=SC2154

# require_whole_runas: exits when the list is there and is damaged.
require_whole_runas() {
    runas_host=$(uname -n)
    runas_file=$home/config/${runas_host%%.*}_zavrunas.cfg
    [ -e "$runas_file" ] || [ -L "$runas_file" ] || return 0
    runas_complaint=$(complain_about_runas "$runas_file") || runas_complaint="it cannot be checked"
    [ -z "$runas_complaint" ] || fail "$EXIT_INVALID" \
        "$runas_file says which agents run as another user, but $runas_complaint; nothing is started"
}

# complain_about_runas FILE: prints what is wrong with the list, nothing when it is whole. A list uses
# little of XML: what it does not need (attributes, references to characters by number, document types,
# sections of raw text) is refused rather than understood.
complain_about_runas() {
    [ -f "$1" ] && [ -r "$1" ] || {
        echo "it cannot be read"
        return
    }
    iconv -f UTF-8 -t UTF-8 <"$1" >/dev/null 2>&1 || {
        echo "it is not UTF-8 text"
        return
    }
    LC_ALL=C tr '\0' '\001' <"$1" | LC_ALL=C awk '
        function bad(text) { if (complaint == "") complaint = text }
        function text_ends(text) {
            gsub(/&(amp|lt|gt|quot|apos);/, "", text)
            if (text ~ /&/) bad("it has an unknown entity")
            if (text ~ /\]\]>/) bad("it has ]]> in a text")
            if (depth == 0 && text !~ /^[ \t\r\n]*$/) bad("it has text outside its elements")
        }
        function opened(name) {
            if (depth == 0 && roots++) bad("it has a second root element")
            path[++depth] = name
            if (depth == 2 && name == "agent") code = 0
            if (depth == 3 && name == "instance") named = used = 0
            if (depth == 3 && name == "productCode" && path[2] == "agent") code = 1
            if (depth == 4 && path[2] == "agent" && path[3] == "instance") {
                if (name == "name") named = 1
                if (name == "user") used = 1
            }
        }
        function closed(name) {
            if (depth == 0 || path[depth] != name) { bad("it has an unexpected </" name ">"); return }
            if (depth == 2 && name == "agent" && !code) bad("it has an agent without a productCode")
            if (depth == 3 && path[2] == "agent" && name == "instance" && !(named && used))
                bad("it has an instance without a name or a user")
            depth--
        }
        function tag(text,    name) {
            name = text
            sub(/^\//, "", name)
            sub(/[ \t\r\n]*\/?$/, "", name)
            if (name !~ /^[A-Za-z_][A-Za-z0-9_.-]*$/) { bad("it has no valid tag in <" text ">"); return }
            if (text ~ /^\//) {
                if (text ~ /\/$/) bad("it has no valid tag in <" text ">")
                closed(name)
            } else {
                opened(name)
                if (text ~ /\/$/) closed(name)
            }
        }
        # part TEXT: what stands between one "<" and the next.
        function part(text,    at) {
            if (comment != "") text = comment "<" text
            comment = ""
            if (substr(text, 1, 3) == "!--") {
                at = index(substr(text, 4), "--")
                if (at == 0) { comment = text; return }
                if (substr(text, at + 5, 1) != ">") { bad("it has -- in a comment"); return }
                text_ends(substr(text, at + 6))
                return
            }
            at = index(text, ">")
            if (at == 0) { bad("it has a tag that does not end"); return }
            tag(substr(text, 1, at - 1))
            text_ends(substr(text, at + 1))
        }
        BEGIN { RS = "\002" } # one record, if the text is one
        NR == 1 { all = $0 }
        NR == 2 { bad("it has control characters") }
        END {
            sub(/^<\?xml version="1\.[0-9]"( encoding="(UTF|utf)-8")?( standalone="(yes|no)")? ?\?>/, "", all)
            if (all ~ /[\001-\010\013\014\016-\037]/) bad("it has control characters")
            if (index(all, "\357\277\276") || index(all, "\357\277\277")) bad("it is not UTF-8 text")
            count = split(all, parts, "<")
            text_ends(parts[1])
            for (i = 2; i <= count && complaint == ""; i++) part(parts[i])
            if (comment != "") bad("it has a comment that does not end")
            if (depth > 0) bad("<" path[depth] "> is not closed")
            if (!roots) bad("it has no root element")
            print complaint
        }
    '
}
