// The files of a call that changes, all looked at before the first is sent.
//
// Thread rule: one owner.
#pragma once

#include "act/file_spool.h"
#include "verbs/change_run.h"
#include "verbs/change_view.h"

#include <cstdint>
#include <optional>
#include <string>

namespace vesk {
enum class QueueAction : uint16_t {
    Send,
    TellOnly,   // it is as asked
    CannotSend, // it is told that it was not
};

class ChangeQueue {
public:
    // 0, or the errno with which the files cannot be kept.
    int Error() const { return spool_.Error(); }
    uint64_t Count() const { return count_; }

    void Put(const std::string &mountPath, const std::string &relativePath, const FileLook &look,
             std::optional<FileState> state, QueueAction action);

    // All are there: from here on they are taken.
    void Close() { spool_.Rewind(); }

    // Until none is left, or nothing is sent any more.
    void SendAll(ChangeRun &run, const ChangeTeller &tell);

    // Leaves all out.
    void SkipAll(SkipReason reason, ChangeView &view);

    // Tells that those which are left were not sent: as many as a second allows, and how many more.
    void TellRest(const ChangeTeller &tell, LookErrors *errors);

private:
    FileSpool spool_;
    uint64_t count_ = 0;
};
} // namespace vesk
