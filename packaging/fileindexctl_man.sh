#!/usr/bin/env bash
# Writes fileindexctl's man page, gzip-compressed, from the tool's own help: help2man turns the
# top-level --help and --version into the page, and a COMMANDS section holds the --help of every
# subcommand, nested ones included, so that the page always says what the tool says.
#
#   fileindexctl_man.sh HELP2MAN TOOL OUTPUT.1.gz
set -euo pipefail
help2man=$1
tool=$2
output=$3
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

# The closing paragraph every subcommand's help repeats; the page prints it once, at the top.
footer=$("$tool" --help | awk -v RS= 'END { print }')

# The subcommands listed in the help of "fileindexctl WORDS...".
subcommands() {
    "$tool" "$@" --help | sed -n '/^Subcommands:$/,/^$/s/^  \([a-z][-a-z]*\) .*/\1/p'
}

# Each subcommand under WORDS..., depth first: a subsection with its help as the tool prints it.
describe() {
    local command
    for command in $(subcommands "$@"); do
        echo ".SS \"${*:+$* }$command\""
        echo ".nf"
        "$tool" "$@" "$command" --help | awk -v RS= -v footer="$footer" '$0 != footer { print; print "" }' |
            sed -e 's/\\/\\e/g' -e "s/^[.']/\\\\\&&/"
        echo ".fi"
        describe "$@" "$command"
    done
}

{
    echo "[COMMANDS]"
    describe
} >"$work/commands.h2m"
"$help2man" --no-info --section=1 --name="show and change the appliance's file index" \
    --include="$work/commands.h2m" --output="$work/fileindexctl.1" "$tool"
gzip -9n <"$work/fileindexctl.1" >"$output"
