# The demo's sandbox appliance, for demo.sh, the panel's browser test and the README's explore check
# (sourced by each). They set root (the build's sandbox root), state (the emulated platform's state
# directory) and tools (the directory of the build's programs) first; record_milliseconds, when set,
# is how long the stand-in daemon takes for one queue record (300 ms otherwise). The explore check
# only stops the stand-in.

# Ends the stand-in daemon that the emulated service start launched, if it still runs.
stop_standin() {
    local pid
    pid=$(sed -n 's/.*"fileindexd":{[^}]*"pid":\([0-9]*\).*/\1/p' "$state/services.json" 2>/dev/null || true)
    if [ -n "$pid" ] && grep -qs fileindex-standin-daemon "/proc/$pid/cmdline"; then
        kill "$pid" 2>/dev/null || true
    fi
}

# A sandbox appliance: the directories of its fixed files, the shares of the emulated share
# database with a few files each, the administrators' notification tool, and the stand-in daemon as
# the command of the "fileindexd" service.
set_up_appliance() {
    stop_standin  # one left running by an interrupted walk
    mkdir -p "$root"
    find "$root" -mindepth 1 -maxdepth 1 -exec rm -rf {} +
    mkdir -p "$root/usr/vexo/etc/fileindex" "$root/usr/vexo/bin" "$root/tmp" "$root/var/run" "$state"

    cd "$root"
    mkdir -p volume1/photo/holiday volume1/photo/family volume1/photo/usb volume1/photo/#recycle \
        volume1/photo/#snapshot/GMT+00-2024.06.01/holiday volume1/video/films volume1/docs/cdrom \
        volume2/music/albums volume2/vault volume2/archive volume2/surveillance/cam1
    touch volume1/photo/holiday/beach.jpg volume1/photo/holiday/sunset.jpg volume1/photo/family/birthday.jpg \
        volume1/photo/#recycle/blurred.jpg volume1/photo/#snapshot/GMT+00-2024.06.01/holiday/beach.jpg \
        volume1/video/films/harbour.mp4 volume1/docs/manual.pdf volume2/music/albums/overture.flac \
        volume2/vault/keys.txt volume2/archive/2019.tar
    ln -s holiday volume1/photo/latest

    cat >emulation/shares.json <<EOF
[
  {"name": "photo", "path": "$root/volume1/photo"},
  {"name": "video", "path": "$root/volume1/video"},
  {"name": "docs", "path": "$root/volume1/docs"},
  {"name": "music", "path": "$root/volume2/music"},
  {"name": "vault", "path": "$root/volume2/vault", "encrypted": true, "uses_encryption": true},
  {"name": "archive", "path": "$root/volume2/archive", "read_only": true},
  {"name": "surveillance", "path": "$root/volume2/surveillance"}
]
EOF
    # A USB disk mounted inside photo and a CD image inside docs, as the platform would report them.
    cat >emulation/faults.json <<EOF
{"VEXOFSDirIsMntPoint": [{"match": "$root/volume1/photo/usb", "result": 1}],
 "VEXOGetFSType": [{"match": "$root/volume1/docs/cdrom", "result": 10}]}
EOF
    # The service's start returns once the daemon listens on its socket.
    cat >emulation/service_commands.json <<EOF
{"fileindexd": {"command": ["$tools/fileindex-standin-daemon", "--output", "$root/fileindexd-commands.jsonl",
                            "--process-queues", "--record-time", "${record_milliseconds:-300}"],
                "ready": "$root/var/run/fileindexd.sock"}}
EOF
    cat >usr/vexo/bin/vexohvxnotify <<EOF
#!/bin/sh
echo "\$*" >>"$root/notifications.log"
EOF
    chmod 755 usr/vexo/bin/vexohvxnotify
}
