#!/usr/bin/env bats
# A client of one word size against an emulated device of the other: BIN's device and OTHER_BIN's client,
# then the other way round. A 64-bit device decodes both; a 32-bit device cannot reach the memory of a
# 64-bit client and says so, instead of reading somewhere else.

load lib

setup_file() {
    [ -x "${OTHER_BIN:-}/veskcachepinfiletool" ] || return 0
    make_volume 1 64M 16M ext4
}

setup() {
    [ -x "${OTHER_BIN:-}/veskcachepinfiletool" ] ||
        skip "OTHER_BIN names no programs of another word size"
    fresh_volume
    DEVICE_BITS=$(bits_of_program "$BIN/veskcachedev")
    CLIENT_BITS=$(bits_of_program "$OTHER_BIN/veskcachepinfiletool")
    [ "$DEVICE_BITS" != "$CLIENT_BITS" ]
    BIN=$OTHER_BIN
}

# The class of an ELF file is its fifth byte.
bits_of_program() { [ "$(od -An -tu1 -j4 -N1 "$1")" -eq 1 ] && echo 32 || echo 64; }

needs_64_bit_device() { [ "$DEVICE_BITS" -eq 64 ] || skip "the device cannot reach the client's memory"; }
needs_32_bit_device() { [ "$DEVICE_BITS" -eq 32 ] || skip "the device reaches every client's memory"; }

@test "queries and the size of the device are answered" {
    answers 0 --is-all-unpin "$(volume_device 1)" <<<Yes
    answers 0 --check-bitmap --mount-path /volume1 <<<No
    answers 0 --get-bitmap-size-byte --mount-path /volume1 <<<128
}

@test "a bitmap is taken whole, its descriptor being the client's" {
    needs_64_bit_device
    tool --set-bitmap --mount-path /volume1 --start-sector 128 --num-sectors 384
    same $'1\n2\n3' "$(driver_blocks 1)"
    answers 0 --check-bitmap --mount-path /volume1 <<<Yes
}

@test "a file is pinned and unpinned by a service of the other word size" {
    needs_64_bit_device
    fragmented a 5
    start_service
    pin 1 /volume1/a
    check_pinned /volume1/a
    unpin 1 /volume1/a
    same "$(ranges_of a)" "$(state 1 .lastUnpin)"
    check_nothing_pinned
    stop_service
}

@test "what the device cannot reach is refused, and nothing changes" {
    needs_32_bit_device
    says_masked 255 --set-bitmap --mount-path /volume1 --start-sector 128 --num-sectors 384 <<END
: Ioctl Error: Send ioctl 65231 Data (ADDRESS) size (8) to $(volume_device 1), ret=-1

: Ioctl error
: Can't send bitmap to driver
: Set bitmap failed
: Set bitmap on volume (/volume1) failed (Start sector = 128 Num of sector = 384)
END
    same "" "$(driver_blocks 1)"
    refute tool --unpin-range --mount-path /volume1 --start-sector 128 --num-sectors 384
    same '[]' "$(state 1 .lastUnpin)"
}
