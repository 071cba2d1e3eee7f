#!/usr/bin/env bats
# Every command of the tool: its output to the byte and its exit status, where it works and where it
# fails.

load lib

setup_file() {
    make_volume 1 64M 16M ext4
    DEVICE=$(volume_device 1)
    export DEVICE
}

setup() {
    fresh_volume
    random a 8K conv=fsync
}

# From now on volume 1 has no cache.
lose_cache() { echo '{"caches":[]}' >"$VESK_FLASHCACHE_CONFIG"; }

@test "no command: the usage, and status 0" {
    answers 0 < <(usage)
    says 0 < <(echo ": Invalid input" && usage)
}

@test "pin-files" {
    says 0 --pin-files "/volume1/a;;/volume1/a" --mount-path /volume1 <<END
: Send pin file request, files = /volume1/a;;/volume1/a
: Send pin file request OK
END
    waiting_is 1
    lose_cache
    says 255 --pin-files /volume1/a --mount-path /volume1 <<END
: Send pin file request, files = /volume1/a
: Volume (/volume1) doesn't support pin
: Pin files failed
END
    waiting_is 1
}

@test "unpin-files" {
    says 0 --unpin-files /volume1/a --mount-path /volume1/ <<END
: Send unpin file request, files = /volume1/a
: Send unpin files request OK
END
    waiting_is 1
    lose_cache
    says 255 --unpin-files /volume1/a --mount-path /volume1 <<END
: Send unpin file request, files = /volume1/a
: Volume (/volume1) doesn't support pin
: Unpin files failed
END
}

@test "reload-blocks" {
    says 0 --reload-blocks --mount-path /volume1 <<END
: Start to send reload block request
: Send reload block request OK
END
    waiting_is 1
    lose_cache
    says 255 --reload-blocks --mount-path /volume1 <<END
: Start to send reload block request
: Volume (/volume1) doesn't support pin
: Reload blocks on volume (/volume1) failed
END
}

@test "start-service" {
    start_service
    service_said </dev/null
    # Not even the queue can be had, and the worker meets an error: the process ends by itself.
    put_config '{"requestQueue":["0"]}'
    : >"$KEY_FILE"
    local status=0
    tool --stdout --start-service --config-path "$CONF" >"$SERVICE_LOG" || status=$?
    same 0 "$status"
    same "$(sort <<END
Can't get a line from file ($KEY_FILE)
Can't get message key from file ($KEY_FILE)
Can't get a line from file ($KEY_FILE)
Can't get message key from file ($KEY_FILE)
Can't get a line from file ($KEY_FILE)
Can't get message key from file ($KEY_FILE)
Can't find the message queue's key from file ($KEY_FILE)
Create server messsage queue by file ($KEY_FILE) failed
Can't find request number (0) in config
Get request error
END
    )" "$(sed -n '2,$s/^veskcachepinfiletool: //p' "$SERVICE_LOG" | sort)"
}

@test "start-service without a thread to be had" {
    without_threads() (
        ulimit -s 900000 -v 700000
        tool "$@"
    )
    without_threads --help >/dev/null 2>&1 || skip "this build needs more address space"
    expect_output 255 /dev/null without_threads --stdout --start-service --config-path "$CONF" <<END
: Service starts (Build time: 2018-06-08-15:24)
: Can't create thread: Cannot allocate memory
: Can't start service
END
}

@test "send-bitmap" {
    says 0 --send-bitmap --mount-path /volume1 <<END
: Start to send bitmap for volume (/volume1)
: Bitmap file (/volume1/veskcachepinfile.bitmap) doesn't exist. No need to update to driver
: Send bitmap OK
END
    same false "$(state 1 .bitmapSet)"
    { printf '\x81' && head -c 127 /dev/zero; } >"$(bitmap_file 1)"
    says 0 --send-bitmap --mount-path /volume1 <<END
: Start to send bitmap for volume (/volume1)
: Send bitmap OK
END
    same $'0\n7' "$(driver_blocks 1)"
    # Once the driver has one, nothing is sent, even if the file has changed.
    head -c 128 /dev/zero >"$(bitmap_file 1)"
    says 0 --send-bitmap --mount-path /volume1 <<END
: Start to send bitmap for volume (/volume1)
: Bitmap is already set
: Send bitmap OK
END
    same $'0\n7' "$(driver_blocks 1)"
    lose_cache
    says 255 --send-bitmap --mount-path /volume1 <<END
: Start to send bitmap for volume (/volume1)
: Volume (/volume1) doesn't support pin
: Send bitmap to space (/volume1) failed
END
}

@test "support-pin" {
    says 0 --support-pin --mount-path /volume1 <<<"Yes"
    says 0 --support-pin --mount-path /volume2 <<END
: Can't get space uuid from mount path (/volume2)
No
END
    lose_cache
    says 0 --support-pin --mount-path /volume1 <<<"No"
    echo 'no JSON' >"$VESK_FLASHCACHE_CONFIG"
    says 0 --support-pin --mount-path /volume1 <<END
: Fail to get SSD cache config
No
END
}

@test "check-bitmap" {
    says 0 --check-bitmap --mount-path /volume1 <<<"No"
    tool --set-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 1
    says 0 --check-bitmap --mount-path /volume1 <<<"Yes"
    lose_cache
    says 0 --check-bitmap --mount-path /volume1 <<<"No"
}

@test "get-uuid" {
    says 0 --get-uuid --mount-path /volume1 <<<"$(volume_uuid 1)"
    says 0 --get-uuid --mount-path /volume2 </dev/null
    lose_cache
    says 0 --get-uuid --mount-path /volume1 <<<"$(volume_uuid 1)"
}

@test "add-pending and remove-pending fail after three seconds and send nothing" {
    local command begin
    for command in add-pending remove-pending; do
        begin=$(now_ms)
        says 255 --$command --mount-path /volume1 <<END
: Send message timeout (3 seconds)
: Send message failed: Invalid argument
: Can't sent pending space
END
        [ $(($(now_ms) - begin)) -ge 3000 ]
        waiting_is 0
    done
    lose_cache
    # Without a cache nothing is sent, and nothing waited for.
    for command in add-pending remove-pending; do
        says 255 --$command --mount-path /volume1 <<END
: Volume (/volume1) doesn't support pin
: Can't sent pending space
END
    done
}

@test "check-pin" {
    put_config '{"volumes":{"/volume1":{"files":{"'"$(inode a)"'":"a"}}}}'
    says 0 --check-pin /volume1/a --config-path "$CONF" <<<"Yes"
    random b 8K
    says 0 --check-pin /volume1/b --config-path "$CONF" <<<"No"
    # By the inode, whatever its name.
    ln a hard
    ln -s a soft
    says 0 --check-pin /volume1/hard --config-path "$CONF" <<<"Yes"
    says 0 --check-pin /volume1/soft --config-path "$CONF" <<<"Yes"
    says 0 --check-pin /etc/passwd --config-path "$CONF" <<<"No"
    says 0 --check-pin a --config-path "$CONF" <<END
: Get top directory of file (a) error

: Can't get top directory of file (a)
Error
END
    says 0 --check-pin /volume1/a --config-path /run/none.json <<END
: Can't find config file (/run/none.json)
Error
END
}

@test "unpin-all" {
    tool --set-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 256
    tool --reload-blocks --mount-path /volume1
    start_service
    wait_until request_is_done 0
    stop_service
    cp "$CONF" "$BATS_TEST_TMPDIR/before"
    same $'0\n1' "$(pinned_blocks 1)"
    says 0 --unpin-all --mount-path /volume1/ <<END
: Start to unpin all blocks of volume (/volume1)
: Unpin all blocks of volume (/volume1) finish
END
    same "" "$(pinned_blocks 1)"
    same false "$(state 1 .bitmapSet)"
    # Neither the bitmap file nor the configuration is touched.
    same $'0\n1' "$(bitmap_blocks 1)"
    cmp "$BATS_TEST_TMPDIR/before" "$CONF"
    says 0 --unpin-all --cache-path "$DEVICE" <<END
: Start to unpin all blocks of cache ($DEVICE)
: Unpin all blocks of cache ($DEVICE) finish
END
    says 255 --unpin-all --cache-path /run/none <<END
: Start to unpin all blocks of cache (/run/none)
: Open device path (/run/none) error

: Ioctl for unpin all cache blocks failed
: Can't unpin all block of cache (/run/none)
END
    lose_cache
    says 255 --unpin-all --mount-path /volume1 <<END
: Start to unpin all blocks of volume (/volume1)
: Can't get cache's ssd path
: Can't get cache path
: Can't get the cache path of volume (/volume1)
: Can't unpin all block of volume (/volume1)
END
}

@test "is-all-unpin" {
    says 0 --is-all-unpin "$DEVICE" <<<"Yes"
    start_service
    pin 1 /volume1/a
    stop_service
    says 0 --is-all-unpin "$DEVICE" <<<"No"
    says_masked 255 --is-all-unpin /volume1/a <<END
: Ioctl Error: Send ioctl -2147156270 Data (ADDRESS) size (4) to /volume1/a, ret=-1

: Ioctl error
Get unpin information failed. (This cache doesn't support pin ?)
END
    says 255 --is-all-unpin /volume1 <<END
: Open device path (/volume1) error

: Ioctl error
Get unpin information failed. (This cache doesn't support pin ?)
END
    # The answer for scripts does not go to the system log.
    answers 255 --is-all-unpin /volume1 \
        <<<"Get unpin information failed. (This cache doesn't support pin ?)"
}

@test "get-bitmap-size-byte" {
    says 0 --get-bitmap-size-byte --mount-path /volume1 <<<"128"
    lose_cache
    says 255 --get-bitmap-size-byte --mount-path /volume1 <<END
: Can't get cache's ssd path
: Can't get cache path
: Get cache path from mount path (/volume1) failed
: Get bitmap size for volume (/volume1) failed
END
}

@test "set-bitmap, unset-bitmap and unpin-range without a cache" {
    lose_cache
    local range="--mount-path /volume1 --start-sector 5 --num-sectors 6"
    # shellcheck disable=SC2086
    says 255 --set-bitmap $range <<END
: Can't get cache's ssd path
: Can't get cache path
: Set bitmap failed
: Set bitmap on volume (/volume1) failed (Start sector = 5 Num of sector = 6)
END
    # shellcheck disable=SC2086
    says 255 --unset-bitmap $range <<END
: Can't get cache's ssd path
: Can't get cache path
: Set bitmap failed
: Unset bitmap on volume (/volume1) failed (Start sector = 5 Num of sector = 6)
END
    # shellcheck disable=SC2086
    says 255 --unpin-range $range <<END
: Can't get cache's ssd path
: Can't get cache path
: Can't get cache path of volume (/volume1)
: Unpin range in cache (volume = /volume1) failed (Start sector = 5 Num of sector = 6)
END
    says 255 --set-bitmap --mount-path /nowhere --start-sector 0 --num-sectors 1 <<END
: Can't get space uuid
: Set bitmap failed
: Set bitmap on volume (/nowhere) failed (Start sector = 0 Num of sector = 1)
END
}
