#include "request/message_queue.h"

#include "files/file_text.h"
#include "files/path.h"

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <stdexcept>
#include <string>
#include <sys/ipc.h>
#include <sys/msg.h>
#include <unistd.h>

namespace vesk {
namespace {
const int kKeyProject = 'x';
const int kKeyReadTries = 3;
const int kSendTries = 3;
const int kAckTries = 3;
static_assert((IPC_CREAT | IPC_EXCL | 0644) == 0x7A4, "creation flags");

// False with errno.
bool QueueMayBeUsed(int queueId) {
    msqid_ds status{};
    if (msgctl(queueId, IPC_STAT, &status) < 0) {
        return false;
    }
    if (!MsgQueueIsTrusted(status)) {
        errno = EPERM;
        return false;
    }
    return true;
}
} // namespace

bool MsgQueueIsTrusted(const msqid_ds &status) {
    const auto isTrusted = [](uid_t user) { return user == 0 || user == geteuid(); };
    return isTrusted(status.msg_perm.uid) && isTrusted(status.msg_perm.cuid);
}

int GetMsgKey(int *key, const char *path) {
    std::string text;
    if (FileReadString(path, &text) < 0) {
        LogError("Can't get message key from file (%s)", path);
        return -1;
    }
    *key = std::stoi(text);
    LogVerbose("Get Key = %d", *key);
    return 0;
}

int MsgCreateExclusive(const char *keyFile) {
    LogTraceScope();
    // Whatever another process has put into the file since the look is kept: nobody would ever
    // write the key of its queue again.
    if (!PathExists(keyFile) && FileWriteString(keyFile, "", OldContent::Kept) < 0) {
        LogError("Create file (%s) failed", keyFile);
        return -1;
    }
    const key_t key = ftok(keyFile, kKeyProject);
    if (key == -1) {
        LogError("Can't get message queue key by file (%s)", keyFile);
        return -1;
    }
    LogVerbose("Generate message queue key = %d (0x%x)", key, static_cast<unsigned>(key));
    char keyText[1024];
    snprintf(keyText, sizeof(keyText), "%d", key);

    const int queueId = msgget(key, IPC_CREAT | IPC_EXCL | 0644);
    if (queueId == -1) {
        LogVerbose("Message queue (key = %d) already exists (error = %s)", key, strerror(errno));
        return -1;
    }
    msqid_ds limits{};
    if (msgctl(queueId, IPC_STAT, &limits) < 0) {
        LogError("Can't get message queue data structure");
        return -1;
    }
    limits.msg_qbytes = kMessageQueueBytes;
    if (msgctl(queueId, IPC_SET, &limits) < 0) {
        LogError("Can't set message queue size");
        return -1;
    }
    LogVerbose("Set size = %ld (num of request = %d, request size = %zu)",
               static_cast<long>(kMessageQueueBytes), kMessageQueueRequests, kRequestMessageBytes);
    if (FileWriteString(keyFile, keyText) < 0) {
        // This process can use the queue all the same; others cannot find it.
        LogError("Can't write to file (%s)", keyFile);
    }
    return queueId;
}

int MsgQueueGet(const char *keyFile) {
    LogTraceScope();
    int queueId = MsgCreateExclusive(keyFile);
    if (queueId != -1) {
        LogVerbose("Create message queue by file (%s) successfully", keyFile);
        return queueId;
    }
    LogVerbose("Message queue exist, try to get key");
    int key = 0;
    int result = -1;
    for (int tries = 0; tries < kKeyReadTries && result < 0; ++tries) {
        result = GetMsgKey(&key, keyFile);
    }
    if (result < 0) {
        LogError("Can't find the message queue's key from file (%s)", keyFile);
        return -1;
    }
    queueId = msgget(key, 0);
    if (queueId == -1 || !QueueMayBeUsed(queueId)) {
        LogError("Can't open message queue: %s", strerror(errno));
        return -1;
    }
    LogVerbose("Get message queue by id (%d) successfully", queueId);
    return queueId;
}

int MsgQueueSend(int queueId, const RequestMessage *message, size_t size) {
    int sendErrno = 0;
    for (int tries = 0; tries < kSendTries; ++tries) {
        LogVerbose("Send to message queue (id = %d) msg type = %ld", queueId, message->messageType);
        if (msgsnd(queueId, message, size, IPC_NOWAIT) == 0) {
            LogVerbose("Send to message queue (id = %d) OK", queueId);
            return 0;
        }
        sendErrno = errno;
        sleep(1);
    }
    LogError("Send message timeout (%d seconds)", kSendTries);
    errno = sendErrno;
    return -1;
}

int SendRequest(int queueId, int requestType, const char *mountPath, const char *files,
                const LogPlace &place) {
    RequestMessage message{};
    message.messageType = kRequestMessageType;
    RequestRecord &record = message.record;
    record.type = requestType;
    memcpy(record.mountPath, mountPath, strnlen(mountPath, sizeof(record.mountPath)));
    if (files != nullptr) {
        memcpy(record.data, files, strnlen(files, sizeof(record.data)));
    }
    if (MsgQueueSend(queueId, &message, kRequestMessageBytes) == -1) {
        LogErrorAt(place, "Send message failed: %s", strerror(errno));
        return -1;
    }
    return 0;
}

int WaitForAck(int queueId, long messageType) {
    LogTraceScope();
    RequestMessage message{};
    int seconds = 0;
    ssize_t received = -1;
    while (received < 0) {
        if (seconds >= kAckTries) {
            LogError("Can't get ack messages (Wait for %d sceounds)", seconds);
            return -1;
        }
        sleep(1);
        ++seconds;
        LogVerbose("Wait for ack. Secound = %d", seconds);
        received = msgrcv(queueId, &message, kRequestMessageBytes, messageType, IPC_NOWAIT);
    }
    LogVerbose("Get message");
    if (message.record.type != kRequestAck) {
        LogError("Get wrong request");
        return -1;
    }
    LogVerbose("Get ACK from servier");
    return 0;
}
} // namespace vesk
