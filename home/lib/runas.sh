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
# sections of raw text) is refused rather than understood. The library takes the first of two entries, passes
# over what it does not look for, and puts the text in front of an element to that element's own: that is
# refused too.
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
            content = content text
            gsub(/&(amp|lt|gt|quot|apos);/, "x", text)
            if (text ~ /&/) bad("it has an unknown entity")
            if (text ~ /\]\]>/) bad("it has ]]> in a text")
            if (depth == 0 && text !~ /^[ \t\r\n]*$/) bad("it has text outside its elements")
            if (depth > 0 && text !~ /^[ \t\r\n]*$/ && role[depth] ~ /^(list|agent|instance)$/)
                bad("it has a text between its entries")
        }
        function plain_text(text) {
            gsub(/^[ \t\r\n]+|[ \t\r\n]+$/, "", text)
            gsub(/&lt;/, "<", text)
            gsub(/&gt;/, ">", text)
            gsub(/&quot;/, "\"", text)
            gsub(/&apos;/, "\047", text)
            gsub(/&amp;/, "\\&", text)
            return text
        }
        # role_in PARENT NAME: what the library takes the element for; "" if it does not look for it.
        function role_in(parent, name) {
            if (parent == "list" && name == "agent") return name
            if (parent == "agent" && name ~ /^(productCode|instance)$/) return name
            if (parent == "instance" && name ~ /^(name|user)$/) return name
            return ""
        }
        # meant_by NAME PARENT: the entry that somebody may have meant by an element that is passed over.
        function meant_by(name, parent) {
            name = tolower(name)
            if (name ~ /^(agent|instance)$/) return name
            if (parent !~ /^(list|agent|instance)$/) return ""
            if (name == "productcode") return "productCode"
            return name ~ /^(name|user)$/ ? name : ""
        }
        function opened(name,    parent, meant) {
            if (depth == 0 && roots++) bad("it has a second root element")
            parent = depth > 0 ? role[depth] : ""
            path[++depth] = name
            role[depth] = depth == 1 ? "list" : role_in(parent, name)
            if (parent ~ /^(productCode|name|user)$/) bad("it has elements in a productCode, a name or a user")
            if (depth == 1 || role[depth] == "") meant = meant_by(name, parent)
            if (meant != "") bad("it has something like <" meant "> where none is looked for")
            if (role[depth] == "agent") { codes = 0; split("", named) }
            if (role[depth] == "instance") names = users = 0
            content = ""
        }
        function code_ends(code) {
            if (codes++) bad("it has an agent with more than one productCode")
            else if (code == "") bad("it has an empty productCode")
            else if (code !~ /^[a-z0-9]+$/) bad("it has a productCode that is not lower-case letters and digits")
            else if (coded[code]++) bad("it has more than one agent with the productCode " code)
        }
        function closed(name) {
            if (depth == 0 || path[depth] != name) { bad("it has an unexpected </" name ">"); return }
            if (role[depth] == "productCode") code_ends(plain_text(content))
            if (role[depth] == "agent" && !codes) bad("it has an agent without a productCode")
            if (role[depth] == "name") {
                names++
                if (named[plain_text(content)]++) bad("it has an agent with more than one instance of the same name")
            }
            if (role[depth] == "user") users++
            if (role[depth] == "instance") {
                if (!names || !users) bad("it has an instance without a name or a user")
                else if (names > 1 || users > 1) bad("it has an instance with more than one name or user")
            }
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
