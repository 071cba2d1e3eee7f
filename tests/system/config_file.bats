#!/usr/bin/env bats
# Where the configuration file lies: what can go wrong with its folder, and what a change keeps.

load lib

setup_file() { make_volume 1 64M 16M ext4; }

setup() {
    fresh_volume
    random a 8K conv=fsync
    FOLDER=${CONF%/*}
}

teardown() {
    end_service
    cd /
    while mountpoint -q "$FOLDER"; do
        umount -l "$FOLDER"
    done
    ! mountpoint -q "$CONF" || umount "$CONF"
}

no_temporary_files() { same "" "$(find "$1" -name '.*' -type f)"; }

@test "the file keeps its owner and mode" {
    put_config '{}'
    chown 1234:2345 "$CONF"
    chmod 0640 "$CONF"
    start_service
    pin 1 /volume1/a
    stop_service
    same "1234:2345 640" "$(stat -c '%u:%g %a' "$CONF")"
    no_temporary_files "$FOLDER"
}

@test "a symbolic link stays one, its target changes" {
    mkdir -p /run/elsewhere
    echo '{}' >/run/elsewhere/target.json
    ln -s ../elsewhere/target.json "$CONF"
    start_service
    pin 1 /volume1/a
    stop_service
    test -L "$CONF"
    same ../elsewhere/target.json "$(readlink "$CONF")"
    same 1 "$(jq .nextRequestNum /run/elsewhere/target.json)"
    no_temporary_files "$FOLDER"
    no_temporary_files /run/elsewhere
}

@test "a link that points nowhere creates its target" {
    rm -rf /run/elsewhere
    mkdir -p /run/elsewhere
    ln -s /run/elsewhere/target.json "$CONF"
    start_service
    pin 1 /volume1/a
    stop_service
    test -L "$CONF"
    same 1 "$(jq .nextRequestNum /run/elsewhere/target.json)"
}

@test "in a read-only folder nothing changes" {
    put_config '{"nextRequestNum":5}'
    mount --bind "$FOLDER" "$FOLDER"
    mount -o remount,bind,ro "$FOLDER"
    start_service
    tool --reload-blocks --mount-path /volume1
    wait_until waiting_is 0
    wait_until service_rests
    same '{"nextRequestNum":5}' "$(config .)"
    service_said <<END
: Can't open config file ($CONF)
: Can't write to files
: Can't add request to config ($CONF)
END
}

@test "a file that is a mount of its own is written in place" {
    put_config '{}'
    echo '{}' >/tmp/own.json
    mount --bind /tmp/own.json "$CONF"
    start_service
    pin 1 /volume1/a
    stop_service
    same 1 "$(jq .nextRequestNum /tmp/own.json)"
    no_temporary_files "$FOLDER"
}

@test "on a full disk the old document stays whole, and the service goes on when there is room" {
    mount -t tmpfs -o size=64k tmpfs "$FOLDER"
    put_config '{"nextRequestNum":7}'
    start_service
    dd if=/dev/zero of="$FOLDER/filler" bs=4k status=none 2>/dev/null || true
    tool --pin-files /volume1/a --mount-path /volume1
    wait_until waiting_is 0
    wait_until service_rests
    same '{"nextRequestNum":7}' "$(config .)"
    no_temporary_files "$FOLDER"
    rm "$FOLDER/filler"
    pin 1 /volume1/a
    same 8 "$(config .nextRequestNum)"
    service_said <<END
: Handle request (type=pinFiles files=a#$(inode a)) OK 
END
}

@test "on a full disk a document that was not there is not made" {
    mount -t tmpfs -o size=64k tmpfs "$FOLDER"
    dd if=/dev/zero of="$FOLDER/filler" bs=4k status=none 2>/dev/null || true
    start_service
    tool --reload-blocks --mount-path /volume1
    wait_until waiting_is 0
    wait_until service_rests
    same filler "$(ls -A "$FOLDER")"
    rm "$FOLDER/filler"
    pin 1 /volume1/a
    same 1 "$(config .nextRequestNum)"
    stop_service
}

@test "without an inode for another file the document is written in place, and every request stored" {
    mount -t tmpfs -o size=64k,nr_inodes=2 tmpfs "$FOLDER"
    put_config '{"nextRequestNum":7}'
    start_service
    pin 1 /volume1/a
    stop_service
    same 8 "$(config .nextRequestNum)"
    check_pinned /volume1/a
    same "${CONF##*/}" "$(ls -A "$FOLDER")"
}

@test "without an inode and without room the document stays whole, and the refusal is told" {
    mount -t tmpfs -o size=8k,nr_inodes=3 tmpfs "$FOLDER"
    put_config '{"nextRequestNum":7}'
    dd if=/dev/zero of="$FOLDER/filler" bs=4k count=1 status=none
    # The document nearly fills its page: what comes needs another one.
    jq -c --arg long "$(head -c 4000 /dev/zero | tr '\0' x)" '.volumes["/other"].files["1"] = $long' "$CONF" >/tmp/long
    cat /tmp/long >"$CONF"
    start_service
    tool --reload-blocks --mount-path /volume1
    wait_until waiting_is 0
    wait_until service_rests
    same "$(cat /tmp/long)" "$(cat "$CONF")"
    service_said <<END
: Can't open config file ($CONF)
: Can't write to files
: Can't add request to config ($CONF)
END
}

@test "without an inode a document that was not there cannot be made, and the refusal is told" {
    mount -t tmpfs -o size=64k,nr_inodes=1 tmpfs "$FOLDER"
    start_service
    tool --reload-blocks --mount-path /volume1
    wait_until waiting_is 0
    wait_until service_rests
    same "" "$(ls -A "$FOLDER")"
    service_said <<END
: Can't open config file ($CONF)
: Can't write to files
: Can't add request to config ($CONF)
END
}

@test "a folder that is missing is not made" {
    rm -rf "$FOLDER"
    start_service
    tool --reload-blocks --mount-path /volume1
    wait_until waiting_is 0
    wait_until service_rests
    refute test -e "$FOLDER"
    service_said <<END
: Can't open config file ($CONF)
: Can't write to files
: Can't add request to config ($CONF)
END
}

@test "a FIFO in its place is refused and holds nobody up" {
    mkfifo "$CONF"
    says 0 --check-pin /volume1/a --config-path "$CONF" <<END
: Can't open file $CONF
: Can't read data from config file ($CONF)
Error
END
    tool --reload-blocks --mount-path /volume1
    # Both threads end, and with them the process.
    tool --stdout --start-service --config-path "$CONF" >/run/log
    grep -q ": Can't add request to config ($CONF)" /run/log
    grep -q ": Get request error" /run/log
    [ -p "$CONF" ]
}

@test "a file removed while the service runs is made anew by the next request" {
    start_service
    pin 1 /volume1/a
    rm "$CONF"
    tool --reload-blocks --mount-path /volume1
    wait_until request_is_done 0
    same '{"nextRequestNum":1,"requestQueue":null,"requests":{}}' "$(config .)"
    stop_service
}
