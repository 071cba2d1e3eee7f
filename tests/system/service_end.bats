#!/usr/bin/env bats
# The end of the service: at once, with status 0, and nothing lost that was written before.

load lib

setup_file() {
    make_volume 1 64M 16M ext4
    SLOW_DEVICE=$(SSD_SIZE=64K spare_device slow 64M --miss-delay-ms 200)
    export SLOW_DEVICE
}

setup() { fresh_volume; }

# A service that reads /volume1/a through a slow device, for a minute.
start_slow_warming() {
    local before
    fragmented a 150
    map_cache "$(volume_uuid 1)" "$SLOW_DEVICE"
    look_at_device "$SLOW_DEVICE"
    before=$MISSES
    start_service
    tool --pin-files /volume1/a --mount-path /volume1
    wait_until misses_are_above "$SLOW_DEVICE" "$before"
}

@test "SIGTERM, SIGINT and SIGQUIT end an idle service" {
    local name
    for name in TERM INT QUIT; do
        start_service
        stop_service_by $name
        same "veskcachepinfiletool: Service starts (Build time: 2018-06-08-15:24)" \
            "$(cat "$SERVICE_LOG")"
    done
}

@test "SIGTERM ends a service that reads from a slow device; its request stays queued" {
    start_slow_warming
    stop_service_by TERM
    same '["0"]' "$(config .requestQueue)"
    same null "$(config .volumes)"
}

@test "SIGINT ends a service that reads from a slow device" {
    start_slow_warming
    stop_service_by INT
    same '["0"]' "$(config .requestQueue)"
}

@test "SIGQUIT ends a service that reads from a slow device" {
    start_slow_warming
    stop_service_by QUIT
    same '["0"]' "$(config .requestQueue)"
}

@test "with --verbose the signal is the last thing told" {
    start_service --verbose
    stop_service
    same "veskcachepinfiletool: SignalHandler() [N]: Get signal = 15" \
        "$(tail -n 1 "$SERVICE_LOG" | mask_numbers)"
}

@test "a signal in the pause after a request ends the service" {
    random a 8K
    start_service
    pin 1 /volume1/a
    wait_until worker_rests
    stop_service_by TERM
    same 1 "$(config '.volumes["/volume1"].files | length')"
    [ "$(wc -l <"$SERVICE_LOG")" -eq 2 ]
}

@test "what was written reaches a pipe" {
    mkfifo "${CONF%/*}/pipe"
    (
        close_descriptors
        exec cat "${CONF%/*}/pipe"
    ) >"$BATS_TEST_TMPDIR/read" &
    local reader=$!
    run_service --stdout >"${CONF%/*}/pipe"
    stop_service
    wait "$reader"
    same "veskcachepinfiletool: Service starts (Build time: 2018-06-08-15:24)" \
        "$(cat "$BATS_TEST_TMPDIR/read")"
}

@test "a full pipe that nobody reads does not hold the end up" {
    # ThreadSanitizer delivers no signal while the C library itself is in a blocking call.
    ! ldd "$BIN/veskcachepinfiletool" | grep -q libtsan || skip "not with ThreadSanitizer"
    mkfifo "${CONF%/*}/pipe"
    exec 8<>"${CONF%/*}/pipe"
    dd if=/dev/zero of=/proc/self/fd/8 bs=4096 count=64 oflag=nonblock status=none 2>/dev/null || true
    run_service --stdout >&8
    stop_service_by TERM
    exec 8>&-
}

@test "the queue and its key file outlive the service" {
    start_service
    local key
    key=$(cat "$KEY_FILE")
    stop_service
    same "$key" "$(cat "$KEY_FILE")"
    same 1 "$(awk -v key="$key" 'NR > 1 && $1 == key' /proc/sysvipc/msg | wc -l)"
    start_service
    same "$key" "$(cat "$KEY_FILE")"
    stop_service
}
