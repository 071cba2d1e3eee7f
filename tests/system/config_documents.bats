#!/usr/bin/env bats
# Configuration files that are damaged or of another shape: refused as a whole and left as they are.

load lib

setup_file() { make_volume 1 64M 16M ext4; }

setup() {
    fresh_volume
    random a 8K conv=fsync
}

# refused [MESSAGE]: the present configuration file is of no use to anyone. MESSAGE comes first where
# it cannot even be read.
refused() {
    local lines=
    [ $# -eq 0 ] || lines=": $1"$'\n'
    cp "$CONF" "$BATS_TEST_TMPDIR/before"
    says 0 --check-pin /volume1/a --config-path "$CONF" <<END
${lines}: Can't read data from config file ($CONF)
Error
END
    # Only a volume without a cache is taken out of the records.
    says 255 --handle-mount --mount-path /nowhere --config-path "$CONF" <<END
: Can't get space uuid from mount path (/nowhere)
${lines}: Can't read data from config file ($CONF)
: Can't remove pin files in volume (/nowhere)
: Handle space (/nowhere) mount failed
END
    service_refused "$lines"
    cmp "$BATS_TEST_TMPDIR/before" "$CONF"
    same config.json "$(ls -A "${CONF%/*}")"
}

# The service cannot use it; the commands that look at the volumes alone can.
refused_by_the_service() {
    cp "$CONF" "$BATS_TEST_TMPDIR/before"
    answers 0 --check-pin /volume1/a --config-path "$CONF" <<<No
    says 0 --handle-mount --mount-path /nowhere --config-path "$CONF" \
        <<<": Can't get space uuid from mount path (/nowhere)"
    service_refused ''
    cmp "$BATS_TEST_TMPDIR/before" "$CONF"
}

# The worker and the receiver both end, and with them the process.
service_refused() {
    local status=0
    tool --reload-blocks --mount-path /volume1
    tool --stdout --start-service --config-path "$CONF" >"$BATS_TEST_TMPDIR/log" || status=$?
    same 0 "$status"
    sed 's/^:/veskcachepinfiletool:/' <<END | sort >"$BATS_TEST_TMPDIR/expected"
${1}: Get request from config file ($CONF) error
: Get request error
${1}: Can't read data from config file ($CONF)
: Can't add request to config ($CONF)
END
    sed 1d "$BATS_TEST_TMPDIR/log" | sort | diff -u "$BATS_TEST_TMPDIR/expected" -
}

@test "an empty file" {
    : >"$CONF"
    refused "Prase file $CONF error"
}

@test "a document that was cut anywhere" {
    local document='{"nextRequestNum":1,"requestQueue":["0"],"requests":{"0":{"type":"ack"}}}' i
    for i in 1 2 20 40 60 $((${#document} - 1)); do
        printf '%s' "${document:0:i}" >"$CONF"
        refused "Prase file $CONF error"
    done
}

@test "text, bytes and endless nesting that are no document" {
    local text
    for text in nonsense '{"a"}' '{,}' '{"a":1,}' $'\xff\xfe' "$(head -c 20000 /dev/zero | tr '\0' '[')"; do
        printf '%s' "$text" >"$CONF"
        refused "Prase file $CONF error"
    done
    head -c 300 /dev/zero >"$CONF"
    refused "Prase file $CONF error"
}

@test "documents that are no object" {
    local text
    for text in '[]' '[1]' '"text"' 5 true 1.5; do
        put_config "$text"
        refused
    done
}

@test "members of another type" {
    local text
    for text in '{"requestQueue":{}}' '{"requestQueue":5}' '{"requestQueue":"0"}' \
        '{"requests":[]}' '{"requests":"0"}' \
        '{"nextRequestNum":"one"}' '{"nextRequestNum":{}}' '{"nextRequestNum":[1]}'; do
        put_config "$text"
        refused_by_the_service
    done
    for text in '{"volumes":[]}' '{"volumes":5}'; do
        put_config "$text"
        refused
    done
}

@test "types that are wrong deep inside" {
    local text
    for text in '{"requestQueue":[{}]}' '{"requestQueue":["0",["1"]]}' '{"requests":{"0":[]}}' \
        '{"requests":{"0":5}}' '{"requests":{"0":{"type":{}}}}' \
        '{"requests":{"0":{"type":"ack","mountPath":[]}}}' \
        '{"requests":{"0":{"type":"ack","mountPath":"/v","data":{"a":1}}}}'; do
        put_config "$text"
        refused_by_the_service
    done
    for text in '{"volumes":{"/v":5}}' '{"volumes":{"/v":[]}}' '{"volumes":{"/v":{"files":[]}}}' \
        '{"volumes":{"/v":{"files":"a"}}}' '{"volumes":{"/v":{"files":7}}}'; do
        put_config "$text"
        refused
    done
}

@test "numbers that are too large for a request number" {
    local text
    for text in 2147483648 -2147483649 4294967296 18446744073709551616 1e300 -1e300; do
        put_config "{\"nextRequestNum\":$text}"
        refused_by_the_service
    done
}

@test "a file that cannot be read, for it is a folder" {
    rm -rf "$CONF"
    mkdir "$CONF"
    says 0 --check-pin /volume1/a --config-path "$CONF" <<END
: Prase file $CONF error
: Can't read data from config file ($CONF)
Error
END
    service_refused ": Prase file $CONF error"$'\n'
    rmdir "$CONF"
}

@test "a path that cannot be looked up counts as missing, and nothing can be stored there" {
    put_config '{}'
    local path=$CONF/config.json
    says 0 --check-pin /volume1/a --config-path "$path" <<END
: Can't find config file ($path)
Error
END
    tool --reload-blocks --mount-path /volume1
    CONF=$path start_service
    wait_until waiting_is 0
    service_said <<END
: Can't open config file ($path)
: Can't write to files
: Can't add request to config ($path)
END
}

@test "null, an empty object and null members are an empty document" {
    local text
    for text in null '{}' '{"requestQueue":null,"requests":null,"volumes":null,"nextRequestNum":null}'; do
        fresh_service
        put_config "$text"
        answers 0 --check-pin /volume1/a --config-path "$CONF" <<<"No"
        start_service
        pin 1 /volume1/a
        same '{"'"$(inode a)"'":"a"}' "$(config '.volumes["/volume1"].files')"
        same 1 "$(config .nextRequestNum)"
        stop_service
    done
}

@test "a queue entry without its request ends the worker and changes nothing" {
    put_config '{"nextRequestNum":2,"requestQueue":["0","1"],"requests":{
        "1":{"type":"reloadPinBlocks","mountPath":"/volume1","data":null}}}'
    cp "$CONF" "$BATS_TEST_TMPDIR/before"
    start_service
    wait_until service_rests
    cmp "$BATS_TEST_TMPDIR/before" "$CONF"
    tool --reload-blocks --mount-path /volume1
    wait_until request_is_stored 2
    same '["0","1","2"]' "$(config .requestQueue)"
    service_said <<END
: Can't find request number (0) in config
: Get request error
END
}

@test "a type name that nobody knows ends the worker" {
    put_config '{"requestQueue":["0"],"requests":{
        "0":{"type":"PinFiles","mountPath":"/volume1","data":null}}}'
    start_service
    service_said <<END
: Can't get correct request type
: Get request error
END
}

@test "a number that stands twice in the queue is carried out, but never removed" {
    put_config '{"requestQueue":["0","0"],"requests":{
        "0":{"type":"pinFiles","mountPath":"/volume1","data":"a#'"$(inode a)"'"}}}'
    cp "$CONF" "$BATS_TEST_TMPDIR/before"
    start_service
    wait_until test -e "$(bitmap_file 1)"
    wait_until service_rests
    cmp "$BATS_TEST_TMPDIR/before" "$CONF"
    stop_service
    # It is carried out each second, perhaps a second time by now.
    same "Remove string error, count =2
Can't remove request num (0) from request queue
Can't remove request
Can't remove request (0) from config file
Handle request (type=pinFiles files=a#$(inode a)) OK " \
        "$(sed -n '2,$s/^veskcachepinfiletool: //p' "$SERVICE_LOG" | awk '!seen[$0]++')"
}

@test "members of other programs and comments' neighbours survive" {
    put_config '{"other":{"deep":[1,null,"x"]},"volumes":{"/elsewhere":{"files":{"7":"f"},"more":1}}}'
    start_service
    pin 1 /volume1/a
    stop_service
    same '{"deep":[1,null,"x"]}' "$(config .other)"
    same '{"files":{"7":"f"},"more":1}' "$(config '.volumes["/elsewhere"]')"
}
