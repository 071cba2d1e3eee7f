// The message queue between clients and service, found through a key file.
//
// Whichever process comes first creates the queue exclusively and writes its key into the file as a
// decimal number without a line feed; every later one reads the key and opens the queue. Nothing
// ever removes queue or file, so messages wait there for the next service.
//
// Thread rule: no state; any number of processes may create and send at once. A process that reads
// the file between its creation and the writing of the key fails.
#pragma once

#include "request/message.h"

namespace vesk {

// The queue's key from the first line of the file. 0, or -1 after an error message when the file
// cannot be read. A line that does not begin with a number throws std::invalid_argument or
// std::out_of_range, which nothing catches: the process ends.
int GetMsgKey(int *key, const char *path);

// Creates the queue and writes its key into the file (created if missing). The queue's identifier,
// or -1: the queue exists already (only a verbose message) or, after an error message, failure.
int MsgCreateExclusive(const char *keyFile);

// Creates or opens the queue. Its identifier, or -1 after an error message. errno tells why.
int MsgQueueGet(const char *keyFile);

// Sends without blocking, up to three times, a second apart; a failing send takes three seconds.
// `size` (bytes) does not count the header word. 0, or -1 after an error message with the errno of
// the last attempt.
int MsgQueueSend(int queueId, const RequestMessage *message, size_t size);

// Waits up to three seconds for an acknowledgement of this message type. 0, or -1 after an error
// message. The service sends none, and no command waits.
int WaitForAck(int queueId, long messageType);

} // namespace vesk
