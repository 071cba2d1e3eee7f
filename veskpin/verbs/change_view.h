// The answer of `pin` and `unpin`, shown file by file. Thread rule: one owner.
#pragma once

#include "model/look_errors.h"
#include "text/text_sink.h"
#include "verbs/file_state.h"
#include "verbs/plan_reason.h"
#include "verbs/settings.h"
#include "json/json_text.h"

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace vesk {
// Why a file is not what was asked for.
enum class ChangeReason {
    Dropped,     // the service gave its request up
    Vanished,    // it is no longer there, or another one
    NotTaken,    // the service did not get to it
    NeedsRepair, // missing or replaced: not the queue's to undo
};
const char *ChangeReasonText(ChangeReason reason);

struct ChangedFile {
    const std::string &path; // absolute
    std::optional<FileState> state;
    std::optional<ChangeReason> reason;
};

class ChangeView {
public:
    // `wanted`: the state that was asked for; `underway`: the one on the way to it, which will do
    // for those who do not wait.
    ChangeView(const char *command, FileState wanted, std::optional<FileState> underway,
               const Settings &settings, TextSink &out);

    // First the files that were asked for, as each comes to rest,
    void Put(const ChangedFile &file);
    // then those that were left out,
    void Skip(const std::string &path, SkipReason reason);
    // then the end.
    void End(uint64_t requestsSent, const std::vector<std::string> &repinned,
             const LookErrors &errors);

    bool IsAllAsAsked() const { return others_ == 0 && skipped_.empty(); }

private:
    void BeginSkipped();
    std::string SkippedText() const;
    const FileState wanted_;
    const std::optional<FileState> underway_;
    TextSink &out_;
    JsonWriter writer_;
    const bool json_;
    const bool color_;
    bool hasSkipped_ = false; // the list has begun
    uint64_t asAsked_ = 0;
    uint64_t others_ = 0;
    std::map<SkipReason, uint64_t> skipped_; // files
};
} // namespace vesk
