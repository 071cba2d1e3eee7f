// The message queue between clients and service, found through a key file.
//
// Whichever process comes first creates the queue exclusively and writes its key into the file as a
// decimal number without a line feed; every later one reads the key and opens the queue. Nothing
// ever removes queue or file, so messages wait there for the next service.
//
// Thread rule: no state; any number of processes may create and send at once. A process that reads
// the file between its creation and the writing of the key fails.
#pragma once

#include "base/log.h"
#include "request/request_record.h"

#include <cstddef>
#include <sys/msg.h>

namespace vesk {
// What clients send: the text is one request record. The header word is 4 bytes on the 32-bit
// target and 8 on 64-bit hosts, and is not counted in the message size; the text is the same on
// both.
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

// The queue's key from the first line of the file. 0, or -1 after an error message when the file
// cannot be read. A line that does not begin with a number throws std::invalid_argument or
// std::out_of_range, which nothing catches: the process ends.
int GetMsgKey(int *key, const char *path);

// Creates the queue and writes its key into the file (created if missing). The queue's identifier,
// or -1: the queue exists already (only a verbose message) or, after an error message, failure.
int MsgCreateExclusive(const char *keyFile);

// Creates or opens the queue. Its identifier, or -1 after an error message. errno tells why: EPERM
// for a queue whose creator or owner is neither root nor the caller.
int MsgQueueGet(const char *keyFile);

// Anybody can make a queue at any key, and whoever made or owns one can send to it and give it
// away: only root's and the caller's own are trusted.
bool MsgQueueIsTrusted(const msqid_ds &status);

// Sends without blocking, up to three times, a second apart; a failing send takes three seconds.
// `size` (bytes) does not count the header word. 0, or -1 after an error message with the errno of
// the last attempt.
int MsgQueueSend(int queueId, const RequestMessage *message, size_t size);

// Sends a request of this type for the volume, with `files` as its data unless null. A text that
// fills its field has no NUL there. 0, or -1 after an error message at the caller's place.
int SendRequest(int queueId, int requestType, const char *mountPath, const char *files,
                const LogPlace &place);

// Waits up to three seconds for an acknowledgement of this message type. 0, or -1 after an error
// message. The service sends none, and no command waits.
int WaitForAck(int queueId, long messageType);
} // namespace vesk
