#include "config/json_array.h"

#include "base/log.h"

#include <algorithm>

namespace vesk {
bool JsonArrayHasString(Json::Value array, const char *text) { // NOLINT(performance-*): by value
    if (!array.isArray()) {
        return false;
    }
    return std::any_of(array.begin(), array.end(),
                       [text](const Json::Value &element) { return element.asString() == text; });
}

int JsonArrayRemoveString(Json::Value &array, const std::string &text) {
    Json::Value kept;
    int count = 0;
    for (const Json::Value &element : array) {
        const std::string value = element.asString();
        if (value == text) {
            ++count;
        } else {
            kept.append(value);
        }
    }
    if (count != 1) {
        LogError("Remove string error, count =%d", count);
        return -1;
    }
    array = std::move(kept);
    return 0;
}
} // namespace vesk
