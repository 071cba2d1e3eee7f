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

@test "the program has 5 commands and 10 options beside --help" {
    [ "$(xargs <<<"$COMMANDS")" = "status list plan export metrics" ]
    [ "$(wc -l <<<"$OPTIONS")" = 10 ]
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

@test "manual page and page have every state and every reason" {
    local manual word
    manual=$(mandoc -T ascii "$PACKAGING/man/veskpin.1" | col -b)
    for word in $(jq -r '."$defs".file.properties.state.enum[] | strings' "$TREE/docs/schemas/veskpin-list.schema.json") \
        $(jq -r '.properties.skipped.items.properties.reason.enum[]' "$TREE/docs/schemas/veskpin-plan.schema.json"); do
        grep -q "\"$word\"" "$TREE"/veskpin/verbs/{file_state,plan_reason}.cpp || { echo "$word"; return 1; }
        grep -qE "^[[:space:]]+$word([[:space:]]|\$)" <<<"$manual" || { echo "$word"; return 1; }
        grep -qE "^\| (\`[a-z]+\`, )?\`$word\`" "$TREE/docs/veskpin.md" || { echo "$word"; return 1; }
    done
}

@test "bash completes commands and each command's options" {
    local everywhere="--color --config --help --json --progress --version"
    [ "$(offered "")" = "$everywhere export list metrics plan status" ]
    [ "$(offered --json --config pins.json pl)" = plan ]
    [ "$(offered --color list "-")" = "$everywhere" ]
    [ "$(offered status -)" = "$everywhere" ]
    [ "$(offered list --s)" = --search ]
    [ "$(offered list -)" = "--color --config --files-from --help --json --progress --search --version -0" ]
    [ "$(offered plan -)" = "--color --config --files-from --help --json --progress --reserve --version -0" ]
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
    local option
    for option in "--config" "list --files-from" "plan --files-from" "metrics --output" "--config =" "list" "list --"; do
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
        "export /vol" "metrics --output fi"
    echo "$output"
    for word in "plan" "--json" "--color never" "plan --reserve" "list --search" "list film1" \
        "--config x status /volume1" "export /volume1" "metrics --output film1"; do
        [[ "$output" == *"<veskpin $word>"* ]] || { echo "$word"; return 1; }
    done
}

@test "zsh carries out nothing that a volume or a file is called" {
    cd "$BATS_TEST_TMPDIR"
    hostile_mounts mounts
    touch 'f$(touch owned)' 'g`touch owned`'
    run zsh_lines "status /v" "status /vo" 'export /v\$' "status /v:" "list f" "plan g"
    echo "$output"
    [ ! -e owned ]
    [[ "$output" == *"<veskpin status /volume1>"* ]]
    [[ "$output" == *'<veskpin export /v\$\(touch\ owned\)>'* ]]
    [[ "$output" == *'<veskpin status /v:m:\{touch\ owned\}>'* ]]
    [[ "$output" == *'<veskpin list f\$\(touch\ owned\)>'* ]]
    [[ "$output" == *'<veskpin plan g\`touch\ owned\`>'* ]]
}
