#include "tests/support/private_world.h"

#include "tests/support/temp_dir.h"

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <sched.h>
#include <sys/ipc.h>
#include <sys/mount.h>
#include <sys/msg.h>
#include <unistd.h>

namespace vesk {
namespace {
std::string missing = "the private world is not set up";

std::string Because(const char *what) {
    return std::string(what) + ": " + strerror(errno);
}

// Whether a queue of the tool's size may be made here.
bool LargeQueuesAllowed() {
    const int queueId = msgget(IPC_PRIVATE, 0600);
    msqid_ds limits{};
    if (queueId < 0 || msgctl(queueId, IPC_STAT, &limits) < 0) {
        return false;
    }
    limits.msg_qbytes = kMessageQueueBytes;
    const bool allowed = msgctl(queueId, IPC_SET, &limits) == 0;
    return msgctl(queueId, IPC_RMID, nullptr) == 0 && allowed;
}

std::string Enter() {
    if (geteuid() != 0) {
        return "private message queues need root";
    }
    if (unshare(CLONE_NEWNS | CLONE_NEWIPC) < 0) {
        return Because("no private mounts and queues");
    }
    char run[PATH_MAX];
    if (realpath("/var/run", run) == nullptr ||
        mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) < 0 ||
        mount("tmpfs", run, "tmpfs", 0, "mode=755") < 0) {
        return Because("no private /var/run");
    }
    // Raising the limit of these queues alone needs no further right; where it is not to be had,
    // the right to exceed it may be. Twice the tool's limit, so that its own setting shows.
    WriteWhole("/proc/sys/kernel/msgmnb", std::to_string(2 * kMessageQueueBytes));
    return LargeQueuesAllowed() ? "" : Because("no message queue of 1024 requests");
}

class PrivateWorld : public ::testing::Environment {
public:
    void SetUp() override { EnterPrivateWorld(); }
};

// The identifiers of all queues of this world.
std::vector<int> QueueIds() {
    std::vector<int> ids;
    msqid_ds status{};
    const int last = msgctl(0, MSG_INFO, &status);
    for (int index = 0; index <= last; ++index) {
        const int queueId = msgctl(index, MSG_STAT, &status);
        if (queueId >= 0) {
            ids.push_back(queueId);
        }
    }
    return ids;
}
} // namespace

void EnterPrivateWorld() {
    missing = Enter();
}

bool UsePrivateWorld() {
    ::testing::AddGlobalTestEnvironment(new PrivateWorld);
    return true;
}

const std::string &PrivateWorldMissing() {
    return missing;
}

void EmptyPrivateWorld() {
    if (!missing.empty()) {
        return;
    }
    for (const int queueId : QueueIds()) {
        msgctl(queueId, IPC_RMID, nullptr);
    }
    unlink(kMessageKeyFile);
}

int CountQueues() {
    return static_cast<int>(QueueIds().size());
}

int CountMessages(int queueId) {
    msqid_ds status{};
    return msgctl(queueId, IPC_STAT, &status) < 0 ? -1 : static_cast<int>(status.msg_qnum);
}

RawMessage TakeMessage(int queueId) {
    struct {
        long type;
        char text[8192];
    } buffer{};
    const ssize_t size = msgrcv(queueId, &buffer, sizeof(buffer.text), 0, IPC_NOWAIT);
    if (size < 0) {
        return {};
    }
    return {buffer.type, std::string(buffer.text, static_cast<size_t>(size))};
}

bool PutMessage(int queueId, long type, const std::string &text) {
    std::string buffer(reinterpret_cast<const char *>(&type), sizeof(type));
    buffer += text;
    return msgsnd(queueId, buffer.data(), text.size(), IPC_NOWAIT) == 0;
}

std::string RecordBytes(int type, const std::string &mountPath, const std::string &data) {
    std::string bytes(reinterpret_cast<const char *>(&type), 4);
    bytes += mountPath;
    bytes.resize(4 + 512, '\0');
    bytes += data;
    bytes.resize(4 + 512 + 1024, '\0');
    return bytes;
}
} // namespace vesk
