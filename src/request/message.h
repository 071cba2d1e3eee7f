// The message that clients send to the service: a System V message whose text is one request
// record.
//
// The header word is a platform long (4 bytes on the 32-bit target, 8 on 64-bit hosts) and is not
// counted in the message size; the text behind it is the same on both.
#pragma once

#include "request/request_record.h"

#include <cstddef>

namespace vesk {

struct RequestMessage {
    long messageType; // kRequestMessageType
    RequestRecord record;
};
static_assert(offsetof(RequestMessage, record) == sizeof(long), "the text follows the header word");
static_assert(sizeof(long) != 4 || sizeof(RequestMessage) == 1544, "message of the 32-bit target");

const char kMessageKeyFile[] = "/var/run/veskcachepinfile-msg-server.key";
const long kRequestMessageType = 1;
const size_t kRequestMessageBytes = sizeof(RequestRecord); // 1540

// How many requests the queue must hold, and its byte limit for that.
const int kMessageQueueRequests = 1024;
const unsigned long kMessageQueueBytes = kMessageQueueRequests * kRequestMessageBytes;
static_assert(kMessageQueueBytes == 1576960, "0x181000 bytes");

} // namespace vesk
