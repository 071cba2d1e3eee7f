#include "request/request_record.h"

#include "request/request_type.h"

#include <cstdio>

namespace vesk {

void RequestToString(std::string *out, const RequestRecord *record) {
    char text[1024];
    const int length = snprintf(text, sizeof(text), "Request type=%s mountPath=%s data=%s",
                                RequestTypeForLog(record->type), record->mountPath, record->data);
    out->assign(length < 0 ? "" : text);
}

} // namespace vesk
