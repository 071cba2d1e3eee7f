#!/usr/bin/env bats
# Several volumes in one service, volumes that lose their cache, and mount paths of unusual shape.

load lib

setup_file() {
    make_volume 1 64M 16M ext4
    make_volume 2 320M 16M xfs
    SLOW_DEVICE=$(SSD_SIZE=64K spare_device slow 320M --miss-delay-ms 100)
    export SLOW_DEVICE
}

# Where a test that failed has left a mount.
teardown() {
    end_service
    cd /
    ! mountpoint -q "$ODD_PATH" || mount --move "$ODD_PATH" /volume1
    ! mountpoint -q /bound || umount /bound
}

ODD_PATH='/odd %s %n [v] (1)'

setup() {
    fresh_volume
    find /volume2 -mindepth 1 -delete
    tool --unpin-all --mount-path /volume2
    random a 200K conv=fsync
    random /volume2/b 300K conv=fsync
}

# The cache configuration without the cache of volume N.
lose_cache() {
    local uuid
    uuid=$(volume_uuid "$1")
    jq -c --arg uuid "$uuid" '.caches |= map(select(.spaceUuid != $uuid))' \
        "$VESK_FLASHCACHE_CONFIG" >"$VESK_FLASHCACHE_CONFIG.new"
    mv "$VESK_FLASHCACHE_CONFIG.new" "$VESK_FLASHCACHE_CONFIG"
}

@test "each volume has its bitmap file, its driver's bitmap and its records" {
    start_service
    pin 1 /volume1/a
    pin 2 /volume2/b
    same "$(blocks_of a)" "$(bitmap_blocks 1)"
    same "$(blocks_of a)" "$(pinned_blocks 1)"
    same "$(blocks_of /volume2/b)" "$(bitmap_blocks 2)"
    same "$(blocks_of /volume2/b)" "$(pinned_blocks 2)"
    same 640 "$(stat -c %s "$(bitmap_file 2)")"
    same '{"/volume1":{"files":{"'"$(inode a)"'":"a"}},"/volume2":{"files":{"'"$(inode /volume2/b)"'":"b"}}}' \
        "$(config .volumes | jq -cS .)"
    unpin 1 /volume1/a
    same '["/volume2"]' "$(config '.volumes | keys')"
    same "$(blocks_of /volume2/b)" "$(pinned_blocks 2)"
    stop_service
}

@test "a file of another volume is refused" {
    start_service
    tool --pin-files "/volume2/b" --mount-path /volume1
    wait_until waiting_is 0
    wait_until service_rests
    refute test -e "$CONF"
    service_said <<END
: Failed to Get relative path (Volume path=/volume1 File path=/volume2/b
: Get relative paths failed
: Can't add request to json
: Can't add request to config ($CONF)
END
}

@test "requests of a volume that lost its cache are dropped with its records, others are served" {
    start_service
    pin 1 /volume1/a
    set_pending /volume1
    set_pending /volume2
    tool --unpin-files /volume1/a --mount-path /volume1
    tool --reload-blocks --mount-path /volume1
    tool --pin-files /volume2/b --mount-path /volume2
    wait_until request_is_stored 3
    lose_cache 1
    wait_until config_has '.requestQueue == ["3"]'
    end_pending /volume2
    wait_until queue_is_empty
    same '["/volume2"]' "$(config '.volumes | keys')"
    same '{}' "$(config .requests)"
    # The volume itself is left alone.
    same "$(blocks_of a)" "$(bitmap_blocks 1)"
    same "$(blocks_of a)" "$(pinned_blocks 1)"
    stop_service
    # Where the cache is lost while the worker walks the requests, the first is dropped a walk later.
    same "Handle request (type=pinFiles files=a#$(inode a)) OK 
Drop requests finish
Handle request (type=pinFiles files=b#$(inode /volume2/b)) OK " \
        "$(sed -n '2,$s/^veskcachepinfiletool: //p' "$SERVICE_LOG" | uniq)"
}

@test "a request behind a runnable one is dropped only when the walk reaches it" {
    local before misses
    # Three seconds of slow reading, in which the device is held.
    random /volume2/b 2M conv=fsync
    look_at_device "$SLOW_DEVICE"
    # shellcheck disable=SC2153
    misses=$MISSES
    map_cache "$(volume_uuid 2)" "$SLOW_DEVICE"
    put_config '{"requestQueue":["0","1"],"requests":{
        "0":{"type":"pinFiles","mountPath":"/volume2","data":"b#'"$(inode /volume2/b)"'"},
        "1":{"type":"reloadPinBlocks","mountPath":"/volume1","data":null}},
        "volumes":{"/volume1":{"files":{"1":"f"}}}}'
    before=$(config .)
    start_service
    wait_until misses_are_above "$SLOW_DEVICE" "$misses"
    hold_device "$SLOW_DEVICE"
    same "$before" "$(config .)"
    release_device
    wait_until queue_is_empty
    same '["/volume2"]' "$(config '.volumes | keys')"
    service_said <<END
: Handle request (type=pinFiles files=b#$(inode /volume2/b)) OK 
: Drop requests finish
END
}

@test "after the last drop the worker waits for requests again" {
    lose_cache 1
    put_config '{"requestQueue":["0"],"requests":{
        "0":{"type":"reloadPinBlocks","mountPath":"/volume1","data":null}}}'
    start_service
    wait_until queue_is_empty
    pin 2 /volume2/b
    service_said <<END
: Drop requests finish
: Handle request (type=pinFiles files=b#$(inode /volume2/b)) OK 
END
}

@test "a mount path with blanks, brackets and conversion characters" {
    local path=$ODD_PATH file
    mkdir -p "$path"
    cd /
    mount --move /volume1 "$path"
    file="$path/a"
    says 0 --support-pin --mount-path "$path/" <<<"Yes"
    start_service --verbose
    request_and_wait --pin-files "$file" --mount-path "$path"
    same "{\"$path\":{\"files\":{\"$(inode "$file")\":\"a\"}}}" "$(config .volumes)"
    same "$(blocks_of "$file")" "$(bits_of "$path/veskcachepinfile.bitmap")"
    same "$(blocks_of "$file")" "$(pinned_blocks 1)"
    answers 0 --check-pin "$file" --config-path "$CONF" <<<"Yes"
    says 0 --set-bitmap --mount-path "$path" --start-sector 0 --num-sectors 1 <<END
: Set bitmap on volume ($path) OK (Start sector = 0 Num of sector = 1)
END
    request_and_wait --unpin-files "$file" --mount-path "$path"
    same null "$(config '.volumes["'"$path"'"]')"
    stop_service
    mount --move "$path" /volume1
}

@test "a bind mount and a covered mount are no spaces of their own" {
    mkdir -p /bound /volume1/dir
    mount --bind /volume1/dir /bound
    says 0 --support-pin --mount-path /bound <<END
: Can't get space uuid from mount path (/bound)
No
END
    umount /bound
    mount --bind /volume1 /bound
    says 0 --support-pin --mount-path /bound <<END
: Can't get space uuid from mount path (/bound)
No
END
    umount /bound
    rmdir /bound
}

@test "a prefix of a mount path and a path below it are no volumes" {
    local path
    for path in /volume /volume11 /volume1/a /volume1//; do
        says 0 --support-pin --mount-path "$path" <<END
: Can't get space uuid from mount path (${path%/})
No
END
    done
}
