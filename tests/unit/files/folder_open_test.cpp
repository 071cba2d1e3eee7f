#include "files/folder_open.h"

#include "tests/support/test_volume.h"

#include <gtest/gtest.h>

#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>

#include <cerrno>
#include <cstddef>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <iterator>
#include <thread>

namespace vesk {
namespace {
// Runs `body` in a thread in which openat2 fails with this error. False: no filters here.
bool RunWithoutOpenat2(int error, const std::function<void()> &body) {
    sock_filter code[] = {
        BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
        BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, SYS_openat2, 0, 1),
        BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | static_cast<uint32_t>(error)),
        BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW)};
    const sock_fprog program = {static_cast<unsigned short>(std::size(code)), code};
    bool isFiltered = false;
    std::thread([&] {
        isFiltered = prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
                     prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) == 0;
        if (isFiltered) {
            body();
        }
    }).join();
    return isFiltered;
}

std::pair<dev_t, ino_t> IdentityOf(const std::string &path) {
    struct stat status = {};
    EXPECT_EQ(stat(path.c_str(), &status), 0) << path;
    return {status.st_dev, status.st_ino};
}

std::pair<dev_t, ino_t> IdentityOf(const ScopedFd &folder) {
    struct stat status = {};
    EXPECT_EQ(fstat(folder.Get(), &status), 0);
    return {status.st_dev, status.st_ino};
}

// A filesystem at <folder>/volume, with a link to it beside it.
class FolderOpen : public testing::Test {
protected:
    void SetUp() override {
        const std::string missing = PrivateWorldEnter();
        if (!missing.empty()) {
            GTEST_SKIP() << missing;
        }
        std::filesystem::create_directory(top);
        ASSERT_EQ(mount("none", top.c_str(), "tmpfs", 0, nullptr), 0);
        device = IdentityOf(top).first;
        std::filesystem::create_directories(top + "/a/b");
        std::filesystem::create_directory(top + "/other");
        std::filesystem::create_directory_symlink("../other", top + "/a/link");
        std::filesystem::create_directory_symlink(top + "/other", top + "/absolute");
        std::filesystem::create_directory_symlink("/proc/self/root" + top, top + "/magic");
        std::filesystem::create_directory_symlink("volume", folder.Path("link to volume"));
        std::filesystem::create_directory_symlink("volume/a", folder.Path("link into volume"));
        folder.FileMake("volume/file", "text");
    }
    void TearDown() override { umount2(top.c_str(), MNT_DETACH); }

    void ExpectOpens(const std::string &path, const std::string &same) const {
        const ScopedFd opened = FolderOpenOnDevice(path, device);
        ASSERT_TRUE(opened.IsOpen()) << path;
        EXPECT_EQ(IdentityOf(opened), IdentityOf(same)) << path;
        EXPECT_EQ(fcntl(opened.Get(), F_GETFL) & O_ACCMODE, O_RDONLY);
        EXPECT_EQ(fcntl(opened.Get(), F_GETFL) & O_PATH, 0) << "can be listed";
        EXPECT_NE(fcntl(opened.Get(), F_GETFD) & FD_CLOEXEC, 0);
    }
    void ExpectWhatIsOpened() const {
        ExpectOpens(top, top);
        ExpectOpens(top + "/", top);
        ExpectOpens(top + "/a/b", top + "/a/b");
        ExpectOpens(top + "//a/./b//", top + "/a/b");
        ExpectOpens(top + "/a/../other", top + "/other");
        ExpectOpens(top + "/a/b/../..", top);
        ExpectOpens(folder.Path("link to volume"), top);
        ExpectOpens(folder.Path("link to volume/a/b"), top + "/a/b");
    }
    void ExpectWhatIsRefused() const {
        for (const char *path :
             {"/a/link", "/a/link/.", "/absolute", "/magic", "/magic/a", "/file", "/missing",
              "/a/missing/..", "/file/..", "/../volume/a", "/a/../../volume", "/a/link/../other"}) {
            EXPECT_FALSE(FolderOpenOnDevice(top + path, device).IsOpen()) << path;
        }
    }

    const TestFolder folder;
    const std::string top = folder.Path("volume");
    dev_t device = 0;
};

TEST_F(FolderOpen, OpensFoldersOfTheVolume) {
    ExpectWhatIsOpened();
}

TEST_F(FolderOpen, FollowsNoLinkInsideTheVolume) {
    ExpectWhatIsRefused();
}

TEST_F(FolderOpen, DoesTheSameWhereTheCallIsMissing) {
    for (const int error : {ENOSYS, EPERM}) {
        bool ran = false;
        const bool isFiltered = RunWithoutOpenat2(error, [&] {
            ran = true;
            EXPECT_EQ(syscall(SYS_openat2, -1, nullptr, nullptr, 0), -1);
            EXPECT_EQ(errno, error);
            ExpectWhatIsOpened();
            ExpectWhatIsRefused();
        });
        if (!isFiltered) {
            GTEST_SKIP() << "no filters of system calls here";
        }
        EXPECT_TRUE(ran);
    }
}

TEST_F(FolderOpen, StepwiseIsTheSame) {
    const ScopedFd opened(open(top.c_str(), O_PATH | O_CLOEXEC));
    for (const char *path : {"", ".", "a", "a/b", "a//b/", "a/../other", "/a"}) {
        const ScopedFd stepped = FolderOpenStepwise(opened.Get(), path);
        ASSERT_TRUE(stepped.IsOpen()) << path;
        EXPECT_EQ(IdentityOf(stepped), IdentityOf(top + "/" + path)) << path;
    }
    for (const char *path : {"..", "a/../..", "a/link", "absolute", "magic", "file", "missing"}) {
        EXPECT_FALSE(FolderOpenStepwise(opened.Get(), path).IsOpen()) << path;
    }
}

TEST_F(FolderOpen, OnlyThroughTheMountPoint) {
    EXPECT_FALSE(FolderOpenOnDevice(folder.Path("link into volume"), device).IsOpen());
    EXPECT_FALSE(FolderOpenOnDevice(folder.Path("link into volume/b"), device).IsOpen());
    EXPECT_FALSE(FolderOpenOnDevice(folder.Path(), device).IsOpen()) << "another filesystem";
    EXPECT_FALSE(FolderOpenOnDevice("/", device).IsOpen());
    EXPECT_FALSE(FolderOpenOnDevice("", device).IsOpen());
    EXPECT_FALSE(FolderOpenOnDevice("volume", device).IsOpen());
}

TEST_F(FolderOpen, OfTheRootFilesystem) {
    if (getenv("VESK_USER_EMULATION") != nullptr) {
        GTEST_SKIP() << "the emulator has a root folder of its own for some calls";
    }
    const auto [root, inode] = IdentityOf("/");
    EXPECT_EQ(IdentityOf(FolderOpenOnDevice("/", root)), (std::pair<dev_t, ino_t>{root, inode}));
}

// What the administrator mounts below the volume is part of it.
TEST_F(FolderOpen, CrossesMountPoints) {
    ASSERT_EQ(mount((top + "/a").c_str(), (top + "/other").c_str(), nullptr, MS_BIND, nullptr), 0);
    ExpectOpens(top + "/other/b", top + "/a/b");
}

TEST_F(FolderOpen, LeavesOtherFilesystemsAlone) {
    ASSERT_EQ(mount("none", (top + "/other").c_str(), "tmpfs", 0, nullptr), 0);
    std::filesystem::create_directory(top + "/other/b");
    EXPECT_FALSE(FolderOpenOnDevice(top + "/other", device).IsOpen());
    EXPECT_FALSE(FolderOpenOnDevice(top + "/other/b", device).IsOpen());
    EXPECT_FALSE(FolderOpenOnDevice(top + "/other/../a", device).IsOpen());
}

TEST_F(FolderOpen, OpensAFileButNothingMountedOnIt) {
    const ScopedFd opened(open(top.c_str(), O_PATH | O_CLOEXEC));
    EXPECT_TRUE(FileOpenInFolder(opened.Get(), "file").IsOpen());
    EXPECT_FALSE(FileOpenInFolder(opened.Get(), "absolute").IsOpen()) << "a link";
    EXPECT_FALSE(FileOpenInFolder(opened.Get(), "missing").IsOpen());
    RunWithoutOpenat2(ENOSYS, [&] {
        EXPECT_TRUE(FileOpenInFolder(opened.Get(), "file").IsOpen());
        EXPECT_FALSE(FileOpenInFolder(opened.Get(), "absolute").IsOpen());
    });
    if (syscall(SYS_openat2, -1, nullptr, nullptr, 0) < 0 && errno == ENOSYS) {
        GTEST_SKIP() << "no openat2 here";
    }
    const std::string mounted = folder.FileMake("mounted", "text");
    ASSERT_EQ(mount(mounted.c_str(), (top + "/file").c_str(), nullptr, MS_BIND, nullptr), 0);
    EXPECT_FALSE(FileOpenInFolder(opened.Get(), "file").IsOpen());
}
} // namespace
} // namespace vesk
