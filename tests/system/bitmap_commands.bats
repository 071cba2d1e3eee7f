#!/usr/bin/env bats
# The commands that set, clear, release and send blocks by their sectors.

load lib

setup_file() { make_volume 1 64M 16M ext4; }

setup() {
    fresh_volume
    BITMAP=$(bitmap_file 1)
}

# change OPTION START COUNT: set-bitmap or unset-bitmap, which must succeed and tell so.
change() {
    local what=Set
    [ "$1" = set ] || what=Unset
    says 0 "--$1-bitmap" --mount-path /volume1 --start-sector "$2" --num-sectors "$3" <<END
: $what bitmap on volume (/volume1) OK (Start sector = $2 Num of sector = $3)
END
}
# The blocks of standard input are what the file and the driver hold.
both_hold() {
    local expected
    expected=$(cat)
    same "$expected" "$(bitmap_blocks 1)"
    same "$expected" "$(driver_blocks 1)"
}

@test "a range sets every block that it touches" {
    change set 0 128
    both_hold <<<0
    same 01 "$(od -An -N1 -tx1 "$BITMAP" | tr -d ' ')"
    change set 255 2
    both_hold <<<$'0\n1\n2'
    change set 1024 1
    both_hold <<<$'0\n1\n2\n8'
    same 0701 "$(od -An -N2 -tx1 "$BITMAP" | tr -d ' ')"
    same 128 "$(stat -c %s "$BITMAP")"
}

@test "setting what is set writes and sends again" {
    change set 0 1
    local sent
    sent=$(state 1 .ioctls.setBitmap)
    printf '\x00' | dd of="$BITMAP" conv=notrunc status=none
    change set 128 1
    both_hold <<<1
    change set 128 1
    both_hold <<<1
    same $((sent + 2)) "$(state 1 .ioctls.setBitmap)"
}

@test "a range clears every block that it touches" {
    change set 0 1024
    change unset 127 2
    both_hold <<<"$(seq 2 7)"
    change unset 512 384
    both_hold <<<$'2\n3\n7'
    change unset 0 131072
    both_hold </dev/null
}

@test "no sectors: nothing at the start of a block, one block within it" {
    change set 128 0
    both_hold </dev/null
    change set 130 0
    both_hold <<<1
}

@test "what lies behind the end of the device is ignored" {
    change set 130944 1000
    both_hold <<<1023
    change set 131072 128
    both_hold <<<1023
    change set 9223372036854775807 128
    both_hold <<<1023
}

@test "the largest number of sectors is done at once" {
    # Sector by sector it would take years: the test's own limit of time tells.
    change set 128 9223372036854775807
    both_hold <<<"$(seq 1 1023)"
    change unset 256 9223372036854775807
    both_hold <<<1
}

@test "a range set by hand is loaded by a reload only" {
    change set 0 256
    same "" "$(pinned_blocks 1)"
    start_service
    reload 1
    same $'0\n1' "$(pinned_blocks 1)"
    service_said <<<": Handle request (type=reloadPinBlocks) OK "
}

@test "unpin-range releases the blocks that it touches and nothing else" {
    change set 0 1024
    start_service
    reload 1
    stop_service
    local before
    before=$(sha256sum "$BITMAP")
    says 0 --unpin-range --mount-path /volume1 --start-sector 127 --num-sectors 2 <<END
: Unpin range in cache (volume = /volume1) OK (Start sector = 127 Num of sector = 2)
END
    same '[[127,2]]' "$(state 1 .lastUnpin)"
    same "$(seq 2 7)" "$(pinned_blocks 1)"
    same "$before" "$(sha256sum "$BITMAP")"
    same "$(seq 0 7)" "$(driver_blocks 1)"
    # The driver takes no range behind the end of the device.
    says_masked 255 --unpin-range --mount-path /volume1 --start-sector 131072 --num-sectors 1 <<END
: Ioctl Error: Send ioctl 65232 Data (ADDRESS) size (16384) to $(volume_device 1), ret=-1

: Send unpin inctl to driver failed
: Unpin range in cache (volume = /volume1) failed (Start sector = 131072 Num of sector = 1)
END
}

@test "a device that is no multiple of 512 KiB has no bits for its last stretch" {
    local device
    device=$(spare_device uneven 66584576)
    map_cache "$(volume_uuid 1)" "$device"
    says 0 --get-bitmap-size-byte --mount-path /volume1 <<<127
    change set 0 9223372036854775807
    same 127 "$(stat -c %s "$BITMAP")"
    same "$(seq 0 1015)" "$(bitmap_blocks 1)"
}

@test "a bitmap of many chunks is written and sent whole" {
    local device
    device=$(spare_device large 16G)
    map_cache "$(volume_uuid 1)" "$device"
    says 0 --get-bitmap-size-byte --mount-path /volume1 <<<32768
    change set 0 33554432
    same 32768 "$(stat -c %s "$BITMAP")"
    same '[[0,262144]]' "$(jq -c .bitmapBits "$device.json")"
    change unset 33554304 128
    same '[[0,262143]]' "$(jq -c .bitmapBits "$device.json")"
}
