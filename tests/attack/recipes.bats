#!/usr/bin/env bats
# The recipes of docs/operations.md, copied by root where an ordinary user has prepared the ground.
# What stands in single quotes is for other shells, or for none.
# shellcheck disable=SC2016

load lib

setup_file() {
    make_volume 1 64M 16M ext4
    mount -t tmpfs -o mode=755 vesk-lib /var/lib # the machine's own is everybody's
    mkdir /var/lib/veskcachepinfiletool
}

PINS_LIST=/var/lib/veskcachepinfiletool/pins.list

setup() {
    fresh_volume
    attacker_folder /volume1/photos
    mkdir -m 700 /volume1/victim
    random /volume1/victim/secret 64K
}

# repeat N CHARACTER
repeat() { head -c "$1" /dev/zero | tr '\0' "$2"; }

# Names that a request can carry, and a shell, a list or a program may take for something else.
GOOD_NAMES=('$(id>owned)' '[a,b].raw' '[' '++' -verbose -0 --json.raw "it's" '"q"' '\n' '~' é '*' honest)
# Names that it cannot, as a shell reads them in $'': their paths, split at ";" or cut at white space or "#", are
# other files'.
BAD_NAMES=('x;/volume1/victim/secret' 'honest /x/1' 'honest#1/2' 'new\n/volume1/victim/secret' '-v;--unpin-files/3'
    'a b' ';' 'tab\t' '`touch owned`' 'esc\e]0;title\a.raw' 'csi\xc2\x9b 2J')

TOO_LONG=$(repeat 250 a)/$(repeat 250 b)/$(repeat 250 c)/$(repeat 250 d)/e

# Makes all of them, and what cannot be pinned for other reasons.
hostile_folder() {
    local name names=()
    for name in "${BAD_NAMES[@]}" 'bad\xff.raw'; do
        printf -v name %b "$name"
        names+=("$name")
    done
    his_files "${GOOD_NAMES[@]}" "$(repeat 250 l)" "${names[@]}" "$TOO_LONG"
    his truncate -s 1M hole.raw
    his ln -s ../victim/secret link.raw
    his ln -s ../victim folder.raw
    his mkfifo fifo.raw
    his ln honest second
    sync
}

# What is to be told of them: a line with reason and path in JSON for each.
left_out() {
    local name
    {
        for name in "${BAD_NAMES[@]}"; do
            printf -v name %b "$name"
            printf 'name\t/volume1/photos/%s\0' "$name"
        done
        printf 'not-utf8\t/volume1/photos/bad\xef\xbf\xbd.raw\0'
        printf 'too-long\t/volume1/photos/%s\0' "$TOO_LONG"
        printf 'no-blocks\t/volume1/photos/hole.raw\0'
        printf 'not-regular\t/volume1/photos/%s\0' link.raw folder.raw fifo.raw
        printf 'same-inode\t/volume1/photos/second\0'
    } | jq -Rsac 'split("\u0000")[] | select(. != "") | split("\t") | [.[0], (.[1:] | join("\t"))]' | LC_ALL=C sort
}

# records_are NAME...: these are recorded, and no other file; the bits are theirs, and the driver's, and no others.
records_are() {
    same "$(printf '%s\n' "$@" | LC_ALL=C sort)" "$(jq -r '.volumes["/volume1"].files // {} | .[]' "$CONF" | LC_ALL=C sort)"
    same "$(cd /volume1 && blocks_of "${@/#/./}")" "$(bitmap_blocks 1)"
    same "$(bitmap_blocks 1)" "$(driver_blocks 1)"
    refute compgen -G '/volume1/photos/owned'
    refute compgen -G '/volume1/owned'
}
ALL_GOOD=("${GOOD_NAMES[@]/#/photos/}" "photos/$(repeat 250 l)")
# all_good_but NAME...: one a line.
all_good_but() { printf '%s\n' "${ALL_GOOD[@]}" | grep -vxF "$(printf '%s\n' "$@")"; }

# Nothing of what a recipe prints moves a cursor, or begins a line of its own.
is_printable() { LC_ALL=C.UTF-8 refute grep -qaxv '[[:print:]]*' <<<"$1"; }

@test "a folder is pinned, and its hostile names are told" {
    hostile_folder
    start_service
    run recipe 'veskpin pin --json /volume1/photos'
    is_printable "$output"
    same "$(left_out)" "$(grep '^{' <<<"$output" | jq -ac '[.reason, .path]' | LC_ALL=C sort)"
    same "$(printf '/volume1/photos/bad\xff.raw' | base64)" "$(grep '^{' <<<"$output" | jq -r '.pathBytes // empty')"
    same "$(left_out | jq -c '.[0]' | sort | uniq -c | awk '{ print "[" $2 "," $1 "]" }')" "$(grep '^\[' <<<"$output")"
    records_are "${ALL_GOOD[@]}"
    stop_service
}

@test "people are told the same, with names that stay names" {
    hostile_folder
    start_service
    run recipe 'veskpin plan /volume1/photos '
    is_printable "$output"
    # All of it twice: planned and done.
    same "$(left_out | wc -l)" "$(grep '^left out  ' <<<"$output" | sort | uniq -c | grep -c '^ *2 ')"
    same 2 "$(grep -cxF 'left out  /volume1/photos/esc\x1b]0;title\x07.raw: name' <<<"$output")"
    same 2 "$(grep -cxF 'left out  /volume1/photos/bad\xff.raw: not-utf8' <<<"$output")"
    same 2 "$(grep -cxF 'left out  /volume1/photos/new\x0a/volume1/victim/secret: name' <<<"$output")"
    records_are "${ALL_GOOD[@]}"
    run recipe 'veskpin pin --timeout 600'
    same "not everything, see /run/pin.log" "$output"
    same "$(left_out | wc -l)" "$(grep -c '^left out  ' /run/pin.log)"
    is_printable "$(</run/pin.log)"
    stop_service
}

@test "names from the shell and from find stay names" {
    hostile_folder
    start_service
    his touch -d '8 days ago' '[' honest
    run recipe 'veskpin pin -- *.raw'
    is_printable "$output"
    # Links and FIFOs are found by the first command alone, what is in folders by the second.
    same "$(left_out | grep -c '\.raw"')" "$(grep '^left out  ' <<<"$output" | grep '\.raw: ' | sort -u | wc -l)"
    same "$(left_out | grep -c '"name"')" "$(grep -c '^left out  .*: name$' <<<"$(grep '^left out' <<<"$output" | sort -u)")"
    mapfile -t rest < <(all_good_but 'photos/[' photos/honest)
    records_are "${rest[@]}"
    stop_service
}

@test "pins are saved and pinned again by the same names" {
    hostile_folder
    start_service
    look 1 pin /volume1/photos
    recipe 'veskpin export -0 >'
    same "$(printf '/volume1/%s\n' "${ALL_GOOD[@]}" | LC_ALL=C sort)" "$(tr '\0' '\n' <"$PINS_LIST" | LC_ALL=C sort)"
    look 0 unpin /volume1
    check_nothing_pinned 1
    # In the place of two of them: a link, and a folder that is none of the list's.
    his rm './*' ./-0
    his ln -s /volume1/victim/secret './*'
    his ln -s ../victim ./-0
    run recipe "veskpin pin --files-from $PINS_LIST"
    same "left out  /volume1/photos/*: not-regular
left out  /volume1/photos/-0: not-regular" "$(grep '^left out' <<<"$output")"
    mapfile -t rest < <(all_good_but 'photos/*' photos/-0)
    records_are "${rest[@]}"
    stop_service
}

@test "what has grown or was replaced is pinned again by its name" {
    local name before
    hostile_folder
    start_service
    look 1 pin /volume1/photos
    for name in "${GOOD_NAMES[@]}" $'bad\xff.raw'; do
        his dd if=/dev/urandom bs=70K count=1 oflag=append conv=notrunc,fsync status=none of="./$name"
    done
    his ln -s ../victim/secret link
    his_files new # before an inode number is free again
    his mv link é
    his mv new '~'
    sync
    # A record that only another hand can have made: it names his file, in bytes that are no UTF-8.
    stop_service
    python3 - "$CONF" "$(inode $'/volume1/photos/bad\xff.raw')" <<'END'
import sys
text = open(sys.argv[1], "rb").read()
record = b'"files" : { "%s" : "photos/bad\xff.raw",' % sys.argv[2].encode()
start = text.index(b'"files"')
open(sys.argv[1], "wb").write(text[:start] + record + text[text.index(b"{", start) + 1:])
END
    start_service
    veskpin list --json >"$ANSWER" || true
    same "$(printf '/volume1/photos/%s\n' é '~' | LC_ALL=C sort)" \
        "$(answer '.files[] | select(.state == "replaced") | .path' -r | LC_ALL=C sort)"
    same 1 "$(answer '[.files[] | select((.state | IN("partial", "unmarked")) and .pathBytes)] | length')"
    before=$(bitmap_blocks 1)
    run recipe 'AA=='
    is_printable "$output"
    same 'left out  /volume1/photos/bad\xff.raw: not-utf8
left out  /volume1/photos/é: not-regular' "$(grep '^left out' <<<"$output")"
    # Beside them the record of the file that was replaced, and the other hand's, whose name the service cannot keep.
    same "$(printf '%s\n' "${ALL_GOOD[@]}" 'photos/~' $'photos/bad\xef\xbf\xbd.raw' | LC_ALL=C sort)" \
        "$(jq -r '.volumes["/volume1"].files[]' "$CONF" | LC_ALL=C sort)"
    mapfile -t rest < <(all_good_but photos/é)
    same "$( (echo "$before" && blocks_of "${rest[@]/#/./}") | sort -nu)" "$(bitmap_blocks 1)"
    look 1 list /volume1/victim
    same '"unpinned"' "$(answer '.files[].state')"
    stop_service
}

@test "folders are taken one by one, and links in their place are not" {
    HIS=/volume1/films
    attacker_folder "$HIS"
    his_files '$(id>owned)/f' '[a,b]/f' -v/f 'x;/f' 'a b/f' $'new\nline/f' file
    his ln -s ../victim link
    sync
    start_service
    run recipe 'for folder in'
    is_printable "$output"
    same 'left out  /volume1/films/a b/f: name
left out  /volume1/films/link: not-regular
left out  /volume1/films/new\x0aline/f: name
left out  /volume1/films/x;/f: name' "$(grep '^left out' <<<"$output" | LC_ALL=C sort)"
    records_are 'films/$(id>owned)/f' 'films/[a,b]/f' films/-v/f
    stop_service
}

# victims_pins_are_whole: his own files, beside the other user's.
victims_pins_are_whole() {
    look 0 list /volume1/victim
    same '["pinned"]' "$(answer '[.files[].state] | unique')"
    is_subset "$(blocks_of /volume1/victim/*)" "$(driver_blocks 1)"
}

@test "unpinning his folder lets go nothing of another user's" {
    local i shared
    his mkdir folder
    for i in 1 2 3 4 5 6; do
        his dd if=/dev/urandom of="folder/$i" bs=8K count=1 conv=fsync status=none
        random "/volume1/victim/$i" 8K conv=fsync
    done
    his_files '$(id>owned)' '[a,b]' -v folder/secret
    sync
    shared=$(common "$(blocks_of /volume1/photos/folder/*)" "$(blocks_of /volume1/victim/*)")
    [ -n "$shared" ]
    start_service
    look 0 pin /volume1/photos /volume1/victim
    his mv folder elsewhere
    his ln -s ../victim folder
    his_files 'x;/volume1/victim/secret' 'a b'
    run recipe 'veskpin unpin /volume1/photos'
    is_printable "$output"
    # What he moved is under its old path no file of his any more, and told.
    same "$(printf '/volume1/photos/folder/%s: needs-repair\n' 1 2 3 4 5 6 secret)" \
        "$(sed -n 's/^unreadable  //p' <<<"$output")"
    victims_pins_are_whole
    his rm folder
    his mv elsewhere folder
    look 0 unpin /volume1/photos
    same "$(cd /volume1/victim && printf 'victim/%s\n' *)" "$(jq -r '.volumes["/volume1"].files[]' "$CONF" | sort)"
    victims_pins_are_whole
    same "$(blocks_of /volume1/victim/*)" "$(bitmap_blocks 1)"
    stop_service
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
    recipe 'KEY_FILE='
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
    recipe 'KEY_FILE='
    same '' "$(awk 'NR > 1' /proc/sysvipc/msg)"
    same '' "$(<"$KEY_FILE")"
}
