# The work of check-layers.sh. Reads the paths of all sources and headers from standard input, and
# docs/layers.txt, README.md and the sources themselves from the working directory. Prints one line
# per fault; the exit status is 1 when there is any.
#
# Rooms are known by their section and name, joined by SUBSEP. A section is a folder, "." for all.

function fault(text) {
    print text
    faults++
}

function trim(text) {
    gsub(/^[ \t]+|[ \t]+$/, "", text)
    return text
}

function readLines(path, lines,    count, line) {
    count = 0
    while ((getline line < path) > 0) lines[++count] = line
    close(path)
    return count
}

# ---- The picture ----

# Adds the room's members to its section: patterns of paths, relative to the section's folder.
function addMembers(section, room, list,    parts, n, i) {
    n = split(list, parts, ",")
    for (i = 1; i <= n; i++) {
        if (trim(parts[i]) == "") continue
        memberRoom[section, ++memberCount[section]] = room
        memberPath[section, memberCount[section]] = trim(parts[i])
    }
}

# "a, b <- c": everything in a group may include everything in the groups before it.
function addArrows(section, chain,    groups, n, g, above, below, i, j, na, nb, a, b) {
    n = split(chain, groups, "<-")
    for (g = 1; g <= n; g++) {
        na = split(groups[g], above, ",")
        for (i = 1; i <= na; i++) {
            a = trim(above[i])
            if (a == "") fault(layers ": an arrow without a room: " chain)
            isRoom[section, a] = 1
            if (g == 1) continue
            nb = split(groups[g - 1], below, ",")
            for (j = 1; j <= nb; j++) {
                b = trim(below[j])
                arrow[section, a, ++arrowCount[section, a]] = b
            }
        }
    }
    chains[section, ++chainCount[section]] = chain
}

function readPicture(    lines, n, i, text, section, set) {
    n = readLines(layers, lines)
    if (n == 0) fault(layers ": missing or empty")
    for (i = 1; i <= n; i++) {
        text = lines[i]
        sub(/#.*/, "", text)
        if (match(text, /^[^ \t]+:/)) {
            section = substr(text, 1, RLENGTH - 1)
            isSection[section] = 1
            sections[++sectionCount] = section
            text = substr(text, RLENGTH + 1)
            set = ""
        }
        text = trim(text)
        if (text == "") continue
        if (text ~ /=/) {
            set = trim(substr(text, 1, index(text, "=") - 1))
            text = substr(text, index(text, "=") + 1)
            isSet[section, set] = 1
        }
        if (set != "") {
            addMembers(section, set, text)
        } else {
            addArrows(section, text)
        }
    }
    finishPicture()
}

# Rooms that are no sets are folders or units of their own name.
function finishPicture(    key, part) {
    for (key in isSet) {
        split(key, part, SUBSEP)
        if (!(key in isRoom)) fault(layers ": no arrow names the set " part[2])
    }
    for (key in isRoom) {
        split(key, part, SUBSEP)
        if (!(key in isSet)) addMembers(part[1], part[2], part[2])
        if (reaches(part[1], part[2], part[2])) {
            fault(layers ": the arrows of " part[1] " close a circle at " part[2])
        }
    }
}

# Whether arrows lead from one room of a section to another, over any number of rooms between.
function reaches(section, from, to,    seen) {
    return walk(section, from, to, seen)
}

function walk(section, from, to, seen,    i, next_) {
    for (i = 1; i <= arrowCount[section, from]; i++) {
        next_ = arrow[section, from, i]
        if (next_ == to) return 1
        if (next_ in seen) continue
        seen[next_] = 1
        if (walk(section, next_, to, seen)) return 1
    }
    return 0
}

# The arrows that say something about one of two rooms, or all of the section's.
function rule(section, a, b,    i, text) {
    for (i = 1; i <= chainCount[section]; i++) {
        if (a != "" && !names(chains[section, i], a) && !names(chains[section, i], b)) continue
        text = text (text == "" ? "" : "; ") chains[section, i]
    }
    return section ": " text
}

function names(chain, room,    parts, n, i) {
    gsub(/<-/, ",", chain)
    n = split(chain, parts, ",")
    for (i = 1; i <= n; i++) {
        if (trim(parts[i]) == room) return 1
    }
    return 0
}

# ---- Rooms of files ----

# Whether a pattern is the unit itself or one of the folders above it. "*" stands for any rest of a
# name.
function covers(pattern, unit,    stem) {
    if (pattern ~ /\*$/) {
        stem = substr(pattern, 1, length(pattern) - 1)
        return substr(unit, 1, length(stem)) == stem && substr(unit, length(stem) + 1) !~ /\//
    }
    return unit == pattern || substr(unit, 1, length(pattern) + 1) == pattern "/"
}

# The room of a unit in a section, by the longest pattern that covers it; "" for none.
function roomOf(section, unit,    i, best, room) {
    if ((section, unit) in roomCache) return roomCache[section, unit]
    best = 0
    room = ""
    for (i = 1; i <= memberCount[section]; i++) {
        if (length(memberPath[section, i]) <= best) continue
        if (!covers(memberPath[section, i], unit)) continue
        best = length(memberPath[section, i])
        room = memberRoom[section, i]
    }
    roomCache[section, unit] = room
    return room
}

function inSection(section, unit) {
    return section == "." || substr(unit, 1, length(section) + 1) == section "/"
}

function within(section, unit) {
    return section == "." ? unit : substr(unit, length(section) + 2)
}

function unitOf(path) {
    sub(/\.[^.\/]*$/, "", path)
    return path
}

function shown(section, room) {
    return section == "." ? room : section "/" room
}

# ---- Includes ----

# The file that an include names, looked for beside the including file, in every folder above it and
# in the folders that the build adds; "" when there is none.
function resolve(path, name,    folder, candidate, i) {
    folder = path
    while (folder != "") {
        sub(/\/?[^\/]*$/, "", folder)
        candidate = (folder == "" ? "" : folder "/") name
        while (sub(/[^\/]+\/\.\.\//, "", candidate)) continue
        if (candidate in isFile) return candidate
    }
    for (i = 1; i <= rootCount; i++) {
        if ((roots[i] "/" name) in isFile) return roots[i] "/" name
    }
    return ""
}

function checkInclude(place, from, to, text,    i, section, a, b) {
    for (i = 1; i <= sectionCount; i++) {
        section = sections[i]
        if (!inSection(section, from) || !inSection(section, to)) continue
        a = roomOf(section, within(section, from))
        b = roomOf(section, within(section, to))
        if (a == "" || b == "" || a == b || reaches(section, a, b)) continue
        fault(place ": includes " text ": " shown(section, a) " may not include " \
              shown(section, b) " (" rule(section, a, b) ")")
    }
}

function readIncludes(path,    line, number, text, name, target, from, to) {
    from = unitOf(path)
    number = 0
    while ((getline line < path) > 0) {
        number++
        if (line !~ /^[ \t]*#[ \t]*include[ \t]*["<]/) continue
        match(line, /["<][^">]*[">]/)
        text = substr(line, RSTART, RLENGTH)
        name = substr(text, 2, RLENGTH - 2)
        target = resolve(path, name)
        if (target == "") {
            if (text ~ /^"/) fault(path ":" number ": includes " text ": there is no such file")
            continue
        }
        to = unitOf(target)
        if (to == from) continue
        checkInclude(path ":" number, from, to, text)
        if ((from, to) in edgePlace) continue
        edgePlace[from, to] = path ":" number ": includes " text
        edges[from, ++edgeCount[from]] = to
    }
    close(path)
}

function checkRooms(path,    i, section, unit) {
    unit = unitOf(path)
    for (i = 1; i <= sectionCount; i++) {
        section = sections[i]
        if (!inSection(section, unit) || roomOf(section, within(section, unit)) != "") continue
        fault(path ":1: stands in no room of " layers " (" rule(section, "", "") ")")
    }
}

# ---- Circles ----

# Depth-first; state 1 = on the way, 2 = done. An include of a unit on the way closes a circle.
function visit(unit, depth,    i, to) {
    state[unit] = 1
    way[depth] = unit
    for (i = 1; i <= edgeCount[unit]; i++) {
        to = edges[unit, i]
        if (state[to] == 1) reportCircle(to, depth)
        if (state[to] == 0) visit(to, depth + 1)
    }
    state[unit] = 2
}

function reportCircle(first, depth,    at, i, text) {
    for (at = depth; way[at] != first; at--) continue
    text = "circle of units:"
    for (i = at; i <= depth; i++) {
        text = text "\n    " edgePlace[way[i], i < depth ? way[i + 1] : first]
    }
    fault(text)
}

# ---- The README ----

# Whether a code block of the file holds exactly the picture.
function checkReadme(    picture, n, lines, m, i, inBlock, at, same) {
    n = readLines(layers, picture)
    m = readLines("README.md", lines)
    inBlock = 0
    for (i = 1; i <= m; i++) {
        if (lines[i] ~ /^```/) {
            if (inBlock && same && at == n) return
            inBlock = !inBlock
            at = 0
            same = 1
        } else if (inBlock) {
            at++
            if (at > n || lines[i] != picture[at]) same = 0
        }
    }
    fault("README.md:1: no code block is the text of " layers)
}

{
    files[++fileCount] = $0
    isFile[$0] = 1
}

END {
    layers = "docs/layers.txt"
    rootCount = split("plugin platform platform/include platform/embedded tests bench", roots, " ")
    readPicture()
    for (i = 1; i <= fileCount; i++) {
        checkRooms(files[i])
        readIncludes(files[i])
    }
    for (i = 1; i <= fileCount; i++) {
        if (state[unitOf(files[i])] == 0) visit(unitOf(files[i]), 1)
    }
    checkReadme()
    if (fileCount == 0) fault("there are no sources here")
    exit faults > 0
}
