// Removes what processes that died while they replaced a file (files/file_replace.h) left in its
// folder, so that years of crashes do not fill it.
//
// Thread rule: no state.
#ifndef FILES_FILE_LEFTOVERS_H
#define FILES_FILE_LEFTOVERS_H

// The names of the temporary files through which a file is replaced:
// ".veskcachepinfile." + process id + "." + a number + ".tmp".
const char temporaryPrefix[] = ".veskcachepinfile.";
const char temporarySuffix[] = ".tmp";

// Removes the temporary files beside `path` whose process is gone and that nobody has written to
// for a minute; what cannot be removed stays. Never logs.
void FileRemoveLeftovers(const char *path);

#endif
