#!/usr/bin/env bats
# The bitmap file's place, the volume's top folder: where only root writes there, and where users do.

load lib

setup_file() { make_volume 1 64M 16M ext4; }

setup() {
    users_volume file
    start_service
}

teardown() {
    chmod 755 /volume1
    end_service
}

BITMAP=/volume1/veskcachepinfile.bitmap

@test "where only root writes into the top folder, a user neither makes, changes nor removes the bitmap" {
    refute attacker mkdir "$BITMAP"
    refute attacker ln -s nowhere "$BITMAP"
    pin 1 /volume1/users/file
    local before
    before=$(stat -c '%i %U %s' "$BITMAP" && sha256sum "$BITMAP")
    refute attacker rm -f "$BITMAP"
    refute attacker mv /volume1/users/file "$BITMAP"
    refute attacker dd if=/dev/zero of="$BITMAP" status=none
    refute attacker chmod 666 "$BITMAP"
    same "$before" "$(stat -c '%i %U %s' "$BITMAP" && sha256sum "$BITMAP")"
}

@test "in a sticky top folder a bitmap that is there stays; before, anybody can take its place" {
    chmod 1777 /volume1
    attacker ln -s /volume1/users/planted "$BITMAP"
    pin 1 /volume1/users/file
    refute test -e /volume1/users/planted
    refute config_has '.volumes["/volume1"]'
    rm "$BITMAP"
    pin 1 /volume1/users/file
    config_has '.volumes["/volume1"].files'
    refute attacker rm -f "$BITMAP"
    refute attacker mv /volume1/users/file "$BITMAP"
}

@test "where users write into the top folder, a folder, FIFO or link in the bitmap's place keeps anybody from pinning" {
    local plant
    chmod 777 /volume1
    for plant in mkdir mkfifo 'ln -s /volume1/users/planted'; do
        # shellcheck disable=SC2086
        attacker $plant "$BITMAP"
        pin 1 /volume1/users/file
        refute config_has '.volumes["/volume1"]'
        refute test -e /volume1/users/planted
        attacker rm -r "$BITMAP"
    done
    # The service is as it was.
    pin 1 /volume1/users/file
    config_has '.volumes["/volume1"].files'
}

@test "where users write into the top folder, a bitmap of ones fills the SSD" {
    chmod 777 /volume1
    attacker sh -c "head -c 128 /dev/zero | tr '\0' '\377' >'$BITMAP'"
    tool --send-bitmap --mount-path /volume1
    reload 1
    same 256 "$(volume_state 1 pinnedBlocks)"
}

@test "the kernel lets nobody link another user's file into the bitmap's place, where it would be written to" {
    [ "$(</proc/sys/fs/protected_hardlinks)" = 1 ] || skip "fs.protected_hardlinks is off"
    echo precious >/volume1/precious
    chmod 777 /volume1
    refute attacker ln /volume1/precious "$BITMAP"
    # What he could do without.
    ln /volume1/precious "$BITMAP"
    pin 1 /volume1/users/file
    same 128 "$(stat -c %s /volume1/precious)"
}
