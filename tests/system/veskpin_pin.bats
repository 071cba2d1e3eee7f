#!/usr/bin/env bats
# veskpin pin: whole trees, with an answer for each file, held against bitmap and driver.

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



@test "a tree is pinned whole, and each file told" {
    start_service
    look 0 pin /volume1/d
    same '[1,3,0]' "$(left)"
    same '[]' "$(skipped)"
    same 'pinned null pinned null' "$(state_of /volume1/d/a) $(reason_of /volume1/d/a) \
$(state_of /volume1/d/below/c) $(reason_of /volume1/d/below/c)"
    holds_just d/a d/b d/below/c
    look 0 list /volume1/d
    stop_service
}

@test "what is pinned already is not sent again" {
    start_service
    look 0 pin /volume1/d/a
    look 0 pin /volume1/d
    same '[1,3,0]' "$(left)"
    look 0 pin /volume1/d
    same '[0,3,0]' "$(left)"
    stop_service
    look 0 pin /volume1/d
}

@test "what is recorded under the path from which it was renamed is pinned, unless another has its path" {
    start_service
    look 0 pin /volume1/d
    mv d/a d/new
    look 0 pin /volume1/d/new
    same '[0,1,0]' "$(left)"
    mv d/new d/b
    look 1 pin /volume1/d/b
    same '[0,1,0]' "$(left)"
    same 'replaced needs-repair' "$(state_of /volume1/d/b) $(reason_of /volume1/d/b)"
    stop_service
}

@test "what cannot be pinned is left out, and why" {
    : >d/empty
    random 'd/a blank' 10K
    random 'd/semi;colon' 10K
    ln -s a d/link
    ln d/a d/twin
    mkfifo d/fifo
    sync
    start_service
    look 1 pin /volume1/d /volume1/none
    same '[["/volume1/d/a blank","name"],["/volume1/d/empty","no-blocks"],["/volume1/d/fifo","not-regular"],["/volume1/d/link","not-regular"],["/volume1/d/semi;colon","name"],["/volume1/d/twin","same-inode"],["/volume1/none","not-found"]]' \
        "$(answer '[.skipped | sort_by(.path)[] | [.path, .reason]]')"
    same 'pinned pinned pinned' "$(answer '[.files[].state] | join(" ")' -r)"
    stop_service
}

@test "what does not fit is refused whole, unless forced" {
    random big 15M conv=fsync
    start_service
    look 1 pin /volume1/big /volume1/d/a
    same '[["/volume1/big","no-room"],["/volume1/d/a","no-room"]]' "$(skipped)"
    same '[0,0,0]' "$(left)"
    [ ! -e "$(bitmap_file 1)" ]
    look 0 pin --reserve 0 /volume1/big
    look 0 pin --force /volume1/d
    holds_just big d/a d/b d/below/c
    # Nothing to be sent needs no room.
    look 0 pin /volume1/d
    same '[0,3,0]' "$(left)"
    stop_service
}

@test "who does not wait is told what is sent" {
    start_service
    set_pending /volume1
    wait_until messages_are_taken
    look 0 pin --no-wait /volume1/d
    same '[1,3,0]' "$(left)"
    same '["pinning",null]' "$(answer '[.files[] | [.state,.reason]] | unique[]')"
    same 1 "$(jq '.requestQueue | length' "$CONF")"
    stop_service
}

@test "a pin that is underway is waited for" {
    start_service
    set_pending /volume1
    wait_until messages_are_taken
    look 0 pin --no-wait /volume1/d
    in_background "$ANSWER" pin /volume1/d
    wait_until request_is_stored 1
    end_pending /volume1
    wait "$PIN_PID"
    same '["pinned",null]' "$(answer '[.files[] | [.state,.reason]] | unique[]')"
    stop_service
}
