#!/usr/bin/env bats
# Volumes that do not begin where their cache device does.

load lib

setup_file() { LOOP_OPTIONS="--offset 1048576" make_volume 1 64M 16M ext4; }

setup() { fresh_volume; }

@test "of a volume that begins inside its cache device no file is pinned, at another file's place" {
    random /volume1/a 300K conv=fsync
    answers 0 --support-pin --mount-path /volume1 <<<Yes
    start_service
    pin 1 /volume1/a
    same "" "$(driver_blocks 1)"
    service_said <<END
: Create file system device "$(volume_loop 1)" fail.
: Create file system device fail. Path:/volume1/a
: Can't add file (/volume1/a) inode ($(inode /volume1/a)) to bitmap
: Handle request failed
: Handle request error (num = 0, type = pinFiles), drop it.
END
}
