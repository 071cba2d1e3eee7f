#!/usr/bin/env bats
# What veskpin status tells: volumes, bitmaps and drivers as they are, the service's threads from
# outside, the queue without taking a message.

load lib

setup_file() { make_volume 1 64M 16M ext4; }

setup() {
    fresh_volume
    random a 200K conv=fsync
}

volume() { answer ".volumes[0].$1" -r; }
service() { answer ".services[0].$1" -r; }

@test "without service, queue and configuration all of that is absent, and nothing is made" {
    look 0 status
    same '[]' "$(answer .services)"
    same '[null,null,0,[]]' "$(answer '[.queue,.queuedMessages,.storedRequests,.errors]')"
    same '["/volume1",0,0,null,128,0,0,false]' "$(answer '.volumes[0] |
        [.volume,.files,.requests,.bitmapBytes,.bitmapBytesNeeded,.blocksMarked,.blocksHeld,.held]')"
    [ ! -e "$KEY_FILE" ] && [ ! -e "$CONF" ] && [ ! -e "$(bitmap_file 1)" ]
    [ ! -e /run/veskpin ]
}

@test "a volume's figures are those of its devices, its bitmap and its records" {
    start_service
    pin 1 /volume1/a
    look 0 status
    same "$(volume_uuid 1)" "$(volume uuid)"
    same "$(volume_device 1)" "$(volume cacheDevice)"
    same /tmp/volume1/ssd "$(volume ssd)"
    same "$((64 * 1024 * 1024))" "$(volume deviceBytes)"
    same "$(volume_state 1 slots)" "$(volume ssdBlocks)"
    same "$(stat -c %s "$(bitmap_file 1)")" "$(volume bitmapBytes)"
    same "$(tool --get-bitmap-size-byte --mount-path /volume1)" "$(volume bitmapBytesNeeded)"
    same "$(bitmap_blocks 1 | wc -l)" "$(volume blocksMarked)"
    same "$(volume_state 1 pinnedBlocks)" "$(volume blocksHeld)"
    same '[true,true,false,1,0]' \
        "$(answer '.volumes[0] | [.supportsPin,.driverHasBitmap,.allUnpinned,.files,.requests]')"
    stop_service
}

@test "for people the same stands in a table" {
    start_service
    pin 1 /volume1/a
    local size
    size="$(($(bitmap_blocks 1 | wc -l) * 64)) KiB"
    shows 0 status <<END
Service $SERVICE_PID: receiver waiting, worker waiting, configuration $CONF
Queue $(ipcs -q | awk '/^0x/ { print $2 }') of user 0: 0 messages waiting
Configuration $CONF: 0 requests stored

VOLUME         FILES  REQUESTS    MARKED      HELD       SSD  OF DEVICE     STATE
/volume1           1         0   $size   $size    16 MiB  64 MiB        pinning
END
    stop_service
}

@test "a service that rests waits, one with a stored request is busy" {
    start_service
    wait_until service_rests
    look 0 status
    same "[$SERVICE_PID,\"$CONF\",\"waiting\",\"waiting\",[]]" \
        "$(answer '.services[0] | [.pid,.config,.receiver,.worker,.otherNamespaces]')"
    set_pending /volume1
    tool --pin-files /volume1/a --mount-path /volume1
    wait_until request_is_stored 0
    wait_until receiver_waits
    look 0 status
    same '["waiting","busy",1,1]' \
        "$(answer '[.services[0].receiver,.services[0].worker,.storedRequests,.volumes[0].requests]')"
    # A volume that veskpin holds has nothing that could be carried out.
    mkdir /run/veskpin
    : >"/run/veskpin/$(volume_uuid 1).hold"
    look 0 status
    same '["waiting",true]' "$(answer '[.services[0].worker,.volumes[0].held]')"
    rm -r /run/veskpin
    end_pending /volume1
    wait_until queue_is_empty
    stop_service
}

@test "a receiver that has ended is told from the threads that live on" {
    start_service
    tool --pin-files /volume1/a --mount-path /volume1
    wait_until queue_is_empty
    send_record 1 "" /volume1/a
    wait_until receiver_has_ended
    look 0 status
    same "[$SERVICE_PID,\"$CONF\",\"ended\",\"waiting\"]" \
        "$(answer '.services[0] | [.pid,.config,.receiver,.worker]')"
    stop_service
}

worker_has_ended() {
    find_worker
    [ -z "$WORKER_THREAD" ]
}

worker_is_told_ended() {
    look 0 status && [ "$(service worker)" = ended ]
}

@test "a worker that has ended is told" {
    put_config '{"requestQueue":["0"],"requests":{"0":{"type":"x","mountPath":"/volume1","data":""}}}'
    start_service
    wait_until worker_has_ended
    # Of a process that has just begun nobody can say that a thread is not to come yet.
    put_config '{}'
    wait_until worker_is_told_ended
    same waiting "$(service receiver)"
    stop_service
}

@test "messages that nobody takes are counted and stay" {
    tool --pin-files /volume1/a --mount-path /volume1
    tool --unpin-files /volume1/a --mount-path /volume1
    look 0 status
    same '[2,0,3080]' "$(answer '[.queuedMessages,.queue.owner,.queue.bytes]')"
    waiting_is 2
}

@test "a service of another IPC namespace is told apart, and takes no message from here" {
    (
        close_descriptors
        exec unshare --ipc "$BIN/veskcachepinfiletool" --start-service --config-path "$CONF"
    ) >/dev/null 2>&1 &
    SERVICE_PID=$!
    other_service_is_there() { look 0 status && [ "$(service otherNamespaces)" = '["ipc"]' ]; }
    wait_until other_service_is_there
    same "$SERVICE_PID" "$(service pid)"
    stop_service_by TERM
}

@test "a service of another mount namespace is told apart, and its own configuration looked at" {
    put_config '{}'
    (
        close_descriptors
        # shellcheck disable=SC2016
        exec unshare --mount sh -c 'mount -t tmpfs none /run/pin && exec "$0" "$@"' \
            "$BIN/veskcachepinfiletool" --start-service --config-path "$CONF"
    ) >/dev/null 2>&1 &
    SERVICE_PID=$!
    wait_until service_is_ready
    set_pending /volume1
    tool --pin-files /volume1/a --mount-path /volume1
    its_request_is_seen() { look 0 status && [ "$(service worker)" = busy ]; }
    wait_until its_request_is_seen
    same '["mnt"]' "$(service otherNamespaces)"
    same 0 "$(answer .storedRequests)"
    stop_service_by TERM
}

@test "a program of root's that is called by the tool's name is no service" {
    ln -s "$(command -v dash)" /tmp/veskcachepinfiletool
    mkfifo /tmp/nobody-writes
    (
        close_descriptors
        exec /tmp/veskcachepinfiletool -c 'read -r line </tmp/nobody-writes' --start-service
    ) >/dev/null 2>&1 &
    SERVICE_PID=$!
    name_is_the_tools() { [ "$(cat "/proc/$SERVICE_PID/comm")" = veskcachepinfil ]; }
    wait_until name_is_the_tools
    look 0 status
    same '[]' "$(answer .services)"
    is_child "$SERVICE_PID"
    kill "$SERVICE_PID"
    wait "$SERVICE_PID" || true
    SERVICE_PID=
}

@test "the trouble of one volume is none of another's answer" {
    local spare
    make_volume 2 64M 16M ext4
    spare=$(volume_device 2)
    umount "${spare%/*}" -l
    look 3 status
    look 0 status /volume1
    same '[]' "$(answer .errors)"
    look 3 status /volume2
    umount -l /volume2
    rm -r /tmp/volume2
    volume_configure
}

@test "options may be cut short and the configuration relative, as the tool takes them" {
    cd /run
    (
        close_descriptors
        exec "$BIN/veskcachepinfiletool" --start-serv --config=pin/config.json
    ) >/dev/null 2>&1 &
    SERVICE_PID=$!
    wait_until service_is_ready
    look 0 status
    same "\"$CONF\"" "$(answer '.services[0].config')"
    stop_service
}

@test "a volume without a cache and a folder that is none cannot be looked at" {
    mkdir -p /volume3
    look 3 status /volume3
    same '[[],"is no volume"]' "$(answer '[.volumes,.errors[0].text]')"
    look 3 status /volume1 /volume3
    same '["/volume1"]' "$(answer '[.volumes[].volume]')"
    printf '{"caches":[]}\n' >"$VESK_FLASHCACHE_CONFIG"
    look 3 status /volume1
    same '"has no cache"' "$(answer '.errors[0].text')"
    look 0 status
    same '[]' "$(answer .volumes)"
    volume_configure
}

@test "records of a volume that is not there are shown without its figures" {
    put_config '{"volumes":{"/volume4":{"files":{"12":"a"}}}}'
    look 0 status
    same '["/volume4",1,null,null]' \
        "$(answer '.volumes[] | select(.volume == "/volume4") | [.volume,.files,.uuid,.blocksMarked]')"
}

@test "a list of caches that cannot be read makes unknown what it would have told" {
    echo '{' >"$VESK_FLASHCACHE_CONFIG"
    look 3 status
    same '["/volume1",null,null]' \
        "$(answer '.volumes[] | select(.volume == "/volume1") | [.volume,.supportsPin,.ssd]')"
    volume_configure
}

@test "a damaged configuration is told, and stays as it was" {
    put_config '{"volumes":'
    look 3 status
    same '[null,null,null]' "$(answer '[.storedRequests,.volumes[0].files,.volumes[0].requests]')"
    same '{"volumes":' "$(cat "$CONF")"
    put_config '{"volumes":{"/volume1":{"files":{"12":"a","x":"b","13":[]}},"/volume2":7},"requestQueue":{}}'
    look 3 status
    same '[1,null,null]' "$(answer '[.volumes[0].files,.volumes[1].files,.storedRequests]')"
    put_config '{"volumes":{"/volume1":{"files":{"12":"a","x":"b","13":[]}}}}'
    look 0 status
    same '[1,2]' "$(answer '[.volumes[0].files,(.errors | length)]')"
}

@test "a bitmap of the wrong length is shown as far as it counts" {
    tool --set-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 256
    truncate -s 5 "$(bitmap_file 1)"
    look 0 status
    same '[5,128,2,[]]' "$(answer '[(.volumes[0] | .bitmapBytes,.bitmapBytesNeeded,.blocksMarked),.errors]')"
    truncate -s 500 "$(bitmap_file 1)"
    look 0 status
    same '[500,128,2]' "$(answer '.volumes[0] | [.bitmapBytes,.bitmapBytesNeeded,.blocksMarked]')"
    same "\"$(bitmap_file 1)\"" "$(answer '.errors[0].path')"
}

@test "what lies in the bitmap's place is neither followed nor waited for" {
    ln -s /etc/passwd "$(bitmap_file 1)"
    look 3 status
    same null "$(volume blocksMarked)"
    rm "$(bitmap_file 1)"
    mkfifo "$(bitmap_file 1)"
    look 3 status
    same null "$(volume blocksMarked)"
}

@test "a dead cache device is unknown, not unpinned" {
    local spare
    spare=$(spare_device spare 64M)
    map_cache "$(volume_uuid 1)" "$spare"
    look 0 status
    umount "${spare%/*}"
    look 3 status
    same '[null,null,null]' "$(answer '.volumes[0] | [.deviceBytes,.driverHasBitmap,.allUnpinned]')"
    volume_configure
}

@test "who may not look is told so and gets no answer that could be wrong" {
    start_service
    pin 1 /volume1/a
    chmod 600 "$CONF"
    local status=0
    setpriv --reuid=65534 --regid=65534 --clear-groups \
        "$BIN/veskpin" --config "$CONF" --json status >"$ANSWER" || status=$?
    same 3 "$status"
    check_schema status
    same '[null,null]' "$(answer '[.storedRequests,.services[0].receiver]')"
    same 0 "$(answer '[.volumes[] | select(.driverHasBitmap != null or .blocksMarked != null)] | length')"
    [ "$(answer '.errors | length')" -gt 0 ]
    stop_service
}
