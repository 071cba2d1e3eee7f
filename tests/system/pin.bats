#!/usr/bin/env bats
# Pinning, unpinning and reloading files on one volume of FSTYPE: whatever the shape of a file, the
# bitmap file, the driver, the SSD and the records hold exactly its blocks.

load lib

setup_file() { make_volume 1 "$SIZE" 16M "$FSTYPE"; }

setup() { fresh_volume; }

@test "a fragmented file is marked, sent, loaded and recorded" {
    fragmented a 12
    start_service
    pin 1 /volume1/a
    check_pinned /volume1/a
    same "$(blocks_of a)" "$(pinned_blocks 1)"
    same "$((${SIZE%M} * 2))" "$(stat -c %s "$(bitmap_file 1)")"
    same "$(inode a)" "$(config '.volumes["/volume1"].files | keys[0] | tonumber')"
    same 0 "$(config '.requestQueue | length')"
    same '{}' "$(config .requests)"
    service_said <<END
: Handle request (type=pinFiles files=a#$(inode a)) OK 
END
}

@test "pinning a file again changes nothing" {
    fragmented a 6
    start_service
    pin 1 /volume1/a
    local before
    before=$(sha256sum "$(bitmap_file 1)")
    pin 1 /volume1/a
    same "$before" "$(sha256sum "$(bitmap_file 1)")"
    check_pinned /volume1/a
    stop_service
}

@test "a file that has grown is pinned whole when it is pinned again" {
    random a 100K conv=fsync
    start_service
    pin 1 /volume1/a
    local before
    before=$(blocks_of a)
    random a 900K conv=notrunc,fsync oflag=append
    pin 1 /volume1/a
    is_subset "$before" "$(bitmap_blocks 1)"
    is_subset "$(written_blocks_of a)" "$(pinned_blocks 1)"
    is_subset "$(blocks_of a)" "$(bitmap_blocks 1)"
    stop_service
}

@test "a scan of the device evicts everything but the pinned blocks, which the SSD serves" {
    fragmented a 10
    cp a /tmp/copy
    start_service
    pin 1 /volume1/a
    while_still 1 scan_evicts_all_but "$(pinned_blocks 1)"
    ssd_holds_the_data 1
    while_still 1 ssd_serves_a
    stop_service
}

scan_evicts_all_but() { # PINNED
    local cached slots last
    scan_device 1 && same "$1" "$(pinned_blocks 1)" && cached=$(cached_blocks 1) || return
    # All other slots hold what was read last.
    slots=$(state 1 .slots)
    last=$(seq 0 $((${SIZE%M} * 16 - 1)) | tail -n "$slots")
    is_subset "$1" "$cached" && is_subset "$cached" "$1"$'\n'"$last" &&
        same "$slots" "$(wc -l <<<"$cached")"
}

# Past the page cache: only the data of the file is read.
ssd_serves_a() {
    local before after
    mapfile -t before < <(state 1 '.ssdReads, .misses')
    dd if=a of=/tmp/read bs=64K iflag=direct status=none && cmp /tmp/copy /tmp/read || return
    mapfile -t after < <(state 1 '.ssdReads, .misses')
    [ "${after[0]}" -ge $((before[0] + $(pinned_blocks 1 | wc -l))) ] && same "${before[1]}" "${after[1]}"
}

@test "several files in one request" {
    fragmented a 3
    fragmented b 3
    mkdir dir
    random dir/c 200K conv=fsync
    start_service
    pin 1 /volume1/a /volume1/b /volume1/dir/c
    check_pinned /volume1/a /volume1/b /volume1/dir/c
    service_said <<END
: Handle request (type=pinFiles files=a#$(inode a);b#$(inode b);dir/c#$(inode dir/c)) OK 
END
}

@test "unpinning clears the blocks and releases the extents in their order" {
    fragmented a 8
    fragmented_apart b 3 a
    start_service
    pin 1 /volume1/a /volume1/b
    unpin 1 /volume1/a
    same "$(ranges_of a)" "$(state 1 .lastUnpin)"
    check_pinned /volume1/b
    unpin 1 /volume1/b
    same "$(ranges_of b)" "$(state 1 .lastUnpin)"
    check_nothing_pinned
    while_still 1 scan_evicts "$(blocks_of a b)"
    service_said <<END
: Handle request (type=pinFiles files=a#$(inode a);b#$(inode b)) OK 
: Handle request (type=unpinFiles files=a#$(inode a)) OK 
: Handle request (type=unpinFiles files=b#$(inode b)) OK 
END
}

scan_evicts() { scan_device 1 && same "" "$(common "$1" "$(cached_blocks 1)")"; } # BLOCKS

@test "unpinning several files lists the ranges of all, in the order of the request" {
    fragmented a 3
    fragmented b 2
    start_service
    pin 1 /volume1/a /volume1/b
    unpin 1 /volume1/b /volume1/a
    same "$(ranges_of b a)" "$(state 1 .lastUnpin)"
    check_nothing_pinned
    stop_service
}

@test "the holes of a sparse file are not pinned" {
    truncate -s 2M a
    random a 64K seek=3 conv=notrunc,fsync
    random a 4K seek=300 conv=notrunc,fsync
    start_service
    pin 1 /volume1/a
    check_pinned /volume1/a
    [ "$(wc -l <<<"$(bitmap_blocks 1)")" -le 16 ]
    unpin 1 /volume1/a
    check_nothing_pinned
    stop_service
}

@test "the blocks of unwritten extents are marked, but not read" {
    fallocate -l 1M a
    sync a
    start_service
    pin 1 /volume1/a
    same "$(blocks_of a)" "$(bitmap_blocks 1)"
    same "$(blocks_of a)" "$(driver_blocks 1)"
    # What is marked and read is pinned, whether it had been cached or not.
    same "" "$(common "$(blocks_of a)" "$(pinned_blocks 1)")"
    service_said <<END
: Only get 1 unitilized entry from file (/volume1/a)
: Handle request (type=pinFiles files=a#$(inode a)) OK 
END
}

@test "of a partly written file the written extents are loaded" {
    fallocate -l 1M a
    random a 128K seek=2 conv=notrunc,fsync
    random a 128K seek=6 conv=notrunc,fsync
    [ "$(extents a | grep -c unwritten)" -ge 2 ]
    [ "$(extents a | grep -vc unwritten)" -ge 2 ]
    start_service
    pin 1 /volume1/a
    check_pinned /volume1/a
    [ "$(wc -l <<<"$(pinned_blocks 1)")" -lt "$(wc -l <<<"$(bitmap_blocks 1)")" ]
    unpin 1 /volume1/a
    same "$(ranges_of a)" "$(state 1 .lastUnpin)"
    check_nothing_pinned
    stop_service
}

@test "a file with punched holes and an inserted range" {
    random a 1M conv=fsync
    fallocate --punch-hole -o 128K -l 64K a
    fallocate --insert-range -o 512K -l 256K a
    sync a
    [ "$(extents a | wc -l)" -ge 3 ]
    start_service
    pin 1 /volume1/a
    check_pinned /volume1/a
    unpin 1 /volume1/a
    check_nothing_pinned
    stop_service
}

@test "a file written a moment ago is pinned without the user's sync" {
    start_service
    random fresh 300K
    pin 1 /volume1/fresh
    check_pinned /volume1/fresh
    stop_service
}

@test "a file that was only partly written out is pinned whole" {
    start_service
    random grown 300K conv=fsync
    random grown 4M conv=notrunc oflag=seek_bytes seek=307200
    pin 1 /volume1/grown
    check_pinned /volume1/grown
    [ "$(wc -l <<<"$(bitmap_blocks 1)")" -ge $(((300 + 4096) / 64)) ]
    stop_service
}

@test "an overwritten copy that shared its blocks is pinned where it lies now" {
    random original 1M conv=fsync
    cp --reflink=always original copy 2>/dev/null || skip "files share nothing on $FSTYPE"
    random copy 1M conv=notrunc
    start_service
    pin 1 /volume1/copy
    check_pinned /volume1/copy
    same "" "$(common "$(extents original | awk '{ print $2 }')" "$(extents copy | awk '{ print $2 }')")"
    stop_service
}

@test "unpinning one of two files in a block clears the block of both" {
    # Where small files go is the file system's choice; of many, two lie in one block.
    local i j=1 shared=
    random small1 4K conv=fsync
    while [ -z "$shared" ] && [ "$j" -lt 40 ]; do
        j=$((j + 1))
        random "small$j" 4K conv=fsync
        for ((i = j - 1; i > 0; i--)); do
            shared=$(common "$(blocks_of "small$i")" "$(blocks_of "small$j")")
            [ -z "$shared" ] || break
        done
    done
    [ -n "$shared" ]
    start_service
    pin 1 "/volume1/small$i" "/volume1/small$j"
    is_subset "$shared" "$(pinned_blocks 1)"
    unpin 1 "/volume1/small$j"
    same "" "$(common "$shared" "$(bitmap_blocks 1)")"
    same "" "$(common "$shared" "$(driver_blocks 1)")"
    same "" "$(common "$shared" "$(pinned_blocks 1)")"
    same "{\"$(inode "small$i")\":\"small$i\"}" "$(config '.volumes["/volume1"].files')"
    stop_service
}

@test "after the driver has lost everything, send-bitmap and reload bring the blocks back" {
    fragmented a 7
    fallocate -l 256K b
    start_service
    pin 1 /volume1/a /volume1/b
    tool --unpin-all --mount-path /volume1
    scan_device 1
    same "" "$(pinned_blocks 1)"
    same false "$(state 1 .bitmapSet)"
    tool --send-bitmap --mount-path /volume1
    same "$(blocks_of a b)" "$(driver_blocks 1)"
    reload 1
    # The reload goes by the bitmap, so it also reads what is not written yet.
    same "$(blocks_of a b)" "$(pinned_blocks 1)"
    ssd_holds_the_data 1
    same 2 "$(config '.volumes["/volume1"].files | length')"
    service_said <<END
: Only get 1 unitilized entry from file (/volume1/b)
: Handle request (type=pinFiles files=a#$(inode a);b#$(inode b)) OK 
: Handle request (type=reloadPinBlocks) OK 
END
}

@test "a pinned file that is replaced keeps its record, the new file is not pinned" {
    random a 64K conv=fsync
    start_service
    pin 1 /volume1/a
    answers 0 --check-pin /volume1/a --config-path "$CONF" <<<"Yes"
    random new 64K conv=fsync
    ln a kept
    mv new a
    answers 0 --check-pin /volume1/a --config-path "$CONF" <<<"No"
    answers 0 --check-pin /volume1/kept --config-path "$CONF" <<<"Yes"
    stop_service
}

@test "an empty file is given up after ten seconds and dropped" {
    [ "$FSTYPE" = ext4 ] || skip "the wait does not depend on the file system"
    : >empty
    random a 8K conv=fsync
    start_service
    local begin
    begin=$(now_ms)
    pin 1 /volume1/a /volume1/empty
    [ $(($(now_ms) - begin)) -ge 10000 ]
    refute test -e "$(bitmap_file 1)"
    same false "$(state 1 .bitmapSet)"
    same null "$(config .volumes)"
    service_said <<END
: Get mapping of file (/volume1/empty) timeout (10 seconds)
: Can't add file (/volume1/empty) inode ($(inode empty)) to bitmap
: Handle request failed
: Handle request error (num = 0, type = pinFiles), drop it.
END
}
