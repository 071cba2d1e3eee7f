# What the tests of the packages share. To be sourced.

# alone COMMAND...: what it leaves running keeps nothing open for which bats waits.
alone() {
    (
        for fd in /proc/"$BASHPID"/fd/*; do
            fd=${fd##*/}
            [ "$fd" -le 2 ] || [ "$fd" -eq 255 ] || eval "exec $fd>&-"
        done
        "$@" >/tmp/alone.log 2>&1
    )
}

# Volumes whose names are commands, in every way in which a shell carries one out.
# shellcheck disable=SC2016
hostile_mounts() { # FILE
    printf '/dev/sdb /%s ext4 rw 0 0\n' 'volume1' 'v$(touch\040owned)' 'v`touch\040owned`' 'v;touch\040owned' \
        'v:m:{touch\040owned}' 'v[$(touch\040owned)]' 'v&\134x' >"$1"
}

# The same as bash is to offer them.
hostile_volumes() {
    cat <<'END'
/volume1
/v\$\(touch\ owned\)
/v\`touch\ owned\`
/v\;touch\ owned
/v:m:\{touch\ owned\}
/v\[\$\(touch\ owned\)\]
/v\&\\x
END
}
