# Another architecture from Debian's packages, without this machine's own package state: lists, archives
# and "what is installed" live in build-ARCH-apt. To be sourced after common.bash.

FOREIGN_BUILD_PACKAGES="libc6-dev libstdc++6 libgcc-s1 libjsoncpp-dev libmount-dev libblkid-dev
    libfuse3-dev libcli11-dev libgtest-dev"

# foreign_use ARCH: Debian's name of the architecture that everything below is about.
foreign_use() {
    FOREIGN_ARCH=$1
    FOREIGN_SYSROOT=$TREE/build-$1-sysroot
    FOREIGN_APT=$TREE/build-$1-apt
}

foreign_apt() {
    mkdir -p "$FOREIGN_APT/lists/partial" "$FOREIGN_APT/preferences.d"
    touch "$FOREIGN_APT/status"
    cat >"$FOREIGN_APT/apt.conf" <<END
APT::Architecture "$FOREIGN_ARCH";
APT::Architectures { "$FOREIGN_ARCH"; };
APT::Install-Recommends "false";
APT::Sandbox::User "root";
Dir::State "$FOREIGN_APT";
Dir::State::status "$FOREIGN_APT/status";
Dir::State::lists "$FOREIGN_APT/lists";
END
    APT_CONFIG=$FOREIGN_APT/apt.conf "$@"
}

# foreign_download FOLDER PACKAGE...: the packages and all they depend on, as archives in the folder.
foreign_download() {
    local folder=$1
    shift
    mkdir -p "$folder/archives/partial"
    # An index that cannot be had (the security archive's index of an architecture lags at times) is
    # passed over: what is missing shows in the next step.
    foreign_apt apt-get -q update || true
    foreign_apt apt-get -q -y -o Dir::Cache="$folder" --download-only install "$@"
}

# foreign_unpack ROOT ARCHIVE...: a folder that looks like the installed packages; their set-up scripts
# are not run.
foreign_unpack() {
    local root=$1 folder archive link
    shift
    rm -rf "$root"
    # Debian's folders of the merged /usr, before packages that still ship the old ones.
    for folder in bin sbin lib; do
        mkdir -p "$root/usr/$folder"
        ln -s "usr/$folder" "$root/$folder"
    done
    for archive in "$@"; do
        dpkg-deb --fsys-tarfile "$archive" | tar -x --keep-directory-symlink -C "$root"
    done
}

# foreign_relink ROOT: absolute links of the packages mean the root, not this machine.
foreign_relink() {
    local root=$1 link
    find "$root" -type l -lname '/*' | while read -r link; do
        ln -sfn "$(realpath -s --relative-to="$(dirname "$link")" "$root$(readlink "$link")")" "$link"
    done
}

foreign_make_sysroot() {
    # shellcheck disable=SC2086
    foreign_download "$FOREIGN_APT/build" $FOREIGN_BUILD_PACKAGES
    foreign_unpack "$FOREIGN_SYSROOT" "$FOREIGN_APT"/build/archives/*.deb
    foreign_relink "$FOREIGN_SYSROOT"
    echo "$FOREIGN_BUILD_PACKAGES" >"$FOREIGN_SYSROOT/.packages"
}

# The sysroot of the architecture, made anew when other packages are asked for.
foreign_sysroot() {
    [ "$(cat "$FOREIGN_SYSROOT/.packages" 2>/dev/null)" != "$FOREIGN_BUILD_PACKAGES" ] || return 0
    with_build_folder "$FOREIGN_ARCH-apt" foreign_make_sysroot
}
