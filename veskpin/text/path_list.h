// Lists of paths, as commands take and give them. Thread rule: no state.
#pragma once

#include <string>
#include <vector>

namespace vesk {
// Adds the paths of a list, "-" for standard input, each ended by a line feed or, with
// `nulSeparated`, by a NUL. 0 or an errno.
int PathListRead(const std::string &file, bool nulSeparated, std::vector<std::string> *paths);
} // namespace vesk
