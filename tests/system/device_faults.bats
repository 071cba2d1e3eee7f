#!/usr/bin/env bats
# Cache devices that refuse a request, cannot be read or are not there: messages, results, and what
# has changed by then.

load lib

setup_file() {
    make_volume 1 64M 16M ext4
    UUID=$(volume_uuid 1)
    export UUID
}

setup() {
    fresh_volume
    fragmented a 3
    BITMAP=$(bitmap_file 1)
}

# broken_device [veskcachedev option...]: from now on the cache device of volume 1.
broken_device() {
    local name
    name=broken$BATS_TEST_NUMBER
    BROKEN=$(spare_device "$name" 64M "$@")
    map_cache "$UUID" "$BROKEN"
}
broken_state() { jq -c "$1" "$BROKEN.json"; }

# The requests of the driver in decimal, as the messages show them.
SET_BITMAP=65231
UNPIN_RANGES=65232
UNPIN_ALL=65233
QUERY_BITMAP=-2147156273
QUERY_UNPINNED=-2147156270

# ioctl_error NUMBER SIZE [DATA]: the message of a refused request, with the empty line that it ends in.
ioctl_error() {
    echo ": Ioctl Error: Send ioctl $1 Data (${3:-ADDRESS}) size ($2) to $BROKEN, ret=-1"
    echo
}

@test "the bitmap is refused: the file is written, the driver and the records are as before" {
    broken_device --fail-ioctl 0xFECF:5
    says_masked 255 --set-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 1 <<END
$(ioctl_error $SET_BITMAP 8)

: Ioctl error
: Can't send bitmap to driver
: Set bitmap failed
: Set bitmap on volume (/volume1) failed (Start sector = 0 Num of sector = 1)
END
    same 0 "$(bitmap_blocks 1)"
    start_service
    pin 1 /volume1/a
    same "$({ echo 0 && blocks_of a; } | sort -nu)" "$(bitmap_blocks 1)"
    same false "$(broken_state .bitmapSet)"
    same 0 "$(broken_state .misses)"
    same null "$(config .volumes)"
    stop_service
    same "$(sed 's/^:/veskcachepinfiletool:/' <<END
$(ioctl_error $SET_BITMAP 8)

: Ioctl error
: Can't send bitmap to driver
: Handle request failed
: Handle request error (num = 0, type = pinFiles), drop it.
END
    )" "$(sed 1d "$SERVICE_LOG" | mask_numbers)"
}

@test "the ranges are refused after the bitmap was accepted: the unpin fails, the record stays" {
    start_service
    pin 1 /volume1/a
    broken_device --fail-ioctl 0xFED0:22
    unpin 1 /volume1/a
    same "" "$(bitmap_blocks 1)"
    same '[]' "$(broken_state .bitmapBits)"
    same true "$(broken_state .bitmapSet)"
    same 1 "$(config '.volumes["/volume1"].files | length')"
    stop_service
    same "$(sed 's/^:/veskcachepinfiletool:/' <<END
: Handle request (type=pinFiles files=a#$(inode a)) OK 
$(ioctl_error $UNPIN_RANGES 16384)

: Send unpin inctl to driver failed
: Can't send unpin information to driver
: Handle request failed
: Handle request error (num = 1, type = unpinFiles), drop it.
END
    )" "$(sed 1d "$SERVICE_LOG" | mask_numbers)"
    says_masked 255 --unpin-range --mount-path /volume1 --start-sector 0 --num-sectors 1 <<END
$(ioctl_error $UNPIN_RANGES 16384)

: Send unpin inctl to driver failed
: Unpin range in cache (volume = /volume1) failed (Start sector = 0 Num of sector = 1)
END
}

@test "the query of the bitmap is refused" {
    broken_device --fail-ioctl 0x8004FECF:25
    says_masked 0 --check-bitmap --mount-path /volume1 <<END
$(ioctl_error $QUERY_BITMAP 4)

: Ioctl error
: Can't get cache's bitmap status
No
END
    says_masked 255 --send-bitmap --mount-path /volume1 <<END
: Start to send bitmap for volume (/volume1)
$(ioctl_error $QUERY_BITMAP 4)

: Ioctl error
: Can't get cache's bitmap status
: Send bitmap to space (/volume1) failed
END
}

@test "unpinning everything is refused" {
    broken_device --fail-ioctl 0xFED1:1
    says 255 --unpin-all --mount-path /volume1 <<END
: Start to unpin all blocks of volume (/volume1)
$(ioctl_error $UNPIN_ALL 0 "(nil)")

: Ioctl for unpin all cache blocks failed
: Can't unpin all block of volume (/volume1)
END
    says 255 --unpin-all --cache-path "$BROKEN" <<END
: Start to unpin all blocks of cache ($BROKEN)
$(ioctl_error $UNPIN_ALL 0 "(nil)")

: Ioctl for unpin all cache blocks failed
: Can't unpin all block of cache ($BROKEN)
END
}

@test "a driver without the query of pins supports no pinning" {
    broken_device --fail-ioctl 0x8004FED2:25
    says_masked 255 --is-all-unpin "$BROKEN" <<END
$(ioctl_error $QUERY_UNPINNED 4)

: Ioctl error
Get unpin information failed. (This cache doesn't support pin ?)
END
    says 0 --support-pin --mount-path /volume1 <<<"No"
    says 255 --pin-files /volume1/a --mount-path /volume1 <<END
: Send pin file request, files = /volume1/a
: Volume (/volume1) doesn't support pin
: Pin files failed
END
}

@test "the size of the device cannot be had" {
    broken_device --fail-ioctl 0x80081272:5 --fail-ioctl 0x80041272:5
    says 255 --get-bitmap-size-byte --mount-path /volume1 <<END
: Can't get size of device ($BROKEN)
: Can't get block device path
: Get bitmap size for cache ($BROKEN) failed
: Get bitmap size for volume (/volume1) failed
END
    start_service
    pin 1 /volume1/a
    refute test -e "$BITMAP"
    service_said <<END
: Can't get size of device ($BROKEN)
: Can't get block device path
: Can't get needed bitmap sizeof
: Allocate bitmap failed
: Handle request failed
: Warning: data is NULL for free
: Handle request error (num = 0, type = pinFiles), drop it.
END
}

# The extent of 64 KiB of file a that a read of the device fails in, as "device start, sectors".
whole_extent() { extents a | awk 'NR > 1 && $3 == 128 { print $2, $3; exit }'; }

# read_fails SEEK LENGTH: what a pin of file a tells when one read fails.
read_fails() {
    local start sectors
    read -r start sectors <<<"$(whole_extent)"
    pin 1 /volume1/a
    same "$(blocks_of a)" "$(bitmap_blocks 1)"
    same null "$(config .volumes)"
    service_said <<END
: Read block error (seek = $1 num bytes = $2
: Read fd to null failed (disk start sector = $start num sectors = $sectors)
: Can't read file (/volume1/a) to cache
: Handle request failed
: Handle request error (num = 0, type = pinFiles), drop it.
END
}

@test "a read error ends the pin: marked and sent, but not recorded" {
    local offset
    offset=$(($(whole_extent | cut -d' ' -f1) * 512))
    broken_device --fail-read $((offset + 4096)):5
    start_service
    read_fails $offset 65536
}

@test "a device that ends too early is a read error, not a loop" {
    local offset
    offset=$(($(whole_extent | cut -d' ' -f1) * 512))
    broken_device --short-at $((offset + 4096))
    start_service
    # The part before the end is read, the rest asked for again.
    read_fails $((offset + 4096)) $((65536 - 4096))
}

@test "a reload that meets a read error fails and is dropped" {
    start_service
    pin 1 /volume1/a
    broken_device --fail-read $(($(blocks_of a | tail -n 1) * 65536)):5
    reload 1
    stop_service
    same "Read range to cache failed
Handle request failed
Handle request error (num = 1, type = reloadPinBlocks), drop it." \
        "$(sed -n 's/^veskcachepinfiletool: \(Read range\|Handle request \(fail\|error\)\)/\1/p' "$SERVICE_LOG")"
}

@test "a device of another size is refused by the bitmap's length" {
    BROKEN=$(spare_device larger 65M)
    map_cache "$UUID" "$BROKEN"
    says 0 --set-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 1 <<END
: Set bitmap on volume (/volume1) OK (Start sector = 0 Num of sector = 1)
END
    same 130 "$(stat -c %s "$BITMAP")"
    volume_configure
    says 255 --set-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 1 <<END
: Incorrect bitmap size (128), file size (130)
: Allocate bitmap failed
: Set bitmap failed
: Set bitmap on volume (/volume1) failed (Start sector = 0 Num of sector = 1)
END
}

@test "a cache device that is not there: no support, and a request is dropped with the records" {
    map_cache "$UUID" /run/nowhere/cachedev
    says 0 --support-pin --mount-path /volume1 <<<"No"
    says 255 --get-bitmap-size-byte --mount-path /volume1 <<END
: Can't open device (/run/nowhere/cachedev)
: Can't get block device path
: Get bitmap size for cache (/run/nowhere/cachedev) failed
: Get bitmap size for volume (/volume1) failed
END
    says 255 --unpin-all --mount-path /volume1 <<END
: Start to unpin all blocks of volume (/volume1)
: Open device path (/run/nowhere/cachedev) error

: Ioctl for unpin all cache blocks failed
: Can't unpin all block of volume (/volume1)
END
}
