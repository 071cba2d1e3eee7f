#include "request/queue_look.h"

#include "files/path.h"
#include "request/message_queue.h"

#include <algorithm>
#include <cerrno>
#include <stdexcept>
#include <sys/ipc.h>
#include <sys/msg.h>

namespace vesk {
MsgQueueCause MsgQueueLook(const char *keyFile, MsgQueueState *state) {
    *state = {};
    if (PathIsMissing(keyFile) == 1) {
        return MsgQueueCause::NoKeyFile;
    }
    try {
        if (GetMsgKey(&state->key, keyFile) < 0) {
            return MsgQueueCause::NoKey;
        }
    } catch (const std::logic_error &) {
        return MsgQueueCause::NoKey;
    }
    if (state->key == IPC_PRIVATE) { // asked for, it would be made
        state->id = -1;
        return MsgQueueCause::NoQueue;
    }
    state->id = msgget(state->key, 0);
    msqid_ds status{};
    if (state->id == -1 || msgctl(state->id, IPC_STAT, &status) < 0) {
        return errno == EACCES || errno == EPERM ? MsgQueueCause::NotAllowed
                                                 : MsgQueueCause::NoQueue;
    }
    state->owner = status.msg_perm.uid;
    state->messages = status.msg_qnum;
    state->bytes = status.__msg_cbytes;
    state->maxBytes = status.msg_qbytes;
    state->lastTaker = status.msg_lrpid;
    return MsgQueueIsTrusted(status) ? MsgQueueCause::Found : MsgQueueCause::Foreign;
}

int MsgQueueCopy(const MsgQueueState &state, std::vector<RequestRecord> *records) {
    // From the last to the first: what is taken meanwhile moves the others towards the first.
    std::vector<RequestRecord> copied;
    for (uint64_t number = state.messages; number-- > 0;) {
        RequestMessage message{};
        const ssize_t size = msgrcv(state.id, &message, kRequestMessageBytes,
                                    static_cast<long>(number), MSG_COPY | IPC_NOWAIT);
        if (size < 0 && errno != ENOMSG && errno != E2BIG) { // E2BIG: longer than any request
            return -1;
        }
        if (size >= 0 && message.messageType == kRequestMessageType) {
            RequestRecordComplete(&message.record, static_cast<size_t>(size));
            copied.push_back(message.record);
        }
    }
    records->insert(records->end(), copied.rbegin(), copied.rend());
    return 0;
}
} // namespace vesk
