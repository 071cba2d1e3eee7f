# What the scripts share: packages and builds. To be sourced; sets TREE, the repository's top folder.

TREE=$(dirname "$(dirname "$(dirname "$(readlink -f "${BASH_SOURCE[0]}")")")")

# shellcheck disable=SC2034
BUILD_PACKAGES="g++ cmake ninja-build pkg-config libjsoncpp-dev libmount-dev libblkid-dev libfuse3-dev libcli11-dev"
# shellcheck disable=SC2034
RUN_PACKAGES="util-linux mount fdisk e2fsprogs xfsprogs procps kmod"
# shellcheck disable=SC2034
TEST_PACKAGES="libgtest-dev bats jq python3-minimal python3-jsonschema btrfs-progs fuse3"

die() {
    echo "$(basename "$0"): $*" >&2
    exit 1
}

# install_packages PACKAGE...: those that are missing; one copy of the scripts at a time.
install_packages() {
    local package missing='' log
    for package in "$@"; do
        [ "$(dpkg-query -W -f '${db:Status-Status}' "$package" 2>/dev/null)" = installed ] ||
            missing="$missing $package"
    done
    [ -n "$missing" ] || return 0
    [ "$(id -u)" -eq 0 ] || die "root is needed to install:$missing"
    echo "Installing:$missing"
    log=$(mktemp)
    (
        flock 9
        export DEBIAN_FRONTEND=noninteractive
        # An update that misses some index still leaves what is needed; installing tells.
        apt-get -q update || true
        # shellcheck disable=SC2086
        apt-get -q install -y --no-install-recommends -o DPkg::Lock::Timeout=300 $missing
    ) 9</var/lib/apt/lists >"$log" 2>&1 || {
        tail -n 20 "$log" >&2
        rm -f "$log"
        die "the packages cannot be installed:$missing"
    }
    rm -f "$log"
}

# with_build_folder PRESET COMMAND...: runs the command in TREE, one copy of the scripts at a time for
# each build folder; what it prints is kept and shown only when it fails.
with_build_folder() {
    local folder=$TREE/build-$1
    shift
    mkdir -p "$folder"
    (
        flock 8
        cd "$TREE" || exit
        "$@" >"$folder/last.log" 2>&1 || {
            tail -n 60 "$folder/last.log" >&2
            die "\"$*\" failed; the whole output is in $folder/last.log"
        }
    ) 8>"$folder/.lock"
}

# configure_preset PRESET, build_preset PRESET: into build-PRESET.
configure_preset() { with_build_folder "$1" cmake --preset "$1"; }
build_preset() {
    configure_preset "$1"
    with_build_folder "$1" cmake --build --preset "$1"
}
