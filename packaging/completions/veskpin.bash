# Completion of veskpin for bash.

# Volumes: what is mounted on a folder at the top. VESK_MOUNTS: another table, for tests.
_veskpin_volumes() {
    awk '$2 ~ /^\/[^\/]+$/ && $1 ~ /^\// { print $2 }' "${VESK_MOUNTS:-/proc/self/mounts}"
}

# Offers the volumes that begin with what was typed, as the shell has to read them. Their names are others': compgen's
# list of words would carry out what is in backticks in them. The table writes blanks and backslashes in octal.
_veskpin_complete_volumes() {
    local escaped name quoted
    while IFS= read -r escaped; do
        printf -v name '%b' "$escaped"
        printf -v quoted '%q' "$name"
        if [[ $name == "$1"* || $quoted == "$1"* ]]; then
            COMPREPLY+=("$quoted")
        fi
    done < <(_veskpin_volumes)
}

_veskpin_complete_files() {
    compopt -o filenames 2>/dev/null
    mapfile -t COMPREPLY < <(compgen -f -- "$1")
}

# Sets the words so far: the command among them, the option whose value is being typed, and what is typed.
_veskpin_read_words() {
    local i
    command='' option='' ended='' word=${COMP_WORDS[COMP_CWORD]}
    for ((i = 1; i < COMP_CWORD; ++i)); do
        case "${COMP_WORDS[i]}" in
        =) ;; # between an option and its value
        --config | --color | --progress | --files-from | --reserve | --timeout | --output) option=${COMP_WORDS[i]} ;;
        --) ended=yes ;;
        *)
            [[ -n $option || ${COMP_WORDS[i]} == -* ]] || command=${command:-${COMP_WORDS[i]}}
            option=''
            ;;
        esac
    done
    [ "$word" != = ] || word=''
}

_veskpin() {
    local command option ended word options="--config --json --color --progress --help --version"
    COMPREPLY=()
    _veskpin_read_words
    case "$option" in
    --color) mapfile -t COMPREPLY < <(compgen -W "auto always never" -- "$word") && return ;;
    --progress) mapfile -t COMPREPLY < <(compgen -W "auto json none" -- "$word") && return ;;
    --config | --files-from | --output) _veskpin_complete_files "$word" && return ;;
    --reserve | --timeout) return ;;
    esac
    case "$command" in
    '') options="status list plan pin unpin export metrics $options" ;;
    list) options="$options --files-from -0 --search" ;;
    plan) options="$options --files-from -0 --reserve" ;;
    pin) options="$options --files-from -0 --no-wait --timeout --reserve --force" ;;
    unpin) options="$options --files-from -0 --no-wait --timeout" ;;
    export) options="$options -0" ;;
    metrics) options="$options --output" ;;
    esac
    if [[ -z $command || ($word == -* && -z $ended) ]]; then
        mapfile -t COMPREPLY < <(compgen -W "$options" -- "$word")
        return
    fi
    case "$command" in
    status | export) _veskpin_complete_volumes "$word" ;;
    list | plan | pin | unpin) _veskpin_complete_files "$word" ;;
    esac
}

complete -F _veskpin veskpin
