#include "model/look_errors.h"

#include "base/log.h"

#include <algorithm>

namespace vesk {
namespace {
std::string loggedErrors;
const size_t kLoggedMax = 1000; // bytes: one look's, not those of a hundred thousand

void KeepError(LogClass logClass, const LogPlace & /*place*/, const char *text) {
    if (logClass != LogClass::Error || loggedErrors.size() > kLoggedMax) {
        return;
    }
    std::string line = text;
    line.erase(line.find_last_not_of(" \n") + 1);
    loggedErrors += (loggedErrors.empty() ? "" : ": ") + line;
}
} // namespace

void LookErrorAdd(LookErrors *errors, const std::string &path, const std::string &text) {
    const auto isSame = [&](const LookError &error) {
        return error.path == path && error.text == text;
    };
    // What repeats itself does so soon; a hundred thousand files are not compared with each other.
    const size_t near = std::min<size_t>(errors->list.size(), 64);
    if (std::any_of(errors->list.rbegin(),
                    errors->list.rbegin() + static_cast<std::ptrdiff_t>(near), isSame)) {
        return;
    }
    if (errors->list.size() < kLookErrorsMax) {
        errors->list.push_back({path, text});
    } else {
        ++errors->more;
    }
}

void LookUnknownAdd(LookErrors *errors, const std::string &path, const std::string &text) {
    LookErrorAdd(errors, path, text);
    errors->isUnknown = true;
}

void LookErrorsAdd(LookErrors *errors, const LookErrors &others) {
    for (const LookError &error : others.list) {
        LookErrorAdd(errors, error.path, error.text);
    }
    errors->more += others.more;
    errors->isUnknown = errors->isUnknown || others.isUnknown;
}

void LookLogBegin() {
    LogSetSink(KeepError);
}

std::string LookLogTake(const std::string &otherwise) {
    std::string taken = loggedErrors.empty() ? otherwise : loggedErrors;
    loggedErrors.clear();
    return taken;
}
} // namespace vesk
