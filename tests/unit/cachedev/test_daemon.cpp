#include "tests/unit/cachedev/test_daemon.h"

#include "base/malloc_text.h"
#include "cachedev/driver_requests.h"
#include "tests/support/test_device.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <climits>
#include <csignal>
#include <cstdlib>
#include <memory>
#include <spawn.h>
#include <sstream>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

namespace vesk {
namespace {
constexpr const char *kOutput = "/run/output";
constexpr const char *kErrors = "/run/errors";

// The bitmap descriptor as a program of this word size passes it.
struct Descriptor {
    const void *bytes;
    uint32_t length;
};

// Where a command writes to.
struct OutputFiles {
    posix_spawn_file_actions_t actions;
    OutputFiles() {
        posix_spawn_file_actions_init(&actions);
        Add(STDOUT_FILENO, kOutput);
        Add(STDERR_FILENO, kErrors);
    }
    ~OutputFiles() { posix_spawn_file_actions_destroy(&actions); }
    OutputFiles(const OutputFiles &) = delete;
    OutputFiles &operator=(const OutputFiles &) = delete;

    void Add(int fd, const char *path) {
        posix_spawn_file_actions_addopen(&actions, fd, path, O_WRONLY | O_CREAT | O_TRUNC, 0600);
    }
};

bool RunsTheDaemon(pid_t process) {
    struct stat running = {};
    struct stat program = {};
    return stat(("/proc/" + std::to_string(process) + "/exe").c_str(), &running) == 0 &&
           stat(VESKCACHEDEV, &program) == 0 && running.st_dev == program.st_dev &&
           running.st_ino == program.st_ino;
}
} // namespace

ScopedFd TestOpen(const char *path, int flags) {
    return ScopedFd(open(path, flags | O_CLOEXEC));
}

int DaemonCommand(std::vector<std::string> command) {
    const OutputFiles files;
    std::vector<char *> words;
    for (std::string &word : command) {
        words.push_back(word.data());
    }
    words.push_back(nullptr);
    pid_t child = -1;
    if (posix_spawnp(&child, words[0], &files.actions, nullptr, words.data(), environ) != 0) {
        return 127;
    }
    return DaemonAwaitEnd(child);
}

std::string DaemonOutput() {
    return ReadWhole(kOutput);
}

std::string DaemonErrors() {
    return ReadWhole(kErrors);
}

int DaemonStart(const std::vector<std::string> &more) {
    std::vector<std::string> command = {VESKCACHEDEV,   "--device", kDaemonDevice, "--backing",
                                        kDaemonBacking, "--ssd",    kDaemonSsd};
    command.insert(command.end(), more.begin(), more.end());
    return DaemonCommand(command);
}

void DaemonStartFresh(uint64_t deviceBytes, uint64_t slots, const std::vector<std::string> &more) {
    TestMakeFile(kDaemonBacking, 0); // for its mode
    WriteWhole(kDaemonBacking, TestBytes(0, static_cast<size_t>(deviceBytes)));
    TestMakeFile(kDaemonSsd, slots * kBlockBytes);
    ASSERT_EQ(DaemonStart(more), 0) << DaemonErrors();
}

Json::Value DaemonState() {
    Json::Value state;
    std::istringstream stream(ReadWhole(kDaemonState));
    std::string errors;
    EXPECT_TRUE(Json::parseFromStream(Json::CharReaderBuilder(), stream, &state, &errors))
        << errors;
    return state;
}

std::string DaemonStateText(const char *member) {
    Json::StreamWriterBuilder writer;
    writer["indentation"] = "";
    return Json::writeString(writer, DaemonState()[member]);
}

int DaemonAwaitEnd(pid_t child) {
    int status = 0;
    if (child <= 0 || waitpid(child, &status, 0) != child) { // 0 and -1 would be any child
        ADD_FAILURE() << "no child " << child;
        return INT_MIN;
    }
    return WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
}

pid_t DaemonPid() {
    const Json::Value state = DaemonState();
    const pid_t daemon = state.isObject() && state["pid"].isInt() ? state["pid"].asInt() : -1;
    if (daemon <= 0 || !RunsTheDaemon(daemon)) {
        ADD_FAILURE() << "no daemon of process id " << daemon;
        return -1;
    }
    return daemon;
}

int DaemonEnd(int signalNumber) {
    const pid_t daemon = DaemonPid();
    if (daemon > 0) { // a signal to 0 or -1 would go far beyond this test
        EXPECT_EQ(kill(daemon, signalNumber), 0);
    }
    return DaemonAwaitEnd(daemon);
}

int DaemonStop() {
    return DaemonEnd(SIGTERM);
}

int DaemonRequest(unsigned long number, const void *argument) {
    const ScopedFd device = TestOpen(kDaemonDevice);
    return ioctl(device.Get(), number, argument) < 0 ? errno : 0;
}

int DaemonSetBitmap(const std::vector<uint8_t> &bitmap) {
    const Descriptor descriptor = {bitmap.data(), static_cast<uint32_t>(bitmap.size())};
    return DaemonRequest(kRequestSetBitmap, &descriptor);
}

int DaemonQuery(unsigned long number) {
    int answer = -1;
    const int error = DaemonRequest(number, &answer);
    return error != 0 ? -error : answer;
}

std::string TestReadAt(int fd, uint64_t offset, uint64_t size) {
    const auto bytes = static_cast<size_t>(size);
    const size_t whole = (bytes / 4096 + 1) * 4096; // what aligned_alloc wants
    const MallocText buffer(static_cast<char *>(aligned_alloc(4096, whole)));
    const ssize_t got = pread(fd, buffer.get(), bytes, static_cast<off_t>(offset));
    return got < 0 ? "error " + std::to_string(errno)
                   : std::string(buffer.get(), static_cast<size_t>(got));
}
} // namespace vesk
