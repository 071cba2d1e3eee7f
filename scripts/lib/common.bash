# What the scripts share: packages and builds. To be sourced; sets TREE, the repository's top folder.

TREE=$(dirname "$(dirname "$(dirname "$(readlink -f "${BASH_SOURCE[0]}")")")")

# shellcheck disable=SC2034
BUILD_PACKAGES="g++ cmake ninja-build pkg-config libjsoncpp-dev libmount-dev libblkid-dev libfuse3-dev"
# shellcheck disable=SC2034
RUN_PACKAGES="util-linux mount fdisk e2fsprogs xfsprogs procps kmod"
# shellcheck disable=SC2034
TEST_PACKAGES="libgtest-dev bats python3-minimal"

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
    ) 9>/var/lock/veskcachepin-apt.lock >"$log" 2>&1 || {
        tail -n 20 "$log" >&2
        rm -f "$log"
        die "the packages cannot be installed:$missing"
    }
    rm -f "$log"
}

# build_preset PRESET [cmake option...]: configures and builds into build-PRESET, one copy at a time.
build_preset() {
    local preset=$1 log
    shift
    mkdir -p "$TREE/build-$preset"
    log=$TREE/build-$preset/build.log
    (
        flock 8
        cd "$TREE" && cmake --preset "$preset" "$@" && cmake --build --preset "$preset"
    ) 8>"$TREE/build-$preset/.lock" >"$log" 2>&1 || {
        tail -n 60 "$log" >&2
        die "the build failed; the whole output is in $log"
    }
}
