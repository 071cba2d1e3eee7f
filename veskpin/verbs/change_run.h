// Sending files to the service, request by request, and waiting for what becomes of them.
//
// Thread rule: one owner.
#pragma once

#include "act/deadline.h"
#include "act/request_watch.h"
#include "act/service_talk.h"
#include "model/file_look.h"
#include "text/work_progress.h"
#include "verbs/change_outcome.h"
#include "verbs/settings.h"

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace vesk {
struct ChangeHooks {
    ChangeTeller tell; // each file once, when it has come to rest
    // What cannot be pinned after all. Where it is empty such a file is told.
    std::function<void(const std::string &path, SkipReason reason)> skip;
    std::function<void(const RequestBatch &)> sent; // each request; may be empty
};

enum class ChangePace {
    Steady, // what is sent is carried out before much more is sent
    AtOnce, // as the service takes it
};

class ChangeRun {
public:
    // `deadline`, `progress` and `errors` outlive it.
    ChangeRun(const Settings &settings, RequestType type, ChangePace pace, const Deadline &deadline,
              WorkProgress &progress, LookErrors &errors, ChangeHooks hooks);

    // A file to be sent, as it was looked at. Sends a request when one is full. False, with nothing
    // done: nothing is sent any more.
    bool Add(const std::string &mountPath, const BatchFile &file);

    // A file that is as asked already. It is told when many are there, or at the end.
    void AddSettled(const std::string &mountPath, const BatchFile &file);

    // Sends what is left.
    void Flush();

    // The same, and waits until all is carried out unless told not to.
    void Finish();

    // The service has ended, and no other one comes: nothing is sent or waited for any more.
    void GiveUp() { end_ = TalkEnd::Ended; }

    uint64_t RequestsSent() const { return sent_; }
    // Done, or why not everything was carried out.
    TalkEnd End() const { return end_; }
    bool HasServiceEnded() const { return hasServiceEnded_; }
    const std::string &Trouble() const { return talk_.Trouble(); }

private:
    RequestBatch EmptyBatch(const std::string &mountPath) const {
        return {mountPath, type_, {}, {}};
    }
    void Send(const RequestBatch &batch, std::vector<BatchFile> *changed);
    bool MaySendTo(const std::string &mountPath);
    void Skip(const RequestBatch &batch, SkipReason reason);
    void SendNow(RequestBatch batch);
    bool AwaitTurn();
    bool AwaitRoom(size_t most);
    bool AwaitRestart();
    void Tell(const std::vector<RequestBatch> &batches, std::optional<ChangeReason> reason);
    void TellSettled();

    const std::string configPath_;
    const bool waits_;
    const bool hasTimeout_;
    const RequestType type_;
    const ChangePace pace_;
    const Deadline &deadline_;
    WorkProgress &progress_;
    LookErrors &errors_;
    const ChangeHooks hooks_;
    ServiceTalk talk_;
    RequestWatch watch_;
    RequestBatch open_; // that is being filled
    RequestBatch settled_;
    uint64_t sent_ = 0;
    TalkEnd end_ = TalkEnd::Done;  // anything else: nothing is sent any more
    bool hasServiceEnded_ = false; // one did; the next was waited for
};
} // namespace vesk
