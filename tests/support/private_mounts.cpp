#include "tests/support/private_mounts.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <unistd.h>
#include <utility>

namespace vesk {
namespace {
std::string missing = "the private view of the mounts is not set up";

std::string EnterPrivateMounts() {
    if (geteuid() != 0) {
        return "a private view of the mounts needs root";
    }
    if (unshare(CLONE_NEWNS) < 0) {
        return std::string("no private view of the mounts: ") + strerror(errno);
    }
    if (mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) < 0 ||
        mount("tmpfs", "/tmp", "tmpfs", 0, "mode=1777") < 0) {
        return std::string("no private /tmp: ") + strerror(errno);
    }
    setenv("TMPDIR", "/tmp", 1); // also where the caller keeps temporary files elsewhere
    return "";
}

class PrivateMounts : public ::testing::Environment {
public:
    void SetUp() override { missing = EnterPrivateMounts(); }
    void TearDown() override {
        // What is written at the program's very end (coverage counts) may belong below the real
        // /tmp.
        if (missing.empty()) {
            umount2("/tmp", MNT_DETACH);
        }
    }
};
} // namespace

bool UsePrivateMounts() {
    ::testing::AddGlobalTestEnvironment(new PrivateMounts);
    return true;
}

const std::string &PrivateMountsMissing() {
    return missing;
}

bool MakeCharacterDevice(const std::string &path, unsigned major, unsigned minor) {
    return mknod(path.c_str(), S_IFCHR | 0600, makedev(major, minor)) == 0;
}

ScopedMount::ScopedMount(std::string target, bool mounted)
    : target_(std::move(target)), mounted_(mounted) {}

ScopedMount ScopedMount::Tmpfs(const std::string &target, size_t bytes, unsigned inodes) {
    const std::string options =
        "mode=0755,size=" + std::to_string(bytes) + ",nr_inodes=" + std::to_string(inodes);
    return {target, mount("tmpfs", target.c_str(), "tmpfs", 0, options.c_str()) == 0};
}

ScopedMount ScopedMount::Bind(const std::string &source, const std::string &target) {
    return {target, mount(source.c_str(), target.c_str(), nullptr, MS_BIND, nullptr) == 0};
}

ScopedMount::~ScopedMount() {
    if (mounted_) {
        umount2(target_.c_str(), MNT_DETACH);
    }
}
} // namespace vesk
