#!/usr/bin/env bats
# What gets in the way of veskpin pin: each ends it with the right status, and with what is true.

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

@test "without a service nothing is sent" {
    look 4 pin /volume1/d
    same '[0,3,0]' "$(left)"
    same '["unpinned","not-taken"]' "$(answer '[.files[] | [.state,.reason]] | unique[]')"
    [ ! -e "$KEY_FILE" ]
    look 4 pin --no-wait /volume1/d
    [ ! -e "$KEY_FILE" ]
}

@test "what needs nothing is told as it is, also behind what was not sent" {
    many 12
    random z 10K conv=fsync
    start_service
    look 0 pin /volume1/z
    stop_service
    look 4 pin /volume1/many /volume1/z
    same 'pinned null' "$(state_of /volume1/z) $(reason_of /volume1/z)"
    same '["unpinned","not-taken"]' \
        "$(answer '[.files[] | select(.path != "/volume1/z") | [.state,.reason]] | unique[]')"
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
    local status=0
    start_service
    set_pending /volume1
    wait_until messages_are_taken
    in_background "$ANSWER" pin /volume1/d
    wait_until request_is_stored 0
    kill -s INT "$PIN_PID"
    wait "$PIN_PID" || status=$?
    same 130 "$status"
    check_schema pin
    same '["pinning","not-taken"]' "$(answer '[.files[] | [.state,.reason]] | unique[]')"
    stop_service
}

# A FIFO that is full, and that nobody reads.
unread() {
    rm -f /tmp/unread
    mkfifo /tmp/unread
    exec 7<>/tmp/unread
    dd if=/dev/zero of=/tmp/unread bs=4096 oflag=nonblock status=none 2>/dev/null || true
}

ends_unread() { # COMMAND...: whose SIGINT ends it, though
    local status=0
    start_service
    set_pending /volume1
    wait_until messages_are_taken
    unread
    "$@" &
    PIN_PID=$!
    wait_until request_is_stored 0
    kill -s INT "$PIN_PID"
    wait "$PIN_PID" || status=$?
    exec 7<&-
    same 130 "$status"
    stop_service
}

answer_unread() {
    close_descriptors
    exec "$BIN/veskpin" --config "$CONF" --json pin /volume1/d >/tmp/unread
}

@test "an interrupted one whose answer nobody reads ends all the same" {
    ends_unread answer_unread
}

errors_unread() {
    close_descriptors
    exec "$BIN/veskpin" --config "$CONF" --progress json pin /volume1/d 2>/tmp/unread >/dev/null
}

@test "so does one whose progress and errors nobody reads" {
    ends_unread errors_unread
}

@test "a service that ends is told, with the paths" {
    local status=0
    start_service
    set_pending /volume1
    wait_until messages_are_taken
    in_background "$ANSWER" pin /volume1/d
    wait_until request_is_stored 0
    is_child "$SERVICE_PID"
    kill -s KILL "$SERVICE_PID"
    wait "$PIN_PID" || status=$?
    same 4 "$status"
    check_schema pin
    same '["pinning","not-taken"]' "$(answer '[.files[] | [.state,.reason]] | unique[]')"
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
    same '["unpinned","vanished"]' "$(answer ".files[] | select(.path | startswith(\"/volume1/many/9-\")) | [.state,.reason]")"
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
    ends_by_itself 3 pin
    same '[null,null]' "$(answer '[.files[] | [.state,.reason]] | unique[]')"
    same '["/volume1","is not mounted, or has no cache"]' "$(answer '.errors[0] | [.path,.text]')"
    mount "$(volume_loop 1)" /volume1
    exec 7<&-
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
