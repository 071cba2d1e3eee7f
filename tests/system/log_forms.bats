#!/usr/bin/env bats
# How messages look on standard output at the three levels, and what the order of options does.

load lib

setup_file() {
    make_volume 1 64M 16M ext4
    UUID=$(volume_uuid 1)
    export UUID
}

setup() { fresh_volume; }

@test "level 2: the trace of main, verbose messages without a blank before the colon" {
    says_masked 0 --verbose --support-pin --mount-path /volume1 <<END
: Verbose mode is enable
: main() [N] : +++++
: SpaceGetUUID() [N]: Get UUID = $UUID
: SpaceHasCache() [N]: Check Space ($UUID) ret=0
: SpaceHasCacheAndSupportPinByUUID() [N]: supportPin=1
: SpaceHasCacheAndSupportPin() [N]: Volume (/volume1) support pin
Yes
: main() [N] : -----
END
}

@test "level 2: errors carry their marker, notices do not" {
    says_masked 255 --verbose --send-bitmap --mount-path /nowhere <<END
: Verbose mode is enable
: main() [N] : +++++
: main() [N] : Start to send bitmap for volume (/nowhere)
: SpaceGetUUID() [N]: Get UUID = (null)
: SpaceHasCacheAndSupportPin() [N] : ***** Can't get space uuid from mount path (/nowhere)
: SendBitmap() [N] : ***** Volume (/nowhere) doesn't support pin
: main() [N] : ***** Send bitmap to space (/nowhere) failed
: main() [N] : -----
END
}

@test "an invalid command at each level" {
    says 0 < <(echo ": Invalid input" && usage)
    says_masked 0 --verbose < <(
        printf ': %s\n' "Verbose mode is enable" "main() [N] : +++++" "main() [N] : ***** Invalid input"
        usage
        echo ": main() [N] : -----"
    )
    says_masked 0 --debug < <(
        printf ': %s\n' "Debug mode is enable" "main() [N] : +++++" "main() [N] : ***** Invalid input"
        usage
        echo ": main() [N] : -----"
    )
}

@test "a failed parse is told in the short form and leaves no trace, whatever the level" {
    says 255 --verbose --debug --send-bitmap < <(
        printf ': %s\n' "Verbose mode is enable" "Debug mode is enable" "Mount path must be set" \
            "Check parameter failed"
        usage
    )
    says 255 --verbose --space-uuid none < <(
        printf ': %s\n' "Verbose mode is enable" "Space UUID none doesn't has cache"
        usage
    )
}

@test "level 3 adds the debug messages, with or without --verbose" {
    local expected="\
: main() [N] : +++++
: SpaceGetUUID() [N]: Get UUID = $UUID
: SpaceGetReferencePath() [N]: Get reference path = /volume1
: SpaceGetReferencePath() [N]: Get reference path = /volume1
: BitmapGetNeededSizeByte() [N]: Disk size = 67108864 byte
: BitmapAllocateAndInitialize() [N]: Allocate 128 bytes bitmap
: BitmapAllocateAndInitialize() [N]: Bitmap files (/volume1/veskcachepinfile.bitmap) doesn't exist
: BitmapOperation() [N]: Disk start sector=256 num sectors=128

: BitmapWriteToFile() [N]: Bytes to write = 128
: BitmapWriteToFile() [N]: Write to bitmap file (/volume1/veskcachepinfile.bitmap) size (128) Finish
: BitmapSendToDriver() [N] : +++++
: DoIoctl() [N] : +++++
: DoIoctl() [N] : -----
: BitmapSendToDriver() [N] : -----
: main() [N] : Set bitmap on volume (/volume1) OK (Start sector = 256 Num of sector = 128)
: main() [N] : -----"
    local command="--set-bitmap --mount-path /volume1 --start-sector 256 --num-sectors 128"
    # shellcheck disable=SC2086
    says_masked 0 --debug $command <<END
: Debug mode is enable
$expected
END
    rm "$(bitmap_file 1)"
    # shellcheck disable=SC2086
    says_masked 0 --debug --verbose $command <<END
: Debug mode is enable
: Verbose mode is enable
$expected
END
    rm "$(bitmap_file 1)"
    # At level 2 the same without the debug message.
    # shellcheck disable=SC2086
    says_masked 0 --verbose $command <<END
: Verbose mode is enable
$(grep -v -e BitmapOperation -e '^$' <<<"$expected")
END
}

@test "the parser's own messages go where the options before them say" {
    answers 0 --get-uuid --mount-path /volume1 --verbose < <(echo "$UUID")
    expect_output 0 mask_numbers tool --verbose --stdout --get-uuid --mount-path /volume1 <<END
: main() [N] : +++++
: SpaceGetUUID() [N]: Get UUID = $UUID
$UUID
: main() [N] : -----
END
    expect_output 0 mask_numbers tool --verbose --stdout --debug --get-uuid --mount-path /volume1 <<END
: Debug mode is enable
: main() [N] : +++++
: SpaceGetUUID() [N]: Get UUID = $UUID
$UUID
: main() [N] : -----
END
    # --stdout at the very end: the failed check before it went to the system log.
    expect_output 255 /dev/null tool --check-pin /none --stdout < <(usage)
}

@test "the mount is silent at level 1 and told at level 2" {
    says 0 --handle-mount --mount-path /volume1 --config-path "$CONF" </dev/null
    says_masked 0 --verbose --handle-mount --mount-path /volume1 --config-path "$CONF" <<END
: Verbose mode is enable
: main() [N] : +++++
: SpaceGetUUID() [N]: Get UUID = $UUID
: SpaceHasCache() [N]: Check Space ($UUID) ret=0
: SpaceHasCacheAndSupportPinByUUID() [N]: supportPin=1
: SpaceHasCacheAndSupportPin() [N]: Volume (/volume1) support pin
: main() [N]: Handle space (/volume1) mount OK
: main() [N] : -----
END
}

@test "the program's name is the base name of its path" {
    ln -s "$BIN/veskcachepinfiletool" /tmp/another-name
    expect_output 255 /dev/null /tmp/another-name --stdout --send-bitmap < <(
        printf 'another-name: %s\n' "Mount path must be set" "Check parameter failed"
        usage | sed 's/veskcachepinfiletool/another-name/'
    )
    (cd /tmp && expect_output 0 /dev/null ./another-name --stdout < <(
        echo 'another-name: Invalid input'
        usage | sed 's/veskcachepinfiletool/another-name/'
    ))
}

@test "a pin told by the service at level 3" {
    random a 64K conv=fsync
    local extent
    extent=$(extents a)
    same 1 "$(wc -l <<<"$extent")"
    local start sectors
    read -r _ start sectors _ <<<"$extent"
    start_service --debug
    pin 1 /volume1/a
    stop_service
    same "Add file (/volume1/a) start
Start for file (/volume1/a), inode = $(inode a)
Entry number = 1
File [/volume1/a] start sector=0 num_sector=$sectors device_start sector =$start
Disk start sector=$start num sectors=$sectors
Add file (/volume1/a) finish
Mapping entry size = 1
Read to null (disk start sector = $start num sectors = $sectors)
offset byte = $((start * 512)) num bytes = 65536
mount path = /volume1 request = Request type=pinFiles mountPath=/volume1 data=a#$(inode a)
Add file (a) to pin file list" \
        "$(mask_numbers <"$SERVICE_LOG" | sed -n 's/^[a-z]*: [A-Za-z]*() \[N\]: \(\(Add file\|Start for\|Entry\|File \[\|Disk start\|Mapping\|Read to null\|offset\|mount path\).*\)/\1/p')"
}
