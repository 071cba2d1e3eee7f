#!/usr/bin/env bats
# The messages as they arrive at the system log, datagram by datagram.

load lib

setup_file() {
    make_volume 1 64M 16M ext4
    UUID=$(volume_uuid 1)
    export UUID
}

setup() {
    fresh_volume
    rm -f /run/syslog
    (
        close_descriptors
        exec "$HELPERS/system_syslog" /dev/log /run/syslog
    ) &
    LOG_PID=$!
    wait_until test -e /run/syslog
}

teardown() {
    end_service
    rm -f /dev/log
}

# The log ends once it has written what was sent, which it does in its own time.
end_log() {
    [ -n "$LOG_PID" ] || return 0
    is_child "$LOG_PID"
    kill "$LOG_PID"
    wait "$LOG_PID"
    LOG_PID=
}

# logged: the datagrams until now are the lines of standard input; the log ends with it. Each begins with
# the priority, the time, the program and the source file, which are checked here and left out there. The
# line's number is N where it is the same at both places of a long form.
logged() {
    cat >"$BATS_TEST_TMPDIR/expected"
    end_log
    local prefix='<11>[A-Z][a-z]{2} [ 0-9][0-9] [0-9:]{8} veskcachepinfiletool: veskcachepinfiletool\.cpp:'
    sed -E -e "s/^${prefix}([0-9]+) ([A-Za-z]+\(\)) \[\1\] : /\2 [N] : /" -e "s/^${prefix}[0-9]+ //" \
        /run/syslog | diff -u "$BATS_TEST_TMPDIR/expected" -
}

@test "level 1: priority 11, the source file, a line number and the text" {
    answers 0 --unpin-all --mount-path /volume1 </dev/null
    answers 255 --handle-mount --mount-path /nowhere --config-path /run < /dev/null
    logged <<END
Start to unpin all blocks of volume (/volume1)
Unpin all blocks of volume (/volume1) finish
Can't get space uuid from mount path (/nowhere)
Prase file /run error
Can't read data from config file (/run)
Can't remove pin files in volume (/nowhere)
Handle space (/nowhere) mount failed
END
}

@test "level 2: function and line again, the marker of errors, the trace" {
    answers 0 --verbose --support-pin --mount-path /nowhere <<<"No"
    logged <<END
Verbose mode is enable
main() [N] : +++++
SpaceGetUUID() [N] : Get UUID = (null)
SpaceHasCacheAndSupportPin() [N] : ***** Can't get space uuid from mount path (/nowhere)
main() [N] : -----
END
}

@test "level 3: debug messages in the same form; a line feed at the end is part of the text" {
    answers 0 --debug --verbose --set-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 128 \
        </dev/null
    logged <<END
Debug mode is enable
Verbose mode is enable
main() [N] : +++++
SpaceGetUUID() [N] : Get UUID = $UUID
SpaceGetReferencePath() [N] : Get reference path = /volume1
SpaceGetReferencePath() [N] : Get reference path = /volume1
BitmapGetNeededSizeByte() [N] : Disk size = 67108864 byte
BitmapAllocateAndInitialize() [N] : Allocate 128 bytes bitmap
BitmapAllocateAndInitialize() [N] : Bitmap files (/volume1/veskcachepinfile.bitmap) doesn't exist
BitmapOperation() [N] : Disk start sector=0 num sectors=128\n
BitmapWriteToFile() [N] : Bytes to write = 128
BitmapWriteToFile() [N] : Write to bitmap file (/volume1/veskcachepinfile.bitmap) size (128) Finish
BitmapSendToDriver() [N] : +++++
DoIoctl() [N] : +++++
DoIoctl() [N] : -----
BitmapSendToDriver() [N] : -----
main() [N] : Set bitmap on volume (/volume1) OK (Start sector = 0 Num of sector = 128)
main() [N] : -----
END
}

@test "no command and a failed parse" {
    answers 0 < <(usage)
    answers 255 --verbose --get-uuid < <(usage)
    answers 134 -d </dev/null
    logged <<END
Invalid input
Verbose mode is enable
Mount path must be set
Check parameter failed
Get unhandled option = d
END
}

@test "with --stdout nothing reaches the system log, what stood before it does" {
    says 0 --get-uuid --mount-path /volume1 <<<"$UUID"
    expect_output 255 /dev/null tool --verbose --stdout --get-uuid < <(
        printf ': %s\n' "Mount path must be set" "Check parameter failed"
        usage
    )
    logged <<<"Verbose mode is enable"
}

@test "the service logs there" {
    random a 8K conv=fsync
    run_service >"$SERVICE_LOG"
    pin 1 /volume1/a
    stop_service
    same "" "$(cat "$SERVICE_LOG")"
    # The client and the service may both be writing.
    end_log
    LC_ALL=C sort -k 6 -o /run/syslog /run/syslog
    logged <<END
Handle request (type=pinFiles files=a#$(inode a)) OK 
Send pin file request OK
Send pin file request, files = /volume1/a
Service starts (Build time: 2018-06-08-15:24)
END
}

@test "conversion characters and long paths in messages" {
    local path
    path=/%s%n%d%%$(printf 'p%.0s' {1..1500})
    answers 0 --handle-umount --mount-path "$path" </dev/null
    logged <<END
Can't get space uuid from mount path ($path)
Space ($path) doesn't support pin
END
}

@test "without a system log every command works all the same" {
    end_log
    answers 0 --support-pin --mount-path /volume1 <<<"Yes"
    rm /dev/log
    answers 0 --support-pin --mount-path /volume1 <<<"Yes"
    answers 255 --add-pending --mount-path /nowhere </dev/null
}
