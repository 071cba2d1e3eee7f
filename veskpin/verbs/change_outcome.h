// What has become of the files of requests. Thread rule: no state.
#pragma once

#include "act/request_batch.h"
#include "verbs/change_view.h"

#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace vesk {
using ChangeTeller = std::function<void(const ChangedFile &)>;

// Tells each file with its state now, as `list` has it, and why it is not what its request was for:
// the reason given, or else the one that follows from its state; who was not taken may
// be as asked all the same, and has none. What cannot be looked at becomes
// an error.
void OutcomeTell(const std::string &configPath, const std::vector<RequestBatch> &batches,
                 std::optional<ChangeReason> reason, const ChangeTeller &tell, LookErrors *errors);
} // namespace vesk
