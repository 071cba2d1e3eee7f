#!/usr/bin/env bats
# The command line: each option, what is checked before any command runs, and in which order.

load lib

setup_file() {
    make_volume 1 64M 16M ext4
    DEVICE=$(volume_device 1)
    UUID=$(volume_uuid 1)
    export DEVICE UUID
}

setup() {
    fresh_volume
    random a 8K
}

# fails_with ARGUMENT...: the parse fails with the lines of standard input, then comes the usage.
fails_with() {
    expect_output 255 /dev/null tool --stdout "$@" < <(cat && usage)
}

@test "--help prints the usage and looks at nothing behind it" {
    answers 0 --help < <(usage)
    answers 0 --help --check-pin /none -d < <(usage)
    says 0 --start-service --pin-files /none --help < <(usage)
    says 255 --check-pin /none --help < <(echo ": File (/none) doesn't exist" && usage)
    answers 0 -h < <(usage)
}

@test "a command that lacks an option names the first one that is missing" {
    local command
    for command in "--pin-files /volume1/a" "--unpin-files /volume1/a" --send-bitmap --support-pin \
        --check-bitmap --add-pending --remove-pending --handle-umount --get-uuid --delete-bitmap \
        --reload-blocks --get-bitmap-size-byte --set-bitmap --unset-bitmap --unpin-range \
        "--handle-mount --config-path $CONF"; do
        # shellcheck disable=SC2086
        fails_with $command <<END
: Mount path must be set
: Check parameter failed
END
    done
    for command in --start-service "--handle-mount --mount-path /volume1" "--check-pin /volume1/a"; do
        # shellcheck disable=SC2086
        fails_with $command <<END
: Config path must be set
: Check parameter failed
END
    done
    for command in --set-bitmap --unset-bitmap --unpin-range; do
        fails_with $command --mount-path /volume1 --num-sectors 1 <<END
: Start sector is not set
: Check parameter failed
END
        fails_with $command --mount-path /volume1 --start-sector 0 <<END
: Num of sectors is not set
: Check parameter failed
END
    done
}

@test "without --stdout a failed parse prints only the usage" {
    answers 255 --send-bitmap < <(usage)
    answers 255 --unpin-all < <(usage)
}

@test "the files of a request must exist, up to 512 characters of them" {
    fails_with --pin-files "/volume1/a;/volume1/missing;/volume1/b" --mount-path /volume1 <<END
: File (path /volume1/missing) doesn't exist
: Check file paths error
: Check parameter failed
END
    fails_with --unpin-files ";;" --mount-path /volume1 <<END
: No availiable files in the file paths (;;)
: Check file paths error
: Check parameter failed
END
    fails_with --pin-files "" --mount-path /volume1 <<END
: No availiable files in the file paths ()
: Check file paths error
: Check parameter failed
END
    local many
    many=/volume1/a$(head -c 502 /dev/zero | tr '\0' ';')
    says 0 --pin-files "$many/none" --mount-path /volume1 <<END
: Send pin file request, files = $many/none
: Send pin file request OK
END
    fails_with --pin-files "${many%;;}/none" --mount-path /volume1 <<END
: File (path /n) doesn't exist
: Check file paths error
: Check parameter failed
END
}

@test "unpin-all takes a mount path or a cache path, not both" {
    fails_with --unpin-all <<END
: You must use --mount-path or --cache-path option!
END
    fails_with --unpin-all --mount-path /volume1 --cache-path "$DEVICE" <<END
: Only one of --mount-path or --cache-path can be set!
END
}

@test "the path of is-all-unpin must exist; --cache-path replaces it" {
    fails_with --is-all-unpin /no/such/dev <<END
: Error: Cache path (/no/such/dev) doesn't exist
: Check parameter failed
END
    says 0 --is-all-unpin /no/such/dev --cache-path "$DEVICE" <<<"Yes"
}

@test "--space-uuid must name a space with a cache" {
    says 0 --space-uuid "$UUID" --support-pin --mount-path /volume1 <<<"Yes"
    fails_with --space-uuid "${UUID%?}" --support-pin --mount-path /volume1 <<END
: Space UUID ${UUID%?} doesn't has cache
END
    # At once: what stands behind it is not looked at.
    fails_with --space-uuid none --check-pin /none <<END
: Space UUID none doesn't has cache
END
}

@test "--check-pin must name something that exists" {
    fails_with --check-pin /volume1/none --config-path "$CONF" <<END
: File (/volume1/none) doesn't exist
END
}

@test "one slash at the end of a mount path is cut off" {
    says 0 --get-uuid --mount-path /volume1/ <<<"$UUID"
    says 0 --support-pin --mount-path /volume1// <<END
: Can't get space uuid from mount path (/volume1/)
No
END
    says 0 --support-pin --mount-path "" <<END
: Can't get space uuid from mount path ()
No
END
}

@test "the last command wins, the demands of all commands stay" {
    says 0 --support-pin --get-uuid --mount-path /volume1 <<<"$UUID"
    fails_with --pin-files /volume1/a --start-service --config-path "$CONF" <<END
: Mount path must be set
: Check parameter failed
END
    fails_with --set-bitmap --get-uuid --mount-path /volume1 <<END
: Start sector is not set
: Check parameter failed
END
}

@test "the last of several values wins" {
    says 0 --get-uuid --mount-path /nowhere --mount-path /volume1 <<<"$UUID"
}

@test "sector numbers: what is no number is 0, -1 is not set, the largest fits" {
    local volume="--mount-path /volume1"
    # shellcheck disable=SC2086
    says 0 --unpin-range $volume --start-sector 0 --num-sectors 0 <<END
: Unpin range in cache (volume = /volume1) OK (Start sector = 0 Num of sector = 0)
END
    # shellcheck disable=SC2086
    says 0 --unpin-range $volume --start-sector abc --num-sectors 12x <<END
: Unpin range in cache (volume = /volume1) OK (Start sector = 0 Num of sector = 12)
END
    # shellcheck disable=SC2086
    fails_with --unpin-range $volume --start-sector -1 --num-sectors 1 <<END
: Start sector is not set
: Check parameter failed
END
    # shellcheck disable=SC2086
    says 0 --set-bitmap $volume --start-sector 131000 --num-sectors 99999999999999999999 <<END
: Set bitmap on volume (/volume1) OK (Start sector = 131000 Num of sector = 9223372036854775807)
END
    # shellcheck disable=SC2086
    says 0 --unset-bitmap $volume --start-sector -2 --num-sectors 1 <<END
: Unset bitmap on volume (/volume1) OK (Start sector = 18446744073709551614 Num of sector = 1)
END
}

@test "unknown options and missing arguments are complained of and ignored" {
    ERRORS="$BIN/veskcachepinfiletool: unrecognized option '--nonsense'" \
        says 0 --nonsense --get-uuid --mount-path /volume1 <<<"$UUID"
    ERRORS="$BIN/veskcachepinfiletool: invalid option -- 'r'" \
        says 0 -r --get-uuid --mount-path /volume1 <<<"$UUID"
    ERRORS="$BIN/veskcachepinfiletool: invalid option -- 'x'" \
        says 0 -x --get-uuid --mount-path /volume1 <<<"$UUID"
    ERRORS="$BIN/veskcachepinfiletool: option '--mount-path' requires an argument" \
        fails_with --get-uuid --mount-path <<END
: Mount path must be set
: Check parameter failed
END
    local option
    for option in pin-files unpin-files config-path space-uuid mount-path check-pin is-all-unpin \
        start-sector num-sectors cache-path; do
        ERRORS="$BIN/veskcachepinfiletool: option '--$option' requires an argument" \
            says 0 --get-uuid --mount-path /volume1 "--$option" <<<"$UUID"
    done
    for option in start-service send-bitmap support-pin stdout check-bitmap add-pending \
        remove-pending handle-mount handle-umount get-uuid delete-bitmap reload-blocks unpin-all \
        set-bitmap unset-bitmap unpin-range get-bitmap-size-byte help verbose debug; do
        ERRORS="$BIN/veskcachepinfiletool: option '--$option' doesn't allow an argument" \
            says 0 --get-uuid --mount-path /volume1 "--$option=x" <<<"$UUID"
    done
    # Arguments that belong to no option are nothing.
    says 0 extra --get-uuid more --mount-path /volume1 rest <<<"$UUID"
}

@test "-d and -e abort" {
    says 134 --get-uuid -d --mount-path /volume1 <<<": Get unhandled option = d"
    says 134 -e <<<": Get unhandled option = e"
    answers 134 -d </dev/null
}

@test "the short options" {
    says 0 -k -j /volume1 <<<"Yes"
    says 0 -kj/volume1/ <<<"Yes"
    says 0 -m -j /volume1 <<<"No"
    says 0 -w "$DEVICE" <<<"Yes"
    says 0 -s -j /volume1 <<<": Delete bitmap on volume (/volume1) OK"
    says 0 -q -j /volume1 </dev/null
    says 0 -p -j /volume1 -f "$CONF" </dev/null
    says 0 -g "$UUID" -v -j /volume1 <<END
: Start to unpin all blocks of volume (/volume1)
: Unpin all blocks of volume (/volume1) finish
END
    says 0 -a /volume1/a -j /volume1 <<END
: Send pin file request, files = /volume1/a
: Send pin file request OK
END
    says 0 -b /volume1/a -j /volume1 <<END
: Send unpin file request, files = /volume1/a
: Send unpin files request OK
END
    says 0 -u -j /volume1 <<END
: Start to send reload block request
: Send reload block request OK
END
    says 0 -i -j /volume1 <<END
: Start to send bitmap for volume (/volume1)
: Bitmap file (/volume1/veskcachepinfile.bitmap) doesn't exist. No need to update to driver
: Send bitmap OK
END
    put_config '{}'
    says 0 -t /volume1/a -f "$CONF" <<<"No"
    expect_output 0 /dev/null tool -lym -j /volume2 < <(tool --stdout --verbose --check-bitmap --mount-path /volume2)
}

@test "a long option may be cut as long as it is not ambiguous" {
    says 0 --support --mount /volume1 <<<"Yes"
}
