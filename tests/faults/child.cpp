#include "tests/faults/child.h"

#include "base/deleter.h"
#include "tests/faults/world.h"

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <dirent.h>
#include <fcntl.h>
#include <filesystem>
#include <initializer_list>
#include <signal.h>
#include <sys/wait.h>
#include <system_error>
#include <unistd.h>

namespace vesk {
namespace {
using Clock = std::chrono::steady_clock;

// What a thread waits for is told by the arguments of the call that it is in: a record's size,
// pthread_cond_wait's operation, sigwait's missing limit of time. The calls' numbers differ from
// machine to machine.
const char kMessageWait[] = " 0x604 ";
const char kRequestWait[] = " 0x189 ";
const char kSignalWait[] = " 0x0 0x8 ";

const char kOutputPath[] = "/run/faults/output";
const char kReportPath[] = "/run/faults/report";
const int kReportFd = 9;
const int kPollMicroseconds = 2000;
const std::chrono::minutes kHang(5); // nothing here takes that long, also where all is slow

void Redirect(const char *path, int fd) {
    const int opened = open(path, O_WRONLY | O_CREAT | O_TRUNC | O_APPEND, 0600);
    if (opened != fd) {
        dup2(opened, fd);
        close(opened);
    }
}

[[noreturn]] void Become(const Command &command, const Fault &fault) {
    Redirect(command.output.c_str(), STDOUT_FILENO);
    if (command.errors.empty()) {
        dup2(STDOUT_FILENO, STDERR_FILENO);
    } else {
        Redirect(command.errors.c_str(), STDERR_FILENO);
    }
    if (!command.report.empty()) {
        Redirect(command.report.c_str(), kReportFd);
    }
    if (!command.preload.empty()) {
        setenv("LD_PRELOAD", command.preload.c_str(), 1);
    }
    if (!fault.kind.empty()) {
        setenv("VESK_FAIL_CALL", fault.kind.c_str(), 1);
        setenv("VESK_FAIL_NUMBER", std::to_string(fault.number).c_str(), 1);
        setenv("VESK_FAIL_ERRNO", std::to_string(fault.error).c_str(), 1);
    }
    std::vector<char *> words;
    for (const std::string &word : command.words) {
        words.push_back(const_cast<char *>(word.c_str()));
    }
    words.push_back(nullptr);
    execv(words.front(), words.data());
    _exit(127);
}

Command ToolCommand(const Program &program, const std::vector<std::string> &arguments) {
    Command command{{program.tool, "--stdout"}, program.preload, kOutputPath, "", kReportPath};
    command.words.insert(command.words.end(), arguments.begin(), arguments.end());
    return command;
}

std::string TaskPath(pid_t pid, const std::string &rest) {
    return "/proc/" + std::to_string(pid) + "/task/" + rest;
}

bool IsInCall(pid_t pid, const std::string &thread,
              const std::initializer_list<const char *> &calls) {
    const std::string call = WorldRead(TaskPath(pid, thread + "/syscall"));
    return std::any_of(calls.begin(), calls.end(), [&call](const char *arguments) {
        return call.find(arguments) != std::string::npos;
    });
}

int CountDescriptors(pid_t pid) {
    const std::unique_ptr<DIR, Deleter<closedir>> folder(
        opendir(("/proc/" + std::to_string(pid) + "/fd").c_str()));
    int count = 0;
    while (folder && readdir(folder.get()) != nullptr) {
        ++count;
    }
    return count;
}
} // namespace

Child::Child(const Program &program, const std::vector<std::string> &arguments, const Fault &fault)
    : Child(ToolCommand(program, arguments), fault) {}

Child::Child(const Command &command, const Fault &fault) : command_(command), pid_(fork()) {
    if (pid_ == 0) {
        Become(command_, fault);
    }
    if (pid_ < 0) {
        perror("fork");
        exit(1); // -1 would be everybody, for a signal
    }
}

Child::~Child() {
    if (pid_ > 0) {
        kill(pid_, SIGKILL);
        waitpid(pid_, nullptr, 0);
    }
}

bool Child::HasEnded() const {
    if (pid_ <= 0) {
        return true;
    }
    siginfo_t info = {};
    return waitid(P_PID, static_cast<id_t>(pid_), &info, WEXITED | WNOHANG | WNOWAIT) != 0 ||
           info.si_pid == pid_;
}

bool Child::AwaitHandler() const {
    const std::string path = "/proc/" + std::to_string(pid_) + "/status";
    while (!HasEnded()) {
        const std::string status = WorldRead(path);
        const size_t at = status.find("SigCgt:\t");
        if (at != std::string::npos &&
            (strtoull(status.c_str() + at + 8, nullptr, 16) & 1ULL << (SIGTERM - 1)) != 0) {
            return true;
        }
        usleep(kPollMicroseconds);
    }
    return false;
}

bool Child::IsQuiet() const {
    // The receiver, the first thread, comes first: before it waits it has made the others and woken
    // the worker for what it has stored.
    if (!IsReceiverWaiting()) {
        return false;
    }
    // The worker is the first of the others; where it has ended that is one that waits for
    // something else, or the receiver alone is left.
    long worker = 0;
    std::error_code gone;
    for (const auto &entry : std::filesystem::directory_iterator(TaskPath(pid_, ""), gone)) {
        const long thread = strtol(entry.path().filename().c_str(), nullptr, 10);
        if (thread != pid_ && (worker == 0 || thread < worker)) {
            worker = thread;
        }
    }
    return IsInCall(pid_, std::to_string(worker == 0 ? pid_ : worker),
                    {kRequestWait, kSignalWait, kMessageWait});
}

bool Child::HasFirstThreadEnded() const {
    const std::string stat = TaskPath(pid_, std::to_string(pid_) + "/stat");
    return WorldRead(stat).find(") Z ") != std::string::npos;
}

bool Child::IsReceiverWaiting() const {
    return IsInCall(pid_, std::to_string(pid_), {kMessageWait}) || HasFirstThreadEnded();
}

bool Child::AwaitQuiet() const {
    const Clock::time_point end = Clock::now() + kHang;
    while (!HasEnded() && Clock::now() < end) {
        if (IsQuiet()) {
            return true;
        }
        usleep(kPollMicroseconds);
    }
    return false;
}

int Child::Descriptors(int enough) const {
    int lowest = CountDescriptors(pid_);
    for (int looks = 0; looks < 5 || (looks < 200 && lowest > enough); ++looks) {
        usleep(kPollMicroseconds);
        lowest = std::min(lowest, CountDescriptors(pid_));
    }
    return lowest;
}

long Child::MemoryKiB() const {
    const std::string status = WorldRead("/proc/" + std::to_string(pid_) + "/status");
    const size_t at = status.find("VmRSS:");
    return at == std::string::npos ? 0 : strtol(status.c_str() + at + 6, nullptr, 10);
}

void Child::Signal(int number) const {
    if (pid_ > 0) {
        kill(pid_, number);
    }
}

int Child::AwaitEnd() {
    const Clock::time_point end = Clock::now() + kHang;
    while (!HasEnded() && Clock::now() < end) {
        usleep(kPollMicroseconds / 4);
    }
    if (!HasEnded()) {
        return -1;
    }
    int status = 0;
    waitpid(pid_, &status, 0);
    pid_ = -1;
    return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

bool Child::FaultReached() const {
    return Report().find('x') != std::string::npos;
}

long Child::LiveAllocations() const {
    const std::string report = Report();
    const size_t at = report.find(' ');
    return at == std::string::npos ? 0 : strtol(report.c_str() + at, nullptr, 10);
}

std::string Child::Report() const {
    return WorldRead(command_.report);
}

std::string Child::Output() const {
    return WorldRead(command_.output);
}

std::string Child::Errors() const {
    return WorldRead(command_.errors);
}
} // namespace vesk
