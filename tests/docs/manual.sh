#!/bin/sh
# Checks the manual pages: that mandoc finds no fault with them, that there is one for every verb, and
# that they name every option.
#
#   tests/docs/manual.sh TEMPLATES PAGES ZAVCTL ZAVHOST [ZAVLINK ZAVFLEETD ZAVCTL_FLEET]
#
# TEMPLATES is the folder of the hand-written text. PAGES is that of the pages as the build lays them out,
# one folder for each program. The last three programs are not built for every width.
set -eu
templates=$1 pages=$2 zavctl=$3 zavhost=$4 zavlink=${5-} zavfleetd=${6-} zavctl_fleet=${7-}
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
status=0
complain() {
    echo "$1"
    status=1
}

# Laid out as they are installed.
mkdir -p "$scratch/man1" "$scratch/man5" "$scratch/man7" "$scratch/man8"
cp "$pages"/zavctl/* "$scratch/man1"
for section in 5 7 8; do cp "$pages"/zavhost/*."$section" "$scratch/man$section"; done
if [ -n "$zavlink" ]; then
    cp "$pages"/zavctl-fleet/* "$scratch/man1"
    cp "$pages"/zavlink/*.5 "$scratch/man5"
    cp "$pages"/zavlink/*.8 "$pages"/zavfleetd/*.8 "$scratch/man8"
fi
# mandoc looks for other pages in the system only, so references are checked here.
mandoc -T lint -W all "$scratch"/man*/* | grep -v 'STYLE: referenced manual not found' &&
    complain "mandoc finds faults"
sed -n 's/^\.\(It \)\{0,1\}Xr \([^ ]*\) \([0-9]\).*/\3 \2/p' "$scratch"/man*/* |
    sort -u >"$scratch/references"
[ "$(wc -l <"$scratch/references")" -gt 10 ] || complain "pages hardly refer to each other"
while read -r section page; do
    [ -f "$scratch/man$section/$page.$section" ] || complain "there is no $page($section)"
done <"$scratch/references"

# As the help lists them; groups stand there with one line, so they are asked as well.
verbs_in() {
    sed -n '/^Commands:/,/^$/s/^  \([a-z][a-z-]*\( [a-z][a-z-]*\)\{0,1\}\)  .*/\1/p'
}
# The groups of a fleet are named by their first words: the name of one of them is a verb as well.
all_verbs_of() {
    "$1" help | verbs_in >"$scratch/words"
    [ "$(wc -l <"$scratch/words")" -gt 10 ] || complain "$1 help lists hardly any command"
    while read -r word; do
        "$1" help "$word" >"$scratch/help"
        if grep -q '^Commands:' "$scratch/help"; then
            verbs_in <"$scratch/help"
        else
            echo "$word"
        fi
    done <"$scratch/words" | LC_ALL=C sort -u
}
all_verbs_of "$zavctl" >"$scratch/host_verbs"
cp "$scratch/host_verbs" "$scratch/all_verbs"
if [ -n "$zavctl_fleet" ]; then
    all_verbs_of "$zavctl_fleet" >"$scratch/fleet_verbs"
    LC_ALL=C sort -u "$scratch/host_verbs" "$scratch/fleet_verbs" >"$scratch/all_verbs"
    # The page about fleets names the others.
    echo fleet >>"$scratch/all_verbs"
    # What both have is on that page: as a reference, or with a section of its own.
    LC_ALL=C comm -12 "$scratch/host_verbs" "$scratch/fleet_verbs" | while read -r verb; do
        grep -qE "^\.(Ss $verb|It Xr zavctl-$(echo "$verb" | tr ' ' -) 1)\$" "$scratch/man1/zavctl-fleet.1" ||
            echo "$verb"
    done >"$scratch/lacking"
    [ ! -s "$scratch/lacking" ] || complain "zavctl-fleet.1 lacks $(cat "$scratch/lacking")"
fi
tr ' ' - <"$scratch/all_verbs" | sed 's/.*/zavctl-&.1/' | LC_ALL=C sort >"$scratch/expected"
(cd "$scratch/man1" && LC_ALL=C ls zavctl-*) >"$scratch/found"
diff "$scratch/expected" "$scratch/found" || complain "the pages (>) are not those of the verbs (<)"
# A text whose verb has another name now would be nowhere.
for text in "$templates"/verbs/*.mdoc; do
    page=$(basename "$text" .mdoc)
    [ -f "$scratch/man1/$page.1" ] || complain "no page holds $text"
done

# Every option of the programs is on their pages.
options_in() {
    grep -oE '(^|[ ,])--[a-z][a-z-]*' | tr -d ' ,' | LC_ALL=C sort -u
}
page_text() {
    mandoc -T ascii "$1" | sed "s/.$(printf '\b')//g"
}
check_options() {
    LC_ALL=C sort -u >"$scratch/options"
    [ -s "$scratch/options" ] || complain "$1 has no options"
    page_text "$scratch/$1" | options_in >"$scratch/shown"
    LC_ALL=C comm -23 "$scratch/options" "$scratch/shown" | sed "s|.*|$1 lacks &|" >"$scratch/lacking"
    [ ! -s "$scratch/lacking" ] || complain "$(cat "$scratch/lacking")"
}
"$zavhost" --help | grep -oE '^ +(-h,)?--[a-z-]+' | tr -d ' ' | sed 's/^-h,//' | check_options man8/zavhost.8
"$zavctl" help install | grep -oE '^  (-h, )?--[a-z-]+' | sed 's/^ *\(-h, \)*//' |
    grep -vxE -e '--help|--version' | check_options man1/zavctl-install.1
# CLI11 writes them so: "  -h,--help", "  --label TEXT ...".
cli_options() {
    grep -oE '^  (-h,)?--[a-z][a-z-]*' | sed 's/^  //' | grep -v -e '^-h,--help$'
}
if [ -n "$zavctl_fleet" ]; then
    for verb in tasks 'task output' 'config get' doctor push; do
        # shellcheck disable=SC2086 # a verb may be two words
        "$zavctl_fleet" help $verb | grep -oE '^  (-h, )?--?[a-z-]+' | sed 's/^ *\(-h, \)*//'
    done | grep -e '^--' | grep -vxE -e '--help|--version' | check_options man1/zavctl-fleet.1
    "$zavctl_fleet" help rollout retry-failed | grep -oE '^  --[a-z-]+' | tr -d ' ' |
        grep -vxE -e '--version' | check_options man1/zavctl-rollout-retry-failed.1
fi
if [ -n "$zavlink" ]; then
    {
        "$zavlink" --help | grep -oE -e '--[a-z]+' | grep -v -e '^--help$'
        "$zavlink" enrol --help | cli_options
    } | check_options man8/zavlink.8
    # Groups have no options of their own, but the commands that they name.
    subcommands_in() {
        sed -n '/^Subcommands:/,$s/^  \([a-z]*\) .*/\1/p'
    }
    "$zavfleetd" --help | subcommands_in >"$scratch/words"
    [ "$(wc -l <"$scratch/words")" -gt 5 ] || complain "zavfleetd --help lists hardly any command"
    while read -r word; do
        "$zavfleetd" "$word" --help | cli_options
        "$zavfleetd" "$word" --help | subcommands_in | while read -r second; do
            "$zavfleetd" "$word" "$second" --help | cli_options
        done
    done <"$scratch/words" >"$scratch/fleet_options" || true
    check_options man8/zavfleetd.8 <"$scratch/fleet_options"
fi
# The keys of the file are those that a host lists.
"$zavhost" --print-config --home "$scratch" --plugin /none 2>/dev/null |
    sed -n 's/^\(# \)\{0,1\}\([a-z-]*\) .*/\2/p' | LC_ALL=C sort >"$scratch/keys"
[ "$(wc -l <"$scratch/keys")" -gt 10 ] || complain "zavhost --print-config lists hardly any key"
page_text "$scratch/man5/zavhost.conf.5" >"$scratch/conf"
while read -r key; do
    grep -qE "^ +$key = " "$scratch/conf" || complain "zavhost.conf.5 lacks $key"
done <"$scratch/keys"
exit "$status"
