#!/usr/bin/env bats
# Pending volumes: their requests wait, their warming gives way, everything runs later.

load lib

setup_file() {
    make_volume 1 64M 16M ext4
    make_volume 2 64M 16M ext4
    SLOW_DEVICE=$(SSD_SIZE=64K spare_device slow 64M --miss-delay-ms 100)
    export SLOW_DEVICE
}

setup() {
    fresh_volume
    find /volume2 -mindepth 1 -maxdepth 1 ! -name lost+found -exec rm -rf {} +
    random a 64K conv=fsync
    random /volume2/b 64K conv=fsync
}

send_pin() { tool --pin-files "$1/$2" --mount-path "$1"; }

# hold_at_reading COMMAND...: from now on the cache device of volume 1 is a slow one; the request that the
# command sends is held where it reads from there.
hold_at_reading() {
    local before
    map_cache "$(volume_uuid 1)" "$SLOW_DEVICE"
    look_at_device "$SLOW_DEVICE"
    before=$MISSES
    start_service
    "$@"
    wait_until misses_are_above "$SLOW_DEVICE" "$before"
    hold_device "$SLOW_DEVICE"
}

@test "the requests of a pending volume wait in their place while another volume's run" {
    start_service
    set_pending /volume1
    send_pin /volume1 a
    wait_until request_is_stored 0
    pin 2 /volume2/b
    same '["0"]' "$(config .requestQueue)"
    same '["/volume2"]' "$(config '.volumes | keys')"
    end_pending /volume1
    # No client has to wake the worker for that.
    wait_until queue_is_empty
    service_said <<END
: Handle request (type=pinFiles files=b#$(inode /volume2/b)) OK 
: Handle request (type=pinFiles files=a#$(inode a)) OK 
END
}

@test "a pin that is interrupted while it reads stays first and runs again" {
    fragmented big 60
    hold_at_reading send_pin /volume1 big
    # Not by a client, which would ask the device.
    send_record 1 /volume1 /volume1/a
    set_pending /volume1
    wait_until messages_are_taken
    # The bitmap was written and sent before the reading began.
    same "$(blocks_of big)" "$(bitmap_blocks 1)"
    release_device
    wait_until worker_rests
    same '["0","1"]' "$(config .requestQueue)"
    same null "$(config .volumes)"
    volume_configure
    end_pending /volume1
    wait_until queue_is_empty
    same "$(blocks_of big a)" "$(pinned_blocks 1)"
    service_said <<END
: Handle request (0). Get interrupted !
: Handle request (type=pinFiles files=big#$(inode big)) OK 
: Handle request (type=pinFiles files=a#$(inode a)) OK 
END
}

@test "a reload is interrupted and runs again" {
    # Every other block of the first 256.
    { printf 'U%.0s' {1..32} && head -c 96 /dev/zero; } >"$(bitmap_file 1)"
    sync "$(bitmap_file 1)"
    hold_at_reading tool --reload-blocks --mount-path /volume1
    set_pending /volume1
    wait_until messages_are_taken
    release_device
    wait_until worker_rests
    same '["0"]' "$(config .requestQueue)"
    volume_configure
    end_pending /volume1
    wait_until queue_is_empty
    is_subset "$(seq 0 2 255)" "$(cached_blocks 1)"
    service_said <<END
: Handle request (0). Get interrupted !
: Handle request (type=reloadPinBlocks) OK 
END
}

@test "a volume declared pending twice is pending once" {
    start_service --verbose
    set_pending /volume1
    set_pending /volume1
    end_pending /volume1
    wait_until waiting_is 0
    pin 1 /volume1/a
    stop_service
    same "ServiceAddPendingSpaceAtomic() [N]: Add pending space = /volume1
GetRequests() [N]: Space (/volume1) is already in pending list
ServiceRemovePendingSpaceAtomic() [N]: Remove pending space (/volume1)" \
        "$(mask_numbers <"$SERVICE_LOG" | sed -n 's/^veskcachepinfiletool: \(.*ending .*\)/\1/p')"
}

@test "the end of a pending state that never was is told and harmless" {
    start_service
    end_pending /volume1
    pin 1 /volume1/a
    service_said <<END
: Space (/volume1) is not in pending list. Could be a new space
: Handle request (type=pinFiles files=a#$(inode a)) OK 
END
}

@test "paths of pending volumes are compared exactly" {
    start_service
    set_pending /volume1/
    set_pending /volume
    set_pending /volume12
    pin 1 /volume1/a
    service_said <<END
: Handle request (type=pinFiles files=a#$(inode a)) OK 
END
}
