# What the attacks share: the system tests' helpers, and an ordinary user. Loaded by every .bats file here.
# shellcheck shell=bash

# shellcheck source=../system/lib.bash
. "$BATS_TEST_DIRNAME/../system/lib.bash"

ATTACKER=1234

# attacker COMMAND...: runs it as a user with no rights but his own. What he runs must lie where he may look:
# the checkout may not.
attacker() {
    (cd / && setpriv --reuid="$ATTACKER" --regid="$ATTACKER" --clear-groups --bounding-set=-all --inh-caps=-all \
        --no-new-privs "$@")
}

# attacker_folder PATH: a folder of his own, as users of a volume have one.
attacker_folder() { install -d -o "$ATTACKER" -g "$ATTACKER" -m 755 "$1"; }

# his COMMAND...: run by him in his folder, HIS.
HIS=/volume1/photos
his() { attacker env -C "$HIS" "$@"; }

# his_files NAME...: with the folders that they need.
# shellcheck disable=SC2016  # for his shell
his_files() {
    his bash -eu -c 'for name in "$@"; do
        [[ $name != */* ]] || mkdir -p "./${name%/*}"
        echo data >"./$name"
    done' - "$@"
}

# users_volume FILE...: a fresh volume whose top folder is root's, and on it the folder "users", the attacker's, with
# these files.
users_volume() {
    local file
    fresh_volume
    attacker_folder /volume1/users
    for file in "$@"; do
        random "/volume1/users/$file" 64K
    done
}

# attacker_tool ARGUMENT...: the tool, run by him from where he can.
attacker_tool() {
    attacker_programs
    attacker /tmp/attacker/bin/veskcachepinfiletool "$@"
}

# attacker_message ARGUMENT...: the same with system_message.
attacker_message() {
    attacker_programs
    attacker /tmp/attacker/system_message "$@"
}

attacker_programs() {
    [ ! -e /tmp/attacker/system_message ] || return 0
    mkdir -p /tmp/attacker/bin
    cp "$BIN/veskcachepinfiletool" /tmp/attacker/bin/
    cp "$HELPERS/system_message" /tmp/attacker/
    cp -r "$LIB" /tmp/attacker/lib
}
