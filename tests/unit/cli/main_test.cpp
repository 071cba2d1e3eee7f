#include "cli/fake_commands.h"
#include "cli/log.h"
#include "cli/syslog_capture.h"
#include "support/leak_checked_test.h"

#include <functional>
#include <gtest/gtest.h>
#include <regex>
#include <string>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>
#include <vector>

extern "C" int ToolMain(int argc, char *argv[]); // the tool's main

namespace {

struct Run {
    int status = -1;       // exit status
    std::string output;    // standard output, whole; line numbers as "[N]"
    std::string systemLog; // one line for each record; line numbers as ":N " and "[N]"
};

std::string Content(int file) {
    std::string text(static_cast<size_t>(lseek(file, 0, SEEK_END)), '\0');
    const ssize_t got = pread(file, &text[0], text.size(), 0);
    text.resize(got < 0 ? 0 : static_cast<size_t>(got));
    text = std::regex_replace(text, std::regex("\\(\\) \\[[0-9]+\\]"), "() [N]");
    return std::regex_replace(text, std::regex("\\.cpp:[0-9]+ "), ".cpp:N ");
}

// The run ends with the process, as in earnest: main keeps state for the whole of its process.
[[noreturn]] void RunInChild(const std::vector<std::string> &arguments, int output, int systemLog) {
    dup2(output, STDOUT_FILENO);
    LogToSyslog = 1;
    LogLevel = 1;
    ProgramName = nullptr;
    SyslogRecords().clear();
    std::vector<std::string> words = arguments;
    words.insert(words.begin(), "/usr/bin/tool");
    std::vector<char *> argv;
    for (std::string &word : words) {
        argv.push_back(&word[0]);
    }
    argv.push_back(nullptr);
    const int status = ToolMain(static_cast<int>(words.size()), argv.data());
    for (const SyslogRecord &record : SyslogRecords()) {
        dprintf(systemLog, "%s\n", record.text.c_str());
    }
    exit(status);
}

class MainTest : public LeakCheckedTest {
protected:
    void SetUp() override {
        LeakCheckedTest::SetUp();
        FakeCommands::result = 0;
        FakeCommands::bitmapSize = 0;
    }

    static Run Tool(const std::vector<std::string> &arguments) {
        const int output = memfd_create("output", 0);
        const int systemLog = memfd_create("system-log", 0);
        fflush(stdout);
        const pid_t child = fork();
        if (child == 0) {
            RunInChild(arguments, output, systemLog);
        }
        Run run;
        int status = 0;
        waitpid(child, &status, 0);
        run.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
        run.output = Content(output);
        run.systemLog = Content(systemLog);
        close(output);
        close(systemLog);
        return run;
    }

    // Runs the command with --stdout and with operations that give this result.
    static Run ToolWith(int result, std::vector<std::string> arguments) {
        FakeCommands::result = result;
        arguments.insert(arguments.begin(), "--stdout");
        return Tool(arguments);
    }
};

} // namespace
