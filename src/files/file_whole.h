// Whole files of any length, for those who only look. Thread rule: no state.
#pragma once

#include <cstddef>
#include <string>

namespace vesk {
// The whole of a regular file of at most `maxBytes`. 0, or the errno of what failed.
int FileReadAll(const std::string &path, size_t maxBytes, std::string *content);
} // namespace vesk
