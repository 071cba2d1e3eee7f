#!/usr/bin/env bats
# What the packages say about veskpin agrees with the program: manual page, completions, page and schemas.
# Names that are commands stand in single quotes, so that they stay names.
# shellcheck disable=SC2016,SC2030,SC2031

# shellcheck source=lib.bash
. "$BATS_TEST_DIRNAME/lib.bash"

setup() {
    TREE=$BATS_TEST_DIRNAME/../..
    PACKAGING=$TREE/packaging
    local source
    source=$(tr -d '\n' <"$TREE/veskpin/frame/command_line.cpp")
    COMMANDS=$(grep -oE 'AddCommand\(app, given, *"[a-z]+' <<<"$source" | sed 's/.*"//')
    OPTIONS=$(grep -oE '(add_option|add_flag|set_version_flag)\("-[-a-z0]+' <<<"$source" | sed 's/.*"//' | sort -u)
}

complete_line() { # WORD...: what bash would offer for the last word
    # shellcheck source=../../packaging/completions/veskpin.bash
    . "$PACKAGING/completions/veskpin.bash"
    COMP_WORDS=(veskpin "$@")
    COMP_CWORD=$#
    COMPREPLY=()
    _veskpin
    printf '%s\n' "${COMPREPLY[@]}"
}
offered() { complete_line "$@" | LC_ALL=C sort | xargs; }

@test "the program has 7 commands and 13 options beside --help" {
    [ "$(xargs <<<"$COMMANDS")" = "status list plan pin unpin export metrics" ]
    [ "$(wc -l <<<"$OPTIONS")" = 13 ]
}

@test "manual page and page have every command and option" {
    local manual page word
    manual=$(mandoc -T ascii "$PACKAGING/man/veskpin.1" | col -b)
    page=$(cat "$TREE/docs/veskpin.md")
    for word in $COMMANDS; do
        grep -qE "^[[:space:]]+$word([[:space:]]|\$)" <<<"$manual" || { echo "$word"; return 1; }
        grep -qE "^## .*$word" <<<"$page" || { echo "$word"; return 1; }
    done
    for word in $OPTIONS --help; do
        grep -q -e "$word" <<<"$manual" || { echo "$word"; return 1; }
        grep -q -e "\`$word" <<<"$page" || { echo "$word"; return 1; }
    done
}

# texts_of COMMAND JQ_FILTER: of the schema of its document.
texts_of() { jq -r "$2 | strings" "$TREE/docs/schemas/veskpin-$1.schema.json"; }

@test "the schemas agree on states and reasons" {
    local command left_out='.properties.skipped.items.properties.reason.enum[]'
    local state='.properties.files.items.properties.state.enum[]' reason='.properties.files.items.properties.reason.enum[]'
    [ "$(texts_of pin "$left_out")" = "$(texts_of plan "$left_out")" ]
    for command in pin unpin; do
        # Renamed files are not looked for.
        [ "$(texts_of "$command" "$state")" = "$(texts_of list '."$defs".file.properties.state.enum[]' | grep -vx renamed)" ]
    done
    [ "$(texts_of pin "$reason" | xargs)" = "dropped vanished not-taken needs-repair" ]
    [ "$(texts_of unpin "$reason" | xargs)" = "dropped vanished not-taken needs-repair" ]
}

@test "manual page and page have every state and every reason" {
    local manual word
    manual=$(mandoc -T ascii "$PACKAGING/man/veskpin.1" | col -b)
    for word in $(texts_of list '."$defs".file.properties.state.enum[]') \
        $(texts_of plan '.properties.skipped.items.properties.reason.enum[]') \
        $(texts_of unpin '.properties.files.items.properties.reason.enum[]'); do
        grep -q "\"$word\"" "$TREE"/veskpin/verbs/{file_state,plan_reason,change_view}.cpp || { echo "$word"; return 1; }
        grep -qE "^[[:space:]]+$word([[:space:]]|\$)" <<<"$manual" || { echo "$word"; return 1; }
        grep -qE "^\| (\`[a-z]+\`, )?\`$word\`" "$TREE/docs/veskpin.md" || { echo "$word"; return 1; }
    done
}

@test "bash completes commands and each command's options" {
    local everywhere="--color --config --help --json --progress --version"
    [ "$(offered "")" = "$everywhere export list metrics pin plan status unpin" ]
    [ "$(offered --json --config pins.json pl)" = plan ]
    [ "$(offered --color list "-")" = "$everywhere" ]
    [ "$(offered status -)" = "$everywhere" ]
    [ "$(offered list --s)" = --search ]
    [ "$(offered list -)" = "--color --config --files-from --help --json --progress --search --version -0" ]
    [ "$(offered plan -)" = "--color --config --files-from --help --json --progress --reserve --version -0" ]
    [ "$(offered pin -)" = "--color --config --files-from --force --help --json --no-wait --progress --reserve --timeout --version -0" ]
    [ "$(offered unpin -)" = "--color --config --files-from --help --json --no-wait --progress --timeout --version -0" ]
    [ "$(offered pin --no-wait --timeout 9 --f)" = "--files-from --force" ]
    [ "$(offered --timeout 9 unp)" = unpin ]
    [ "$(offered export -)" = "$everywhere -0" ]
    [ "$(offered metrics --o)" = --output ]
    [ "$(offered metrics "")" = "" ]
}

@test "bash completes values" {
    cd "$BATS_TEST_TMPDIR"
    touch film1 'film 2'
    [ "$(offered --color a)" = "always auto" ]
    [ "$(offered --color = n)" = never ]
    [ "$(offered status --progress j)" = json ]
    [ "$(offered plan --reserve "")" = "" ]
    [ "$(offered pin --reserve "")" = "" ]
    [ "$(offered unpin --timeout "")" = "" ]
    local option
    for option in "--config" "list --files-from" "plan --files-from" "pin --files-from" "metrics --output" "--config =" \
        "list" "list --" "pin" "pin --timeout 9" "unpin --"; do
        # shellcheck disable=SC2086
        [ "$(complete_line $option f | sort)" = "$(printf 'film 2\nfilm1')" ] || { echo "$option"; return 1; }
    done
}

@test "bash completes volumes for status and export" {
    export VESK_MOUNTS=$BATS_TEST_TMPDIR/mounts
    printf '%s\n' "/dev/sda1 / ext4 rw 0 0" "/dev/sdb /volume1 ext4 rw 0 0" "/dev/sdc /volume22 xfs rw 0 0" \
        "tmpfs /run tmpfs rw 0 0" "/dev/sdd /mnt/deep ext4 rw 0 0" >"$VESK_MOUNTS"
    [ "$(offered status "")" = "/volume1 /volume22" ]
    [ "$(offered --json export -0 /volume1 /volume2)" = /volume22 ]
}

@test "bash carries out nothing that a volume or a file is called" {
    cd "$BATS_TEST_TMPDIR"
    export VESK_MOUNTS=$PWD/mounts
    hostile_mounts mounts
    local names=('f$(touch owned)' 'f`touch owned`' 'f&')
    [ "$(complete_line status /v)" = "$(hostile_volumes)" ]
    [ "$(complete_line export '/v\$')" = '/v\$\(touch\ owned\)' ]
    touch "${names[@]}"
    [ "$(complete_line list f | sort)" = "$(printf '%s\n' "${names[@]}" | sort)" ]
    [ "$(complete_line pin f | sort)" = "$(printf '%s\n' "${names[@]}" | sort)" ]
    [ "$(complete_line --config f | sort)" = "$(printf '%s\n' "${names[@]}" | sort)" ]
    [ ! -e owned ]
}

# What zsh makes of the lines: a terminal of its own, into which a person's keys go.
zsh_lines() { timeout 120 zsh -f "$BATS_TEST_DIRNAME/complete.zsh" "$PACKAGING/completions" veskpin "$@"; }

@test "zsh completes commands, options, values, volumes and files" {
    zsh -n "$PACKAGING/completions/_veskpin"
    local word
    for word in $OPTIONS --help; do
        grep -qE -e "'(\(- \*\))?$word\[" "$PACKAGING/completions/_veskpin" || { echo "$word"; return 1; }
    done
    for word in $COMMANDS; do
        grep -q "^ *'$word:" "$PACKAGING/completions/_veskpin" || { echo "$word"; return 1; }
        grep -q "^$word) " "$PACKAGING/completions/_veskpin" || { echo "$word"; return 1; }
    done
    cd "$BATS_TEST_TMPDIR"
    touch film1
    printf '%s\n' "/dev/sdb /volume1 ext4 rw 0 0" >mounts
    run zsh_lines "pl" "--js" "--color ne" "plan --res" "list --se" "list fi" "--config x status /vol" \
        "export /vol" "metrics --output fi" "unp" "pin --fo" "pin --res" "pin fi" "unpin --no" "unpin --timeout 9 fi"
    echo "$output"
    for word in "plan" "--json" "--color never" "plan --reserve" "list --search" "list film1" \
        "--config x status /volume1" "export /volume1" "metrics --output film1" "unpin" "pin --force" "pin --reserve" \
        "pin film1" "unpin --no-wait" "unpin --timeout 9 film1"; do
        [[ "$output" == *"<veskpin $word>"* ]] || { echo "$word"; return 1; }
    done
}

@test "zsh carries out nothing that a volume or a file is called" {
    cd "$BATS_TEST_TMPDIR"
    hostile_mounts mounts
    touch 'f$(touch owned)' 'g`touch owned`'
    run zsh_lines "status /v" "status /vo" 'export /v\$' "status /v:" "list f" "plan g" "pin f" "unpin g"
    echo "$output"
    [ ! -e owned ]
    [[ "$output" == *"<veskpin status /volume1>"* ]]
    [[ "$output" == *'<veskpin export /v\$\(touch\ owned\)>'* ]]
    [[ "$output" == *'<veskpin status /v:m:\{touch\ owned\}>'* ]]
    [[ "$output" == *'<veskpin list f\$\(touch\ owned\)>'* ]]
    [[ "$output" == *'<veskpin plan g\`touch\ owned\`>'* ]]
    [[ "$output" == *'<veskpin pin f\$\(touch\ owned\)>'* ]]
    [[ "$output" == *'<veskpin unpin g\`touch\ owned\`>'* ]]
}
