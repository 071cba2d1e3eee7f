#!/usr/bin/env bats
# The packaged units, run by a systemd as process 1: see scripts/lib/systemd-root. The packages are installed.

TREE=$BATS_TEST_DIRNAME/../..
export BIN=/usr/bin
# shellcheck source=../../scripts/lib/volume.bash
. "$TREE/scripts/lib/volume.bash"
# shellcheck source=lib.bash
. "$BATS_TEST_DIRNAME/lib.bash"
export VESK_FLASHCACHE_CONFIG=/etc/veskflashcache.json
UNIT=veskcachepinfiletool.service
WATCH=veskcachepinfiletool-watch.service
HOOK=veskcachepinfiletool-volume@volume1.service
KEY_FILE=/run/veskcachepinfile-msg-server.key
DOCUMENT=/var/lib/veskcachepinfiletool/pins.json
RECORDS='{"volumes":{"/volume1":{"files":{"12":"a"}}}}'

setup_file() {
    mkdir -p /volume1
    alone volume_make 1 64M 16M ext4
    umount /volume1
}

# By a node that is not in /dev: systemd would wait for udev, which is not here, to tell of the device.
mount_volume() {
    local loop
    ! mountpoint -q /volume1 || return 0
    loop=$(losetup --find --show "$(volume_device 1)")
    rm -f /run/volume1.node
    mknod /run/volume1.node b 7 "${loop#/dev/loop}"
    mount /run/volume1.node /volume1
    losetup --detach "$loop"
}

setup() {
    volume_configure
    mount_volume
}

teardown() {
    systemctl stop "$UNIT" "$HOOK"
    systemctl reset-failed
    rm -rf /run/systemd/system/veskcache*.d "$DOCUMENT" "$DOCUMENT".before*
    systemctl daemon-reload
    awk 'NR > 1 { print $2 }' /proc/sysvipc/msg | xargs -r -n 1 ipcrm -q
    rm -f "$KEY_FILE"
}

teardown_file() {
    umount /volume1
    umount "$(dirname "$(volume_device 1)")"
}

await() { # SECONDS COMMAND...
    local end=$((SECONDS + $1))
    shift
    until "$@"; do
        [ "$SECONDS" -lt "$end" ] || { echo "in vain: $*"; log; return 1; }
        sleep 0.1
    done
}
refute() { if "$@"; then echo "succeeded: $*"; return 1; fi; }
log() { journalctl --no-pager -n 40 -o cat; }
state() { systemctl show --property ActiveState --value "$1"; }
active() { [ "$(state "$1")" = active ]; }
inactive() { [ "$(state "$1")" = inactive ]; }
main_pid() { systemctl show --property MainPID --value "$UNIT"; }
is_new() { [ "$(state "$UNIT")" = active ] && [ "$(main_pid)" != "$1" ]; }
receiver_ended() { grep -q '^State:.*Z' "/proc/$(main_pid)/status"; }
waiting() { awk 'NR > 1 { n += $5 } END { print n + 0 }' /proc/sysvipc/msg; }
is_waiting() { [ "$(waiting)" = "$1" ]; }
logged() { journalctl --no-pager -o cat | grep -qF -e "$1"; }
recorded() { jq -e --arg name "$1" '.volumes["/volume1"].files | to_entries | any(.value == $name)' "$DOCUMENT"; } >/dev/null 2>&1
not_recorded() { ! recorded "$1"; }

# user COMMAND...: as one without rights.
user() { setpriv --reuid=1234 --regid=1234 --clear-groups "$@"; }


# queue_of_user KEY: a message queue that an ordinary user has made.
queue_of_user() { user perl -e 'exit(!defined(msgget(shift, 01666)))' -- "$1"; }
keys_of_user() { awk '$8 == 1234 { print $1 }' /proc/sysvipc/msg; }

# Sends while nobody receives.
send_reload() { veskcachepinfiletool --reload-blocks --mount-path /volume1; }
send_file_that_goes() {
    echo text >/volume1/gone
    veskcachepinfiletool --pin-files /volume1/gone --mount-path /volume1
    rm /volume1/gone
}

put_document() { install -d -m 700 "${DOCUMENT%/*}" && printf '%s\n' "$1" >"$DOCUMENT"; }

@test "the service starts, pins, is watched, and starts again" {
    local pid
    systemctl start "$UNIT"
    [ "$(state "$WATCH")" = active ]
    echo text >/volume1/file
    veskcachepinfiletool --pin-files /volume1/file --mount-path /volume1
    await 20 recorded file
    [ "$(stat -c %a "$KEY_FILE")" = 644 ]
    pid=$(main_pid)
    kill -KILL "$pid"
    await 20 is_new "$pid"
    await 20 active "$WATCH"
    pid=$(main_pid)
    systemctl restart "$UNIT"
    is_new "$pid"
    await 20 active "$WATCH"
}

@test "queues of a user, at the written key and at the one that is tried, go before the start" {
    : >"$KEY_FILE"
    queue_of_user $((0x78 << 24 | ($(stat -c %d "$KEY_FILE") & 0xff) << 16 | ($(stat -c %i "$KEY_FILE") & 0xffff)))
    echo -n 77777 >"$KEY_FILE"
    queue_of_user 77777
    queue_of_user 88888
    systemctl start "$UNIT"
    [ "$(keys_of_user)" = 88888 ]
    refute receiver_ended
    send_reload
    await 20 is_waiting 0
}

@test "a receiver that has ended is noticed within ten seconds, and the service restarted" {
    local pid
    send_file_that_goes
    systemctl start "$UNIT"
    pid=$(main_pid)
    await 10 is_new "$pid"
    logged "$UNIT takes no more requests: it is restarted"
    refute receiver_ended
}

@test "but not while the document cannot be used: nothing is taken off the queue" {
    local pid
    systemctl start "$UNIT"
    pid=$(main_pid)
    put_document '{"volumes":'
    send_reload
    await 10 receiver_ended
    send_reload
    await 10 logged "$UNIT takes no more requests, and is not restarted: $DOCUMENT cannot be read, or is damaged"
    [ "$(main_pid)" = "$pid" ]
    systemctl stop "$UNIT"
    refute systemctl start "$UNIT"
    [ "$(waiting)" = 1 ]
    put_document '{}'
    await 20 is_new 0
    await 20 is_waiting 0
}

@test "the service is not started before the volume of a stored request is mounted" {
    put_document '{"nextRequestNum":1,"requestQueue":["0"],"requests":{"0":{"data":null,"mountPath":"/volume1","type":"reloadPinBlocks"}},"volumes":{"/volume1":{"files":{"12":"a"}}}}'
    umount /volume1
    refute systemctl start "$UNIT"
    logged "/volume1: it cannot be known whether its cache supports pinning:"
    recorded a
    mount_volume
    await 20 is_new 0
    recorded a
}

@test "the hook hands over the bitmap and asks for the blocks" {
    veskcachepinfiletool --set-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 128
    veskcachepinfiletool --unpin-all --mount-path /volume1
    [ "$(veskcachepinfiletool --check-bitmap --mount-path /volume1)" = No ]
    systemctl start "$HOOK"
    [ "$(veskcachepinfiletool --check-bitmap --mount-path /volume1)" = Yes ]
    [ "$(state "$UNIT")" = active ]
    umount /volume1
    await 10 inactive "$HOOK"
}

@test "the hook fails and keeps the records when the list of caches cannot be read" {
    put_document "$RECORDS"
    echo '{"caches":[' >"$VESK_FLASHCACHE_CONFIG"
    refute systemctl start "$HOOK"
    recorded a
}

@test "the hook fails and keeps the records when the device does not answer" {
    put_document "$RECORDS"
    sed -i 's,"cachePath":"[^"]*","cachePath":"/run/none",' "$VESK_FLASHCACHE_CONFIG"
    refute systemctl start "$HOOK"
    recorded a
}

@test "the hook removes the records of a volume without a cache, and keeps a copy" {
    put_document "$RECORDS"
    echo '{"caches":[]}' >"$VESK_FLASHCACHE_CONFIG"
    systemctl start "$HOOK"
    refute recorded a
    [ "$(cat "$DOCUMENT.before-volume1")" = "$RECORDS" ]
}

# drop_in UNIT LINE...: of its section [Service].
drop_in() {
    mkdir -p "/run/systemd/system/$1.d"
    printf '%s\n' '[Service]' "${@:2}" >"/run/systemd/system/$1.d/test.conf"
    systemctl daemon-reload
}

@test "an emulated device does without the capabilities of real drivers" {
    drop_in "$UNIT" "CapabilityBoundingSet=~CAP_SYS_ADMIN CAP_SYS_RAWIO"
    drop_in veskcachepinfiletool-volume@.service "CapabilityBoundingSet=~CAP_SYS_ADMIN CAP_SYS_RAWIO"
    systemctl start "$HOOK"
    echo text >/volume1/few
    veskcachepinfiletool --pin-files /volume1/few --mount-path /volume1
    await 20 recorded few
    veskcachepinfiletool --unpin-files /volume1/few --mount-path /volume1
    await 20 not_recorded few
}

is_stopped() { grep -q '^State:.*T' "/proc/$1/status"; }

@test "a service that stands in one look is noticed from inside the watch's sandbox, and restarted" {
    local pid device=/run/stand/cachedev stand
    drop_in "$WATCH" Environment=VESK_WATCH_SECONDS=4
    mkdir -p /run/stand /volume1/user
    truncate -s 4M /tmp/stand.backing /tmp/stand.ssd
    alone veskcachedev --device "$device" --backing /tmp/stand.backing --ssd /tmp/stand.ssd
    mount --bind /run/stand /volume1/user
    stand=$(jq .pid "$device.json")
    veskcachepinfiletool --pin-files /volume1/user/cachedev --mount-path /volume1
    kill -STOP "$stand"
    await 10 is_stopped "$stand"
    systemctl start "$UNIT"
    pid=$(main_pid)
    await 20 is_new "$pid"
    logged "$UNIT has stood in one look for a minute: it is restarted"
    kill -CONT "$stand"
    umount /volume1/user /run/stand
    send_reload
    await 20 is_waiting 0
}

queues() { awk 'NR > 1' /proc/sysvipc/msg; }
inside() { nsenter --ipc="/proc/$(main_pid)/ns/ipc" "$@"; }

@test "with an IPC namespace of their own, service, hook and clients meet, and nobody else sees the queue" {
    local unit example=$TREE/packaging/systemd/private-ipc pid
    cp "$example/veskcachepinfiletool-ipc.service" /run/systemd/system/
    for unit in "$UNIT" veskcachepinfiletool-volume@.service; do
        mkdir -p "/run/systemd/system/$unit.d"
        cp "$example/private-ipc.conf" "/run/systemd/system/$unit.d/"
    done
    # The limit belongs to the namespace.
    mkdir -p /run/systemd/system/veskcachepinfiletool-ipc.service.d
    printf '[Service]\nExecStart=/bin/sh -c "echo 1576960 >/proc/sys/kernel/msgmnb"\n' \
        >/run/systemd/system/veskcachepinfiletool-ipc.service.d/limit.conf
    systemctl daemon-reload
    systemctl start "$HOOK"
    [ "$(queues)" = "" ]
    [ "$(inside awk 'NR > 1' /proc/sysvipc/msg | wc -l)" = 1 ]
    echo text >/volume1/inside
    inside veskcachepinfiletool --pin-files /volume1/inside --mount-path /volume1
    await 20 recorded inside
    # The namespace outlives the service.
    inside setpriv --reuid=1234 --clear-groups perl -e 'msgget(1, 01666)'
    pid=$(main_pid)
    systemctl restart "$UNIT"
    [ "$(main_pid)" != "$pid" ]
    [ "$(inside awk 'NR > 1' /proc/sysvipc/msg | wc -l)" = 2 ]
    refute receiver_ended
    systemctl stop "$UNIT" "$HOOK" veskcachepinfiletool-ipc.service
    rm -r /run/systemd/system/veskcachepinfiletool-ipc.service*
}
