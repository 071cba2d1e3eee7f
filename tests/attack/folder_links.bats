#!/usr/bin/env bats
# Links in the place of folders, on the way to a file that root pins or unpins for a user.

load lib

VICTIM=1235

setup_file() { make_volume 1 64M 16M ext4; }

setup() {
    fresh_volume
    attacker_folder /volume1/his
    attacker_folder /volume1/his/photos
    attacker dd if=/dev/urandom of=/volume1/his/photos/a bs=64K count=2 conv=fsync status=none
    install -d -o "$VICTIM" -m 755 /volume1/victim
    random /volume1/victim/a 128K conv=fsync
    chown "$VICTIM" /volume1/victim/a
    start_service
}

# Nor ever was: no bitmap file was made.
nothing_is_pinned() { [ ! -e "$(bitmap_file 1)" ] && same "" "$(pinned_blocks 1)"; }

his_folder_becomes_a_link() { # TARGET
    attacker rm -rf /volume1/his/photos
    attacker ln -s "$1" /volume1/his/photos
}

@test "a link in a folder's place unpins no other user's file" {
    local target
    pin 1 /volume1/victim/a
    for target in ../victim /volume1/victim /proc/self/root/volume1/victim; do
        his_folder_becomes_a_link "$target"
        unpin 1 /volume1/his/photos/a
        same "$(blocks_of /volume1/victim/a)" "$(bitmap_blocks 1)"
        same "$(blocks_of /volume1/victim/a)" "$(pinned_blocks 1)"
    done
    stop_service
}

@test "a link in a folder's place pins no other user's file" {
    his_folder_becomes_a_link ../victim
    pin 1 /volume1/his/photos/a
    nothing_is_pinned
    stop_service
}

@test "a link that leads out of the volume and back is not followed" {
    mkdir /tmp/attacker
    chown "$ATTACKER" /tmp/attacker
    attacker ln -s /volume1/victim /tmp/attacker/back
    his_folder_becomes_a_link /tmp/attacker/back
    pin 1 /volume1/his/photos/a
    nothing_is_pinned
    stop_service
}

@test "files in folders and hard links are pinned as ever" {
    attacker ln /volume1/his/photos/a /volume1/his/hard
    pin 1 /volume1/his/photos/a
    same "$(blocks_of /volume1/his/hard)" "$(bitmap_blocks 1)"
    unpin 1 /volume1/his/hard
    same "" "$(bitmap_blocks 1)"
    stop_service
}
