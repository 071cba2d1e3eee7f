// The names of the temporary files through which a file is replaced:
// ".veskcachepinfile." + process id + "." + a number + ".tmp".
#ifndef FILES_TEMPORARY_NAME_H
#define FILES_TEMPORARY_NAME_H

const char temporaryPrefix[] = ".veskcachepinfile.";
const char temporarySuffix[] = ".tmp";

#endif
