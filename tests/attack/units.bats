#!/usr/bin/env bats
# What the packaged units run beside the tool, where users have been before them. Under a real systemd:
# tests/package/units.bats.

load lib

setup_file() { make_volume 1 64M 16M ext4; }

setup() {
    fresh_volume
    mkdir -p /tmp/bin
    # They find each other, and the tool, by their names.
    PATH=/tmp/bin:$(readlink -f "$BATS_TEST_DIRNAME/../../packaging/libexec"):$BIN:$PATH
}

RECORDS='{"volumes":{"/volume1":{"files":{"12":"a"}}}}'

# user_queue KEY: a queue that the attacker has made, everybody may use it.
user_queue() { attacker perl -e 'exit(!defined(msgget(shift, 01666)))' -- "$1"; }
root_queue() { perl -e 'exit(!defined(msgget(shift, 01644)))' -- "$1"; }
keys() { awk 'NR > 1 { print $1 ":" $10 }' /proc/sysvipc/msg | sort -n; }
tried_key() {
    : >>"$KEY_FILE"
    echo $((0x78 << 24 | ($(stat -c %d "$KEY_FILE") & 0xff) << 16 | ($(stat -c %i "$KEY_FILE") & 0xffff)))
}
remove_all_queues() { awk 'NR > 1 { print $2 }' /proc/sysvipc/msg | xargs -r -n 1 ipcrm -q; }

@test "a user's queues at the written and at the tried key go, every other one stays" {
    local tried
    tried=$(tried_key)
    user_queue "$tried"
    echo -n -77 >"$KEY_FILE"
    user_queue -77
    user_queue 78
    root_queue 79
    queues-check "$KEY_FILE"
    same "78:$ATTACKER 79:0" "$(keys | tr '\n' ' ' | sed 's/ $//')"
    remove_all_queues
    # The service gets the key that the user had.
    start_service
    same "$tried" "$(cat "$KEY_FILE")"
}

@test "a key file is made with mode 0644 whatever the umask; a folder or link in its place goes" {
    rm -f "$KEY_FILE"
    (umask 0 && queues-check "$KEY_FILE")
    same "0 644 0" "$(stat -c '%u %a %s' "$KEY_FILE")"
    rm "$KEY_FILE"
    ln -s /volume1/target "$KEY_FILE"
    queues-check "$KEY_FILE"
    same "regular empty file" "$(stat -c %F "$KEY_FILE")"
    refute test -e /volume1/target
    rm "$KEY_FILE"
    install -o "$ATTACKER" /dev/null "$KEY_FILE"
    queues-check "$KEY_FILE"
    same 0 "$(stat -c %u "$KEY_FILE")"
}

@test "root's own queue stays, and its key is written where its maker could not" {
    local tried
    tried=$(tried_key)
    : >"$KEY_FILE"
    root_queue "$tried"
    queues-check "$KEY_FILE"
    same "$tried" "$(cat "$KEY_FILE")"
    same "$tried:0" "$(keys)"
    remove_all_queues
}

@test "a document that cannot be read or replaced keeps the service from its start" {
    document-check "$CONF"
    put_config '{}'
    document-check "$CONF"
    put_config '{"volumes":'
    refute document-check "$CONF"
    put_config '[]'
    refute document-check "$CONF"
    rm "$CONF"
    mkfifo "$CONF"
    refute document-check "$CONF"
    rm "$CONF"
    mount -t tmpfs -o size=64k small "${CONF%/*}"
    put_config '{}'
    document-check "$CONF"
    head -c 64k /dev/zero >"${CONF%/*}/full" 2>/dev/null || true
    run document-check "$CONF"
    umount "${CONF%/*}"
    same 1 "$status"
    same "" "$(find "${CONF%/*}" -name '*tmp*')"
}

device_is_dead() { ! head -c 1 "$1" >/dev/null 2>&1; }

@test "a volume's records stay unless it is known that its cache cannot pin" {
    local list=$VESK_FLASHCACHE_CONFIG uuid
    uuid=$(volume_uuid 1)
    put_config "$RECORDS"
    same yes "$(cache-verdict /volume1)"
    echo '{"caches":[' >"$list"
    refute volume-mounted /volume1 "$CONF"
    map_cache "$uuid" /run/none
    refute volume-mounted /volume1 "$CONF"
    map_cache "$uuid" "$(spare_device killed 4M)"
    same yes "$(cache-verdict /volume1)"
    look_at_device /run/killed/cachedev
    kill -s KILL "$DEVICE_PID"
    wait_until device_is_dead /run/killed/cachedev
    refute volume-mounted /volume1 "$CONF"
    umount /run/killed
    refute volume-mounted /volume2 "$CONF"
    same "$RECORDS" "$(cat "$CONF")"
    # A device without the requests answers, and is a cache that cannot pin.
    truncate -s 1M /tmp/plain
    map_cache "$uuid" /tmp/plain
    same no "$(cache-verdict /volume1)"
    echo '{"caches":[]}' >"$list"
    same no "$(cache-verdict /volume1)"
    volume-mounted /volume1 "$CONF"
    same null "$(config '.volumes["/volume1"]')"
    same "$RECORDS" "$(cat "$CONF.before-volume1")"
    # Again: the copy stays.
    volume-mounted /volume1 "$CONF"
    same "$RECORDS" "$(cat "$CONF.before-volume1")"
}

@test "the hook warns of a top folder that others may write to" {
    local warning="warning: others than root may write to the top folder of /volume1"
    chmod 755 /volume1
    run volume-mounted /volume1 "$CONF"
    [[ "$output" != *warning* ]]
    chmod 1777 /volume1
    run volume-mounted /volume1 "$CONF"
    chmod 755 /volume1
    [[ "$output" == *"$warning"* ]]
    chown "$ATTACKER" /volume1
    run volume-mounted /volume1 "$CONF"
    chown 0 /volume1
    [[ "$output" == *"$warning"* ]]
}

@test "stored requests of a volume that is not there keep the service from its start" {
    put_config '{"requests":{"0":{"mountPath":"/volume1"}}}'
    requests-check "$CONF"
    # A text that looks like a member.
    put_config '{"requests":{"0":{"data":"\"mountPath\" : \"/volume2\"","mountPath" : "/volume1"}}}'
    requests-check "$CONF"
    put_config '{"requests":{"0":{"mountPath":"/volume1"},"1":{"mountPath" : "/volume2"}}}'
    refute requests-check "$CONF"
}

@test "volumes are known by names that JSON writes with escapes, too" {
    local volume=$'/tmp/vol\u00fcme "1"\\ \U1f600' written='/tmp/vol\u00fcme \"1\"\\ \ud83d\ude00' records
    mkdir "$volume"
    mount --move /volume1 "$volume"
    put_config "{\"requests\":{\"0\":{\"mountPath\":\"$written\"}}}"
    printf '%s\0' "$volume" | cmp - <(document-texts "$CONF" mountPath)
    requests-check "$CONF"
    mount --move "$volume" /volume1
    refute requests-check "$CONF"
    mount --move /volume1 "$volume"
    records="{\"volumes\":{\"$written\":{\"files\":{\"12\":\"a\"}}}}"
    put_config "$records"
    echo '{"caches":[]}' >"$VESK_FLASHCACHE_CONFIG"
    volume-mounted "$volume" "$CONF"
    mount --move "$volume" /volume1
    same "$records" "$(cat "$CONF.before$(tr / - <<<"$volume")")"
}

# watch_service: the watch's output in the background; systemctl tells of this service, and is written down.
watch_service() {
    # shellcheck disable=SC2016
    printf '#!/bin/sh\ncase $1 in show) echo %s ;; *) echo "$@" >>/tmp/systemctl.log ;; esac\n' "$SERVICE_PID" \
        >/tmp/bin/systemctl
    chmod +x /tmp/bin/systemctl
    rm -f /tmp/systemctl.log
    (
        close_descriptors
        VESK_WATCH_SECONDS=4 exec service-watch some.service "$CONF"
    ) >/tmp/watch.log 2>&1 &
}
watch_said() { grep -qxF "some.service $1" /tmp/watch.log; }
restart_was_asked() { [ -e /tmp/systemctl.log ] && grep -qxF -e "--no-block restart some.service" /tmp/systemctl.log; }

@test "the watch restarts a service whose receiver has ended, once the document can be used" {
    start_service
    watch_service
    sleep 6
    refute test -e /tmp/systemctl.log
    echo '{"volumes":' >"$CONF"
    tool --reload-blocks --mount-path /volume1
    wait_until receiver_has_ended
    wait_until watch_said "takes no more requests, and is not restarted: $CONF cannot be read, or is damaged"
    refute test -e /tmp/systemctl.log
    echo '{}' >"$CONF"
    PATIENCE=10 wait_until restart_was_asked
    watch_said "takes no more requests: it is restarted"
}

@test "the watch restarts a service that stands in one look" {
    mkdir user
    mount --make-shared /run
    spare_device stand 4M
    mount --bind /run/stand user
    start_service
    wait_until receiver_waits
    kill -s STOP "$SERVICE_PID"
    tool --pin-files /volume1/user/cachedev --mount-path /volume1
    hold_device user/cachedev
    watch_service
    kill -s CONT "$SERVICE_PID"
    PATIENCE=20 wait_until restart_was_asked
    watch_said "has stood in one look for a minute: it is restarted"
    release_device
    stop_service
    umount user
}
