#!/usr/bin/env bats
# The images behind an emulated cache device, which hold everybody's files, and its process id's file.

load lib

setup() { fresh_service; }

# serve [OPTION...]: a cache device on /tmp/images; what it says goes to /tmp/said.
serve() {
    (
        close_descriptors
        volume_serve --device /run/images/cachedev --backing /tmp/images/backing.img --ssd /tmp/images/ssd.img \
            --pid-file /run/images.pid "$@" >/tmp/said 2>&1
    )
}

end_serving() {
    umount /run/images
    wait_until test ! -e /run/images.pid
}

@test "a user reads nothing from images made as the page says, and cannot lock them" {
    local image
    mkdir /tmp/images
    (cd /tmp/images && eval "$(grep '^(umask' "$BATS_TEST_DIRNAME/../../docs/cachedev.md")")
    volume_image /tmp/images/other.img 1M
    for image in backing ssd other; do
        refute attacker head -c 1 "/tmp/images/$image.img"
        refute attacker flock --nonblock "/tmp/images/$image.img" true
    done
}

@test "a user's locks on images that he may read do not keep the device from starting" {
    chmod 644 /tmp/images/*.img
    # Both kinds of lock; they are there when the FIFO is opened, and until it is opened again.
    mkfifo -m 666 /tmp/locked
    # shellcheck disable=SC2016
    attacker flock --nonblock --exclusive /tmp/images/ssd.img flock --nonblock --exclusive /tmp/images/backing.img \
        perl -e 'for my $name ("ssd", "backing") {
                open(my $file, "<", "/tmp/images/$name.img") && push(@kept, $file) || die;
                fcntl($file, 37, pack($ARGV[0], 0, 0, 0, 0, 0)) || die "$name: $!\n"; # F_OFD_SETLK, F_RDLCK
            }
            open(my $ready, ">", "/tmp/locked"); close($ready); open($ready, "<", "/tmp/locked")' \
        's s x![q] q q l x![q]' 3>&- &
    read -r _ </tmp/locked || true
    run serve
    : >/tmp/locked
    wait
    same 0 "$status"
    same "veskcachedev: warning: others could read what the volume holds: they may read the backing image /tmp/images/backing.img; run: chmod 600 /tmp/images/backing.img
veskcachedev: warning: others could read what the volume holds: they may read the SSD image /tmp/images/ssd.img; run: chmod 600 /tmp/images/ssd.img" \
        "$(</tmp/said)"
    end_serving
}

@test "the device takes no image that a user could change" {
    chmod 600 /tmp/images/*.img
    chown "$ATTACKER" /tmp/images/ssd.img
    refute serve
    same "veskcachedev: the SSD image /tmp/images/ssd.img belongs to user $ATTACKER, who could change what the volume holds; run: chown root /tmp/images/ssd.img" \
        "$(</tmp/said)"
    chown root /tmp/images/ssd.img
    chmod 602 /tmp/images/backing.img
    refute serve
    same "veskcachedev: others could change what the volume holds: they may write the backing image /tmp/images/backing.img; run: chmod 600 /tmp/images/backing.img" \
        "$(</tmp/said)"
    chmod 600 /tmp/images/backing.img
}

@test "a link in the place of the process id's file leads to no other file" {
    echo precious >/run/precious
    attacker_folder /tmp/attacker-pids
    attacker ln -s /run/precious /tmp/attacker-pids/pid
    refute serve --pid-file /tmp/attacker-pids/pid
    same "veskcachedev: cannot write /tmp/attacker-pids/pid: it is a link or no file of root's" "$(</tmp/said)"
    same precious "$(</run/precious)"
}
