#include "model/service_look.h"

#include "base/deleter.h"
#include "config/config_records.h"
#include "model/cache_state.h"
#include "service/start_service.h"

#include <dirent.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <memory>

namespace vesk {
namespace {
const char kToolName[] = "veskcachepinfil";  // as much of it as the kernel keeps
const size_t kProcFileMax = size_t{4} << 20; // bytes
const uint64_t kYoungSeconds =
    2; // a process that has begun later may still be starting its threads

struct Thread {
    pid_t id = 0;
    std::string folder; // below task/
    std::string name;
    char state = '?';
    uint64_t startTicks = 0; // since the machine's start
};

bool IsLiving(const Thread &thread) {
    return thread.state != 'Z' && thread.state != 'X' && thread.state != 'x';
}

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
std::optional<Thread> ThreadOf(const std::string &process, pid_t id, int *error) {
    Thread thread;
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

std::vector<Thread> ThreadsOf(const std::string &process, int *error) {
    std::vector<Thread> threads;
    for (const pid_t id : NumbersIn(process + "/task", error)) {
        if (const auto thread = ThreadOf(process, id, error)) {
            threads.push_back(*thread);
        }
    }
    return threads;
}

// The arguments of a command line: each ends with a NUL.
std::vector<std::string> ArgumentsOf(const Thread &thread, int *error) {
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

std::optional<std::string> AbsoluteConfig(const Thread &thread, const std::string &config) {
    if (!config.empty() && config[0] == '/') {
        return config;
    }
    const auto folder = LinkText(thread.folder + "/cwd");
    return folder ? std::optional(*folder + "/" + config) : std::nullopt;
}

std::optional<std::vector<std::string>> OtherNamespaces(const Thread &thread,
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

// Whether the thread waits for a message. Absent where the kernel does not tell the caller.
std::optional<bool> WaitsForMessage(const Thread &thread) {
    const auto place = ReadProc(thread.folder + "/wchan");
    if (place && place->find("msgrcv") != std::string::npos) {
        return true;
    }
    // Not every kernel knows names, and other users are told none.
    const auto call = ReadProc(thread.folder + "/syscall");
    if (!call) {
        return std::nullopt;
    }
    if (call->compare(0, 7, "running") == 0) {
        return false;
    }
#ifdef SYS_msgrcv
    return strtol(call->c_str(), nullptr, 10) == SYS_msgrcv;
#else
    const int kMsgrcvOfIpc = 12;
    char *rest = nullptr;
    return strtol(call->c_str(), &rest, 10) == SYS_ipc &&
           (strtol(rest, nullptr, 16) & 0xFFFF) == kMsgrcvOfIpc;
#endif
}

std::optional<ThreadLook> ReceiverLook(const Thread &leader) {
    if (!IsLiving(leader)) {
        return ThreadLook::Ended;
    }
    const auto waits = WaitsForMessage(leader);
    if (!waits) {
        return std::nullopt;
    }
    return *waits ? ThreadLook::Waiting : ThreadLook::Busy;
}

bool IsYoung(const Thread &leader, const std::string &procFolder) {
    const double seconds = strtod(ReadProc(procFolder + "/uptime").value_or("0").c_str(), nullptr);
    const auto ticks = static_cast<uint64_t>(sysconf(_SC_CLK_TCK));
    return static_cast<double>(leader.startTicks) / static_cast<double>(ticks) +
               static_cast<double>(kYoungSeconds) >
           seconds;
}

// The worker waits while nothing is stored that it could carry out. What it sleeps for, between two
// requests or for want of one, does not show in its thread.
std::optional<ThreadLook> WorkerLook(const std::vector<Thread> &threads, const std::string &config,
                                     const std::set<std::string> &heldVolumes,
                                     const std::string &procFolder) {
    const bool isThere = std::any_of(threads.begin(), threads.end(), [](const Thread &thread) {
        return thread.name == kWorkerThreadName && IsLiving(thread);
    });
    if (!isThere) {
        return IsYoung(threads.front(), procFolder) ? std::nullopt
                                                    : std::optional(ThreadLook::Ended);
    }
    ConfigRecords records;
    if (config.empty() || ConfigReadRecords(config.c_str(), &records) < 0) {
        LookLogTake("");
        return std::nullopt;
    }
    const bool hasWork = std::any_of(
        records.requests.begin(), records.requests.end(),
        [&](const StoredRequest &request) { return heldVolumes.count(request.mountPath) == 0; });
    return hasWork ? ThreadLook::Busy : ThreadLook::Waiting;
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
bool IsToolsProgram(const Thread &thread) {
    const auto program = LinkText(thread.folder + "/exe");
    const std::string name = program ? program->substr(program->rfind('/') + 1) : kToolName;
    return name.compare(0, strlen(kToolName), kToolName) == 0;
}

// The process's threads and what one that lives was asked for, where it is a service of ours;
// nothing where it is none. A process whose first thread has ended has a command line in the others
// only.
struct ServiceProcess {
    std::vector<Thread> threads; // the first one is the receiver
    Thread living;
    Asked asked;
    int error = 0; // not every thread can be looked at
};
std::optional<ServiceProcess> ServiceProcessOf(pid_t pid, const std::string &process, int *error) {
    const std::string name = ReadProc(process + "/comm", error).value_or("");
    if (name != std::string(kToolName) + "\n" || !IsTrusted(process, error)) {
        return std::nullopt;
    }
    ServiceProcess found;
    found.threads = ThreadsOf(process, &found.error);
    KeepError(found.error, error);
    const auto living = std::find_if(found.threads.begin(), found.threads.end(), IsLiving);
    if (living == found.threads.end() || found.threads.front().id != pid) {
        return std::nullopt;
    }
    found.living = *living;
    if (!IsToolsProgram(*living)) {
        return std::nullopt;
    }
    found.asked = AskedBy(ArgumentsOf(*living, error));
    return found.asked.serves ? std::optional(found) : std::nullopt;
}

Service ServiceOf(pid_t pid, const ServiceProcess &process,
                  const std::set<std::string> &heldVolumes, const std::string &procFolder,
                  LookErrors *errors) {
    Service service;
    service.pid = pid;
    if (process.asked.config) {
        service.config = AbsoluteConfig(process.living, *process.asked.config);
    }
    service.otherNamespaces = OtherNamespaces(process.living, procFolder);
    const auto &others = service.otherNamespaces;
    const bool seesOtherFiles =
        others && std::find(others->begin(), others->end(), "mnt") != others->end();
    service.receiver = ReceiverLook(process.threads.front());
    if (process.error == 0) {
        service.worker =
            WorkerLook(process.threads,
                       service.config ? (seesOtherFiles ? process.living.folder + "/root" : "") +
                                            *service.config
                                      : "",
                       heldVolumes, procFolder);
    }
    if (!service.config || !service.receiver || !service.worker || !service.otherNamespaces) {
        LookUnknownAdd(errors, procFolder + "/" + std::to_string(pid),
                       "what the service and its threads do cannot be seen, or not yet");
    }
    return service;
}
} // namespace

std::vector<Service> ServicesLook(const std::set<std::string> &heldVolumes, LookErrors *errors,
                                  const std::string &procFolder) {
    std::vector<Service> services;
    int error = 0;
    for (const pid_t pid : NumbersIn(procFolder, &error)) {
        const std::string folder = procFolder + "/" + std::to_string(pid);
        if (const auto process = ServiceProcessOf(pid, folder, &error)) {
            services.push_back(ServiceOf(pid, *process, heldVolumes, procFolder, errors));
        }
    }
    if (error != 0) {
        LookUnknownAdd(errors, procFolder,
                       std::string("not every process can be looked at: ") + strerror(error));
    }
    return services;
}

Queue QueueLook(LookErrors *errors, const char *keyFile) {
    Queue queue;
    queue.cause = MsgQueueLook(keyFile, &queue.state);
    const std::string logged = LookLogTake("it holds no key");
    switch (queue.cause) {
    case MsgQueueCause::Found:
    case MsgQueueCause::NoKeyFile: break;
    case MsgQueueCause::NoKey: LookErrorAdd(errors, keyFile, logged); break;
    case MsgQueueCause::NoQueue:
        LookErrorAdd(errors, keyFile, "there is no queue of its key");
        break;
    case MsgQueueCause::NotAllowed:
        LookUnknownAdd(errors, keyFile, "no permission to look at the queue");
        break;
    case MsgQueueCause::Foreign:
        LookErrorAdd(errors, keyFile,
                     "the queue belongs to user " + std::to_string(queue.state.owner) +
                         " and is refused by service and clients");
        break;
    }
    return queue;
}

std::optional<std::string> ThreadLookText(const std::optional<ThreadLook> &look) {
    if (!look) {
        return std::nullopt;
    }
    switch (*look) {
    case ThreadLook::Waiting: return "waiting";
    case ThreadLook::Busy: return "busy";
    case ThreadLook::Ended: break;
    }
    return "ended";
}
} // namespace vesk
