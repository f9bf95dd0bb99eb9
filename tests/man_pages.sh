#!/usr/bin/env bash
# The man pages fit an 80-column terminal and have the sections a reader looks for: EXAMPLES,
# EXIT STATUS and FILES.
#
#   man_pages.sh PAGE.1.gz...
set -euo pipefail
for page in "$@"; do
    text=$(zcat "$page" | nroff -man -rLL=80n -Tascii 2>/dev/null | col -bx)
    for section in EXAMPLES "EXIT STATUS" FILES; do
        if ! grep -qx "$section" <<<"$text"; then
            echo "$page has no $section section"
            exit 1
        fi
    done
    wide=$(awk 'length($0) > 80 { print length($0) ": " $0 }' <<<"$text")
    if [ -n "$wide" ]; then
        echo "$page has lines wider than 80 columns:"
        echo "$wide"
        exit 1
    fi
done
echo "the man pages fit 80 columns and have their sections"
