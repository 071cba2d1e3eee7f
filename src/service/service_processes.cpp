#include "service/service_processes.h"

#include "base/deleter.h"
#include "files/file_whole.h"

#include <dirent.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <memory>

namespace vesk {
namespace {
const size_t kProcFileMax = size_t{4} << 20; // bytes
const char kToolName[] = "veskcachepinfil";  // as much of it as the kernel keeps

// Processes and threads end while they are looked at: that is no error. Anything else is kept.
void KeepError(int error, int *kept) {
    if (error != 0 && error != ENOENT && error != ESRCH) {
        *kept = error;
    }
}

std::optional<std::string> ReadProc(const std::string &path, int *error = nullptr) {
    std::string text;
    const int failure = FileReadAll(path, kProcFileMax, &text);
    if (error != nullptr) {
        KeepError(failure, error);
    }
    return failure == 0 ? std::optional(text) : std::nullopt;
}

// The entries of a folder that are numbers, in ascending order.
std::vector<pid_t> NumbersIn(const std::string &folder, int *error) {
    std::vector<pid_t> numbers;
    errno = 0;
    const std::unique_ptr<DIR, Deleter<closedir>> stream(opendir(folder.c_str()));
    while (const dirent *entry = stream ? readdir(stream.get()) : nullptr) {
        if (entry->d_name[0] >= '1' && entry->d_name[0] <= '9') {
            numbers.push_back(static_cast<pid_t>(strtol(entry->d_name, nullptr, 10)));
        }
    }
    KeepError(errno, error);
    std::sort(numbers.begin(), numbers.end());
    return numbers;
}

// "123 (name) S 1 ... starttime ...": the name is the thread's own choice and may hold anything.
std::optional<ServiceThread> ThreadOf(const std::string &process, pid_t id, int *error) {
    ServiceThread thread;
    thread.id = id;
    thread.folder = process + "/task/" + std::to_string(id);
    const auto text = ReadProc(thread.folder + "/stat", error);
    const size_t open = text ? text->find('(') : std::string::npos;
    const size_t close = text ? text->rfind(')') : std::string::npos;
    if (open == std::string::npos || close == std::string::npos || close + 2 >= text->size()) {
        return std::nullopt;
    }
    thread.name = text->substr(open + 1, close - open - 1);
    thread.state = (*text)[close + 2];
    const char *field = text->c_str() + close + 2;
    const int kStartField = 22 - 3; // of stat, counted from the state
    for (int i = 0; i < kStartField && field != nullptr; ++i) {
        field = strchr(field + 1, ' ');
    }
    thread.startTicks = field == nullptr ? 0 : strtoull(field, nullptr, 10);
    return thread;
}

std::vector<ServiceThread> ThreadsOf(const std::string &process, int *error) {
    std::vector<ServiceThread> threads;
    for (const pid_t id : NumbersIn(process + "/task", error)) {
        if (const auto thread = ThreadOf(process, id, error)) {
            threads.push_back(*thread);
        }
    }
    return threads;
}

// The arguments of a command line: each ends with a NUL.
std::vector<std::string> ArgumentsOf(const ServiceThread &thread, int *error) {
    std::vector<std::string> arguments;
    const std::string text = ReadProc(thread.folder + "/cmdline", error).value_or("");
    for (size_t at = 0; at < text.size();) {
        const size_t end = std::min(text.find('\0', at), text.size());
        arguments.push_back(text.substr(at, end - at));
        at = end + 1;
    }
    return arguments;
}

// Whether the argument is the option, also one cut short, as the tool takes it: not shorter than
// `least`, up to which another option begins alike.
bool IsOption(const std::string &argument, const std::string &option, const std::string &least) {
    const std::string name = argument.substr(0, argument.find('='));
    return name.size() >= least.size() && option.compare(0, name.size(), name) == 0;
}

// What a command line asks of the tool.
struct Asked {
    bool serves = false;
    std::optional<std::string> config; // as it is written there
};

// A group of letters: the first that takes a value takes the rest, or else the next argument, of
// which the result tells.
bool ReadLetters(const std::string &letters, const std::string *next, Asked *asked) {
    for (size_t at = 1; at < letters.size(); ++at) {
        asked->serves = asked->serves || letters[at] == 'c';
        if (strchr("abfgjw", letters[at]) == nullptr) {
            continue;
        }
        const bool takesNext = at + 1 == letters.size() && next != nullptr;
        if (letters[at] == 'f' && (takesNext || at + 1 < letters.size())) {
            asked->config = takesNext ? *next : letters.substr(at + 1);
        }
        return takesNext;
    }
    return false;
}

Asked AskedBy(const std::vector<std::string> &arguments) {
    Asked asked;
    for (size_t i = 1; i < arguments.size() && arguments[i] != "--"; ++i) {
        const std::string &argument = arguments[i];
        const std::string *next = i + 1 < arguments.size() ? &arguments[i + 1] : nullptr;
        if (IsOption(argument, "--start-service", "--start-ser")) {
            asked.serves = true;
        } else if (IsOption(argument, "--config-path", "--co")) {
            const size_t equals = argument.find('=');
            if (equals != std::string::npos) {
                asked.config = argument.substr(equals + 1);
            } else if (next != nullptr) {
                asked.config = *next;
                ++i;
            }
        } else if (argument[0] == '-' && argument[1] != '-' &&
                   ReadLetters(argument, next, &asked)) {
            ++i;
        }
    }
    return asked;
}

std::optional<std::string> LinkText(const std::string &path) {
    char text[4096];
    const ssize_t length = readlink(path.c_str(), text, sizeof(text));
    return length < 0 ? std::nullopt
                      : std::optional(std::string(text, static_cast<size_t>(length)));
}

std::optional<std::string> AbsoluteConfig(const ServiceThread &thread, const std::string &config) {
    if (!config.empty() && config[0] == '/') {
        return config;
    }
    const auto folder = LinkText(thread.folder + "/cwd");
    return folder ? std::optional(*folder + "/" + config) : std::nullopt;
}

std::optional<std::vector<std::string>> OtherNamespaces(const ServiceThread &thread,
                                                        const std::string &procFolder) {
    std::vector<std::string> others;
    for (const char *name : {"ipc", "mnt"}) {
        const auto its = LinkText(thread.folder + "/ns/" + name);
        const auto ours = LinkText(procFolder + "/self/ns/" + name);
        if (!its || !ours) {
            return std::nullopt;
        }
        if (*its != *ours) {
            others.emplace_back(name);
        }
    }
    return others;
}

// By the process's effective user. The owner of its folder is root's also where it hides itself.
bool IsTrusted(const std::string &process, int *error) {
    const std::string status = ReadProc(process + "/status", error).value_or("");
    const std::string title = "\nUid:\t";
    const size_t found = status.find(title);
    if (found == std::string::npos) {
        return false;
    }
    const size_t effective = status.find('\t', found + title.size());
    const unsigned long user = strtoul(status.c_str() + effective + 1, nullptr, 10);
    return effective != std::string::npos && (user == 0 || user == geteuid());
}

// Whether the program that runs is the tool, as far as it may be asked: anybody can call a program
// of root's by another name.
bool IsToolsProgram(const ServiceThread &thread) {
    const auto program = LinkText(thread.folder + "/exe");
    const std::string name = program ? program->substr(program->rfind('/') + 1) : kToolName;
    return name.compare(0, strlen(kToolName), kToolName) == 0;
}

} // namespace

// What it is asked for is told by a thread that lives: a process whose first thread has ended has a
// command line in the others only.
std::optional<ServiceProcess> ServiceProcessAt(const std::string &procFolder, pid_t pid,
                                               int *error) {
    const std::string folder = procFolder + "/" + std::to_string(pid);
    const std::string name = ReadProc(folder + "/comm", error).value_or("");
    if (name != std::string(kToolName) + "\n" || !IsTrusted(folder, error)) {
        return std::nullopt;
    }
    ServiceProcess found;
    found.pid = pid;
    found.threads = ThreadsOf(folder, &found.error);
    KeepError(found.error, error);
    const auto living =
        std::find_if(found.threads.begin(), found.threads.end(), ServiceThreadLives);
    if (living == found.threads.end() || found.threads.front().id != pid ||
        !IsToolsProgram(*living)) {
        return std::nullopt;
    }
    const Asked asked = AskedBy(ArgumentsOf(*living, error));
    if (!asked.serves) {
        return std::nullopt;
    }
    if (asked.config) {
        found.config = AbsoluteConfig(*living, *asked.config);
    }
    found.otherNamespaces = OtherNamespaces(*living, procFolder);
    found.root = living->folder + "/root";
    return found;
}

bool ServiceThreadLives(const ServiceThread &thread) {
    return thread.state != 'Z' && thread.state != 'X' && thread.state != 'x';
}

std::vector<ServiceProcess> ServiceProcessesFind(const std::string &procFolder, int *error) {
    std::vector<ServiceProcess> found;
    for (const pid_t pid : NumbersIn(procFolder, error)) {
        if (auto process = ServiceProcessAt(procFolder, pid, error)) {
            found.push_back(std::move(*process));
        }
    }
    return found;
}
} // namespace vesk
