// Running the tool's main in a test: a process of its own for every run, with the operations behind
// the commands replaced (fake_commands.h).
#pragma once

#include "base/log.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/syslog_capture.h"
#include "tests/unit/cli/fake_commands.h"
#include "tests/unit/cli/options_fixture.h"

#include <cstdlib>
#include <gtest/gtest.h>
#include <string>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>
#include <vector>

namespace vesk {
extern "C" int ToolMain(int argc, char *argv[]); // the tool's main

const Arguments kMount = {"--mount-path", "/volume1"};

inline Arguments Range(const char *command) {
    return Arguments{command, "--start-sector", "128", "--num-sectors", "18446744073709551"} +
           kMount;
}

struct Outcome {
    int status = -1;       // exit status
    std::string output;    // standard output, whole; line numbers as "[N]"
    std::string systemLog; // one line for each record; line numbers as ":N " and "[N]"
    std::string logLevel;  // as main leaves it
};

// "N" for every number that stands between these two texts.
inline void HideNumbers(std::string *text, const std::string &before, const std::string &after) {
    for (size_t at = text->find(before); at != std::string::npos; at = text->find(before, at + 1)) {
        const size_t first = at + before.size();
        const size_t end = text->find_first_not_of("0123456789", first);
        if (end != std::string::npos && end > first &&
            text->compare(end, after.size(), after) == 0) {
            text->replace(first, end - first, "N");
        }
    }
}

inline std::string Content(int file) {
    std::string text(static_cast<size_t>(lseek(file, 0, SEEK_END)), '\0');
    const ssize_t got = pread(file, &text[0], text.size(), 0);
    text.resize(got < 0 ? 0 : static_cast<size_t>(got));
    HideNumbers(&text, "() [", "]");
    HideNumbers(&text, ".cpp:", " ");
    return text;
}

// The run ends with the process, as in earnest: main keeps state for the whole of its process.
[[noreturn]] inline void RunInChild(const Arguments &arguments, int output, int systemLog,
                                    int logLevel) {
    dup2(output, STDOUT_FILENO);
    LogToSyslog = 1;
    LogLevel = 1;
    ProgramName = nullptr;
    SyslogRecords().clear();
    Arguments words = arguments;
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
    dprintf(logLevel, "%d", LogLevel);
    exit(status);
}

class MainTest : public LeakCheckedTest {
protected:
    void SetUp() override {
        LeakCheckedTest::SetUp();
        FakeCommands::result = 0;
        FakeCommands::onOperation = nullptr;
        FakeCommands::bitmapSize = 0;
    }

    static Outcome Tool(const Arguments &arguments) {
        const int output = memfd_create("output", 0);
        const int systemLog = memfd_create("system-log", 0);
        const int logLevel = memfd_create("log-level", 0);
        fflush(stdout);
        const pid_t child = fork();
        if (child == 0) {
            RunInChild(arguments, output, systemLog, logLevel);
        }
        Outcome run;
        int status = -1; // of no process, where there is none
        waitpid(child, &status, 0);
        run.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
        run.output = Content(output);
        run.systemLog = Content(systemLog);
        run.logLevel = Content(logLevel);
        close(output);
        close(systemLog);
        close(logLevel);
        return run;
    }

    // Runs the command with --stdout and with operations that give this result.
    static Outcome ToolWith(int result, Arguments arguments) {
        FakeCommands::result = result;
        arguments.insert(arguments.begin(), "--stdout");
        return Tool(arguments);
    }
};
} // namespace vesk
