#!/bin/sh
# The alerts fire when they should and at no other time, as the rules' own cases say.
#
#   alert_rules.sh FOLDER      skipped, with status 77, where promtool is not installed
set -eu
cd "$1"
if ! command -v promtool >/dev/null; then
    echo "promtool, of the package prometheus, is not installed"
    exit 77
fi
for program in zavhost fleet; do
    promtool check rules "$program.rules.yml"
    promtool test rules "${program}.rules_test.yml"
done
