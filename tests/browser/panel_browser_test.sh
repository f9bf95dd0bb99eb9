#!/usr/bin/env bash
# The panel in a real headless Chromium, as a person uses it: the demo's sandbox appliance, the
# panel on a free loopback port, then panel_browser_test.py clicks through it and keeps a screenshot
# of each step in SHOTS.
#
#   panel_browser_test.sh ROOT STATE TOOLS SHOTS
set -euo pipefail
root=$1
state=$2
tools=$(cd "$3" && pwd)
shots=$4
here=$(cd "$(dirname "$0")" && pwd)
# Long enough per queue record for the page to show a folder "processing" before it is "finished".
record_milliseconds=2500
# shellcheck source=tools/sandbox_appliance.sh
source "$here/../../tools/sandbox_appliance.sh"
set_up_appliance >/dev/null

mkdir -p "$shots"
coproc panel { exec "$tools/fileindex-panel" --listen 127.0.0.1:0 --token-file "$root/panel.token"; }
panel_pid=$panel_PID
trap 'kill "$panel_pid" 2>/dev/null || true; stop_standin' EXIT
read -r -t 10 url <&"${panel[0]}"
# Debian's Python, which has Debian's selenium (the python3 on PATH may be another one).
/usr/bin/python3 "$here/panel_browser_test.py" "$url" "$shots"
