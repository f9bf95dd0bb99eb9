#!/usr/bin/env bash
# fileindex-demo: a living appliance in the build's sandbox. It sets up two volumes with shares and
# files (an encrypted, a read-only and an excluded share among them, a recycle bin and a snapshot),
# lets the first folder setting start the stand-in for fileindexd through the emulated service
# start, and walks through the work of a management program with fileindexctl, printing every
# command before it runs it. The sandbox stays for exploring afterwards.
#
#   demo.sh ROOT STATE TOOLS
# ROOT is the build's sandbox root (FILEINDEX_ROOT), STATE the emulated platform's state directory
# and TOOLS the directory of fileindexctl and fileindex-standin-daemon; the build's fileindex-demo
# passes them.
set -euo pipefail

if [ $# -ne 3 ] || [ -z "$1" ]; then
    echo "usage: demo.sh ROOT STATE TOOLS (run the build's tools/fileindex-demo; it needs a sandbox root)" >&2
    exit 2
fi
root=$1
state=$2
tools=$(cd "$3" && pwd)
export PATH="$tools:$PATH"
# shellcheck source=tools/sandbox_appliance.sh
source "$(dirname "${BASH_SOURCE[0]}")/sandbox_appliance.sh"

step() {
    printf '\n== %s\n' "$*"
}

# A walk that stops early leaves no daemon behind.
trap 'status=$?; [ "$status" -eq 0 ] || stop_standin; exit "$status"' EXIT

# Prints the command and runs it; a failure ends the walk (exit status 1).
run() {
    printf '$ %s\n' "$*"
    "$@" 2>&1 || {
        printf '(exit status %d: the walk stops here)\n' "$?"
        exit 1
    }
}

# Prints the command and runs it where it is meant to fail, showing its exit status.
run_failing() {
    printf '$ %s\n' "$*"
    local status=0
    "$@" 2>&1 || status=$?
    if [ "$status" -eq 0 ]; then
        printf '(it succeeded, but should have failed: the walk stops here)\n'
        exit 1
    fi
    printf '(exit status %d)\n' "$status"
}

# Prints a shell command line, then runs it in the shell.
run_sh() {
    printf '$ %s\n' "$1"
    bash -c "$1"
}

# Waits up to five seconds for a condition, quietly.
wait_for() {
    for _ in $(seq 50); do
        if bash -c "$1" >/dev/null 2>&1; then
            return 0
        fi
        sleep 0.1
    done
    echo "gave up waiting for: $1" >&2
    return 1
}

printf 'libfileindex demo: a sandbox appliance in %s\n' "$root"
printf 'fileindexctl and the stand-in daemon come from %s\n' "$tools"
set_up_appliance

step "The appliance: two volumes, seven shares (vault encrypted, archive read-only)"
run ls volume1 volume2
run fileindexctl status

step "Add folders: the first one starts fileindexd (the stand-in) through the emulated service start"
run fileindexctl folder add /photo/holiday --name Holiday --photo
run fileindexctl folder add /photo/family --name Family --photo --document
run fileindexctl folder add /music --audio
run fileindexctl folder list --with status,is_valid
run_sh "grep -o '\"op\":\"[^\"]*\"' emulation/journal.jsonl | sort | uniq -c"
run fileindexctl status --watch --interval 0.2

step "Pause: new work waits in the queues"
run fileindexctl pause --hours 2
run fileindexctl folder add /video --name Films --video
run fileindexctl reindex /photo/holiday
run cat fileindexd-commands.jsonl
run cat volume1/video/@eaDir/VEXO@file_index_queue volume1/photo/@eaDir/VEXO@file_index_queue
run fileindexctl status

step "Resume: the daemon takes each queue, works through its records and removes it"
run fileindexctl resume
run fileindexctl status --watch --interval 0.2
run cat volume1/video/@eaDir/VEXO@.fileindexdb/index.jsonl

step "What may be indexed, and which rule refuses what may not (check exits 3 when a path may not be)"
run_failing fileindexctl check /photo /photo/holiday /photo/#recycle /photo/#snapshot/GMT+00-2024.06.01 /photo/latest \
    /photo/usb /photo/@eaDir /docs/cdrom /vault /archive /surveillance/cam1 /nosuch/folder

step "Another process holds the folder list's lock: --wait 0 gives up at once (status 75, naming the holder), the default waits"
run_sh "flock tmp/fileidx_cfg_folder.lock sleep 2 &"
wait_for "! flock -n tmp/fileidx_cfg_folder.lock true"
run_failing fileindexctl folder set /music --name Albums --wait 0
run fileindexctl folder set /music --name Albums --document off

step "music runs out of space: the daemon marks it and the administrators are told"
run_sh "sed -i 's#^{#{\"VEXOQuotaIsEnough\": [{\"match\": \"$root/volume2/music\", \"result\": 0, \"error\": 10496}],\\n #' emulation/faults.json"
run fileindexctl reindex /music
wait_for "fileindexctl share space music | grep -q marked"
run fileindexctl share space music
run fileindexctl status /music
run cat notifications.log

step "Space is freed: revive the share and let the daemon finish"
run_sh "sed -i 's#^{\"VEXOQuotaIsEnough\".*#{#' emulation/faults.json"
run fileindexctl share revive music
run fileindexctl status --watch --interval 0.2

step "Pause and resume one share, then an upgrade brings everything in line"
run fileindexctl share pause photo
run fileindexctl share resume photo
run fileindexctl upgrade
run fileindexctl status --watch --interval 0.2

step "The video share is renamed films, then the docs share goes"
run mv volume1/video volume1/films
run_sh "sed -i 's#\"video\", \"path\": \"\\(.*\\)/video\"#\"films\", \"path\": \"\\1/films\"#' emulation/shares.json"
run fileindexctl share rename video films
run fileindexctl folder add /docs --document
run fileindexctl share remove docs
run fileindexctl folder list --sort name --with status

step "Remove folders until none is left: fileindexd stops and Spotlight goes off"
run fileindexctl folder remove /photo/holiday /photo/family
run ls -lA volume1/photo/@eaDir
run fileindexctl folder remove /music /films
run cat emulation/services.json emulation/smb.json
run fileindexctl folder list

step "The sandbox stays: explore it with fileindexctl"
cat <<EOF
  export PATH="$tools:\$PATH"; cd "$root"
  fileindexctl folder add /photo/holiday --photo    # starts the stand-in daemon again
  fileindexctl status --watch
  fileindexctl check /photo/#recycle
  fileindexctl folder list --with status,is_valid --json
  fileindexctl --help
The frames the daemon received are in fileindexd-commands.jsonl, the platform's calls in
emulation/journal.jsonl. The next run of the demo sets this sandbox up afresh.
EOF

# On a terminal the appliance stays up with its web panel until Ctrl-C; elsewhere (CI) the walk
# ends here.
if [ -t 0 ] && [ -t 1 ]; then
    step "The web panel: the same appliance in a browser (Ctrl-C ends it)"
    run fileindexctl folder add /photo/family /music --photo --audio
    printf 'Open the address below (it carries the panel'"'"'s token, kept in %s):\n' \
        "$root/usr/vexo/etc/fileindex/panel.token"
    status=0
    fileindex-panel --listen 127.0.0.1:8642 || status=$?
    stop_standin
    [ "$status" -eq 0 ] || printf '(fileindex-panel ended with status %d; is port 8642 taken? Stop the other panel, then run the demo again)\n' "$status"
fi
