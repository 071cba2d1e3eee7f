# Blocks of 64 KiB as the file system, the bitmap file, the driver and the SSD see them. Lists of
# blocks have one number per line, ascending.
# shellcheck shell=bash

# extents FILE...: per extent "file start, device start, sectors, flags", in sectors, in file order;
# as the file system gives them to filefrag. Extents without a place on the device are left out.
extents() {
    local file
    for file in "$@"; do
        filefrag -v -b512 "$file" | awk '/^ *[0-9]+:/ && !/delalloc|inline/ {
            gsub(/\.\.|:/, " ")
            print $2, $4, $6, $NF
        }'
    done
}

# Sectors "start count" per line to blocks.
sectors_to_blocks() {
    awk '{ for (b = int($1 / 128); b <= int(($1 + $2 - 1) / 128); b++) print b }' | sort -nu
}

blocks_of() { extents "$@" | awk '{ print $2, $3 }' | sectors_to_blocks; }
written_blocks_of() { extents "$@" | awk '!/unwritten/ { print $2, $3 }' | sectors_to_blocks; }

# ranges_of FILE...: the extents as the unpin request lists them, in JSON.
ranges_of() {
    extents "$@" | awk '
        { ranges = ranges separator "[" $2 "," $3 "]"; separator = "," }
        END { print "[" ranges "]" }'
}

# bits_of FILE: the set bits of a bitmap file, least significant bit of each byte first.
bits_of() { "$HELPERS/system_bits" "$1"; }

bitmap_file() { echo "/volume$1/veskcachepinfile.bitmap"; }
bitmap_blocks() { bits_of "$(bitmap_file "$1")"; }

# What the cache device of volume N says. state N JQ_FILTER.
state() { jq -c "$2" "$(volume_state_file "$1")"; }
# The blocks of a member that lists runs, [first, number].
expand_runs() {
    awk -v name="\"$2\":" '{
        rest = substr($0, index($0, name) + length(name))
        end = index(rest, "\"")
        if (end) rest = substr(rest, 1, end - 1)
        gsub(/[^0-9]+/, " ", rest)
        count = split(rest, run, " ")
        for (i = 1; i < count; i += 2)
            for (block = run[i]; block < run[i] + run[i + 1]; block++) print block
    }' "$(volume_state_file "$1")"
}
driver_blocks() { expand_runs "$1" bitmapBits; }
pinned_blocks() { expand_runs "$1" pinned; }
cached_blocks() { bits_of "$(volume_device "$1").cached"; }

# is_subset LIST LIST
is_subset() {
    local missing
    missing=$(comm -23 <(sort -u <<<"$1") <(sort -u <<<"$2"))
    [ -z "$missing" ] || {
        echo "not there: $missing"
        return 1
    }
}
# common LIST LIST: what both hold.
common() { comm -12 <(sort -u <<<"$1") <(sort -u <<<"$2"); }

# The SSD of volume N holds, for every cached block, the bytes of the backing image.
ssd_holds_the_data() { while_still "$1" compare_ssd "$1"; }
compare_ssd() {
    cached_blocks "$1" | "$HELPERS/system_slots" "/tmp/volume$1/ssd" "/tmp/volume$1/backing"
}

# The written extents of FILE lie on the device of volume N where the file system says they do.
device_holds_the_file() {
    trim_to_size "$2" |
        awk '!/unwritten/ { printf "%.0f %.0f %d\n", $1 * 512, $2 * 512, $3 * 512 }' |
        "$HELPERS/system_compare" "$2" "/tmp/volume$1/backing"
}

# The extents of FILE without what lies behind its end.
trim_to_size() {
    local sectors=$((($(stat -c %s "$1") + 511) / 512))
    extents "$1" | awk -v end="$sectors" '$1 < end { if ($1 + $3 > end) $3 = end - $1; print }'
}

# Reads the whole cache device of volume N past every page cache, which evicts what is not pinned.
scan_device() { dd if="$(volume_device "$1")" of=/dev/null bs=1M iflag=direct status=none; }

# random FILE SIZE [dd option...]: fresh bytes.
random() { dd if=/dev/urandom of="$1" bs="$2" count=1 status=none "${@:3}"; }

# fragmented FILE PIECES: a file without holes whose pieces of 64 KiB, and 4 KiB behind them, are
# extents of their own: what lay between them is cut out.
fragmented() {
    random "$1" $(($2 * 128 + 4))K conv=fsync
    "$HELPERS/system_fallocate" "$1" collapse-range 65536 131072 65536 "$2"
    sync "$1"
    [ "$(extents "$1" | wc -l)" -gt "$2" ]
}

# fragmented_apart FILE PIECES OTHER: the same, sharing no block with the other file.
fragmented_apart() {
    local spare=0
    fragmented "$1" "$2"
    while [ -n "$(common "$(blocks_of "$1")" "$(blocks_of "$3")")" ]; do
        spare=$((spare + 1))
        [ "$spare" -lt 10 ]
        mv "$1" "$1.spare$spare"
        fragmented "$1" "$2"
    done
}

# The files are all that is pinned on volume 1: in the bitmap file, in the driver, in the records,
# and their written blocks on the SSD.
check_pinned() {
    local file blocks written pinned records=
    blocks=$(blocks_of "$@")
    written=$(written_blocks_of "$@")
    [ -n "$blocks" ]
    same "$blocks" "$(bitmap_blocks 1)"
    same "$blocks" "$(driver_blocks 1)"
    pinned=$(pinned_blocks 1)
    is_subset "$written" "$pinned"
    is_subset "$pinned" "$blocks"
    ssd_holds_the_data 1
    for file in "$@"; do
        device_holds_the_file 1 "$file"
        records+="\"$(inode "$file")\":\"${file#/volume1/}\","
    done
    same "$(jq -cS . <<<"{${records%,}}")" "$(config '.volumes["/volume1"].files' | jq -cS .)"
}

check_nothing_pinned() {
    same "" "$(bitmap_blocks 1)"
    same "" "$(driver_blocks 1)"
    same "" "$(pinned_blocks 1)"
    same null "$(config '.volumes["/volume1"]')"
    same '"Yes"' "$(jq -R . <<<"$(tool --is-all-unpin "$(volume_device 1)")")"
}
