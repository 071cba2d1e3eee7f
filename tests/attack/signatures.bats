#!/usr/bin/env bats
# The bytes of other superblocks, brought through a user's own files to where a probe of the device looks.

load lib

setup_file() {
    # Nearly every block can be a user's.
    MKFS_OPTIONS='-m 0 -N 512 -O ^resize_inode,^has_journal' make_volume 1 64M 16M ext4
}

setup() {
    fresh_volume
    UUID=$(volume_uuid 1)
    attacker_folder /volume1/his
}

# His bytes go, whatever the volume has become by them.
teardown() {
    end_service
    [ -z "${HIS_FILE:-}" ] || he_writes_there '\0\0\0\0\0\0\0\0'
}

# All room of the volume becomes files of his. The file system keeps some back, by then the last
# blocks: one file goes, and what grows now grows into these.
take_all_room() {
    # shellcheck disable=SC2016
    attacker bash -c 'cd "$1" && n=0
        for size in 8192 1024 128 16 4; do
            while fallocate -l "${size}K" "$((n += 1))"; do :; done
        done
        rm 1
        for file in *; do fallocate -o "$(stat -c %s "$file")" -l 2M "$file"; done' \
        bash /volume1/his 2>/dev/null || true
    sync
}

# his_place OFFSET: sets HIS_FILE and HIS_OFFSET, where the byte OFFSET of the device is in a file of his.
his_place() {
    local file start place sectors rest
    for file in /volume1/his/*; do
        # shellcheck disable=SC2034
        while read -r start place sectors rest; do
            if [ "$place" -le $(($1 / 512)) ] && [ $(($1 / 512)) -lt $((place + sectors)) ]; then
                HIS_FILE=$file HIS_OFFSET=$((start * 512 + $1 - place * 512))
                return
            fi
        done < <(extents "$file")
    done
    echo "no file of his at $1"
    return 1
}

# he_writes OFFSET TEXT: printf's text to there.
he_writes() { his_place "$1" && he_writes_there "$2"; }
he_writes_there() {
    # shellcheck disable=SC2016
    attacker sh -c 'printf "$3" | dd of="$1" bs=1 seek="$2" conv=notrunc,fsync status=none' \
        sh "$HIS_FILE" "$HIS_OFFSET" "$1"
    # As after a restart of the machine.
    drop_page_cache
    blockdev --flushbufs "$(volume_loop 1)"
}

probed() { blkid -p -o value -s "$1" "$(volume_loop 1)"; }

records_survive_a_mount() {
    local bitmap_before
    start_service
    random /volume1/pinned 64K conv=fsync
    pin 1 /volume1/pinned
    stop_service
    put_config "$(config . | jq -cS .)"
    bitmap_before=$(bitmap_blocks 1)
    drop_page_cache
    "$@"
    tool --handle-mount --mount-path /volume1 --config-path "$CONF"
    same '{"/volume1":{"files":{"'"$(inode /volume1/pinned)"'":"pinned"}}}' "$(config .volumes)"
    same "$bitmap_before" "$(bitmap_blocks 1)"
    answers 0 --get-uuid --mount-path /volume1 <<<"$UUID"
}

raid_superblock() {
    take_all_room
    # Version 0.90, in the last 64 KiB: the magic number, the version, the beginning of a UUID.
    he_writes $((64 * 1048576 - 65536)) '\374\116\053\251\0\0\0\0\132\0\0\0\0\0\0\0\0\0\0\0uuid'
    same linux_raid_member "$(probed TYPE)"
}

second_file_system() {
    take_all_room
    he_writes $((65536 + 64)) '_BHRfS_M'
    refute probed TYPE
}

@test "a RAID's superblock in a user's file takes no volume's records" {
    records_survive_a_mount raid_superblock
}

@test "another file system's superblock in a user's file takes no volume's records" {
    records_survive_a_mount second_file_system
}
