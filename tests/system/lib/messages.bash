# Messages on the service's queue, written and read without the tool.
# shellcheck shell=bash

# record TYPE MOUNT_PATH DATA: a request record, 1540 bytes.
record() {
    local type=$1 i
    for i in 0 8 16 24; do
        # shellcheck disable=SC2059
        printf "\\x$(printf %02x $(((type >> i) & 255)))"
    done
    padded "$2" 512
    padded "$3" 1024
}

# padded TEXT LENGTH: the text, cut or filled with NUL bytes.
padded() {
    { printf '%s' "$1" && head -c "$2" /dev/zero; } | head -c "$2"
}

# send_record TYPE MOUNT_PATH DATA: as a message of type 1.
send_record() { record "$@" | send_raw 1; }

# send_raw MESSAGE_TYPE [COUNT]: standard input, whatever it is, COUNT times.
send_raw() { "$HELPERS/system_message" send "$KEY_FILE" "$@"; }

# receive_raw MESSAGE_TYPE: the next message's text; fails where there is none.
receive_raw() { "$HELPERS/system_message" receive "$KEY_FILE" "$1"; }

messages_waiting() { awk 'NR > 1 { sum += $5 } END { print sum + 0 }' /proc/sysvipc/msg; }
waiting_is() { [ "$(messages_waiting)" -eq "$1" ]; }

# Removes every queue of this private world, and the key file.
remove_queues() {
    awk 'NR > 1 { print $2 }' /proc/sysvipc/msg | xargs -r -n 1 ipcrm -q
    rm -rf "$KEY_FILE"
}

set_pending() { send_record 4 "$1" ""; }
end_pending() { send_record 5 "$1" ""; }
