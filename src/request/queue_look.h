// A look at the queue between clients and service, for those who only look: nothing is created,
// taken, sent or waited for.
//
// Thread rule: no state.
#pragma once

#include "request/request_record.h"

#include <cstdint>
#include <sys/types.h>
#include <vector>

namespace vesk {
enum class MsgQueueCause {
    Found,
    NoKeyFile,
    NoKey, // the file cannot be read or holds no number
    NoQueue,
    NotAllowed, // the caller may not ask for it
    Foreign,    // its creator or owner is neither root nor the caller: MsgQueueGet refuses it
};

struct MsgQueueState {
    int key;
    int id;
    uid_t owner;
    uint64_t messages;
    uint64_t bytes;    // in the messages
    uint64_t maxBytes; // of all messages
    pid_t lastTaker;   // who took the last message, 0 where none was taken
};

// Looks at the queue that the file's key names. `*state` is filled as far as the cause allows,
// wholly for Found and Foreign.
MsgQueueCause MsgQueueLook(const char *keyFile, MsgQueueState *state);

// Appends what the receiver would take from the queue that was found, in its order. A message that
// it takes meanwhile is there all the same, perhaps twice; one that is sent meanwhile is not. 0, or
// -1 with errno: not every kernel lets one look (ENOSYS).
int MsgQueueCopy(const MsgQueueState &state, std::vector<RequestRecord> *records);
} // namespace vesk
