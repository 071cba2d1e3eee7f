# Messages on the service's queue, written and read without the tool.
# shellcheck shell=bash

# record TYPE MOUNT_PATH DATA: a request record, 1540 bytes.
record() { "$HELPERS/system_message" record "$@"; }

# send_record TYPE MOUNT_PATH DATA: as a message of type 1.
send_record() { record "$@" | send_raw 1; }

# send_raw MESSAGE_TYPE [COUNT]: standard input, whatever it is, COUNT times.
send_raw() { "$HELPERS/system_message" send "$KEY_FILE" "$@"; }

# receive_raw MESSAGE_TYPE: the next message's text; fails where there is none.
receive_raw() { "$HELPERS/system_message" receive "$KEY_FILE" "$1"; }

# Sets WAITING, the messages in all queues.
count_messages() {
    local key id permissions bytes number rest
    WAITING=0
    # shellcheck disable=SC2034
    while read -r key id permissions bytes number rest; do
        [ "$key" = key ] || WAITING=$((WAITING + number))
    done </proc/sysvipc/msg
}
waiting_is() {
    count_messages
    [ "$WAITING" -eq "$1" ]
}

# Removes every queue of this private world, and the key file.
remove_queues() {
    local key id rest
    while read -r key id rest; do
        [ "$key" = key ] || ipcrm -q "$id"
    done </proc/sysvipc/msg
    rm -rf "$KEY_FILE"
}

set_pending() { send_record 4 "$1" ""; }
end_pending() { send_record 5 "$1" ""; }
