#!/bin/sh
# What scripts/check-layers.sh refuses and what it says then, on a small tree made for each case.
#
#   check_layers_test.sh CHECK      CHECK is the script
set -eu
check=$1
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
failed=0

# A tree without a fault: base <- tasks, where tasks holds two layers; a seam and its implementation.
make_tree() {
    rm -rf "$scratch/tree"
    mkdir -p "$scratch/tree/docs"
    cd "$scratch/tree"
    mkdir -p plugin/base plugin/tasks platform/include/platform platform/embedded/ncs \
        host tests/platform tests/host
    cat >docs/layers.txt <<'EOF'
# A picture.

.:                  platform/include/platform <- plugin, platform/embedded, host
                    plugin, host <- tests <- tests/platform
                    platform/embedded <- tests/platform

plugin:             base <- tasks

plugin/tasks:       queue <- handlers
    queue         = task_queue
    handlers      = install,
                    ua_*
EOF
    write_readme
    echo '#define SEAM' >platform/include/platform/seam.h
    echo '#include "platform/seam.h"' >platform/embedded/ncs/packet.h
    echo '#include "platform/seam.h"' >plugin/base/text.h
    printf '#include "base/text.h"\n' >plugin/base/text.cpp
    echo '#include "base/text.h"' >plugin/tasks/task_queue.h
    printf '#include <vector>\n\n#include "tasks/task_queue.h"\n' >plugin/tasks/install.h
    echo '#include "tasks/install.h"' >plugin/tasks/ua_files.h
    echo '#include "platform/seam.h"' >host/main.cpp
    echo '#include "ncs/packet.h"' >tests/platform/packet_test.cpp
    echo '#include "tasks/install.h"' >tests/host/host_test.cpp
}

write_readme() {
    # shellcheck disable=SC2016
    { printf 'Text.\n\n```\nother\n```\n\n```\n'; cat docs/layers.txt; printf '```\n'; } >README.md
}

fail() {
    echo "FAILED: $*"
    failed=1
}

# accepts WHAT
accepts() {
    "$check" "$scratch/tree" >"$scratch/said" 2>&1 || {
        fail "$1: it was refused"
        cat "$scratch/said"
    }
}

# refuses WHAT TEXT...: each text is part of what is said.
refuses() {
    what=$1
    shift
    if "$check" "$scratch/tree" >"$scratch/said" 2>&1; then
        fail "$what: it was accepted"
        return
    fi
    for text in "$@"; do
        grep -qF -- "$text" "$scratch/said" || {
            fail "$what: nobody says \"$text\""
            cat "$scratch/said"
        }
    done
}

make_tree
accepts "a tree that keeps to its picture"

make_tree
printf '\n#include "tasks/install.h"\n' >>plugin/base/text.cpp
refuses "an include that points up" \
    'plugin/base/text.cpp:3: includes "tasks/install.h": plugin/base may not include plugin/tasks' \
    '(plugin: base <- tasks)'

make_tree
echo '#include "tasks/ua_files.h"' >>plugin/tasks/task_queue.h
refuses "an include that points up within a folder" \
    'plugin/tasks/task_queue.h:2: includes "tasks/ua_files.h"' \
    'plugin/tasks/queue may not include plugin/tasks/handlers' \
    '(plugin/tasks: queue <- handlers)'

make_tree
printf '\n#  include "tasks/ua_files.h"\n' >plugin/tasks/install.cpp
refuses "a circle within one room" 'circle of units:' \
    'plugin/tasks/install.cpp:2: includes "tasks/ua_files.h"' \
    'plugin/tasks/ua_files.h:1: includes "tasks/install.h"'

make_tree
echo '#include "b.h"' >tests/host/a.h
echo '#include "c.h"' >tests/host/b.h
echo '#include "a.h"' >tests/host/c.h
refuses "a circle of three among files that lie side by side" 'circle of units:' \
    'tests/host/a.h:1: includes "b.h"' 'tests/host/b.h:1: includes "c.h"' \
    'tests/host/c.h:1: includes "a.h"'

make_tree
echo '#include "ncs/packet.h"' >>host/main.cpp
refuses "an internal header of the platform in the host" \
    'host/main.cpp:2: includes "ncs/packet.h": host may not include platform/embedded'

make_tree
echo '#include <ncs/packet.h>' >>tests/host/host_test.cpp
refuses "an internal header of the platform in other tests, between angle brackets" \
    'tests/host/host_test.cpp:2: includes <ncs/packet.h>: tests may not include platform/embedded'

make_tree
echo '#include "../platform/embedded/ncs/packet.h"' >>host/main.cpp
refuses "an internal header by way of its relative path" \
    'host/main.cpp:2: includes "../platform/embedded/ncs/packet.h": host may not include'

make_tree
echo '#include "base/gone.h"' >>plugin/base/text.cpp
refuses "an include of nothing" \
    'plugin/base/text.cpp:2: includes "base/gone.h": there is no such file'

make_tree
mkdir fleet
echo >fleet/link.cpp
echo >plugin/tasks/unplaced.h
refuses "files without a room" 'fleet/link.cpp:1: stands in no room of docs/layers.txt' \
    'plugin/tasks/unplaced.h:1: stands in no room of docs/layers.txt (plugin/tasks: queue <- handlers)'

make_tree
echo 'plugin:             tasks <- base' >>docs/layers.txt
write_readme
refuses "a picture with a circle" 'docs/layers.txt: the arrows of plugin close a circle'

make_tree
echo '# One line more.' >>docs/layers.txt
refuses "a README with another picture" 'README.md:1: no code block is the text of docs/layers.txt'

make_tree
rm -r plugin platform host tests
refuses "a tree without sources" 'there are no sources here'

exit "$failed"
