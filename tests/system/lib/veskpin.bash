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
