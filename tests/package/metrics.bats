#!/usr/bin/env bats
# What Prometheus's own checker says of the installed veskpin's metrics. In a private world; scripts/test-package
# fetches promtool.

TREE=$BATS_TEST_DIRNAME/../..
PROMTOOL=$TREE/build-promtool/usr/bin/promtool
export BIN=${BIN:-/usr/bin}
# shellcheck source=../../scripts/lib/volume.bash
. "$TREE/scripts/lib/volume.bash"
# shellcheck source=lib.bash
. "$BATS_TEST_DIRNAME/lib.bash"
export VESKPIN_CONFIG=/tmp/pins.json

setup_file() {
    alone volume_make 1 64M 16M ext4
    echo text >/volume1/file
    sync
}
setup() {
    cd "$BATS_TEST_TMPDIR" || exit
    rm -f "$VESKPIN_CONFIG"
}

# accepted FILE: without a complaint.
accepted() { [ "$("$PROMTOOL" check metrics <"$1" 2>&1)" = "" ]; }

@test "the checker finds what is wrong" {
    echo 'veskpin_files{volume="/volume1} 1' >wrong
    run accepted wrong
    [ "$status" -ne 0 ]
}

@test "metrics of a volume with records and requests are accepted" {
    printf '{"volumes":{"/volume1":{"files":{"%s":"file","77":"gone"}}},"requestQueue":["0"],"requests":{"0":%s}}' \
        "$(stat -c %i /volume1/file)" '{"type":"pinFiles","mountPath":"/volume1","data":"new#12"}' >"$VESKPIN_CONFIG"
    "$BIN/veskpin" metrics >answer
    accepted answer
    grep -qxF 'veskpin_files{volume="/volume1"} 2' answer
    grep -qxF 'veskpin_requests{volume="/volume1"} 1' answer
    grep -qxF 'veskpin_files_by_state{volume="/volume1",state="unmarked"} 1' answer
    grep -qxF 'veskpin_files_by_state{volume="/volume1",state="missing"} 1' answer
    grep -qxF 'veskpin_files_by_state{volume="/volume1",state="pinning"} 1' answer
}

@test "metrics of a volume whose name holds what separates labels are accepted" {
    # shellcheck disable=SC2028
    echo '{"volumes":{"/v\"o\\l\nu{m}e,=1":{"files":{"12":"a"}}}}' >"$VESKPIN_CONFIG"
    run "$BIN/veskpin" metrics --output metrics
    [ "$status" -eq 3 ] # that volume is not mounted
    accepted metrics
    # shellcheck disable=SC1003
    grep -qxF 'veskpin_files{volume="/v\"o\\l\nu{m}e,=1"} 1' metrics
}

@test "metrics are accepted where the configuration cannot be read" {
    echo '{' >"$VESKPIN_CONFIG"
    run "$BIN/veskpin" metrics --output metrics
    [ "$status" -eq 3 ]
    accepted metrics
    grep -qxF 'veskpin_look_errors 1' metrics
    [ "$(grep -c '^veskpin_files' metrics)" = 0 ]
}
