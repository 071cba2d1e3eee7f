#include "service/receiver.h"

#include "base/log.h"
#include "config/request_queue.h"
#include "request/message_queue.h"
#include "request/request_type.h"
#include "service/message_check.h"
#include "service/receiver_rest.h"
#include "service/signal_handler.h"
#include "state/service_state.h"

#include <cerrno>
#include <cstring>
#include <exception>
#include <pthread.h>
#include <sys/msg.h>
#include <unistd.h>

int ServerMsgQueueId = -1;

namespace {

// Whoever may write to the queue fills the record. Before anyone reads it, what a short message
// left of the one before is cleared and the texts end inside their fields.
void CompleteRecord(RequestRecord *record, size_t received) {
    memset(reinterpret_cast<char *>(record) + received, 0, sizeof(*record) - received);
    record->mountPath[sizeof(record->mountPath) - 1] = '\0';
    record->data[sizeof(record->data) - 1] = '\0';
}

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

} // namespace

void GetRequests(const char *configPath) {
    {
        LogTraceScope();
        RequestMessage message{}; // overwritten by each message
        RequestRecord &record = message.record;
        bool receiving = true;
        ServerMsgQueueId = MsgQueueGet(messageKeyFile);
        if (ServerMsgQueueId == -1) {
            LogError("Create server messsage queue by file (%s) failed", messageKeyFile);
            receiving = false;
        } else {
            LogVerbose("Get server messsage queue id = %d", ServerMsgQueueId);
        }
        while (receiving) {
            ReceiverTakesNext();
            const ssize_t received =
                msgrcv(ServerMsgQueueId, &message, requestMessageBytes, requestMessageType, 0);
            if (received < 0 && errno == EINTR && ReceiverIsCalledToRest()) {
                continue;
            }
            if (received < 0) {
                LogError("Receive messaged failed: %s", strerror(errno));
                break;
            }
            CompleteRecord(&record, static_cast<size_t>(received));
            LogVerbose("Get a new message. Request type = %s", RequestTypeForLog(record.type));

            if (record.type == requestAddPendingSpace) {
                if (ServiceIsPendingSpace(record.mountPath)) {
                    LogVerbose("Space (%s) is already in pending list", record.mountPath);
                } else if (DoPatiently([&] {
                               return ServiceAddPendingSpaceAtomic(record.mountPath);
                           }) < 0) {
                    LogError("Add spend space error");
                    break;
                }
                continue;
            }
            if (record.type == requestRemovePendigSpace) {
                if (!ServiceIsPendingSpace(record.mountPath)) {
                    LogNotice("Space (%s) is not in pending list. Could be a new space",
                              record.mountPath);
                } else if (DoPatiently([&] {
                               return ServiceRemovePendingSpaceAtomic(record.mountPath);
                           }) < 0) {
                    LogError("Remove pending space error");
                    break;
                }
                continue;
            }
            if (CheckNormalMsg(&message) < 0) {
                LogError("Get wrong message format");
                break;
            }
            if (DoPatiently([&] { return ConfigAddRequest(configPath, &record); }) < 0) {
                LogError("Can't add request to config (%s)", configPath);
                break;
            }
            LogVerbose("Signal a new request is added");
            ServiceSignalRequest();
        }
    }
    ReceiverHasEnded();
    ServiceThreadEnds();
    pthread_exit(nullptr);
}
