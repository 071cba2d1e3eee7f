#!/usr/bin/env bats
# What the service and the cache device keep in the file system, beside what lies on the volume.

load lib

setup_file() { make_volume 1 64M 16M ext4; }

setup() {
    rm -f /tmp/veskcachepinfiletool.debug
    users_volume a b
}

@test "the control file, which anybody makes, fails the look-up of its one path, and no more" {
    # shellcheck disable=SC2016
    attacker sh -c 'echo /volume1/users/a >"$0"' /tmp/veskcachepinfiletool.debug
    start_service
    pin 1 /volume1/users/a
    pin 1 /volume1/users/b
    same "[\"users/b\"]" "$(config '[.volumes["/volume1"].files[]]')"
    stop_service
    # A link leads to nothing that is told, a FIFO holds nobody up.
    rm /tmp/veskcachepinfiletool.debug
    echo secret >/run/secret
    chmod 600 /run/secret
    attacker ln -s /run/secret /tmp/veskcachepinfiletool.debug
    start_service --verbose
    pin 1 /volume1/users/a
    stop_service
    refute grep secret "$SERVICE_LOG"
    rm /tmp/veskcachepinfiletool.debug
    attacker mkfifo /tmp/veskcachepinfiletool.debug
    start_service
    unpin 1 /volume1/users/a
    pin 1 /volume1/users/a
    config_has '.volumes["/volume1"].files | length == 2'
}

# Where a folder is not sticky, the kernel follows links in it as it does everywhere without fs.protected_symlinks.
@test "where the kernel follows links of /tmp, one in the control file's place has root's files told in the log" {
    echo secret >/run/secret
    chmod 600 /run/secret
    chmod 777 /tmp
    attacker ln -s /run/secret /tmp/veskcachepinfiletool.debug
    start_service --verbose
    pin 1 /volume1/users/a
    stop_service
    chmod 1777 /tmp
    grep secret "$SERVICE_LOG"
}

@test "a user neither reads nor replaces the document in a folder of root's" {
    local before
    chmod 700 "${CONF%/*}"
    start_service
    pin 1 /volume1/users/a
    before=$(stat -c '%i %a' "$CONF" && cat "$CONF")
    refute attacker cat "$CONF"
    refute attacker mv "/volume1/users/a" "$CONF"
    refute attacker rm -f "$CONF"
    refute attacker touch "${CONF%/*}/.veskcachepinfile.1.0.tmp"
    same "$before" "$(stat -c '%i %a' "$CONF" && cat "$CONF")"
}

@test "a user reads nothing from the cache device, and asks nothing of its driver" {
    local before command
    start_service
    pin 1 /volume1/users/a
    before=$(config . && volume_state 1 bitmapSet && volume_state 1 pinnedBlocks)
    refute attacker head -c 1 "$(volume_device 1)"
    for command in --unpin-all --delete-bitmap --send-bitmap --reload-blocks; do
        run attacker_tool "$command" --mount-path /volume1
        [ "$status" -ne 0 ]
    done
    run attacker_tool --pin-files /volume1/users/b --mount-path /volume1
    [ "$status" -ne 0 ]
    same "$before" "$(config . && volume_state 1 bitmapSet && volume_state 1 pinnedBlocks)"
    config_has '.volumes["/volume1"].files | length == 1'
    test -s /volume1/veskcachepinfile.bitmap
}
