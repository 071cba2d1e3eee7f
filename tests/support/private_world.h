// A test program's own message queues and its own empty /var/run, where the queue's key file lies:
// nothing of it is seen by another process, and all of it is gone with the program.
//
// One file of the program calls UsePrivateWorld() from a static initialiser; a test that needs it
// begins with SKIP_WITHOUT_PRIVATE_WORLD().
#pragma once

#include "request/message_queue.h"

#include <gtest/gtest.h>
#include <string>
#include <vector>

namespace vesk {
// Sets it up before the program's first test. Always true.
bool UsePrivateWorld();

// Sets it up now, for programs that are not run by GoogleTest.
void EnterPrivateWorld();

// Why the program has none; empty when it has one.
const std::string &PrivateWorldMissing();

#define SKIP_WITHOUT_PRIVATE_WORLD()                                                               \
    if (!PrivateWorldMissing().empty()) {                                                          \
        GTEST_SKIP() << PrivateWorldMissing();                                                     \
    }                                                                                              \
    static_assert(true, "a semicolon follows")

// Removes every queue and the key file. Does nothing without the private world.
void EmptyPrivateWorld();

// How many queues there are.
int CountQueues();

// How many messages wait in the queue; -1 where there is no such queue.
int CountMessages(int queueId);

// Takes the next message of any type: its type and its text, byte for byte.
struct RawMessage {
    long type = 0;
    std::string text;
};
RawMessage TakeMessage(int queueId);

// Puts a message of this type into the queue, text byte for byte.
bool PutMessage(int queueId, long type, const std::string &text);

// The text of a message: a request record byte for byte.
std::string RecordBytes(int type, const std::string &mountPath, const std::string &data = "");
} // namespace vesk
