# The companion, and what its answers must agree with.
# shellcheck shell=bash

SCHEMAS=$SYSTEM_TESTS/../../docs/schemas

veskpin() { "$BIN/veskpin" --config "$CONF" "$@"; }

# look STATUS COMMAND [ARGUMENT...]: runs it with --json, which must end with STATUS and write one
# document of the command's schema to ANSWER, and nothing to standard error.
ANSWER=/tmp/answer.json
look() {
    local status=0
    veskpin --json "${@:2}" >"$ANSWER" 2>/tmp/errors || status=$?
    if [ "$status" -ne "$1" ] || [ -s /tmp/errors ]; then
        echo "status $status, expected $1, of: ${*:2}"
        cat /tmp/errors "$ANSWER"
        return 1
    fi
    check_schema "$2"
}

# Where an emulated machine has no validator, the other builds have checked the same documents.
check_schema() {
    [ -z "${VESK_NO_TRACE:-}" ] || return 0
    /usr/bin/python3 - "$ANSWER" "$SCHEMAS/veskpin-$1.schema.json" <<'END'
import json, sys, jsonschema
document, schema = (json.load(open(path, encoding="utf-8")) for path in sys.argv[1:])
jsonschema.validate(document, schema)
END
}

# answer JQ_FILTER [JQ_OPTION...]: of the last look, in compact form.
answer() { jq -c "${@:2}" "$1" "$ANSWER"; }

# state_of PATH: its state in the last look's list.
# shellcheck disable=SC2016
state_of() { answer '.files[] | select(.path == $path) | .state' --arg path "$1" -r; }

# shows STATUS COMMAND [ARGUMENT...]: for people; exactly standard input, and ERRORS on standard error.
shows() {
    local status=$1
    shift
    expect_output "$status" /dev/null veskpin "$@"
}

# shellcheck disable=SC2016
reason_of() { answer '.files[] | select(.path == $path) | .reason' --arg path "$1" -r; }
skipped() { answer '[.skipped[] | [.path, .reason]]'; }
left() { answer '[.requestsSent, (.files | length), (.repinned | length)]'; }

# in_background FILE COMMAND...: veskpin, its JSON into FILE; PIN_PID is its process.
in_background() {
    (
        close_descriptors
        exec "$BIN/veskpin" --config "$CONF" --json "${@:2}"
    ) >"$1" 2>/tmp/told &
    PIN_PID=$!
}

# All blocks of these files are marked and at the driver, and no others.
holds_just() { # FILE...
    same "$(blocks_of "$@")" "$(bitmap_blocks 1)"
    same "$(blocks_of "$@")" "$(driver_blocks 1)"
}

# many COUNT: a folder of so many files whose names fill a request each four or five of them.
many() {
    local i long
    long=$(printf '%0100d' 0)
    mkdir many
    for i in $(seq "$1"); do random "many/$i-$long" 4K; done
    sync
}
nth() { echo "many/$1-$(printf '%0100d' 0)"; }

# ends_by_itself STATUS COMMAND: what is in the background does so, whatever it waited for.
ends_by_itself() {
    local status=0
    wait "$PIN_PID" || status=$?
    same "$1" "$status"
    check_schema "$2"
}
