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
