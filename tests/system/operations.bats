#!/usr/bin/env bats
# The commands of docs/operations.md, as they stand there, one after the other.
# What stands in single quotes is for another shell.
# shellcheck disable=SC2016

load lib

setup_file() {
    make_volume 1 64M 16M ext4
    mount -t tmpfs -o mode=755 vesk-lib /var/lib # the machine's own is everybody's
}

# Prints the document's blocks that are to be run, each between the two functions that are told its name: its section's
# title, with a number from the second block of a section on.
script_of() {
    awk '
        /^##* / && !inside { title = $0; sub(/^#* /, "", title); number = 0 }
        /^```sh$/ { inside = 1; name = title (++number > 1 ? " " number : ""); print "before \"" name "\""; next }
        /^```$/ && inside { inside = 0; print "after \"" name "\""; next }
        inside
    ' "$1" | sed 's#/var/lib/veskcachepinfiletool#/run/operations#'
}

# What happens on the system between the recipes, and what is kept of each for a look at it.
around_the_blocks() {
    cat <<'END'
set -E
trap 'echo "$? $BASH_COMMAND" >>/tmp/failed' ERR
export VESKPIN_CONFIG=/run/operations/pins.json

before() {
    case $1 in
    "Pin a folder 3") veskpin unpin /volume1 >/dev/null ;;
    "Pin again what has grown or was replaced")
        head -c 200K /dev/urandom >>/volume1/photos/1.raw
        head -c 90K /dev/urandom >/volume1/new
        mv /volume1/new /volume1/photos/2.raw
        sync
        veskpin list --json |
            jq -r '.files[] | select(.state != "pinned") | "\(.path | ltrimstr("/volume1/")) \(.state)"' >"/tmp/before $1"
        ;;
    "Save all pins, and pin them again 2")
        veskpin unpin /volume1 >/dev/null || true
        after "Save all pins, and pin them again"
        ;;
    "After a reboot")
        veskcachepinfiletool --unpin-all --mount-path /volume1
        after "$1: before"
        ;;
    "When nothing happens any more 2") : >/run/veskcachepinfile-msg-server.key ;;
    "Start over") rm /volume1/photos/1.raw ;;
    esac
    exec >"/tmp/said $1" 2>&1
}

# Until what was asked for is done, where the service runs.
after() {
    exec >/dev/null
    until idle; do sleep 0.2; done
    SERVICE_PID= # the service's lines are not this shell's
    veskpin list --json /volume1 >"/tmp/list $1" || true
    veskpin status | head -n 1 >"/tmp/status $1"
    cp /run/veskcachepinfile-msg-server.key "/tmp/key $1" 2>/dev/null || true
}
idle() {
    SERVICE_PID=$(pgrep -f 'veskcachepinfiletool --start-service') || return 0
    service_rests && CONF=$CONFIG look_at_requests && [[ $QUEUE != *[0-9]* ]]
}
END
    printf '. %q\n' "$BATS_TEST_DIRNAME/lib/service.bash"
}

said() { cat "/tmp/said $1"; }
# Of what veskpin says to people the lines that tell of a file.
told() { grep -E '^[a-z ]+  /' "/tmp/said $1"; }
# The paths, below the volume, of what is in this state once the block is done.
in_state() { # STATE BLOCK
    jq -r --arg state "$1" '.files[] | select(.state == $state) | .path | ltrimstr("/volume1/")' "/tmp/list $2" | sort
}

@test "every recipe of the operations page does what it says" {
    mkdir -p /volume1/photos/album /volume1/films/one /volume1/films/two
    for i in $(seq 9) -10; do
        random "/volume1/photos/$i.raw" 4K
    done
    random /volume1/photos/album/new 4K
    random /volume1/photos/album/old 4K
    touch -d '8 days ago' /volume1/photos/album/old
    random '/volume1/photos/not this one' 4K
    touch /volume1/photos/empty.raw
    truncate -s 1M /volume1/photos/hole.raw
    # Its attribute takes a block of its own, in which there is nothing of the file.
    python3 -c 'import os; os.setxattr("/volume1/photos/hole.raw", "user.note", b"x" * 300)'
    random /volume1/films/one/a 5M
    random /volume1/films/two/b 13M
    sync
    mkdir /run/operations
    {
        around_the_blocks
        script_of "$BATS_TEST_DIRNAME/../../docs/operations.md"
    } >/tmp/operations.sh
    PATH=$BIN:$PATH timeout $((2 * PATIENCE)) bash /tmp/operations.sh >/tmp/operations.log 2>&1 3>&- || {
        tail -n 20 /tmp/operations.log /tmp/said*
        return 1
    }
    same '' "$(cat /tmp/operations.log)"
    # What has no other end than this, and nothing else has.
    same '1 veskpin plan /volume1/photos
1 veskpin pin /volume1/photos
1 veskpin pin --json /volume1/photos > /run/pin.json
1 veskpin pin -- *.raw
1 ( cd /volume1/photos && veskpin pin -- *.raw )
1 veskpin pin --files-from - -0
1 veskpin pin "$folder"
1 veskpin unpin /volume1/photos
1 veskpin pin --files-from /run/operations/wanted.list -0' "$(cat /tmp/failed)"
    same Yes "$(said "Does a volume support pinning?")"
    check_pinning
    check_mending
    check_cache_commands
    check_start_over
}

ALL_BUT_THE_OLD="$(seq -f 'photos/%g.raw' 9)
photos/-10.raw
photos/album/new"

check_pinning() {
    local left_out='left out  /volume1/photos/empty.raw: no-blocks
left out  /volume1/photos/hole.raw: no-blocks'
    same "$left_out
left out  /volume1/photos/not this one: name" "$(told "Pin a folder" | sort -u)"
    same "$(sort <<<"$ALL_BUT_THE_OLD"$'\nphotos/album/old')" "$(in_state pinned "Pin a folder")"
    same '["name",1]
["no-blocks",2]
{"path":"/volume1/photos/empty.raw","reason":"no-blocks"}
{"path":"/volume1/photos/hole.raw","reason":"no-blocks"}
{"path":"/volume1/photos/not this one","reason":"name"}' "$(said "Pin a folder 2")"
    same "$left_out
$left_out
left out  /volume1/photos/not this one: name" "$(told "Pin a folder 3")"
    same "$(sort <<<"$ALL_BUT_THE_OLD")" "$(in_state pinned "Pin a folder 3")"
    same "not everything, see /run/pin.log" "$(said "Pin a folder 4")"
    same "left out  /volume1/films/two/b: no-room" "$(told "When it does not fit")"
    same "$(sort <<<"$ALL_BUT_THE_OLD"$'\nphotos/album/old\nfilms/one/a')" "$(in_state pinned "When it does not fit")"
}

check_mending() {
    local seen="See what is pinned, and what still waits"
    said "$seen" | grep -q '^/volume1  *13  *0 .* pinning$'
    same 2 "$(said "$seen" | grep -c '^pinned .* /volume1/photos/1.raw$')" # alone, and among all
    same "photos/1.raw partial
photos/2.raw replaced" "$(cat "/tmp/before Pin again what has grown or was replaced")"
    same "$(in_state pinned "$seen")" "$(in_state pinned "Pin again what has grown or was replaced")"
    same "" "$(in_state pinned "Save all pins, and pin them again")"
    same "$(in_state pinned "$seen")" "$(in_state pinned "Save all pins, and pin them again 2")"
    same "films/one/a" "$(in_state pinned Unpin)"
    # Beside the file that came in its place, the record of the one that was replaced.
    same "replaced  /volume1/photos/2.raw: needs-repair" "$(told Unpin | sort -u)"
    same "films/one/a
photos/1.raw
photos/2.raw" "$(in_state pinned "One request, from an appliance's script")"
}

check_cache_commands() {
    local pinned
    pinned=$(in_state pinned "One request, from an appliance's script")
    same "$pinned" "$(in_state marked "After a reboot: before")"
    same "$pinned" "$(in_state pinned "After a reboot")"
    same No "$(said "When the cache is replaced")"
    same "$pinned" "$(in_state marked "When the cache is replaced")"
}

check_start_over() {
    said "When nothing happens any more" | grep -q '^Service [0-9]*: receiver waiting, worker waiting,'
    same "No service runs" "$(cat "/tmp/status When nothing happens any more 3")"
    same "$(cat "/tmp/key Start the service")" "$(cat "/tmp/key When nothing happens any more 2")"
    same "left out  /volume1/photos/1.raw: not-found" "$(told "Start over 2")"
    same "films/one/a
photos/2.raw" "$(jq -r '.volumes["/volume1"].files[]' /run/operations/pins.json | sort)"
    same "$(blocks_of /volume1/films/one/a /volume1/photos/2.raw)" "$(bitmap_blocks 1)"
    same "$(blocks_of /volume1/films/one/a /volume1/photos/2.raw)" "$(driver_blocks 1)"
}
