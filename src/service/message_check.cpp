#include "service/message_check.h"

#include "base/log.h"
#include "request/request_type.h"

int CheckNormalMsg(const RequestMessage *message) {
    const RequestRecord &record = message->record;
    if (record.mountPath[0] == '\0') {
        LogError("Space UUID is not set");
        return -1;
    }
    const bool needsFiles = record.type == requestPinFiles || record.type == requestUnpinFiles;
    if (needsFiles && record.data[0] == '\0') {
        LogError("Should provide file paths");
        return -1;
    }
    return 0;
}
