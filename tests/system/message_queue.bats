#!/usr/bin/env bats
# The service's message queue and its key file: who makes them, what lies on the queue, what happens
# when they are damaged or full.

load lib

setup_file() { make_volume 1 64M 16M ext4; }

setup() {
    fresh_volume
    random a 8K
    random b 8K
}

teardown() {
    end_service
    # What the limit is in every private world.
    echo 1576960 >/proc/sys/kernel/msgmnb
}

# A pin request of file a that succeeds, or fails with the lines of standard input.
send_pin() { tool --pin-files /volume1/a --mount-path /volume1; }
pin_fails() {
    says 255 --pin-files /volume1/a --mount-path /volume1 < <(
        echo ": Send pin file request, files = /volume1/a"
        cat
        echo ": Pin files failed"
    )
}
no_key_in_file() {
    for _ in 1 2 3; do
        printf ': %s\n' "$1" "Can't get message key from file ($KEY_FILE)"
    done
    printf ': %s\n' "Can't find the message queue's key from file ($KEY_FILE)"
}
queue() { awk -v column="$1" 'NR > 1 { print $column }' /proc/sysvipc/msg; }

# ftok: the project, the device's and the inode's low bits.
key_of_file() {
    local device node
    read -r device node < <(stat -c '%d %i' "$KEY_FILE")
    echo $(((120 << 24) | ((device & 255) << 16) | (node & 65535)))
}

@test "the first client makes the key file and the queue, of the documented key, size and mode" {
    # A new queue starts with this limit, which is not the one to set.
    echo 2000000 >/proc/sys/kernel/msgmnb
    send_pin
    echo 1576960 >/proc/sys/kernel/msgmnb
    local key
    key=$(key_of_file)
    same "$key" "$(cat "$KEY_FILE")"
    same "${#key}" "$(stat -c %s "$KEY_FILE")"
    same "$key" "$(queue 1)"
    same 644 "$(queue 3)"
    same 1540 "$(queue 4)"
    same 1 "$(queue 5)"
    same 1576960 "$(ipcs -q -i "$(queue 2)" | sed -n 's/.*qbytes=\([0-9]*\).*/\1/p')"
}

@test "later processes use the same queue, the service included" {
    send_pin
    local id
    id=$(queue 2)
    send_pin
    same "$id" "$(queue 2)"
    start_service
    wait_until request_is_done 1
    same "$id" "$(queue 2)"
    stop_service
}

@test "the service makes the queue where no client has" {
    start_service
    same 1 "$(queue 2 | wc -l)"
    same "$(queue 1)" "$(cat "$KEY_FILE")"
    same 644 "$(stat -c %a "$KEY_FILE")"
    stop_service
}

@test "an empty key file that is there is used" {
    : >"$KEY_FILE"
    send_pin
    same "$(queue 1)" "$(cat "$KEY_FILE")"
}

@test "the messages, byte for byte" {
    tool --pin-files ";/volume1/a;;/volume1/b" --mount-path /volume1/
    tool --unpin-files /volume1/b --mount-path /volume1
    tool --reload-blocks --mount-path /volume1
    cmp <(record 1 /volume1 ";/volume1/a;;/volume1/b") <(receive_raw 1)
    cmp <(record 2 /volume1 /volume1/b) <(receive_raw 1)
    cmp <(record 6 /volume1 "") <(receive_raw 1)
    waiting_is 0
}

@test "a files text of 1024 characters and more is cut to 1024, without a NUL" {
    local files
    files=/volume1/a$(printf ';%.0s' {1..600})$(printf 'f%.0s' {1..600})
    tool --pin-files "${files:0:1023}" --mount-path /volume1
    tool --pin-files "${files:0:1024}" --mount-path /volume1
    tool --pin-files "$files" --mount-path /volume1
    local length message=$BATS_TEST_TMPDIR/message
    for length in 1023 1024 1024; do
        receive_raw 1 >"$message"
        same 1540 "$(stat -c %s "$message")"
        same "${files:0:length}" "$(tail -c 1024 "$message" | tr -d '\0')"
    done
}

@test "no queue and no key file for a volume without a cache" {
    echo '{"caches":[]}' >"$VESK_FLASHCACHE_CONFIG"
    local command
    for command in "--pin-files /volume1/a" --reload-blocks --add-pending --remove-pending; do
        # shellcheck disable=SC2086
        refute tool $command --mount-path /volume1
    done
    refute test -e "$KEY_FILE"
    same "" "$(queue 2)"
}

@test "add-pending makes the queue, if nothing else" {
    : >"$KEY_FILE"
    says_masked 255 --verbose --add-pending --mount-path /volume1 < <(
        printf ': %s\n' "Verbose mode is enable" "main() [N] : +++++" "SetSpaceStateRequest() [N] : +++++"
        printf ': %s\n' "SpaceGetUUID() [N]: Get UUID = $(volume_uuid 1)" \
            "SpaceHasCache() [N]: Check Space ($(volume_uuid 1)) ret=0" \
            "SpaceHasCacheAndSupportPinByUUID() [N]: supportPin=1" \
            "SpaceHasCacheAndSupportPin() [N]: Volume (/volume1) support pin"
        printf ': %s\n' "MsgQueueGet() [N] : +++++" "MsgCreateExclusive() [N] : +++++" \
            "MsgCreateExclusive() [N]: Generate message queue key = $(key_of_file) (ADDRESS)" \
            "MsgCreateExclusive() [N]: Set size = 1576960 (num of request = 1024, request size = 1540)" \
            "FileWriteString() [N]: Write to file OK" "MsgCreateExclusive() [N] : -----" \
            "MsgQueueGet() [N]: Create message queue by file ($KEY_FILE) successfully" \
            "MsgQueueGet() [N] : -----" "SetSpaceStateRequest() [N]: Get server message queue id = -1"
        for _ in 1 2 3; do
            echo ": MsgQueueSend() [N]: Send to message queue (id = -1) msg type = 1"
        done
        printf ': %s\n' "MsgQueueSend() [N] : ***** Send message timeout (3 seconds)" \
            "SetSpaceStateRequest() [N] : ***** Send message failed: Invalid argument" \
            "SetSpaceStateRequest() [N] : -----" "main() [N] : ***** Can't sent pending space" \
            "main() [N] : -----"
    )
    same 1 "$(queue 2 | wc -l)"
    waiting_is 0
}

@test "a full queue fails the send after three seconds" {
    send_pin
    # The queue's byte limit may not be raised everywhere; the number of messages follows from it.
    same 1576960 "$(ipcs -q -i "$(queue 2)" | sed -n 's/.*qbytes=\([0-9]*\).*/\1/p')"
    record 6 /volume1 "" | send_raw 1 1023
    waiting_is 1024
    local begin
    begin=$(now_ms)
    pin_fails <<END
: Send message timeout (3 seconds)
: Send message failed: Resource temporarily unavailable
END
    [ $(($(now_ms) - begin)) -ge 3000 ]
    waiting_is 1024
    # As soon as there is room, it works again.
    receive_raw 1 >/dev/null
    send_pin
    waiting_is 1024
}

@test "a send waits for room for up to three seconds" {
    send_pin
    record 6 /volume1 "" | send_raw 1 1023
    (
        close_descriptors
        exec "$BIN/veskcachepinfiletool" --pin-files /volume1/a --mount-path /volume1
    ) &
    local client=$!
    wait_until thread_is_in_call "$client" "$PAUSE_CALL"
    # In its pause, however long it takes to make room.
    is_child "$client"
    kill -s STOP "$client"
    receive_raw 1 >/dev/null
    kill -s CONT "$client"
    wait "$client"
    waiting_is 1024
}

@test "a key file without a number aborts the process" {
    send_pin
    echo abc >"$KEY_FILE"
    ERRORS="terminate called after throwing an instance of 'std::invalid_argument'
  what():  stoi" answers 134 --pin-files /volume1/a --mount-path /volume1 </dev/null
    echo 99999999999 >"$KEY_FILE"
    ERRORS="terminate called after throwing an instance of 'std::out_of_range'
  what():  stoi" answers 134 --pin-files /volume1/a --mount-path /volume1 </dev/null
}

@test "a key file with blanks before and anything behind the number is read" {
    send_pin
    local key
    key=$(cat "$KEY_FILE")
    printf '  %s more\nlines\n' "$key" >"$KEY_FILE"
    send_pin
    waiting_is 2
}

@test "a key file that was emptied while its queue exists" {
    send_pin
    : >"$KEY_FILE"
    pin_fails < <(
        no_key_in_file "Can't get a line from file ($KEY_FILE)"
        echo ": Can't get server messsage queue: File exists"
    )
    # The way out that docs/operations.md has.
    recipe 'KEY_FILE='
    send_pin
    waiting_is 2
}

@test "a key file that names no queue" {
    send_pin
    echo 123456 >"$KEY_FILE"
    pin_fails <<END
: Can't open message queue: No such file or directory
: Can't get server messsage queue: No such file or directory
END
}

@test "a folder in the key file's place: the queue is there for its maker alone" {
    mkdir "$KEY_FILE"
    says 0 --pin-files /volume1/a --mount-path /volume1 <<END
: Send pin file request, files = /volume1/a
: Can't open file ($KEY_FILE)
: Can't write to file ($KEY_FILE)
: Send pin file request OK
END
    waiting_is 1
    pin_fails < <(
        no_key_in_file "Can't get a line from file ($KEY_FILE)"
        echo ": Can't get server messsage queue: Is a directory"
    )
}

@test "a folder that takes no key file" {
    # All of /run is mounted read-only for this one command.
    unshare --mount sh -c 'mount -o remount,bind,ro /run && exec "$@"' sh \
        "$BIN/veskcachepinfiletool" --stdout --pin-files /volume1/a --mount-path /volume1 \
        >"$BATS_TEST_TMPDIR/output" || same 255 $?
    same "$(
        sed 's/^:/veskcachepinfiletool:/' < <(
            printf ': %s\n' "Send pin file request, files = /volume1/a" "Can't open file ($KEY_FILE)" \
                "Create file ($KEY_FILE) failed"
            no_key_in_file "Can't open file ($KEY_FILE)"
            printf ': %s\n' "Can't get server messsage queue: No such file or directory" \
                "Pin files failed"
        )
    )" "$(cat "$BATS_TEST_TMPDIR/output")"
    same "" "$(queue 2)"
}
