# Debian's armhf packages without the machine's own package state: lists, archives and "what is installed"
# live in build-armhf-apt. To be sourced after common.bash.

# shellcheck disable=SC2034
ARM_SYSROOT=$TREE/build-armhf-sysroot
ARM_APT=$TREE/build-armhf-apt

ARM_BUILD_PACKAGES="libc6-dev libstdc++6 libgcc-s1 libjsoncpp-dev libmount-dev libblkid-dev
    libfuse3-dev libgtest-dev"

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
    arm_download $ARM_BUILD_PACKAGES
    rm -rf "$ARM_SYSROOT"
    mkdir -p "$ARM_SYSROOT"
    # Debian's folders of the merged /usr, before packages that still ship the old ones.
    for folder in bin sbin lib; do
        mkdir -p "$ARM_SYSROOT/usr/$folder"
        ln -s "usr/$folder" "$ARM_SYSROOT/$folder"
    done
    for archive in "$ARM_APT"/cache/archives/*.deb; do
        dpkg-deb --fsys-tarfile "$archive" |
            tar -x --keep-directory-symlink -C "$ARM_SYSROOT"
    done
    arm_relink
}
