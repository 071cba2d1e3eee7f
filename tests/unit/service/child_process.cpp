#include "tests/unit/service/child_process.h"

#include "tests/support/fake_libc.h"
#include "tests/support/temp_dir.h"
#include "tests/support/thread_state.h"

#include "base/log.h"

#include <algorithm>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <filesystem>
#include <pthread.h>
#include <regex>
#include <sstream>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>

namespace vesk {
// Writes the counts of a build that measures coverage; only such a build has it.
extern "C" void __gcov_dump() __attribute__((weak));

namespace {
using Clock = std::chrono::steady_clock;

const int kStretched = 100;

void PauseBriefly() {
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
}

void StuffPipe(int fd) {
    const int flags = fcntl(fd, F_GETFL);
    fcntl(fd, F_SETFL, flags | O_NONBLOCK);
    const std::string block(512, '.');
    while (write(fd, block.data(), block.size()) > 0) {
    }
    fcntl(fd, F_SETFL, flags);
}

void WriteCoverage() {
    if (__gcov_dump != nullptr) {
        __gcov_dump();
    }
}

struct Body {
    const std::function<int()> &function;
    int result;
};

void *RunBody(void *argument) {
    auto *body = static_cast<Body *>(argument);
    sigset_t none;
    sigemptyset(&none);
    pthread_sigmask(SIG_SETMASK, &none, nullptr);
    body->result = body->function();
    return body;
}

// On a thread of its own: the end of a thread unwinds its stack, and the one that the test
// framework calls a test on must not be unwound.
[[noreturn]] void RunChild(int output, const ChildProcess::Setup &setup,
                           const std::function<int()> &function) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    dup2(output, STDOUT_FILENO);
    stdout = fdopen(STDOUT_FILENO, "w"); // buffered as for any program whose output is a pipe
    if (setup.lineBuffered) {
        setvbuf(stdout, nullptr, _IOLBF, BUFSIZ);
    }
    LogToSyslog = 0;
    LogLevel = setup.logLevel;
    ProgramName = "tool";
    FakeLibc::onSleep = PauseBriefly;
    FakeLibc::alarmFactor = setup.stuffedPipe ? 1 : kStretched;
    at_quick_exit(WriteCoverage);

    sigset_t all;
    sigfillset(&all);
    pthread_sigmask(SIG_SETMASK, &all, nullptr); // signals are for the body's threads
    Body body{function, 0};
    pthread_t thread{};
    pthread_create(&thread, nullptr, RunBody, &body);
    void *ended = nullptr;
    pthread_join(thread, &ended);
    while (ended != &body) { // ended without returning: what goes on, goes on in other threads
        pause();
    }
    fflush(stdout);
    WriteCoverage();
    _exit(body.result);
}
} // namespace

ChildProcess::ChildProcess(const Setup &setup, const std::function<int()> &body) {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) < 0) {
        abort();
    }
    if (setup.stuffedPipe) {
        StuffPipe(ends[1]);
    }
    fflush(stdout);
    pid_ = fork();
    if (pid_ < 0) {
        abort(); // a signal to -1 would go to everybody
    }
    if (pid_ == 0) {
        RunChild(ends[1], setup, body);
    }
    close(ends[1]);
    output_ = ends[0];
    fcntl(output_, F_SETFL, O_NONBLOCK);
}

ChildProcess::~ChildProcess() {
    if (!ended_) {
        kill(pid_, SIGKILL);
        waitpid(pid_, nullptr, 0);
    }
    close(output_);
}

void ChildProcess::Signal(int number) const {
    if (!ended_) { // or its number may be another's by now
        kill(pid_, number);
    }
}

int ChildProcess::AwaitEnd(std::chrono::milliseconds limit) {
    const Clock::time_point end = Clock::now() + limit;
    while (!ended_) {
        int status = 0;
        if (waitpid(pid_, &status, WNOHANG) == pid_) {
            ended_ = true;
            result_ = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
        } else if (Clock::now() > end) {
            return -1;
        } else {
            PauseBriefly();
        }
    }
    return result_;
}

bool ChildProcess::Runs() {
    return AwaitEnd(std::chrono::milliseconds(0)) == -1;
}

bool ChildProcess::Await(const std::function<bool()> &condition) {
    const Clock::time_point end = Clock::now() + std::chrono::seconds(30);
    while (!condition()) {
        if (Clock::now() > end) {
            return false;
        }
        PauseBriefly();
    }
    return true;
}

bool ChildProcess::Catches(int number) const {
    const std::string status = ReadWhole("/proc/" + std::to_string(pid_) + "/status");
    const size_t place = status.find("SigCgt:");
    const char *mask = place == std::string::npos ? "" : status.c_str() + place + 7;
    return (strtoull(mask, nullptr, 16) >> (number - 1) & 1) != 0;
}

bool ChildProcess::Sleeps() const {
    std::error_code gone;
    const std::filesystem::directory_iterator threads("/proc/" + std::to_string(pid_) + "/task",
                                                      gone);
    return std::all_of(begin(threads), end(threads), [this](const auto &entry) {
        return ThreadSleeps(pid_, std::stoi(entry.path().filename()));
    });
}

void ChildProcess::ReadOutput() {
    char buffer[4096];
    for (ssize_t got = 0; (got = read(output_, buffer, sizeof(buffer))) > 0;) {
        text_.append(buffer, static_cast<size_t>(got));
    }
}

bool ChildProcess::AwaitOutput(const std::string &text) {
    return Await([&] {
        ReadOutput();
        return text_.find(text) != std::string::npos;
    });
}

std::vector<std::string> ChildProcess::Messages() {
    ReadOutput();
    static const std::regex prefix("^tool: ");
    static const std::regex lineNumber("^([A-Za-z]+\\(\\)) \\[[0-9]+\\]");
    std::vector<std::string> messages;
    std::istringstream lines(text_);
    for (std::string line; std::getline(lines, line);) {
        messages.push_back(
            std::regex_replace(std::regex_replace(line, prefix, ""), lineNumber, "$1 [N]"));
    }
    return messages;
}
} // namespace vesk
