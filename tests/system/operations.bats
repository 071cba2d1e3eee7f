#!/usr/bin/env bats
# The commands of docs/operations.md, as they stand there, one after the other.

load lib

setup_file() { make_volume 1 64M 16M ext4; }

# Prints the document's blocks that are to be run, each with a heading before and time for the service
# to finish behind.
script_of() {
    awk '
        /^```sh$/ { inside = 1; print "echo \"== " ++block "\""; next }
        /^```$/ && inside { inside = 0; print "settle"; next }
        inside
    ' "$1" | sed 's#/var/lib/veskcachepinfiletool#/run/operations#'
}

# The output of a block.
block() { awk -v wanted="== $1" '/^== / { inside = $0 == wanted; next } inside' /tmp/operations.log; }

@test "every recipe of the operations page does what it says" {
    local i threads=3
    # ThreadSanitizer has a thread of its own.
    ! ldd "$BIN/veskcachepinfiletool" | grep -q libtsan || threads=4
    mkdir -p /volume1/photos
    for i in $(seq 40); do
        random "/volume1/photos/$i.raw" 4K
    done
    mkdir "/volume1/photos/not these"
    random "/volume1/photos/not this one" 4K
    random "/volume1/photos/not these/1.raw" 4K
    touch /volume1/photos/empty.raw
    truncate -s 1M /volume1/photos/hole.raw
    # Its attribute takes a block of its own, in which there is nothing of the file.
    python3 -c 'import os; os.setxattr("/volume1/photos/hole.raw", "user.note", b"x" * 300)'
    sync
    # The record of a file that is gone.
    mkdir /run/operations
    echo '{"volumes":{"/volume1":{"files":{"4000000000":"gone"}}}}' >/run/operations/pins.json
    {
        cat <<'END'
set -eu
# Until what was asked for is done, where the service runs.
settle() { until idle; do sleep 0.2; done; }
idle() {
    SERVICE_PID=$(pgrep -f 'veskcachepinfiletool --start-service') || return 0
    service_rests && CONF=$CONFIG look_at_requests && [[ $QUEUE != *[0-9]* ]]
}
END
        printf '. %q\n' "$BATS_TEST_DIRNAME/lib/service.bash"
        script_of "$BATS_TEST_DIRNAME/../../docs/operations.md"
    } >/tmp/operations.sh
    PATH=$BIN:$PATH timeout $((2 * PATIENCE)) bash /tmp/operations.sh >/tmp/operations.log 2>&1 3>&- || {
        cat /tmp/operations.log
        return 1
    }
    same Yes "$(block 3)"
    same Yes "$(block 5 | sed -n 1p)"
    same "$(printf 'cannot be named: /volume1/photos/not\\ %s\n' 'these/1.raw' 'this\ one'
        printf 'has nothing to pin: /volume1/photos/%s.raw\n' empty hole)" "$(block 4 | sort)"
    same "$({ echo '"gone"' && seq -f '"photos/%g.raw"' 40; } | sort)" \
        "$(block 5 | sed -n '2,/^[0-9]*$/{/^[0-9]*$/!p}' | sort)"
    same "$(volume_state 1 pinnedBlocks)" 0
    [ "$(block 6)" -ge 1 ]
    same "{\"slots\":256,\"pinnedBlocks\":$(block 6)}" "$(block 7)"
    same "$(block 9 | sed -n 1p)" "$(block 9 | sed -n 2p)"
    same No "$(block 10)"
    same "$threads" "$(block 12 | wc -l)"
    same 0 "$(grep -c '"photos/' /run/operations/pins.json)"
    # The last block, which starts over: a volume of whose pins nothing is left.
    same null "$(jq '.volumes["/volume1"]' /run/operations/pins.json)"
    refute test -e /volume1/veskcachepinfile.bitmap
}
