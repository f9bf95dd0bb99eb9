#!/usr/bin/env bash
# Compares the ABI of a shared library with a committed baseline, as distributions check theirs:
# abidw describes the library from its symbols and debugging information (its soname, every exported
# function and variable, and the layout of every type their declarations under HEADERS reach), and
# abidiff reports each difference from the baseline: a symbol added or removed, the soname changed,
# a member, parameter or return type changed, a virtual function added, removed or moved. With
# --update, rewrites the baseline instead.
#
#   check_abi.sh LIBRARY BASELINE HEADERS SUPPRESSIONS [--update]
set -euo pipefail
library=$1
baseline=$2
headers=$3
suppressions=$4

describe() {
    abidw --no-corpus-path --no-comp-dir-path --no-show-locs --type-id-style hash --drop-private-types \
        --headers-dir "$headers" --suppressions "$suppressions" --out-file "$1" "$library"
}

if [ "${5:-}" = "--update" ]; then
    describe "$baseline"
    echo "Wrote $baseline"
    exit 0
fi
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
describe "$work/current.abi"
status=0
abidiff "$baseline" "$work/current.abi" || status=$?
if [ $status -ne 0 ]; then
    cat <<EOT
The ABI of $(basename "$library") differs from $(basename "$baseline") (abidiff exit status $status).
If the change is deliberate, regenerate the baseline and commit it with the change:
    cmake --build --preset dev --target update_exported_abi
EOT
    exit 1
fi
