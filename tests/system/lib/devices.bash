# Cache devices beside those of the volumes, and moments that stay: a device that answers nobody until
# it is released, a file system that leaves its device alone.
# shellcheck shell=bash

# map_cache UUID DEVICE: from now on this cache device is the one of the space, and the only one.
map_cache() {
    printf '{"caches":[{"spaceUuid":"%s","ssdPath":"/tmp/some-ssd","cachePath":"%s"}]}\n' \
        "$1" "$2" >"$VESK_FLASHCACHE_CONFIG.new"
    mv "$VESK_FLASHCACHE_CONFIG.new" "$VESK_FLASHCACHE_CONFIG"
}

# spare_device NAME SIZE [veskcachedev option...]: a cache device that no volume lies on, with SSD_SIZE
# (16M) of cache; prints its path. With map_cache it takes the place of a volume's own.
spare_device() {
    local name=$1 size=$2
    shift 2
    mkdir -p "/tmp/$name"
    volume_image "/tmp/$name/backing" "$size"
    volume_image "/tmp/$name/ssd" "${SSD_SIZE:-16M}"
    (
        close_descriptors
        volume_serve --device "/run/$name/cachedev" --backing "/tmp/$name/backing" \
            --ssd "/tmp/$name/ssd" "$@"
    )
    echo "/run/$name/cachedev"
}

# look_at_device DEVICE: sets MISSES, the blocks that it had to get, and DEVICE_PID; without a process.
look_at_device() {
    local text
    IFS= read -r text <"$1.json"
    [[ $text =~ \"misses\":([0-9]+) ]] && MISSES=${BASH_REMATCH[1]}
    [[ $text =~ \"pid\":([0-9]+) ]] && DEVICE_PID=${BASH_REMATCH[1]}
}
misses_are_above() {
    look_at_device "$1"
    [ "$MISSES" -gt "$2" ]
}

# hold_device DEVICE: whoever reads from it waits until release_device. So does who opens it or looks at
# its state, the tool's commands for its volume included.
hold_device() {
    local name
    look_at_device "$1"
    read -r name <"/proc/$DEVICE_PID/comm"
    [ "$name" = veskcachedev ] || {
        echo "process $DEVICE_PID is no cache device, but $name"
        return 1
    }
    HELD_PID=$DEVICE_PID
    kill -s STOP "$HELD_PID"
    wait_until held_device_is_still
}
held_device_is_still() {
    local task pid name state rest
    for task in /proc/"$HELD_PID"/task/*; do
        # shellcheck disable=SC2034
        read -r pid name state rest <"$task/stat"
        [ "$state" = T ] || return 1
    done
}
release_device() {
    [ -n "${HELD_PID:-}" ] || return 0
    kill -s CONT "$HELD_PID"
    HELD_PID=
}

# while_still N COMMAND...: while the file system of volume N changes nothing on its device. It writes
# its journal and its tables at times of its own choice, and so between two looks at the device. The
# command is a condition to the shell: each of its parts must be asked for its status.
while_still() {
    local status=0
    fsfreeze --freeze "/volume$1"
    "${@:2}" || status=$?
    fsfreeze --unfreeze "/volume$1"
    return "$status"
}
