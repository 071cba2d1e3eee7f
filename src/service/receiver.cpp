#include "service/receiver.h"

#include "base/log.h"
#include "config/request_queue.h"
#include "request/request_record.h"
#include "service/receiver_rest.h"
#include "service/signal_handler.h"
#include "state/service_state.h"

#include <cerrno>
#include <cstring>
#include <exception>
#include <pthread.h>
#include <sys/msg.h>
#include <unistd.h>

namespace vesk {
int ServerMsgQueueId = -1;

namespace {
// What a taken message asks for, tried until there is memory for it: the message is off the queue,
// and nobody would send it again.
template <typename Operation> int DoPatiently(Operation operation) {
    for (;;) {
        try {
            return operation();
        } catch (const std::exception &error) {
            LogError("Message is held back: %s", error.what());
            sleep(1);
        }
    }
}

// Waits for the next message. False after an error message.
bool ReceiveMessage(RequestMessage *message, const LogPlace &place) {
    ssize_t received = -1;
    do {
        ReceiverTakesNext();
        received = msgrcv(ServerMsgQueueId, message, kRequestMessageBytes, kRequestMessageType, 0);
    } while (received < 0 && errno == EINTR && ReceiverIsCalledToRest());
    if (received < 0) {
        LogErrorAt(place, "Receive messaged failed: %s", strerror(errno));
        return false;
    }
    RequestRecordComplete(&message->record, static_cast<size_t>(received));
    LogVerboseAt(place, "Get a new message. Request type = %s",
                 RequestTypeForLog(message->record.type));
    return true;
}

bool AddPendingSpace(char *mountPath, const LogPlace &place) {
    if (ServiceIsPendingSpace(mountPath)) {
        LogVerboseAt(place, "Space (%s) is already in pending list", mountPath);
    } else if (DoPatiently([&] { return ServiceAddPendingSpaceAtomic(mountPath); }) < 0) {
        LogErrorAt(place, "Add spend space error");
        return false;
    }
    return true;
}

bool RemovePendingSpace(char *mountPath, const LogPlace &place) {
    if (!ServiceIsPendingSpace(mountPath)) {
        LogNoticeAt(place, "Space (%s) is not in pending list. Could be a new space", mountPath);
    } else if (DoPatiently([&] { return ServiceRemovePendingSpaceAtomic(mountPath); }) < 0) {
        LogErrorAt(place, "Remove pending space error");
        return false;
    }
    return true;
}

bool StoreRequest(const char *configPath, const RequestMessage *message, const LogPlace &place) {
    if (CheckNormalMsg(message) < 0) {
        LogErrorAt(place, "Get wrong message format");
        return false;
    }
    if (DoPatiently([&] { return ConfigAddRequest(configPath, &message->record); }) < 0) {
        LogErrorAt(place, "Can't add request to config (%s)", configPath);
        return false;
    }
    LogVerboseAt(place, "Signal a new request is added");
    ServiceSignalRequest();
    return true;
}

// Does what the message asks for. False after an error message.
bool DoMessage(const char *configPath, RequestMessage *message, const LogPlace &place) {
    switch (message->record.type) {
    case kRequestAddPendingSpace: return AddPendingSpace(message->record.mountPath, place);
    case kRequestRemovePendigSpace: return RemovePendingSpace(message->record.mountPath, place);
    default: return StoreRequest(configPath, message, place);
    }
}
} // namespace

int CheckNormalMsg(const RequestMessage *message) {
    const RequestRecord &record = message->record;
    if (record.mountPath[0] == '\0') {
        LogError("Space UUID is not set");
        return -1;
    }
    if (RequestHasFiles(record.type) && record.data[0] == '\0') {
        LogError("Should provide file paths");
        return -1;
    }
    return 0;
}

void GetRequests(const char *configPath) {
    {
        LogTraceScope();
        // A queue whose key is not in its file yet would never be found.
        ReceiverTakesNext();
        ServerMsgQueueId = MsgQueueGet(kMessageKeyFile);
        if (ServerMsgQueueId == -1) {
            LogError("Create server messsage queue by file (%s) failed", kMessageKeyFile);
        } else {
            LogVerbose("Get server messsage queue id = %d", ServerMsgQueueId);
            RequestMessage message{}; // overwritten by each message
            while (ReceiveMessage(&message, LogHere()) &&
                   DoMessage(configPath, &message, LogHere())) {
            }
        }
    }
    ReceiverHasEnded();
    ServiceThreadEnds();
    pthread_exit(nullptr);
}
} // namespace vesk
