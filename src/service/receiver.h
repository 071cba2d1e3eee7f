// The receiver: takes requests off the message queue and stores them in the configuration file.
//
// Pending-space messages change the pending-space list at once; every other request is stored and
// the worker woken. Nothing is answered. Any error ends the receiver's thread and leaves the worker
// running with what is stored.
//
// Thread rule: runs on the process's first thread; takes the service lock only inside the
// configuration and pending-space operations.
#pragma once

namespace vesk {

extern int ServerMsgQueueId; // -1 until the receiver has opened the queue; used by its thread only

// Does not return: ends the calling thread.
[[noreturn]] void GetRequests(const char *configPath);

} // namespace vesk
