#include "tests/support/test_volume.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <linux/loop.h>
#include <sched.h>
#include <spawn.h>
#include <sys/ioctl.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>

namespace vesk {
namespace {
constexpr int kNoSuchCommand = 127;

std::string WorldMake() {
    if (geteuid() != 0) {
        return "needs root";
    }
    if (unshare(CLONE_NEWNS) != 0) {
        return std::string("needs a private mount namespace: ") + std::strerror(errno);
    }
    if (mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0 ||
        mount("none", kWorldPath, "tmpfs", 0, nullptr) != 0) {
        return std::string("needs to mount: ") + std::strerror(errno);
    }
    return {};
}

// Why loop devices cannot be used; empty: they can.
std::string LoopProbe() {
    const ScopedFd control(open("/dev/loop-control", O_RDWR | O_CLOEXEC));
    const int number = control.IsOpen() ? ioctl(control.Get(), LOOP_CTL_GET_FREE) : -1;
    const std::string path = "/dev/loop" + std::to_string(number);
    const ScopedFd loop(number < 0 ? -1 : open(path.c_str(), O_RDWR | O_CLOEXEC));
    return loop.IsOpen() ? "" : "needs loop devices";
}

// btrfs does not show its device's number, but every filesystem shows what was mounted.
std::string MountSource(const std::string &mountPath) {
    std::string output;
    CommandRun({"findmnt", "-n", "-o", "SOURCE", "--mountpoint", mountPath}, output);
    return output.substr(0, output.find('\n'));
}

std::string UuidMake() {
    std::string uuid;
    std::ifstream("/proc/sys/kernel/random/uuid") >> uuid;
    return uuid;
}

std::vector<std::string> WordsOf(const std::string &text) {
    std::istringstream stream(text);
    return {std::istream_iterator<std::string>(stream), {}};
}

// Starts the command with both outputs into the pipe's end; its process or a negative errno.
pid_t CommandStart(std::vector<std::string> command, int output) {
    std::vector<char *> words;
    for (std::string &word : command) {
        words.push_back(word.data());
    }
    words.push_back(nullptr);
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, output, STDOUT_FILENO);
    posix_spawn_file_actions_adddup2(&actions, output, STDERR_FILENO);
    pid_t child = -1;
    const int error = posix_spawnp(&child, words[0], &actions, nullptr, words.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    return error == 0 ? child : -error;
}
} // namespace

std::string PrivateWorldEnter() {
    static const std::string reason = WorldMake();
    return reason;
}

int CommandRun(const std::vector<std::string> &command, std::string &output) {
    output.clear();
    std::array<int, 2> ends = {-1, -1};
    if (pipe2(ends.data(), O_CLOEXEC) != 0) {
        return -1;
    }
    const pid_t child = CommandStart(command, ends[1]);
    close(ends[1]);
    std::array<char, 4096> buffer = {};
    for (ssize_t count = 0; (count = read(ends[0], buffer.data(), buffer.size())) > 0;) {
        output.append(buffer.data(), static_cast<size_t>(count));
    }
    close(ends[0]);
    int status = 0;
    if (child < 0 || waitpid(child, &status, 0) != child) {
        return child == -ENOENT ? kNoSuchCommand : -1;
    }
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

TestVolume::TestVolume(const std::string &name, const std::string &mkfs, uint64_t imageBytes)
    : skipReason(PrivateWorldEnter()), uuid(UuidMake()),
      mountPath(std::string(kWorldPath) + "/" + name), imagePath(mountPath + ".image") {
    if (skipReason.empty()) {
        skipReason = LoopProbe();
    }
    if (!skipReason.empty()) {
        return;
    }
    std::filesystem::create_directory(mountPath);
    std::ofstream(imagePath).flush();
    std::filesystem::resize_file(imagePath, imageBytes);
    const std::string place = "%UUID%";
    std::string command = mkfs;
    if (const size_t at = command.find(place); at != std::string::npos) {
        command.replace(at, place.size(), uuid);
    }
    Mount(command);
}

void TestVolume::Mount(const std::string &mkfs) {
    std::vector<std::string> command = WordsOf(mkfs);
    command.push_back(imagePath);
    std::string output;
    const int formatted = CommandRun(command, output);
    if (formatted == kNoSuchCommand) {
        skipReason = "needs " + command[0];
        return;
    }
    EXPECT_EQ(formatted, 0) << mkfs << ": " << output;
    // The loop device of "-o loop" goes with the mount.
    if (CommandRun({"mount", "-n", "-o", "loop", imagePath, mountPath}, output) != 0) {
        skipReason = "cannot mount: " + output;
        EXPECT_NE(output.find("unknown filesystem type"), std::string::npos) << output;
        return;
    }
    device = MountSource(mountPath);
    EXPECT_EQ(device.compare(0, 9, "/dev/loop"), 0) << device;
}

TestVolume::~TestVolume() {
    Unmount();
    std::error_code ignored;
    std::filesystem::remove(imagePath, ignored);
}

void TestVolume::Unmount() {
    if (!device.empty()) {
        EXPECT_EQ(umount2(mountPath.c_str(), 0), 0) << std::strerror(errno);
        device.clear();
    }
}

TestFile::TestFile(const std::string &filePath)
    : path(filePath), fd(open(path.c_str(), O_RDWR | O_CREAT | O_TRUNC | O_CLOEXEC, 0600)) {
    EXPECT_TRUE(fd.IsOpen()) << path << ": " << std::strerror(errno);
}

void TestFile::Write(uint64_t offset, uint64_t length) {
    const std::vector<char> pattern = TestPattern(offset, length);
    EXPECT_EQ(pwrite(fd.Get(), pattern.data(), pattern.size(), static_cast<off_t>(offset)),
              static_cast<ssize_t>(length));
}

void TestFile::Fallocate(int mode, uint64_t offset, uint64_t length) {
    EXPECT_EQ(fallocate(fd.Get(), mode, static_cast<off_t>(offset), static_cast<off_t>(length)), 0)
        << std::strerror(errno);
}

void TestFile::Sync() {
    EXPECT_EQ(fsync(fd.Get()), 0) << std::strerror(errno);
}

uint64_t TestFile::Inode() const {
    struct stat status = {};
    EXPECT_EQ(fstat(fd.Get(), &status), 0);
    return status.st_ino;
}

std::vector<char> TestPattern(uint64_t offset, uint64_t length) {
    std::vector<char> pattern(static_cast<size_t>(length));
    for (uint64_t i = 0; i < length; ++i) {
        const uint64_t place = offset + i;
        pattern[static_cast<size_t>(i)] = static_cast<char>(place ^ (place >> 9) ^ (place >> 17));
    }
    return pattern;
}

TestFolder::TestFolder() : TempDir(PrivateWorldEnter().empty() ? kWorldPath : testing::TempDir()) {}
} // namespace vesk
