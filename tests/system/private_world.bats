#!/usr/bin/env bats
# The private worlds in which these tests run: apart from each other, and gone without a trace,
# whatever ends them.

load lib

WORLD=$BATS_TEST_DIRNAME/../../scripts/lib/private-world
RUN_BATS=$BATS_TEST_DIRNAME/run-bats

# A program for a world: a volume, whose device lies below /run/ID, is written to without end.
write_program() {
    ID=world-$BATS_TEST_NUMBER-$RANDOM$RANDOM
    # A world sees the folder it is called in, wherever that lies.
    cd "$BATS_TEST_TMPDIR" || return
    PROGRAM=$BATS_TEST_TMPDIR/program
    cat >"$PROGRAM" <<END
set -e
BIN=$(printf %q "$BIN")
. $(printf %q "$BATS_TEST_DIRNAME/../../scripts/lib/volume.bash")
volume_device() { echo "/run/$ID/cachedev_\$1"; }
volume_make 1 64M 16M ext4
echo ready
while :; do dd if=/dev/urandom of=/volume1/a bs=1M count=20 status=none; done
END
}

# Leaves the world's process id in WORLD_PID, and the world at work.
start_world() {
    write_program
    : >"$BATS_TEST_TMPDIR/log"
    (
        close_descriptors
        # Whoever has started the tests may ignore signals, and then all that they start would.
        exec /usr/bin/env --default-signal=HUP,TERM "$WORLD" bash "$PROGRAM"
    ) >"$BATS_TEST_TMPDIR/log" 2>&1 &
    WORLD_PID=$!
    wait_until grep -q ready "$BATS_TEST_TMPDIR/log"
    [ -n "$(processes_of_world)" ]
    loop_devices_of_world
}

teardown() { end_children; }

# Of the whole machine, whose nodes this world need not have.
loop_devices_of_world() {
    cat /sys/block/loop*/loop/backing_file 2>/dev/null | grep -q "$ID"
}

# The processes that have the program or the device on their command line.
processes_of_world() {
    # The list of files is older than the process that looks, which so does not find itself.
    grep -las -e "$ID" -e "$PROGRAM" /proc/[0-9]*/cmdline || true
}

nothing_is_left() {
    [ -z "$(processes_of_world)" ] &&
        ! loop_devices_of_world &&
        ! grep -q "$ID" /proc/self/mountinfo
}

# end_world SIGNAL STATUS: the world ends so, and the machine can still write back everything.
end_world() {
    local status=0
    is_child "$WORLD_PID"
    kill -s "$1" "$WORLD_PID"
    wait "$WORLD_PID" || status=$?
    same "$2" "$status"
    wait_until nothing_is_left
    timeout "$PATIENCE" sync
}

@test "nothing is left after kill -9, with a volume being written to" {
    start_world
    end_world KILL 137
}

@test "nothing is left after kill -9, again and again" {
    for _ in 1 2 3; do
        start_world
        end_world KILL 137
    done
}

@test "nothing is left after SIGTERM" {
    start_world
    end_world TERM 143
}

@test "nothing is left after SIGHUP" {
    start_world
    end_world HUP 143
}

@test "nothing is left when the command ends" {
    write_program
    sed -i '/^while/d' "$PROGRAM"
    same ready "$("$WORLD" bash "$PROGRAM")"
    wait_until nothing_is_left
}

@test "nothing is left when the cache device is killed under a mounted volume" {
    write_program
    # shellcheck disable=SC2016
    sed -i 's/^while.*/kill -KILL "$(volume_state 1 pid)"; ls \/volume1 >\/dev\/null || true/' "$PROGRAM"
    same ready "$("$WORLD" bash "$PROGRAM")"
    wait_until nothing_is_left
    timeout "$PATIENCE" sync
}

@test "two worlds at once have each their own volume 1, their own queue and their own log" {
    write_program
    cat >"$PROGRAM" <<END
set -e
BIN=$(printf %q "$BIN")
. $(printf %q "$BATS_TEST_DIRNAME/../../scripts/lib/volume.bash")
# Where both worlds have come so far.
meet() {
    : >"\$1.\$2"
    until [ -e "\$1.1" ] && [ -e "\$1.2" ]; do sleep 0.1; done
}
volume_make 1 64M 16M ext4
echo "\$1" >/volume1/name
"\$BIN/veskcachepinfiletool" --reload-blocks --mount-path /volume1
meet made "\$1"
for i in \$(seq \$1); do "\$BIN/veskcachepinfiletool" --reload-blocks --mount-path /volume1; done
meet sent "\$1"
cat /volume1/name
awk 'NR > 1 { print \$5 }' /proc/sysvipc/msg
ls -A /dev/log 2>/dev/null || echo none
END
    (
        close_descriptors
        exec "$WORLD" bash "$PROGRAM" 1
    ) >"$BATS_TEST_TMPDIR/one" &
    local one=$!
    timeout "$PATIENCE" "$WORLD" bash "$PROGRAM" 2 >"$BATS_TEST_TMPDIR/two"
    wait "$one"
    same $'1\n2\nnone' "$(cat "$BATS_TEST_TMPDIR/one")"
    same $'2\n3\nnone' "$(cat "$BATS_TEST_TMPDIR/two")"
}

# The first two folders of a path: a world sees what leads to this tree and to where it is called in.
way_to() { cut -d/ -f1-3 <<<"$1"; }

@test "what a world writes below /run, /tmp, /dev and the volumes stays in it" {
    cd "$BATS_TEST_TMPDIR"
    # shellcheck disable=SC2016
    "$WORLD" sh -c 'for f in /run /tmp /dev /dev/shm /volume1 /volume2; do : >$f/from-the-world; done'
    same "" "$(ls -d /run/from-* /tmp/from-* /dev/from-* /dev/shm/from-* /volume?/from-* 2>/dev/null)"
    same "" "$("$WORLD" sh -c 'ls -d /run/* /run/.[!.]* /tmp/* /tmp/.[!.]* /volume1/* 2>/dev/null' |
        grep -vxF -e /run/mount -e "$(way_to "$(readlink -f "$BATS_TEST_DIRNAME")")" -e "$(way_to "$PWD")")"
}

@test "the command's status and arguments come through" {
    local status=0
    # shellcheck disable=SC2016
    same '<a b><*><>' "$("$WORLD" sh -c 'printf "<%s>" "$@"' sh 'a b' '*' '')"
    "$WORLD" sh -c 'exit 3' || status=$?
    same 3 "$status"
    same "$BATS_TEST_DIRNAME" "$(cd "$BATS_TEST_DIRNAME" && "$WORLD" pwd)"
}

# missing REASON COMMAND...: it ends with 77 and the reason.
missing() {
    local status=0 reason=$1
    shift
    "$@" >/dev/null 2>"$BATS_TEST_TMPDIR/errors" || status=$?
    same 77 "$status"
    same "private-world: $reason" "$(cat "$BATS_TEST_TMPDIR/errors")"
}

@test "without root, FUSE or loop devices it says so and ends with 77" {
    # In a place that everybody can reach; the tree's may not be one.
    local copy=/tmp/of-everybody
    mkdir -p "$copy/scripts/lib" "$copy/tests/system"
    cp "$WORLD" "$copy/scripts/lib/"
    cp "$RUN_BATS" "$copy/tests/system/"
    chmod -R a+rX "$copy"
    cd "$copy"
    missing "root is needed (namespaces, mounts, loop devices)" \
        setpriv --reuid=65534 --clear-groups scripts/lib/private-world true
    # shellcheck disable=SC2016
    missing "/dev/fuse is missing: this kernel has no FUSE" \
        unshare --mount sh -c 'mount -t tmpfs tmpfs /dev && mknod /dev/null c 1 3 &&
            exec "$0" true' "$WORLD"
    # shellcheck disable=SC2016
    missing "/dev/loop-control is missing: no loop devices" \
        unshare --mount sh -c 'mount -t tmpfs tmpfs /dev && mknod /dev/fuse c 10 229 &&
            mknod /dev/null c 1 3 && exec "$0" true' "$WORLD"
    missing "root is needed (namespaces, mounts, loop devices)" \
        setpriv --reuid=65534 --clear-groups tests/system/run-bats tests/system/any.bats
}

@test "run-bats tells passed, failed and skipped files apart" {
    local file=$BATS_TEST_TMPDIR/sample.bats status
    cd "$BATS_TEST_TMPDIR"
    run_sample() {
        status=0
        printf '%s\n' "$@" >"$file"
        "$RUN_BATS" "$file" >"$BATS_TEST_TMPDIR/tap" 2>&1 || status=$?
    }
    run_sample '@test "x" { true; }' '@test "y" { skip "no"; }'
    same 0 "$status"
    run_sample '@test "x" { true; }' '@test "y" { false; }'
    same 1 "$status"
    run_sample '@test "x" { skip "no"; }' '@test "y" { skip "neither"; }'
    same 77 "$status"
    run_sample 'setup_file() { false; }' '@test "x" { true; }'
    same 1 "$status"
}
