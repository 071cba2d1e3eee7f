// The daemon itself, through the kernel.
#include "base/deleter.h"
#include "cachedev/driver_requests.h"
#include "tests/support/test_device.h"
#include "tests/unit/cachedev/private_world.h"
#include "tests/unit/cachedev/test_daemon.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <dirent.h>
#include <memory>
#include <sys/ioctl.h>
#include <sys/mman.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
bool IsFolderEmpty() {
    const std::unique_ptr<DIR, Deleter<closedir>> folder(opendir(kDaemonFolder));
    int entries = 0;
    while (folder && readdir(folder.get()) != nullptr) {
        ++entries;
    }
    return entries == 2;
}

void ExpectReadOnly(const char *path) {
    for (const int flags : {O_RDWR, O_WRONLY, O_WRONLY | O_APPEND}) {
        EXPECT_EQ(open(path, flags), -1) << path << " " << flags;
        EXPECT_EQ(errno, EACCES) << path << " " << flags;
    }
    EXPECT_EQ(open(path, O_RDONLY | O_TRUNC), -1) << path;
    EXPECT_NE(truncate(path, 0), 0) << path;
    EXPECT_NE(unlink(path), 0) << path;
    const ScopedFd file = TestOpen(path, O_RDONLY);
    EXPECT_EQ(ioctl(file.Get(), kRequestUnpinAll), -1) << path;
    EXPECT_EQ(errno, ENOTTY) << path;
}

constexpr size_t kClients = 4;

// How many rounds each client has done, in memory that they share with the test.
struct Rounds {
    using Count = std::atomic<unsigned>;
    Count *done = static_cast<Count *>(mmap(nullptr, kClients * sizeof(Count),
                                            PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1,
                                            0)); // all 0
    Rounds() = default;
    ~Rounds() { munmap(done, kClients * sizeof(Count)); }
    Rounds(const Rounds &) = delete;
    Rounds &operator=(const Rounds &) = delete;
};

[[noreturn]] void UseDaemonWithoutEnd(uint8_t bitmapByte, Rounds::Count &rounds) {
    const ScopedFd device = TestOpen(kDaemonDevice, O_RDWR | O_DIRECT);
    const std::vector<uint8_t> bitmap(128, bitmapByte);
    for (unsigned i = 0;; ++i) {
        DaemonSetBitmap(bitmap);
        TestReadAt(device.Get(), (i * 37 % 1000) * kBlockBytes, 8 * kBlockBytes);
        DaemonRequest(kRequestUnpinAll, nullptr);
        ++rounds;
    }
}

// Attaches a loop device to the daemon's; its path, empty where there is none to be had.
std::string AttachLoop() {
    if (DaemonCommand({"losetup", "--find", "--show", kDaemonDevice}) != 0) {
        return "";
    }
    const std::string output = DaemonOutput();
    return output.substr(0, output.find('\n'));
}

// Mounts it at /run/m and detaches it while it is mounted: the kernel lets go of it with the mount,
// whatever ends this test.
void MountAndDetach(const std::string &loop, const std::string &options) {
    EXPECT_EQ(DaemonCommand({"mount", "-o", options, loop, "/run/m"}), 0) << DaemonErrors();
    EXPECT_EQ(DaemonCommand({"losetup", "-d", loop}), 0) << DaemonErrors();
}
} // namespace

TEST(CachedevDaemonTest, ServesReadsAndWritesThroughTheCache) {
    RunInPrivateWorld([] {
        constexpr uint64_t kBytes = 40 * kBlockBytes + 4096;
        ASSERT_NO_FATAL_FAILURE(DaemonStartFresh(kBytes, 4, {"--pid-file", "/run/pid"}));
        EXPECT_EQ(ReadWhole("/run/pid"), std::to_string(DaemonPid()) + "\n");
        struct stat status = {};
        ASSERT_EQ(stat(kDaemonDevice, &status), 0);
        EXPECT_EQ(static_cast<uint64_t>(status.st_size), kBytes);
        EXPECT_EQ(status.st_mode, S_IFREG | 0600U);
        for (const char *path : {kDaemonState, kDaemonCached}) {
            ASSERT_EQ(stat(path, &status), 0);
            EXPECT_EQ(status.st_mode, S_IFREG | 0444U);
        }
        uint64_t size = 0;
        EXPECT_EQ(DaemonRequest(kRequestGetSize64Bit, &size), 0);
        EXPECT_EQ(size, kBytes);

        for (const int flags : {0, O_DIRECT}) {
            const ScopedFd device = TestOpen(kDaemonDevice, O_RDWR | flags);
            ASSERT_TRUE(device.IsOpen());
            EXPECT_TRUE(TestReadAt(device.Get(), 0, kBytes) == TestBytes(0, kBytes));
            EXPECT_TRUE(TestReadAt(device.Get(), 3 * kBlockBytes + 512, 1024) ==
                        TestBytes(3 * kBlockBytes + 512, 1024));
            EXPECT_EQ(TestReadAt(device.Get(), kBytes - 512, 4096), TestBytes(kBytes - 512, 512));
            EXPECT_EQ(TestReadAt(device.Get(), kBytes, 512), "");
            EXPECT_EQ(fsync(device.Get()), 0);
        }
        const ScopedFd device = TestOpen(kDaemonDevice);
        const std::string text = "written through";
        ASSERT_EQ(pwrite(device.Get(), text.data(), text.size(), 40 * 65536 + 5),
                  static_cast<ssize_t>(text.size()));
        EXPECT_EQ(TestReadAt(device.Get(), 40 * kBlockBytes + 5, text.size()), text);
        EXPECT_EQ(ReadWhole(kDaemonBacking).substr(40 * kBlockBytes + 5, text.size()), text);
        EXPECT_EQ(pwrite(device.Get(), "x", 1, kBytes), -1);
        EXPECT_EQ(errno, ENOSPC);
        EXPECT_EQ(pwrite(device.Get(), "xyz", 3, kBytes - 1), 1);

        const Json::Value state = DaemonState();
        EXPECT_EQ(state["cachedBlocks"].asInt(), 4);
        EXPECT_EQ(state["hits"], state["ssdReads"]);
        EXPECT_EQ(state["misses"], state["backingReads"]);
        EXPECT_EQ(DaemonState(), state); // watching changes nothing
        EXPECT_EQ(DaemonStop(), 0);
        EXPECT_TRUE(IsFolderEmpty());
        EXPECT_NE(access("/run/pid", F_OK), 0);
    });
}

TEST(CachedevDaemonTest, KeepsItsShape) {
    RunInPrivateWorld([] {
        ASSERT_NO_FATAL_FAILURE(DaemonStartFresh(kBlockBytes, 1));
        EXPECT_EQ(open(kDaemonDevice, O_RDWR | O_TRUNC), -1);
        EXPECT_EQ(open("/run/vesk/new", O_RDWR | O_CREAT, 0600), -1);
        EXPECT_NE(unlink(kDaemonDevice), 0);
        EXPECT_NE(truncate(kDaemonDevice, 0), 0);
        EXPECT_NE(truncate(kDaemonDevice, 655360), 0);
        EXPECT_EQ(truncate(kDaemonDevice, 65536), 0);
        struct stat status = {};
        ASSERT_EQ(stat(kDaemonDevice, &status), 0);
        EXPECT_EQ(static_cast<uint64_t>(status.st_size), kBlockBytes);
        EXPECT_EQ(DaemonRequest(0x1234, nullptr), ENOTTY);
        for (const char *path : {kDaemonState, kDaemonCached}) {
            ExpectReadOnly(path);
        }
        EXPECT_EQ(DaemonStop(), 0);
    });
}

TEST(CachedevDaemonTest, PinnedBlocksSurviveAScan) {
    RunInPrivateWorld([] {
        ASSERT_NO_FATAL_FAILURE(DaemonStartFresh(64 * kBlockBytes, 8));
        std::vector<uint8_t> bitmap(8);
        bitmap[1] = 0x03; // blocks 8 and 9
        EXPECT_EQ(DaemonQuery(kRequestQueryBitmapSet), 0);
        EXPECT_EQ(DaemonSetBitmap(std::vector<uint8_t>(7)), EINVAL);
        EXPECT_EQ(DaemonRequest(kRequestSetBitmap, nullptr), EFAULT);
        EXPECT_EQ(DaemonRequest(kRequestUnpinRanges, nullptr), EFAULT);
        EXPECT_EQ(DaemonSetBitmap(bitmap), 0);
        EXPECT_EQ(DaemonQuery(kRequestQueryBitmapSet), 1);
        EXPECT_EQ(DaemonQuery(kRequestQueryAllUnpinned), 1);
        const ScopedFd device = TestOpen(kDaemonDevice, O_RDWR | O_DIRECT);
        TestReadAt(device.Get(), 8 * kBlockBytes, 4096);
        TestReadAt(device.Get(), 0, 64 * kBlockBytes);
        EXPECT_EQ(DaemonStateText("bitmapBits"), "[[8,2]]");
        EXPECT_EQ(DaemonStateText("pinned"), "[[8,2]]");
        EXPECT_EQ(DaemonQuery(kRequestQueryAllUnpinned), 0);
        const uint64_t before = DaemonState()["ssdReads"].asUInt64();
        EXPECT_EQ(TestReadAt(device.Get(), 8 * kBlockBytes, 2 * kBlockBytes),
                  TestBytes(8 * kBlockBytes, 2 * kBlockBytes));
        EXPECT_EQ(DaemonState()["ssdReads"].asUInt64(), before + 2);
        std::vector<SectorRange> ranges(kRangeListRecords);
        ranges[0] = {9 * kBlockSectors - 1, 1};
        EXPECT_EQ(DaemonRequest(kRequestUnpinRanges, ranges.data()), 0);
        EXPECT_EQ(DaemonStateText("pinned"), "[[9,1]]");
        EXPECT_EQ(DaemonRequest(kRequestUnpinAll, nullptr), 0);
        EXPECT_EQ(DaemonStateText("pinned"), "[]");
        EXPECT_EQ(DaemonQuery(kRequestQueryBitmapSet), 0);
        // The size asked for as a 32-bit program does: 4 bytes announced, 8 written.
        uint64_t size = UINT64_MAX;
        EXPECT_EQ(DaemonRequest(kRequestGetSize32Bit, &size), 0);
        EXPECT_EQ(size, 64 * kBlockBytes);
        EXPECT_EQ(DaemonState()["ioctls"]["refused"].asInt(), 3);
        EXPECT_EQ(DaemonStop(), 0);
    });
}

TEST(CachedevDaemonTest, OutlivesClientsThatDieInTheMiddle) {
    RunInPrivateWorld([] {
        ASSERT_NO_FATAL_FAILURE(DaemonStartFresh(1024 * kBlockBytes, 16));
        Rounds rounds;
        std::vector<pid_t> clients;
        for (size_t client = 0; client < kClients; ++client) {
            const pid_t process = fork();
            ASSERT_GE(process, 0);
            if (process == 0) {
                UseDaemonWithoutEnd(static_cast<uint8_t>(client), rounds.done[client]);
            }
            clients.push_back(process);
        }
        for (size_t client = 0; client < kClients; ++client) {
            while (rounds.done[client] < 5) {
                usleep(1000);
            }
        }
        for (const pid_t client : clients) {
            EXPECT_EQ(kill(client, SIGKILL), 0);
            EXPECT_EQ(DaemonAwaitEnd(client), -SIGKILL);
        }
        const ScopedFd device = TestOpen(kDaemonDevice);
        EXPECT_TRUE(TestReadAt(device.Get(), 0, 64 * kBlockBytes) ==
                    TestBytes(0, 64 * kBlockBytes));
        EXPECT_EQ(DaemonRequest(kRequestUnpinAll, nullptr), 0);
        EXPECT_EQ(DaemonStateText("cachedBlocks"), "16");
        EXPECT_EQ(DaemonStop(), 0);
    });
}

TEST(CachedevDaemonTest, CarriesAFilesystem) {
    RunInPrivateWorld([] {
        if (access("/sbin/mkfs.ext4", X_OK) != 0 || access("/dev/loop-control", R_OK) != 0) {
            SkipWorld("needs mkfs.ext4 and loop devices");
        }
        constexpr uint64_t kBytes = 256 * kBlockBytes;
        TestMakeFile(kDaemonBacking, kBytes);
        TestMakeFile(kDaemonSsd, 16 * kBlockBytes);
        ASSERT_EQ(DaemonStart(), 0) << DaemonErrors();
        ASSERT_EQ(access(kDaemonDevice, F_OK), 0);
        const std::string loop = AttachLoop();
        if (loop.empty()) {
            SkipWorld("no free loop device");
        }
        EXPECT_EQ(mkdir("/run/m", 0755), 0);
        EXPECT_EQ(DaemonCommand({"mkfs.ext4", "-q", "-F", "-b", "4096", loop}), 0)
            << DaemonErrors();
        MountAndDetach(loop, "rw");
        const std::string content = TestBytes(0, 3000000);
        WriteWhole("/run/m/file", content);
        EXPECT_EQ(umount("/run/m"), 0);
        EXPECT_GT(DaemonState()["writes"].asInt(), 40);
        const std::string again = AttachLoop();
        ASSERT_NE(again, "") << DaemonErrors();
        MountAndDetach(again, "ro");
        const uint64_t misses = DaemonState()["misses"].asUInt64();
        EXPECT_TRUE(ReadWhole("/run/m/file") == content);
        EXPECT_GE(DaemonState()["misses"].asUInt64(), misses + 3000000 / kBlockBytes);
        EXPECT_EQ(umount("/run/m"), 0);
        EXPECT_EQ(DaemonStop(), 0);
    });
}

TEST(CachedevDaemonTest, EndsWhenTheFolderIsUnmounted) {
    RunInPrivateWorld([] {
        ASSERT_NO_FATAL_FAILURE(DaemonStartFresh(kBlockBytes, 1));
        const pid_t daemon = DaemonPid();
        ASSERT_GT(daemon, 0);
        ASSERT_EQ(umount(kDaemonFolder), 0);
        EXPECT_EQ(DaemonAwaitEnd(daemon), 0);
        EXPECT_EQ(DaemonStart(), 0) << DaemonErrors(); // and may begin again at once
        EXPECT_EQ(DaemonStop(), 0);
    });
}

TEST(CachedevDaemonTest, TellsWhatALeftOverMountPointIs) {
    RunInPrivateWorld([] {
        ASSERT_NO_FATAL_FAILURE(DaemonStartFresh(kBlockBytes, 1));
        EXPECT_EQ(DaemonEnd(SIGKILL), -SIGKILL);
        EXPECT_EQ(DaemonStart(), 1);
        EXPECT_NE(DaemonErrors().find("umount /run/vesk"), std::string::npos) << DaemonErrors();
        EXPECT_EQ(umount(kDaemonFolder), 0);
        EXPECT_EQ(DaemonStart(), 0) << DaemonErrors();
        EXPECT_EQ(DaemonStop(), 0);
    });
}

TEST(CachedevDaemonTest, RefusesToStart) {
    RunInPrivateWorld([] {
        TestMakeFile(kDaemonBacking, kBlockBytes);
        TestMakeFile(kDaemonSsd, kBlockBytes - 1);
        EXPECT_EQ(DaemonStart(), 1);
        EXPECT_NE(DaemonErrors().find("smaller than one cache block"), std::string::npos)
            << DaemonErrors();
        TestMakeFile(kDaemonSsd, kBlockBytes);
        EXPECT_EQ(unlink(kDaemonBacking), 0);
        EXPECT_EQ(DaemonStart(), 1);
        EXPECT_NE(DaemonErrors().find("No such file"), std::string::npos) << DaemonErrors();
        TestMakeFile(kDaemonBacking, kBlockBytes);
        EXPECT_EQ(mkdir(kDaemonFolder, 0755), 0);
        WriteWhole("/run/vesk/precious", "x");
        EXPECT_EQ(DaemonStart(), 1);
        EXPECT_NE(DaemonErrors().find("not empty"), std::string::npos) << DaemonErrors();
        EXPECT_EQ(unlink("/run/vesk/precious"), 0);
        EXPECT_EQ(mount("t", kDaemonFolder, "tmpfs", 0, nullptr), 0);
        EXPECT_EQ(DaemonStart(), 1);
        EXPECT_NE(DaemonErrors().find("mount point already"), std::string::npos) << DaemonErrors();
        EXPECT_EQ(umount(kDaemonFolder), 0);
        EXPECT_EQ(mount("t", "/dev", "tmpfs", 0, nullptr), 0); // no /dev/fuse
        EXPECT_EQ(DaemonStart(), 1);
        EXPECT_NE(DaemonErrors().find("cannot mount"), std::string::npos) << DaemonErrors();
    });
}

TEST(CachedevDaemonTest, WritesItsProcessIdIntoNobodyElsesFile) {
    RunInPrivateWorld([] {
        TestMakeFile(kDaemonBacking, kBlockBytes);
        TestMakeFile(kDaemonSsd, kBlockBytes);
        WriteWhole("/run/victim", "precious");
        // Where everybody writes, the kernel may refuse some of it before the daemon can.
        ASSERT_EQ(mkdir("/run/own", 0755), 0);
        const auto refused = [] {
            EXPECT_EQ(DaemonStart({"--pid-file", "/run/own/pid"}), 1);
            EXPECT_EQ(
                DaemonErrors(),
                "veskcachedev: cannot write /run/own/pid: it is a link or no file of root's\n");
            EXPECT_EQ(ReadWhole("/run/victim"), "precious");
            EXPECT_EQ(unlink("/run/own/pid"), 0); // still there
        };
        EXPECT_EQ(symlink("/run/victim", "/run/own/pid"), 0);
        refused();
        EXPECT_EQ(symlink("/run/nowhere", "/run/own/pid"), 0);
        refused();
        EXPECT_NE(access("/run/nowhere", F_OK), 0);
        EXPECT_EQ(link("/run/victim", "/run/own/pid"), 0);
        refused();
        EXPECT_EQ(mkfifo("/run/own/pid", 0666), 0);
        refused();
        WriteWhole("/run/own/pid", "another user's");
        EXPECT_EQ(chown("/run/own/pid", 1234, 1234), 0);
        refused();
        WriteWhole("/run/own/pid", "what an earlier daemon has left");
        ASSERT_EQ(DaemonStart({"--pid-file", "/run/own/pid"}), 0) << DaemonErrors();
        EXPECT_EQ(ReadWhole("/run/own/pid"), std::to_string(DaemonPid()) + "\n");
        EXPECT_EQ(DaemonStop(), 0);
    });
}

TEST(CachedevDaemonTest, OrderedFaults) {
    RunInPrivateWorld([] {
        ASSERT_NO_FATAL_FAILURE(DaemonStartFresh(
            4 * kBlockBytes, 2,
            {"--fail-ioctl", "0xFED1:5", "--fail-read", "70000:61", "--short-at", "200000"}));
        EXPECT_EQ(DaemonRequest(kRequestUnpinAll, nullptr), EIO);
        const ScopedFd device = TestOpen(kDaemonDevice);
        EXPECT_EQ(TestReadAt(device.Get(), 69000, 1000).size(), 1000U);
        EXPECT_EQ(TestReadAt(device.Get(), 69000, 1001), "error 61");
        EXPECT_EQ(TestReadAt(device.Get(), 199000, 2000).size(), 1000U);
        EXPECT_EQ(TestReadAt(device.Get(), 200000, 1).size(), 0U);
        EXPECT_EQ(DaemonStop(), 0);
    });
}
} // namespace vesk
