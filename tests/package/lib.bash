# What the tests of the packages' documents share. To be sourced.

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
