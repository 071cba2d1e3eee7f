// Storage spaces (volumes): UUID, reference path and block device path of each.
//
// A reference path is the mount path, the volume's top directory. Every lookup enumerates the
// spaces afresh; nothing is kept between calls. A returned text is malloc'd for the caller (wrap it
// in MallocText); null means not found or, after an error message, failure.
//
// Thread rule: no state; callable from any thread.
#ifndef SPACE_SPACE_H
#define SPACE_SPACE_H

char *SpaceGetReferencePath(const char *uuid);
char *SpaceGetDevicePath(const char *referencePath);
char *SpaceGetUUID(const char *referencePath);

#endif
