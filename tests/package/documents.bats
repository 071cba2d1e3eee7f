#!/usr/bin/env bats
# What the packages say about the options agrees with the program: manual pages and completions.
# Names that are commands stand in single quotes, so that they stay names.
# Every test sets its own table of mounts.
# shellcheck disable=SC2016,SC2030,SC2031

# shellcheck source=lib.bash
. "$BATS_TEST_DIRNAME/lib.bash"

# Every long option that a program takes, from its own table.
options_of() { sed -n 's/^    {"\([a-z-]*\)", [a-z]*_argument.*/--\1/p' "$1"; }

setup() {
    TREE=$BATS_TEST_DIRNAME/../..
    PACKAGING=$TREE/packaging
    OPTIONS=$(options_of "$TREE/src/cli/options.cpp")
}

complete_line() { # WORD...: what bash would offer for the last word
    # shellcheck source=../../packaging/completions/veskcachepinfiletool.bash
    . "$PACKAGING/completions/veskcachepinfiletool.bash"
    COMP_WORDS=(veskcachepinfiletool "$@")
    COMP_CWORD=$#
    COMPREPLY=()
    _veskcachepinfiletool
    printf '%s\n' "${COMPREPLY[@]}"
}

@test "the program has 30 options" {
    [ "$(wc -l <<<"$OPTIONS")" = 30 ]
}

@test "the manual page has every option" {
    local page option
    page=$(mandoc -T ascii "$PACKAGING/man/veskcachepinfiletool.1" | col -b)
    for option in $OPTIONS; do
        grep -q -e "$option" <<<"$page" || { echo "$option"; return 1; }
    done
}

@test "the manual page of the device has every option" {
    local page option options
    page=$(mandoc -T ascii "$PACKAGING/man/veskcachedev.1" | col -b)
    options=$(options_of "$TREE/appliance/cachedev/cachedev_options.cpp")
    [ "$(wc -l <<<"$options")" = 10 ]
    for option in $options; do
        grep -q -e "$option" <<<"$page" || { echo "$option"; return 1; }
    done
}

@test "the service's unit counts as started when the queue's key can be read" {
    local key=/run/veskcachepinfile-msg-server.key wait
    wait=$(sed -n 's/^ExecStartPost=//p' "$PACKAGING/systemd/veskcachepinfiletool.service")
    : >"$key"
    run timeout 0.5 bash -c "$wait"
    [ "$status" -eq 124 ]
    echo 1 >"$key"
    timeout 120 bash -c "$wait"
    rm "$key"
}

@test "bash completes every option" {
    [ "$(complete_line -- | sort)" = "$(sort <<<"$OPTIONS")" ]
    [ "$(complete_line --pin)" = --pin-files ]
}

@test "bash completes volumes after --mount-path" {
    export VESK_MOUNTS=$BATS_TEST_TMPDIR/mounts
    printf '%s\n' "/dev/sda1 / ext4 rw 0 0" "/dev/sdb /volume1 ext4 rw 0 0" "/dev/sdc /volume22 xfs rw 0 0" \
        "tmpfs /run tmpfs rw 0 0" "/dev/sdd /mnt/deep ext4 rw 0 0" >"$VESK_MOUNTS"
    [ "$(complete_line --mount-path "" | tr '\n' ' ')" = "/volume1 /volume22 " ]
    [ "$(complete_line --mount-path /volume2)" = /volume22 ]
}

@test "bash carries out nothing that a volume or a file is called" {
    cd "$BATS_TEST_TMPDIR"
    export VESK_MOUNTS=$PWD/mounts
    hostile_mounts mounts
    local offered
    offered=$(complete_line --mount-path /v)
    echo "$offered"
    [ ! -e owned ]
    [ "$offered" = "$(hostile_volumes)" ]
    [ "$(complete_line --mount-path '/v\$')" = '/v\$\(touch\ owned\)' ]
    touch 'f$(touch owned)' 'f`touch owned`' 'f&'
    [ "$(complete_line --pin-files 'a&;f' | sort)" = "$(printf 'a&;%s\n' 'f$(touch owned)' 'f`touch owned`' 'f&' | sort)" ]
    [ "$(complete_line --check-pin f | sort)" = "$(printf '%s\n' 'f$(touch owned)' 'f`touch owned`' 'f&' | sort)" ]
    [ ! -e owned ]
}

@test "zsh carries out nothing that a volume is called" {
    cd "$BATS_TEST_TMPDIR"
    hostile_mounts mounts
    run timeout 120 zsh -f "$BATS_TEST_DIRNAME/complete.zsh" "$PACKAGING/completions" veskcachepinfiletool "--mount-path /v" \
        "--mount-path /vo" '--mount-path /v\$' '--mount-path /v:'
    echo "$output"
    [ ! -e owned ]
    [[ "$output" == *"<veskcachepinfiletool --mount-path /volume1>"* ]]
    [[ "$output" == *'<veskcachepinfiletool --mount-path /v\$\(touch\ owned\)>'* ]]
    [[ "$output" == *'<veskcachepinfiletool --mount-path /v:m:\{touch\ owned\}>'* ]]
}

@test "bash completes files, also behind ';'" {
    cd "$BATS_TEST_TMPDIR"
    touch film1 film2 other
    [ "$(complete_line --check-pin o)" = other ]
    [ "$(complete_line --pin-files fil | sort | tr '\n' ' ')" = "film1 film2 " ]
    [ "$(complete_line --pin-files "other;film1;film2;o")" = "other;film1;film2;other" ]
}

@test "zsh completes every option, volumes and files" {
    zsh -n "$PACKAGING/completions/_veskcachepinfiletool"
    local option
    for option in $OPTIONS; do
        grep -q -e "'$option\[" "$PACKAGING/completions/_veskcachepinfiletool" || { echo "$option"; return 1; }
    done
    cd "$BATS_TEST_TMPDIR"
    touch film1
    printf '%s\n' "/dev/sdb /volume1 ext4 rw 0 0" >mounts
    # A terminal of zsh's own, into which a person's keys go.
    run timeout 120 zsh -f "$BATS_TEST_DIRNAME/complete.zsh" "$PACKAGING/completions" veskcachepinfiletool "--support-p" \
        "--mount-path /vol" "--pin-files x\;fi"
    echo "$output"
    [[ "$output" == *"<veskcachepinfiletool --support-pin>"* ]]
    [[ "$output" == *"<veskcachepinfiletool --mount-path /volume1>"* ]]
    [[ "$output" == *"<veskcachepinfiletool --pin-files x\;film1>"* ]]
}
