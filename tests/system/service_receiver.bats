#!/usr/bin/env bats
# Messages that nobody's client sends: what each does to the receiver, the worker and the queue.

load lib

setup_file() { make_volume 1 64M 16M ext4; }

setup() {
    fresh_volume
    random a 8K conv=fsync
    random b 8K conv=fsync
}

send_pin() { tool --pin-files "$1" --mount-path /volume1; }

thread_is_gone() { [ ! -e "/proc/$SERVICE_PID/task/$1" ]; }

# receiver_ended [WAITING]: with the lines of standard input. What is sent now stays on the queue, as
# the one message (WAITING) there, and the worker still serves what was stored before.
receiver_ended() {
    send_pin /volume1/b
    wait_until queue_is_empty
    wait_until receiver_has_ended
    waiting_is "${1:-1}"
    stop_service
    {
        sed 's/^:/veskcachepinfiletool:/'
        echo "veskcachepinfiletool: Handle request (type=pinFiles files=a#$(inode a)) OK "
    } | sort >"$BATS_TEST_TMPDIR/expected"
    sed 1d "$SERVICE_LOG" | sort | diff -u "$BATS_TEST_TMPDIR/expected" -
}

@test "an empty mount path ends the receiver" {
    start_service
    send_pin /volume1/a
    send_record 1 "" /volume1/a
    receiver_ended <<END
: Space UUID is not set
: Get wrong message format
END
}

@test "a pin without files ends the receiver, and so does an unpin" {
    start_service
    send_pin /volume1/a
    send_record 1 /volume1 ""
    receiver_ended <<END
: Should provide file paths
: Get wrong message format
END
    fresh_service
    start_service
    send_pin /volume1/a
    send_record 2 /volume1 ""
    receiver_ended <<END
: Should provide file paths
: Get wrong message format
END
}

@test "a file outside the volume ends the receiver" {
    start_service
    send_pin /volume1/a
    send_record 1 /volume1 "/volume1/a;/etc/passwd"
    receiver_ended <<END
: Failed to Get relative path (Volume path=/volume1 File path=/etc/passwd
: Get relative paths failed
: Can't add request to json
: Can't add request to config ($CONF)
END
    same 1 "$(config .nextRequestNum)"
}

@test "the worker goes on after the receiver has ended" {
    start_service
    send_pin /volume1/a
    send_pin /volume1/b
    wait_until request_is_stored 1
    send_record 6 "" ""
    wait_until request_is_done 1
    same 2 "$(config '.volumes["/volume1"].files | length')"
    stop_service
    # Two threads write.
    same "Get wrong message format
Handle request (type=pinFiles files=a#$(inode a)) OK 
Handle request (type=pinFiles files=b#$(inode b)) OK 
Space UUID is not set" "$(sed -n '2,$s/^veskcachepinfiletool: //p' "$SERVICE_LOG" | sort)"
}

@test "types that are no request's end the receiver: negative, 7 and the largest" {
    local type
    for type in -1 7 2147483647; do
        fresh_service
        start_service
        send_pin /volume1/a
        send_record "$type" /volume1 /volume1/a
        receiver_ended <<END
: Convert request type to string errror
: Can't add request to json
: Can't add request to config ($CONF)
END
    done
}

@test "a message longer than a record ends the receiver" {
    start_service
    send_pin /volume1/a
    { record 1 /volume1 /volume1/a && echo; } | send_raw 1
    # It is too long to be taken and stays there, too.
    receiver_ended 2 <<END
: Receive messaged failed: Argument list too long
END
}

@test "an empty message has no mount path" {
    start_service
    send_pin /volume1/a
    send_raw 1 </dev/null
    receiver_ended <<END
: Space UUID is not set
: Get wrong message format
END
}

@test "the removal of the queue ends the receiver" {
    start_service
    send_pin /volume1/a
    wait_until request_is_stored 0
    # Where the queue is gone before it waits again, the call tells another reason.
    wait_until receiver_waits
    remove_queues
    # The request sent now makes a queue of its own.
    receiver_ended <<END
: Receive messaged failed: Identifier removed
END
}

@test "a request of type unknown is stored and ends the worker for good" {
    start_service
    find_worker
    local worker=$WORKER_THREAD
    send_record 0 /volume1 ""
    wait_until request_is_stored 0
    wait_until thread_is_gone "$worker"
    same '{"data":null,"mountPath":"/volume1","type":"unknown"}' "$(config '.requests["0"]')"
    send_pin /volume1/a
    wait_until request_is_stored 1
    same '["0","1"]' "$(config .requestQueue)"
    service_said <<END
: Can't get correct request type
: Get request error
END
}

@test "a service whose worker and receiver have both ended ends with status 0" {
    start_service
    send_record 0 /volume1 ""
    send_record 6 "" ""
    local status=0
    wait "$SERVICE_PID" || status=$?
    SERVICE_PID=
    same 0 "$status"
    same "Can't get correct request type
Get request error
Get wrong message format
Space UUID is not set" "$(sed -n '2,$s/^veskcachepinfiletool: //p' "$SERVICE_LOG" | sort)"
}

@test "an ack is stored, refused by the handler and dropped" {
    start_service
    send_record 3 /volume1 ""
    wait_until request_is_done 0
    service_said <<END
: Get unhandle request (ack)
: Handle request failed
: Bitmap is already NULL
: Handle request error (num = 0, type = ack), drop it.
END
}

@test "a mount path without its NUL ends at 511 characters, and its request is dropped" {
    local path
    path=/$(head -c 520 /dev/zero | tr '\0' v)
    start_service
    send_record 6 "$path" ""
    wait_until request_is_done 0
    service_said <<END
: Can't get space uuid from mount path (${path:0:511})
: Drop requests finish
END
}

@test "a files text without its NUL ends at 1023 characters" {
    # Separators fill it up: the last character is cut off, which leaves a file that is there.
    local files
    files=/volume1/a$(head -c 1003 /dev/zero | tr '\0' ';')/volume1/ab
    same 1024 "${#files}"
    start_service
    send_record 1 /volume1 "$files"
    wait_until request_is_done 0
    same '["0"]' "$(config '[.nextRequestNum - 1 | tostring]')"
    service_said <<END
: Handle request (type=pinFiles files=a#$(inode a);a#$(inode a)) OK 
END
}

@test "file names with conversion characters go through unharmed" {
    local name='100%s%n%d%%.bin'
    random "$name" 8K conv=fsync
    start_service --verbose
    pin 1 "/volume1/$name"
    same "{\"$(inode "$name")\":\"$name\"}" "$(config '.volumes["/volume1"].files')"
    unpin 1 "/volume1/$name"
    stop_service
    grep -q "Handle request (type=unpinFiles files=$name#$(inode "$name")) OK $" "$SERVICE_LOG"
}

@test "a name with a blank is cut at the blank, one with a # cannot be parsed" {
    random "x y" 8K conv=fsync
    random "x#1" 8K conv=fsync
    start_service
    send_pin "/volume1/x y"
    send_pin "/volume1/x#1"
    wait_until request_is_done 1
    # What is left of the name leads to the folder all the same, and the inode decides there.
    same "{\"$(inode "x y")\":\"x\"}" "$(config '.volumes["/volume1"].files')"
    service_said <<END
: Handle request (type=pinFiles files=x#$(inode "x y")) OK 
: Parse file inode from string (x#1#$(inode "x#1")) failed
: Can't parse file inodes from request's data (x#1#$(inode "x#1"))
: Handle request failed
: Handle request error (num = 1, type = pinFiles), drop it.
END
}

@test "messages of another message type are never taken" {
    start_service
    record 1 /volume1 /volume1/a | send_raw 2
    pin 1 /volume1/b
    waiting_is 1
    same "$(record 1 /volume1 /volume1/a | sha256sum)" "$(receive_raw 2 | sha256sum)"
    stop_service
}
