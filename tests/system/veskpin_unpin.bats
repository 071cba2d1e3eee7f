#!/usr/bin/env bats
# veskpin unpin: what is let go, and what is pinned again since it shared a block with that.

load lib

setup_file() {
    make_volume 1 64M 16M ext4
    mount -t tmpfs -o mode=755 vesk-lib /var/lib # the machine's own is everybody's
}

setup() {
    fresh_volume
    mkdir d d/below
    random d/a 300K conv=fsync
    random d/b 700K conv=fsync
    random d/below/c 10K conv=fsync
}

@test "letting go pins the neighbours again that shared a block" {
    local i neighbours=
    mkdir small
    for i in 1 2 3 4 5 6; do random "small/$i" 8K; done
    sync
    for i in 1 2 4 5 6; do
        [ -z "$(common "$(blocks_of small/$i)" "$(blocks_of small/3)")" ] || neighbours+=" /volume1/small/$i"
    done
    [ -n "$neighbours" ]
    start_service
    look 0 pin /volume1/small
    look 0 unpin /volume1/small/3
    same '[2,1]' "$(answer '[.requestsSent, (.files | length)]')"
    same 'unpinned null' "$(state_of /volume1/small/3) $(reason_of /volume1/small/3)"
    same "$neighbours" " $(answer '.repinned | sort | join(" ")' -r)"
    holds_just small/1 small/2 small/4 small/5 small/6
    look 0 unpin /volume1/small /volume1/d
    same 5 "$(answer '.files | length')"
    check_nothing_pinned 1
    look 0 unpin /volume1/small
    same '[0,0,0]' "$(left)"
    stop_service
}

@test "what is missing or replaced is repair's, not the queue's" {
    start_service
    look 0 pin /volume1/d
    rm d/a
    random new 20K conv=fsync
    mv new d/b
    look 1 unpin /volume1/d
    same 'missing needs-repair replaced needs-repair unpinned null' \
        "$(state_of /volume1/d/a) $(reason_of /volume1/d/a) $(state_of /volume1/d/b) \
$(reason_of /volume1/d/b) $(state_of /volume1/d/below/c) $(reason_of /volume1/d/below/c)"
    same 1 "$(answer .requestsSent)"
    stop_service
}

@test "letting go that is interrupted sends the neighbours of what was sent all the same" {
    local i status=0
    mkdir small
    for i in 1 2 3 4 5 6; do random "small/$i" 8K; done
    sync
    start_service
    look 0 pin /volume1/small
    set_pending /volume1
    wait_until messages_are_taken
    in_background "$ANSWER" unpin /volume1/small/3
    wait_until request_is_stored 1
    kill -s INT "$PIN_PID"
    ends_by_itself 130 unpin
    same 'unpinning not-taken' "$(state_of /volume1/small/3) $(reason_of /volume1/small/3)"
    # Who is told was sent, and is pinned again.
    same 2 "$(answer .requestsSent)"
    [ "$(answer '.files | length')" -gt 1 ]
    end_pending /volume1
    wait_until request_is_done 2
    wait_until service_rests
    holds_just small/1 small/2 small/4 small/5 small/6
    stop_service
}

@test "letting go without waiting is told as underway" {
    start_service
    look 0 pin /volume1/d
    set_pending /volume1
    wait_until messages_are_taken
    look 0 unpin --no-wait /volume1/d
    same '["unpinning",null]' "$(answer '[.files[] | [.state,.reason]] | unique[]')"
    # Sent once.
    look 0 unpin --no-wait /volume1/d
    same '[0,3,0]' "$(left)"
    same '["unpinning",null]' "$(answer '[.files[] | [.state,.reason]] | unique[]')"
    stop_service
}

@test "a path that was pinned anew after it was replaced is told once" {
    start_service
    look 0 pin /volume1/d/a
    random new 20K conv=fsync
    mv new d/a
    look 0 pin /volume1/d/a
    look 1 unpin /volume1/d
    same '[1,"replaced","needs-repair"]' "$(answer '[(.files | length), .files[0].state, .files[0].reason]')"
    # The old record stays, the new one is gone.
    same 1 "$(config '.volumes["/volume1"].files | length')"
    same "" "$(common "$(blocks_of d/a)" "$(bitmap_blocks 1)")"
    stop_service
}

@test "a record whose path would be two in a request is not sent" {
    random 'd/a;b' 10K conv=fsync
    put_config "{\"volumes\":{\"/volume1\":{\"files\":{\"$(inode 'd/a;b')\":\"d/a;b\"}}}}"
    start_service
    look 1 unpin /volume1/d
    same 0 "$(answer .requestsSent)"
    same needs-repair "$(reason_of '/volume1/d/a;b')"
    stop_service
}

# It has looked for neighbours then.
has_told_for_a_while() { [ "$(wc -l </tmp/told)" -gt 3 ]; }

# grows_meanwhile NAME: d/a, which may be given another name, while a request to let it go is stored.
# Its new blocks can only be those which d/b leaves out.
grows_meanwhile() {
    local i status=0 before
    rm d/below/c
    before=$(blocks_of d/a)
    for i in 1 2 3 4; do
        [ -n "$(common "$before" "$(blocks_of d/b)")" ] || break
        mv d/b "between$i"
        random d/b 700K conv=fsync
    done
    [ -z "$(common "$before" "$(blocks_of d/b)")" ]
    start_service
    look 0 pin /volume1/d
    echo 0 >"/sys/fs/ext4/$(basename "$(findmnt -no SOURCE /volume1)")/reserved_clusters"
    dd if=/dev/zero of=fill bs=4K status=none 2>/dev/null || true
    sync
    fallocate --punch-hole -o 320K -l 32K d/b
    sync
    set_pending /volume1
    wait_until messages_are_taken
    in_background "$ANSWER" --progress json unpin /volume1/d/a
    wait_until request_is_stored 1
    wait_until has_told_for_a_while
    [ "$1" = a ] || mv d/a "d/$1"
    random "d/$1" 20K conv=notrunc,fsync oflag=append
    [ -n "$(common "$(blocks_of d/b)" "$(comm -13 <(sort <<<"$before") <(blocks_of "d/$1" | sort))")" ]
    end_pending /volume1
    wait "$PIN_PID" || status=$?
    same 0 "$status"
    # Without the blocks that no file has any more.
    same "$(blocks_of d/b)" "$(common "$(blocks_of d/b "d/$1")" "$(bitmap_blocks 1)")"
    stop_service
}

@test "neighbours of what has grown meanwhile are pinned again" {
    grows_meanwhile a
}

@test "also where it has another name by then: the service finds it by its inode" {
    grows_meanwhile new
}

@test "a neighbour whose path is known twice is pinned again once" {
    mkdir small
    random small/1 4K
    random small/2 4K
    sync
    [ -n "$(common "$(blocks_of small/1)" "$(blocks_of small/2)")" ]
    start_service
    look 0 pin /volume1/small
    # The record of a file that was there before, and a request.
    put_config "$(jq -c '.volumes["/volume1"].files["4000000000"] = "small/2"' "$CONF")"
    set_pending /volume1
    tool --pin-files /volume1/small/2 --mount-path /volume1
    wait_until request_is_stored 1
    look 0 unpin --no-wait /volume1/small/1
    same '[2,["/volume1/small/2"]]' "$(answer '[.requestsSent, .repinned]')"
    stop_service
}

@test "a link in a recorded folder's place is no doubt about what else has lost a block" {
    start_service
    look 0 pin /volume1/d
    mv d/below d/away
    ln -s away d/below
    look 0 unpin /volume1/d/a
    stop_service
}
