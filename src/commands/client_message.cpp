#include "commands/client_message.h"

#include "request/message_queue.h"

#include <cerrno>
#include <cstring>

namespace vesk {

int SendRequest(int queueId, int requestType, const char *mountPath, const char *files,
                const LogPlace &place) {
    RequestMessage message{};
    message.messageType = kRequestMessageType;
    RequestRecord &record = message.record;
    record.type = requestType;
    memcpy(record.mountPath, mountPath, strnlen(mountPath, sizeof(record.mountPath)));
    if (files != nullptr) {
        memcpy(record.data, files, strnlen(files, sizeof(record.data)));
    }
    if (MsgQueueSend(queueId, &message, kRequestMessageBytes) == -1) {
        LogWrite(LogClass::Error, place, "Send message failed: %s", strerror(errno));
        return -1;
    }
    return 0;
}

} // namespace vesk
