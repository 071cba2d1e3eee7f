// Removes what processes that died while they replaced a file (files/file_replace.h) left in its
// folder, so that years of crashes do not fill it. Thread rule: no state.
#pragma once

namespace vesk {
// The names of the temporary files through which a file is replaced:
// ".veskcachepinfile." + process id + "." + a number + ".tmp".
const char kTemporaryPrefix[] = ".veskcachepinfile.";
const char kTemporarySuffix[] = ".tmp";

// Removes the temporary files beside `path`, or beside its target if it is a link, whose process is
// gone and that nobody has written to for a minute; what cannot be removed stays. Never logs.
void FileRemoveLeftovers(const char *path);
} // namespace vesk
