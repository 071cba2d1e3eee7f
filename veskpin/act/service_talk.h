// The service that carries out what is sent: found and watched from outside, given one request at a
// time, and only while its receiver waits for one.
//
// Thread rule: one owner.
#pragma once

#include "act/deadline.h"
#include "act/request_batch.h"
#include "service/service_threads.h"

#include <cstdint>
#include <optional>
#include <string>

namespace vesk {
enum class TalkState {
    Takes,   // the receiver waits for a message, and has stored the one before
    Busy,    // not yet
    Ended,   // the service that was watched, its receiver or its worker has ended
    Absent,  // no service of this configuration takes messages from here
    Taken,   // somebody else has taken the request that was sent
    Unknown, // that cannot be told
};

// How a wait has ended.
enum class TalkEnd {
    Done,
    Interrupted,
    TimeOver,
    Ended,
    Absent,
    Unknown,
    NotSent,
    NoCache,
    BadConfig,
    Taken
};

class ServiceTalk {
public:
    explicit ServiceTalk(const std::string &configPath, const std::string &procFolder = "/proc");

    // The first look finds the service, one that lives wholly if there is one; the later ones are
    // about that one.
    TalkState Look();

    // Waits until it takes a message. A service that has just begun is waited for.
    TalkEnd AwaitTurn(const Deadline &deadline);

    // Sends the request; to be called in its turn. Done, or with nothing sent Ended, Unknown or
    // NotSent, with the cause in Trouble().
    TalkEnd Send(const RequestBatch &batch);

    // From here on about whichever service runs next.
    void Forget();

    const std::string &Trouble() const { return trouble_; }

private:
    std::optional<ServiceProcess> Find();
    std::optional<ServiceProcess> FindNew();
    bool IsTakenByOthers() const;
    struct Watched {
        pid_t pid;
        uint64_t startTicks;
    };
    const std::string configPath_; // resolved
    const std::string procFolder_;
    std::optional<Watched> watched_;
    std::optional<uint64_t> sleepsBefore_; // of the receiver, when the last request was sent
    bool isUnknown_ = false;
    std::string trouble_;
};
} // namespace vesk
