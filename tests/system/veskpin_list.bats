#!/usr/bin/env bats
# What veskpin list, export and metrics tell of files: each state brought about, figures held against
# file system, bitmap and device; and that looking changes nothing.

load lib

setup_file() {
    make_volume 1 64M 16M ext4
    mount -t tmpfs -o mode=755 vesk-lib /var/lib # the machine's own is everybody's
}

setup() {
    fresh_volume
    mkdir d
    random d/a 300K conv=fsync
    random d/b 700K conv=fsync
}

teardown() {
    end_service
    rm -rf /var/lib/veskpin
}

# file PATH MEMBER: of the last list.
# shellcheck disable=SC2016
file() { answer '.files[] | select(.path == $path) | .'"$2" --arg path "$1" -r; }

pin_both() {
    start_service
    pin 1 /volume1/d/a /volume1/d/b
}

@test "a pinned file, with the figures of file system, bitmap and device" {
    pin_both
    look 0 list
    same 2 "$(answer '.files | length')"
    same "pinned $(inode d/b) $((700 * 1024)) $(blocks_of d/b | wc -l) $(extents d/b | wc -l)" \
        "$(answer '.files[1] | "\(.state) \(.inode) \(.bytes) \(.blocks) \(.extents)"' -r)"
    same "$(common "$(blocks_of d/b)" "$(bitmap_blocks 1)" | wc -l)" "$(file /volume1/d/b blocksMarked)"
    same "$(common "$(blocks_of d/b)" "$(cached_blocks 1)" | wc -l)" "$(file /volume1/d/b blocksResident)"
    tool --unpin-all --mount-path /volume1
    scan_device 1
    look 1 list
    same "$(common "$(blocks_of d/b)" "$(cached_blocks 1)" | wc -l)" "$(file /volume1/d/b blocksResident)"
    stop_service
}

@test "after the driver has lost its bitmap a file is marked, and pinned when it has it again" {
    pin_both
    tool --unpin-all --mount-path /volume1
    look 1 list
    same marked "$(state_of /volume1/d/a)"
    tool --send-bitmap --mount-path /volume1
    look 0 list
    same pinned "$(state_of /volume1/d/a)"
    stop_service
}

@test "a file that has grown is partial, one whose marks are gone unmarked, an emptied one pinned" {
    pin_both
    random d/b 900K conv=notrunc,fsync oflag=append
    look 1 list
    same partial "$(state_of /volume1/d/b)"
    same "$(blocks_of d/b | wc -l) $(common "$(blocks_of d/b)" "$(bitmap_blocks 1)" | wc -l)" \
        "$(file /volume1/d/b blocks) $(file /volume1/d/b blocksMarked)"
    tool --unset-bitmap --mount-path /volume1 --start-sector 0 --num-sectors 131072
    look 1 list
    same 'unmarked unmarked' "$(state_of /volume1/d/a) $(state_of /volume1/d/b)"
    : >d/a
    sync
    look 1 list
    same pinned "$(state_of /volume1/d/a)"
    stop_service
}

@test "a replaced, a missing and an unreadable file" {
    pin_both
    local old
    old=$(inode d/a)
    random d/new 300K conv=fsync
    mv d/new d/a
    look 1 list
    same "replaced $old" "$(state_of /volume1/d/a) $(file /volume1/d/a inode)"
    rm d/a
    look 1 list
    same missing "$(state_of /volume1/d/a)"
    mv d e
    look 1 list
    same 'missing missing' "$(state_of /volume1/d/a) $(state_of /volume1/d/b)"
    # Folders that are links are not followed: whoever makes them is a user of the volume.
    ln -s e d
    look 1 list
    same unreadable "$(state_of /volume1/d/b)"
    stop_service
}

@test "a file pinned again in its place is judged by the record that fits" {
    pin_both
    rm d/a
    random d/a 100K conv=fsync
    pin 1 /volume1/d/a
    look 0 list
    same '["pinned","pinned"]' "$(answer '[.files[].state]')"
    stop_service
}

@test "a renamed file is found by inode and birth time, and only then" {
    pin_both
    mv d/a 'd/other name'
    look 1 list --search
    same missing "$(state_of /volume1/d/a)"
    mkdir -p /var/lib/veskpin/last
    birth() { stat -c %.9W "$1" | tr -d .; }
    copy() {
        printf '{"files":[{"path":"d/a","inode":%d,"birth":%d}]}\n' "$(inode 'd/other name')" "$1" \
            >"/var/lib/veskpin/last/$(volume_uuid 1).json"
    }
    copy "$(($(birth 'd/other name') + 1))"
    look 1 list --search
    same missing "$(state_of /volume1/d/a)"
    copy "$(birth 'd/other name')"
    look 1 list --search
    same 'renamed /volume1/d/other name' "$(state_of /volume1/d/a) $(file /volume1/d/a pathNow)"
    look 1 list
    same 'missing null' "$(state_of /volume1/d/a) $(file /volume1/d/a pathNow)"
    stop_service
}

@test "what is stored and not done yet wins over everything" {
    pin_both
    set_pending /volume1
    tool --unpin-files /volume1/d/a --mount-path /volume1
    random d/c 10K conv=fsync
    tool --pin-files /volume1/d/c --mount-path /volume1
    wait_until request_is_stored 2
    look 1 list
    same 'unpinning pinned pinning' \
        "$(state_of /volume1/d/a) $(state_of /volume1/d/b) $(state_of /volume1/d/c)"
    end_pending /volume1
    wait_until queue_is_empty
    # Blocks that the unpinned file shared with its neighbours are unmarked: their states tell it.
    veskpin --json list >"$ANSWER" || true
    same '["/volume1/d/b","/volume1/d/c"]' "$(answer '[.files[].path]')"
    stop_service
}

@test "what is sent and not yet stored is pinning, and waits on" {
    pin_both
    stop_service
    random d/c 10K conv=fsync
    tool --unpin-files /volume1/d/a --mount-path /volume1
    tool --pin-files /volume1/d/c --mount-path /volume1
    look 1 list
    same 'unpinning pinned pinning' \
        "$(state_of /volume1/d/a) $(state_of /volume1/d/b) $(state_of /volume1/d/c)"
    look 1 list /volume1/d/c
    same pinning "$(state_of /volume1/d/c)"
    look 0 status
    same '[2,0]' "$(answer '[.queuedMessages,.storedRequests]')"
    start_service
    is_carried_out() {
        veskpin --json list /volume1/d/a /volume1/d/c >"$ANSWER" || true
        [ "$(state_of /volume1/d/a) $(state_of /volume1/d/c)" = 'unpinned pinned' ]
    }
    wait_until is_carried_out
    stop_service
}

@test "a folder is taken whole, and blocks that its files share count once" {
    start_service
    pin 1 /volume1/d/a
    local i
    mkdir d/small
    for i in 1 2 3 4 5; do printf x >"d/small/$i"; done
    sync
    ln d/a d/small/link
    ln -s ../b d/small/soft
    look 1 list /volume1/d d/small /volume1/d/b
    same "unpinned unpinned pinned" \
        "$(state_of /volume1/d/b | head -n 1) $(state_of /volume1/d/small/1 | head -n 1) $(state_of /volume1/d/small/link | head -n 1)"
    same '["/volume1/d","/volume1/d/small"]' "$(answer '[.folders[].path]')"
    same "[8,2,$(blocks_of d/a d/b d/small/? | wc -l),$(blocks_of d/a | wc -l)]" \
        "$(answer '.folders[0] | [.files,.filesPinned,.blocks,.blocksMarked]')"
    same "$(common "$(blocks_of d/a d/b d/small/?)" "$(cached_blocks 1)" | wc -l)" \
        "$(answer '.folders[0].blocksResident')"
    same '[6,1]' "$(answer '.folders[1] | [.files,.filesPinned]')"
    stop_service
}

@test "records of a volume that is not mounted are unreadable, not missing" {
    put_config '{"volumes":{"/volume3":{"files":{"12":"a"}}}}'
    mkdir -p /volume3
    look 3 list
    same unreadable "$(state_of /volume3/a)"
}

@test "what is recorded of a volume that has lost its cache is not told to be unpinned" {
    put_config "{\"volumes\":{\"/volume1\":{\"files\":{\"$(inode d/a)\":\"d/a\"}}}}"
    printf '{"caches":[]}\n' >"$VESK_FLASHCACHE_CONFIG"
    look 3 list
    same null "$(state_of /volume1/d/a)"
    look 3 list /volume1/d/a
    same null "$(state_of /volume1/d/a)"
    volume_configure
}

@test "paths that cannot be looked at: one of several, and all" {
    : >/tmp/elsewhere
    look 1 list d/a /volume1/nothing
    same '["unpinned"]' "$(answer '[.files[].state]')"
    look 3 list /volume1/nothing
    look 3 list /tmp/elsewhere
    same '[null,"unpinned"]' "$(answer '.files[0] | [.volume,.state]')"
    local status=0
    veskpin list '' 2>/dev/null || status=$?
    same 2 "$status"
}

@test "names reach a terminal escaped and JSON as valid text" {
    local name=$'d/\e[2J\n\xff\u202e'
    random "$name" 4K conv=fsync
    shows 1 list "$name" <<END
STATE           SIZE    BLOCKS    MARKED    ON SSD   EXTENTS  FILE
unpinned     4.0 KiB         1         0         $(common "$(blocks_of "$name")" "$(cached_blocks 1)" | wc -l)         1  /volume1/d/\\x1b[2J\\x0a\\xff\\xe2\\x80\\xae
END
    look 1 list "$name"
    same "$(printf '/volume1/%s' "$name" | base64 -w0)" "$(answer '.files[0].pathBytes' -r)"
}

@test "colours are for terminals, or for those who ask" {
    pin_both
    [[ "$(veskpin list --color always)" == *$'\e[32mpinned\e[0m'* ]]
    refute grep -q $'\e' <(veskpin list)
    refute grep -q $'\e' <(veskpin list --color never)
    stop_service
}

@test "what is exported is what is recorded, and can be given to plan" {
    pin_both
    same $'/volume1/d/a\n/volume1/d/b' "$(veskpin export)"
    same "$(veskpin export)" "$(veskpin export -0 /volume1 | tr '\0' '\n')"
    look 0 export
    same '[["/volume1","/volume1/d/a"],["/volume1","/volume1/d/b"]]' "$(answer '[.files[] | [.volume,.path]]')"
    veskpin export -0 >/tmp/list
    look 0 plan -0 --files-from /tmp/list
    same '[2,0]' "$(answer '.volumes[0] | [.fileCount,.requestsNeeded]')"
    look 3 export /volume3
    stop_service
    put_config '{"volumes":{"/volume1":{"files":{"12":"a\nb"}}}}'
    ERRORS='veskpin: /volume1/a\x0ab: its name holds a line feed: use -0' shows 1 export </dev/null
    same $'/volume1/a\nb' "$(veskpin export -0 | tr -d '\0')"
}

@test "metrics are the figures of status and list, and replace a file whole" {
    pin_both
    look 0 status
    veskpin metrics >/tmp/metrics
    metric() { awk -v name="veskpin_$1 " 'index($0, name) == 1 { print substr($0, length(name) + 1) }' /tmp/metrics; }
    same 2 "$(metric 'files_by_state{volume="/volume1",state="pinned"}')"
    same "$(answer '.volumes[0].blocksMarked')" "$(metric 'blocks_marked{volume="/volume1"}')"
    same "$(answer '.volumes[0].ssdBlocks')" "$(metric 'ssd_blocks{volume="/volume1"}')"
    same "$(cached_blocks 1 | wc -l)" "$(metric 'blocks_resident{volume="/volume1"}')"
    same 1 "$(metric "service_thread_up{pid=\"$SERVICE_PID\",thread=\"worker\"}")"
    echo old >/tmp/veskpin.prom
    ln -f /tmp/veskpin.prom /tmp/kept
    veskpin metrics --output /tmp/veskpin.prom
    same old "$(cat /tmp/kept)"
    same 2 "$(sed -n 's/^veskpin_files{volume="\/volume1"} //p' /tmp/veskpin.prom)"
    local status=0
    veskpin --json metrics 2>/dev/null || status=$?
    same 2 "$status"
    status=0
    veskpin metrics --output /nowhere/file 2>/tmp/errors || status=$?
    same "1 veskpin: /nowhere/file: No such file or directory" "$status $(cat /tmp/errors)"
    stop_service
}

@test "output that cannot be written is told" {
    pin_both
    local status=0
    veskpin list >/dev/full 2>/tmp/errors || status=$?
    same '1 veskpin: standard output: No space left on device' "$status $(cat /tmp/errors)"
    stop_service
}

# Everything that a look could change: files with their times, records, queue,
whole_world() {
    find /volume1 /run/pin /var/run/*.key /var/lib -printf '%p %i %m %s %T@ %C@\n'
    cat "$CONF" "$KEY_FILE"
    cat /proc/sysvipc/msg
}
# and the device but for the questions and reads from the SSD that it counts.
whole_device() {
    find /tmp/volume1 -printf '%p %i %m %s %T@ %C@\n'
    state 1 'del(.ioctls, .hits, .ssdReads)'
    cksum <"$(volume_device 1).cached"
}

look_at_everything() {
    look 0 status
    look 1 list
    look 1 list /volume1 --search
    look 1 plan /volume1
    look 0 export
    veskpin metrics >/dev/null
}

@test "looking changes nothing anywhere" {
    pin_both
    set_pending /volume1
    tool --unpin-files /volume1/d/a --mount-path /volume1
    wait_until request_is_stored 1
    wait_until receiver_waits
    random d/c 100K conv=fsync
    sync
    fsfreeze --freeze /volume1
    local before device now
    before=$(whole_world)
    # What the file system has to read of itself for an answer comes from the device the first time, and
    # again where the kernel has dropped it. What a look did it would do every time.
    for _ in 1 2 3 4 5; do
        device=$(whole_device)
        look_at_everything
        now=$(whole_device)
        [ "$device" != "$now" ] || break
    done
    same "$device" "$now"
    same "$before" "$(whole_world)"
    fsfreeze --unfreeze /volume1
    end_pending /volume1
    wait_until queue_is_empty
    stop_service
}
