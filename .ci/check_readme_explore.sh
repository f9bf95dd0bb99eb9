#!/usr/bin/env bash
# Runs the README's explore commands, as a reader would after the README's two commands: the
# fenced block that follows the README's `export PATH=...` line, each command in the sandbox the
# demo left. A command fails the check when it exits non-zero or runs longer than 60 seconds, except
# that `fileindexctl check` answers with 3 (may not be indexed) and 4 (does not resolve). The
# stand-in daemon the commands start is stopped at the end.
#
#   check_readme_explore.sh      (from the top of the source tree, after ./dev.sh demo)
set -euo pipefail
cd "$(dirname "$0")/.."

export_line=$(grep -m1 -o 'export PATH="\$PWD/[^"]*:\$PATH"' README.md) || {
    echo "README.md has no 'export PATH=\"\$PWD/...:\$PATH\"' line before its explore commands" >&2
    exit 1
}
eval "$export_line"
tools=${PATH%%:*}
root=$(dirname "$tools")/root
mapfile -t commands < <(awk -v line="$export_line" '
    index($0, line) { found = 1; next }
    found && /^```sh$/ { inside = 1; next }
    inside && /^```$/ { exit }
    inside { sub(/[[:space:]]+#.*$/, ""); if ($0 != "") print }' README.md)
if [ ${#commands[@]} -eq 0 ]; then
    echo "README.md has no sh block after its export PATH line" >&2
    exit 1
fi

# The demo's sandbox appliance, whose stop_standin ends the stand-in daemon.
state=$root/emulation
# shellcheck source=tools/sandbox_appliance.sh
source tools/sandbox_appliance.sh
trap stop_standin EXIT

failed=0
for command in "${commands[@]}"; do
    echo "\$ $command"
    status=0
    timeout 60 bash -c "$command" </dev/null || status=$?
    if [ "$status" -eq 0 ]; then
        continue
    elif [[ $command == "fileindexctl check "* ]] && { [ "$status" -eq 3 ] || [ "$status" -eq 4 ]; }; then
        echo "(exit status $status: the answer of check)"
        continue
    fi
    [ "$status" -eq 124 ] && status="124, timed out"
    echo "README explore command failed (exit status $status): $command" >&2
    failed=1
done
exit $failed
