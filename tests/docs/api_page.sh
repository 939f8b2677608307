#!/bin/sh
# Checks that docs/api.md and docs/fleet-api.md are what scripts/api_page.py makes of the descriptions.
set -eu
cd "$(dirname "$0")/../.."
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
for interface in "" fleet-; do
    python3 scripts/api_page.py "docs/${interface}openapi.json" "$scratch/api.md"
    diff "$scratch/api.md" "docs/${interface}api.md" || {
        echo "write docs/${interface}api.md anew with: cmake --build --preset native --target interface"
        exit 1
    }
done
