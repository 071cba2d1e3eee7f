#!/usr/bin/env bats
# The queue of the service: what clients send is kept, numbered, served in order, and survives.

load lib

setup_file() { make_volume 1 64M 16M ext4; }

setup() {
    fresh_volume
    local name
    for name in a b c; do
        random $name 100K conv=fsync
    done
}

send_pin() { tool --pin-files "$1" --mount-path /volume1; }

@test "requests sent before the service starts wait in the queue and are served in their order" {
    send_pin "/volume1/a;/volume1/b"
    send_pin /volume1/c
    tool --unpin-files /volume1/a --mount-path /volume1
    tool --reload-blocks --mount-path /volume1
    waiting_is 4
    refute test -e "$CONF"
    start_service
    wait_until request_is_done 3
    waiting_is 0
    same '{"'"$(inode b)"'":"b","'"$(inode c)"'":"c"}' \
        "$(config '.volumes["/volume1"].files' | jq -cS .)"
    service_said <<END
: Handle request (type=pinFiles files=a#$(inode a);b#$(inode b)) OK 
: Handle request (type=pinFiles files=c#$(inode c)) OK 
: Handle request (type=unpinFiles files=a#$(inode a)) OK 
: Handle request (type=reloadPinBlocks) OK 
END
}

@test "a stored request has a number, its type, its mount path and its files by inode" {
    start_service
    set_pending /volume1
    send_pin "/volume1/a;;/volume1/b"
    tool --unpin-files /volume1/c --mount-path /volume1/
    tool --reload-blocks --mount-path /volume1
    wait_until request_is_stored 2
    same "$(jq -cS . <<END
{ "nextRequestNum": 3, "requestQueue": ["0", "1", "2"], "requests": {
  "0": { "type": "pinFiles", "mountPath": "/volume1", "data": "a#$(inode a);b#$(inode b)" },
  "1": { "type": "unpinFiles", "mountPath": "/volume1", "data": "c#$(inode c)" },
  "2": { "type": "reloadPinBlocks", "mountPath": "/volume1", "data": null } } }
END
    )" "$(jq -cS . "$CONF")"
    stop_service
}

@test "a finished request leaves the file together with its record's change" {
    start_service
    pin 1 /volume1/a
    same "$(jq -cS . <<END
{ "nextRequestNum": 1, "requestQueue": null, "requests": {},
  "volumes": { "/volume1": { "files": { "$(inode a)": "a" } } } }
END
    )" "$(jq -cS . "$CONF")"
    unpin 1 /volume1/a
    same '{"nextRequestNum":2,"requestQueue":null,"requests":{},"volumes":{}}' "$(config .)"
    stop_service
}

@test "the queue survives kill -9 and is served by the next service, records included" {
    start_service
    pin 1 /volume1/c
    set_pending /volume1
    send_pin /volume1/a
    send_pin /volume1/b
    wait_until request_is_stored 2
    is_child "$SERVICE_PID"
    kill -KILL "$SERVICE_PID"
    wait "$SERVICE_PID" || [ $? -eq 137 ]
    send_pin /volume1/c
    # The pending state is not kept: nothing holds the requests back.
    start_service
    wait_until request_is_done 3
    same 3 "$(config '.volumes["/volume1"].files | length')"
    service_said <<END
: Handle request (type=pinFiles files=a#$(inode a)) OK 
: Handle request (type=pinFiles files=b#$(inode b)) OK 
: Handle request (type=pinFiles files=c#$(inode c)) OK 
END
}

@test "the number after 2147483645 is 0" {
    put_config '{"nextRequestNum":2147483645}'
    start_service
    set_pending /volume1
    send_pin /volume1/a
    send_pin /volume1/b
    wait_until config_has '.requestQueue == ["2147483645", "0"]'
    same 1 "$(config .nextRequestNum)"
    end_pending /volume1
    wait_until queue_is_empty
    same 2 "$(config '.volumes["/volume1"].files | length')"
    stop_service
}

@test "between failed requests there is no pause" {
    # As many pauses of a second are longer than anything is waited for.
    local requests=$((PATIENCE + 30))
    put_config "$(jq -n --argjson number "$requests" '[range($number) | tostring] as $numbers | {
        nextRequestNum: $number, requestQueue: $numbers,
        requests: ($numbers | map({(.): {type: "ack", mountPath: "/volume1", data: null}}) | add)}')"
    start_service
    wait_until queue_is_empty
    stop_service
    same "$requests" "$(grep -c 'type = ack), drop it.$' "$SERVICE_LOG")"
}

@test "a failed request is dropped and the next one is taken" {
    put_config '{"nextRequestNum":4,"requestQueue":["0","1","2","3"],"requests":{
        "0":{"type":"pinFiles","mountPath":"/volume1","data":"gone#4000000"},
        "1":{"type":"pinFiles","mountPath":"/volume1","data":"a"},
        "2":{"type":"ack","mountPath":"/volume1","data":null},
        "3":{"type":"pinFiles","mountPath":"/volume1","data":"a#'"$(inode a)"'"}}}'
    start_service
    wait_until queue_is_empty
    same '{}' "$(config .requests)"
    service_said <<END
: Get mapping result fail.
: Can't add file (/volume1/gone) inode (4000000) to bitmap
: Handle request failed
: Handle request error (num = 0, type = pinFiles), drop it.
: Parse file inode from string (a) failed
: Can't parse file inodes from request's data (a)
: Handle request failed
: Handle request error (num = 1, type = pinFiles), drop it.
: Get unhandle request (ack)
: Handle request failed
: Bitmap is already NULL
: Handle request error (num = 2, type = ack), drop it.
: Handle request (type=pinFiles files=a#$(inode a)) OK 
END
}

@test "a file that vanishes before its request is stored ends the receiver, not the service" {
    send_pin /volume1/a
    send_pin /volume1/b
    rm a
    start_service
    wait_until receiver_has_ended
    waiting_is 1
    refute test -e "$CONF"
    service_said <<END
: Stat file /volume1/a error
: Cant' get inode number of file (/volume1/a)
: Get relative paths failed
: Can't add request to json
: Can't add request to config ($CONF)
END
}

@test "an unpin whose second file has vanished changes neither the bitmap file nor the driver" {
    start_service
    pin 1 /volume1/a /volume1/b
    local before counts
    before=$(sha256sum "$(bitmap_file 1)")
    counts=$(state 1 '[.ioctls.setBitmap, .ioctls.unpinRanges, .pinnedBlocks]')
    set_pending /volume1
    tool --unpin-files "/volume1/a;/volume1/b" --mount-path /volume1
    wait_until request_is_stored 1
    local second
    second=$(inode b)
    rm b
    end_pending /volume1
    wait_until request_is_done 1
    same "$before" "$(sha256sum "$(bitmap_file 1)")"
    same "$counts" "$(state 1 '[.ioctls.setBitmap, .ioctls.unpinRanges, .pinnedBlocks]')"
    same 2 "$(config '.volumes["/volume1"].files | length')"
    service_said <<END
: Handle request (type=pinFiles files=a#$(inode a);b#$second) OK 
: Get mapping result fail.
: Get mapping table of file (/volume1/b) failed
: Unset bitmap and append unpin infos failed
: Handle request failed
: Handle request error (num = 1, type = unpinFiles), drop it.
END
}

@test "many clients at once: every request is stored, each under a number of its own" {
    local i clients=
    for i in $(seq 8); do
        random "many$i" 8K
    done
    start_service
    set_pending /volume1
    for i in $(seq 8); do
        send_pin "/volume1/many$i" &
        clients+=" $!"
    done
    for i in $clients; do
        wait "$i"
    done
    wait_until request_is_stored 7
    same '["0","1","2","3","4","5","6","7"]' "$(config .requestQueue)"
    same "$(for i in $(seq 8); do echo "many$i#$(inode "many$i")"; done)" \
        "$(jq -r '.requests[].data' "$CONF" | sort)"
    stop_service
}
