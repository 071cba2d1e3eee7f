// What has become of the files of a request. Thread rule: no state.
#pragma once

#include "act/request_batch.h"
#include "verbs/change_view.h"

#include <functional>
#include <optional>
#include <string>

namespace vesk {
using ChangeTeller = std::function<void(const ChangedFile &)>;

// Tells each file with its state now, as `list` has it, and why it is not what the request was for:
// the reason given, or else the one that follows from its state.
void OutcomeTell(const std::string &configPath, const RequestBatch &batch,
                 std::optional<ChangeReason> reason, const ChangeTeller &tell);
} // namespace vesk
