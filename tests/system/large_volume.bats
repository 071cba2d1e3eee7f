#!/usr/bin/env bats
# A volume of 3 TiB: sectors beyond 2^32, device offsets and file offsets far beyond 2^32 bytes. All of
# it is sparse.

load lib

setup_file() {
    MKFS_OPTIONS="-l size=64m" make_volume 1 3T 16M xfs
    # A new folder gets an allocation group of its own, and the last group begins at 2.25 TiB.
    mkdir /volume1/1 /volume1/2 /volume1/3 /volume1/4
}

setup() {
    volume_configure
    rm -f /volume1/?/* "$(bitmap_file 1)"
    tool --unpin-all --mount-path /volume1
    fresh_service
    cd /volume1 || return
}

first_sector() { extents "$1" | awk 'NR == 1 { print $2 }'; }

# A file of 5 GiB and a bit, with 192 KiB at its start and at its end, in the last group.
make_far_file() {
    local folder
    for folder in 1 2 3 4; do
        FAR=/volume1/$folder/far
        random "$FAR" 192K conv=fsync
        random "$FAR" 192K conv=notrunc,fsync oflag=seek_bytes seek=5G
        [ "$(first_sector "$FAR")" -le 4294967296 ] || return 0
    done
    echo "no folder lies beyond sector 2^32"
    return 1
}

@test "the bitmap of the device has a bit for every 64 KiB of it" {
    answers 0 --get-bitmap-size-byte --mount-path /volume1 <<<6291456
}

@test "a file beyond sector 2^32 and beyond 2^32 bytes of its own is pinned, loaded and recorded" {
    make_far_file
    start_service
    pin 1 "$FAR"
    check_pinned "$FAR"
    same 6291456 "$(stat -c %s "$(bitmap_file 1)")"
    [ "$(bitmap_blocks 1 | head -n 1)" -gt 33554432 ]
    same "" "$(comm -13 <(pinned_blocks 1 | sort) <(written_blocks_of "$FAR" | sort))"
    stop_service
}

@test "what veskpin plans for it is what pinning does" {
    make_far_file
    look 0 plan "$FAR"
    local planned
    planned=$(answer '.volumes[0] | [.blocks,.blocksNew,.extents,.requestsNeeded]')
    same "[$(blocks_of "$FAR" | wc -l),$(blocks_of "$FAR" | wc -l),$(extents "$FAR" | wc -l),1]" "$planned"
    start_service
    pin 1 "$FAR"
    same "$(answer '.volumes[0].blocksNew')" "$(bitmap_blocks 1 | wc -l)"
    look 0 list "$FAR"
    same "pinned $(stat -c %s "$FAR")" "$(state_of "$FAR") $(answer '.files[0].bytes')"
    stop_service
}

@test "unpinning it releases its ranges" {
    make_far_file
    start_service
    pin 1 "$FAR"
    unpin 1 "$FAR"
    same "$(ranges_of "$FAR")" "$(state 1 .lastUnpin)"
    check_nothing_pinned
    stop_service
}

@test "a reload reads its blocks where they lie" {
    make_far_file
    start_service
    pin 1 "$FAR"
    local before
    before=$(pinned_blocks 1)
    tool --unpin-all --mount-path /volume1
    while_still 1 scan_far_evicts "$before"
    tool --send-bitmap --mount-path /volume1
    reload 1
    same "$before" "$(pinned_blocks 1)"
    ssd_holds_the_data 1
    stop_service
}

# Reads as much as the SSD holds elsewhere, which evicts everything that is not pinned.
scan_far_evicts() { # BLOCKS
    dd if="$(volume_device 1)" of=/dev/null bs=1M count=32 skip=1000000 iflag=direct status=none &&
        same "" "$(common "$1" "$(cached_blocks 1)")"
}

@test "ranges by sector reach the end of the device and no further" {
    tool --set-bitmap --mount-path /volume1 --start-sector 6442450816 --num-sectors 1000
    same 50331647 "$(bitmap_blocks 1)"
    same 50331647 "$(driver_blocks 1)"
    tool --unset-bitmap --mount-path /volume1 --start-sector 4294967296 --num-sectors 9223372036854775807
    same "" "$(bitmap_blocks 1)"
    same "" "$(driver_blocks 1)"
}
