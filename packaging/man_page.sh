#!/usr/bin/env bash
# Writes a program's man page, gzip-compressed, from the program's own help: help2man turns its
# --help into the page, a COMMANDS section holds the --help of every subcommand, nested ones
# included, and INCLUDE (a help2man include file) adds sections of its own, so that the page always
# says what the program says.
#
#   man_page.sh HELP2MAN PROGRAM SUMMARY VERSION OUTPUT.1.gz [INCLUDE]
set -euo pipefail
help2man=$1
program=$2
summary=$3
version=$4
output=$5
include=${6:-}
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

# Run by its name, so that the usage lines name the program and not the build directory.
name=$(basename "$program")
export PATH="$(dirname "$program"):$PATH"

# The closing paragraph every subcommand's help repeats; the page prints it once, at the top.
footer=$("$name" --help | awk -v RS= 'END { print }')

# The subcommands listed in the help of "PROGRAM WORDS...".
subcommands() {
    "$name" "$@" --help | sed -n '/^Subcommands:$/,/^$/s/^  \([a-z][-a-z]*\) .*/\1/p'
}

# Each subcommand under WORDS..., depth first: a subsection with its help as the program prints it.
describe() {
    local command
    for command in $(subcommands "$@"); do
        echo ".SS \"${*:+$* }$command\""
        echo ".nf"
        "$name" "$@" "$command" --help | awk -v RS= -v footer="$footer" '$0 != footer { print; print "" }' |
            sed -e 's/\\/\\e/g' -e "s/^[.']/\\\\\&&/"
        echo ".fi"
        describe "$@" "$command"
    done
}

includes=()
commands=$(describe)
if [ -n "$commands" ]; then
    printf '[COMMANDS]\n%s\n' "$commands" >"$work/commands.h2m"
    includes+=(--include="$work/commands.h2m")
fi
if [ -n "$include" ]; then
    includes+=(--include="$include")
fi
"$help2man" --no-info --section=1 --name="$summary" --version-string="$version" "${includes[@]}" \
    --output="$work/$name.1" "$name"
gzip -9n <"$work/$name.1" >"$output"
