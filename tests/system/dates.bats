#!/usr/bin/env bats
# Files dated outside 1901 to 2038, and what is written in 2040. The tools of a 32-bit machine cannot look
# at such files, so they are dated back before anything else looks.

load lib

setup_file() { MKFS_OPTIONS="-I 256" make_volume 1 64M 16M ext4; }

setup() { fresh_volume; }

date_files() { "$HELPERS/system_date" file "$@"; }
is_pinned() { [ "$(tool --check-pin /volume1/a --config-path "$CONF")" = Yes ]; }

# pin_dated SECONDS: the file, the configuration and the bitmap all have this date when they are used.
pin_dated() {
    local blocks
    random a 300K conv=fsync
    random b 100K conv=fsync
    blocks=$(blocks_of a b)
    start_service
    date_files "$1" a
    tool --pin-files /volume1/a --mount-path /volume1
    wait_until is_pinned
    stop_service
    date_files "$1" a "$CONF" "$(bitmap_file 1)"
    start_service
    pin 1 /volume1/b
    stop_service
    date_files "$(date +%s)" a
    check_pinned /volume1/a /volume1/b
    date_files "$1" a "$CONF" "$(bitmap_file 1)"
    tool --unpin-all --mount-path /volume1
    tool --send-bitmap --mount-path /volume1
    same "$blocks" "$(driver_blocks 1)"
    date_files "$(date +%s)" a "$CONF" "$(bitmap_file 1)"
}

@test "files of 2040 and 2106 are files as any other" {
    pin_dated 2208988800
    fresh_volume
    pin_dated 4291747200
}

@test "files of 1890 where the file system holds them" {
    local folder=/run/dated
    mkdir -p "$folder"
    date_files -2524521600 "$folder"
    random a 300K conv=fsync
    cp a "$folder/a"
    date_files -2524521600 "$folder/a"
    # The list of files is looked through before anything else is.
    says 255 --pin-files "$folder/a;$folder/b" --mount-path "$folder" <<END
: File (path $folder/b) doesn't exist
: Check file paths error
: Check parameter failed
$(usage)
END
}

# With scripted libraries, as libblkid of a 32-bit Debian 12 cannot look at a device then.
@test "in 2040 a request is taken, stored and carried out" {
    [ -n "${VESK_OWN_MACHINE:-}" ] || skip "the clock is the machine's"
    random a 64K conv=fsync
    export LD_LIBRARY_PATH=$SCRIPTED VESK_SCRIPT=$BATS_TEST_TMPDIR/script
    printf '%s\n' "space /dev/space1 /volume1 uuid-1" "config 1 /dev/ssd1" "stat 1 1 1" \
        "cache 1 $(volume_device 1)" "device 0 /dev/space1" "mapping 0 0:128:1280:0" >"$VESK_SCRIPT"
    start_service
    "$HELPERS/system_date" clock 2208988800 "$CONF" '"requestQueue" : null' \
        "$BIN/veskcachepinfiletool" --pin-files /volume1/a --mount-path /volume1
    tool --send-bitmap --mount-path /volume1
    stop_service
    same "{\"$(inode a)\":\"a\"}" "$(config '.volumes["/volume1"].files')"
    same 10 "$(bitmap_blocks 1)"
    same 10 "$(driver_blocks 1)"
}
