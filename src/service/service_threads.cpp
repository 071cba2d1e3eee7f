#include "service/service_threads.h"

#include "config/config_records.h"
#include "files/file_whole.h"
#include "service/start_service.h"

#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>

namespace vesk {
namespace {
const size_t kProcFileMax = 65536; // bytes
// A process that has begun later may still be starting its threads.
const uint64_t kYoungSeconds = 2;

std::optional<std::string> ReadProc(const std::string &path) {
    std::string text;
    return FileReadAll(path, kProcFileMax, &text) == 0 ? std::optional(text) : std::nullopt;
}

// Whether the thread waits for a message. Absent where the kernel does not tell the caller.
std::optional<bool> WaitsForMessage(const ServiceThread &thread) {
    if (thread.state == 'T' || thread.state == 't') {
        return false; // it stands still, whatever call it is in
    }
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

bool IsYoung(const ServiceThread &leader, const std::string &procFolder) {
    const double seconds = strtod(ReadProc(procFolder + "/uptime").value_or("0").c_str(), nullptr);
    const auto ticks = static_cast<uint64_t>(sysconf(_SC_CLK_TCK));
    return static_cast<double>(leader.startTicks) / static_cast<double>(ticks) +
               static_cast<double>(kYoungSeconds) >
           seconds;
}

// The document that the service serves, where we can read it; empty: it cannot be told.
std::string ConfigSeen(const ServiceProcess &process) {
    if (!process.config) {
        return "";
    }
    const auto &others = process.otherNamespaces;
    const bool seesOtherFiles =
        others && std::find(others->begin(), others->end(), "mnt") != others->end();
    return (seesOtherFiles ? process.root : "") + *process.config;
}
} // namespace

std::optional<ThreadLook> ServiceReceiverLook(const ServiceProcess &process) {
    const ServiceThread &leader = process.threads.front();
    if (!ServiceThreadLives(leader)) {
        return ThreadLook::Ended;
    }
    const auto waits = WaitsForMessage(leader);
    if (!waits) {
        return std::nullopt;
    }
    return *waits ? ThreadLook::Waiting : ThreadLook::Busy;
}

std::optional<uint64_t> ServiceReceiverSleeps(const ServiceProcess &process) {
    const std::string title = "\nvoluntary_ctxt_switches:\t";
    const std::string status = ReadProc(process.threads.front().folder + "/status").value_or("");
    const size_t found = status.find(title);
    if (found == std::string::npos) {
        return std::nullopt;
    }
    return strtoull(status.c_str() + found + title.size(), nullptr, 10);
}

std::optional<bool> ServiceWorkerLives(const ServiceProcess &process,
                                       const std::string &procFolder) {
    if (process.error != 0) {
        return std::nullopt;
    }
    const auto &threads = process.threads;
    const bool isThere =
        std::any_of(threads.begin(), threads.end(), [](const ServiceThread &thread) {
            return thread.name == kWorkerThreadName && ServiceThreadLives(thread);
        });
    return isThere || !IsYoung(threads.front(), procFolder) ? std::optional(isThere) : std::nullopt;
}

std::optional<ThreadLook> ServiceWorkerLook(const ServiceProcess &process,
                                            const std::set<std::string> &heldVolumes,
                                            const std::string &procFolder) {
    const auto lives = ServiceWorkerLives(process, procFolder);
    if (!lives || !*lives) {
        return lives ? std::optional(ThreadLook::Ended) : std::nullopt;
    }
    const std::string config = ConfigSeen(process);
    ConfigRecords records;
    if (config.empty() || ConfigReadRecords(config.c_str(), &records) < 0) {
        return std::nullopt;
    }
    const bool hasWork = std::any_of(
        records.requests.begin(), records.requests.end(),
        [&](const StoredRequest &request) { return heldVolumes.count(request.mountPath) == 0; });
    return hasWork ? ThreadLook::Busy : ThreadLook::Waiting;
}
} // namespace vesk
