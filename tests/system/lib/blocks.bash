# Blocks of 64 KiB as the file system, the bitmap file, the driver and the SSD see them. Lists of
# blocks have one number per line, ascending.
# shellcheck shell=bash

# extents FILE...: per extent "file start, device start, sectors, flags", in sectors, in file order;
# as the file system gives them to filefrag. Extents without a place on the device are left out.
extents() {
    local file
    for file in "$@"; do
        filefrag -v -b512 "$file" | sed -n 's/^ *[0-9]*: *//p' | tr -d '.:' |
            awk '$NF !~ /delalloc|inline/ { print $1, $3, $5, $NF }'
    done
}

# Sectors "start count" per line to blocks.
sectors_to_blocks() {
    awk '{ for (b = int($1 / 128); b <= int(($1 + $2 - 1) / 128); b++) print b }' | sort -nu
}

blocks_of() { extents "$@" | awk '{ print $2, $3 }' | sectors_to_blocks; }
written_blocks_of() { extents "$@" | awk '!/unwritten/ { print $2, $3 }' | sectors_to_blocks; }

# ranges_of FILE...: the extents as the unpin request lists them, in JSON.
ranges_of() { extents "$@" | jq -c -n -R '[inputs | split(" ") | [(.[1:3][] | tonumber)]]'; }

# bits_of FILE: the set bits of a bitmap file, least significant bit of each byte first.
bits_of() {
    od -An -v -w1 -tu1 "$1" |
        awk '{ for (i = 0; i < 8; i++) if (int($1 / 2 ^ i) % 2) print (NR - 1) * 8 + i }'
}

bitmap_file() { echo "/volume$1/veskcachepinfile.bitmap"; }
bitmap_blocks() { bits_of "$(bitmap_file "$1")"; }

# What the cache device of volume N says. state N JQ_FILTER.
state() { jq -c "$2" "$(volume_state_file "$1")"; }
expand_runs() { jq ".$2[] | range(.[0]; .[0] + .[1])" "$(volume_state_file "$1")"; }
driver_blocks() { expand_runs "$1" bitmapBits; }
pinned_blocks() { expand_runs "$1" pinned; }
cached_blocks() { jq '.slotBlocks[] | select(. >= 0)' "$(volume_state_file "$1")" | sort -n; }

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

# Every cached block's slot on the SSD of volume N holds the bytes of the backing image.
ssd_holds_the_data() {
    local slot=0 block folder=/tmp/volume$1
    for block in $(jq '.slotBlocks[]' "$(volume_state_file "$1")"); do
        if [ "$block" -ge 0 ]; then
            cmp -n 65536 -i "$((slot * 65536)):$((block * 65536))" "$folder/ssd" "$folder/backing" || {
                echo "slot $slot, block $block"
                return 1
            }
        fi
        slot=$((slot + 1))
    done
}

# The written extents of FILE lie on the device of volume N where the file system says they do.
device_holds_the_file() {
    local start device count flags
    while read -r start device count flags; do
        case "$flags" in *unwritten*) continue ;; esac
        cmp -n "$((count * 512))" -i "$((start * 512)):$((device * 512))" "$2" \
            "/tmp/volume$1/backing" || return 1
    done < <(trim_to_size "$2")
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
    local i
    random "$1" $(($2 * 128 + 4))K conv=fsync
    for ((i = $2 - 1; i >= 0; i--)); do
        fallocate --collapse-range -o $((i * 131072 + 65536)) -l 65536 "$1"
    done
    sync "$1"
    [ "$(extents "$1" | wc -l)" -gt "$2" ]
}
