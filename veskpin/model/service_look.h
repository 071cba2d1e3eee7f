// The pin services that run on the machine, seen from outside, and their queue. Nothing is sent,
// taken or waited for.
//
// Thread rule: no state.
#pragma once

#include "model/look_errors.h"
#include "request/message_queue.h"
#include "request/queue_look.h"
#include "service/service_threads.h"

#include <sys/types.h>

#include <optional>
#include <set>
#include <string>
#include <vector>

namespace vesk {
struct Service {
    pid_t pid = 0;
    std::optional<std::string> config; // absolute path, from the command line of a living thread
    std::optional<ThreadLook> receiver;
    std::optional<ThreadLook> worker;
    // Its namespaces are others than ours ("ipc", "mnt"): it takes no message, or sees no file, of
    // ours. Absent where that cannot be told.
    std::optional<std::vector<std::string>> otherNamespaces;
};

// The services of root and of the caller's own user, in ascending order of their pids. Of volumes
// in `heldVolumes` (mount paths) no request is carried out. `procFolder` is where the kernel shows
// processes.
std::vector<Service> ServicesLook(const std::set<std::string> &heldVolumes, LookErrors *errors,
                                  const std::string &procFolder = "/proc");

struct Queue {
    MsgQueueCause cause = MsgQueueCause::NoKeyFile;
    MsgQueueState state{};
};

// The queue to which clients of our IPC namespace send.
Queue QueueLook(LookErrors *errors, const char *keyFile = kMessageKeyFile);

// "waiting", "busy", "ended"; absent stays absent.
std::optional<std::string> ThreadLookText(const std::optional<ThreadLook> &look);
} // namespace vesk
