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

# shellcheck disable=SC2016
reason_of() { answer '.files[] | select(.path == $path) | .reason' --arg path "$1" -r; }
skipped() { answer '[.skipped[] | [.path, .reason]]'; }
left() { answer '[.requestsSent, (.files | length), (.repinned | length)]'; }

# in_background FILE COMMAND...: veskpin, its JSON into FILE; PIN_PID is its process.
in_background() {
    (
        close_descriptors
        exec "$BIN/veskpin" --config "$CONF" --json "${@:2}"
    ) >"$1" 2>/tmp/told &
    PIN_PID=$!
}

# All blocks of these files are marked and at the driver, and no others.
holds_just() { # FILE...
    same "$(blocks_of "$@")" "$(bitmap_blocks 1)"
    same "$(blocks_of "$@")" "$(driver_blocks 1)"
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

@test "without a service nothing is sent" {
    look 4 pin /volume1/d
    same '[0,3,0]' "$(left)"
    same '["unpinned","not-taken"]' "$(answer '[.files[] | [.state,.reason]] | unique[]')"
    [ ! -e "$KEY_FILE" ]
    look 4 pin --no-wait /volume1/d
    [ ! -e "$KEY_FILE" ]
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

@test "a time limit ends the wait, and what was sent is told" {
    start_service
    set_pending /volume1
    wait_until messages_are_taken
    look 4 pin --timeout 1 /volume1/d
    same '[1,3,0]' "$(left)"
    same '["pinning","not-taken"]' "$(answer '[.files[] | [.state,.reason]] | unique[]')"
    stop_service
}

@test "an interrupted one tells what was sent, and ends at once" {
    local status=0 began
    start_service
    set_pending /volume1
    wait_until messages_are_taken
    in_background "$ANSWER" pin /volume1/d
    wait_until request_is_stored 0
    began=$(now_ms)
    kill -s INT "$PIN_PID"
    wait "$PIN_PID" || status=$?
    same 130 "$status"
    [ $(($(now_ms) - began)) -lt 2000 ]
    check_schema pin
    same '["pinning","not-taken"]' "$(answer '[.files[] | [.state,.reason]] | unique[]')"
    stop_service
}

@test "a service that ends is told, with the paths" {
    local status=0 began
    start_service
    set_pending /volume1
    wait_until messages_are_taken
    in_background "$ANSWER" pin /volume1/d
    wait_until request_is_stored 0
    began=$(now_ms)
    is_child "$SERVICE_PID"
    kill -s KILL "$SERVICE_PID"
    wait "$PIN_PID" || status=$?
    same 4 "$status"
    [ $(($(now_ms) - began)) -lt 4000 ]
    check_schema pin
    same '["pinning","not-taken"]' "$(answer '[.files[] | [.state,.reason]] | unique[]')"
}

# many COUNT: a folder of so many files whose names fill a request each four or five of them.
many() {
    local i long
    long=$(printf '%0100d' 0)
    mkdir many
    for i in $(seq "$1"); do random "many/$i-$long" 4K; done
    sync
}
nth() { echo "many/$1-$(printf '%0100d' 0)"; }

# ends_by_itself STATUS COMMAND: what is in the background does so, within two seconds.
ends_by_itself() {
    local began status=0
    began=$(now_ms)
    wait "$PIN_PID" || status=$?
    same "$1" "$status"
    [ $(($(now_ms) - began)) -lt 2000 ]
    check_schema "$2"
}

@test "a receiver that ends is told, and nothing more is sent" {
    start_service
    set_pending /volume1
    wait_until messages_are_taken
    in_background "$ANSWER" pin /volume1/d
    wait_until request_is_stored 0
    printf x | send_raw 1
    ends_by_itself 4 pin
    same '["pinning","not-taken"]' "$(answer '[.files[] | [.state,.reason]] | unique[]')"
    same '["the service has ended"]' "$(answer '[.errors[].text]')"
}

@test "after a restart in time the rest is sent, and the end is told all the same" {
    local status=0
    many 20
    start_service
    set_pending /volume1
    wait_until messages_are_taken
    in_background "$ANSWER" --progress json pin --timeout 60 /volume1/many
    wait_until request_is_stored 1
    is_child "$SERVICE_PID"
    kill -s KILL "$SERVICE_PID"
    wait "$SERVICE_PID" || true
    start_service
    wait "$PIN_PID" || status=$?
    same 4 "$status"
    check_schema pin
    same '[20,["pinned",null]]' "$(answer '[(.files | length), (.files | map([.state,.reason]) | unique[])]')"
    holds_just many/*
    # What it told meanwhile.
    jq -se 'length > 1 and all(.[]; .total == 20 and .files <= 20 and .blocks <= .blocksTotal) and
        (map(.files) | . == sort) and (last | .secondsLeft != null)' /tmp/told
    stop_service
}

@test "what vanishes or changes meanwhile takes nothing else down" {
    local status=0
    many 20
    start_service
    set_pending /volume1
    wait_until messages_are_taken
    in_background "$ANSWER" pin /volume1/many
    wait_until request_is_stored 1
    # In order of their names the last ones are in requests that wait for their turn.
    rm "$(nth 9)"
    random "$(nth 8)" 200K conv=fsync
    end_pending /volume1
    wait "$PIN_PID" || status=$?
    same 1 "$status"
    check_schema pin
    same '[null,"vanished"]' "$(answer ".files[] | select(.path | startswith(\"/volume1/many/9-\")) | [.state,.reason]")"
    same '[19,["pinned",null]]' \
        "$(answer '[.files[] | select(.reason == null)] | [length, (map([.state,.reason]) | unique[])]')"
    holds_just many/*
    stop_service
}

@test "a queue that is full of something else ends it at once" {
    start_service
    head -c 8000 /dev/zero >/tmp/filler
    send_raw 2 1024 </tmp/filler 2>/dev/null || true
    in_background "$ANSWER" pin /volume1/d
    ends_by_itself 4 pin
    same '["the service'"'"'s queue is full of what it does not take, or too small"]' "$(answer '[.errors[].text]')"
    same '["unpinned","not-taken"]' "$(answer '[.files[] | [.state,.reason]] | unique[]')"
    stop_service
    remove_queues
}

@test "a service that stands still is waited for up to the time limit" {
    start_service
    is_child "$SERVICE_PID"
    kill -s STOP "$SERVICE_PID"
    look 4 pin --timeout 1 /volume1/d
    same '[0,3,0]' "$(left)"
    kill -s CONT "$SERVICE_PID"
    stop_service
}

@test "a cache that is lost meanwhile is told, and nothing more is sent" {
    many 20
    start_service
    set_pending /volume1
    wait_until messages_are_taken
    in_background "$ANSWER" pin /volume1/many
    wait_until request_is_stored 1
    printf '{"caches":[]}\n' >"$VESK_FLASHCACHE_CONFIG"
    end_pending /volume1
    # The service drops what is stored.
    wait_until request_is_done 1
    ends_by_itself 3 pin
    same 2 "$(answer .requestsSent)"
    same 20 "$(answer '.files | length')"
    same '["unpinned","dropped"]' "$(answer '[.files[] | select(.reason == "dropped") | [.state,.reason]] | unique[]')"
    same '["unpinned","not-taken"]' "$(answer '[.files[] | select(.reason == "not-taken") | [.state,.reason]] | unique[]')"
    volume_configure
    stop_service
}

@test "a volume that is unmounted meanwhile is told" {
    cd /
    start_service
    set_pending /volume1
    wait_until messages_are_taken
    in_background "$ANSWER" pin /volume1/d
    wait_until request_is_stored 0
    exec 7<"$(volume_loop 1)" # which would go with its last user
    umount /volume1
    end_pending /volume1
    wait_until request_is_done 0
    ends_by_itself 1 pin
    same '[null,"vanished"]' "$(answer '[.files[] | [.state,.reason]] | unique[]')"
    mount "$(volume_loop 1)" /volume1
    exec 7<&-
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

@test "of two at once one waits" {
    start_service
    set_pending /volume1
    wait_until messages_are_taken
    local first
    in_background /tmp/first pin /volume1/d/a
    first=$PIN_PID
    wait_until request_is_stored 0
    in_background /tmp/second pin /volume1/d/b
    it_is_told() { grep -q '^veskpin: another veskpin changes pins; waiting$' /tmp/told; }
    wait_until it_is_told
    same 1 "$(jq '.requestQueue | length' "$CONF")"
    end_pending /volume1
    wait "$first" && wait "$PIN_PID"
    holds_just d/a d/b
    stop_service
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

@test "who may not change anything is told so" {
    start_service
    local status=0
    setpriv --reuid=65534 --regid=65534 --clear-groups "$BIN/veskpin" --config "$CONF" --json pin /volume1/d \
        >"$ANSWER" || status=$?
    same 3 "$status"
    check_schema pin
    same '["/run/veskpin/lock","Permission denied"]' "$(answer '.errors[0] | [.path,.text]')"
    stop_service
}
