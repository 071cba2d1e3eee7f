#!/usr/bin/env bats
# What veskpin plan tells before pinning is, to the block, what pinning then does.

load lib

setup_file() { make_volume 1 "$SIZE" 16M "$FSTYPE"; }

setup() { fresh_volume; }

plan() { answer ".volumes[0].$1" -r; }

# pinned_as_planned FILE...: each alone, as a plan, then pinned; the bitmap must have just that many
# blocks more.
pinned_as_planned() {
    local file before planned
    for file in "$@"; do
        before=$([ ! -e "$(bitmap_file 1)" ] || bitmap_blocks 1 | wc -l)
        look 0 plan "$file"
        planned=$(plan blocksNew)
        same "$(blocks_of "$file" | wc -l)" "$(plan blocks)"
        same "$(extents "$file" | wc -l)" "$(plan extents)"
        same "$((before + 0))" "$(plan blocksMarked)"
        pin 1 "$file"
        same "$((before + planned))" "$(bitmap_blocks 1 | wc -l)"
        look 0 plan "$file"
        same '[0,0]' "$(answer '.volumes[0] | [.blocksNew,.requestsNeeded]')"
    done
}

@test "fragmented, sparse, unwritten, tiny and freshly written files cost what was planned" {
    fragmented fragmented 12
    random sparse 64K seek=9 conv=fsync
    truncate -s 3M sparse
    fallocate -l 300000 unwritten
    printf x >tiny
    random fresh 700K
    start_service
    pinned_as_planned /volume1/{fragmented,sparse,unwritten,tiny,fresh}
    stop_service
}

@test "files of one plan that share blocks pay for them once" {
    mkdir d
    local i
    for i in 1 2 3 4 5 6 7 8 9; do printf x >"d/$i"; done
    sync
    look 0 plan /volume1/d
    same "$(blocks_of d/* | wc -l)" "$(plan blocks)"
    same "$(($(blocks_of d/* | wc -l) * 65536 - $(extents d/* | awk '{ s += $3 } END { print s * 512 }')))" \
        "$(plan roundingBytes)"
    same '[9,9,1]' "$(answer '.volumes[0] | [.fileCount,.bytes,.requestsNeeded]')"
    start_service
    pin 1 /volume1/d/*
    same "$(plan blocksNew)" "$(bitmap_blocks 1 | wc -l)"
    stop_service
}

@test "as many requests as are needed, each filled to its limit" {
    local name=long/
    mkdir long
    name=$(printf 'x%.0s' {1..236})
    local i
    # /volume1/long/ + 236 + 1: 251 bytes; four of them and three separators: 1007, with the numbers of
    # their inodes less.
    for i in 1 2 3 4 5; do random "long/$name$i" 4K; done
    sync
    look 0 plan /volume1/long
    same '[5,2]' "$(answer '.volumes[0] | [.fileCount,.requestsNeeded]')"
    # The service takes what was planned as one request.
    start_service
    local files=(long/*)
    send_record 1 /volume1 "$(join "${files[@]:0:4}" | sed 's,long/,/volume1/long/,g')"
    wait_until request_is_done 0
    same 4 "$(config '.volumes["/volume1"].files | length')"
    stop_service
}

@test "each reason for leaving a file out" {
    mkdir d d/sub
    random 'd/a b' 4K
    random 'd/a;b' 4K
    random 'd/a#b' 4K
    random $'d/a\nb' 4K
    random $'d/\xff' 4K
    random "d/first" 4K
    ln d/first d/second
    : >d/empty
    mkfifo d/fifo
    ln -s first d/link
    mkdir -p "d/$(printf 'y%.0s' {1..250})/$(printf 'z%.0s' {1..250})"
    random "d/$(printf 'y%.0s' {1..250})/$(printf 'z%.0s' {1..250})/$(printf 'w%.0s' {1..20})" 4K
    tool --set-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 1
    mount -t tmpfs none d/sub
    : >/tmp/elsewhere
    sync
    look 1 plan /volume1/d "$(bitmap_file 1)" /volume1/nothing /tmp/elsewhere
    umount d/sub
    same '/tmp/elsewhere no-volume
/volume1/d/a b name
/volume1/d/a#b name
/volume1/d/a;b name
/volume1/d/a\nb name
/volume1/d/empty no-blocks
/volume1/d/fifo not-regular
/volume1/d/link not-regular
/volume1/d/second same-inode
/volume1/d/sub other-filesystem
/volume1/d/yz too-long
/volume1/d/� not-utf8
/volume1/nothing not-found
/volume1/veskcachepinfile.bitmap bitmap-file' "$(answer '.skipped[] | (.path | gsub("y{250}/z{250}/w{20}"; "yz") |
        tojson | .[1:-1]) + " " + .reason' -r | LC_ALL=C sort)"
    same '"L3ZvbHVtZTEvZC//"' "$(answer '.skipped[] | select(.reason == "not-utf8") | .pathBytes')"
    same '[1]' "$(answer '[.volumes[].fileCount]')"
    # What was planned can be pinned, and nothing is sent by planning.
    [ ! -e "$KEY_FILE" ]
}

@test "what does not fit is told, with the reserve and what is stored already" {
    random a 8M conv=fsync
    random b 6M conv=fsync
    local a b both
    a=$(blocks_of a | wc -l)
    b=$(blocks_of b | wc -l)
    both=$(blocks_of a b | wc -l)
    look 0 plan a
    same "[256,$((256 - 26 - a)),true]" "$(answer '.volumes[0] | [.ssdBlocks,.headroomBlocks,.fits]')"
    look 0 plan a b
    same "[$((256 - 26 - both)),true]" "$(answer '.volumes[0] | [.headroomBlocks,.fits]')"
    look 1 plan a b --reserve 50
    same "[$((256 - 128 - both)),false]" "$(answer '.volumes[0] | [.headroomBlocks,.fits]')"
    start_service
    set_pending /volume1
    tool --pin-files /volume1/a --mount-path /volume1
    wait_until request_is_stored 0
    look 1 plan b --reserve 50
    same "[$((256 - 128 - both)),$b]" "$(answer '.volumes[0] | [.headroomBlocks,.blocksNew]')"
    end_pending /volume1
    wait_until queue_is_empty
    stop_service
}

@test "a path that is not there is told, also below a folder that is planned whole" {
    mkdir d
    random d/a 4K conv=fsync
    look 1 plan d d/a d/b
    same '[1,[["/volume1/d/b","not-found"]]]' \
        "$(answer '[.volumes[0].fileCount,[.skipped[] | [.path,.reason]]]')"
}

@test "who may not read a file is told so" {
    mkdir d
    random d/a 4K conv=fsync
    chmod 600 d/a
    local status=0
    setpriv --reuid=65534 --regid=65534 --clear-groups \
        "$BIN/veskpin" --config "$CONF" --json plan /volume1/d >"$ANSWER" || status=$?
    same 3 "$status"
    check_schema plan
    same '[["/volume1/d/a","no-permission"]]' "$(answer '[.skipped[] | [.path,.reason]]')"
    same 1 "$(answer '[.errors[] | select(.path == "/volume1/d/a")] | length')"
}

@test "wrong usage plans nothing" {
    local status
    for arguments in "" "--reserve 101 /volume1" "--reserve x /volume1" "--what /volume1" "--files-from /nowhere"; do
        status=0
        # shellcheck disable=SC2086
        veskpin plan $arguments >/tmp/output 2>/tmp/errors || status=$?
        same 2 "$status"
        [ ! -s /tmp/output ] && [ -s /tmp/errors ]
    done
}

@test "paths come from a list, separated by line feeds or NULs" {
    mkdir d
    random d/a 4K
    random $'d/b\nc' 4K
    sync
    printf '/volume1/d/a\n\nd/nothing' >/tmp/list
    look 1 plan --files-from /tmp/list
    same '[1,["/volume1/d/nothing"]]' "$(answer '[.volumes[0].fileCount,[.skipped[].path]]')"
    printf '/volume1/d/a\0d/b\nc\0' >/tmp/list
    look 1 plan -0 --files-from - </tmp/list
    same '[1,["/volume1/d/b\nc"]]' "$(answer '[.volumes[0].fileCount,[.skipped[].path]]')"
}
