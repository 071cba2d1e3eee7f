// The messages that one function of the tool logged, at level 2 and above in their long form.
#pragma once

#include "tests/support/captured_log.h"

#include <algorithm>
#include <iterator>
#include <string>
#include <vector>

namespace vesk {
// In order, as CapturedLog::Messages() gives them.
inline std::vector<std::string> MessagesOf(CapturedLog &log, const std::string &function) {
    const std::string prefix = function + "() [N]";
    const std::vector<std::string> all = log.Messages();
    std::vector<std::string> messages;
    std::copy_if(all.begin(), all.end(), std::back_inserter(messages),
                 [&prefix](const std::string &message) { return message.rfind(prefix, 0) == 0; });
    return messages;
}

using Messages = std::vector<std::string>;
} // namespace vesk
