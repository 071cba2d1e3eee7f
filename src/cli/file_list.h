// Lists of file paths as the command line gives them, joined by ";". Thread rule: no state.
#pragma once

namespace vesk {

// 0 when every path of the list exists and there is at least one; otherwise -1 after an error
// message about the first that does not. Empty pieces are skipped; only the first 512 characters
// count.
int CheckFilesExist(const char *paths);

} // namespace vesk
