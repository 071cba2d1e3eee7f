// The daemon itself, as a script would use it, through the kernel.
#include "cachedev/caller_memory.h"
#include "cachedev/driver_requests.h"
#include "private_world.h"
#include "test_device.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <json/json.h>
#include <memory>
#include <sstream>
#include <sys/ioctl.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

namespace {

const char *const kFolder = "/run/vesk";
const char *const kDevice = "/run/vesk/cachedev_0";
const char *const kState = "/run/vesk/cachedev_0.json";
const char *const kBacking = "/run/backing.img";
const char *const kSsd = "/run/ssd.img";

struct Fd {
    int fd;
    explicit Fd(const char *path, int flags = O_RDWR) : fd(open(path, flags | O_CLOEXEC)) {}
    ~Fd() {
        if (fd >= 0)
            close(fd);
    }
    Fd(const Fd &) = delete;
    Fd &operator=(const Fd &) = delete;
};

// Runs a command; its exit status. Its standard error goes to /run/errors.
int Command(const std::string &command) {
    const int status = system((command + " 2>/run/errors").c_str());
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

std::string Errors() {
    return TestReadFile("/run/errors");
}

int Start(const std::string &more = "") {
    return Command(std::string(VESKCACHEDEV) + " --device " + kDevice + " --backing " + kBacking +
                   " --ssd " + kSsd + " " + more);
}

// Makes the images and starts the daemon.
void StartFresh(uint64_t deviceBytes, uint64_t slots, const std::string &more = "") {
    TestWriteFile(kBacking, TestBytes(0, static_cast<size_t>(deviceBytes)));
    TestMakeFile(kSsd, slots * kBlockBytes);
    ASSERT_EQ(Start(more), 0) << Errors();
}

Json::Value State() {
    Json::Value state;
    std::istringstream stream(TestReadFile(kState));
    std::string errors;
    EXPECT_TRUE(Json::parseFromStream(Json::CharReaderBuilder(), stream, &state, &errors))
        << errors;
    return state;
}

std::string StateText(const char *member) {
    Json::StreamWriterBuilder writer;
    writer["indentation"] = "";
    return Json::writeString(writer, State()[member]);
}

// In its world the daemon becomes a child of the test, being orphaned: its exit status.
int AwaitEnd(pid_t daemon) {
    int status = 0;
    EXPECT_EQ(waitpid(daemon, &status, 0), daemon);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
}

pid_t DaemonPid() {
    return State()["pid"].asInt();
}

int StopDaemon() {
    const pid_t daemon = DaemonPid();
    EXPECT_EQ(kill(daemon, SIGTERM), 0);
    return AwaitEnd(daemon);
}

bool IsFolderEmpty() {
    const std::unique_ptr<DIR, int (*)(DIR *)> folder(opendir(kFolder), closedir);
    int entries = 0;
    while (folder && readdir(folder.get()) != nullptr)
        ++entries;
    return entries == 2;
}

// The result of an ioctl on the device: 0 or an errno.
int Request(unsigned long number, const void *argument) {
    const Fd device(kDevice);
    return ioctl(device.fd, number, argument) < 0 ? errno : 0;
}

// The bitmap descriptor as a program of this word size passes it.
struct Descriptor {
    const void *bytes;
    uint32_t length;
};

int SetBitmap(const std::vector<uint8_t> &bitmap) {
    const Descriptor descriptor = {bitmap.data(), static_cast<uint32_t>(bitmap.size())};
    return Request(kRequestSetBitmap, &descriptor);
}

int Query(unsigned long number) {
    int answer = -1;
    const int error = Request(number, &answer);
    return error != 0 ? -error : answer;
}

std::string ReadAt(int fd, uint64_t offset, size_t size) {
    const size_t whole = (size / 4096 + 1) * 4096; // what aligned_alloc wants
    const std::unique_ptr<void, void (*)(void *)> buffer(aligned_alloc(4096, whole), free);
    const ssize_t got = pread(fd, buffer.get(), size, static_cast<off_t>(offset));
    return got < 0 ? "error " + std::to_string(errno)
                   : std::string(static_cast<const char *>(buffer.get()), static_cast<size_t>(got));
}

} // namespace

TEST(CachedevDaemonTest, ServesReadsAndWritesThroughTheCache) {
    RunInPrivateWorld([] {
        constexpr uint64_t kBytes = 40 * kBlockBytes + 4096;
        StartFresh(kBytes, 4, "--pid-file /run/pid");
        EXPECT_EQ(std::stoi(TestReadFile("/run/pid")), DaemonPid());
        struct stat status = {};
        ASSERT_EQ(stat(kDevice, &status), 0);
        EXPECT_EQ(static_cast<uint64_t>(status.st_size), kBytes);
        EXPECT_EQ(status.st_mode, S_IFREG | 0600U);
        ASSERT_EQ(stat(kState, &status), 0);
        EXPECT_EQ(status.st_mode, S_IFREG | 0444U);
        uint64_t size = 0;
        EXPECT_EQ(Request(kRequestGetSize64Bit, &size), 0);
        EXPECT_EQ(size, kBytes);

        for (const int flags : {0, O_DIRECT}) {
            const Fd device(kDevice, O_RDWR | flags);
            ASSERT_GE(device.fd, 0);
            EXPECT_TRUE(ReadAt(device.fd, 0, kBytes) == TestBytes(0, kBytes));
            EXPECT_TRUE(ReadAt(device.fd, 3 * kBlockBytes + 512, 1024) ==
                        TestBytes(3 * kBlockBytes + 512, 1024));
            EXPECT_EQ(ReadAt(device.fd, kBytes - 512, 4096), TestBytes(kBytes - 512, 512));
            EXPECT_EQ(ReadAt(device.fd, kBytes, 512), "");
            EXPECT_EQ(fsync(device.fd), 0);
        }
        const Fd device(kDevice);
        const std::string text = "written through";
        ASSERT_EQ(pwrite(device.fd, text.data(), text.size(), 40 * 65536 + 5),
                  static_cast<ssize_t>(text.size()));
        EXPECT_EQ(ReadAt(device.fd, 40 * kBlockBytes + 5, text.size()), text);
        EXPECT_EQ(TestReadFile(kBacking).substr(40 * kBlockBytes + 5, text.size()), text);
        EXPECT_EQ(pwrite(device.fd, "x", 1, kBytes), -1);
        EXPECT_EQ(errno, ENOSPC);
        EXPECT_EQ(pwrite(device.fd, "xyz", 3, kBytes - 1), 1);

        const Json::Value state = State();
        EXPECT_EQ(state["cachedBlocks"].asInt(), 4);
        EXPECT_EQ(state["hits"], state["ssdReads"]);
        EXPECT_EQ(state["misses"], state["backingReads"]);
        EXPECT_EQ(State(), state); // watching changes nothing
        EXPECT_EQ(StopDaemon(), 0);
        EXPECT_TRUE(IsFolderEmpty());
        EXPECT_NE(access("/run/pid", F_OK), 0);
    });
}

TEST(CachedevDaemonTest, KeepsItsShape) {
    RunInPrivateWorld([] {
        StartFresh(kBlockBytes, 1);
        EXPECT_EQ(open(kDevice, O_RDWR | O_TRUNC), -1);
        EXPECT_EQ(open(kState, O_RDWR), -1);
        EXPECT_EQ(open("/run/vesk/new", O_RDWR | O_CREAT, 0600), -1);
        EXPECT_NE(unlink(kDevice), 0);
        EXPECT_NE(truncate(kDevice, 0), 0);
        EXPECT_NE(truncate(kDevice, 10 * 65536), 0);
        EXPECT_NE(truncate(kState, 0), 0);
        EXPECT_EQ(truncate(kDevice, 65536), 0);
        struct stat status = {};
        ASSERT_EQ(stat(kDevice, &status), 0);
        EXPECT_EQ(static_cast<uint64_t>(status.st_size), kBlockBytes);
        EXPECT_EQ(Request(0x1234, nullptr), ENOTTY);
        const Fd state(kState, O_RDONLY);
        EXPECT_EQ(ioctl(state.fd, kRequestUnpinAll), -1);
        EXPECT_EQ(errno, ENOTTY);
        EXPECT_EQ(StopDaemon(), 0);
    });
}

TEST(CachedevDaemonTest, PinnedBlocksSurviveAScan) {
    RunInPrivateWorld([] {
        StartFresh(64 * kBlockBytes, 8);
        std::vector<uint8_t> bitmap(8);
        bitmap[1] = 0x03; // blocks 8 and 9
        EXPECT_EQ(Query(kRequestQueryBitmapSet), 0);
        EXPECT_EQ(SetBitmap(std::vector<uint8_t>(7)), EINVAL);
        EXPECT_EQ(Request(kRequestSetBitmap, nullptr), EFAULT);
        EXPECT_EQ(Request(kRequestUnpinRanges, nullptr), EFAULT);
        EXPECT_EQ(SetBitmap(bitmap), 0);
        EXPECT_EQ(Query(kRequestQueryBitmapSet), 1);
        EXPECT_EQ(Query(kRequestQueryAllUnpinned), 1);
        const Fd device(kDevice, O_RDWR | O_DIRECT);
        ReadAt(device.fd, 8 * kBlockBytes, 4096);
        ReadAt(device.fd, 0, 64 * kBlockBytes);
        EXPECT_EQ(StateText("bitmapBits"), "[[8,2]]");
        EXPECT_EQ(StateText("pinned"), "[[8,2]]");
        EXPECT_EQ(Query(kRequestQueryAllUnpinned), 0);
        const uint64_t before = State()["ssdReads"].asUInt64();
        EXPECT_EQ(ReadAt(device.fd, 8 * kBlockBytes, 2 * kBlockBytes),
                  TestBytes(8 * kBlockBytes, 2 * kBlockBytes));
        EXPECT_EQ(State()["ssdReads"].asUInt64(), before + 2);
        std::vector<SectorRange> ranges(kRangeListRecords);
        ranges[0] = {9 * kBlockSectors - 1, 1};
        EXPECT_EQ(Request(kRequestUnpinRanges, ranges.data()), 0);
        EXPECT_EQ(StateText("pinned"), "[[9,1]]");
        EXPECT_EQ(Request(kRequestUnpinAll, nullptr), 0);
        EXPECT_EQ(StateText("pinned"), "[]");
        EXPECT_EQ(Query(kRequestQueryBitmapSet), 0);
        // The size asked for as a 32-bit program does: 4 bytes announced, 8 written.
        uint64_t size = UINT64_MAX;
        EXPECT_EQ(Request(kRequestGetSize32Bit, &size), 0);
        EXPECT_EQ(size, 64 * kBlockBytes);
        EXPECT_EQ(State()["ioctls"]["refused"].asInt(), 3);
        EXPECT_EQ(StopDaemon(), 0);
    });
}

TEST(CachedevDaemonTest, OutlivesClientsThatDieInTheMiddle) {
    RunInPrivateWorld([] {
        StartFresh(1024 * kBlockBytes, 16);
        std::vector<pid_t> clients;
        for (int client = 0; client < 4; ++client) {
            clients.push_back(fork());
            if (clients.back() != 0)
                continue;
            const Fd device(kDevice, O_RDWR | O_DIRECT);
            const std::vector<uint8_t> bitmap(128, static_cast<uint8_t>(client));
            for (unsigned i = 0;; ++i) {
                SetBitmap(bitmap);
                ReadAt(device.fd, (i * 37 % 1000) * kBlockBytes, 8 * kBlockBytes);
                Request(kRequestUnpinAll, nullptr);
            }
        }
        usleep(200000);
        for (const pid_t client : clients) {
            kill(client, SIGKILL);
            EXPECT_EQ(AwaitEnd(client), -SIGKILL);
        }
        const Fd device(kDevice);
        EXPECT_TRUE(ReadAt(device.fd, 0, 64 * kBlockBytes) == TestBytes(0, 64 * kBlockBytes));
        EXPECT_EQ(Request(kRequestUnpinAll, nullptr), 0);
        EXPECT_EQ(StateText("cachedBlocks"), "16");
        EXPECT_EQ(StopDaemon(), 0);
    });
}

TEST(CachedevDaemonTest, CarriesAFilesystem) {
    RunInPrivateWorld([] {
        if (access("/sbin/mkfs.ext4", X_OK) != 0 || access("/dev/loop-control", R_OK) != 0)
            SkipWorld("needs mkfs.ext4 and loop devices");
        constexpr uint64_t kBytes = 256 * kBlockBytes;
        TestMakeFile(kBacking, kBytes);
        TestMakeFile(kSsd, 16 * kBlockBytes);
        ASSERT_EQ(Start(), 0) << Errors();
        const std::string attach = "losetup --find --show /run/vesk/cachedev_0 >/run/loop";
        if (Command(attach) != 0)
            SkipWorld("no free loop device");
        // Detached while mounted: the kernel lets go of it with the mount, whatever ends this test.
        EXPECT_EQ(Command("L=$(cat /run/loop); mkdir /run/m; mkfs.ext4 -q -F -b 4096 $L &&"
                          " mount $L /run/m; R=$?; losetup -d $L; exit $R"),
                  0)
            << Errors();
        const std::string content = TestBytes(0, 3000000);
        TestWriteFile("/run/m/file", content);
        EXPECT_EQ(umount("/run/m"), 0);
        EXPECT_GT(State()["writes"].asInt(), 40);
        EXPECT_EQ(Command(attach + " && L=$(cat /run/loop); mount -o ro $L /run/m;"
                                   " R=$?; losetup -d $L; exit $R"),
                  0)
            << Errors();
        const uint64_t misses = State()["misses"].asUInt64();
        EXPECT_TRUE(TestReadFile("/run/m/file") == content);
        EXPECT_GE(State()["misses"].asUInt64(), misses + 3000000 / kBlockBytes);
        EXPECT_EQ(umount("/run/m"), 0);
        EXPECT_EQ(StopDaemon(), 0);
    });
}

TEST(CachedevDaemonTest, EndsWhenTheFolderIsUnmounted) {
    RunInPrivateWorld([] {
        StartFresh(kBlockBytes, 1);
        const pid_t daemon = DaemonPid();
        EXPECT_EQ(umount(kFolder), 0);
        EXPECT_EQ(AwaitEnd(daemon), 0);
        EXPECT_EQ(Start(), 0) << Errors(); // and may begin again at once
        EXPECT_EQ(StopDaemon(), 0);
    });
}

TEST(CachedevDaemonTest, TellsWhatALeftOverMountPointIs) {
    RunInPrivateWorld([] {
        StartFresh(kBlockBytes, 1);
        const pid_t daemon = DaemonPid();
        EXPECT_EQ(kill(daemon, SIGKILL), 0);
        EXPECT_EQ(AwaitEnd(daemon), -SIGKILL);
        EXPECT_EQ(Start(), 1);
        EXPECT_NE(Errors().find("umount /run/vesk"), std::string::npos) << Errors();
        EXPECT_EQ(umount(kFolder), 0);
        EXPECT_EQ(Start(), 0) << Errors();
        EXPECT_EQ(StopDaemon(), 0);
    });
}

TEST(CachedevDaemonTest, RefusesToStart) {
    RunInPrivateWorld([] {
        TestMakeFile(kBacking, kBlockBytes);
        TestMakeFile(kSsd, kBlockBytes - 1);
        EXPECT_EQ(Start(), 1);
        EXPECT_NE(Errors().find("smaller than one cache block"), std::string::npos) << Errors();
        TestMakeFile(kSsd, kBlockBytes);
        EXPECT_EQ(unlink(kBacking), 0);
        EXPECT_EQ(Start(), 1);
        EXPECT_NE(Errors().find("No such file"), std::string::npos) << Errors();
        TestMakeFile(kBacking, kBlockBytes);
        EXPECT_EQ(mkdir(kFolder, 0755), 0);
        TestWriteFile("/run/vesk/precious", "x");
        EXPECT_EQ(Start(), 1);
        EXPECT_NE(Errors().find("not empty"), std::string::npos) << Errors();
        EXPECT_EQ(unlink("/run/vesk/precious"), 0);
        EXPECT_EQ(mount("t", kFolder, "tmpfs", 0, nullptr), 0);
        EXPECT_EQ(Start(), 1);
        EXPECT_NE(Errors().find("mount point already"), std::string::npos) << Errors();
        EXPECT_EQ(umount(kFolder), 0);
        EXPECT_EQ(mount("t", "/dev", "tmpfs", 0, nullptr), 0); // no /dev/fuse
        const int status =
            system((std::string(VESKCACHEDEV) + " --device " + kDevice + " --backing " + kBacking +
                    " --ssd " + kSsd + " >/run/output 2>&1")
                       .c_str());
        EXPECT_EQ(WEXITSTATUS(status), 1);
        EXPECT_NE(TestReadFile("/run/output").find("cannot mount"), std::string::npos);
    });
}

TEST(CachedevDaemonTest, OrderedFaults) {
    RunInPrivateWorld([] {
        StartFresh(4 * kBlockBytes, 2,
                   "--fail-ioctl 0xFED1:5 --fail-read 70000:61 --short-at 200000");
        EXPECT_EQ(Request(kRequestUnpinAll, nullptr), EIO);
        const Fd device(kDevice);
        EXPECT_EQ(ReadAt(device.fd, 69000, 1000).size(), 1000U);
        EXPECT_EQ(ReadAt(device.fd, 69000, 1001), "error 61");
        EXPECT_EQ(ReadAt(device.fd, 199000, 2000).size(), 1000U);
        EXPECT_EQ(ReadAt(device.fd, 200000, 1).size(), 0U);
        EXPECT_EQ(StopDaemon(), 0);
    });
}
