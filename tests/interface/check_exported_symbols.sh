#!/usr/bin/env bash
# Compares the soname and the exported symbols of a shared library (demangled, each with its nm type
# letter) with a committed list; with --update, rewrites the list instead.
#
#   check_exported_symbols.sh LIBRARY LIST [--update]
set -euo pipefail
library=$1
list=$2

exported() {
    echo "SONAME $(objdump -p "$library" | awk '$1 == "SONAME" { print $2 }')"
    nm -D --defined-only --demangle "$library" | cut -d' ' -f2- | LC_ALL=C sort
}

if [ "${3:-}" = "--update" ]; then
    exported >"$list"
    echo "Wrote $list"
    exit 0
fi
if ! diff -u --label "committed $(basename "$list")" --label "exported by $(basename "$library")" "$list" <(exported); then
    cat <<EOT
The interface of the library changed: lines with - are in the committed list, lines with + are
what the library exports now. If the change is deliberate, regenerate the list and commit it:
    cmake --build --preset dev --target update_exported_symbols
EOT
    exit 1
fi
