#!/usr/bin/env bats
# Message queues and their key file, which every user of the machine can see and make.

load lib

setup_file() { make_volume 1 64M 16M ext4; }

setup() { fresh_volume; }

queues() { awk 'NR > 1 { print $1, $2, $3, $4 }' /proc/sysvipc/msg; }

@test "a user can neither send to the queue, nor remove it, nor change its key" {
    local before id
    start_service
    before=$(queues)
    id=$(awk 'NR > 1 { print $2 }' /proc/sysvipc/msg)
    run attacker_tool --stdout --reload-blocks --mount-path /volume1
    same 255 "$status"
    refute attacker ipcrm -q "$id"
    refute attacker rm -f "$KEY_FILE"
    refute attacker sh -c ": >'$KEY_FILE'"
    same "$before" "$(queues)"
    receiver_waits
}

@test "his own queue is not used, not even when its key is in the file" {
    local key
    random a 8K
    rm -f "$KEY_FILE"
    (umask 022 && : >"$KEY_FILE")
    attacker_message make "$KEY_FILE" 666
    key=$(awk 'NR > 1 { print $1 }' /proc/sysvipc/msg)
    refute attacker sh -c "echo $key >'$KEY_FILE'"
    says 255 --pin-files /volume1/a --mount-path /volume1 < <(
        echo ": Send pin file request, files = /volume1/a"
        for _ in 1 2 3; do
            printf ': %s\n' "Can't get a line from file ($KEY_FILE)" "Can't get message key from file ($KEY_FILE)"
        done
        printf ': %s\n' "Can't find the message queue's key from file ($KEY_FILE)" \
            "Can't get server messsage queue: File exists" "Pin files failed"
    )
    # Whoever repairs it without looking whose it is.
    printf %s "$key" >"$KEY_FILE"
    says 255 --pin-files /volume1/a --mount-path /volume1 <<END
: Send pin file request, files = /volume1/a
: Can't open message queue: Operation not permitted
: Can't get server messsage queue: Operation not permitted
: Pin files failed
END
    record 1 /volume1 /volume1/a | attacker_message send "$KEY_FILE" 1
    start_service
    wait_until receiver_has_ended
    service_said <<END
: Can't open message queue: Operation not permitted
: Create server messsage queue by file ($KEY_FILE) failed
END
    waiting_is 1
    refute test -e "$CONF"
}

# What the queue's mode and the end of the receiver allow him.
@test "he can take requests that wait, and end the receiver with a file that is gone" {
    attacker_folder /volume1/home
    attacker touch /volume1/home/a
    tool --pin-files /volume1/home/a --mount-path /volume1
    same "$(record 1 /volume1 /volume1/home/a | od -c)" "$(attacker_message receive "$KEY_FILE" 1 | od -c)"
    waiting_is 0
    tool --pin-files /volume1/home/a --mount-path /volume1
    attacker rm /volume1/home/a
    start_service
    wait_until receiver_has_ended
    stop_service
    same ": Can't add request to config ($CONF)" "$(tail -n 1 "$SERVICE_LOG" | sed 's/^veskcachepinfiletool//')"
    refute test -e "$CONF"
}
