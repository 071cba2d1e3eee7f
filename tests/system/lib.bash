# What the system tests share. Loaded by every .bats file, which runs inside a private world; needs
# BIN, the built programs' folder, and HELPERS, the folder of the tests' own programs.
# shellcheck shell=bash

SYSTEM_TESTS=$(dirname "${BASH_SOURCE[0]}")
# shellcheck source=../../scripts/lib/volume.bash
. "$SYSTEM_TESTS/../../scripts/lib/volume.bash"
# shellcheck source=lib/wait.bash
. "$SYSTEM_TESTS/lib/wait.bash"
# shellcheck source=lib/devices.bash
. "$SYSTEM_TESTS/lib/devices.bash"
# shellcheck source=lib/service.bash
. "$SYSTEM_TESTS/lib/service.bash"
# shellcheck source=lib/blocks.bash
. "$SYSTEM_TESTS/lib/blocks.bash"
# shellcheck source=lib/messages.bash
. "$SYSTEM_TESTS/lib/messages.bash"
# shellcheck source=lib/veskpin.bash
. "$SYSTEM_TESTS/lib/veskpin.bash"

# bats traces every command to tell where a test failed, which takes many times longer than most
# commands. On a slow machine that is too much.
[ -z "${VESK_NO_TRACE:-}" ] || set +o functrace

CONF=/run/pin/config.json
# shellcheck disable=SC2034
KEY_FILE=/var/run/veskcachepinfile-msg-server.key

tool() { "$BIN/veskcachepinfiletool" "$@"; }

usage() { cat "$SYSTEM_TESTS/usage.txt"; }

# answers STATUS ARGUMENT...: runs the tool, which must end with STATUS, write to standard output
# exactly what comes on standard input, and to standard error ERRORS (nothing). ":" at the start of a
# line stands for the program's name.
answers() {
    expect_output "$1" /dev/null tool "${@:2}"
}

# The same with --stdout before the arguments: the messages are part of the output.
says() {
    expect_output "$1" /dev/null tool --stdout "${@:2}"
}

# The same, with what differs from build to build written as N (the lines of the sources, in the long
# forms) and ADDRESS.
says_masked() {
    expect_output "$1" mask_numbers tool --stdout "${@:2}"
}

mask_numbers() {
    sed -E -e 's/^([a-z]+: [A-Za-z]+\(\) )\[[0-9]+\]/\1[N]/' -e 's/0x[0-9a-f]{5,}/ADDRESS/g'
}

# expect_output STATUS FILTER COMMAND...: see above; FILTER /dev/null leaves the output as it is. Starts
# as few processes as it can: they are what the tests' time goes into on a slow machine.
expect_output() {
    local expected_status=$1 filter=$2 status=0 folder=$BATS_TEST_TMPDIR expected output errors
    shift 2
    read -rd '' expected || true
    expected=$'\n'$expected
    "$@" >"$folder/output" 2>"$folder/errors" || status=$?
    if [ "$filter" != /dev/null ]; then
        "$filter" <"$folder/output" >"$folder/filtered"
        mv "$folder/filtered" "$folder/output"
    fi
    IFS= read -rd '' output <"$folder/output" || true
    read -rd '' errors <"$folder/errors" || true
    case "$errors" in *' Aborted '*)
        # The shell tells of an abort by itself.
        errors=$(sed '/^[^ ]*: line [0-9]*: .* Aborted /d' <<<"$errors")
        ;;
    esac
    if [ "${expected//$'\n:'/$'\n'veskcachepinfiletool:}" != $'\n'"${output%$'\n'}" ] ||
        [ "$errors" != "${ERRORS:-}" ] || [ "$status" -ne "$expected_status" ]; then
        echo "status $status, expected $expected_status, of: $*"
        diff -u <(sed '1d; s/^:/veskcachepinfiletool:/' <<<"$expected") "$folder/output"
        echo "standard error: $errors"
        return 1
    fi
}

# same EXPECTED ACTUAL: two texts.
same() {
    [ "$1" = "$2" ] || {
        diff -u <(printf '%s\n' "$1") <(printf '%s\n' "$2") | head -n 40
        return 1
    }
}

# refute COMMAND...: it must fail.
refute() {
    if "$@"; then
        echo "succeeded, but must fail: $*"
        return 1
    fi
}

# recipe WORDS: the block of docs/operations.md with these words in it, as root copies it: a status is no reason to
# stop.
recipe() {
    awk -v words="$1" '
        /^```sh$/ { inside = 1; text = ""; next }
        /^```$/ && inside { inside = 0; if (index(text, words)) printf "%s", text; next }
        inside { text = text $0 "\n" }' "$SYSTEM_TESTS/../../docs/operations.md" >/tmp/recipe.sh
    [ -s /tmp/recipe.sh ]
    PATH=$BIN:$PATH VESKPIN_CONFIG=$CONF bash -u /tmp/recipe.sh
}

# put_config JSON: makes it the configuration file's content.
put_config() {
    mkdir -p "${CONF%/*}"
    printf '%s\n' "$1" >"$CONF"
}

# config JQ_FILTER: a value of the configuration file in compact form.
config() { jq -c "$1" "$CONF"; }

# The number by which the service knows a file: the low 32 bits.
inode() { echo $(($(stat -c %i "$1") & 0xFFFFFFFF)); }

# make_volume: volume_make as a test may call it.
make_volume() { (close_descriptors && volume_make "$@"); }

# Closes what bats keeps open in this subshell: it waits until nobody holds it any more, and what is
# started here goes on running.
close_descriptors() {
    local fd
    for fd in /proc/"$BASHPID"/fd/*; do
        fd=${fd##*/}
        [ "$fd" -le 2 ] || [ "$fd" -eq 255 ] || eval "exec $fd>&-"
    done
}

# Volume 1 as it was made, no queue, no configuration file; the current folder is the volume.
fresh_volume() {
    volume_configure
    find /volume1 -mindepth 1 -maxdepth 1 ! -name lost+found -exec rm -rf {} +
    tool --unpin-all --mount-path /volume1
    fresh_service
    cd /volume1 || return
}
fresh_service() {
    rm -rf "${CONF%/*}"
    mkdir -p "${CONF%/*}"
    remove_queues
}

# Every file's end of a test: no service is left over, and a failed test shows what it wrote.
teardown() { end_service; }
