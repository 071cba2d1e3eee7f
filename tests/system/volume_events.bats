#!/usr/bin/env bats
# Mount and unmount of a volume, and its bitmap file's end.

load lib

setup_file() { make_volume 1 64M 16M ext4; }

setup() {
    fresh_volume
    BITMAP=$(bitmap_file 1)
    head -c 128 /dev/zero >"$BITMAP"
    RECORDS='{"nextRequestNum":3,"requestQueue":["2"],"requests":{"2":{"data":null,"mountPath":"/volume1","type":"reloadPinBlocks"}},"volumes":{"/volume1":{"files":{"12":"a"}},"/volume2":{"files":{"13":"b"}}}}'
    put_config "$RECORDS"
}

teardown() {
    end_service
    ! mountpoint -q "${CONF%/*}" || umount "${CONF%/*}"
    mount -o remount,rw /volume1
}

lose_cache() { echo '{"caches":[]}' >"$VESK_FLASHCACHE_CONFIG"; }
handle_mount() { says "$1" --handle-mount --mount-path /volume1 --config-path "$CONF"; }

@test "the mount of a volume that can pin touches nothing" {
    handle_mount 0 </dev/null
    same "$RECORDS" "$(config . | jq -cS .)"
    test -e "$BITMAP"
}

@test "the mount of a volume without a cache removes its records and its bitmap file" {
    lose_cache
    handle_mount 0 <<<": Remove pin file volume (/volume1) from config file"
    same "$(jq -c 'del(.volumes["/volume1"])' <<<"$RECORDS")" "$(config . | jq -cS .)"
    refute test -e "$BITMAP"
    # A second time there is nothing left to do.
    handle_mount 0 </dev/null
}

@test "the last volume's records go, the empty object stays" {
    put_config '{"volumes":{"/volume1":{"files":{"12":"a"}}}}'
    lose_cache
    handle_mount 0 <<<": Remove pin file volume (/volume1) from config file"
    same '{"volumes":{}}' "$(config .)"
}

@test "without a configuration file only the bitmap file goes" {
    lose_cache
    rm "$CONF"
    handle_mount 0 </dev/null
    refute test -e "$CONF"
    refute test -e "$BITMAP"
}

@test "a volume without records is not written back" {
    lose_cache
    put_config '{"volumes":{"/volume2":{"files":{"13":"b"}}}}'
    local before
    before=$(stat -c '%i %Y' "$CONF")
    handle_mount 0 </dev/null
    same "$before" "$(stat -c '%i %Y' "$CONF")"
    put_config '{}'
    handle_mount 0 </dev/null
    same '{}' "$(config .)"
}

@test "a folder or a link in the bitmap file's place stays" {
    lose_cache
    rm "$BITMAP"
    mkdir "$BITMAP"
    handle_mount 0 <<<": Remove pin file volume (/volume1) from config file"
    test -d "$BITMAP"
    rmdir "$BITMAP"
    echo data >target
    ln -s target "$BITMAP"
    handle_mount 0 </dev/null
    test -L "$BITMAP"
    same data "$(cat target)"
    rm target
    handle_mount 0 </dev/null
    test -L "$BITMAP"
}

@test "records that cannot be removed keep the bitmap file" {
    lose_cache
    echo '{' >"$CONF"
    handle_mount 255 <<END
: Prase file $CONF error
: Can't read data from config file ($CONF)
: Can't remove pin files in volume (/volume1)
: Handle space (/volume1) mount failed
END
    test -e "$BITMAP"
}

@test "records that cannot be written are told" {
    lose_cache
    mount -t tmpfs tmpfs "${CONF%/*}"
    put_config "$RECORDS"
    mount -o remount,ro "${CONF%/*}"
    handle_mount 255 <<END
: Can't open config file ($CONF)
: Write json data to config ($CONF) failed
: Can't remove pin files in volume (/volume1)
: Handle space (/volume1) mount failed
END
    umount "${CONF%/*}"
    test -e "$BITMAP"
}

@test "a bitmap file that cannot be deleted is told; the records are gone" {
    lose_cache
    sync
    mount -o remount,ro /volume1
    handle_mount 255 <<END
: Remove pin file volume (/volume1) from config file
: Can't delete bitmap file ($BITMAP)
: Handle space (/volume1) mount failed
END
    same '["/volume2"]' "$(config '.volumes | keys')"
    says 255 --delete-bitmap --mount-path /volume1 <<END
: Can't delete bitmap ($BITMAP)
: Delete bitmap on volume (/volume1) failed
END
    mount -o remount,rw /volume1
}

@test "the unmount changes nothing and always succeeds" {
    says 0 --handle-umount --mount-path /volume1 </dev/null
    lose_cache
    says 0 --handle-umount --mount-path /volume1 <<<": Space (/volume1) doesn't support pin"
    says 0 --handle-umount --mount-path /nowhere <<END
: Can't get space uuid from mount path (/nowhere)
: Space (/nowhere) doesn't support pin
END
    same "$RECORDS" "$(config . | jq -cS .)"
    test -e "$BITMAP"
}

@test "delete-bitmap deletes the file whether the volume can pin or not" {
    says 0 --delete-bitmap --mount-path /volume1 <<<": Delete bitmap on volume (/volume1) OK"
    refute test -e "$BITMAP"
    says 0 --delete-bitmap --mount-path /volume1 <<<": Delete bitmap on volume (/volume1) OK"
    lose_cache
    echo >"$BITMAP"
    says 0 --delete-bitmap --mount-path /volume1/ <<<": Delete bitmap on volume (/volume1) OK"
    refute test -e "$BITMAP"
    same "$RECORDS" "$(config . | jq -cS .)"
}

@test "delete-bitmap tells the driver nothing" {
    tool --set-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 1
    tool --delete-bitmap --mount-path /volume1
    same true "$(state 1 .bitmapSet)"
    same 0 "$(driver_blocks 1)"
}

@test "delete-bitmap of a folder fails" {
    rm "$BITMAP"
    mkdir "$BITMAP"
    says 255 --delete-bitmap --mount-path /volume1 <<END
: Can't delete bitmap ($BITMAP)
: Delete bitmap on volume (/volume1) failed
END
}

@test "the path of a bitmap file ends at 511 characters" {
    local folder name
    folder=/tmp/$(printf 'd%.0s' {1..250})/$(printf 'e%.0s' {1..250})
    mkdir -p "$folder"
    name=$folder/veskcachepinfile.bitmap
    [ "${#name}" -gt 511 ]
    echo whole >"$name"
    echo cut >"${name:0:511}"
    says 0 --delete-bitmap --mount-path "$folder" <<<": Delete bitmap on volume ($folder) OK"
    test -e "$name"
    refute test -e "${name:0:511}"
    rm -rf "/tmp/$(printf 'd%.0s' {1..250})"
}
