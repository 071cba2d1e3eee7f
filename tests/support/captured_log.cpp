#include "tests/support/captured_log.h"

#include "base/log.h"

#include <algorithm>
#include <cstdio>
#include <gtest/gtest.h>
#include <regex>
#include <sys/mman.h>
#include <unistd.h>

namespace vesk {
std::string FirstOf(const std::vector<std::string> &texts) {
    return texts.empty() ? "(none)" : texts.front();
}

std::string LastOf(const std::vector<std::string> &texts) {
    return texts.empty() ? "(none)" : texts.back();
}

CapturedLog::CapturedLog(int level)
    : savedStdout_(dup(STDOUT_FILENO)), file_(memfd_create("captured-log", 0)) {
    fflush(stdout);
    dup2(file_.Get(), STDOUT_FILENO);
    LogToSyslog = 0;
    LogLevel = level;
    ProgramName = "tool";
}

CapturedLog::~CapturedLog() {
    // What a failed expectation had to say was caught, too.
    const std::string unseen = ::testing::Test::HasFailure() ? Text() : "";
    fflush(stdout);
    dup2(savedStdout_.Get(), STDOUT_FILENO);
    LogLevel = 1;
    fputs(unseen.c_str(), stdout);
}

std::string CapturedLog::Text() {
    fflush(stdout);
    std::string text(static_cast<size_t>(lseek(file_.Get(), 0, SEEK_END)), '\0');
    const ssize_t got = pread(file_.Get(), &text[0], text.size(), 0);
    text.resize(got < 0 ? 0 : static_cast<size_t>(got));
    return text;
}

std::vector<std::string> CapturedLog::Lines() {
    std::vector<std::string> lines;
    const std::string text = Text();
    size_t start = 0;
    for (size_t end = text.find('\n'); end != std::string::npos; end = text.find('\n', start)) {
        lines.push_back(text.substr(start, end - start));
        start = end + 1;
    }
    if (start < text.size()) {
        lines.push_back(text.substr(start));
    }
    return lines;
}

std::vector<std::string> CapturedLog::Messages() {
    static const std::regex lineNumber("^([A-Za-z]+\\(\\)) \\[[0-9]+\\]");
    std::vector<std::string> messages;
    for (const std::string &line : Lines()) {
        const std::string prefix = std::string(ProgramName) + ": ";
        std::string message = line.rfind(prefix, 0) == 0 ? line.substr(prefix.size()) : line;
        messages.push_back(std::regex_replace(message, lineNumber, "$1 [N]"));
    }
    return messages;
}

bool CapturedLog::Has(const std::string &message) {
    return Count(message) > 0;
}

int CapturedLog::Count(const std::string &message) {
    const std::vector<std::string> messages = Messages();
    return static_cast<int>(std::count(messages.begin(), messages.end(), message));
}
} // namespace vesk
