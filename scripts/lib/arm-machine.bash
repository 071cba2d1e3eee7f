# The emulated ARM machine: Debian's armhf kernel and programs, with this tree at its own place, so that
# CTest's files hold there too. To be sourced after foreign.bash and
# foreign_use armhf.

ARM_MACHINE=$TREE/build-armhf-machine

ARM_MACHINE_PACKAGES="bash coreutils util-linux util-linux-extra mount fdisk e2fsprogs xfsprogs procps
    kmod libc-bin grep sed mawk findutils diffutils gzip tar hostname debianutils perl-base dash busybox-static bash-static
    bats jq python3-minimal cmake libjsoncpp25 libmount1 libblkid1 libfuse3-3 fuse3 libstdc++6 libgtest-dev"
ARM_KERNEL=linux-image-armmp
# Small tools that the tests start by the thousand: busybox's need no dynamic linking, which takes three
# times as long there as everything else about starting them.
ARM_QUICK_TOOLS="awk basename cat chmod cmp cut dirname env grep head id ln mkdir mktemp mv od readlink rm
    sed seq sleep sort stat tail tee touch tr uname wc"

# What the packages' set-up scripts would have made and the tests need.
arm_configure() { # ROOT
    local tool
    printf 'root:x:0:0:root:/root:/bin/bash\nnobody:x:65534:65534:nobody:/nonexistent:/bin/false\n' \
        >"$1/etc/passwd"
    printf 'root:x:0:\nnogroup:x:65534:\n' >"$1/etc/group"
    printf '127.0.0.1 localhost\n' >"$1/etc/hosts"
    [ -e "$1/bin/sh" ] || ln -s dash "$1/bin/sh"
    [ -e "$1/usr/bin/awk" ] || ln -s mawk "$1/usr/bin/awk"
    ln -sfn /proc/self/mounts "$1/etc/mtab"
    rm -rf "$1/var/run"
    mkdir -p "$1/var" "$1/root" "$1/mnt" "$1/tmp" "$1/run" "$1/proc" "$1/sys" "$1/dev"
    ln -sfn /run "$1/var/run"
    chmod u+s "$1/usr/bin/fusermount3"
    cp "$1/bin/bash-static" "$1/bin/bash" # the shell, which forks all the time, for the same reason
    mkdir -p "$1/opt/quick"
    for tool in $ARM_QUICK_TOOLS; do
        ln -sf /bin/busybox "$1/opt/quick/$tool"
    done
}

# The kernel that the newest package of Debian's stands for.
arm_kernel_package() {
    foreign_apt apt-cache show "$ARM_KERNEL" |
        sed -n 's/^Depends: \(linux-image-[^ ,]*\).*/\1/p' | head -n 1
}

arm_make_kernel() {
    local work=$ARM_MACHINE/kernel version module modules package
    package=$(arm_kernel_package)
    rm -rf "$work"
    mkdir -p "$work/initramfs/bin" "$work/initramfs/root"
    (cd "$work" && foreign_apt apt-get -q download "$package")
    dpkg-deb -x "$work/$package"_*.deb "$work"
    version=$(basename "$work"/lib/modules/*)
    depmod -b "$work" "$version"
    cp "$ARM_MACHINE/root/bin/busybox" "$work/initramfs/bin/"
    modules=$(modprobe -d "$work" -S "$version" --show-depends -a virtio_mmio virtio_blk ext4 |
        sed -n 's/^insmod //p' | awk '!seen[$1]++ { print $1 }')
    {
        printf '#!/bin/busybox sh\n'
        for module in $modules; do
            cp "$module" "$work/initramfs/"
            printf '/bin/busybox insmod /%s\n' "$(basename "$module")"
        done
        printf '/bin/busybox mkdir -p /dev; /bin/busybox mount -t devtmpfs devtmpfs /dev\n'
        printf '/bin/busybox mount -t ext4 /dev/vda /root\n'
        printf '/bin/busybox umount /dev\n'
        printf 'exec /bin/busybox switch_root /root %q/tests/system/arm-init %q\n' "$TREE" "$TREE"
    } >"$work/initramfs/init"
    chmod +x "$work/initramfs/init"
    (cd "$work/initramfs" && find . | cpio -o -H newc --quiet | gzip -1) >"$ARM_MACHINE/initrd.gz"
    cp "$work"/boot/vmlinuz-* "$ARM_MACHINE/vmlinuz"
    cp -a "$work/lib/modules" "$ARM_MACHINE/root/lib/"
    rm -rf "$work"
}

# Everything that does not change with this tree.
arm_make_machine() {
    # shellcheck disable=SC2086
    foreign_download "$FOREIGN_APT/machine" $ARM_MACHINE_PACKAGES
    foreign_unpack "$ARM_MACHINE/root" "$FOREIGN_APT"/machine/archives/*.deb
    rm -rf "$ARM_MACHINE"/root/usr/share/{doc,man,locale,info} "$ARM_MACHINE/root/usr/include"
    arm_configure "$ARM_MACHINE/root"
    arm_make_kernel
}

# The tree's place is part of what the machine starts with.
arm_make_machine_if_needed() {
    local made_of=$ARM_MACHINE/.made-of wanted="$TREE $ARM_MACHINE_PACKAGES $ARM_QUICK_TOOLS"
    [ "$(cat "$made_of" 2>/dev/null)" != "$wanted" ] || return 0
    with_build_folder armhf-machine arm_make_machine
    echo "$wanted" >"$made_of"
}

# The root disk: the machine's programs, and this tree without what only building needs.
arm_make_disk() {
    local stage=$ARM_MACHINE/stage
    rm -rf "$stage" "$ARM_MACHINE/disk.img"
    mkdir -p "$stage"
    cp -al "$ARM_MACHINE/root/." "$stage/"
    mkdir -p "$stage$TREE"
    tar -c -C "$TREE" --exclude '*.o' --exclude '*.a' --exclude CMakeFiles \
        scripts tests docs build-armhf | tar -x -C "$stage$TREE"
    # The unit tests are registered with the emulator in front, which is not needed there.
    printf '#!/bin/bash\nshift 2\nexec "$@"\n' >"$stage/usr/bin/qemu-arm-static"
    chmod +x "$stage/usr/bin/qemu-arm-static"
    truncate -s 2G "$ARM_MACHINE/disk.img"
    /sbin/mke2fs -q -F -t ext4 -b 4096 -d "$stage" "$ARM_MACHINE/disk.img"
    rm -rf "$stage"
}

# What hardens a kernel against others costs an emulated one much time, page by page and call by call.
ARM_KERNEL_OPTIONS="init_on_alloc=0 init_on_free=0 mitigations=off apparmor=0 audit=0 randomize_kstack_offset=off"

# arm_boot SECONDS: boots a machine of as many processors as this one has, at most four; it runs the tests and switches
# itself off. Its console goes to standard output. Nothing is kept of what it writes.
arm_boot() {
    local processors
    processors=$(nproc)
    timeout --foreground "$1" qemu-system-arm -M virt -cpu cortex-a15 -smp $((processors < 4 ? processors : 4)) \
        -m 2560 -accel tcg,thread=multi -nographic -no-reboot -nodefaults -serial stdio -snapshot \
        -kernel "$ARM_MACHINE/vmlinuz" -initrd "$ARM_MACHINE/initrd.gz" \
        -append "console=ttyAMA0 quiet panic=-1 $ARM_KERNEL_OPTIONS" \
        -drive "if=none,file=$ARM_MACHINE/disk.img,format=raw,id=root" \
        -device virtio-blk-device,drive=root </dev/null
}
