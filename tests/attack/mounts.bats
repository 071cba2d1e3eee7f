#!/usr/bin/env bats
# FUSE mounts that users make, with whatever source they name, and that answer when they like.

load lib

setup_file() {
    make_volume 1 64M 16M ext4
    HELD=$(spare_device held 1M)
    export HELD
}

setup() { fresh_volume; }

teardown() {
    end_service
    cd /
    end_his_mount
    umount /etc/fuse.conf /etc/passwd /tmp/his /volume1/his/photos/a /volume1/his/photos 2>/dev/null || true
}

@test "a source below a FUSE mount that does not answer keeps nobody waiting" {
    mkdir /tmp/his
    mount -t tmpfs "$HELD/below" /tmp/his
    hold_device "$HELD"
    run timeout -k 1 20 "$BIN/veskcachepinfiletool" --get-uuid --mount-path /volume1
    release_device
    same "0 $(volume_uuid 1)" "$status $output"
}

end_his_mount() {
    ! is_child "${HIS_PID:-}" || kill -s KILL "$HIS_PID"
    HIS_PID=
}

# A user's mount whose file system never answers, made as users make them where /etc/fuse.conf lets them.
mount_unanswered() { # FOLDER
    [ -u "$(command -v fusermount3)" ] || skip "needs fusermount3, which mounts for users"
    echo user_allow_other >/tmp/fuse.conf
    mount --bind /tmp/fuse.conf /etc/fuse.conf
    { cat /etc/passwd && echo "attacker:x:$ATTACKER:$ATTACKER::/:/bin/sh"; } >/tmp/passwd
    mount --bind /tmp/passwd /etc/passwd
    chmod 666 /dev/fuse # as udev makes it
    cp "$HELPERS/system_unanswered_mount" /tmp/
    (
        close_descriptors
        cd /
        exec setpriv --reuid="$ATTACKER" --regid="$ATTACKER" --clear-groups \
            /tmp/system_unanswered_mount "$1" "$HELD"
    ) >/tmp/his.log 2>&1 &
    HIS_PID=$!
    it_is_mounted() { grep -q '^mounted$' /tmp/his.log; }
    wait_until it_is_mounted || {
        cat /tmp/his.log
        return 1
    }
    grep -q " $1 fuse .*user_id=$ATTACKER.*allow_other" /proc/self/mounts
}

# The companion, too, comes back from looking at the whole volume and knows what is the user's own.
list_below() {
    local listed looked=0
    listed=$(timeout -k 1 20 "$BIN/veskpin" --config "$CONF" list /volume1) || looked=$?
    echo "$listed"
    same 1 "$looked"
    [[ $listed = *pinned*" /volume1/b"* ]]
}

# it_holds_no_request_up COMMAND...: which makes the mount while a request waits for its turn.
it_holds_no_request_up() {
    attacker_folder /volume1/his
    attacker_folder /volume1/his/photos
    attacker dd if=/dev/urandom of=/volume1/his/photos/a bs=64K count=1 conv=fsync status=none
    random b 64K conv=fsync
    start_service
    set_pending /volume1
    wait_until messages_are_taken
    tool --pin-files /volume1/his/photos/a --mount-path /volume1
    wait_until request_is_stored 0
    "$@"
    end_pending /volume1
    PATIENCE=20 wait_until request_is_done 0
    pin 1 /volume1/b
    same "$(blocks_of b)" "$(bitmap_blocks 1)"
    list_below
    release_device
    end_his_mount
    stop_service
}

# The mount of a device that is held, made by root as fusermount makes them for a user.
mount_held() { # SOURCE TARGET
    mount --bind "$1" "$2"
    hold_device "$HELD"
}

@test "a FUSE mount in a folder's place holds no request up" {
    it_holds_no_request_up mount_held "${HELD%/*}" /volume1/his/photos
}

@test "a FUSE mount in a file's place holds no request up" {
    it_holds_no_request_up mount_held "$HELD" /volume1/his/photos/a
}

@test "a user's own mount that never answers holds no request up" {
    it_holds_no_request_up mount_unanswered /volume1/his/photos
}

@test "a user's own mount that calls itself the volume's device and never answers keeps nobody waiting" {
    HELD=$(volume_device 1)
    attacker_folder /tmp/his
    mount_unanswered /tmp/his
    run timeout -k 1 20 "$BIN/veskcachepinfiletool" --get-uuid --mount-path /volume1
    same "0 $(volume_uuid 1)" "$status $output"
    random b 64K conv=fsync
    start_service
    pin 1 /volume1/b
    same "$(blocks_of b)" "$(bitmap_blocks 1)"
    end_his_mount
    stop_service
}
