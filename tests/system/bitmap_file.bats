#!/usr/bin/env bats
# Bitmap files that do not fit the volume, and the fault injection of extent look-ups.

load lib

setup_file() { make_volume 1 64M 16M ext4; }

setup() {
    fresh_volume
    random a 100K conv=fsync
    BITMAP=$(bitmap_file 1)
}

teardown() {
    end_service
    rm -f /tmp/veskcachepinfiletool.debug
}

bitmap_of() { printf '%b' "$1" >"$BITMAP"; }

@test "send-bitmap fills up a bitmap file that is too short, and sends it" {
    bitmap_of '\x05\x80'
    says 0 --send-bitmap --mount-path /volume1 <<END
: Start to send bitmap for volume (/volume1)
: Bitmap size changed. Could be due to volume expansion
: Send bitmap OK
END
    same 128 "$(stat -c %s "$BITMAP")"
    same $'0\n2\n15' "$(bitmap_blocks 1)"
    same $'0\n2\n15' "$(driver_blocks 1)"
}

@test "a pin keeps the bits of a bitmap file that is too short" {
    bitmap_of '\x01'
    start_service
    pin 1 /volume1/a
    same 128 "$(stat -c %s "$BITMAP")"
    same "$({ echo 0 && blocks_of a; } | sort -nu)" "$(bitmap_blocks 1)"
    service_said <<END
: Bitmap size changed. Could be due to volume expansion
: Handle request (type=pinFiles files=a#$(inode a)) OK 
END
}

@test "a bitmap file that is too long is refused and stays as it is" {
    head -c 129 /dev/zero >"$BITMAP"
    says 255 --send-bitmap --mount-path /volume1 <<END
: Start to send bitmap for volume (/volume1)
: Incorrect bitmap size (128), file size (129)
: Allocate bitmap failed
: Send bitmap to space (/volume1) failed
END
    says 255 --set-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 1 <<END
: Incorrect bitmap size (128), file size (129)
: Allocate bitmap failed
: Set bitmap failed
: Set bitmap on volume (/volume1) failed (Start sector = 0 Num of sector = 1)
END
    start_service
    pin 1 /volume1/a
    same 129 "$(stat -c %s "$BITMAP")"
    same "" "$(bitmap_blocks 1)"
    same false "$(state 1 .bitmapSet)"
    same null "$(config .volumes)"
    service_said <<END
: Incorrect bitmap size (128), file size (129)
: Allocate bitmap failed
: Handle request failed
: Bitmap is already NULL
: Handle request error (num = 0, type = pinFiles), drop it.
END
}

@test "an empty bitmap file counts as one without bits" {
    : >"$BITMAP"
    says 0 --unset-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 1 <<END
: Bitmap size changed. Could be due to volume expansion
: Unset bitmap on volume (/volume1) OK (Start sector = 0 Num of sector = 1)
END
    same 128 "$(stat -c %s "$BITMAP")"
    same "" "$(bitmap_blocks 1)"
}

@test "a folder in the bitmap file's place is refused" {
    mkdir "$BITMAP"
    local size
    size=$(stat -c %s "$BITMAP")
    says 255 --set-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 1 <<END
: Incorrect bitmap size (128), file size ($size)
: Allocate bitmap failed
: Set bitmap failed
: Set bitmap on volume (/volume1) failed (Start sector = 0 Num of sector = 1)
END
}

@test "a link that leads nowhere in the bitmap file's place is no missing file" {
    ln -s /nowhere/bitmap "$BITMAP"
    says 255 --set-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 1 <<END
: Bitmap size changed. Could be due to volume expansion
: Can't open bitmap file ($BITMAP)

: Read bitmap file to bitmap memory error
: Allocate bitmap failed
: Set bitmap failed
: Set bitmap on volume (/volume1) failed (Start sector = 0 Num of sector = 1)
END
    same false "$(state 1 .bitmapSet)"
}

# Until nothing is left: what the file system has promised and then not used is free again only once it
# is written.
fill_volume() {
    local i
    for ((i = 0; i < 20; i++)); do
        dd if=/dev/zero of="filler$i" bs=4k conv=fsync status=none 2>/dev/null || true
        sync --file-system .
        [ -s "filler$i" ] || return 0
    done
    return 1
}

@test "on a full volume the bitmap file cannot be written, and the driver is not told" {
    fill_volume
    says 255 --set-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 1 <<END
: Write bitmap file ($BITMAP) error

: Write bitmap failed
: Set bitmap failed
: Set bitmap on volume (/volume1) failed (Start sector = 0 Num of sector = 1)
END
    same false "$(state 1 .bitmapSet)"
}

@test "a link planted in the bitmap file's place is not followed" {
    local target
    for target in /volume1/target /dev/zero; do
        : >/volume1/target
        ln -s "$target" "$BITMAP"
        says 255 --set-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 1 <<END
: Bitmap size changed. Could be due to volume expansion
: Can't open bitmap file ($BITMAP)

: Read bitmap file to bitmap memory error
: Allocate bitmap failed
: Set bitmap failed
: Set bitmap on volume (/volume1) failed (Start sector = 0 Num of sector = 1)
END
        same 0 "$(stat -c %s /volume1/target)"
        [ -L "$BITMAP" ]
        rm "$BITMAP"
    done
}

set_bit_is_refused() {
    expect_output 255 /dev/null timeout "$PATIENCE" "$BIN/veskcachepinfiletool" --stdout --set-bitmap \
        --mount-path /volume1 --start-sector 0 --num-sectors 1 <<END
: Bitmap size changed. Could be due to volume expansion
: Can't open bitmap file ($BITMAP)

: Read bitmap file to bitmap memory error
: Allocate bitmap failed
: Set bitmap failed
: Set bitmap on volume (/volume1) failed (Start sector = 0 Num of sector = 1)
END
}

@test "a FIFO planted in the bitmap file's place holds nobody up" {
    mkfifo "$BITMAP"
    set_bit_is_refused
    # Neither with somebody at its other end.
    exec {OTHER_END}<>"$BITMAP"
    set_bit_is_refused
    refute read -rt 0.1 -u "$OTHER_END"
    exec {OTHER_END}>&-
    [ -p "$BITMAP" ]
    rm "$BITMAP"
}

@test "a new bitmap file has mode 0644 under the umask" {
    (umask 027 && tool --set-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 1)
    same 640 "$(stat -c %a "$BITMAP")"
}

@test "the control file makes the look-up of just its path fail" {
    random b 8K conv=fsync
    echo /volume1/a >/tmp/veskcachepinfiletool.debug
    start_service
    pin 1 /volume1/b
    pin 1 /volume1/a
    pin 1 /volume1/b /volume1/a
    rm /tmp/veskcachepinfiletool.debug
    pin 1 /volume1/a
    service_said <<END
: Handle request (type=pinFiles files=b#$(inode b)) OK 
: Simulate /volume1/a get mapping failed
: Get mapping result fail.
: Can't add file (/volume1/a) inode ($(inode a)) to bitmap
: Handle request failed
: Handle request error (num = 1, type = pinFiles), drop it.
: Simulate /volume1/a get mapping failed
: Get mapping result fail.
: Can't add file (/volume1/a) inode ($(inode a)) to bitmap
: Handle request failed
: Handle request error (num = 2, type = pinFiles), drop it.
: Handle request (type=pinFiles files=a#$(inode a)) OK 
END
}

@test "a control file with a second line feed, a part of a path or nothing fails no look-up" {
    local content
    start_service
    for content in '/volume1/a\n\n' '/volume1/' '/volume1/aa' ' /volume1/a' ''; do
        printf '%b' "$content" >/tmp/veskcachepinfiletool.debug
        pin 1 /volume1/a
    done
    stop_service
    same 5 "$(grep -c 'Handle request (type=pinFiles' "$SERVICE_LOG")"
    refute grep Simulate "$SERVICE_LOG"
}
