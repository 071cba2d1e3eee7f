#!/usr/bin/env bats
# A file in as many pieces as a user likes.

load lib

setup_file() { MKFS_OPTIONS='-b 1024' make_volume 1 320M 16M ext4; }

setup() { fresh_volume; }

# Its peak since it was started, in KiB.
service_peak() { sed -n 's/^VmHWM:[[:space:]]*\([0-9]*\) kB$/\1/p' "/proc/$SERVICE_PID/status"; }

@test "a file of 100,000 extents costs the service one table of them" {
    local before
    attacker_folder /volume1/his
    mkdir -p /tmp/attacker
    cp "$HELPERS/system_fallocate" /tmp/attacker/
    random small 64K conv=fsync
    attacker touch /volume1/his/many
    attacker /tmp/attacker/system_fallocate /volume1/his/many allocate 0 2048 1024 100000
    same "/volume1/his/many: 100000 extents found" "$(filefrag /volume1/his/many)"
    start_service
    pin 1 /volume1/small
    wait_until service_rests
    before=$(service_peak)
    pin 1 /volume1/his/many /volume1/small
    wait_until service_rests
    # 3125 KiB is the table; half of it more is everything else.
    [ $(($(service_peak) - before)) -lt 4700 ] || {
        echo "from $before to $(service_peak) KiB"
        return 1
    }
    same "$(blocks_of small /volume1/his/many)" "$(bitmap_blocks 1)"
    stop_service
}
