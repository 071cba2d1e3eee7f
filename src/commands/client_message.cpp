#include "commands/client_message.h"

RequestMessage BuildMessage(int requestType, const char *mountPath) {
    RequestMessage message{};
    message.messageType = requestMessageType;
    message.record.type = requestType;
    CopyToField(message.record.mountPath, mountPath);
    return message;
}
