#!/usr/bin/env bats
# What users write into the mount table: the sources of their FUSE mounts are any text.

load lib

setup_file() { make_volume 1 64M 16M ext4; }

setup() { fresh_volume; }

@test "a source below a FUSE mount that does not answer keeps nobody waiting" {
    local device
    device=$(spare_device held 1M)
    mkdir /tmp/his
    # A mount without a device, with a source of the user's choice, as fusermount makes it for him.
    mount -t tmpfs "$device/below" /tmp/his
    hold_device "$device"
    run timeout -k 1 20 "$BIN/veskcachepinfiletool" --get-uuid --mount-path /volume1
    release_device
    umount /tmp/his
    same "0 $(volume_uuid 1)" "$status $output"
}
