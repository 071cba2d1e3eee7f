#include "act/service_talk.h"

#include "act/interrupt.h"
#include "base/malloc_text.h"
#include "model/look_errors.h"
#include "request/message_queue.h"
#include "request/queue_look.h"

#include <algorithm>
#include <cstdlib>

namespace vesk {
namespace {
const unsigned kPauseMs = 20;

// By the folder that it is in: the document may not be there yet.
std::string Resolved(const std::string &path) {
    const size_t slash = path.rfind('/');
    const std::string folder = slash == std::string::npos ? "." : path.substr(0, slash + 1);
    const MallocText whole(realpath(path.c_str(), nullptr));
    const MallocText real(whole ? nullptr : realpath(folder.c_str(), nullptr));
    if (whole || !real) {
        return whole ? whole.get() : path;
    }
    return std::string(real.get()) + "/" + path.substr(slash == std::string::npos ? 0 : slash + 1);
}
} // namespace

ServiceTalk::ServiceTalk(const std::string &configPath, const std::string &procFolder)
    : configPath_(Resolved(configPath)), procFolder_(procFolder) {}

void ServiceTalk::Forget() {
    watched_.reset();
    sleepsBefore_.reset();
}

// The watched service, or one to be watched from here on.
std::optional<ServiceProcess> ServiceTalk::Find() {
    if (!watched_) {
        return FindNew();
    }
    int error = 0;
    auto process = ServiceProcessAt(procFolder_, watched_->pid, &error);
    isUnknown_ = !process && error != 0;
    return process;
}

// Of this configuration, and taking messages from here. What has ended in part is taken only where
// no other is: it may not have been ended wholly yet when the next one began.
std::optional<ServiceProcess> ServiceTalk::FindNew() {
    int error = 0;
    isUnknown_ = false;
    std::optional<ServiceProcess> found;
    for (ServiceProcess &process : ServiceProcessesFind(procFolder_, &error)) {
        isUnknown_ = isUnknown_ || !process.otherNamespaces || !process.config;
        if (!process.otherNamespaces || !process.otherNamespaces->empty() || !process.config ||
            Resolved(*process.config) != configPath_) {
            continue;
        }
        const bool lives = ServiceThreadLives(process.threads.front()) &&
                           ServiceWorkerLives(process, procFolder_) != false;
        if (!found || lives) {
            found = std::move(process);
        }
        if (lives) {
            break;
        }
    }
    if (found) {
        watched_ = {found->pid, found->threads.front().startTicks};
    }
    isUnknown_ = !found && (isUnknown_ || error != 0);
    return found;
}

// A message is handed over, and its taker noted, before the one who sends it goes on.
bool ServiceTalk::IsTakenByOthers() const {
    MsgQueueState queue{};
    const bool isFound = MsgQueueLook(kMessageKeyFile, &queue) == MsgQueueCause::Found;
    LookLogTake("");
    return isFound && queue.messages == 0 && queue.lastTaker != watched_->pid;
}

TalkState ServiceTalk::Look() {
    const bool isFirst = !watched_;
    const auto process = Find();
    if (!process) {
        return isUnknown_ ? TalkState::Unknown : isFirst ? TalkState::Absent : TalkState::Ended;
    }
    if (process->threads.front().startTicks != watched_->startTicks) {
        return TalkState::Ended; // another process has got its number
    }
    const auto worker = ServiceWorkerLives(*process, procFolder_);
    const auto sleeps = ServiceReceiverSleeps(*process);
    const auto receiver = ServiceReceiverLook(*process);
    if (receiver == ThreadLook::Ended || worker == false) {
        return TalkState::Ended;
    }
    if (!receiver || !sleeps) {
        return TalkState::Unknown;
    }
    const bool hasTaken = !sleepsBefore_ || *sleeps > *sleepsBefore_;
    if (!hasTaken && IsTakenByOthers()) {
        return TalkState::Taken;
    }
    return worker && *receiver == ThreadLook::Waiting && hasTaken ? TalkState::Takes
                                                                  : TalkState::Busy;
}

TalkEnd ServiceTalk::AwaitTurn(const Deadline &deadline) {
    for (;;) {
        const TalkState state = Look();
        switch (state) {
        case TalkState::Takes: return TalkEnd::Done;
        case TalkState::Ended: return TalkEnd::Ended;
        case TalkState::Absent: return TalkEnd::Absent;
        case TalkState::Unknown: return TalkEnd::Unknown;
        case TalkState::Taken: return TalkEnd::Taken;
        case TalkState::Busy: break;
        }
        if (!InterruptPause(kPauseMs)) {
            return TalkEnd::Interrupted;
        }
        if (deadline.IsOver()) {
            return TalkEnd::TimeOver;
        }
    }
}

TalkEnd ServiceTalk::Send(const RequestBatch &batch) {
    MsgQueueState queue{};
    if (MsgQueueLook(kMessageKeyFile, &queue) != MsgQueueCause::Found) {
        trouble_ = LookLogTake("the service's queue cannot be found");
        return TalkEnd::NotSent;
    }
    // A service that waits has emptied it of requests; sending would be tried for seconds.
    if (queue.maxBytes - std::min(queue.bytes, queue.maxBytes) < kRequestMessageBytes) {
        trouble_ = "the service's queue is full of what it does not take, or too small";
        return TalkEnd::NotSent;
    }
    const auto process = Find();
    sleepsBefore_ = process ? ServiceReceiverSleeps(*process) : std::nullopt;
    if (!sleepsBefore_) {
        return process || isUnknown_ ? TalkEnd::Unknown : TalkEnd::Ended;
    }
    if (SendRequest(queue.id, batch.type, batch.mountPath.c_str(), BatchPaths(batch).c_str(),
                    LogHere()) < 0) {
        trouble_ = LookLogTake("the request cannot be sent");
        return TalkEnd::NotSent;
    }
    return TalkEnd::Done;
}
} // namespace vesk
