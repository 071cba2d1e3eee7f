#!/usr/bin/env bats
# The end of the service: at once, with status 0, and nothing lost that was written before.

load lib

setup_file() {
    make_volume 1 64M 16M ext4
    SLOW_DEVICE=$(SSD_SIZE=64K spare_device slow 64M --miss-delay-ms 150)
    export SLOW_DEVICE
}

setup() { fresh_volume; }

# A service that reads /volume1/a through a slow device, for 7 seconds.
start_slow_warming() {
    fragmented a 50
    map_cache "$(volume_uuid 1)" "$SLOW_DEVICE"
    local before
    before=$(slow_misses)
    start_service
    tool --pin-files /volume1/a --mount-path /volume1
    wait_until slow_misses_are_above $((before + 2))
}
slow_misses() { jq .misses "$SLOW_DEVICE.json"; }
slow_misses_are_above() { [ "$(slow_misses)" -gt "$1" ]; }

# stops_at_once SIGNAL: before a device as slow as that could be read to the end.
stops_at_once() {
    local begin
    begin=$(now_ms)
    stop_service_by "$1"
    [ $(($(now_ms) - begin)) -lt 5000 ]
}

@test "SIGTERM, SIGINT and SIGQUIT end an idle service" {
    local name
    for name in TERM INT QUIT; do
        start_service
        stops_at_once $name
        same "veskcachepinfiletool: Service starts (Build time: 2018-06-08-15:24)" \
            "$(cat "$SERVICE_LOG")"
    done
}

@test "SIGTERM ends a service that reads from a slow device; its request stays queued" {
    start_slow_warming
    stops_at_once TERM
    same '["0"]' "$(config .requestQueue)"
    same null "$(config .volumes)"
}

@test "SIGINT ends a service that reads from a slow device" {
    start_slow_warming
    stops_at_once INT
    same '["0"]' "$(config .requestQueue)"
}

@test "SIGQUIT ends a service that reads from a slow device" {
    start_slow_warming
    stops_at_once QUIT
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
    stops_at_once TERM
    same 1 "$(config '.volumes["/volume1"].files | length')"
    [ "$(wc -l <"$SERVICE_LOG")" -eq 2 ]
}

@test "what was written reaches a pipe" {
    mkfifo "${CONF%/*}/pipe"
    cat "${CONF%/*}/pipe" >"$BATS_TEST_TMPDIR/read" &
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
    stops_at_once TERM
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
