#!/usr/bin/env bats
# Files of more than 1024 extents: how their ranges are cut into requests, and which range gets lost.
#
# One file serves all tests; it loses extents from its end from test to test.

load lib

EXTENTS=1030

setup_file() {
    make_volume 1 192M 96M ext4
    # 4 KiB of every 128 KiB: each extent lies in a block of its own.
    dd if=/dev/urandom of=/volume1/a bs=128K count=$EXTENTS conv=fsync status=none
    "$HELPERS/system_fallocate" /volume1/a punch-hole 4096 131072 $((131072 - 4096)) $EXTENTS
    sync /volume1/a
}

setup() {
    volume_configure
    tool --unpin-all --mount-path /volume1
    rm -f "$(bitmap_file 1)"
    fresh_service
}

# pin_and_unpin EXTENTS: the file with that many; sets REQUESTS, how many requests released them.
pin_and_unpin() {
    truncate -s $(($1 * 131072)) /volume1/a
    sync /volume1/a
    BLOCKS=$(extents /volume1/a | awk '{ print int($2 / 128) }')
    same "$1" "$(wc -l <<<"$BLOCKS")"
    local before
    before=$(state 1 .ioctls.unpinRanges)
    start_service
    pin 1 /volume1/a
    same "$1" "$(state 1 .pinnedBlocks)"
    unpin 1 /volume1/a
    stop_service
    REQUESTS=$(($(state 1 .ioctls.unpinRanges) - before))
    same "" "$(bitmap_blocks 1)"
    same "" "$(driver_blocks 1)"
    same null "$(config '.volumes["/volume1"]')"
    grep -q 'Handle request (type=unpinFiles files=a#[0-9]*) OK $' "$SERVICE_LOG"
}

# The ranges of extents FIRST to LAST, counted from 0.
ranges() { ranges_of /volume1/a | jq -c ".[$1:$(($2 + 1))]"; }

@test "1030 ranges: the 1025th is lost, those behind it go in a second request" {
    pin_and_unpin 1030
    same 2 "$REQUESTS"
    same "$(ranges 1025 1029)" "$(state 1 .lastUnpin)"
    same "$(sed -n 1025p <<<"$BLOCKS")" "$(pinned_blocks 1)"
}

@test "1025 ranges: one request, and nothing for the 1025th" {
    pin_and_unpin 1025
    same 1 "$REQUESTS"
    same "$(ranges 0 1023)" "$(state 1 .lastUnpin)"
    same "$(sed -n 1025p <<<"$BLOCKS")" "$(pinned_blocks 1)"
}

@test "1024 ranges go in one request that has no end mark" {
    pin_and_unpin 1024
    same 1 "$REQUESTS"
    same "$(ranges 0 1023)" "$(state 1 .lastUnpin)"
    same "" "$(pinned_blocks 1)"
}

@test "1023 ranges go in one request" {
    pin_and_unpin 1023
    same 1 "$REQUESTS"
    same "$(ranges 0 1022)" "$(state 1 .lastUnpin)"
    same "" "$(pinned_blocks 1)"
}
