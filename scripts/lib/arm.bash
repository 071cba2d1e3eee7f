# Debian's armhf packages without the machine's own package state: lists, archives and "what is installed"
# live in build-armhf-apt. To be sourced after common.bash.

# shellcheck disable=SC2034
ARM_SYSROOT=$TREE/build-armhf-sysroot
ARM_APT=$TREE/build-armhf-apt

ARM_BUILD_PACKAGES="libc6-dev libstdc++6 libgcc-s1 libjsoncpp-dev libmount-dev libblkid-dev
    libfuse3-dev libgtest-dev"
ARM_MACHINE_PACKAGES="bash coreutils util-linux util-linux-extra mount fdisk e2fsprogs xfsprogs procps
    kmod grep sed mawk findutils bats python3-minimal libpython3-stdlib hostname debianutils perl-base
    dash busybox-static"
ARM_KERNEL_PACKAGE=linux-image-armmp

arm_apt() {
    mkdir -p "$ARM_APT/lists/partial" "$ARM_APT/cache/archives/partial" "$ARM_APT/preferences.d"
    touch "$ARM_APT/status"
    cat >"$ARM_APT/apt.conf" <<END
APT::Architecture "armhf";
APT::Architectures { "armhf"; };
APT::Install-Recommends "false";
APT::Sandbox::User "root";
Dir::State "$ARM_APT";
Dir::State::status "$ARM_APT/status";
Dir::State::lists "$ARM_APT/lists";
Dir::Cache "$ARM_APT/cache";
END
    APT_CONFIG=$ARM_APT/apt.conf apt-get -q -y "$@"
}

# arm_download PACKAGE...: the packages and all they depend on, as archives.
arm_download() {
    # An index that cannot be had (the security archive's armhf index lags at times) is passed over: what
    # is missing shows in the next step.
    arm_apt update || true
    arm_apt --download-only install "$@"
}

# Absolute links of the packages mean the sysroot, not this machine.
arm_relink() {
    find "$ARM_SYSROOT" -type l -lname '/*' | while read -r link; do
        ln -sfn "$(realpath -s --relative-to="$(dirname "$link")" "$ARM_SYSROOT$(readlink "$link")")" \
            "$link"
    done
}

# arm_make_sysroot: unpacks everything; the packages' own set-up scripts are not run.
arm_make_sysroot() {
    local archive
    # shellcheck disable=SC2086
    arm_download $ARM_BUILD_PACKAGES $ARM_MACHINE_PACKAGES
    rm -rf "$ARM_SYSROOT"
    mkdir -p "$ARM_SYSROOT"
    # Debian's folders of the merged /usr, before packages that still ship the old ones.
    for folder in bin sbin lib; do
        mkdir -p "$ARM_SYSROOT/usr/$folder"
        ln -s "usr/$folder" "$ARM_SYSROOT/$folder"
    done
    for archive in "$ARM_APT"/cache/archives/*.deb; do
        case "$archive" in */linux-image-*) continue ;; esac
        dpkg-deb --fsys-tarfile "$archive" |
            tar -x --keep-directory-symlink -C "$ARM_SYSROOT"
    done
    arm_relink
    arm_configure
}

# What the packages' set-up scripts would have made and the tests need.
arm_configure() {
    local root=$ARM_SYSROOT
    printf 'root:x:0:0:root:/root:/bin/bash\nnobody:x:65534:65534:nobody:/nonexistent:/bin/false\n' \
        >"$root/etc/passwd"
    printf 'root:x:0:\nnogroup:x:65534:\n' >"$root/etc/group"
    [ -e "$root/bin/sh" ] || ln -s dash "$root/bin/sh"
    [ -e "$root/usr/bin/awk" ] || ln -s mawk "$root/usr/bin/awk"
    ln -sfn /proc/self/mounts "$root/etc/mtab"
    [ -L "$root/var/run" ] || rmdir "$root/var/run"
    ln -sfn /run "$root/var/run"
    mkdir -p "$root/root" "$root/mnt" "$root/tmp" "$root/run" "$root/proc" "$root/sys" "$root/dev"
}

# arm_make_kernel FOLDER: Debian's armhf kernel and an initramfs that mounts /dev/vda and goes on there.
arm_make_kernel() {
    local archive version work=$1/kernel modules
    arm_download $ARM_KERNEL_PACKAGE
    rm -rf "$work"
    mkdir -p "$work"
    for archive in "$ARM_APT"/cache/archives/linux-image-[0-9]*.deb; do
        dpkg-deb -x "$archive" "$work"
    done
    version=$(basename "$work"/lib/modules/*)
    depmod -b "$work" "$version"
    mkdir -p "$work/initramfs/bin" "$work/initramfs/root"
    cp "$ARM_SYSROOT/bin/busybox" "$work/initramfs/bin/"
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
        printf 'exec /bin/busybox switch_root /root /root/repo/tests/system/arm-init\n'
    } >"$work/initramfs/init"
    chmod +x "$work/initramfs/init"
    (cd "$work/initramfs" && find . | cpio -o -H newc --quiet | gzip -1) >"$1/initrd.gz"
    cp "$work"/boot/vmlinuz-* "$1/vmlinuz"
}

# arm_make_disk FOLDER: the root disk, with the sysroot, the kernel's modules and this tree in it.
arm_make_disk() {
    local stage=$1/root
    rm -rf "$stage" "$1/disk.img"
    mkdir -p "$stage"
    cp -al "$ARM_SYSROOT/." "$stage/"
    rm -rf "$stage/usr/include" "$stage/usr/share/doc" "$stage/usr/share/man"
    cp -al "$1/kernel/lib/modules" "$stage/lib/"
    mkdir -p "$stage/root/repo/build-armhf"
    cp -a scripts tests docs "$stage/root/repo/"
    cp -a build-armhf/bin build-armhf/lib "$stage/root/repo/build-armhf/"
    rm -f "$stage"/root/repo/build-armhf/lib/*.a
    truncate -s 2G "$1/disk.img"
    /sbin/mke2fs -q -F -t ext4 -b 4096 -d "$stage" "$1/disk.img"
    rm -rf "$stage"
}

# arm_boot FOLDER SECONDS: boots the machine; its console goes to standard output.
arm_boot() {
    timeout --foreground "$2" qemu-system-arm -M virt -cpu cortex-a15 -smp 1 -m 1024 -accel tcg \
        -nographic -no-reboot -nodefaults -serial stdio \
        -kernel "$1/vmlinuz" -initrd "$1/initrd.gz" \
        -append "console=ttyAMA0 quiet panic=-1" \
        -drive "if=none,file=$1/disk.img,format=raw,id=root" -device virtio-blk-device,drive=root \
        </dev/null
}
