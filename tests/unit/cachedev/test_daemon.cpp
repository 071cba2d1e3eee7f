#include "test_daemon.h"

#include "cachedev/driver_requests.h"
#include "test_device.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <memory>
#include <sstream>
#include <sys/ioctl.h>
#include <sys/wait.h>
#include <unistd.h>

namespace {

// The bitmap descriptor as a program of this word size passes it.
struct Descriptor {
    const void *bytes;
    uint32_t length;
};

} // namespace

TestFd::TestFd(const char *path, int flags) : fd(open(path, flags | O_CLOEXEC)) {}

TestFd::~TestFd() {
    if (fd >= 0) {
        close(fd);
    }
}

int DaemonCommand(const std::string &command) {
    const int status = system((command + " 2>/run/errors").c_str());
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

std::string DaemonErrors() {
    return TestReadFile("/run/errors");
}

int DaemonStart(const std::string &more) {
    return DaemonCommand(std::string(VESKCACHEDEV) + " --device " + kDaemonDevice + " --backing " +
                         kDaemonBacking + " --ssd " + kDaemonSsd + " " + more);
}

void DaemonStartFresh(uint64_t deviceBytes, uint64_t slots, const std::string &more) {
    TestWriteFile(kDaemonBacking, TestBytes(0, static_cast<size_t>(deviceBytes)));
    TestMakeFile(kDaemonSsd, slots * kBlockBytes);
    ASSERT_EQ(DaemonStart(more), 0) << DaemonErrors();
}

Json::Value DaemonState() {
    Json::Value state;
    std::istringstream stream(TestReadFile(kDaemonState));
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

int DaemonAwaitEnd(pid_t daemon) {
    int status = 0;
    EXPECT_EQ(waitpid(daemon, &status, 0), daemon);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
}

pid_t DaemonPid() {
    return DaemonState()["pid"].asInt();
}

int DaemonStop() {
    const pid_t daemon = DaemonPid();
    EXPECT_EQ(kill(daemon, SIGTERM), 0);
    return DaemonAwaitEnd(daemon);
}

int DaemonRequest(unsigned long number, const void *argument) {
    const TestFd device(kDaemonDevice);
    return ioctl(device.fd, number, argument) < 0 ? errno : 0;
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
    const std::unique_ptr<void, void (*)(void *)> buffer(aligned_alloc(4096, whole), free);
    const ssize_t got = pread(fd, buffer.get(), bytes, static_cast<off_t>(offset));
    return got < 0 ? "error " + std::to_string(errno)
                   : std::string(static_cast<const char *>(buffer.get()), static_cast<size_t>(got));
}
