// The receiver: takes requests off the message queue and stores them in the configuration file.
//
// Pending-space messages change the pending-space list at once; every other request is stored and
// the worker woken. Nothing is answered. Any error ends the receiver's thread and leaves the worker
// running with what is stored.
//
// Thread rule: runs on the process's first thread; takes the service lock only inside the
// configuration and pending-space operations.
#pragma once

#include "request/message_queue.h"

namespace vesk {
extern int ServerMsgQueueId; // -1 until the receiver has opened the queue; used by its thread only

// 0, or -1 after an error message when a request that is to be stored has no mount path, or a pin
// or unpin request no files.
int CheckNormalMsg(const RequestMessage *message);

// Does not return: ends the calling thread.
[[noreturn]] void GetRequests(const char *configPath);
} // namespace vesk
