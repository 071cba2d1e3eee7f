# Volumes on emulated cache devices, for the demo and the system tests. To be sourced inside a private
# world; needs BIN, the folder of the built programs.
#
# A volume N has its images in /tmp/volumeN, its cache device in /run/veskN/cachedev_N and is mounted at
# /volumeN. Everything ends with the private world; nothing needs to be undone.

export VESK_FLASHCACHE_CONFIG=/run/veskflashcache.json

volume_device() { echo "/run/vesk$1/cachedev_$1"; }
volume_state_file() { echo "/run/vesk$1/cachedev_$1.json"; }

# volume_make N SIZE SSD_SIZE FSTYPE [veskcachedev option...]: sizes as truncate takes them;
# MKFS_OPTIONS, words, go to mkfs.
volume_make() {
    local n=$1 size=$2 ssd_size=$3 fstype=$4 device loop
    shift 4
    device=$(volume_device "$n")
    mkdir -p "/tmp/volume$n"
    volume_image "/tmp/volume$n/backing" "$size"
    volume_image "/tmp/volume$n/ssd" "$ssd_size"
    volume_serve --device "$device" --backing "/tmp/volume$n/backing" --ssd "/tmp/volume$n/ssd" "$@"
    loop=$(volume_attach "$device")
    # All that an ext file system has to write at first is written here; the kernel would do it by and by,
    # which shows in the device's counts.
    # shellcheck disable=SC2086
    case "$fstype" in
    ext*)
        "mkfs.$fstype" -q -b 4096 -E lazy_itable_init=0,lazy_journal_init=0 ${MKFS_OPTIONS:-} "$loop"
        ;;
    *) "mkfs.$fstype" -q ${MKFS_OPTIONS:-} "$loop" ;;
    esac
    mount "$loop" "/volume$n"
    # Detaching a loop device in use only makes it go with its last user: no exit path can forget it.
    losetup --detach "$loop"
    echo "$loop" >"/tmp/volume$n/loop"
    blkid -p -o value -s UUID "$loop" >"/tmp/volume$n/uuid"
    volume_configure
}

# volume_image FILE SIZE: an image that its owner alone may look into, as it holds everybody's files.
volume_image() { (umask 077 && truncate -s "$2" "$1"); }

# volume_attach FILE: prints the loop device; LOOP_OPTIONS, words, go to losetup. The devices are the machine's, which makes new ones as they
# are asked for; the nodes are the world's own. Another world may be faster with the device, once or twice.
volume_attach() {
    local loop tries=0
    while [ "$tries" -lt 20 ]; do
        loop=$(losetup --find)
        [ -b "$loop" ] || mknod "$loop" b 7 "${loop#/dev/loop}"
        # shellcheck disable=SC2086
        if losetup ${LOOP_OPTIONS:-} "$loop" "$1" 2>/tmp/losetup.errors; then
            echo "$loop"
            return
        fi
        tries=$((tries + 1))
        sleep 0.1
    done
    cat /tmp/losetup.errors >&2
    return 1
}

# volume_serve VESKCACHEDEV_OPTION...: a cache device below /run.
#
# The daemon gets a mount namespace of its own, in which no volume is mounted; only what it mounts below
# /run is seen here. Were it the last process of the world's namespace to end, as happens when all are
# killed, its exit would unmount the volume, and that waits for the daemon itself, for ever.
volume_serve() {
    mount --make-shared /run
    # shellcheck disable=SC2016
    unshare --mount --propagation unchanged -- \
        sh -c 'umount /volume? 2>/dev/null; exec "$0" "$@"' "$BIN/veskcachedev" "$@"
}

volume_loop() { cat "/tmp/volume$1/loop"; }
volume_uuid() { cat "/tmp/volume$1/uuid"; }

# Writes the cache configuration for all volumes made so far; a running service sees the old or the new.
volume_configure() {
    local folder uuid separator=
    {
        printf '{"caches":['
        for folder in /tmp/volume[0-9]; do
            [ -e "$folder/uuid" ] || continue
            read -r uuid <"$folder/uuid"
            printf '%s{"spaceUuid":"%s","ssdPath":"%s/ssd","cachePath":"%s"}' "$separator" \
                "$uuid" "$folder" "$(volume_device "${folder#/tmp/volume}")"
            separator=,
        done
        printf ']}\n'
    } >"$VESK_FLASHCACHE_CONFIG.new"
    mv "$VESK_FLASHCACHE_CONFIG.new" "$VESK_FLASHCACHE_CONFIG"
}

# volume_state N MEMBER: one number or word of the cache device's state.
volume_state() {
    sed -n 's/.*"'"$2"'":\([0-9a-z]*\).*/\1/p' "$(volume_state_file "$1")"
}

# Forgets what the page cache holds, so that reads reach the cache device.
drop_page_cache() {
    sync
    echo 3 >/proc/sys/vm/drop_caches
}
