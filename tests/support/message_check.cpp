#include "tests/support/message_check.h"

#include "base/log.h"
#include "tests/support/plain_log.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <gtest/gtest.h>
#include <iterator>
#include <map>
#include <set>
#include <sstream>
#include <string>
#include <unistd.h>
#include <vector>

namespace vesk {
namespace {
// A line that begins with a letter names functions; the lines below it are what each of them logs:
// class and text, as the source has it. "trace" stands for the entry/exit trace. A line feed at a
// text's end is written as "\n", a blank there as "\s".
const char kMessageList[] =
#include "tests/support/message_list.inc"
    ;

const char *const kClassNames[] = {"error", "notice", "verbose", "debug"}; // in LogClass's order

struct ListedMessage {
    std::string logClass;
    std::vector<std::string> pieces; // what stands between the conversions
};
using MessageList = std::map<std::string, std::vector<ListedMessage>>; // by function

// The text as the list has it to what stands between its conversions.
std::vector<std::string> PiecesOf(const std::string &text) {
    std::vector<std::string> pieces(1);
    for (size_t at = 0; at < text.size(); ++at) {
        if (text[at] == '%') {
            at = text.find_first_not_of(".0123456789lz", at + 1); // at the conversion's last letter
            pieces.emplace_back();
        } else if (text[at] == '\\') {
            ++at;
            pieces.back() += text[at] == 'n' ? '\n' : ' ';
        } else {
            pieces.back() += text[at];
        }
    }
    return pieces;
}

void AddLine(const std::string &line, std::vector<std::string> *functions, MessageList *list) {
    std::istringstream words(line);
    if (line[0] != ' ') {
        functions->assign(std::istream_iterator<std::string>(words), {});
        return;
    }
    std::string logClass;
    words >> logClass;
    const size_t textColumn = 10;
    for (const std::string &function : *functions) {
        std::vector<ListedMessage> &messages = (*list)[function];
        if (logClass == "trace") {
            messages.push_back({"notice", {"+++++"}});
            messages.push_back({"notice", {"-----"}});
        } else {
            messages.push_back({logClass, PiecesOf(line.substr(textColumn))});
        }
    }
}

const MessageList &List() {
    static const MessageList *const list = [] {
        auto *made = new MessageList;
        std::vector<std::string> functions;
        std::istringstream lines(kMessageList);
        for (std::string line; std::getline(lines, line);) {
            if (!line.empty()) {
                AddLine(line, &functions, made);
            }
        }
        return made;
    }();
    return *list;
}

bool Fits(const std::vector<std::string> &pieces, const std::string &text) {
    size_t at = pieces.front().size();
    if (text.compare(0, at, pieces.front()) != 0) {
        return false;
    }
    for (size_t i = 1; i + 1 < pieces.size(); ++i) {
        at = text.find(pieces[i], at);
        if (at == std::string::npos) {
            return false;
        }
        at += pieces[i].size();
    }
    const std::string &last = pieces.back();
    return pieces.size() == 1 ? text.size() == at
                              : text.size() >= at + last.size() &&
                                    text.compare(text.size() - last.size(), last.size(), last) == 0;
}

bool IsListed(LogClass logClass, const std::string &function, const std::string &text) {
    const std::string name = kClassNames[static_cast<int>(logClass)];
    const auto found = List().find(function);
    return found != List().end() && std::any_of(found->second.begin(), found->second.end(),
                                                [&](const ListedMessage &listed) {
                                                    return listed.logClass == name &&
                                                           Fits(listed.pieces, text);
                                                });
}

// The places that tests log at themselves.
bool IsTestsOwn(const std::string &function) {
    static const std::set<std::string> functions = {"Caller", "TestBody", "operator()"};
    return functions.count(function) > 0;
}

pid_t testProcess = 0;

void Complain(LogClass logClass, const LogPlace &place, const char *text) {
    const std::string complaint = std::string("in no list of messages: ") +
                                  kClassNames[static_cast<int>(logClass)] + " of " +
                                  place.function + ": \"" + text + "\"";
    if (getpid() == testProcess) {
        ADD_FAILURE() << complaint;
        return;
    }
    fprintf(stderr, "%s\n", complaint.c_str());
    abort();
}

void CheckAndHandOn(LogClass logClass, const LogPlace &place, const char *text) {
    if (!IsListed(logClass, place.function, text) && !IsTestsOwn(place.function)) {
        Complain(logClass, place, text);
    }
    LogPlainly({static_cast<int>(logClass), place.function, place.line, text},
               {LogToSyslog, LogLevel, ProgramName});
}
} // namespace

void CheckMessages() {
    testProcess = getpid();
    LogSetSink(CheckAndHandOn);
}

void CheckNoMessages() {
    LogSetSink(nullptr);
}
} // namespace vesk
