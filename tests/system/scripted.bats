#!/usr/bin/env bats
# The unchanged tool with other libraries in the appliance's place, which answer as a test scripts
# them: what the tool makes of each answer, and that it gives back what it was handed.

load lib

setup_file() {
    # Its device serves as the cache device of the scripted volumes.
    make_volume 1 64M 16M ext4
    DEVICE=$(volume_device 1)
    export DEVICE
}

setup() {
    fresh_volume
    export VESK_SCRIPT=$BATS_TEST_TMPDIR/script
    export LD_LIBRARY_PATH=$SCRIPTED
}

# script LINE...: the libraries' answers from now on; forgets the calls so far.
script() {
    printf '%s\n' "$@" >"$VESK_SCRIPT"
    : >"$VESK_SCRIPT.calls"
}
# A volume /volume1 whose cache supports pinning, and lines that come before that.
script_volume() {
    script "$@" "space /dev/space1 /volume1 uuid-1" "config 1 /dev/ssd1" "stat 1 1 1" \
        "cache 1 $DEVICE"
}

calls() { cat "$VESK_SCRIPT.calls"; }
calls_of() { grep -c "^$1\( \|$\)" "$VESK_SCRIPT.calls" || true; }
# Everything that the libraries handed out was given back.
nothing_is_kept() {
    same "$(calls_of enum)" "$(calls_of enum-free)"
    # Where "create" gives a null there is nothing to destroy.
    if ! grep -qx 'create 0' "$VESK_SCRIPT"; then
        same "$(calls_of create)" "$(calls_of destroy)"
    fi
}

@test "a volume that can pin: what is asked, in words and texts" {
    script_volume
    says 0 --support-pin --mount-path /volume1 <<<"Yes"
    same "enum 1
enum-free
config 2 0 0 uuid-1 0 0
config-free
config 2 0 0 uuid-1 0 0
config-free
stat 3 /dev/ssd1
stat-free" "$(calls)"
    script_volume
    says 0 --get-bitmap-size-byte --mount-path /volume1 <<<"128"
    same "enum 1
enum-free
config 2 0 0 uuid-1 0 0
config-free
cache /dev/ssd1 512" "$(calls)"
}

@test "spaces that cannot be enumerated; a list handed out all the same is given back" {
    script_volume "enum -1"
    says 0 --support-pin --mount-path /volume1 <<END
: Can't enum spaces
: Can't get space uuid from mount path (/volume1)
No
END
    same $'enum -1\nenum-free' "$(calls | sed 's/enum 1/enum -1/')"
    says 0 --get-uuid --mount-path /volume1 <<<": Can't enum spaces"
    # Only a negative number is a failure.
    script_volume "enum 7"
    says 0 --get-uuid --mount-path /volume1 <<<"uuid-1"
    script "enum 0"
    says 0 --get-uuid --mount-path /volume1 </dev/null
}

@test "a space whose UUID cannot be read" {
    script "space /dev/space1 /volume1 -" "config 1 /dev/ssd1" "stat 1 1 1"
    says 0 --get-uuid --mount-path /volume1 </dev/null
    says 0 --support-pin --mount-path /volume1 <<END
: Can't get space uuid from mount path (/volume1)
No
END
    nothing_is_kept
    # Such a space before the one that is looked for matches nothing and is passed by.
    script_volume "space /dev/space0 /volume0 -"
    says 0 --set-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 1 <<END
: Get space uuid failed
: Get space uuid failed
: Set bitmap on volume (/volume1) OK (Start sector = 0 Num of sector = 1)
END
    nothing_is_kept
}

@test "a UUID is compared whole, and so is a reference path" {
    script "space /dev/space0 /volume1 uuid-12" "space /dev/space1 /volume12 uuid-1" \
        "config 1 /dev/ssd1" "stat 1 1 1" "cache 1 $DEVICE"
    says 0 --get-uuid --mount-path /volume1 <<<"uuid-12"
    says 0 --get-uuid --mount-path /volume12 <<<"uuid-1"
    says 0 --get-uuid --mount-path /volume </dev/null
    mkdir -p /volume12
    says 0 --set-bitmap --mount-path /volume12 --start-sector 0 --num-sectors 1 <<END
: Set bitmap on volume (/volume12) OK (Start sector = 0 Num of sector = 1)
END
    test -e /volume12/veskcachepinfile.bitmap
    rm -r /volume12
}

@test "a space without a reference path is passed by" {
    script_volume "space /dev/space0 - uuid-0"
    says 0 --get-uuid --mount-path /volume1 <<<"uuid-1"
    says 0 --support-pin --mount-path /volume1 <<<"Yes"
}

@test "answers of the cache configuration: none, error, any other number" {
    script_volume "config 0 -"
    says 0 --support-pin --mount-path /volume1 <<<"No"
    says_masked 0 --verbose --support-pin --mount-path /volume1 <<END
: Verbose mode is enable
: main() [N] : +++++
: SpaceGetUUID() [N]: Get UUID = uuid-1
: SpaceGetCacheConfig() [N]: Can't find cache in the config file. Space UUID is (uuid-1)
: SpaceHasCache() [N]: Space (uuid-1) doesn't be found in the config
: SpaceHasCacheAndSupportPinByUUID() [N]: Space (UUID = uuid-1) doesn't has cache
No
: main() [N] : -----
END
    script_volume "config -1 -"
    says 0 --support-pin --mount-path /volume1 <<END
: Fail to get SSD cache config
No
END
    script_volume "config 3 /dev/ssd1"
    says 0 --support-pin --mount-path /volume1 <<<"Yes"
    # A record without an SSD.
    script_volume "config 1 -"
    says 0 --support-pin --mount-path /volume1 <<END
: Can't get cache's ssd path
No
END
    same "$(calls_of config)" "$(calls_of config-free)"
    says 255 --get-bitmap-size-byte --mount-path /volume1 <<END
: Can't get cache's ssd path
: Can't get cache path
: Get cache path from mount path (/volume1) failed
: Get bitmap size for volume (/volume1) failed
END
}

@test "a cache that is being made: no support and no error" {
    local result
    for result in "0 1 1" "-1 1 1" "0 1 1 set" "-5 1 1 set"; do
        script_volume "stat $result"
        says 0 --support-pin --mount-path /volume1 <<<"No"
        case "$result" in *set) same 1 "$(calls_of stat-free)" ;; esac
    done
    says_masked 0 --verbose --support-pin --mount-path /volume1 <<END
: Verbose mode is enable
: main() [N] : +++++
: SpaceGetUUID() [N]: Get UUID = uuid-1
: SpaceHasCache() [N]: Check Space (uuid-1) ret=0
: SpaceHasCacheAndSupportPinByUUID() [N]: Failed to get status of flashcache, ssd = /dev/ssd1. (Might be due to cache is not estabilied yet)
No
: main() [N] : -----
END
}

@test "support needs the state 1 and the word 1" {
    local words
    for words in "0 1" "2 1" "-1 1" "1 0" "1 2" "1 -1"; do
        script_volume "stat 1 $words"
        says 0 --support-pin --mount-path /volume1 <<<"No"
        same 1 "$(calls_of stat-free)"
    done
    script_volume "stat 23 1 1"
    says 0 --support-pin --mount-path /volume1 <<<"Yes"
    script_volume "stat 1 0 1"
    says 255 --send-bitmap --mount-path /volume1 <<END
: Start to send bitmap for volume (/volume1)
: Volume (/volume1) doesn't support pin
: Send bitmap to space (/volume1) failed
END
}

@test "only the result 1 gives a cache device path" {
    local result
    for result in 0 2 -1; do
        script_volume "cache $result $DEVICE"
        says 255 --unpin-all --mount-path /volume1 <<END
: Start to unpin all blocks of volume (/volume1)
: Can't get cache path
: Can't get cache path
: Can't get the cache path of volume (/volume1)
: Can't unpin all block of volume (/volume1)
END
        says 0 --check-bitmap --mount-path /volume1 <<END
: Can't get cache path
: Can't get cache path
: Can't get cache path
No
END
    done
}

@test "a space UUID with and without a cache" {
    script_volume
    says 0 --space-uuid anything --support-pin --mount-path /volume1 <<<"Yes"
    same 1 "$(grep -c '^config 2 0 0 anything 0 0' "$VESK_SCRIPT.calls")"
    script_volume "config 0 -"
    expect_output 255 /dev/null tool --stdout --space-uuid anything < <(
        echo ": Space UUID anything doesn't has cache"
        usage
    )
}

@test "the mount path of a request fills its field up to 511 characters" {
    local path
    path=/$(printf 'v%.0s' {1..510})
    script "space /dev/space1 $path uuid-1" "config 1 /dev/ssd1" "stat 1 1 1"
    says 0 --reload-blocks --mount-path "$path" <<END
: Start to send reload block request
: Send reload block request OK
END
    cmp <(record 6 "$path" "") <(LD_LIBRARY_PATH='' receive_raw 1)
}

@test "a file list that does not fit its 1023 characters is refused, one that fits is stored" {
    # Where the mount path is short the inode numbers make the list longer than the paths were.
    local entry files
    mkdir -p /v
    touch /v/{1..1000}
    random /v/a 1
    script "space /dev/space1 /v uuid-1" "config 1 /dev/ssd1" "stat 1 1 1" "cache 1 $DEVICE"
    entry="a#$(inode /v/a)"
    [ "${#entry}" -ge 6 ]
    files=$(printf '/v/a;%.0s' {1..204})
    start_service
    set_pending /v
    tool --pin-files "$(printf '/v/a;%.0s' $(seq $((1024 / (${#entry} + 1)))))" --mount-path /v
    wait_until request_is_stored 0
    [ "$(config '.requests["0"].data | length')" -le 1023 ]
    [ "$(config '.requests["0"].data | length')" -gt $((1023 - ${#entry} - 1)) ]
    tool --pin-files "$files" --mount-path /v
    wait_until waiting_is 0
    wait_until service_rests
    same 1 "$(config .nextRequestNum)"
    stop_service
    same "Get relative paths failed
Can't add request to json
Can't add request to config ($CONF)" "$(tail -n 3 "$SERVICE_LOG" | sed 's/^veskcachepinfiletool: //')"
}

# served LINES...: a pin of file a with these answers; the service then said what comes on standard
# input.
served() {
    script_volume "$@"
    random a 8K conv=fsync
    fresh_service
    start_service
    pin 1 /volume1/a
    service_said
    nothing_is_kept
}
failed() {
    printf ': %s\n' "Can't add file (/volume1/a) inode ($(inode a)) to bitmap" \
        "Handle request failed" "Handle request error (num = 0, type = pinFiles), drop it."
}
unread() {
    printf ': %s\n' "Read fd to null failed (disk start sector = $1 num sectors = $2)" \
        "Can't read file (/volume1/a) to cache" "Handle request failed" \
        "Handle request error (num = 0, type = pinFiles), drop it."
}

@test "extents: each marks its blocks, an unwritten one is not read" {
    random a 8K
    served "device 0 /dev/space1" \
        "mapping 0 0:10:2048:0 10:128:4090:1 138:1:131071:0" \
        <<<": Handle request (type=pinFiles files=a#$(inode a)) OK "
    same $'16\n31\n32\n1023' "$(bitmap_blocks 1)"
    same $'16\n1023' "$(pinned_blocks 1)"
    same "device /volume1 false
create /dev/space1
mapping /volume1 $(inode a)
destroy" "$(calls | grep -E '^(device|create|mapping|destroy)')"
}

@test "the device of the volume cannot be found or made" {
    random a 8K
    served "device -1 -" < <(
        printf ': %s\n' 'Get device path of file fail. File path = "/volume1"' \
            "Create file system device fail. Path:/volume1/a"
        failed
    )
    served "device 1 -" < <(
        printf ': %s\n' 'Device path of file not found. File path = "/volume1"' \
            "Create file system device fail. Path:/volume1/a"
        failed
    )
    served "device 0 /dev/space1" "create 0" < <(
        printf ': %s\n' 'Create file system device "/dev/space1" fail.' \
            "Create file system device fail. Path:/volume1/a"
        failed
    )
    refute test -e "$(bitmap_file 1)"
}

@test "a failed look-up ends the tries, whatever is in the table" {
    random a 8K
    served "device 0 /dev/space1" "mapping -1 0:1:0:0" < <(
        echo ": Get mapping result fail."
        failed
    )
    same 1 "$(calls_of mapping)"
    refute test -e "$(bitmap_file 1)"
}

@test "an empty answer is asked again after a second, as often as it takes" {
    random a 8K
    local begin
    begin=$(now_ms)
    served "device 0 /dev/space1" "mapping 0" "mapping 0" "mapping 0 0:1:256:0" \
        <<<": Handle request (type=pinFiles files=a#$(inode a)) OK "
    [ $(($(now_ms) - begin)) -ge 2000 ]
    same 3 "$(calls_of mapping)"
    same 1 "$(calls_of create)"
    same 2 "$(bitmap_blocks 1)"
}

@test "a single unwritten extent is told and accepted" {
    random a 8K
    served "device 0 /dev/space1" "mapping 0 0:128:256:1" <<END
: Only get 1 unitilized entry from file (/volume1/a)
: Handle request (type=pinFiles files=a#$(inode a)) OK 
END
    same 2 "$(bitmap_blocks 1)"
    same "" "$(pinned_blocks 1)"
}

@test "an extent that passes the end of the bitmap: what lies before it is applied, reading fails" {
    random a 8K
    served "device 0 /dev/space1" "mapping 0 0:256:130944:0" < <(
        echo ": Read block error (seek = 67108864 num bytes = 65536"
        unread 130944 256
    )
    same 1023 "$(bitmap_blocks 1)"
    rm "$(bitmap_file 1)"
    served "device 0 /dev/space1" "mapping 0 0:128:18014398509481984:0" < <(
        echo ": Can't seek to -9223372036854775808"
        unread 18014398509481984 128
    )
    same "" "$(bitmap_blocks 1)"
}

@test "an unpin of scripted extents releases each, in their order" {
    random a 8K
    script_volume "device 0 /dev/space1" "mapping 0 0:1:3000:0 1:1:1000:1 2:2:2000:0"
    start_service
    tool --unpin-files /volume1/a --mount-path /volume1
    wait_until request_is_done 0
    same '[[3000,1],[1000,1],[2000,2]]' "$(state 1 .lastUnpin)"
    same null "$(config '.volumes["/volume1"]')"
    service_said <<<": Handle request (type=unpinFiles files=a#$(inode a)) OK "
    nothing_is_kept
}
