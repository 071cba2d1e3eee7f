#!/usr/bin/env bats
# The recipes of docs/operations.md, copied by root where an ordinary user has prepared the ground.
# What stands in single quotes is for other shells, or for none.
# shellcheck disable=SC2016

load lib

setup_file() { make_volume 1 64M 16M ext4; }

setup() { fresh_volume; }

# repeat N CHARACTER
repeat() { head -c "$1" /dev/zero | tr '\0' "$2"; }

@test "no name in a folder makes root pin another file" {
    attacker_folder /volume1/photos
    mkdir -m 700 /volume1/victim
    random /volume1/victim/secret 64K
    random /volume1/photos/honest 64K
    attacker bash -eu -c '
        cd /volume1/photos
        # Their paths, split at ";" or cut at white space or "#", are other paths.
        mkdir -p -- "x;/volume1/victim" "honest /x" "honest#1" "new
/volume1/victim" "-v;--unpin-files"
        for name in "x;/volume1/victim/secret" "honest /x/1" "honest#1/2" "new
/volume1/victim/secret" "-v;--unpin-files/3" a\ b ";" "tab	" -verbose "\$(touch owned)" "\`touch owned\`" "\$(id>owned)" "é" "$0" "$1" \
            "$2"; do
            echo data >"./$name"
        done
        mkdir "$3"
        echo data >"$3/$4"
        truncate -s 1M hole
    ' $'bad\xff' $'esc\e]0;title\a' "$(repeat 250 l)" "$(repeat 250 d)" "$(repeat 240 f)"
    start_service
    run recipe 'files_below()'
    same 0 "$status"
    same 'cannot be named: /volume1/photos/$(touch\ owned)
cannot be named: /volume1/photos/-v;--unpin-files/3
cannot be named: /volume1/photos/;
cannot be named: /volume1/photos/`touch\ owned`
cannot be named: /volume1/photos/a\ b
cannot be named: /volume1/photos/bad\377
cannot be named: /volume1/photos/esc\033]0;title\a
cannot be named: /volume1/photos/honest#1/2
cannot be named: /volume1/photos/honest\ /x/1
cannot be named: /volume1/photos/new\n/volume1/victim/secret
cannot be named: /volume1/photos/tab\t
cannot be named: /volume1/photos/x;/volume1/victim/secret
has nothing to pin: /volume1/photos/hole
too long: /volume1/photos/'"$(repeat 250 d)/$(repeat 240 f)" \
        "$(LC_ALL=C sort <<<"$output")"
    wait_until messages_are_taken
    wait_until queue_is_empty
    same "$(printf '%s\n' 'photos/$(id>owned)' photos/-verbose photos/honest "photos/$(repeat 250 l)" photos/é)" \
        "$(jq -r '.volumes["/volume1"].files[]' "$CONF" | LC_ALL=C sort)"
    refute compgen -G '/volume1/photos/owned'
}

# attacker_queue KEY: a queue of his that everybody may send to; prints its number.
attacker_queue() { attacker perl -e 'my $id = msgget($ARGV[0], 01666) // die "$!\n"; print $id + 0' "$1"; }

@test "filling an emptied key file gives nobody's queue to root" {
    local key before id i
    start_service
    key=$(<"$KEY_FILE")
    before=$(awk 'NR > 1 { print $1, $2 }' /proc/sysvipc/msg)
    # At keys that files in /run may get, beside another program's.
    for i in 100 101 102; do
        attacker_queue $(((key & 0x7FFF0000) | ((key + i) & 0xFFFF)))
    done
    attacker_queue 305419896
    : >"$KEY_FILE"
    recipe 'queues_of_root()'
    same "$key" "$(<"$KEY_FILE")"
    same "$before
305419896" "$(awk 'NR > 1 { print $1, ($1 == 305419896 ? "" : $2) }' /proc/sysvipc/msg | sed 's/ $//')"
    # The service's own key taken, and the queue given to root, as a service that believed the key would do.
    stop_service
    remove_queues
    id=$(attacker_queue "$key")
    # IPC_STAT, IPC_SET; the owner is the record's second number.
    perl -e 'my ($id, $queue) = ($ARGV[0], ""); msgctl($id, 2, $queue) || die "$!\n";
        substr($queue, 4, 4) = pack("L", 0); msgctl($id, 1, $queue) || die "$!\n"' "$id"
    same "0 $ATTACKER" "$(awk 'NR > 1 { print $8, $10 }' /proc/sysvipc/msg)"
    : >"$KEY_FILE"
    recipe 'queues_of_root()'
    same '' "$(awk 'NR > 1' /proc/sysvipc/msg)"
    same '' "$(<"$KEY_FILE")"
}
