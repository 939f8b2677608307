#!/bin/sh
# Checks that docs/api.md is what scripts/api_page.py makes of docs/openapi.json.
set -eu
cd "$(dirname "$0")/../.."
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
python3 scripts/api_page.py docs/openapi.json "$scratch/api.md"
diff "$scratch/api.md" docs/api.md || {
    echo "write docs/api.md anew with: cmake --build --preset native --target interface"
    exit 1
}
