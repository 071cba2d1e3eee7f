// Replacing a file that others may read at any moment, where others may write, too.
//
// Thread rule: no state.
#pragma once

#include <string>
#include <string_view>

namespace vesk {
// Makes the text the content of the file, whole: a new file (0644, the caller's) takes its place by
// a rename within its folder. What lies there is neither followed nor opened, and anything but a
// regular file stays. 0 or an errno, EINVAL for what is no regular file; then all is as it was.
int FileOutputReplace(const std::string &path, std::string_view text);
} // namespace vesk
