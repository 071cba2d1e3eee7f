# Completion of veskcachepinfiletool for bash.

# Volumes: what is mounted on a folder at the top. VESK_MOUNTS: another table, for tests.
_veskcachepinfiletool_volumes() {
    awk '$2 ~ /^\/[^\/]+$/ && $1 ~ /^\// { print $2 }' "${VESK_MOUNTS:-/proc/self/mounts}"
}

# Offers the volumes that begin with what was typed, as the shell has to read them. Their names are others': compgen's
# list of words would carry out what is in backticks in them. The table writes blanks and backslashes in octal.
_veskcachepinfiletool_complete_volumes() {
    local escaped name quoted
    COMPREPLY=()
    while IFS= read -r escaped; do
        printf -v name '%b' "$escaped"
        printf -v quoted '%q' "$name"
        if [[ $name == "$1"* || $quoted == "$1"* ]]; then
            COMPREPLY+=("$quoted")
        fi
    done < <(_veskcachepinfiletool_volumes)
}

# Files joined by ";", of which the last is completed.
_veskcachepinfiletool_files() {
    local typed=${1#[\"\']} before=
    case "$typed" in
    *";"*)
        before=${typed%;*};
        before+=";"
        ;;
    esac
    compopt -o filenames -o nospace 2>/dev/null
    mapfile -t COMPREPLY < <(compgen -f -- "${typed##*;}")
    COMPREPLY=("${COMPREPLY[@]/#/"$before"}")
}

_veskcachepinfiletool() {
    local word=${COMP_WORDS[COMP_CWORD]} previous=
    [ "$COMP_CWORD" -eq 0 ] || previous=${COMP_WORDS[COMP_CWORD - 1]}
    # ";" splits words on the command line where it stands in quotes as well.
    COMPREPLY=()
    case "$previous" in
    --mount-path | -j)
        _veskcachepinfiletool_complete_volumes "$word"
        return
        ;;
    --pin-files | --unpin-files | -a | -b)
        _veskcachepinfiletool_files "$word"
        return
        ;;
    --check-pin | --config-path | --cache-path | --is-all-unpin | -t | -f | -w)
        compopt -o filenames 2>/dev/null
        mapfile -t COMPREPLY < <(compgen -f -- "$word")
        return
        ;;
    --start-sector | --num-sectors | --space-uuid | -g)
        return
        ;;
    esac
    mapfile -t COMPREPLY < <(compgen -W "--pin-files --unpin-files --start-service --config-path --space-uuid
        --send-bitmap --mount-path --support-pin --stdout --check-bitmap --add-pending --remove-pending
        --handle-mount --handle-umount --get-uuid --delete-bitmap --check-pin --reload-blocks --unpin-all
        --is-all-unpin --set-bitmap --start-sector --num-sectors --unset-bitmap --unpin-range
        --get-bitmap-size-byte --cache-path --help --verbose --debug" -- "$word")
}

complete -F _veskcachepinfiletool veskcachepinfiletool
