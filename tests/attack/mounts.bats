#!/usr/bin/env bats
# FUSE mounts that users make, with whatever source they name, and that answer when they like. Made by
# root here, as fusermount makes them for a user.

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
    umount /tmp/his /volume1/his/photos/a /volume1/his/photos 2>/dev/null || true
}

@test "a source below a FUSE mount that does not answer keeps nobody waiting" {
    mkdir /tmp/his
    mount -t tmpfs "$HELD/below" /tmp/his
    hold_device "$HELD"
    run timeout -k 1 20 "$BIN/veskcachepinfiletool" --get-uuid --mount-path /volume1
    release_device
    same "0 $(volume_uuid 1)" "$status $output"
}

# it_holds_no_request_up SOURCE TARGET: mounted while a request waits for its turn.
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
    mount --bind "$1" "$2"
    hold_device "$HELD"
    end_pending /volume1
    PATIENCE=20 wait_until request_is_done 0
    pin 1 /volume1/b
    same "$(blocks_of b)" "$(bitmap_blocks 1)"
    release_device
    stop_service
}

@test "a FUSE mount in a folder's place holds no request up" {
    it_holds_no_request_up "${HELD%/*}" /volume1/his/photos
}

@test "a FUSE mount in a file's place holds no request up" {
    it_holds_no_request_up "$HELD" /volume1/his/photos/a
}
