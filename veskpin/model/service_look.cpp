#include "model/service_look.h"

#include <cstring>

namespace vesk {
std::vector<Service> ServicesLook(const std::set<std::string> &heldVolumes, LookErrors *errors,
                                  const std::string &procFolder) {
    std::vector<Service> services;
    int error = 0;
    for (const ServiceProcess &process : ServiceProcessesFind(procFolder, &error)) {
        const Service service{process.pid, process.config, ServiceReceiverLook(process),
                              ServiceWorkerLook(process, heldVolumes, procFolder),
                              process.otherNamespaces};
        LookLogTake(""); // a document that cannot be read is the worker's "cannot be seen"
        if (!service.config || !service.receiver || !service.worker || !service.otherNamespaces) {
            LookUnknownAdd(errors, procFolder + "/" + std::to_string(process.pid),
                           "what the service and its threads do cannot be seen, or not yet");
        }
        services.push_back(service);
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
