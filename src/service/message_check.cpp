#include "service/message_check.h"

#include "base/log.h"
#include "request/request_type.h"

namespace vesk {

int CheckNormalMsg(const RequestMessage *message) {
    const RequestRecord &record = message->record;
    if (record.mountPath[0] == '\0') {
        LogError("Space UUID is not set");
        return -1;
    }
    const bool needsFiles = record.type == kRequestPinFiles || record.type == kRequestUnpinFiles;
    if (needsFiles && record.data[0] == '\0') {
        LogError("Should provide file paths");
        return -1;
    }
    return 0;
}

} // namespace vesk
