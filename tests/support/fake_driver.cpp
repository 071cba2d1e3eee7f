#include "tests/support/fake_driver.h"

#define FUSE_USE_VERSION 35

#include "base/scoped_fd.h"
#include "tests/support/test_volume.h"

#include <fuse.h>
#include <gtest/gtest.h>

#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <utility>

namespace vesk {
namespace {
constexpr unsigned kQueryAllUnpinned = 0x8004FED2;
constexpr char kFile[] = "/cachedev";

bool HasPinInterface() {
    return *static_cast<bool *>(fuse_get_context()->private_data);
}

int FakeGetattr(const char *path, struct stat *status, fuse_file_info *) {
    *status = {};
    if (std::strcmp(path, "/") == 0) {
        status->st_mode = S_IFDIR | 0700;
        return 0;
    }
    status->st_mode = S_IFREG | 0600;
    return std::strcmp(path, kFile) == 0 ? 0 : -ENOENT;
}

int FakeOpen(const char *, fuse_file_info *) {
    return 0;
}

int FakeIoctl(const char *, unsigned request, void *, fuse_file_info *, unsigned, void *data) {
    if (request != kQueryAllUnpinned || !HasPinInterface()) {
        return -ENOTTY;
    }
    const int32_t allUnpinned = 1;
    std::memcpy(data, &allUnpinned, sizeof(allUnpinned));
    return 0;
}

// Serves until the filesystem is unmounted; one byte into `ready` tells that it is mounted.
[[noreturn]] void Serve(const std::string &mountPath, bool hasPinInterface, ScopedFd ready) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    fuse_operations operations = {};
    operations.getattr = FakeGetattr;
    operations.open = FakeOpen;
    operations.ioctl = FakeIoctl;
    std::string program = "fake_driver";
    std::array<char *, 2> arguments = {program.data(), nullptr};
    fuse_args args = FUSE_ARGS_INIT(1, arguments.data());
    fuse *server = fuse_new(&args, &operations, sizeof(operations), &hasPinInterface);
    if (server == nullptr || fuse_mount(server, mountPath.c_str()) != 0 ||
        write(ready.Get(), "m", 1) != 1) {
        _exit(1);
    }
    ready = ScopedFd();
    _exit(fuse_loop(server) == 0 ? 0 : 1);
}
} // namespace

FakeDriver::FakeDriver(const std::string &name, bool hasPinInterface)
    : skipReason(PrivateWorldEnter()), devicePath(std::string(kWorldPath) + "/" + name + kFile),
      mountPath_(std::string(kWorldPath) + "/" + name) {
    if (skipReason.empty() && access("/dev/fuse", R_OK | W_OK) != 0) {
        skipReason = "needs FUSE";
    }
    if (skipReason.empty() && getenv("VESK_USER_EMULATION") != nullptr) {
        skipReason = "user-mode emulation refuses the driver's requests before they get anywhere";
    }
    std::array<int, 2> ready = {-1, -1};
    if (!skipReason.empty() || pipe(ready.data()) != 0) {
        return;
    }
    ScopedFd readEnd(ready[0]);
    ScopedFd writeEnd(ready[1]);
    std::filesystem::create_directory(mountPath_);
    server_ = fork();
    if (server_ == 0) {
        readEnd = ScopedFd();
        Serve(mountPath_, hasPinInterface, std::move(writeEnd));
    }
    writeEnd = ScopedFd();
    char byte = 0;
    if (read(readEnd.Get(), &byte, 1) != 1) {
        skipReason = "FUSE does not mount here";
    }
}

FakeDriver::~FakeDriver() {
    if (server_ < 0) {
        return;
    }
    if (skipReason.empty()) {
        EXPECT_EQ(umount2(mountPath_.c_str(), 0), 0) << std::strerror(errno);
    }
    int status = 0;
    EXPECT_EQ(waitpid(server_, &status, 0), server_);
}
} // namespace vesk
